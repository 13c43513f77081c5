#include "server/server_remount.h"

#include <unistd.h>

#include "zyrovfs/error.h"
#include "zyrovfs/vfs.h"

namespace ZYROVFS::Server {
namespace {

constexpr unsigned int kBeforeKill = 1;  // for the unmount to reach the daemons
constexpr unsigned int kAfterKill = 2;   // for the daemons to follow their bus

void EndStaleChain(ServerMgr& mgr, unsigned int uid) {
    mgr.Unmount(uid, VFS_CONFIG_CONNECT);
    sleep(kBeforeKill);
    DBUS::DoKill();
    sleep(kAfterKill);
}

}  // namespace

MountOutcome MountAndDescribe(ServerMgr& mgr, unsigned int uid, const Json::Value& conf, bool force,
                              Json::Value& profile) {
    for (bool retried = false;; retried = true) {
        if (!mgr.Mount(uid, VFS_CONFIG_CONNECT, conf, force)) {
            return MountOutcome::kMountFailed;
        }
        if (mgr.CreateJsonObj(uid, VFS_CONFIG_CONNECT, profile, true)) {
            return MountOutcome::kDone;
        }
        if (retried || GetError() != VFS_ERR_FAILED) {
            return MountOutcome::kDescribeFailed;
        }
        EndStaleChain(mgr, uid);
    }
}

}  // namespace ZYROVFS::Server
