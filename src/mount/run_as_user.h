/**
 * Work that only the user may do runs in a program of its own: mount, unmount, path lookup, launch
 * of the fuse daemon, repair of its mount point. Whatever the calling process has done with GIO,
 * its threads, signals, descriptors and environment stays behind there.
 */
#ifndef ZYROVFS_MOUNT_RUN_AS_USER_H
#define ZYROVFS_MOUNT_RUN_AS_USER_H

#include <json/value.h>

#include <string>

#include "core/source_line.h"
#include "mount/fork_as_user.h"

namespace ZYROVFS {

struct HelperRun {
    enum How { kNoPipe, kNotStarted, kEnded } how = kNoPipe;
    ChildEnd end{ChildEnd::kWaitFailed, -1};
    std::string report;

    /** Exit status; -1 for a helper that was killed or never ran. */
    int Result() const { return how == kEnded ? end.Result() : -1; }
};

/**
 * Runs `job` of the helper for the user, and waits for its end. The request goes through a socket:
 * passwords stand in no argument and no environment. `read`, unless null, takes what the helper
 * writes to its standard output. The helper is given the mount lock if this process holds it, and
 * ends when this process does. Its exit status is known whatever the caller does about SIGCHLD.
 * Failures are logged in the name of `at`; a helper that is not there sets VFS_ERR_FAILED.
 */
HelperRun RunAsUser(const char* job, uid_t uid, Json::Value request, std::string (*read)(int pipe),
                    SourceLine at = SourceLine::Here());

}  // namespace ZYROVFS

#endif
