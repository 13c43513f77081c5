#include <sys/stat.h>
#include <sys/statfs.h>
#include <unistd.h>
#include <zosplatform/process.h>

#include <cerrno>
#include <climits>
#include <cstdio>
#include <cstdlib>

#include "core/entry_name.h"
#include "core/error_cell.h"
#include "core/fd_io.h"
#include "core/handle.h"
#include "core/identity.h"
#include "core/log.h"
#include "core/no_throw.h"
#include "core/owned_folder.h"
#include "core/paths.h"
#include "mount/daemon.h"
#include "mount/helper.h"
#include "mount/program.h"
#include "mount/run_as_user.h"
#include "mount/user_environment.h"
#include "zyrovfs/global.h"
#include "zyrovfs/utils.h"
#include "zyrovfs/vfs.h"

namespace ZYROVFS {
namespace {

/** How a launch ended; travels as the helper's exit status. */
enum LaunchResult { kLaunched = 0, kLaunchFailed = 1, kStaleMountPoint = 2 };

/** Where the kernel checks permissions itself, it answers access() from what it remembers of the
 * tree, for a second after the daemon died; the size of the file system only the daemon can tell.
 */
bool CanAccess(const std::string& path) {
    struct statfs info {};
    return access(path.c_str(), F_OK) == 0 && statfs(path.c_str(), &info) == 0;
}

/** A fuse daemon that died leaves a mount point on which every access fails. */
int PrepareMountPoint(const std::string& path) {
    if (!Utils::CreateFolder(path.c_str(), nullptr, true, -1, -1, 0777)) {
        LOG_ERROR("Failed to mkdir %s, %m", path.c_str());
        return kStaleMountPoint;
    }
    if (!CanAccess(path)) {
        LOG_ERROR("Failed to access %s, %m", path.c_str());
        return kStaleMountPoint;
    }
    return kLaunched;
}

/** The fuse daemon outlives the helper, whose identity it has: it is the user already. */
int SpawnFuse(const std::string& mount_point, uid_t uid, pid_t& pid) {
    const Program fuse{{paths::kGvfsdFuse, mount_point, "-f", "-o", "big_writes", "-o", "direct_io",
                        "-o", "allow_other"},
                       UserEnvironment(uid),
                       {-1, -1, -1}};
    pid = StartDaemon(fuse, static_cast<uid_t>(-1));
    if (pid < 0) {
        LOG_ERROR("Error launching gvfsd-fuse: %m");
        return kLaunchFailed;
    }
    return kLaunched;
}

/** Only root takes what is root's or a stranger's out of a sticky folder; the user makes the mount
 * point then. */
void ClearMountPoint(uid_t uid) {
    const EffectiveUid as_root(0);
    const EntryPath place = SplitPath(paths::FuseTree(uid));
    const OwnedFolder above = OwnedFolder::Open(place.folder, uid);
    struct stat info {};
    if (above.Stat(place.name, info) && !S_ISDIR(info.st_mode)) {
        above.Remove(place.name);  // what stays is told by whoever cannot make the folder
    }
}

/** The helper's work: as the user, since the mount must be the user's. */
int LaunchAsUser(uid_t uid) {
    ClearMountPoint(uid);
    if (!BecomeUserInHelper(uid)) {
        return kLaunchFailed;
    }
    const std::string mount_point = paths::FuseTree(uid);
    pid_t pid = 0;
    int result = PrepareMountPoint(mount_point);
    if (result == kLaunched) {
        result = SpawnFuse(mount_point, uid, pid);
    }
    if (result == kLaunched) {
        sleep(3);
        return dprintf(STDOUT_FILENO, "%u", static_cast<unsigned>(pid)) > 0 ? kLaunched
                                                                            : kLaunchFailed;
    }
    return result;
}

void LaunchJob(const Json::Value& request) {
    const uid_t uid = UserOf(request);
    const int result = LaunchAsUser(uid);
    if (result != kLaunched) {
        LOG_ERROR("Failed to run gvfsd-fuse, uid=%u, %d", uid, result);
    }
    EndHelper(result);
}

std::string ReadPidText(int pipe) {
    std::string text;
    ReadAll(pipe, text);
    return text;
}

int RunFuse(uid_t uid, int& pid) {
    const SigchldGuard collect;
    const HelperRun run =
        RunAsUser(kLaunchFuseJob.name, uid, Json::Value(Json::objectValue), ReadPidText);
    const long long number = strtoll(run.report.c_str(), nullptr, 10);
    pid = number > 0 && number <= INT_MAX ? static_cast<int>(number) : 0;
    return run.Result() == kLaunched && pid == 0 ? kLaunchFailed : run.Result();
}

/** Lets nobody but root change what a folder holds while root goes by a path through it. */
class ClosedToOthers {
  public:
    explicit ClosedToOthers(const OwnedFolder& folder) : fd_(folder.OpenForReading()) {
        closed_ = fd_ && fstat(fd_.Get(), &info_) == 0 && fchown(fd_.Get(), 0, -1) == 0 &&
                  fchmod(fd_.Get(), info_.st_mode & 0755) == 0;
    }
    ClosedToOthers(const ClosedToOthers&) = delete;
    ClosedToOthers& operator=(const ClosedToOthers&) = delete;
    ~ClosedToOthers() {
        if (closed_ && (fchown(fd_.Get(), info_.st_uid, -1) != 0 ||
                        fchmod(fd_.Get(), info_.st_mode & 07777) != 0)) {
            LOG_ERROR("Failed to open a folder to its users again, %m");
        }
    }
    explicit operator bool() const { return closed_; }

