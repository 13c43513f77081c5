/** Connections to a Box account. */
#ifndef ZYROVFS_SERVER_SERVER_BOX_H
#define ZYROVFS_SERVER_SERVER_BOX_H

#include "server/server_cloud.h"

namespace ZYROVFS::Server {

class BoxServer : public CloudServer {
  public:
    bool Load(unsigned int uid, VFS_CONFIG_MODE mode, Json::Value conf, bool decrypt,
              bool online) override;
    bool GetServerID(std::string& id) override;
};

}  // namespace ZYROVFS::Server

#endif
