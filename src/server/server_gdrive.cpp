#include "server/server_gdrive.h"

namespace ZYROVFS::Server {

const CloudAccountRules& GDriveServer::Rules() {
    // Of what the service tells, only the user is asked for and kept.
    static const CloudAccountRules rules{
        ZYROCloud::CLOUD_TYPE_GOOGLE, "google://", true, false, "user", "user", "user",
        {"user", "emailAddress"}};
    return rules;
}

}  // namespace ZYROVFS::Server
