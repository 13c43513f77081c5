/** What a kind of remote server must be able to do. */
#ifndef ZYROVFS_SERVER_SERVER_BASE_H
#define ZYROVFS_SERVER_SERVER_BASE_H

#include <json/value.h>

#include <string>

#include "server/config_info.h"
#include "zyrovfs/server.h"

namespace ZYROVFS::Server {

/**
 * One profile in the hands of its server type. An object lives for one operation; all operations
 * answer bool and leave the cause of a failure in the error cell.
 */
class ServerBase {
  public:
    virtual ~ServerBase() = default;

    /** Takes a profile in and validates it. `decrypt`: its credentials are enciphered. `online`:
     * the remote side may be asked. */
    virtual bool Load(unsigned int uid, VFS_CONFIG_MODE mode, Json::Value conf, bool decrypt,
                      bool online) = 0;
    /** The id under which the profile is stored. */
    virtual bool GetServerID(std::string& id) = 0;
    /** The profile as it is stored; with `encrypt` its credentials are enciphered. */
    virtual bool CreateJsonObj(unsigned int uid, VFS_CONFIG_MODE mode, Json::Value& out,
                               bool encrypt) = 0;
    virtual bool DecryptCredentials(unsigned int uid, VFS_CONFIG_MODE mode, Json::Value& conf) = 0;
    virtual bool RemoveCredentials(unsigned int uid, VFS_CONFIG_MODE mode, Json::Value& conf) = 0;
    /** Clean-up after the profile was deleted. */
    virtual bool DeletePostProcess(unsigned int uid, VFS_CONFIG_MODE mode) = 0;
    virtual bool DumpToStruct(unsigned int uid, VFS_CONFIG_MODE mode,
                              _tag_VFS_CONFIG_INFO_& info) = 0;
    /** Whether a live mount has to be made anew for these changes. */
    virtual bool IsUpdateNeedsRemount(unsigned int uid, VFS_CONFIG_MODE mode,
                                      const Json::Value& changes) = 0;
    virtual bool Mount(unsigned int uid, VFS_CONFIG_MODE mode, const Json::Value& conf,
                       bool force) = 0;
    virtual bool Unmount(unsigned int uid, VFS_CONFIG_MODE mode) = 0;

    /** At most 255 bytes; empty is fine. */
    bool IsAliasValid(const char* alias);
    /** 1 when connect.conf has this server and its local path stands, else 0. The saved profiles
     * play no part, and nobody asks the remote side. */
    int GetConnectStatus(unsigned int uid);

  protected:
    std::string protocol_;
    std::string path_;  ///< local path of the mount, empty until known
    std::string client_id_;
    int connect_status_ = 0;
};

}  // namespace ZYROVFS::Server

#endif
