/** Profiles as drivers take them. */
#ifndef ZYROVFS_CLOUD_STORED_PROFILE_H
#define ZYROVFS_CLOUD_STORED_PROFILE_H

#include <json/value.h>

#include <string>

#include "zyrovfs/server.h"

namespace ZYROCloud {

/**
 * A user's profile as `Server::Get` tells it, credentials in plain text, and its id as "server_id".
 * Null when there is none. A service's is kept by the thread while the user's file stays as it is:
 * a backend makes a driver for each of its calls, and reading a profile takes longer than the
 * call's request. Good until the next call.
 */
const Json::Value* StoredProfile(unsigned int uid, const std::string& server_id,
                                 ZYROVFS::Server::VFS_CONFIG_MODE mode);

}  // namespace ZYROCloud

#endif
