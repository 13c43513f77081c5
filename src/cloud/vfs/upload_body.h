/**
 * The bytes of one upload as libcurl takes them. A server of a user's own asks for a password only
 * when the request is there, and a connection may break in the middle: both times the body is
 * wanted once more from its start. A file can give it again. What came through a stream is gone;
 * sending on from the middle would leave a broken file that counts as sent.
 */
#ifndef ZYROVFS_CLOUD_UPLOAD_BODY_H
#define ZYROVFS_CLOUD_UPLOAD_BODY_H

#include "http/api_handler.h"
#include "zyrovfs/cloud.h"

namespace ZYROCloud {

class UploadBody {
  public:
    explicit UploadBody(const XferData& xfer);
    UploadBody(const UploadBody&) = delete;
    UploadBody& operator=(const UploadBody&) = delete;

    /** Must outlive the request. */
    void GiveTo(APIHandler& api);

  private:
    bool IsFile() const { return start_ >= 0; }
    static size_t Read(char* data, size_t size, size_t count, void* body);
    static int Seek(void* body, curl_off_t offset, int origin);

    const XferData& xfer_;
    off64_t start_;      ///< position of the body's first byte; negative for a stream
    bool read_ = false;  ///< some of it went
};

}  // namespace ZYROCloud

#endif
