#include "server/server_box.h"

namespace ZYROVFS::Server {

const CloudAccountRules& BoxServer::Rules() {
    // The one service for which the token's life goes before a stored end.
    static const CloudAccountRules rules{
        ZYROCloud::CLOUD_TYPE_BOX, "box://", true, true, nullptr, nullptr, nullptr, {"login"}};
    return rules;
}

}  // namespace ZYROVFS::Server
