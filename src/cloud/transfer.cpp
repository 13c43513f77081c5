#include "cloud/transfer.h"

#include <strings.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <climits>
#include <memory>
#include <new>

#include "cloud/guard.h"
#include "core/error_cell.h"
#include "core/json.h"
#include "core/log.h"
#include "http/api_handler.h"
#include "http/error_handler_table.h"

namespace ZYROCloud {

using namespace ZYROVFS;

TransferGlobals transfer;

namespace {

constexpr int kMostPasses = 50;
constexpr unsigned int kPause = 3;  // seconds between two passes of a download
/** A pass that gains less is not worth another one. */
constexpr long long kLeastGain = 1024 * 1024;

/** Failures of a download that another pass would only meet again. */
constexpr __tag_vfs_err_ kFinal[] = {
    VFS_ERR_UNAUTHORIZED, VFS_ERR_FORBIDDEN,         VFS_ERR_CANCELLED, VFS_ERR_SERVICE_UNAVAILABLE,
    VFS_ERR_RATE_LIMITED, VFS_ERR_PERMISSION_DENIED, VFS_ERR_NOT_FOUND,
};

/** A transfer's own context for `body`, which answers bool; false when there is no memory for it.
 */
template <typename Body>
bool WithContext(Cloud* cloud, Body body, SourceLine at = SourceLine::Here()) {
    if (cloud == nullptr) {
        return false;
    }
    return Guard(
        *cloud,
        [&] {
            const std::unique_ptr<XferContext> context(new (std::nothrow) XferContext);
            if (context == nullptr) {
                cloud->SetError(VFS_ERR_CLOUD_FAILED, "");
                return false;
            }
            return body(*context);
        },
        at);
}

/** What a driver is to know of a whole file. What the metadata lacks shows when it is used. */
Json::Value DescribeFile(Cloud& cloud, const std::string& uri, long long size, const char* action) {
    Json::Value meta(Json::objectValue);
    cloud.GetMetaDataByURI(uri, meta, action);
    meta["total_bytes"] = static_cast<Json::Int64>(size);
    meta["filesize"] = static_cast<Json::Int64>(size);
    return meta;
}

void ExpectAnswer(const Json::Value& meta) {
    uint64_t from = 0;
    uint64_t length = 0;
    transfer.answer = Answer();
    if (meta.isObject() && json::toUInt64(meta.get("len", 0), length) && length != 0) {
        json::toUInt64(meta.get("from_bytes", 0), from);
    }
    transfer.answer.from = from;
    transfer.answer.length = length;
    transfer.answer.expected = length != 0 ? length : transfer.bytes_total;
}

/** Whether the handler has prepared a request since a mark was set: that wipes the mark. */
class RequestMark {
  public:
    explicit RequestMark(CURL* curl) : curl_(curl) { Set(this); }
    RequestMark(const RequestMark&) = delete;
    RequestMark& operator=(const RequestMark&) = delete;
    ~RequestMark() { Set(nullptr); }

    bool IsWiped() const {
        char* mark = nullptr;
        return curl_ != nullptr && curl_easy_getinfo(curl_, CURLINFO_PRIVATE, &mark) == CURLE_OK &&
               mark == nullptr;
    }

  private:
    void Set(void* mark) {
        if (curl_ != nullptr) {
            curl_easy_setopt(curl_, CURLOPT_PRIVATE, mark);
        }
    }

