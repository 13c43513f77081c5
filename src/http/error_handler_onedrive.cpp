#include <algorithm>
#include <cstdlib>
#include <limits>

#include "core/json.h"
#include "core/log.h"
#include "http/error_handler.h"
#include "http/error_handler_table.h"

namespace ZYROCloud {

using namespace ZYROVFS;

namespace {

constexpr Verdict kServerError = {kPlatformNetwork, VFS_ERR_SERVER_ERROR};

constexpr StatusRow kRows[] = {
    {400, "resource_already_exists", {kPlatformConflict, VFS_ERR_CONFLICT}},
    {400, "request_parameter_too_large", {kPlatformNameTooLong, VFS_ERR_NAME_TOO_LONG}},
    {400, "request_parameter_invalid", {kPlatformBadName, VFS_ERR_INVALID_NAME}},
    {400, nullptr, kTokenRule},
    {401, nullptr, {kPlatformNoPermission, VFS_ERR_UNAUTHORIZED}},
    {403, nullptr, {kPlatformNoPermission, VFS_ERR_FORBIDDEN}},
    {404, nullptr, {kPlatformNotFound, VFS_ERR_NOT_FOUND}},
    {413, nullptr, {kPlatformTooLarge, VFS_ERR_FILE_TOO_LARGE}},
    {416, nullptr, {kPlatformNetwork, VFS_ERR_RANGE_FAILED}},
    {420, nullptr, {kPlatformService, VFS_ERR_RATE_LIMITED}},
    {500, nullptr, kServerError},
    {503, nullptr, kServerError},
    {507, nullptr, {kPlatformQuota, VFS_ERR_QUOTA_EXCEEDED}},
};

constexpr unsigned int kExtraWait = 30;
constexpr unsigned int kLongestWait = 3600;

/** A refused token request has a text under "error", the service's own answers an object. */
std::string DetailOfBody(const std::string& message) {
    Json::Value answer;
    json::fromString(answer, message);
    const Json::Value& error = MemberOf(answer, "error");
    return error.isString() ? error.asString() : TextOf(error, "code");
}

/** The text behind "Wait " as far as the next blank; false when there is no "Wait ". */
bool FindWait(const std::string& message, std::string& seconds) {
    static const std::string kWait = "Wait ";
    const size_t at = message.find(kWait);
    if (at == std::string::npos) {
        return false;
    }
    const std::string rest = message.substr(at + kWait.size());
    seconds = rest.substr(0, rest.find(' '));
    return true;
}

/** What the service asks for, with some more. 0 means that it need not be left alone at all. */
unsigned int WaitFor(const std::string& seconds) {
    const unsigned long asked = strtoul(seconds.c_str(), nullptr, 0);
    if (asked > std::numeric_limits<unsigned int>::max() - kExtraWait) {
        return kBusySleep;  // no time that anyone can mean
    }
    // It decides about its own pause, and not about how long a call may take.
    return asked == 0 ? 0 : std::min(static_cast<unsigned int>(asked), kLongestWait) + kExtraWait;
}

unsigned int ThrottledSleep(const std::string& message) {
    if (message.empty()) {
        return kBusySleep;
    }
    LOG_ERROR("%s", message.c_str());
    Json::Value answer;
    if (!json::fromString(answer, message)) {
        LOG_ERROR("Failed to parse to json, %s", message.c_str());
        return kBusySleep;
    }
    const Json::Value& error = MemberOf(answer, "error");
    std::string seconds;
    if (TextOf(error, "code") != "request_throttled" ||
        !FindWait(TextOf(error, "message"), seconds)) {
        return kBusySleep;
    }
    return WaitFor(seconds);
}

}  // namespace

bool OneDriveErrorHandler::IsNeedRetry() {
    return ErrorHandler::IsNeedRetry() || IsBusy(GetErrorCode());
}

unsigned int OneDriveErrorHandler::GetRetrySleepTime() {
    switch (GetErrorCode()) {
        case VFS_ERR_SERVER_ERROR:
            return kBusySleep;
        case VFS_ERR_RATE_LIMITED:
            return ThrottledSleep(Message());
        default:
            return kRetrySleep;
    }
}

bool OneDriveErrorHandler::ParseError(int response_code, __tag_vfs_err_* code) {
    if (response_code < kFirstHttpFailure) {
        return Succeed(code);
    }
    LOG_ERROR("OneDrive response error code=%d", response_code);
    const auto detail = [this] { return DetailOfBody(Message()); };
    Apply(CloudVerdict(*this, kRows, response_code, detail), code);
    return false;
}

}  // namespace ZYROCloud
