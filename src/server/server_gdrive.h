/** Connections to a Google Drive account. */
#ifndef ZYROVFS_SERVER_SERVER_GDRIVE_H
#define ZYROVFS_SERVER_SERVER_GDRIVE_H

#include "server/server_cloud.h"

namespace ZYROVFS::Server {

class GDriveServer : public CloudAccount<GDriveServer> {
  public:
    static const CloudAccountRules& Rules();
};

}  // namespace ZYROVFS::Server

#endif
