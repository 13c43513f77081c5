#include "mount/daemon.h"

#include <sys/stat.h>

#include <cerrno>
#include <climits>
#include <cstdlib>

#include "core/entry_name.h"
#include "core/log.h"
#include "core/owned_folder.h"
#include "core/paths.h"
#include "zyrovfs/global.h"
#include "zyrovfs/utils.h"

namespace ZYROVFS {
namespace {

/** The pid in a line of text, 0 when no process can have it. */
int ParsePid(const std::string& text) {
    const long long pid = strtoll(text.c_str(), nullptr, 10);
    return pid < 0 || pid > INT_MAX ? 0 : static_cast<int>(pid);
}

/** A stranger's file is none: it could name any process, or a bus that listens for passwords. */
bool Exists(const std::string& path, uid_t uid) {
    const EntryPath place = SplitPath(path);
    const OwnedFolder folder = OwnedFolder::Open(place.folder, uid);
    struct stat info {};
    return (folder && folder.Stat(place.name, info)) || (errno != ENOENT && errno != ENOTDIR);
}

bool IsRunning(const Daemon& daemon, SourceLine at) {
    int pid = 0;
    return ReadPid(daemon, pid, at) && IsDaemonAlive(daemon, pid);
}

}  // namespace

const Daemon kDbusDaemon = {
    "dbus-daemon",
    paths::DbusPid,
    "Failed to lock dbus pid",
    "Failed to get dbus pid, %s, %m",
    "Failed to dbus's pid of uid(%u)",
    "Failed to lock dbus",
};

const Daemon kGvfsdDaemon = {
    "gvfsd",
    paths::GvfsdPid,
    "Failed to lock gvfsd pid, uid=%u",
    "Failed to get gvfsd pid, %s, %m",
    "Failed to gvfsd's pid of uid(%u)",
    "Failed to lock gvfsd",
};

const Daemon kGvfsdFuseDaemon = {
    "gvfsd-fuse",
    paths::GvfsdFusePid,
    "Failed to lock gvfsd-fuse pid",
    "Failed to get gvfsd-fsue pid, %s, %m",
    "Failed to gvfsd-fuse's pid of uid(%u)",
    "Failed to lock gvfsd-fuse",
};

bool ReadPid(const Daemon& daemon, int& pid, SourceLine at) {
    const uid_t uid = GetActorUID();
    pid = 0;
    if (!Utils::LockMnt(false)) {
        LOG_ERROR_AT(at, daemon.pid_lock_failed, uid);
        return false;
    }
    const MountLockRelease release;
    const std::string path = daemon.pid_file(uid);
    if (!Exists(path, uid)) {
        return true;
    }
    std::string line;
    if (!Utils::GetFileLine(path.c_str(), line)) {
        LOG_ERROR_AT(at, daemon.pid_read_failed, path.c_str());
        return false;
    }
    pid = ParsePid(line);
    return true;
}

bool IsDaemonAlive(const Daemon& daemon, int pid) {
    return Utils::IsProcAlive(pid, daemon.process, GetActorUID());
}

bool CheckDaemonDied(const Daemon& daemon, SourceLine at) {
    int pid = 0;
    if (!ReadPid(daemon, pid, at)) {
        LOG_ERROR_AT(at, daemon.pid_unknown, GetActorUID());
        return false;
    }
    return !IsDaemonAlive(daemon, pid);
}

bool StartIfDead(const Daemon& daemon, bool (*launch)(uid_t uid), SourceLine at) {
    if (IsRunning(daemon, at)) {
        return true;
    }
    if (!Utils::LockMnt(true)) {
        LOG_ERROR_AT(at, "%s", daemon.lock_failed);
        return false;
    }
    return IsRunning(daemon, at) || launch(GetActorUID());
}

bool WritePid(const Daemon& daemon, uid_t uid, int pid, SourceLine at) {
    const std::string path = daemon.pid_file(uid);
    if (!Utils::CreatePidFile(path.c_str(), pid)) {
        LOG_ERROR_AT(at, "Failed to create %s, %m", path.c_str());
        return false;
    }
    return true;
}

MountLockRelease::~MountLockRelease() {
    Utils::UnLockMnt();
}

}  // namespace ZYROVFS