    CURL* curl_;
};

/** libcurl's result of the driver's last request, 0 for none. */
int LastCurlCode(APIHandler* api) {
    const Json::Value record = api == nullptr ? Json::Value() : api->GetError();
    const Json::Value code = record.isObject() ? record["curl_code"] : Json::Value();
    return code.isInt() ? code.asInt() : 0;
}

/**
 * Whether the server had taken an upload for whole before libcurl failed. An interim status says
 * nothing of the kind, nor does a redirection, and in FTP each command before has its own reply.
 */
bool WasTaken(CURL* curl) {
    constexpr long kFtpTransferComplete = 226;
    constexpr long kFtpActionDone = 250;
    long status = 0;
    const char* scheme = "";
    curl_easy_getinfo(curl, CURLINFO_RESPONSE_CODE, &status);
    curl_easy_getinfo(curl, CURLINFO_SCHEME, &scheme);
    if (scheme != nullptr && strncasecmp(scheme, "ftp", 3) == 0) {
        return status == kFtpTransferComplete || status == kFtpActionDone;
    }
    return status / 100 == 2;
}

bool IsCut(const Answer& answer) {
    return answer.expected == 0 || answer.received < answer.expected;
}

off64_t Position(int fd, SourceLine at = SourceLine::Here()) {
    const off64_t position = lseek64(fd, 0, SEEK_CUR);
    if (position < 0) {
        LOG_ERROR_AT(at, "Failed to get pos %m");
    }
    return position;
}

/** One download after another into a descriptor, each from where the last one stopped. */
class Passes {
  public:
    Passes(Cloud& cloud, XferData& xfer, Json::Value& meta, long long size)
        : cloud_(cloud), xfer_(xfer), meta_(meta), size_(size) {}

    bool Run() {
        for (int pass = 0; pass < kMostPasses; ++pass) {
            const off64_t before = Position(xfer_.context->fd);
            if (before < 0) {
                return false;
            }
            if (cloud_.Download(&xfer_, meta_)) {
                return true;
            }
            const Next next = JudgeFailure(before);
            if (next != kGoOn) {
                return next == kComplete;
            }
        }
        return false;
    }

  private:
    enum Next { kFailed, kComplete, kGoOn };

    Next JudgeFailure(off64_t before) {
        const __tag_vfs_err_ code = cloud_.GetErrorCode();
        for (const __tag_vfs_err_ final_code : kFinal) {
            if (code == final_code) {
                return kFailed;
            }
        }
        const off64_t now = Position(xfer_.context->fd);
        if (now < 0) {
            return kFailed;
        }
        if (now == size_) {
            return kComplete;  // whatever the driver says
        }
        if (now > size_ || now - before < kLeastGain) {
            LOG_ERROR("Size is wrong, %llu, %llu", static_cast<unsigned long long>(now),
                      static_cast<unsigned long long>(size_));
            return kFailed;
        }
        meta_["from_bytes"] = static_cast<Json::Int64>(now);
        meta_["len"] = static_cast<Json::Int64>(size_ - now);
        sleep(kPause);
        return kGoOn;
    }

