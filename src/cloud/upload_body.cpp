#include "cloud/upload_body.h"

#include <unistd.h>

#include <algorithm>

#include "cloud/transfer.h"
#include "core/error_cell.h"
#include "core/json.h"
#include "core/log.h"

namespace ZYROCloud {

using namespace ZYROVFS;

UploadSize::UploadSize(const Json::Value& meta) : known(true), total(0) {
    int64_t source = 0;
    int64_t most = 0;
    json::toInt64(meta["filesize"], source);
    json::toUInt64(meta["total_bytes"], total);
    if (json::toInt64(meta["total_bytes"], most) && most < 0) {
        total = kSizeNotKnown;
    }
    known = source != -1 && total != kSizeNotKnown;
}

UploadBody::UploadBody(const XferData& xfer, uint64_t announced)
    : xfer_(xfer),
      announced_(announced),
      start_(xfer.context == nullptr || xfer.context->fd == -1
                 ? -1
                 : lseek64(xfer.context->fd, 0, SEEK_CUR)),
      piece_left_(xfer.context == nullptr ? 0 : xfer.context->chunk_left) {}

void UploadBody::GiveTo(APIHandler& api) {
    if (xfer_.callback != nullptr) {
        api.SetReadFunAndData(Read, this);
        api.SetSeekFunAndData(Seek, this);
    }
}

void UploadBody::GiveRewindTo(APIHandler& api) {
    if (IsFile()) {
        api.SetSeekFunAndData(Seek, this);
    }
}

size_t UploadBody::Read(char* data, size_t size, size_t count, void* body) {
    return static_cast<UploadBody*>(body)->ReadPiece(data, size * count);
}

size_t UploadBody::ReadPiece(char* data, size_t room) {
    const uint64_t left = announced_ - sent_.count;
    const auto want = static_cast<size_t>(std::min<uint64_t>(room, left));
    if (want == 0) {
        return 0;
    }
    const size_t got = xfer_.callback(data, 1, want, xfer_.context);
    if (got > want) {
        return got;  // a failure
    }
    const XferContext* context = xfer_.context;
    const bool paused = context != nullptr && context->limited && context->chunk_left == 0;
    sent_.count += got;
    sent_.ended = got == 0 && !paused;
    if (got == 0 && announced_ != kSizeNotKnown) {
        LOG_ERROR("The file ended %llu bytes before its size",
                  static_cast<unsigned long long>(left));
        SetPlatformErr(kPlatformShort);
        return CURL_READFUNC_ABORT;
    }
    return got;
}

bool UploadBody::GoTo(curl_off_t offset) {
    if (!IsFile()) {
        return offset == 0 && sent_.count == 0;
    }
    XferContext& context = *xfer_.context;
    if (context.limited && offset > static_cast<curl_off_t>(piece_left_)) {
        return false;
    }
    if (lseek64(context.fd, start_ + offset, SEEK_SET) < 0) {
        return false;
    }
    if (context.limited) {
        context.chunk_left = piece_left_ - static_cast<unsigned int>(offset);
    }
    sent_ = {static_cast<uint64_t>(offset), false};
    return true;
}

int UploadBody::Seek(void* body, curl_off_t offset, int origin) {
    auto& self = *static_cast<UploadBody*>(body);
    return origin == SEEK_SET && offset >= 0 && self.GoTo(offset) ? CURL_SEEKFUNC_OK
                                                                  : CURL_SEEKFUNC_CANTSEEK;
}

bool SendUpload(Cloud& cloud, const XferData& xfer, uint64_t announced, SentBytes* sent) {
    APIHandler* api = cloud.GetAPIHandler();
    if (api == nullptr || xfer.context == nullptr) {
        return false;
    }
    UploadBody body(xfer, announced);
    api->SetStopCheck(IsStopAsked);  // forms are not described by InitXferData
    if (api->IsForm()) {
        body.GiveRewindTo(*api);
    } else {
        body.GiveTo(*api);
    }
    const bool done = api->Process(0);
    api->ForgetSeek();
    if (!api->IsForm()) {
        api->SetReadFunAndData(xfer.callback, xfer.context);
    }
    if (sent != nullptr) {
        *sent = body.Sent();
    }
    return done;
}

bool IsAtEnd(const XferData& xfer) {
    char byte = 0;
    xfer.context->limited = false;
    return xfer.callback != nullptr && xfer.callback(&byte, 1, 1, xfer.context) == 0;
}

AttemptPlan WholeUploadPlan(Cloud& cloud, const XferData& xfer, const std::string& what,
                            ZYROVFS::SourceLine at) {
    AttemptPlan plan;
    plan.send = [&cloud, &xfer] { return SendUpload(cloud, xfer); };
    plan.judge = [&cloud, &xfer](__tag_vfs_err_) { return JudgeUpload(cloud, *xfer.context); };
    plan.rewind = [&xfer, at, begin = SourceBegin(*xfer.context)] {
        return SeekSource(xfer.context->fd, begin, 0,
                          "Failed to seek file to back to zero position, %m", at);
    };
    plan.retry = "Retry directly upload";
    plan.exhausted = kNoAttemptLeft;
    plan.what = &what;
    return plan;
}

}  // namespace ZYROCloud
