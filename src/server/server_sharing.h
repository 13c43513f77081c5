/** Connections to a share that needs no credentials of its own. */
#ifndef ZYROVFS_SERVER_SERVER_SHARING_H
#define ZYROVFS_SERVER_SERVER_SHARING_H

#include <string>

#include "server/server_base.h"

namespace ZYROVFS::Server {

/** A name and an e-mail: nothing to keep secret, nothing to clean up. */
class SharingServer : public ServerBase {
  public:
    /** VFS_ERR_BAD_PARAM. An alias may have any length here. */
    bool Load(unsigned int uid, VFS_CONFIG_MODE mode, Json::Value conf, bool decrypt,
              bool online) override;
    bool GetServerID(std::string& id) override;
    /** VFS_ERR_INVALID_SERVER; VFS_ERR_FAILED when the mount has no local path. */
    bool CreateJsonObj(unsigned int uid, VFS_CONFIG_MODE mode, Json::Value& out,
                       bool encrypt) override;
    bool DecryptCredentials(unsigned int uid, VFS_CONFIG_MODE mode, Json::Value& conf) override;
    bool RemoveCredentials(unsigned int uid, VFS_CONFIG_MODE mode, Json::Value& conf) override;
    bool DeletePostProcess(unsigned int uid, VFS_CONFIG_MODE mode) override;
    bool DumpToStruct(unsigned int uid, VFS_CONFIG_MODE mode, _tag_VFS_CONFIG_INFO_& info) override;
    bool IsUpdateNeedsRemount(unsigned int uid, VFS_CONFIG_MODE mode,
                              const Json::Value& changes) override;
    bool Mount(unsigned int uid, VFS_CONFIG_MODE mode, const Json::Value& conf,
               bool force) override;
    bool Unmount(unsigned int uid, VFS_CONFIG_MODE mode) override;

    bool IsConfigValid(Json::Value& conf);
    /** The e-mail up to its last at sign. */
    bool GetAccountName(std::string& name);
    /** The same as the server id. */
    bool GetURI(std::string& uri);

  private:
    std::string alias_;
    std::string email_;
};

}  // namespace ZYROVFS::Server

#endif
