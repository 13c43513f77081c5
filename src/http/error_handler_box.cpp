#include "core/json.h"
#include "core/log.h"
#include "http/error_handler.h"
#include "http/error_handler_table.h"

namespace ZYROCloud {

using namespace ZYROVFS;

namespace {

constexpr Verdict kServerError = {kPlatformNetwork, VFS_ERR_SERVER_ERROR};

constexpr StatusRow kRows[] = {
    {400, "item_name_invalid", {kPlatformBadName, VFS_ERR_INVALID_NAME}},
    {400, nullptr, kTokenRule},
    {401, nullptr, {kPlatformNoPermission, VFS_ERR_UNAUTHORIZED}},
    {403, "storage_limit_exceeded", {kPlatformQuota, VFS_ERR_QUOTA_EXCEEDED}},
    {403, "file_size_limit_exceeded", {kPlatformTooLarge, VFS_ERR_FILE_TOO_LARGE}},
    {403, nullptr, {kPlatformNoPermission, VFS_ERR_FORBIDDEN}},
    {404, nullptr, {kPlatformNotFound, VFS_ERR_NOT_FOUND}},
    {405, nullptr, {kPlatformService, VFS_ERR_NOT_SUPPORTED}},
    {409, nullptr, {kPlatformConflict, VFS_ERR_CONFLICT}},
    {412, nullptr, {kPlatformNetwork, VFS_ERR_BAD_REQUEST}},
    {429, nullptr, {kPlatformNetwork, VFS_ERR_RATE_LIMITED}},
    {500, nullptr, kServerError},
    {503, nullptr, kServerError},
};

std::string DetailOfBody(const std::string& message) {
    Json::Value answer;
    json::fromString(answer, message);
    return TextOf(answer, "code");
}

}  // namespace

bool BoxErrorHandler::IsNeedRetry() {
    return ErrorHandler::IsNeedRetry() || IsBusy(GetErrorCode());
}

unsigned int BoxErrorHandler::GetRetrySleepTime() {
    return IsBusy(GetErrorCode()) ? kBusySleep : kRetrySleep;
}

bool BoxErrorHandler::ParseError(int response_code, __tag_vfs_err_* code) {
    if (response_code < kFirstHttpFailure) {
        return Succeed(code);
    }
    LOG_ERROR("Box response error code=%d", response_code);
    const auto detail = [this] { return DetailOfBody(Message()); };
    Apply(CloudVerdict(*this, kRows, response_code, detail), code);
    return false;
}

}  // namespace ZYROCloud
