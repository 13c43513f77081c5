#include "http/error_handler.h"

#include <algorithm>
#include <iterator>

#include "core/json.h"
#include "core/log.h"
#include "http/error_handler_table.h"

namespace ZYROCloud {

using namespace ZYROVFS;

namespace {

constexpr int kCurlOk = 0;
constexpr int kCurlHttpFailure = 22;
constexpr int kCurlWriteFailure = 23;
constexpr int kCurlCallbackAbort = 42;

enum CurlResult { kSuccess = 0, kMapped = 1, kUnmapped = 2 };

struct CurlRow {
    int curl_code;
    Verdict verdict;
};

// By libcurl's numbers: some of their names have changed over its releases.
constexpr CurlRow kCurlRows[] = {
    {2, {kPlatformService, VFS_ERR_NOT_SUPPORTED}},
    {5, {kPlatformUnreachable, VFS_ERR_CONNECT_FAILED}},
    {6, {kPlatformUnreachable, VFS_ERR_CONNECT_FAILED}},
    {7, {kPlatformUnreachable, VFS_ERR_CONNECT_FAILED}},
    {9, {kPlatformNoPermission, VFS_ERR_PERMISSION_DENIED}},
    {13, {kPlatformService, VFS_ERR_COMMAND_REFUSED}},
    {21, {kPlatformCommand, VFS_ERR_COMMAND_REFUSED}},
    {28, {kPlatformUnreachable, VFS_ERR_TIMEOUT}},
    {35, {kPlatformUnreachable, VFS_ERR_CONNECT_FAILED}},
    {56, {kPlatformNetwork, VFS_ERR_RECEIVE_FAILED}},
    {70, {kPlatformNoSpace, VFS_ERR_NO_SPACE}},
    {73, {kPlatformExists, VFS_ERR_FILE_EXISTS}},
    {78, {kPlatformNotFound, VFS_ERR_NOT_FOUND}},
};

// Names that do not resolve, servers that do not answer, connections that break.
constexpr int kWorthARetry[] = {5, 6, 7, 13, 28, 35, 52, 56};

// What libcurl is sure of; a status that came before says nothing against it.
constexpr __tag_vfs_err_ kStatusIsNotAsked[] = {
    VFS_ERR_CONNECT_FAILED,
    VFS_ERR_TIMEOUT,
    VFS_ERR_TRANSFER_ABORTED,
    VFS_ERR_CANCELLED,
};

template <typename T, size_t N>
bool Holds(const T (&list)[N], T value) {
    return std::find(std::begin(list), std::end(list), value) != std::end(list);
}

int NumberOf(const Json::Value& record, const char* key, int otherwise) {
    const Json::Value& member = MemberOf(record, key);
    return member.isInt() ? member.asInt() : otherwise;
}

/** What libcurl's result says, before a status is asked. */
struct Failure {
    unsigned int platform;
    __tag_vfs_err_ code;
};

bool IsRedirection(int status) {
    return status / 100 == 3;
}

/** A callback of ours ended the transfer; the platform error tells whether a user wanted that. */
__tag_vfs_err_ AbortCode() {
    return YLIBCErrGet() == kPlatformCancelled ? VFS_ERR_CANCELLED : VFS_ERR_TRANSFER_ABORTED;
}

}  // namespace

bool ErrorHandler::IsNeedRetry() {
    return Holds(kWorthARetry, GetCurlErrorCode());
}

unsigned int ErrorHandler::GetRetrySleepTime() {
    return kRetrySleep;
}

bool ErrorHandler::ParseError(int, __tag_vfs_err_* code) {
    if (code != nullptr) {
        *code = VFS_ERR_NONE;
    }
    return true;
}

std::string ErrorHandler::GetErrorCodeFromBadReq() {
    const Json::Value& message = MemberOf(record_, "msg");
    if (message.isString()) {
        const std::string text = message.asString();
        Json::Value parsed;
        if (!json::fromString(parsed, text)) {
            LOG_ERROR("Failed to parse %s", text.c_str());
        }
        record_["msg"] = parsed;
    }
    return TextOf(MemberOf(record_, "msg"), "error");
}

bool ErrorHandler::ParseError(const Json::Value& record, bool return_on_error) {
    const int curl_code = NumberOf(record, "curl_code", kCurlOk);
    const int response_code = NumberOf(record, "response_code", 200);
    Json::Value fresh(Json::objectValue);
    fresh["curl_code"] = curl_code;
    fresh["response_code"] = response_code;
    const Json::Value& message = MemberOf(record, "msg");
    fresh["msg"] = message.isNull() ? Json::Value("") : message;
    record_ = std::move(fresh);

    __tag_vfs_err_ code = VFS_ERR_NONE;
    bool success = false;
    if (ParseCurlError(curl_code, &code) == kSuccess && return_on_error) {
        success = true;
    } else if (!Holds(kStatusIsNotAsked, code) && response_code != 0) {
        // The status replaces what libcurl said: a body cut short behind a 200 is a success.
        const Failure cause = {YLIBCErrGet(), code};
        success = ParseError(response_code, &code);
        if (success && cause.code != VFS_ERR_NONE && IsRedirection(response_code)) {
            // It led to where nobody did what was asked for: to another scheme, in a circle, to a
            // server that is not trusted.
            success = false;
            code = cause.code;
            SetPlatformErr(cause.platform);
        }
    }
    record_["code"] = code;
    return success;
}

int ErrorHandler::ParseCurlError(int curl_code, __tag_vfs_err_* code) {
    if (curl_code == kCurlOk) {
        Succeed(code);
        return kSuccess;
    }
    if (curl_code == kCurlHttpFailure) {
        return kUnmapped;  // the status says all
    }
    if (curl_code == kCurlWriteFailure || curl_code == kCurlCallbackAbort) {
        *code = AbortCode();
        return kMapped;
    }
    const auto* row =
        std::find_if(std::begin(kCurlRows), std::end(kCurlRows),
                     [curl_code](const CurlRow& r) { return r.curl_code == curl_code; });
    if (row == std::end(kCurlRows)) {
        LOG_ERROR("Non-handled curl error code=%d", curl_code);
        Apply({kPlatformNetwork, VFS_ERR_UNKNOWN}, code);
        return kUnmapped;
    }
    Apply(row->verdict, code);
    return kMapped;
}

Json::Value ErrorHandler::GetError() const {
    return record_;
}

int ErrorHandler::GetCurlErrorCode() const {
    return NumberOf(record_, "curl_code", 0);
}

int ErrorHandler::GetRespErrorCode() const {
    return NumberOf(record_, "response_code", 0);
}

int ErrorHandler::GetErrorCode() const {
    return NumberOf(record_, "code", 0);
}

std::string ErrorHandler::Message() const {
    return TextOf(record_, "msg");
}

void ErrorHandler::SetMessage(const std::string& text) {
    record_["msg"] = text;
}

}  // namespace ZYROCloud
