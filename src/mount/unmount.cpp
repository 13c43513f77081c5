#include <cstdlib>
#include <memory>
#include <string>

#include "core/error_cell.h"
#include "core/handle.h"
#include "core/log.h"
#include "core/no_throw.h"
#include "mount/glib_handle.h"
#include "mount/helper.h"
#include "mount/mount_child.h"
#include "mount/run_as_user.h"
#include "mount/vfs_result.h"
#include "zyrovfs/global.h"
#include "zyrovfs/utils.h"

namespace ZYROVFS {
namespace {

/** Transfers of the connection keep its mount busy. They may run under any identity of the user. */
void KillTransfers(const std::string& uri, const std::string& user) {
    const auto uid = static_cast<unsigned int>(strtoul(user.c_str(), nullptr, 10));
    if (!Utils::KillProcByUID(uri.c_str(), uid)) {
        LOG_ERROR("Failed to kill vfs procs, uid=%16s", user.c_str());
    }
}

GFile* MountedLocation(const VFS& session) {
    const std::string full_path = session.GetFullPath();
    if (full_path.empty()) {
        return NewLocation(session.GetURI(), session.GetUser(), session.GetPath(),
                           VFS_ERR_BAD_PARAM);
    }
    GFile* file = g_file_new_for_commandline_arg(full_path.c_str());
    if (file == nullptr) {
        SetErr(VFS_ERR_INVALID_SERVER);
        LOG_ERROR("Wrong input %s, %s", full_path.c_str(), session.GetURI().c_str());
    }
    return file;
}

/** Null for a location that is not mounted, which is what an unmount wants. */
UniqueObject<GMount> FindMount(GFile* file, const std::string& uri) {
    GError* raw = nullptr;
    UniqueObject<GMount> found(g_file_find_enclosing_mount(file, nullptr, &raw));
    const UniqueError error(raw);
    if (found == nullptr) {
        LOG_ERROR("Unable to unmount location uri %s, [%d], %s", uri.c_str(),
                  error == nullptr ? 0 : error->code,
                  error == nullptr ? "not mounted" : error->message);
        SetErr(VFS_ERR_NONE);
    }
    return found;
}

void UnmountLocation(VFS& session) {
    const std::unique_ptr<VFSMountOperaion> mount = NewMountOperaion(session);
    if (mount == nullptr) {
        return;
    }
    GFile* file = MountedLocation(session);
    if (file == nullptr) {
        return;
    }
    const UniqueObject<GMountOperation> operation = NewOperation(*mount, file);
    if (const UniqueObject<GMount> found = FindMount(file, session.GetURI())) {
        // A refused unmount sets no code and so counts as done, whatever the cell held before.
        SetErr(VFS_ERR_NONE);
        g_mount_unmount_with_operation(found.get(), G_MOUNT_UNMOUNT_NONE, operation.get(), nullptr,
                                       UnmountFinished, mount.get());
        g_main_loop_run(mount->loop);
    }
}

void Run(const Json::Value& request) {
    VFS session;
    RestoreSession(request, session);
    if (request.isMember("transfers_of")) {
        KillTransfers(session.GetURI(), request["transfers_of"].asString());
    }
    if (BecomeUserInHelper(UserOf(request))) {
        UnmountLocation(session);
    } else {
        FailIfNoneSet();
    }
    if (GetError() != VFS_ERR_NONE) {
        LOG_ERROR("Fail to unmount, error = %d", GetError());
    }
    EndHelper(GetError());
}

Json::Value RequestFor(const VFS& session) {
    Json::Value request = DescribeSession(session);
    const char* user = getenv("ZYROVFS_UID");
    if (!session.GetURI().empty() && user != nullptr) {
        request["transfers_of"] = user;
    }
    return request;
}

bool UnmountLocked(VFS& session) {
    const SigchldGuard collect;
    const HelperRun run = RunAsUser(kUnmountJob.name, GetActorUID(), RequestFor(session), nullptr);
    const int status = run.Result();
    if (status > 0) {
        SetErr(static_cast<__tag_vfs_err_>(status));
    }
    return status == 0;
}

}  // namespace

const HelperJob kUnmountJob = {"unmount", Run};

bool VFS::UnMount() {
    return NoThrow(VFS_ERR_FAILED, [this] {
        // A lock that cannot be had gives back one level, as it does on every other way out.
        const ScopeExit unlock([] { Utils::UnLockMnt(); });
        if (!Utils::LockMnt(true)) {
            LOG_ERROR("Fail to lock unmmount");
            return false;
        }
        return UnmountLocked(*this);
    });
}

}  // namespace ZYROVFS
