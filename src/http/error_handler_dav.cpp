#include "core/log.h"
#include "http/error_handler.h"
#include "http/error_handler_table.h"

namespace ZYROCloud {

using namespace ZYROVFS;

namespace {

constexpr Verdict kDenied = {kPlatformNoPermission, VFS_ERR_PERMISSION_DENIED};
constexpr Verdict kNotFound = {kPlatformNotFound, VFS_ERR_NOT_FOUND};
constexpr Verdict kTimeout = {kPlatformTimeout, VFS_ERR_REQUEST_TIMEOUT};
constexpr Verdict kBadRequest = {kPlatformNetwork, VFS_ERR_BAD_REQUEST};
constexpr Verdict kOther = {kPlatformRemote, VFS_ERR_REMOTE_FAILED};

constexpr StatusRow kRows[] = {
    {400, nullptr, kBadRequest},
    {401, nullptr, kDenied},
    {402, nullptr, kDenied},
    {403, nullptr, kDenied},
    {404, nullptr, kNotFound},
    {405, nullptr, {kPlatformCommand, VFS_ERR_COMMAND_REFUSED}},
    {407, nullptr, kDenied},
    {408, nullptr, kTimeout},
    {409, nullptr, {kPlatformConflict, VFS_ERR_CONFLICT}},
    {410, nullptr, kNotFound},
    {411, nullptr, kBadRequest},
    {412, nullptr, kBadRequest},
    {413, nullptr, {kPlatformTooLarge, VFS_ERR_FILE_TOO_LARGE}},
    {414, nullptr, kBadRequest},
    {415, nullptr, kBadRequest},
    {423, nullptr, kDenied},
    {424, nullptr, kBadRequest},
    {501, nullptr, kBadRequest},
    {504, nullptr, kTimeout},
    {507, nullptr, {kPlatformNoSpace, VFS_ERR_NO_SPACE}},
};

}  // namespace

bool DavErrorHandler::ParseError(int response_code, __tag_vfs_err_* code) {
    if (response_code < kFirstHttpFailure) {
        return Succeed(code);
    }
    LOG_ERROR("dav response error code=%d", response_code);
    const Verdict* verdict = FindVerdict(kRows, response_code);
    Apply(verdict == nullptr ? kOther : *verdict, code);
    return false;
}

}  // namespace ZYROCloud
