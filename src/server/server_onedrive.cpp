#include "server/server_onedrive.h"

namespace ZYROVFS::Server {

const CloudAccountRules& OneDriveServer::Rules() {
    static const CloudAccountRules rules{
        ZYROCloud::CLOUD_TYPE_ONEDRIVE, "onedrive://", true, false, nullptr, "emails", nullptr,
        {"emails", "account"}};
    return rules;
}

}  // namespace ZYROVFS::Server
