/** Servers that GVFS mounts by a URI of host, port and account: ftp, sftp, dav, davs, cifs, nfs. */
#ifndef ZYROVFS_SERVER_SERVER_VFS_H
#define ZYROVFS_SERVER_SERVER_VFS_H

#include <string>

#include "server/server_base.h"
#include "zyrovfs/vfs.h"

namespace ZYROVFS::Server {

/**
 * A profile of any standard protocol. Its id is scheme, user, host and port: two profiles of one
 * account on one host with different remote paths are the same server.
 */
class VFSServer : public ServerBase {
  public:
    /**
     * VFS_ERR_BAD_PARAM for a missing key, a value of the wrong type and a port outside of 1 to
     * 65535; port 0 takes the default of the catalogue. A password that cannot be deciphered stays
     * as it stands, and VFS_ERR_FAILED in the cell.
     */
    bool Load(unsigned int uid, VFS_CONFIG_MODE mode, Json::Value conf, bool decrypt,
              bool online) override;
    bool GetServerID(std::string& id) override;
    /**
     * VFS_ERR_UNKNOWN when the password cannot be enciphered, VFS_ERR_INVALID_SERVER, and for a
     * connection VFS_ERR_FAILED when the mount has no local path. A saved profile takes its remote
     * path from the live connection of the same id.
     */
    bool CreateJsonObj(unsigned int uid, VFS_CONFIG_MODE mode, Json::Value& out,
                       bool encrypt) override;
    /** VFS_ERR_FAILED. */
    bool DecryptCredentials(unsigned int uid, VFS_CONFIG_MODE mode, Json::Value& conf) override;
    bool RemoveCredentials(unsigned int uid, VFS_CONFIG_MODE mode, Json::Value& conf) override;
    /** Forgets the host's key and certificate after a connection was deleted.
     * VFS_ERR_INVALID_SERVER; no code when the mount lock cannot be had. */
    bool DeletePostProcess(unsigned int uid, VFS_CONFIG_MODE mode) override;
    bool DumpToStruct(unsigned int uid, VFS_CONFIG_MODE mode, _tag_VFS_CONFIG_INFO_& info) override;
    bool IsUpdateNeedsRemount(unsigned int uid, VFS_CONFIG_MODE mode,
                              const Json::Value& changes) override;
    /** Codes of the mount. An empty account that mounted becomes "anonymous". */
    bool Mount(unsigned int uid, VFS_CONFIG_MODE mode, const Json::Value& conf,
               bool force) override;
    /** VFS_ERR_INVALID_SERVER, or the codes of the unmount. */
    bool Unmount(unsigned int uid, VFS_CONFIG_MODE mode) override;

    bool IsHostnameValid(const char* hostname);
    /** 1 to 65535. */
    bool IsPortValid(unsigned int port);
    bool IsCodepageValid(const char* codepage);
    /** Checks the members that are there. */
    bool IsConfigValid(Json::Value& conf);
    /** Plain text for people, without account and password. */
    bool GetURI(std::string& uri);

  private:
    void Take(const Json::Value& conf);
    /** Remote and local path of a connection, as they stand in its record. */
    bool WriteMountedPaths(unsigned int uid, const std::string& id, Json::Value& out);
    /** Remote path of a saved profile: that of the connection with the same id. */
    void WriteRemotePath(unsigned int uid, const std::string& id, Json::Value& out);
    bool MountAs(const char* account, const std::string& id, const Json::Value& conf, bool force,
                 VFS& session);
    /** The second mount of a profile without account, which then has one. */
    bool MountAnonymously(const Json::Value& conf, bool force, VFS& session);

    std::string hostname_;
    unsigned int port_ = 0;
    std::string alias_;
    std::string account_;
    std::string password_;  ///< plain text
    std::string codepage_;
    std::string uri_path_;
    unsigned int max_connection_ = 0;
};

}  // namespace ZYROVFS::Server

#endif
