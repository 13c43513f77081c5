/** Connections to a OneDrive account. */
#ifndef ZYROVFS_SERVER_SERVER_ONEDRIVE_H
#define ZYROVFS_SERVER_SERVER_ONEDRIVE_H

#include "server/server_cloud.h"

namespace ZYROVFS::Server {

class OneDriveServer : public CloudAccount<OneDriveServer> {
  public:
    static const CloudAccountRules& Rules();
};

}  // namespace ZYROVFS::Server

#endif
