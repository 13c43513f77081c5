/** The environment of whatever runs for a user. */
#ifndef ZYROVFS_MOUNT_USER_ENVIRONMENT_H
#define ZYROVFS_MOUNT_USER_ENVIRONMENT_H

#include <sys/types.h>

#include <string>
#include <vector>

namespace ZYROVFS {

/**
 * "NAME=value" each: the user's own runtime folder and session bus, the language and the proxies of
 * the caller, and nothing else.
 */
std::vector<std::string> UserEnvironment(uid_t uid);

}  // namespace ZYROVFS

#endif
