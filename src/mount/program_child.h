/**
 * The child side of a start, between fork and execve. A process with threads may have forked in the
 * middle of anything: nothing here allocates, locks or logs.
 */
#ifndef ZYROVFS_MOUNT_PROGRAM_CHILD_H
#define ZYROVFS_MOUNT_PROGRAM_CHILD_H

#include <sys/types.h>

#include <vector>

#include "mount/fork_as_user.h"

namespace ZYROVFS {

/** Instead of a user's: the identity that the process has. */
inline constexpr uid_t kOwnIdentity = static_cast<uid_t>(-1);

/** What the child tells through its pipe, which a program that has started closes. */
struct StartReport {
    pid_t daemon;  ///< of a daemon that was forked, otherwise 0
    IdentityStep step;
    int error;
};

/** All that the child needs, made before it is there: it may not allocate. */
struct Start {
    std::vector<char*> argv;
    std::vector<char*> environment;
    std::vector<int> descriptors;
    int report_fd;
    uid_t uid;
};

/** StartChild and StartDaemon (mount/program.h). What fails is reported. */
[[noreturn]] void BecomeChild(const Start& start);
[[noreturn]] void BecomeDaemon(const Start& start);

}  // namespace ZYROVFS

#endif
