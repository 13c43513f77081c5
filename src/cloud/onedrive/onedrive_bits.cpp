#include <strings.h>

#include <algorithm>

#include "cloud/answer_header.h"
#include "cloud/attempt.h"
#include "cloud/guard.h"
#include "cloud/onedrive/fragment_cursor.h"
#include "cloud/onedrive/onedrive.h"
#include "cloud/onedrive/onedrive_api.h"
#include "cloud/request.h"
#include "cloud/upload_body.h"
#include "core/handle.h"
#include "core/json.h"
#include "core/log.h"
#include "core/loggable_url.h"
#include "http/api_handler.h"

namespace ZYROCloud {

using namespace ZYROVFS;
using namespace onedrive;

namespace {

/** "bytes FIRST-LAST/TOTAL". */
std::string RangeText(long long offset, long long length, long long total) {
    return "bytes " + std::to_string(offset) + "-" + std::to_string(offset + length - 1) + "/" +
           std::to_string(total);
}

/** What each fragment has to tell. Of a browser's file it is known when the file is the last thing
 * in the request; a file of another size fails. */
int64_t FileSize(const Json::Value& meta, const UploadSize& size) {
    int64_t total = 0;
    const bool guess = !size.known && meta.isMember(kLikelyBytes);
    json::toInt64(meta.get(guess ? kLikelyBytes : "total_bytes", 0), total);
    return total;
}

/** Whoever has the session can write into the file. */
Json::Value LoggableHeaders(Json::Value headers) {
    for (const std::string& name : headers.getMemberNames()) {
        for (const char* secret : {kSessionId, "Set-Cookie", "Location"}) {
            if (strcasecmp(name.c_str(), secret) == 0) {
                headers[name] = "***";
            }
        }
    }
    return headers;
}

/** Bytes of the file that the service has, by its last answer; 0 when it does not say. */
long long Received(APIHandler* api) {
    int64_t received = 0;
    if (api != nullptr) {
        json::toInt64(AnswerHeader(*api, kReceived), received);
    }
    return std::max<int64_t>(received, 0);
}

}  // namespace

bool OneDrive::StartUploadSession(const std::string& url, std::string& session) {
    // A step of an upload, which has the last word about an answer without an id.
    return Barrier(*this, [&] {
        Request request(*this, kFrame);
        request.To(kBitsMethod, url)
            .Header(kPacketType, "Create-Session")
            .Header(kSupportedProtocols, kBitsProtocol)
            .Retries(0);
        if (!request.Send()) {
            return false;
        }
        const std::string id = AnswerHeader(*api, kSessionId);
        if (!id.empty()) {
            session = id;
        }
        return !id.empty();
    });
}

bool OneDrive::CloseUploadSession(const std::string& url, const std::string& session) {
    Request request(*this, kFrame);
    request.To(kBitsMethod, url)
        .Header(kPacketType, "Close-Session")
        .Header(kSessionId, session)
        .Header("Content-Length", 0)
        .Retries(0);
    return request.Send() && HasTaken();
}

bool OneDrive::StartUpload(XferData* xfer, const std::string& url, const std::string& session,
                           long long* offset, long long length, long long total) {
    return Guard(*this, [&] {
        const std::string range = RangeText(*offset, length, total);
        // The service's word counts, however the request ended: that is where a repeat begins.
        const ScopeExit move_on([&] {
            const long long received = Received(api);
            const long long sent = *offset + length;
            if (received > sent) {
                LOG_ERROR("Wrong size, %llu, %llu", static_cast<unsigned long long>(received),
                          static_cast<unsigned long long>(sent));
            }
            *offset = OffsetBehind(*offset, length, received);
        });
        Request request(*this, kFrame);
        request.To(kBitsMethod, url)
            .Header(kPacketType, "Fragment")
            .Header(kSessionId, session)
            .Header("Content-Length", static_cast<Json::Int64>(length))
            .Header("Content-Range", range);
        return request.Prepare(xfer) && SendFragment(xfer, url, length);
    });
}

bool OneDrive::SendFragment(XferData* xfer, const std::string& url, long long length) {
    if (xfer == nullptr || xfer->context == nullptr || !api->SetUploadOpt(false) ||
        // With the length as a header alone the body would go out in chunks, too.
        !api->SetUploadSize(length)) {
        SetError(VFS_ERR_CLOUD_FAILED, "");
        return false;
    }
    xfer->context->chunk_size = static_cast<unsigned int>(length);
    xfer->context->chunk_left = static_cast<unsigned int>(length);
    if (SendUpload(*this, *xfer, static_cast<uint64_t>(length))) {
        return HasTaken();
    }
    SetError(api->GetError());
    LOG_ERROR(kRequestFailed, LoggableUrl(url).c_str(), json::toString(GetError()).c_str());
    LOG_ERROR("%s", json::toString(LoggableHeaders(api->GetHeaderResponse())).c_str());
    return false;
}

namespace {

/** One file on its way through a session. */
class Fragments {
  public:
    Fragments(OneDrive& drive, XferData& xfer, const std::string& url, const std::string& session,
              long long total)
        : drive_(drive),
          xfer_(xfer),
          url_(url),
          session_(session),
          total_(total),
          source_begin_(SourceBegin(*xfer.context)),
          cursor_(total) {}

