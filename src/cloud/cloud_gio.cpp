#include <gio/gio.h>

#include <iterator>

#include "zyrovfs/cloud.h"

namespace ZYROCloud {

using namespace ZYROVFS;

namespace {

struct Row {
    __tag_vfs_err_ code;
    GIOErrorEnum gio;
};

/** What file managers show for the failures of clouds: one row per code, in the order of codes. */
constexpr Row kRows[] = {
    {VFS_ERR_UNAUTHORIZED, G_IO_ERROR_CONNECTION_REFUSED},
    {VFS_ERR_CLOUD_FAILED, G_IO_ERROR_FAILED},
    {VFS_ERR_TOKEN_REVOKED, G_IO_ERROR_NOT_SUPPORTED},
    {VFS_ERR_FORBIDDEN, G_IO_ERROR_PERMISSION_DENIED},
    {VFS_ERR_CONNECT_FAILED, G_IO_ERROR_HOST_UNREACHABLE},
    {VFS_ERR_TIMEOUT, G_IO_ERROR_TIMED_OUT},
    {VFS_ERR_TRANSFER_ABORTED, G_IO_ERROR_CANCELLED},
    {VFS_ERR_RESERVED_32, G_IO_ERROR_FAILED},
    {VFS_ERR_CANCELLED, G_IO_ERROR_CANCELLED},
    {VFS_ERR_QUOTA_EXCEEDED, G_IO_ERROR_NO_SPACE},
    {VFS_ERR_FILE_TOO_LARGE, G_IO_ERROR_INVALID_DATA},
    {VFS_ERR_IS_DIRECTORY, G_IO_ERROR_IS_DIRECTORY},
    {VFS_ERR_NAME_TOO_LONG, G_IO_ERROR_FILENAME_TOO_LONG},
    {VFS_ERR_INVALID_NAME, G_IO_ERROR_INVALID_FILENAME},
    {VFS_ERR_RECEIVE_FAILED, G_IO_ERROR_FAILED},
    {VFS_ERR_SERVICE_UNAVAILABLE, G_IO_ERROR_BUSY},
    {VFS_ERR_RESERVED_41, G_IO_ERROR_NOT_DIRECTORY},
    {VFS_ERR_PROFILE_UPDATE, G_IO_ERROR_FAILED},
    {VFS_ERR_RATE_LIMITED, G_IO_ERROR_FAILED},
    {VFS_ERR_SERVER_ERROR, G_IO_ERROR_HOST_UNREACHABLE},
    {VFS_ERR_TOO_MANY_FILES, G_IO_ERROR_TOO_MANY_LINKS},
    {VFS_ERR_RANGE_FAILED, G_IO_ERROR_FAILED},
    {VFS_ERR_CONFLICT, G_IO_ERROR_EXISTS},
    {VFS_ERR_PERMISSION_DENIED, G_IO_ERROR_PERMISSION_DENIED},
    {VFS_ERR_NOT_FOUND, G_IO_ERROR_NOT_FOUND},
    {VFS_ERR_REQUEST_TIMEOUT, G_IO_ERROR_BUSY},
    {VFS_ERR_NO_SPACE, G_IO_ERROR_NO_SPACE},
    {VFS_ERR_REMOTE_FAILED, G_IO_ERROR_FAILED},
    {VFS_ERR_BAD_REQUEST, G_IO_ERROR_FAILED},
    {VFS_ERR_NOT_SUPPORTED, G_IO_ERROR_NOT_SUPPORTED},
    {VFS_ERR_FILE_EXISTS, G_IO_ERROR_EXISTS},
    {VFS_ERR_COMMAND_REFUSED, G_IO_ERROR_NOT_SUPPORTED},
};

constexpr bool InOrder() {
    for (size_t i = 0; i < std::size(kRows); ++i) {
        if (kRows[i].code != static_cast<int>(VFS_ERR_UNAUTHORIZED + i)) {
            return false;
        }
    }
    return kRows[std::size(kRows) - 1].code == VFS_ERR_COMMAND_REFUSED;
}
static_assert(InOrder());

}  // namespace

int Cloud::GetGIOError() const {
    const int code = GetErrorCode();
    return code < VFS_ERR_UNAUTHORIZED || code > VFS_ERR_COMMAND_REFUSED
               ? G_IO_ERROR_FAILED
               : kRows[code - VFS_ERR_UNAUTHORIZED].gio;
}

}  // namespace ZYROCloud
