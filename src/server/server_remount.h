/** Mounting a connection and finding out where it landed, with the one recovery of the feature. */
#ifndef ZYROVFS_SERVER_SERVER_REMOUNT_H
#define ZYROVFS_SERVER_SERVER_REMOUNT_H

#include <json/value.h>

#include "server/server_mgr.h"

namespace ZYROVFS::Server {

enum class MountOutcome {
    kDone,
    kMountFailed,     ///< never tried again
    kDescribeFailed,  ///< mounted, but there is no profile to store for it
};

/**
 * Mounts what `mgr` holds and puts its connection profile, credentials enciphered, into `profile`.
 *
 * A mount whose local path cannot be found (VFS_ERR_FAILED) means that the user's daemons are
 * stale: it is taken down, the user's bus is ended, which takes the user's other mounts with it,
 * and the mount is made anew, once. That costs three seconds. The cell tells the cause of a
 * failure.
 */
MountOutcome MountAndDescribe(ServerMgr& mgr, unsigned int uid, const Json::Value& conf, bool force,
                              Json::Value& profile);

}  // namespace ZYROVFS::Server

#endif
