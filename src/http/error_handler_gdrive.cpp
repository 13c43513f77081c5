#include "core/json.h"
#include "core/log.h"
#include "http/error_handler.h"
#include "http/error_handler_table.h"

namespace ZYROCloud {

using namespace ZYROVFS;

namespace {

constexpr Verdict kUnauthorized = {kPlatformNoPermission, VFS_ERR_UNAUTHORIZED};
constexpr Verdict kRateLimited = {kPlatformService, VFS_ERR_RATE_LIMITED};
constexpr Verdict kServerError = {kPlatformNetwork, VFS_ERR_SERVER_ERROR};
// The application is shut out, for the day or for good: the user has to connect again.
constexpr Verdict kAppRefused = {kPlatformService, VFS_ERR_UNAUTHORIZED};

constexpr StatusRow kRows[] = {
    {400, nullptr, kTokenRule},
    {401, nullptr, kUnauthorized},
    {403, "quotaExceeded", {kPlatformQuota, VFS_ERR_QUOTA_EXCEEDED}},
    {403, "userRateLimitExceeded", kRateLimited},
    {403, "rateLimitExceeded", kRateLimited},
    {403, "dailyLimitExceeded", kAppRefused},
    {403, "appNotInstalled", kAppRefused},
    {403, "userAccess", kAppRefused},
    {403, "appNotConfigured", kAppRefused},
    {403, "appBlacklisted", kAppRefused},
    {403, nullptr, {kPlatformNoPermission, VFS_ERR_FORBIDDEN}},
    {404, nullptr, {kPlatformNotFound, VFS_ERR_NOT_FOUND}},
    {500, nullptr, kServerError},
    {503, nullptr, kServerError},
};

/** error.errors[0].reason */
std::string ReasonOf(const std::string& message) {
    Json::Value answer;
    if (!json::fromString(answer, message)) {
        LOG_ERROR("Failed to parse to json, %s", message.c_str());
        return "";
    }
    const Json::Value& errors = MemberOf(MemberOf(answer, "error"), "errors");
    return errors.isArray() && !errors.empty() ? TextOf(errors[0], "reason") : "";
}

/** A 403 of this service is often a hidden rate limit. */
bool IsPassing(int code) {
    return IsBusy(code) || code == VFS_ERR_FORBIDDEN;
}

}  // namespace

bool GDriveErrorHandler::IsNeedRetry() {
    return ErrorHandler::IsNeedRetry() || IsPassing(GetErrorCode());
}

unsigned int GDriveErrorHandler::GetRetrySleepTime() {
    return IsPassing(GetErrorCode()) ? kBusySleep : kRetrySleep;
}

bool GDriveErrorHandler::ParseError(int response_code, __tag_vfs_err_* code) {
    if (response_code < kFirstHttpFailure) {
        return Succeed(code);
    }
    LOG_ERROR("google-drive response error code=%d", response_code);
    const auto reason = [this] {
        std::string text = ReasonOf(Message());
        SetMessage(text);
        return text;
    };
    Apply(CloudVerdict(*this, kRows, response_code, reason), code);
    return false;
}

}  // namespace ZYROCloud