  private:
    UniqueFd fd_;
    struct stat info_ {};
    bool closed_ = false;
};

/** umount goes by the path and through links: it must end at the tree's own mount point, not at
 * whatever file system the user or somebody else has made a link to. */
bool Unmount(const std::string& path, uid_t uid) {
    const EntryPath place = SplitPath(path);
    const OwnedFolder above = OwnedFolder::Open(place.folder, uid);
    const ClosedToOthers closed(above);
    struct stat info {};
    if (!closed || (above.Stat(place.name, info) && S_ISLNK(info.st_mode))) {
        return false;
    }
    return YLIBCExec(paths::kUmount, path.c_str(), nullptr) == 0;
}

void RepairJob(const Json::Value& request) {
    const uid_t uid = UserOf(request);
    const std::string path = paths::FuseTree(uid);
    if (!BecomeRootForGood()) {
        EndHelper(1);
    }
    if (!Unmount(path, uid)) {
        LOG_ERROR("Failed to umount %s", path.c_str());
    }
    EndHelper(0);
}

/** Takes the stale mount away. Whether it worked shows in the next launch. */
void RepairMountPoint(uid_t uid) {
    const SigchldGuard collect;
    RunAsUser(kRepairMountPointJob.name, uid, Json::Value(Json::objectValue), nullptr);
}

bool Launch(uid_t uid) {
    int pid = 0;
    int result = RunFuse(uid, pid);
    if (result == kStaleMountPoint) {
        RepairMountPoint(uid);
        result = RunFuse(uid, pid);
    }
    if (result != kLaunched) {
        LOG_ERROR("Failed to run gvfsd-fuse, uid=%u", uid);
        return false;
    }
    if (!WritePid(kGvfsdFuseDaemon, uid, pid)) {
        return false;
    }
    // What the launch left in the cells is no failure of the caller's operation.
    SetErr(VFS_ERR_NONE);
    SetPlatformErr(ZOS_ERR_NONE);
    return true;
}

}  // namespace

const HelperJob kLaunchFuseJob = {"launch-fuse", LaunchJob};
const HelperJob kRepairMountPointJob = {"repair-mount-point", RepairJob};

bool GVFSD_FUSE::IsAlive(int pid) {
    return IsDaemonAlive(kGvfsdFuseDaemon, pid);
}

bool GVFSD_FUSE::CheckDaemonDied() {
    return NoThrow(VFS_ERR_FAILED, [] { return ZYROVFS::CheckDaemonDied(kGvfsdFuseDaemon); });
}

bool GVFSD_FUSE::Init() {
    const MountLockRelease release;
    return NoThrow(VFS_ERR_FAILED, [] { return StartIfDead(kGvfsdFuseDaemon, Launch); });
}

}  // namespace ZYROVFS
