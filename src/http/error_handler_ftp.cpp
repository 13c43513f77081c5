#include "core/log.h"
#include "http/error_handler.h"
#include "http/error_handler_table.h"

namespace ZYROCloud {

using namespace ZYROVFS;

namespace {

constexpr int kFirstRefusal = 300;
constexpr int kServerCloses = 421;

constexpr Verdict kDenied = {kPlatformNoPermission, VFS_ERR_PERMISSION_DENIED};
constexpr Verdict kNoSpace = {kPlatformNoSpace, VFS_ERR_NO_SPACE};
constexpr Verdict kRefused = {kPlatformCommand, VFS_ERR_COMMAND_REFUSED};
// Servers have many ways to say that something is not there; so has every reply without a row.
constexpr Verdict kNotFound = {kPlatformNotFound, VFS_ERR_NOT_FOUND};

constexpr StatusRow kRows[] = {
    {332, nullptr, kRefused},
    {kServerCloses, nullptr, {kPlatformTimeout, VFS_ERR_SERVICE_UNAVAILABLE}},
    {425, nullptr, kNotFound},
    {426, nullptr, kNotFound},
    {450, nullptr, kNotFound},
    {451, nullptr, kNotFound},
    {452, nullptr, kNoSpace},
    {500, nullptr, kRefused},
    {501, nullptr, kRefused},
    {502, nullptr, kRefused},
    {503, nullptr, kRefused},
    {504, nullptr, kRefused},
    {522, nullptr, kRefused},
    {530, nullptr, kDenied},
    {532, nullptr, kRefused},
    {550, nullptr, kNotFound},
    {551, nullptr, kNotFound},
    {552, nullptr, kNoSpace},
    {553, nullptr, kDenied},
};

}  // namespace

bool FTPErrorHandler::IsNeedRetry() {
    return GetRespErrorCode() != kServerCloses && ErrorHandler::IsNeedRetry();
}

bool FTPErrorHandler::ParseError(int response_code, __tag_vfs_err_* code) {
    if (response_code < kFirstRefusal) {
        return Succeed(code);
    }
    LOG_ERROR("ftp response error code=%d", response_code);
    const Verdict* verdict = FindVerdict(kRows, response_code);
    Apply(verdict == nullptr ? kNotFound : *verdict, code);
    return false;
}

}  // namespace ZYROCloud
