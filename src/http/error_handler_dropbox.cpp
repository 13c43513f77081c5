#include <algorithm>
#include <iterator>

#include "core/json.h"
#include "core/log.h"
#include "http/error_handler.h"
#include "http/error_handler_table.h"

namespace ZYROCloud {

using namespace ZYROVFS;

namespace {

constexpr Verdict kDenied = {kPlatformNoPermission, VFS_ERR_PERMISSION_DENIED};
constexpr Verdict kRateLimited = {kPlatformNetwork, VFS_ERR_RATE_LIMITED};

constexpr StatusRow kRows[] = {
    {400, nullptr, {kPlatformNetwork, VFS_ERR_TOKEN_REVOKED}},
    {401, nullptr, {kPlatformNoPermission, VFS_ERR_UNAUTHORIZED}},
    {409, "no_permission", kDenied},
    {409, "no_write_permission", kDenied},
    {409, "not_found", {kPlatformNotFound, VFS_ERR_NOT_FOUND}},
    {409, "too_many_files", {kPlatformNetwork, VFS_ERR_TOO_MANY_FILES}},
    {409, "conflict", {kPlatformConflict, VFS_ERR_CONFLICT}},
    {409, "insufficient_space", {kPlatformNoSpace, VFS_ERR_NO_SPACE}},
    {409, nullptr, {kPlatformNetwork, VFS_ERR_BAD_REQUEST}},
    {429, nullptr, kRateLimited},
    {503, nullptr, kRateLimited},
    {507, nullptr, {kPlatformQuota, VFS_ERR_QUOTA_EXCEEDED}},
};

constexpr const char* kTag = ".tag";

// These say only which path is meant; what is wrong with it stands one level below.
constexpr const char* kOuterTags[] = {"path", "path_lookup", "from_lookup", "from_write", "to"};

std::string InnerTag(const Json::Value& error, const std::string& tag) {
    for (const char* key : {tag.c_str(), "reason"}) {
        if (error.isMember(key)) {
            return TextOf(error[key], kTag);
        }
    }
    return tag;
}

std::string DetailOfBody(const std::string& message) {
    Json::Value answer;
    if (message.empty() || !json::fromString(answer, message)) {
        return "";
    }
    LOG_ERROR("Dropbox Error: %s", json::toString(answer).c_str());
    const Json::Value& error = MemberOf(answer, "error");
    const std::string tag = TextOf(error, kTag);
    const bool outer =
        std::find(std::begin(kOuterTags), std::end(kOuterTags), tag) != std::end(kOuterTags);
    return outer ? InnerTag(error, tag) : tag;
}

}  // namespace

bool DropboxErrorHandler::IsNeedRetry() {
    return ErrorHandler::IsNeedRetry() || IsBusy(GetErrorCode());
}

unsigned int DropboxErrorHandler::GetRetrySleepTime() {
    return IsBusy(GetErrorCode()) ? kBusySleep : kRetrySleep;
}

bool DropboxErrorHandler::ParseError(int response_code, __tag_vfs_err_* code) {
    if (response_code < kFirstHttpFailure) {
        return Succeed(code);
    }
    LOG_ERROR("dropbox response error code=%d", response_code);
    const auto detail = [this] { return DetailOfBody(Message()); };
    Apply(CloudVerdict(*this, kRows, response_code, detail), code);
    return false;
}

}  // namespace ZYROCloud
