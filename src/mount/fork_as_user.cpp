#include "mount/fork_as_user.h"

#include <grp.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>

#include "core/log.h"

namespace ZYROVFS {

SigchldGuard::SigchldGuard() : restore_(false) {
    struct sigaction action {};
    if (sigaction(SIGCHLD, nullptr, &action) == 0 && (action.sa_flags & SA_NOCLDWAIT) != 0) {
        action.sa_flags &= ~SA_NOCLDWAIT;
        restore_ = sigaction(SIGCHLD, &action, nullptr) == 0;
    }
}

SigchldGuard::~SigchldGuard() {
    struct sigaction action {};
    if (restore_ && sigaction(SIGCHLD, nullptr, &action) == 0) {
        action.sa_flags |= SA_NOCLDWAIT;
        sigaction(SIGCHLD, &action, nullptr);
    }
}

ChildEnd WaitForChild(pid_t pid) {
    int status = 0;
    while (waitpid(pid, &status, 0) < 0) {
        if (errno == ECHILD) {
            return {ChildEnd::kNotFound, 0};
        }
        if (errno != EINTR) {
            return {ChildEnd::kWaitFailed, -1};
        }
    }
    if (WIFEXITED(status)) {
        return {ChildEnd::kExited, WEXITSTATUS(status)};
    }
    return {ChildEnd::kSignalled, -1};
}

void RegainRoot() {
    constexpr uid_t kUnchanged = static_cast<uid_t>(-1);
    if (setresuid(kUnchanged, 0, kUnchanged) != 0) {
        return;  // what needs root tells by itself
    }
}

IdentityStep TryBecomeUser(uid_t uid) {
    // Root's supplementary groups would open to the user what only those groups may read.
    if (geteuid() == 0 && setgroups(0, nullptr) != 0) {
        return IdentityStep::kGroups;
    }
    if (setregid(kUsersGid, kUsersGid) != 0) {
        return IdentityStep::kGid;
    }
    return setreuid(uid, uid) == 0 ? IdentityStep::kDone : IdentityStep::kUid;
}

IdentityStep TryBecomeUserBySavedRoot(uid_t uid) {
    return seteuid(0) == 0 ? TryBecomeUser(uid) : IdentityStep::kRoot;
}

void LogIdentity(IdentityStep step, uid_t uid, SourceLine at) {
    switch (step) {
        case IdentityStep::kDone:
            break;
        case IdentityStep::kRoot:
            LOG_ERROR_AT(at, "Failed to set uid 0, %m");
            break;
        case IdentityStep::kGroups:
            LOG_ERROR_AT(at, "Failed to drop groups, %m");
            break;
        case IdentityStep::kGid:
            LOG_ERROR_AT(at, "Failed to set gid %u, %m", kUsersGid);
            break;
        case IdentityStep::kUid:
            LOG_ERROR_AT(at, "Failed to set uid %u, %m", uid);
            break;
    }
}

bool BecomeUserForGood(uid_t uid, SourceLine at) {
    const IdentityStep step = TryBecomeUser(uid);
    LogIdentity(step, uid, at);
    return step == IdentityStep::kDone;
}

bool BecomeRootForGood(SourceLine at) {
    if (seteuid(0) == 0 && setreuid(0, 0) == 0) {
        return true;
    }
    const int reason = errno;
    uid_t real = 0;
    uid_t effective = 0;
    uid_t saved = 0;
    getresuid(&real, &effective, &saved);
    errno = reason;
    LOG_ERROR_AT(at, "Failed to set uid %u %u %u, %m", real, effective, saved);
    return false;
}

}  // namespace ZYROVFS
