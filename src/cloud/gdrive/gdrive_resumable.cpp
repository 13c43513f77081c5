#include <strings.h>
#include <unistd.h>

#include <cerrno>
#include <charconv>

#include "cloud/answer_header.h"
#include "cloud/attempt.h"
#include "cloud/gdrive/gdrive.h"
#include "cloud/gdrive/gdrive_api.h"
#include "cloud/gdrive/gdrive_body.h"
#include "cloud/guard.h"
#include "cloud/request.h"
#include "cloud/size_limit.h"
#include "cloud/upload_body.h"
#include "core/log.h"
#include "core/loggable_url.h"
#include "http/api_handler.h"
#include "http/error_handler_table.h"

namespace ZYROCloud {

using namespace ZYROVFS;
using namespace gdrive;

namespace {

/**
 * "bytes=0-41", also without its unit: 42 bytes, the first ones, have arrived. Anything else is
 * refused: with a wrong guess a part of the file would be left out, or stand in it twice.
 */
bool ReadRange(const std::string& text, unsigned long long& arrived) {
    constexpr const char* kUnit = "bytes=";
    constexpr size_t kUnitLength = 6;
    const char* at = text.c_str();
    const char* const end = at + text.size();
    at += strncasecmp(at, kUnit, kUnitLength) == 0 ? kUnitLength : 0;
    unsigned long long last = 0;
    if (end - at < 3 || at[0] != '0' || at[1] != '-') {
        return false;
    }
    const auto [stop, error] = std::from_chars(at + 2, end, last);
    if (error != std::errc() || stop != end || last == kSizeNotKnown) {
        return false;
    }
    arrived = last + 1;
    return true;
}

/** What is sent, when it is not all of the file. Nothing at all is left when only the service's
 * word that it has everything was lost. */
std::string RangeText(unsigned long long start, unsigned long long total) {
    const std::string all = "/" + std::to_string(total);
    return start == total
               ? "bytes *" + all
               : "bytes " + std::to_string(start) + "-" + std::to_string(total - 1) + all;
}

}  // namespace

bool GDrive::StartResumableUpload(const std::string& url, const std::string& method,
                                  const Json::Value& body, std::string& session_uri) {
    return Guard(*this, [&] {
        Json::Value query;
        query["uploadType"] = "resumable";
        Request request(*this, kFrame);
        request.To(method, url.empty() ? gdrive::Upload() : url)
            .Unescaped()
            .Query(query)
            .Body(body)
            .Retries(0);
        if (!body.isObject()) {
            SetError(VFS_ERR_CLOUD_FAILED, "");
            LOG_ERROR("Failed to add post raw data");
            return false;
        }
        if (!request.Send()) {
            return false;
        }
        const std::string location = AnswerHeader(*api, "Location");
        if (location.empty()) {
            SetError(VFS_ERR_CLOUD_FAILED, "");
            LOG_ERROR("Has no location field in header response");
            return false;
        }
        session_uri = location;
        return true;
    });
}

bool GDrive::GetResumableStartByte(const std::string& session_uri, unsigned long long* start) {
    return Guard(*this, [&] {
        if (start == nullptr) {
            SetError(VFS_ERR_CLOUD_FAILED, "");
            return false;
        }
        *start = 0;
        Request request(*this, kFrame);
        request.Put(session_uri)
            .Unescaped()
            .Header("Content-Range", "bytes */*")
            .Header("Content-Length", 0)
            .Retries(0);
        if (!request.Send()) {
            return false;
        }
        const std::string range = AnswerHeader(*api, "Range");
        // Without one nothing has arrived.
        if (range.empty() || ReadRange(range, *start)) {
            return true;
        }
        SetError(VFS_ERR_CLOUD_FAILED, "");
        LOG_ERROR("Unknown range of an upload, %s", range.c_str());
        return false;
    });
}

bool GDrive::StartUpload(const std::string& session_uri, XferData* xfer, unsigned long long start,
                         unsigned long long total) {
    return Guard(*this, [&] {
        const bool known = total != kSizeNotKnown;
        // A rest has its place in a whole that is known.
        if (xfer == nullptr || xfer->context == nullptr || start > (known ? total : 0)) {
            SetError(VFS_ERR_CLOUD_FAILED, "");
            return false;
        }
        Request request(*this, kFrame);
        request.Put(session_uri).Unescaped();
        if (known) {
            request.Header("Content-Length", static_cast<Json::UInt64>(total - start));
        }
        if (start != 0) {
            // Without it the service takes a rest for the whole.
            request.Header("Content-Range", RangeText(start, total));
        }
        if (!request.Prepare(xfer)) {
            return false;
        }
        // With the length as a header alone the body would go out in chunks, too. That is right for
        // a length that nobody knows.
        if (!api->SetUploadOpt(true) ||
            (known && !api->SetUploadSize(static_cast<long long>(total - start)))) {
            SetError(VFS_ERR_CLOUD_FAILED, "");
            return false;
        }
        return SendRest(*xfer, session_uri);
    });
}

bool GDrive::SendRest(const XferData& xfer, const std::string& session_uri) {
    if (!SendUpload(*this, xfer)) {
        SetError(api->GetError());
        LOG_ERROR(kRequestFailed, LoggableUrl(session_uri).c_str(),
                  json::toString(GetError()).c_str());
        return false;
    }
    if (IsStored(*api)) {
        return true;
    }
    SetError(VFS_ERR_RANGE_FAILED, "");
    LOG_ERROR("The service has not got all of the file, status %d", AnswerStatus(*api));
    return false;
}

namespace {

/** One file on its way through a session. */
class Session {
  public:
    Session(GDrive& drive, XferData& xfer, const std::string& uri, unsigned long long total)
        : drive_(drive),
          xfer_(xfer),
          uri_(uri),
          total_(total),
          begin_(SourceBegin(*xfer.context)) {}

