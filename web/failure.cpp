#include "failure.h"

#include <cerrno>
#include <cstring>

namespace web {

using namespace ZYROVFS;

namespace {

struct CodeRow {
    __tag_vfs_err_ code;
    int status;
};

constexpr CodeRow kCodes[] = {
    {VFS_ERR_NOT_FOUND, 404},      {VFS_ERR_CONFIG_NOT_FOUND, 404},
    {VFS_ERR_FORBIDDEN, 403},      {VFS_ERR_PERMISSION_DENIED, 403},
    {VFS_ERR_CONFLICT, 409},       {VFS_ERR_FILE_EXISTS, 409},
    {VFS_ERR_IS_DIRECTORY, 409},   {VFS_ERR_FILE_TOO_LARGE, 413},
    {VFS_ERR_QUOTA_EXCEEDED, 507}, {VFS_ERR_NO_SPACE, 507},
    {VFS_ERR_INVALID_NAME, 422},   {VFS_ERR_NAME_TOO_LONG, 422},
    {VFS_ERR_BAD_REQUEST, 400},    {VFS_ERR_RANGE_FAILED, 416},
    {VFS_ERR_RATE_LIMITED, 503},   {VFS_ERR_SERVICE_UNAVAILABLE, 503},
};

struct ErrnoRow {
    int error;
    int status;
    __tag_vfs_err_ code;
};

constexpr ErrnoRow kErrnos[] = {
    {ENOENT, 404, VFS_ERR_NOT_FOUND},
    {ENOTDIR, 404, VFS_ERR_NOT_FOUND},
    {EACCES, 403, VFS_ERR_PERMISSION_DENIED},
    {EPERM, 403, VFS_ERR_PERMISSION_DENIED},
    {EROFS, 403, VFS_ERR_PERMISSION_DENIED},
    {EEXIST, 409, VFS_ERR_FILE_EXISTS},
    {ENOTEMPTY, 409, VFS_ERR_CONFLICT},
    {EISDIR, 409, VFS_ERR_IS_DIRECTORY},
    {ENOSPC, 507, VFS_ERR_NO_SPACE},
    {EDQUOT, 507, VFS_ERR_QUOTA_EXCEEDED},
    {ENAMETOOLONG, 422, VFS_ERR_NAME_TOO_LONG},
    // What leads out of the folder that a connection has is nobody's business.
    {EXDEV, 403, VFS_ERR_PERMISSION_DENIED},
    {ELOOP, 403, VFS_ERR_PERMISSION_DENIED},
};

}  // namespace

Json::Value Failure::Describe() const {
    Json::Value error;
    error["status"] = status_;
    error["meaning"] = what();
    if (code_ != VFS_ERR_NONE) {
        error["name"] = GetErrorName(code_);
        error["code"] = static_cast<int>(code_);
    }
    return error;
}

Failure FailureOf(const std::string& what, __tag_vfs_err_ code) {
    const std::string sentence = what + ": " + GetErrorMeaning(code);
    for (const CodeRow& row : kCodes) {
        if (row.code == code) {
            return {row.status, sentence, code};
        }
    }
    return {502, sentence, code};
}

Failure FailureOfErrno(const std::string& what) {
    const int error = errno;
    for (const ErrnoRow& row : kErrnos) {
        if (row.error == error) {
            return {row.status, what + ": " + GetErrorMeaning(row.code), row.code};
        }
    }
    return {502, what + ": " + std::strerror(error)};
}

}  // namespace web