    Cloud& cloud_;
    XferData& xfer_;
    Json::Value& meta_;
    const long long size_;
};

/** Bytes to send when nobody told: a file says it, anything else just ends. An empty file in the
 * place of what was there is the worst guess. */
long long SizeOf(int fd, long long size) {
    struct stat file {};
    if (size >= 0 || fstat(fd, &file) != 0 || !S_ISREG(file.st_mode)) {
        return std::max(size, -1LL);
    }
    return std::max<long long>(0, file.st_size - lseek64(fd, 0, SEEK_CUR));
}

/** Where a file ends that is sent from its position on; -1 when it has no position. */
long long SourceEnd(int fd, long long size) {
    const off64_t start = size < 0 ? -1 : lseek64(fd, 0, SEEK_CUR);
    return start < 0 || start > LLONG_MAX - size ? -1 : start + size;
}

}  // namespace

void BeginTransfer(unsigned long long size, const TransferCallbacks& callbacks) {
    transfer.bytes_left = size;
    transfer.bytes_total = size;
    transfer.progress_cb = callbacks.progress;
    transfer.cancel_cb = callbacks.cancel;
    transfer.speed_cb = callbacks.speed;
    transfer.first_write = true;
    transfer.slot_state = kSlotEmpty;
    transfer.slot_length = 0;
    transfer.slot_offset = 0;
    transfer.watched_pid = 0;
    transfer.own_pid = getpid();
    transfer.source_end = -1;
    transfer.answer = Answer();
    if (YLIBCErrGet() == kPlatformCancelled) {
        // It would make a cancel of any failure in which one of the functions ends the transfer.
        SetPlatformErr(0);
    }
}

bool Cloud::InitXferData(XferData* xfer) {
    if (xfer == nullptr) {
        return false;
    }
    const auto set = xfer->direction == 0   ? &APIHandler::SetWriteFunAndData
                     : xfer->direction == 1 ? &APIHandler::SetReadFunAndData
                                            : nullptr;
    if (set == nullptr || api == nullptr) {
        return true;
    }
    api->SetStopCheck(IsStopAsked);
    if (xfer->callback != nullptr) {
        (api->*set)(xfer->callback, nullptr);
    }
    if (xfer->context != nullptr) {
        (api->*set)(nullptr, xfer->context);
    }
    return true;
}

bool Cloud::Upload(XferData* xfer, const Json::Value& meta) {
    CURL* curl = api == nullptr ? nullptr : api->GetCurlHandler();
    if (xfer != nullptr && xfer->context != nullptr) {
        xfer->context->curl = curl;
    }
    const RequestMark mark(curl);
    if (!UploadProcess(xfer, meta)) {
        return false;
    }
    if (mark.IsWiped() && LastCurlCode(api) != CURLE_OK && !WasTaken(curl)) {
        // A status below 400 counts as a success for the handler, whatever it says.
        SetError(VFS_ERR_TRANSFER_ABORTED, "");
        return false;
    }
    return true;
}

bool Cloud::Download(XferData* xfer, const Json::Value& meta) {
    CURL* curl = api == nullptr ? nullptr : api->GetCurlHandler();
    if (xfer != nullptr && xfer->context != nullptr) {
        xfer->context->curl = curl;
    }
    ExpectAnswer(meta);
    const RequestMark mark(curl);
    if (!DownloadProcess(xfer, meta)) {
        return false;
    }
    if (transfer.answer.refused) {
        const unsigned int cause = transfer.answer.refused_for;
        SetPlatformErr(cause);
        SetError(cause == kPlatformCancelled ? VFS_ERR_CANCELLED : VFS_ERR_TRANSFER_ABORTED, "");
        return false;
    }
    if (mark.IsWiped() && LastCurlCode(api) != CURLE_OK && IsCut(transfer.answer)) {
        // A body that broke off behind a good status counts as a success for the handler; here it
        // is a part of the file.
        SetError(VFS_ERR_RECEIVE_FAILED, "");
        return false;
    }
    return true;
}

bool Cloud::UploadFile(Cloud* cloud, const std::string& uri, int fd, long long size,
                       ProgressCallback progress, CancelCallback cancel, SpeedCallback speed) {
    return WithContext(cloud, [&](XferContext& context) {
        context.fd = fd;
        XferData xfer{FileReadCallback, 1, &context};
        const long long bytes = SizeOf(fd, size);
        BeginTransfer(static_cast<unsigned long long>(bytes), {progress, cancel, speed});
        transfer.source_end = SourceEnd(fd, bytes);
        return cloud->Upload(&xfer, DescribeFile(*cloud, uri, bytes, "Upload"));
    });
}

bool Cloud::DownloadFile(Cloud* cloud, const std::string& uri, int fd, long long size,
                         ProgressCallback progress, CancelCallback cancel, SpeedCallback speed) {
    return WithContext(cloud, [&](XferContext& context) {
        context.fd = fd;
        XferData xfer{FileWriteCallback, 0, &context};
        BeginTransfer(static_cast<unsigned long long>(size), {progress, cancel, speed});
        Json::Value meta = DescribeFile(*cloud, uri, size, "Download");
        return Passes(*cloud, xfer, meta, size).Run();
    });
}

bool Cloud::DownloadFileToBuffer(Cloud* cloud, const std::string& uri, char* buffer, long long from,
                                 long long len, long long* got, ProgressCallback progress,
                                 CancelCallback cancel, SpeedCallback speed) {
    if (got == nullptr || from < 0 || len < 0) {
        return false;
    }
    return WithContext(cloud, [&](XferContext& context) {
        context.buffer = buffer;
        XferData xfer{FileWriteCallback, 0, &context};
        BeginTransfer(static_cast<unsigned long long>(len), {progress, cancel, speed});
        Json::Value meta(Json::objectValue);
        meta["url"] = uri;
        meta["from_bytes"] = static_cast<Json::Int64>(from);
        meta["len"] = static_cast<Json::Int64>(len);
        if (!cloud->Download(&xfer, meta)) {
            return false;
        }
        *got = static_cast<long long>(context.buffer_used);
        return true;
    });
}

}  // namespace ZYROCloud