    bool Send(long long length) {
        if (cursor_.IsSourceElsewhere() && !ReturnToOffset()) {
            return false;
        }
        cursor_.BeginFragment(length);
        if (!SendWithRetries(length)) {
            return false;
        }
        const long long rest = cursor_.RestOfFragment(Received(drive_.GetAPIHandler()));
        return rest == 0 || (SeekToOffset() && SendWithRetries(rest));
    }

    /** Whether a file of a size that was guessed is no longer than that: closed, it would count as
     * whole. */
    bool EndsHere() {
        if (IsAtEnd(xfer_)) {
            return true;
        }
        drive_.SetError(VFS_ERR_NOT_SUPPORTED, "");
        LOG_ERROR(
            "The service takes no file of unknown size, and this one has more than %lld bytes",
            total_);
        return false;
    }

    /** What the service has stored short: the count of fragments is that of the file, so that what
     * is said again for one is missing at the end. Closed before, the session would be the file. */
    bool SendRest() {
        while (!cursor_.IsWhole()) {
            const long long before = cursor_.Offset();
            LOG_ERROR("The service has %lld of %lld bytes", before, total_);
            if (!Send(std::min<long long>(kMostAtOnce, total_ - before))) {
                return false;
            }
            if (cursor_.Offset() <= before) {
                drive_.SetError(VFS_ERR_TRANSFER_ABORTED, "");
                return false;
            }
        }
        return true;
    }

    bool Close() { return drive_.CloseUploadSession(url_, session_); }

  private:
    static constexpr const char* kRefused = "Chunk upload failed and do not retry";

    bool SendWithRetries(long long length) {
        AttemptPlan plan;
        plan.send = [this, length] { return SendOnce(length); };
        plan.judge = [this](__tag_vfs_err_ code) {
            // Going back to where the service wants to go on cures a wrong range.
            return JudgeRenewing(drive_, *xfer_.context, code, code == VFS_ERR_RANGE_FAILED);
        };
        plan.rewind = [this] {
            cursor_.AdoptServerOffset(Received(drive_.GetAPIHandler()));
            return SeekToOffset();
        };
        plan.copy = CopyError::kAtEnd;
        plan.retry = "Retry chunk upload";
        plan.refused = kRefused;
        plan.exhausted = kNoAttemptLeft;
        plan.what = &url_;
        // The handler, whose error counts, knows of none behind a status below 400.
        plan.unexplained = VFS_ERR_TRANSFER_ABORTED;
        return RunAttempts(drive_, plan);
    }

    bool SendOnce(long long length) {
        const long long size = cursor_.BeginAttempt(length);
        if (size == 0) {
            return true;
        }
        long long offset = cursor_.Offset();
        const bool done = drive_.StartUpload(&xfer_, url_, session_, &offset, size, total_);
        cursor_.MoveTo(offset);
        return done;
    }

    bool SeekToOffset() {
        cursor_.SourceIsAtOffset();
        if (SeekSource(xfer_.context->fd, source_begin_, cursor_.Offset(),
                       "Failed to seek file to back to last position, %m")) {
            return true;
        }
        drive_.SetError(drive_.GetAPIHandler()->GetError());
        return false;
    }

    /** The service has stored less than it was sent, and the next fragment begins there. */
    bool ReturnToOffset() {
        if (xfer_.context->fd != -1) {
            return SeekToOffset();
        }
        // What it lacks of a stream is gone, and what follows must not take its place.
        drive_.SetError(VFS_ERR_RANGE_FAILED, "");
        LOG_ERROR("%s", kRefused);
        return false;
    }

    OneDrive& drive_;
    XferData& xfer_;
    const std::string& url_;
    const std::string& session_;
    const long long total_;
    const off64_t source_begin_;  ///< position of the file's first byte
    FragmentCursor cursor_;
};

}  // namespace

bool OneDrive::ChunkedUpload(XferData* xfer, const Json::Value& meta) {
    return Guard(*this, [&] {
        const std::string url = meta.get("url", "").asString();
        const UploadSize size(meta);
        const int64_t total = FileSize(meta, size);
        std::string session;
        if (url.empty() || xfer == nullptr || xfer->context == nullptr ||
            !StartUploadSession(url, session)) {
            return false;
        }
        if (total < 0) {
            LOG_ERROR("Wrong size when uploading");
            return false;
        }
        // A source that counts to the end of its request must not count for us.
        xfer->context->limited = size.known;
        Fragments file(*this, *xfer, url, session, total);
        return ForEachChunk(
            static_cast<unsigned long long>(total), kMostAtOnce,
            [&](unsigned long long length) { return file.Send(static_cast<long long>(length)); },
            [&] { return file.SendRest() && (size.known || file.EndsHere()) && file.Close(); });
    });
}

}  // namespace ZYROCloud
