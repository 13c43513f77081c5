#include "cloud/upload_body.h"

#include <unistd.h>

#include "core/json.h"

namespace ZYROCloud {

uint64_t TotalBytes(const Json::Value& meta) {
    uint64_t total = 0;
    ZYROVFS::json::toUInt64(meta["total_bytes"], total);
    return total;
}

UploadBody::UploadBody(const XferData& xfer)
    : xfer_(xfer),
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
    auto& self = *static_cast<UploadBody*>(body);
    const size_t got = self.xfer_.callback(data, size, count, self.xfer_.context);
    self.read_ = self.read_ || got != 0;
    return got;
}

bool UploadBody::GoTo(curl_off_t offset) const {
    if (!IsFile()) {
        return offset == 0 && !read_;
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
    return true;
}

int UploadBody::Seek(void* body, curl_off_t offset, int origin) {
    const auto& self = *static_cast<UploadBody*>(body);
    return origin == SEEK_SET && offset >= 0 && self.GoTo(offset) ? CURL_SEEKFUNC_OK
                                                                  : CURL_SEEKFUNC_CANTSEEK;
}

bool SendUpload(Cloud& cloud, const XferData& xfer) {
    APIHandler* api = cloud.GetAPIHandler();
    if (api == nullptr || xfer.context == nullptr) {
        return false;
    }
    UploadBody body(xfer);
    if (api->IsForm()) {
        body.GiveRewindTo(*api);
    } else {
        body.GiveTo(*api);
    }
    const bool sent = api->Process(0);
    api->ForgetSeek();
    if (!api->IsForm()) {
        api->SetReadFunAndData(xfer.callback, xfer.context);
    }
    return sent;
}

AttemptPlan WholeUploadPlan(Cloud& cloud, const XferData& xfer, const std::string& what,
                            ZYROVFS::SourceLine at) {
    AttemptPlan plan;
    plan.send = [&cloud, &xfer] { return SendUpload(cloud, xfer); };
    plan.judge = [&cloud, &xfer](__tag_vfs_err_) { return JudgeUpload(cloud, *xfer.context); };
    plan.rewind = [&xfer, at] {
        return SeekSource(xfer.context->fd, 0, "Failed to seek file to back to zero position, %m",
                          at);
    };
    plan.retry = "Retry directly upload";
    plan.exhausted = kNoAttemptLeft;
    plan.what = &what;
    return plan;
}

}  // namespace ZYROCloud