    bool Send(const std::string& url) {
        AttemptPlan plan;
        plan.prepare = [this] { return Ask() && (stored_ || Seek()); };
        plan.send = [this] {
            sent_ = true;
            return stored_ || drive_.StartUpload(uri_, &xfer_, start_, total_);
        };
        plan.judge = [this](__tag_vfs_err_ code) {
            // What the service has not stored it gets with the next attempt.
            return JudgeRenewing(drive_, *xfer_.context, code, code == VFS_ERR_RANGE_FAILED);
        };
        // The question between two attempts has a record of its own.
        plan.copy = CopyError::kNever;
        plan.retry = "Retry upload";
        plan.exhausted = kNoAttemptLeft;
        plan.what = &url;
        return RunAttempts(drive_, plan);
    }

  private:
    bool Ask() {
        if (!drive_.GetResumableStartByte(uri_, &start_)) {
            LOG_ERROR("Failed to get start bytes");
            return false;
        }
        // A session that is asked in vain what it lacks has all: only its word for that was lost.
        stored_ = sent_ && IsComplete();
        if (start_ <= total_) {
            return true;
        }
        drive_.SetError(VFS_ERR_CLOUD_FAILED, "");
        LOG_ERROR("The service has %llu of %llu bytes", start_, total_);
        return false;
    }

    /** Whether the answer describes the item. */
    bool IsComplete() const {
        const APIHandler& api = *drive_.GetAPIHandler();
        Json::Value item;
        return IsStored(api) && json::fromString(item, api.GetResponse()) &&
               !TextOf(item, "id").empty() && IsOfThisSize(item);
    }

    bool IsOfThisSize(const Json::Value& item) const {
        uint64_t size = 0;
        return total_ == kSizeNotKnown || !json::toUInt64(MemberOf(item, "fileSize"), size) ||
               size == total_;
    }

    bool Seek() {
        if (xfer_.context->fd == -1 || IsFreshPipe()) {
            return IsAtStart();
        }
        if (total_ == kSizeNotKnown) {
            start_ = 0;  // a rest of it cannot be named
        }
        if (SeekSource(xfer_.context->fd, begin_, static_cast<off64_t>(start_),
                       "Failed to seek file to %llu, %m")) {
            return true;
        }
        drive_.SetError(drive_.GetAPIHandler()->GetError());
        if (drive_.GetErrorCode() == VFS_ERR_NONE) {
            // The question went well, but the upload does not.
            drive_.SetError(VFS_ERR_CLOUD_FAILED, "");
        }
        return false;
    }

    /** Of a descriptor that just ends nothing is known, not even whether it can go back. */
    bool IsFreshPipe() const {
        return total_ == kSizeNotKnown && !sent_ && lseek64(xfer_.context->fd, 0, SEEK_CUR) < 0 &&
               errno == ESPIPE;
    }

    /** A stream has nothing but its first byte to begin with. */
    bool IsAtStart() {
        if (start_ == 0) {
            return true;
        }
        drive_.SetError(VFS_ERR_RANGE_FAILED, "");
        LOG_ERROR("The service wants a stream from %llu on", start_);
        return false;
    }

    GDrive& drive_;
    XferData& xfer_;
    const std::string& uri_;
    const unsigned long long total_;  ///< kSizeNotKnown for a source that just ends
    const off64_t begin_;             ///< position of the file's first byte in its source
    unsigned long long start_ = 0;    ///< bytes that the service has
    bool sent_ = false;
    bool stored_ = false;
};

/** How much will be sent. What comes from a browser may be shorter than "total_bytes" says. */
unsigned long long BytesToSend(const XferContext& context, const Json::Value& meta) {
    uint64_t total = 0;
    const bool counted = json::toUInt64(meta.get("total_bytes", 0), total);
    const bool ends_by_itself = SourceSize(meta) == -1 && (context.fd == -1 || !counted);
    return ends_by_itself ? kSizeNotKnown : total;
}

}  // namespace

bool GDrive::ResumableUpload(XferData* xfer, const Json::Value& meta) {
    return Guard(*this, [&] {
        const std::string url = meta.get("url", "").asString();
        if (url.empty() || xfer == nullptr || xfer->context == nullptr) {
            LOG_ERROR("Upload URL is empty");
            return false;
        }
        std::string session_uri;
        if (!StartResumableUpload(url, meta.get("method", "POST").asString(), Uploaded(meta),
                                  session_uri)) {
            LOG_ERROR("Failed to start upload session");
            return false;
        }
        return Session(*this, *xfer, session_uri, BytesToSend(*xfer->context, meta)).Send(url);
    });
}

}  // namespace ZYROCloud
