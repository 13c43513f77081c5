#include "server/server_box.h"

namespace ZYROVFS::Server {
namespace {

const CloudAccountRules& Rules() {
    // The one service for which the token's life goes before a stored end.
    static const CloudAccountRules rules{
        ZYROCloud::CLOUD_TYPE_BOX, "box://", true, true, nullptr, nullptr, nullptr, {"login"}};
    return rules;
}

}  // namespace

bool BoxServer::Load(unsigned int uid, VFS_CONFIG_MODE mode, Json::Value conf, bool decrypt,
                     bool online) {
    return LoadBy(Rules(), uid, mode, conf, decrypt, online);
}

bool BoxServer::GetServerID(std::string& id) {
    id = Rules().scheme + email_;
    return true;
}

}  // namespace ZYROVFS::Server
