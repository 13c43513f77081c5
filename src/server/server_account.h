/**
 * What the server types have in common: the mount session of a profile, and the local path of what
 * was mounted. The types that are an account at a service, not a host, share some more.
 */
#ifndef ZYROVFS_SERVER_SERVER_ACCOUNT_H
#define ZYROVFS_SERVER_SERVER_ACCOUNT_H

#include <json/value.h>

#include <string>

#include "core/source_line.h"
#include "server/config_info.h"

namespace ZYROVFS::Server {

// --- any server type --------------------------------------------------------------------------

/** Takes the mount of a server down. `uri_path` may be null. Codes of the unmount. */
bool UnmountServer(unsigned int uid, const std::string& id, const char* uri_path);

/**
 * Finds the local path of what was just mounted. `remote` becomes its remote path, if there is one.
 * False is logged in the name of `at` and leaves VFS_ERR_FAILED, on which a connection is mounted
 * once more.
 */
bool FindLocalPath(unsigned int uid, const std::string& id, const std::string& uri_path,
                   const std::string& codepage, std::string& remote, std::string& local,
                   SourceLine at = SourceLine::Here());

/** Writes a credential, enciphered when asked for. False is logged: VFS_ERR_UNKNOWN. */
bool WriteSecret(const char* key, const std::string& plain, bool encrypt, Json::Value& out,
                 SourceLine at = SourceLine::Here());

/** Deciphers a credential in place. False is logged: VFS_ERR_FAILED. */
bool DecipherSecret(const char* key, Json::Value& conf, SourceLine at = SourceLine::Here());

// --- types that are known by an e-mail --------------------------------------------------------

/** The e-mail up to its last at sign; all of it when there is none. */
std::string AccountNameOf(const std::string& email);

/** Mounts an account. `secret` is what the backend asks for as the password. Codes of the mount. */
bool MountAccount(unsigned int uid, const std::string& email, const std::string& secret,
                  const std::string& id, const Json::Value& conf, bool force);

/** Member "path" of a stored account: `known`, or what FindLocalPath gives when that is empty. */
bool WriteAccountPath(unsigned int uid, const std::string& id, const std::string& known,
                      Json::Value& out, SourceLine at = SourceLine::Here());

/** What a listing shows of an account; limit of connections and id stay untouched. */
void DumpAccount(const std::string& protocol, const std::string& uri, const std::string& alias,
                 const std::string& email, int connect_status, _tag_VFS_CONFIG_INFO_& info);

}  // namespace ZYROVFS::Server

#endif
