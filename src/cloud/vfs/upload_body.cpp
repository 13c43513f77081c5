#include "cloud/vfs/upload_body.h"

#include <unistd.h>

namespace ZYROCloud {

UploadBody::UploadBody(const XferData& xfer)
    : xfer_(xfer),
      start_(xfer.context == nullptr || xfer.context->fd == -1
                 ? -1
                 : lseek64(xfer.context->fd, 0, SEEK_CUR)) {}

void UploadBody::GiveTo(APIHandler& api) {
    if (xfer_.callback != nullptr) {
        api.SetReadFunAndData(Read, this);
        api.SetSeekFunAndData(Seek, this);
    }
}

size_t UploadBody::Read(char* data, size_t size, size_t count, void* body) {
    auto& self = *static_cast<UploadBody*>(body);
    const size_t got = self.xfer_.callback(data, size, count, self.xfer_.context);
    self.read_ = self.read_ || got != 0;
    return got;
}

int UploadBody::Seek(void* body, curl_off_t offset, int origin) {
    const auto& self = *static_cast<UploadBody*>(body);
    if (origin != SEEK_SET || offset < 0) {
        return CURL_SEEKFUNC_CANTSEEK;
    }
    if (self.IsFile()) {
        return lseek64(self.xfer_.context->fd, self.start_ + offset, SEEK_SET) < 0
                   ? CURL_SEEKFUNC_CANTSEEK
                   : CURL_SEEKFUNC_OK;
    }
    return offset == 0 && !self.read_ ? CURL_SEEKFUNC_OK : CURL_SEEKFUNC_CANTSEEK;
}

}  // namespace ZYROCloud
