/** Connections to a Box account. */
#ifndef ZYROVFS_SERVER_SERVER_BOX_H
#define ZYROVFS_SERVER_SERVER_BOX_H

#include "server/server_cloud.h"

namespace ZYROVFS::Server {

class BoxServer : public CloudAccount<BoxServer> {
  public:
    static const CloudAccountRules& Rules();
};

}  // namespace ZYROVFS::Server

#endif
