/** Connections to a Dropbox account. */
#ifndef ZYROVFS_SERVER_SERVER_DROPBOX_H
#define ZYROVFS_SERVER_SERVER_DROPBOX_H

#include "server/server_cloud.h"

namespace ZYROVFS::Server {

class DropboxServer : public CloudAccount<DropboxServer> {
  public:
    static const CloudAccountRules& Rules();
};

}  // namespace ZYROVFS::Server

#endif
