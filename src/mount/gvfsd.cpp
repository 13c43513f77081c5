#include <unistd.h>

#include "core/log.h"
#include "core/no_throw.h"
#include "core/paths.h"
#include "mount/daemon.h"
#include "mount/program.h"
#include "mount/user_environment.h"
#include "zyrovfs/vfs.h"

namespace ZYROVFS {
namespace {

/** The pid of a new gvfsd, 0 on failure. */
pid_t SpawnGvfsd(uid_t uid) {
    const Program gvfsd{{paths::kGvfsd, "-r", "--no-fuse"}, UserEnvironment(uid), {-1, -1, -1}};
    const pid_t pid = StartDaemon(gvfsd, uid);
    if (pid < 0) {
        LOG_ERROR("Error launching gvfsd: %m");
        return 0;
    }
    return pid;
}

bool Launch(uid_t uid) {
    const pid_t pid = SpawnGvfsd(uid);
    if (pid == 0) {
        LOG_ERROR("Failed to run gvfsd, uid=%u", uid);
        return false;
    }
    sleep(3);
    return WritePid(kGvfsdDaemon, uid, pid);
}

}  // namespace

bool GVFSD::IsAlive(int pid) {
    return IsDaemonAlive(kGvfsdDaemon, pid);
}

bool GVFSD::CheckDaemonDied() {
    return NoThrow(VFS_ERR_FAILED, [] { return ZYROVFS::CheckDaemonDied(kGvfsdDaemon); });
}

bool GVFSD::Init() {
    const MountLockRelease release;
    return NoThrow(VFS_ERR_FAILED, [] { return StartIfDead(kGvfsdDaemon, Launch); });
}

}  // namespace ZYROVFS
