/**
 * Work that only the user may do runs in a forked child: mount, unmount, path lookup, launch of the
 * fuse daemon. Each keeps its own steps; what they share stands here.
 */
#ifndef ZYROVFS_MOUNT_FORK_AS_USER_H
#define ZYROVFS_MOUNT_FORK_AS_USER_H

#include <sys/types.h>

#include "core/source_line.h"

namespace ZYROVFS {

/** Every child that acts for a user has this group. */
inline constexpr gid_t kUsersGid = 100;

/**
 * Lets waitpid collect a child under a service that ignores its children: clears SA_NOCLDWAIT of
 * SIGCHLD's action, and puts it back in the end if it was set. Process-wide.
 */
class SigchldGuard {
  public:
    SigchldGuard();
    SigchldGuard(const SigchldGuard&) = delete;
    SigchldGuard& operator=(const SigchldGuard&) = delete;
    ~SigchldGuard();

    /** Leaves the bit cleared for good. */
    void Dismiss() { restore_ = false; }

  private:
    bool restore_;
};

/** How a child ended. */
struct ChildEnd {
    enum How { kExited, kSignalled, kNotFound, kWaitFailed } how;
    int status;  ///< exit status for kExited; 0 for kNotFound (somebody else collected it)

    /** The common reading: exit status, 0 for a child that is gone, -1 for all else. */
    int Result() const { return how == kExited || how == kNotFound ? status : -1; }
};

/** Waits for one child, through interruptions. */
ChildEnd WaitForChild(pid_t pid);

/**
 * In a child, for its last steps as root before BecomeUserForGood. A process that has no root to
 * go back to, such as a backend, stays what it is: its groups may be right already.
 */
void RegainRoot();

/** What a process that was to become a user could not do; kDone: it is the user. */
enum class IdentityStep { kDone, kRoot, kGroups, kGid, kUid };

/**
 * In a child, for good: real, effective and saved ids become gid 100 and `uid`, and the groups of
 * root go. The effective uid must be 0 by then. Nothing is logged, so that a child of a process
 * with threads may call it before it executes another program; errno tells the cause.
 */
IdentityStep TryBecomeUser(uid_t uid);
/** TryBecomeUser from any effective uid, by way of the saved root identity. */
IdentityStep TryBecomeUserBySavedRoot(uid_t uid);
/** Logs, with errno, a step that failed. */
void LogIdentity(IdentityStep step, uid_t uid, SourceLine at);

/** TryBecomeUser; failures are logged in the name of `at`. */
bool BecomeUserForGood(uid_t uid, SourceLine at = SourceLine::Here());

/** In a child, for good: root by the saved root identity. Failures are logged in the name of `at`.
 */
bool BecomeRootForGood(SourceLine at = SourceLine::Here());

}  // namespace ZYROVFS

#endif
