#include "failure.h"

#include <gio/gio.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <iterator>

namespace web {

using namespace ZYROVFS;

namespace {

struct CodeRow {
    __tag_vfs_err_ code;
    int status;
    const char* advice;
};

constexpr const char* kSignIn =
    "Forget the connection and add the account again, signing in at the service.";
constexpr const char* kCredentials = "Check the user name and the password.";
constexpr const char* kLater = "Try again in a few minutes.";
constexpr const char* kSpace = "Make room there, or choose another place.";
constexpr const char* kRename = "Choose another name.";
constexpr const char* kRights = "Ask whoever runs the remote side for the right to do this.";
constexpr const char* kHost = "Check the address and the port, and whether the server is running.";

/** What is not here is the remote side's failure, without advice. */
constexpr CodeRow kCodes[] = {
    {VFS_ERR_UNKNOWN, 502,
     "The administrator finds the cause in the system log; the key of a server that is new here "
     "may "
     "have to be made known first."},
    {VFS_ERR_BAD_PARAM, 422, "Check what was filled in."},
    {VFS_ERR_INVALID_SERVER, 422, "Check what was filled in."},
    {VFS_ERR_HOST_UNREACHABLE, 502, kHost},
    // Said by a server that takes no session, and by mounts that know no better.
    {VFS_ERR_ACCESS_DENIED, 502, "Check the address, the port, the user name and the password."},
    // Not 401: that is the web server's own log-in, and on it browsers forget what they log in
    // with.
    {VFS_ERR_WRONG_USERNAME, 403, kCredentials},
    {VFS_ERR_WRONG_PASSWORD, 403, kCredentials},
    {VFS_ERR_CONNECT_EXISTS, 409, "It is among the connections already."},
    {VFS_ERR_CONFIG_NOT_FOUND, 404, "Reload the page: it may have been removed elsewhere."},
    {VFS_ERR_IDENTITY_QUESTION, 409, "Compare the fingerprint with the server's own."},
    {VFS_ERR_IDENTITY_WRONG, 409, "Ask whoever runs the server whether its key was changed."},
    {VFS_ERR_CERT_UNTRUSTED, 409, "Accept the certificate only if you know whose it is."},
    {VFS_ERR_CONFIG_FULL, 507, "Forget a connection of this kind that is no longer needed."},
    {VFS_ERR_BUSY, 503, kLater},
    {VFS_ERR_UNAUTHORIZED, 403, kSignIn},
    {VFS_ERR_TOKEN_REVOKED, 403, kSignIn},
    {VFS_ERR_FORBIDDEN, 403, kRights},
    {VFS_ERR_PERMISSION_DENIED, 403, kRights},
    {VFS_ERR_CONNECT_FAILED, 502, kLater},
    {VFS_ERR_TIMEOUT, 504, kLater},
    {VFS_ERR_QUOTA_EXCEEDED, 507, kSpace},
    {VFS_ERR_NO_SPACE, 507, kSpace},
    {VFS_ERR_FILE_TOO_LARGE, 413, "Choose another place for files of this size."},
    {VFS_ERR_IS_DIRECTORY, 409, kRename},
    {VFS_ERR_CONFLICT, 409, kRename},
    {VFS_ERR_FILE_EXISTS, 409, kRename},
    {VFS_ERR_INVALID_NAME, 422, kRename},
    {VFS_ERR_NAME_TOO_LONG, 422, kRename},
    {VFS_ERR_NOT_FOUND, 404, "Reload the folder: it may have been moved or deleted elsewhere."},
    {VFS_ERR_BAD_REQUEST, 400, nullptr},
    {VFS_ERR_RANGE_FAILED, 416, nullptr},
    {VFS_ERR_RATE_LIMITED, 503, kLater},
    {VFS_ERR_SERVER_ERROR, 502, kLater},
    {VFS_ERR_SERVICE_UNAVAILABLE, 503, kLater},
    {VFS_ERR_REQUEST_TIMEOUT, 504, kLater},
};

const CodeRow* FindRow(__tag_vfs_err_ code) {
    const auto* row = std::find_if(std::begin(kCodes), std::end(kCodes),
                                   [code](const CodeRow& r) { return r.code == code; });
    return row == std::end(kCodes) ? nullptr : row;
}

struct ErrorRow {
    int error;
    __tag_vfs_err_ code;
};

constexpr ErrorRow kErrnos[] = {
    {ENOENT, VFS_ERR_NOT_FOUND},
    {ENOTDIR, VFS_ERR_NOT_FOUND},
    {EACCES, VFS_ERR_PERMISSION_DENIED},
    {EPERM, VFS_ERR_PERMISSION_DENIED},
    {EROFS, VFS_ERR_PERMISSION_DENIED},
    {EEXIST, VFS_ERR_FILE_EXISTS},
    {ENOTEMPTY, VFS_ERR_CONFLICT},
    {EISDIR, VFS_ERR_IS_DIRECTORY},
    {EINVAL, VFS_ERR_BAD_REQUEST},
    {ENOSPC, VFS_ERR_NO_SPACE},
    {EDQUOT, VFS_ERR_QUOTA_EXCEEDED},
    {ENAMETOOLONG, VFS_ERR_NAME_TOO_LONG},
    {ETIMEDOUT, VFS_ERR_TIMEOUT},
    // What leads out of the folder that a connection has is nobody's business.
    {EXDEV, VFS_ERR_PERMISSION_DENIED},
    {ELOOP, VFS_ERR_PERMISSION_DENIED},
};

constexpr ErrorRow kGioErrors[] = {
    {G_IO_ERROR_NOT_FOUND, VFS_ERR_NOT_FOUND},
    {G_IO_ERROR_NOT_DIRECTORY, VFS_ERR_NOT_FOUND},
    {G_IO_ERROR_EXISTS, VFS_ERR_CONFLICT},
    {G_IO_ERROR_IS_DIRECTORY, VFS_ERR_IS_DIRECTORY},
    {G_IO_ERROR_FILENAME_TOO_LONG, VFS_ERR_NAME_TOO_LONG},
    {G_IO_ERROR_INVALID_FILENAME, VFS_ERR_INVALID_NAME},
    {G_IO_ERROR_NO_SPACE, VFS_ERR_NO_SPACE},
    {G_IO_ERROR_PERMISSION_DENIED, VFS_ERR_PERMISSION_DENIED},
    {G_IO_ERROR_CONNECTION_REFUSED, VFS_ERR_UNAUTHORIZED},
    {G_IO_ERROR_HOST_UNREACHABLE, VFS_ERR_CONNECT_FAILED},
    {G_IO_ERROR_TIMED_OUT, VFS_ERR_TIMEOUT},
    {G_IO_ERROR_BUSY, VFS_ERR_SERVICE_UNAVAILABLE},
    {G_IO_ERROR_TOO_MANY_LINKS, VFS_ERR_TOO_MANY_FILES},
    {G_IO_ERROR_WOULD_RECURSE, VFS_ERR_TOO_MANY_FILES},
    {G_IO_ERROR_NOT_EMPTY, VFS_ERR_TOO_MANY_FILES},
};

template <size_t N>
__tag_vfs_err_ CodeOf(const ErrorRow (&rows)[N], int error) {
    const auto* row = std::find_if(std::begin(rows), std::end(rows),
                                   [error](const ErrorRow& r) { return r.error == error; });
    return row == std::end(rows) ? VFS_ERR_NONE : row->code;
}

}  // namespace

Json::Value Failure::Describe() const {
    const CodeRow* row = FindRow(code_);
    Json::Value error;
    error["status"] = status_;
    error["meaning"] = what();
    if (!advice_.empty()) {
        error["advice"] = advice_;
    } else if (row != nullptr && row->advice != nullptr) {
        error["advice"] = row->advice;
    }
    if (!trust_.isNull()) {
        error["trust"] = trust_;
    }
    if (code_ != VFS_ERR_NONE) {
        error["name"] = GetErrorName(code_);
        error["code"] = static_cast<int>(code_);
    }
    return error;
}

Failure FailureOf(const std::string& what, __tag_vfs_err_ code) {
    const CodeRow* row = FindRow(code);
    const std::string cause =
        code == VFS_ERR_NONE ? "." : std::string(": ") + GetErrorMeaning(code);
    return {row == nullptr ? 502 : row->status, what + cause, code};
}

Failure FailureOfErrno(const std::string& what) {
    const int error = errno;
    const __tag_vfs_err_ code = CodeOf(kErrnos, error);
    return code == VFS_ERR_NONE ? Failure(502, what + ": The remote side could not do it (" +
                                                   std::strerror(error) + ").")
                                : FailureOf(what, code);
}

Failure FailureOfGio(const std::string& what, int error) {
    const __tag_vfs_err_ code = CodeOf(kGioErrors, error);
    return FailureOf(what, code == VFS_ERR_NONE ? VFS_ERR_CLOUD_FAILED : code);
}

}  // namespace web
