// Bodies of refused requests through every error handler: whatever a service answers, a failure
// stays a failure with a code, and the record can be read.
#include <cstdint>
#include <cstdlib>
#include <iterator>
#include <memory>
#include <string>

#include "http/error_handler.h"

using namespace ZYROCloud;

namespace {

void Check(bool holds) {
    if (!holds) {
        abort();
    }
}

constexpr int kStatuses[] = {400, 401, 403, 404, 409, 416, 420, 421, 429, 500, 503, 507, 550, 999};

void Judge(ErrorHandler& errors, int status, const std::string& body) {
    Json::Value record;
    record["curl_code"] = 0;
    record["response_code"] = status;
    record["msg"] = body;
    Check(!errors.ParseError(record, false));
    Check(errors.GetErrorCode() >= ZYROVFS::VFS_ERR_UNAUTHORIZED ||
          errors.GetErrorCode() == ZYROVFS::VFS_ERR_UNKNOWN);
    const unsigned sleep = errors.GetRetrySleepTime();
    // Only OneDrive may ask for other times.
    Check(sleep == 3 || sleep == 5 || errors.GetErrorCode() == ZYROVFS::VFS_ERR_RATE_LIMITED);
    errors.IsNeedRetry();
    errors.GetErrorCodeFromBadReq();
    Check(errors.GetError()["response_code"].asInt() == status);
    Check(errors.ParseError(record, true));
    Check(errors.GetErrorCode() == ZYROVFS::VFS_ERR_NONE);
}

template <typename... Errors>
void JudgeByAll(int status, const std::string& body) {
    (Judge(*std::make_unique<Errors>(), status, body), ...);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    // The first byte chooses the status.
    if (size == 0) {
        return 0;
    }
    const std::string body(reinterpret_cast<const char*>(data) + 1, size - 1);
    JudgeByAll<GDriveErrorHandler, OneDriveErrorHandler, BoxErrorHandler, DropboxErrorHandler,
               DavErrorHandler, FTPErrorHandler>(kStatuses[data[0] % std::size(kStatuses)], body);
    return 0;
}
