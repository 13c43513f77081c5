#include "server/server_dropbox.h"

namespace ZYROVFS::Server {

const CloudAccountRules& DropboxServer::Rules() {
    // Tokens may be without an end, and without another one to renew them.
    static const CloudAccountRules rules{ZYROCloud::CLOUD_TYPE_DROPBOX,
                                         "dropbox://",
                                         false,
                                         false,
                                         nullptr,
                                         nullptr,
                                         nullptr,
                                         {"email"}};
    return rules;
}

}  // namespace ZYROVFS::Server
