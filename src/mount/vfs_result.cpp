#include "mount/vfs_result.h"

#include <cstring>
#include <string>

#include "core/error_cell.h"
#include "core/log.h"
#include "mount/glib_handle.h"
#include "mount/vfs_private.h"

namespace ZYROVFS {
namespace {

struct GioCode {
    int gio;
    __tag_vfs_err_ code;
};

constexpr GioCode kGioCodes[] = {
    {G_IO_ERROR_FAILED, VFS_ERR_ACCESS_DENIED},
    {G_IO_ERROR_NOT_SUPPORTED, VFS_ERR_ACCESS_DENIED},
    {G_IO_ERROR_BROKEN_PIPE, VFS_ERR_ACCESS_DENIED},
    {G_IO_ERROR_PERMISSION_DENIED, VFS_ERR_WRONG_USERNAME},
    {G_IO_ERROR_CLOSED, VFS_ERR_HOST_UNREACHABLE},
    {G_IO_ERROR_TIMED_OUT, VFS_ERR_HOST_UNREACHABLE},
    {G_IO_ERROR_HOST_NOT_FOUND, VFS_ERR_HOST_UNREACHABLE},
    {G_IO_ERROR_HOST_UNREACHABLE, VFS_ERR_HOST_UNREACHABLE},
    {G_IO_ERROR_NETWORK_UNREACHABLE, VFS_ERR_HOST_UNREACHABLE},
    {G_IO_ERROR_PENDING, VFS_ERR_MOUNT_PENDING},
};

struct MessageCode {
    const char* message;  ///< whole text
    __tag_vfs_err_ code;
};

/** Backends tell by text what has no code in GIO. */
constexpr MessageCode kMessageCodes[] = {
    {"Login dialog cancelled", VFS_ERR_IDENTITY_QUESTION},
    {"Identification is wrong", VFS_ERR_IDENTITY_WRONG},
    {"Not a WebDAV enabled share", VFS_ERR_ACCESS_DENIED},
};

/** Standard servers refuse sessions; behind any other URI stands a backend that lost its token. */
__tag_vfs_err_ CodeOfRefusal(const std::string& uri) {
    for (const char* scheme : {"ftp://", "sftp://", "dav://", "davs://"}) {
        if (g_str_has_prefix(uri.c_str(), scheme)) {
            return VFS_ERR_ACCESS_DENIED;
        }
    }
    return VFS_ERR_UNAUTHORIZED;
}

__tag_vfs_err_ CodeOfGio(int gio, const std::string& uri) {
    if (gio == G_IO_ERROR_CONNECTION_REFUSED) {
        return CodeOfRefusal(uri);
    }
    for (const GioCode& row : kGioCodes) {
        if (row.gio == gio) {
            return row.code;
        }
    }
    return VFS_ERR_FAILED;
}

void OverrideByMessage(const char* message) {
    if (g_str_has_prefix(message, "identity:")) {
        KeepIdentity(message);
        return;
    }
    for (const MessageCode& row : kMessageCodes) {
        if (strcmp(row.message, message) == 0) {
            SetErr(row.code);
        }
    }
}

bool IsIo(const GError& error, int code) {
    return error.domain == G_IO_ERROR && error.code == code;
}

void JudgeMount(const GError& error, const std::string& uri) {
    if (IsIo(error, G_IO_ERROR_ALREADY_MOUNTED)) {
        SetErr(VFS_ERR_NONE);
        return;
    }
    const char* message = error.message == nullptr ? "" : error.message;
    LOG_ERROR("Unable to access %s", uri.c_str());
    LOG_ERROR("Error: [%d, %d], %s", static_cast<int>(error.domain), error.code, message);
    if (IsIo(error, G_IO_ERROR_FAILED_HANDLED) || IsIo(error, G_IO_ERROR_CANCELLED)) {
        if (GetError() == VFS_ERR_NONE) {
            SetErr(VFS_ERR_FAILED);
        }
        return;
    }
    SetErr(CodeOfGio(error.code, uri));
    OverrideByMessage(message);
}

}  // namespace

void MountFinished(GObject* file, GAsyncResult* result, gpointer data) noexcept {
    if (data == nullptr) {
        SetErr(VFS_ERR_BAD_PARAM);
        return;
    }
    const auto& mount = *static_cast<VFSMountOperaion*>(data);
    GError* raw = nullptr;
    const bool mounted = g_file_mount_enclosing_volume_finish(G_FILE(file), result, &raw) != FALSE;
    const UniqueError error(raw);
    if (mounted) {
        SetErr(VFS_ERR_NONE);
    } else if (error != nullptr) {
        JudgeMount(*error, mount.session->GetURI());
    } else {
        SetErr(VFS_ERR_FAILED);  // a file class that fails without a reason
    }
    g_main_loop_quit(mount.loop);
}

void UnmountFinished(GObject* object, GAsyncResult* result, gpointer data) noexcept {
    if (data == nullptr) {
        SetErr(VFS_ERR_BAD_PARAM);
        return;
    }
    const auto& mount = *static_cast<VFSMountOperaion*>(data);
    GError* raw = nullptr;
    g_mount_unmount_with_operation_finish(G_MOUNT(object), result, &raw);
    const UniqueError error(raw);
    if (error != nullptr && error->code != G_IO_ERROR_FAILED_HANDLED &&
        error->code != G_IO_ERROR_NOT_MOUNTED) {
        LOG_ERROR("Unable to unmount location uri %s, [%d], %s", mount.session->GetURI().c_str(),
                  error->code, error->message);
    } else {
        SetErr(VFS_ERR_NONE);
    }
    g_main_loop_quit(mount.loop);
}

}  // namespace ZYROVFS
