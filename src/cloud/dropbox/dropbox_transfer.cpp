#include <unistd.h>

#include "cloud/attempt.h"
#include "cloud/dropbox/dropbox.h"
#include "cloud/dropbox/dropbox_api.h"
#include "cloud/guard.h"
#include "cloud/request.h"
#include "cloud/upload_body.h"
#include "core/json.h"
#include "core/log.h"
#include "http/api_handler.h"
#include "zyrovfs/cloud_utils.h"

namespace ZYROCloud {

using namespace ZYROVFS;
using namespace dropbox;

namespace {

// What the content side needs to show a file that the other side has just taken.
constexpr unsigned kLookAfter = 3;
constexpr int kCatchUp = 10;

std::string ServerPath(const Json::Value& meta) {
    return meta.get("server_path", "").asString();
}

bool HasSource(const XferData* xfer) {
    return xfer != nullptr && xfer->context != nullptr;
}

/** Names a place in an upload session. */
Json::Value At(const std::string& session, unsigned long long offset) {
    Json::Value argument;
    argument["cursor"]["session_id"] = session;
    argument["cursor"]["offset"] = static_cast<Json::UInt64>(offset);
    return argument;
}

bool PrepareUpload(Cloud& cloud, Request& request, XferData* xfer) {
    if (!request.Prepare(xfer)) {
        return false;
    }
    if (!cloud.GetAPIHandler()->SetUploadOpt(false)) {
        cloud.SetError(VFS_ERR_CLOUD_FAILED, "");
        return false;
    }
    return true;
}

}  // namespace

bool Dropbox::UploadProcess(XferData* xfer, const Json::Value& meta) {
    return Guard(*this, [&] {
        return UploadSize(meta).total <= kLargestDirect ? DirectUpload(xfer, meta)
                                                        : ChunkedUpload(xfer, meta);
    });
}

bool Dropbox::DirectUpload(XferData* xfer, const Json::Value& meta) {
    return Guard(*this, [&] {
        const std::string path = ServerPath(meta);
        if (path.empty() || !HasSource(xfer)) {
            SetError(VFS_ERR_NOT_FOUND, "");
            return false;
        }
        Json::Value argument;
        argument["path"] = Utils::EscapeDoubleQuote(path);
        argument["mode"] = "add";
        argument["autorename"] = true;
        Request request(*this, kContentFrame);
        request.To("POST", Content("upload")).Header("Expect", "").Header(kArgument, argument);
        if (!PrepareUpload(*this, request, xfer)) {
            return false;
        }
        AttemptPlan plan = WholeUploadPlan(*this, *xfer, path);
        plan.refused = "Directly upload failed and do not retry";
        return RunAttempts(*this, plan);
    });
}

bool Dropbox::ChunkedUpload(XferData* xfer, const Json::Value& meta) {
    // A step of an upload, which has the last word where there is nothing to send.
    return Barrier(*this, [&] {
        const std::string path = ServerPath(meta);
        const UploadSize size(meta);
        const unsigned long long total = size.total;
        std::string session;
        if (path.empty() || !HasSource(xfer) || !StartChunkUploadSession(session)) {
            return false;
        }
        xfer->context->limited = true;
        if (!size.known) {
            return SendToEnd(xfer, session, path);
        }
        unsigned long long offset = 0;
        unsigned long long arrived = 0;
        SentBytes sent;
        const auto send = [&](unsigned long long length) {
            const bool done = SendChunk(xfer, session, path, &offset, length, sent);
            arrived += sent.count;
            return done;
        };
        const auto finish = [&] {
            // A piece that was left out for its wrong place has moved the offset alone.
            if (offset != total || arrived != total) {
                LOG_ERROR("upload size is not match");
                SetError(arrived < offset ? VFS_ERR_RANGE_FAILED : VFS_ERR_TRANSFER_ABORTED, "");
                return false;
            }
            return CommitChunkUpload(session, path, total);
        };
        return ForEachChunk(total, kLargestDirect, send, finish);
    });
}

/** A source that just ends: its size is what was sent when it has. */
bool Dropbox::SendToEnd(XferData* xfer, const std::string& session, const std::string& path) {
    unsigned long long offset = 0;
    SentBytes sent;
    while (!sent.ended) {
        if (!SendChunk(xfer, session, path, &offset, kLargestDirect, sent)) {
            return false;
        }
    }
    return CommitChunkUpload(session, path, offset);
}

bool Dropbox::StartChunkUploadSession(std::string& out) {
    return Guard(*this, [&] {
        Json::Value answer;
        // The service wants an argument even of calls that need none.
        if (!Request(*this, kContentFrame)
                 .To("POST", Content("upload_session/start"))
                 .Header(kArgument, Json::Value(Json::objectValue))
                 .Send(answer)) {
            return false;
        }
        if (!answer.isMember("session_id")) {
            SetError(VFS_ERR_CLOUD_FAILED, "");
            LOG_ERROR("No upload id in response, %s", api->GetResponse().c_str());
            return false;
        }
        out = answer["session_id"].asString();
        return true;
    });
}

bool Dropbox::SendChunk(XferData* xfer, const std::string& session, const std::string& path,
                        unsigned long long* offset, unsigned long long size, SentBytes& sent) {
    const XferContext& context = *xfer->context;
    AttemptPlan plan;
    plan.send = [&] { return SendAt(xfer, session, offset, size, sent); };
    plan.judge = [&](__tag_vfs_err_ code) {
        return JudgeUpload(*this, context, code == VFS_ERR_RANGE_FAILED);
    };
    plan.rewind = [&, begin = SourceBegin(context, *offset)] {
        return SeekSource(context.fd, begin, static_cast<off64_t>(*offset),
                          "Failed to seek file to back to last position, %m");
    };
    plan.copy = CopyError::kNever;  // StartChunkUpload has left the driver's record as it must be
    plan.retry = "Retry chunk upload";
    plan.refused = "Chunk upload failed and do not retry";
    plan.exhausted = kNoAttemptLeft;
    plan.what = &path;
    return RunAttempts(*this, plan);
}

bool Dropbox::StartChunkUpload(XferData* xfer, const std::string& session,
                               unsigned long long* offset, unsigned long long size) {
    SentBytes sent;
    return SendAt(xfer, session, offset, size, sent);
}

bool Dropbox::SendAt(XferData* xfer, const std::string& session, unsigned long long* offset,
                     unsigned long long size, SentBytes& sent) {
    return Guard(*this, [&] {
        if (!HasSource(xfer) || offset == nullptr) {
            SetError(VFS_ERR_CLOUD_FAILED, "");
            return false;
        }
        xfer->context->chunk_size = xfer->context->chunk_left = static_cast<unsigned int>(size);
        const std::string url = Content("upload_session/append_v2");
        Request request(*this, kContentFrame);
        request.To("POST", url).Header(kArgument, At(session, *offset));
        if (!PrepareUpload(*this, request, xfer)) {
            return false;
        }
        if (SendUpload(*this, *xfer, kSizeNotKnown, &sent)) {
            *offset += sent.count;
            return true;
        }
        SetError(api->GetError());
        LOG_ERROR(kRequestFailed, url.c_str(), json::toString(GetError()).c_str());
        // Callers go on behind a piece that the service found in the wrong place: it has it.
        if (GetErrorCode() == VFS_ERR_RANGE_FAILED) {
            *offset += size;
        }
        return false;
    });
}

bool Dropbox::CommitChunkUpload(const std::string& session, const std::string& path,
                                unsigned long long total) {
    return Guard(*this, [&] {
        Json::Value argument = At(session, total);
        argument["commit"]["path"] = path;
        Request request(*this, kContentFrame);
        request.To("POST", Content("upload_session/finish")).Header(kArgument, argument);
        if (!request.Prepare()) {
            return false;
        }
        if (!api->Process(6)) {
            SetError(api->GetError());
            LOG_ERROR("Failed to process curl for path %s, err:%s", path.c_str(),
                      json::toString(GetError()).c_str());
            return false;
        }
        return true;
    });
}

bool Dropbox::DownloadProcess(XferData* xfer, const Json::Value& meta) {
    return Guard(*this, [&] {
        const std::string path = meta.isMember("server_path")
                                     ? ServerPath(meta)
                                     : GetServerPathBySharePath(meta.get("url", "").asString());
        if (!HasSource(xfer)) {
            SetError(VFS_ERR_CLOUD_FAILED, "");
            return false;
        }
        const std::string url = Content("download");
        AttemptPlan plan = DownloadPlan(*this, *xfer, url);
        plan.prepare = [&] { return PrepareDownload(xfer, meta, path); };
        plan.send = [&] { return api->Process(0); };
        plan.judge = [&, judge = plan.judge](__tag_vfs_err_ code) {
            if (code != VFS_ERR_NOT_FOUND) {
                return judge(code);
            }
            return IsThere(path) ? NextStep::RetryAfter(kCatchUp) : NextStep::End();
        };
        plan.copy = CopyError::kAfterCancelTest;
        plan.first_number = 1;
        return RunAttempts(*this, plan);
    });
}

/** Of a file that the content side does not have. */
bool Dropbox::IsThere(const std::string& path) {
    const Json::Value missing = GetError();
    sleep(kLookAfter);
    Json::Value info;
    if (GetFileInfo(path, Json::Value(), info)) {
        return true;
    }
    // A refusal without its body, as they all are behind a download: the first one had it.
    if (GetErrorCode() == VFS_ERR_BAD_REQUEST) {
        SetError(missing);
    }
    return false;
}

bool Dropbox::PrepareDownload(XferData* xfer, const Json::Value& meta, const std::string& path) {
    Json::Value argument;
    argument["path"] = Utils::EscapeDoubleQuote(path);
    // The handler stays set to fail on errors: later refusals on this driver have no body.
    Request request(*this, kContentFrame);
    request.To("POST", Content("download")).Header("Expect", "").Header(kArgument, argument);
    if (!request.FailOnError().Prepare(xfer)) {
        return false;
    }
    // Of this request's own refusal the body is wanted: it tells a file that is not there yet.
    if (!api->KeepRefusal() || !SetRange(*this, meta)) {
        SetError(VFS_ERR_CLOUD_FAILED, "");
        return false;
    }
    return true;
}

}  // namespace ZYROCloud
