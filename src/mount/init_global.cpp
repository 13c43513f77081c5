#include "mount/init_global.h"

#include <zosplatform/process.h>

#include <clocale>
#include <cstdlib>
#include <optional>
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

bool IsAnyDaemonDead() {
    return DBUS::CheckDaemonDied() || GVFSD::CheckDaemonDied() || GVFSD_FUSE::CheckDaemonDied();
}

namespace {

constexpr const char* kActingUser = "ZYROVFS_UID";

/** For whom this process has brought the chain up. */
std::optional<unsigned int> initialised;

/** Whether it is that user's still: clean-up behind another user, or InitEnv, makes it theirs. */
bool IsReadyFor(unsigned int uid) {
    const char* acting_for = getenv(kActingUser);
    return initialised == uid && acting_for != nullptr && acting_for == std::to_string(uid);
}

void SetEnvironment(unsigned int uid) {
    setenv(kActingUser, std::to_string(uid).c_str(), 1);
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
    if (force && IsAnyDaemonDead()) {
        return true;
    }
    if (!StartChain()) {
        return false;
    }
    initialised = uid;
    return true;
}

}  // namespace

bool InitGlobal(unsigned int uid, bool force) {
    if (ZYRODZOSIsPrivilegedMode() == 0) {
        LOG_ERROR("not support VFS in DZOS");
        return false;
    }
    if (!force && IsReadyFor(uid)) {
        return true;
    }
    return NoThrow(VFS_ERR_FAILED, [=] { return Prepare(uid, force); });
}

bool InitForMount(unsigned int uid) {
    const bool was_ready = IsReadyFor(uid);
    if (!InitGlobal(uid, false)) {
        return false;
    }
    if (was_ready && IsAnyDaemonDead()) {
        initialised.reset();
        return InitGlobal(uid, false);
    }
    return true;
}

}  // namespace ZYROVFS
