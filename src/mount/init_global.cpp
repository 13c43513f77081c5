#include <zosplatform/process.h>

#include <clocale>
#include <cstdlib>
#include <string>

#include "core/identity.h"
#include "core/log.h"
#include "core/no_throw.h"
#include "core/paths.h"
#include "mount/daemon.h"
#include "zyrovfs/global.h"
#include "zyrovfs/utils.h"
#include "zyrovfs/vfs.h"

namespace ZYROVFS {
namespace {

bool initialised = false;

void SetEnvironment(unsigned int uid) {
    setenv("ZYROVFS_UID", std::to_string(uid).c_str(), 1);
    setenv("XDG_RUNTIME_DIR", paths::RuntimeDir(GetActorUID()).c_str(), 1);
}

bool StartChain() {
    if (!Utils::LockMnt(true)) {
        LOG_ERROR("Failed to lock %m");
        return false;
    }
    const MountLockRelease release;
    return DBUS::Init() && GVFSD::Init() && GVFSD_FUSE::Init();
}

bool Prepare(unsigned int uid, bool force) {
    setlocale(LC_ALL, "");
    const UserWithRootGroup user(uid);
    SetEnvironment(uid);
    // A dead daemon means that the user is not connected to anything. Those who force only want to
    // clean up behind a chain that is there; they must not bring one to life.
    if (force &&
        (DBUS::CheckDaemonDied() || GVFSD::CheckDaemonDied() || GVFSD_FUSE::CheckDaemonDied())) {
        return true;
    }
    if (!StartChain()) {
        return false;
    }
    initialised = true;
    return true;
}

}  // namespace

bool InitGlobal(unsigned int uid, bool force) {
    if (ZYRODZOSIsPrivilegedMode() == 0) {
        LOG_ERROR("not support VFS in DZOS");
        return false;
    }
    if (!force && initialised) {
        return true;
    }
    return NoThrow(VFS_ERR_FAILED, [=] { return Prepare(uid, force); });
}

}  // namespace ZYROVFS
