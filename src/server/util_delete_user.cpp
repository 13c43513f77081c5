#include <dirent.h>
#include <unistd.h>
#include <zosplatform/file.h>
#include <zosplatform/process.h>

#include <cerrno>
#include <cstdlib>
#include <memory>

#include "core/entry_name.h"
#include "core/handle.h"
#include "core/identity.h"
#include "core/log.h"
#include "core/no_throw.h"
#include "core/owned_folder.h"
#include "core/paths.h"
#include "core/user_mount.h"
#include "mount/init_global.h"
#include "zyrovfs/global.h"
#include "zyrovfs/server.h"
#include "zyrovfs/utils.h"
#include "zyrovfs/vfs.h"

namespace ZYROVFS::Server {
namespace {

bool AreAllDaemonsDead() {
    return DBUS::CheckDaemonDied() && GVFSD::CheckDaemonDied() && GVFSD_FUSE::CheckDaemonDied();
}

void UnmountAll(unsigned int uid) {
    Json::Value doc;
    if (!CfgAccess(uid, VFS_CONFIG_CONNECT, VFS_CONFIG_READ, doc)) {
        LOG_ERROR("Failed to list server config of user(%u), code=%u", uid, GetError());
        return;
    }
    for (const std::string& id : doc["servers"].getMemberNames()) {
        VFS session;
        if (!session.Init(nullptr, nullptr, id.c_str(), nullptr, nullptr,
                          Json::Value(Json::objectValue), false) ||
            !session.UnMount()) {
            LOG_ERROR("Failed to unmount vfs server, uid=%u, serverID=%s", uid, id.c_str());
        }
    }
}

/** Removes a tree, but nothing that is mounted in it: that is not this user's to lose. */
bool RunRm(const std::string& path) {
    const char* const plain[] = {paths::kRm, "-rf", path.c_str(), nullptr};
    // Only another device tells rm that it comes to a mount. Users have no other mounts.
    const char* const around[] = {paths::kRm,   "-rf",  "--one-file-system", "--preserve-root=all",
                                  path.c_str(), nullptr};
    switch (FindMountsBelow(path)) {
        case MountsBelow::kNone:
            return YLIBCExecv(paths::kRm, plain) == 0;
        case MountsBelow::kOfUsers:
            return YLIBCExecv(paths::kRm, around) == 0;
        case MountsBelow::kOfTheSystem:
            break;
    }
    errno = EBUSY;
    return false;
}

/** What leads to the tree is looked at first: rm goes by the path, through any link above it. */
void RemoveTree(const std::string& path, unsigned int uid) {
    // The folders above are sticky: only root takes root's folders out of them.
    const EffectiveUid as_root(0);
    const OwnedFolder above = OwnedFolder::Open(SplitPath(path).folder, uid);
    if ((!above && errno != ENOENT) || !RunRm(path)) {
        LOG_ERROR("Failed to rm -rf %s, errno=%X", path.c_str(), errno);
    }
}

/** Daemons without pid files count as dead, but their tree still shows the servers. It goes, and
 * nothing of what it shows. */
void DetachFuseTree(unsigned int uid) {
    const EntryPath place = SplitPath(paths::FuseTree(uid));
    const EffectiveUid as_root(0);
    const OwnedFolder above = OwnedFolder::Open(place.folder, uid);
    if (above && !DetachUsersMount(above.Get(), place.name.c_str())) {
        LOG_ERROR("Failed to umount %s, %m", paths::FuseTree(uid).c_str());
    }
}

/** Looks through what the fuse tree shows. Nothing found there keeps the directory: a tree without
 * daemons holds no remote files. */
void ScanFuseTree(unsigned int uid) {
    const std::string path = paths::FuseTree(uid);
    if (!YLIBCFileExist(path.c_str())) {
        return;
    }
    UniqueFd fd = OwnedFolder::Open(path, uid).OpenForReading();
    const UniqueDir dir(fd ? fdopendir(fd.Get()) : nullptr);
    if (!dir) {
        LOG_ERROR("Failed to opendir, path=%s", path.c_str());
        return;
    }
    fd.Release();
    while (readdir(dir.get()) != nullptr) {
    }
}

void RemoveFiles(unsigned int uid, bool removeProfiles, bool removeRuntime) {
    if (!Utils::LockMnt(true)) {
        LOG_ERROR("Fail to lock mnt");
        return;
    }
    const ScopeExit unlock([] { Utils::UnLockMnt(); });
    if (removeProfiles) {
        RemoveTree(paths::UserConfigDir(uid), uid);
    }
    RemoveTree(paths::UserConnectDir(uid), uid);
    if (removeRuntime && AreAllDaemonsDead()) {
        DetachFuseTree(uid);
        ScanFuseTree(uid);
        RemoveTree(paths::RuntimeDir(uid), uid);
    }
}

void CleanUp(unsigned int uid, bool removeProfiles, bool removeRuntime) {
    // As root the process acts for whom the environment names; as a user, for itself alone: it
    // would take its own lock and end its own mounts for those of the one who goes.
    const EffectiveUid as_root(geteuid() == uid ? uid : 0);
    setenv("ZYROVFS_UID", std::to_string(uid).c_str(), 1);
    // A process that has acted for somebody else knows that user's bus, and would look there for
    // this one's mounts, find none and take them for gone. Without an address this user's is read.
    unsetenv("DBUS_SESSION_BUS_ADDRESS");
    InitGlobal(uid, true);
    if (GetActorUID() != uid) {
        LOG_ERROR("Failed to clean up behind user(%u) as %u", uid, GetActorUID());
        return;
    }
    if (!IsAnyDaemonDead()) {
        // A damaged list of connections must not keep the files in place.
        NoThrow(VFS_ERR_CONFIG_READ, [&] {
            UnmountAll(uid);
            return true;
        });
    }
    RemoveFiles(uid, removeProfiles, removeRuntime);
}

}  // namespace

bool DeleteUser(Json::Value& uids, bool removeProfiles, bool removeRuntime) {
    NoThrow(VFS_ERR_BAD_PARAM, [&] {
        if (!uids.isArray()) {
            LOG_ERROR("Wrong JSON value, user ids are no array");
            return false;
        }
        for (const Json::Value& uid : uids) {
            if (uid.isUInt()) {
                CleanUp(uid.asUInt(), removeProfiles, removeRuntime);
            } else {
                LOG_ERROR("Wrong JSON value, a user id is no number");
            }
        }
        return true;
    });
    return true;
}

}  // namespace ZYROVFS::Server
