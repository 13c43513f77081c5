/**
 * What a user's three daemons have in common: a pid file that may be stale, a test whether the
 * daemon lives, a start under the user's mount lock. The daemons' own units keep only how theirs is
 * launched. Lines are logged in the name of the unit that asks, with its own texts.
 */
#ifndef ZYROVFS_MOUNT_DAEMON_H
#define ZYROVFS_MOUNT_DAEMON_H

#include <sys/types.h>

#include <string>

#include "core/source_line.h"

namespace ZYROVFS {

/** One daemon as data. Texts are log lines, most of them formats. */
struct Daemon {
    const char* process;  ///< name of the process
    std::string (*pid_file)(unsigned int uid);
    const char* pid_lock_failed;  ///< may take %u, the user
    const char* pid_read_failed;  ///< takes %s, the pid file, and %m
    const char* pid_unknown;      ///< takes %u, the user
    const char* lock_failed;
};

extern const Daemon kDbusDaemon;
extern const Daemon kGvfsdDaemon;
extern const Daemon kGvfsdFuseDaemon;

/**
 * Reads the pid file under a shared lock. A file that is not there gives pid 0 and success, and so
 * does text that is no number: nobody has that pid, so the daemon counts as dead.
 */
bool ReadPid(const Daemon& daemon, int& pid, SourceLine at = SourceLine::Here());

/** Whether `pid` is this daemon of the acting user, by name and owner: pids are reused. */
bool IsDaemonAlive(const Daemon& daemon, int pid);

/** True when the pid was read and that daemon is gone, also when there is no pid file. */
bool CheckDaemonDied(const Daemon& daemon, SourceLine at = SourceLine::Here());

/**
 * Makes sure that the daemon runs: calls `launch` for the acting user unless it is alive. It is
 * looked for without the exclusive lock, which would make users of a healthy chain wait for each
 * other, and once more under it, since another process may have started it meanwhile. The lock is
 * still held afterwards when it was taken; the caller gives it back.
 */
bool StartIfDead(const Daemon& daemon, bool (*launch)(uid_t uid),
                 SourceLine at = SourceLine::Here());

/** Writes the pid file of a daemon just started. */
bool WritePid(const Daemon& daemon, uid_t uid, int pid, SourceLine at = SourceLine::Here());

/** Gives back one level of the mount lock when it goes; does nothing when none is held. */
class MountLockRelease {
  public:
    MountLockRelease() = default;
    MountLockRelease(const MountLockRelease&) = delete;
    MountLockRelease& operator=(const MountLockRelease&) = delete;
    ~MountLockRelease();
};

}  // namespace ZYROVFS

#endif
