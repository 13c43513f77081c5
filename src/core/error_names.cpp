#include <array>

#include "zyrovfs/error.h"

namespace ZYROVFS {
namespace {

struct Row {
    __tag_vfs_err_ code;
    const char* name;
    const char* meaning;
};

#define ROW(code, meaning)   \
    Row {                    \
        code, #code, meaning \
    }

constexpr std::array kRows{
    ROW(VFS_ERR_NONE, "No error."),
    ROW(VFS_ERR_UNKNOWN, "An internal failure that has no better code."),
    ROW(VFS_ERR_BAD_PARAM,
        "An argument or a value of the profile is missing, wrong or unsupported."),
    ROW(VFS_ERR_FAILED, "A local step failed."),
    ROW(VFS_ERR_NO_PERMISSION, "The caller may not use remote connections."),
    ROW(VFS_ERR_INVALID_SERVER, "The profile does not describe a server that can be reached."),
    ROW(VFS_ERR_HOST_UNREACHABLE, "The host cannot be reached."),
    ROW(VFS_ERR_ACCESS_DENIED, "The remote side refused the session."),
    ROW(VFS_ERR_WRONG_USERNAME, "The remote side refused the user name."),
    ROW(VFS_ERR_WRONG_PASSWORD, "The remote side refused the password."),
    ROW(VFS_ERR_RESERVED_10, "Not used."),
    ROW(VFS_ERR_DBUS_ADDRESS, "The address of the user's session bus is not known."),
    ROW(VFS_ERR_RESERVED_12, "Not used."),
    ROW(VFS_ERR_CONNECT_EXISTS, "This server is connected already."),
    ROW(VFS_ERR_SERVER_EXISTS, "A profile of this server is saved already."),
    ROW(VFS_ERR_CONFIG_READ, "The file of profiles cannot be read or brought up to date."),
    ROW(VFS_ERR_CONFIG_WRITE, "The file of profiles cannot be written."),
    ROW(VFS_ERR_CONFIG_NOT_FOUND, "There is no profile with this id."),
    ROW(VFS_ERR_OUT_OF_MEMORY, "Memory ran out."),
    ROW(VFS_ERR_BUSY, "A needed resource is in use; try again later."),
    ROW(VFS_ERR_IDENTITY_QUESTION, "The identity of the host is unknown and has to be confirmed."),
    ROW(VFS_ERR_IDENTITY_WRONG, "The host is not the one it was."),
    ROW(VFS_ERR_CONFIG_FULL, "No more profiles of this protocol can be kept."),
    ROW(VFS_ERR_PROXY_AUTH, "The proxy refused its user name or password."),
    ROW(VFS_ERR_CERT_UNTRUSTED, "The server's certificate is not trusted."),
    ROW(VFS_ERR_UNAUTHORIZED, "The remote side refused the credentials or the token."),
    ROW(VFS_ERR_CLOUD_FAILED, "A step of the cloud driver failed on this side."),
    ROW(VFS_ERR_TOKEN_REVOKED, "The access to the cloud account was withdrawn; sign in anew."),
    ROW(VFS_ERR_FORBIDDEN, "The service refuses this application or account."),
    ROW(VFS_ERR_CONNECT_FAILED, "There is no connection to the service."),
    ROW(VFS_ERR_TIMEOUT, "The service did not answer in time."),
    ROW(VFS_ERR_TRANSFER_ABORTED, "The transfer was broken off."),
    ROW(VFS_ERR_RESERVED_32, "Not used."),
    ROW(VFS_ERR_CANCELLED, "The transfer was cancelled."),
    ROW(VFS_ERR_QUOTA_EXCEEDED, "The account's quota is used up."),
    ROW(VFS_ERR_FILE_TOO_LARGE, "The file is larger than the service allows."),
    ROW(VFS_ERR_IS_DIRECTORY, "The target is a folder, a file is needed."),
    ROW(VFS_ERR_NAME_TOO_LONG, "The name is too long for the service."),
    ROW(VFS_ERR_INVALID_NAME, "The service refuses the name."),
    ROW(VFS_ERR_RECEIVE_FAILED, "Receiving data failed."),
    ROW(VFS_ERR_SERVICE_UNAVAILABLE, "The service is not available now."),
    ROW(VFS_ERR_RESERVED_41, "Not used."),
    ROW(VFS_ERR_PROFILE_UPDATE, "The renewed tokens could not be stored in the profile."),
    ROW(VFS_ERR_RATE_LIMITED, "The service's rate limit is reached."),
    ROW(VFS_ERR_SERVER_ERROR, "The service reported an error of its own."),
    ROW(VFS_ERR_TOO_MANY_FILES, "Too many files for one request."),
    ROW(VFS_ERR_RANGE_FAILED, "The service refused the requested range."),
    ROW(VFS_ERR_CONFLICT, "An item of this name exists."),
    ROW(VFS_ERR_PERMISSION_DENIED, "No permission on this item."),
    ROW(VFS_ERR_NOT_FOUND, "The item does not exist."),
    ROW(VFS_ERR_REQUEST_TIMEOUT, "The request took too long for the service."),
    ROW(VFS_ERR_NO_SPACE, "There is no space on the remote side."),
    ROW(VFS_ERR_REMOTE_FAILED, "The WebDAV server failed."),
    ROW(VFS_ERR_BAD_REQUEST, "The service refused the request as malformed."),
    ROW(VFS_ERR_NOT_SUPPORTED, "The service does not support the operation."),
    ROW(VFS_ERR_FILE_EXISTS, "The remote file exists."),
    ROW(VFS_ERR_COMMAND_REFUSED, "The remote side refused the command."),
    ROW(VFS_ERR_MOUNT_PENDING, "The location is being mounted."),
};

#undef ROW

static_assert(kRows.size() == VFS_ERR_MOUNT_PENDING + 1, "one row for each code");
constexpr bool NumbersArePositions() {
    for (size_t i = 0; i < kRows.size(); ++i) {
        if (kRows[i].code != static_cast<__tag_vfs_err_>(i)) {
            return false;
        }
    }
    return true;
}
static_assert(NumbersArePositions(), "rows are found by their number");

const Row& Find(__tag_vfs_err_ code) {
    const auto index = static_cast<unsigned>(code);
    return index < kRows.size() ? kRows[index] : kRows[VFS_ERR_UNKNOWN];
}

}  // namespace

const char* GetErrorName(__tag_vfs_err_ code) {
    return Find(code).name;
}

const char* GetErrorMeaning(__tag_vfs_err_ code) {
    return Find(code).meaning;
}

}  // namespace ZYROVFS
