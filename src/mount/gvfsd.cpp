#include <unistd.h>

#include "core/log.h"
#include "core/no_throw.h"
#include "core/paths.h"
#include "mount/daemon.h"
#include "mount/glib_handle.h"
#include "zyrovfs/vfs.h"

namespace ZYROVFS {
namespace {

void SetUpGvfsd(gpointer data) {
    PointStdioAtNull();
    BecomeDaemonOf(*static_cast<const uid_t*>(data));
}

/** The pid of a new gvfsd, 0 on failure. */
GPid SpawnGvfsd(uid_t uid) {
    const char* const argv[] = {paths::kGvfsd, "-r", "--no-fuse", nullptr};
    const auto flags =
        static_cast<GSpawnFlags>(G_SPAWN_STDOUT_TO_DEV_NULL | G_SPAWN_STDERR_TO_DEV_NULL);
    GPid pid = 0;
    GError* error = nullptr;
    g_spawn_async(nullptr, const_cast<char**>(argv), nullptr, flags, SetUpGvfsd, &uid, &pid,
                  &error);
    const UniqueError failure(error);
    if (failure != nullptr) {
        LOG_ERROR("Error launching gvfsd: %s", failure->message);
        return 0;
    }
    return pid;
}

bool Launch(uid_t uid) {
    const GPid pid = SpawnGvfsd(uid);
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
