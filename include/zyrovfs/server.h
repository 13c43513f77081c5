/**
 * Connection profiles of one user: the store on disk and the operations on it.
 *
 * A profile is a JSON object kept under its server id, a text such as
 * "sftp://amy@nas.example:2222". Callers run as root or with a saved root identity. All operations
 * answer bool unless stated otherwise; after false, GetError() tells the cause. None of them may
 * run in two threads at once.
 *
 * The files have no lock: two processes that change the profiles of one user at the same moment
 * lose one of the changes, though never the file.
 */
#ifndef ZYROVFS_SERVER_H
#define ZYROVFS_SERVER_H

#include <json/value.h>

#include <string>

#include "zyrovfs/export.h"

namespace ZYROVFS::Server {

/** Which of a user's two files an operation works on. Any other number fails. */
enum VFS_CONFIG_MODE : unsigned int {
    VFS_CONFIG_SERVER = 0,   ///< saved profiles: servers.conf under /usr/zyro/etc/zyrovfs/UID
    VFS_CONFIG_CONNECT = 1,  ///< live connections: connect.conf under /var/tmp/zyrovfs/UID
};

enum VFS_CONFIG_ACTION : unsigned int {
    VFS_CONFIG_READ = 0,
    VFS_CONFIG_WRITE = 1,
};

// ---------------------------------------------------------------------------------------------
// The store: one whole-file read, a change in memory, one whole-file write. Credentials in these
// documents are enciphered; the store passes them through.

/** Makes the user's directory if it is missing. VFS_ERR_FAILED. */
ZYROVFS_API bool CfgCheckPath(unsigned int uid, VFS_CONFIG_MODE mode);

/** The file's path, its directory made. VFS_ERR_FAILED. */
ZYROVFS_API bool CfgGetPath(unsigned int uid, VFS_CONFIG_MODE mode, std::string& path);

/**
 * Reads the whole document into `doc`, or writes `doc` over the file. A missing or empty file reads
 * as a document with an empty "servers" object. False sets a code only when the path cannot be had
 * (VFS_ERR_FAILED); a failed read or write is logged and named by the caller.
 */
ZYROVFS_API bool CfgAccess(unsigned int uid, VFS_CONFIG_MODE mode, VFS_CONFIG_ACTION action,
                           Json::Value& doc);

/**
 * Adds a profile under a new id. VFS_ERR_CONNECT_EXISTS or VFS_ERR_SERVER_EXISTS (by mode) when the
 * id is taken, VFS_ERR_CONFIG_READ when the file cannot be read or cannot be written.
 */
ZYROVFS_API bool CfgAppend(unsigned int uid, VFS_CONFIG_MODE mode, const char* serverID,
                           Json::Value profile);

/**
 * Gives the profiles whose text member `key` equals `value`, as an object keyed by server id; empty
 * when there are none. VFS_ERR_CONFIG_READ.
 */
ZYROVFS_API bool CfgGetByKey(unsigned int uid, VFS_CONFIG_MODE mode, const char* key,
                             const char* value, Json::Value& out);

/** True when 100 profiles of this protocol are kept, or when that cannot be found out. */
ZYROVFS_API bool CfgIsFull(unsigned int uid, VFS_CONFIG_MODE mode, const char* protocol);

/** VFS_ERR_CONFIG_READ, VFS_ERR_CONFIG_NOT_FOUND. */
ZYROVFS_API bool CfgGetByID(unsigned int uid, VFS_CONFIG_MODE mode, const char* serverID,
                            Json::Value& profile);

/** Removes a profile; true also when there was none. VFS_ERR_CONFIG_READ, also for a failed write.
 */
ZYROVFS_API bool CfgDeleteByID(unsigned int uid, VFS_CONFIG_MODE mode, const char* serverID);

/**
 * Replaces a profile, under another id when `newServerID` differs. VFS_ERR_CONFIG_READ;
 * VFS_ERR_CONFIG_WRITE when the write under the same id fails. A change of id is a delete and an
 * append: when the new id is taken, the old profile is gone and the "exists" code tells so.
 */
ZYROVFS_API bool CfgSetByID(unsigned int uid, VFS_CONFIG_MODE mode, std::string serverID,
                            std::string& newServerID, const Json::Value& profile);

// ---------------------------------------------------------------------------------------------
// Operations on profiles. `force` accepts a changed SSH host key or a new certificate.

/**
 * Makes a profile from `conf`; in VFS_CONFIG_CONNECT it is mounted first. With a null `conf` and an
 * id in `serverID`, the saved profile of that id is connected. On success `serverID` is the
 * computed id and `out` the stored object, credentials enciphered. A connection that is recorded
 * already counts as added.
 *
 * VFS_ERR_FAILED when the saved profile cannot be read, VFS_ERR_CONFIG_FULL, VFS_ERR_BAD_PARAM for
 * a profile that lacks a key, the codes of the mount, VFS_ERR_SERVER_EXISTS, VFS_ERR_CONFIG_READ.
 */
ZYROVFS_API bool Add(unsigned int uid, VFS_CONFIG_MODE mode, std::string& serverID,
                     Json::Value conf, bool force, Json::Value& out);

/**
 * Reads one profile, with "api" and "protocol_name" from the catalogue. With `withCredentials` the
 * credentials come in plain text, without they are left out. `online` lets cloud profiles ask their
 * service. The store's codes; VFS_ERR_UNKNOWN for a profile that does not load; VFS_ERR_FAILED for
 * a protocol that the catalogue does not have.
 */
ZYROVFS_API bool Get(unsigned int uid, VFS_CONFIG_MODE mode, const char* serverID,
                     bool withCredentials, bool online, Json::Value& out);

/**
 * Removes one profile from one file, then takes its mount down and, for a connection, forgets the
 * host's key and certificate. True when there was no such profile. VFS_ERR_BAD_PARAM for a null id
 * or a profile that does not load (it is removed by then), else the store's codes.
 */
ZYROVFS_API bool Delete(unsigned int uid, VFS_CONFIG_MODE mode, const char* serverID);

/**
 * Overlays the members of `conf` that are not null. A change that matters to a live mount mounts
 * anew. `serverID` becomes the new id when host or account changed. VFS_ERR_CONFIG_NOT_FOUND,
 * VFS_ERR_BAD_PARAM, VFS_ERR_FAILED, or the codes of the mount.
 */
ZYROVFS_API bool Set(unsigned int uid, VFS_CONFIG_MODE mode, std::string& serverID,
                     const Json::Value& conf, bool force);

/** Mounts a recorded connection again. VFS_ERR_CONFIG_NOT_FOUND, VFS_ERR_BAD_PARAM, mount codes. */
ZYROVFS_API bool Connect(unsigned int uid, const char* serverID, bool force);

/** Takes a connection's mount down; the record stays. Codes as for Connect. */
ZYROVFS_API bool Disconnect(unsigned int uid, const char* serverID);

/**
 * One page of profiles or connections. `protocol` null or empty takes all; `sortBy` is "protocol",
 * "port", "hostname", "alias", "account", "codepage" or "uri" (other text sorts by protocol), null
 * keeps the file's order. `limit` 0 gives all, whatever `offset` says.
 *
 * `out` gets "total" (matching entries before the page was cut), "offset", and an array under
 * "profiles" or "connections". Entries that do not load are left out. VFS_ERR_CONFIG_READ.
 */
ZYROVFS_API bool List(unsigned int uid, VFS_CONFIG_MODE mode, const char* protocol,
                      const char* sortBy, bool ascending, unsigned long offset, unsigned long limit,
                      Json::Value& out);

// ---------------------------------------------------------------------------------------------
// Around the profiles.

/**
 * Removes what users left behind: live mounts, connection records, and when asked for the saved
 * profiles and the runtime directory (only when no daemon of the user lives). `uids` is an array of
 * numbers. Always true; failures are logged. The environment stays set to the last user.
 */
ZYROVFS_API bool DeleteUser(Json::Value& uids, bool removeProfiles, bool removeRuntime);

/**
 * Turns a connection's id with a path behind it into the URI that is mounted, without user, and the
 * user's name. `uri` must begin with exactly the id's text. False when there is no such connection
 * of the acting user; no code beyond the store's is set.
 */
ZYROVFS_API bool GetUserAndURI(const char* uri, std::string& user, std::string& outURI);

/**
 * Credentials as they stand in files. `size` is that of `out`; a text that does not fit fails.
 * Non-zero is success; the platform error tells the cause of a failure.
 */
ZYROVFS_API int SzEncrypt(const char* plain, char* out, unsigned int size);
ZYROVFS_API int SzDecrypt(const char* cipher, char* out, unsigned int size);

/** Host of a URI as a "known_hosts" file writes it: with a port other than 22, "[host]:port". */
ZYROVFS_API bool GetSFTPHost(const char* uri, std::string& host);

}  // namespace ZYROVFS::Server

#endif
