/** Readiness of a process to act for one user. */
#ifndef ZYROVFS_GLOBAL_H
#define ZYROVFS_GLOBAL_H

#include <sys/types.h>

#include "zyrovfs/export.h"

namespace ZYROVFS {

/**
 * For a process that already knows its bus, such as a gvfs backend below a per-user daemon: sets
 * the acting user (decimal text), the runtime directory and the bus address in the environment.
 * False, with nothing changed, when an argument is null; no failure code is set.
 */
ZYROVFS_API bool InitEnv(const char* uid, const char* busAddress);

/**
 * The user on whose behalf the library works: the effective uid, or, in a process whose effective
 * uid is 0, the decimal number in the environment variable ZYROVFS_UID. Text that is no number
 * counts as 0.
 */
ZYROVFS_API uid_t GetActorUID();

/**
 * Prepares this process to act for `uid` and makes sure that the user's dbus-daemon, gvfsd and
 * gvfsd-fuse are up; the environment (ZYROVFS_UID, XDG_RUNTIME_DIR, DBUS_SESSION_BUS_ADDRESS)
 * stays set to that user. For callers with effective or saved root identity.
 *
 * Once it has succeeded in a process, later calls without `force` for the same user answer true at
 * once, until the process turns to another user. With
 * `force` it only starts a chain when none of the three daemons is known to be dead: a dead one
 * means that nobody is using the chain, so clean-up must not bring it to life.
 *
 * False when this system may not run the feature, when the user's mount lock cannot be had, or
 * when a daemon does not start (the cell then holds VFS_ERR_DBUS_ADDRESS if the bus has no
 * address). A cold start takes about nine seconds.
 */
ZYROVFS_API bool InitGlobal(unsigned int uid, bool force);

}  // namespace ZYROVFS

#endif
