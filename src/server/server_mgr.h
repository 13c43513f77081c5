/** Picks the server type of a profile and owns it for one operation. */
#ifndef ZYROVFS_SERVER_SERVER_MGR_H
#define ZYROVFS_SERVER_SERVER_MGR_H

#include <json/value.h>

#include <memory>
#include <string>

#include "server/server_base.h"

namespace ZYROVFS::Server {

/**
 * The operations of ServerBase on the instance that Load picked. Without an instance they log and
 * answer false, with no code. Mount, Unmount and DeletePostProcess run as root.
 */
class ServerMgr {
  public:
    /** By the profile's "protocol": VFS_ERR_BAD_PARAM without one. The instance stays held when its
     * own Load fails. */
    bool Load(unsigned int uid, VFS_CONFIG_MODE mode, Json::Value& conf, bool decrypt, bool online);
    bool GetServerID(std::string& id);
    bool CreateJsonObj(unsigned int uid, VFS_CONFIG_MODE mode, Json::Value& out, bool encrypt);
    bool DecryptCredentials(unsigned int uid, VFS_CONFIG_MODE mode, Json::Value& conf);
    bool RemoveCredentials(unsigned int uid, VFS_CONFIG_MODE mode, Json::Value& conf);
    bool DeletePostProcess(unsigned int uid, VFS_CONFIG_MODE mode);
    bool DumpToStruct(unsigned int uid, VFS_CONFIG_MODE mode, _tag_VFS_CONFIG_INFO_& info);
    bool IsUpdateNeedsRemount(unsigned int uid, VFS_CONFIG_MODE mode, const Json::Value& changes);
    bool Mount(unsigned int uid, VFS_CONFIG_MODE mode, const Json::Value& conf, bool force);
    bool Unmount(unsigned int uid, VFS_CONFIG_MODE mode);

  private:
    std::unique_ptr<ServerBase> server_;
};

}  // namespace ZYROVFS::Server

#endif
