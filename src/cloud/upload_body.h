/**
 * The bytes of one upload as libcurl takes them. A kept connection may turn out dead in the middle
 * of a body, and a server of a user's own asks for a password only when the request is there: both
 * times the body is wanted once more from where it began. A file can give it again, and a piece of
 * a file, too. What came through a stream is gone; sending on from the middle would leave a broken
 * file that counts as sent.
 */
#ifndef ZYROVFS_CLOUD_UPLOAD_BODY_H
#define ZYROVFS_CLOUD_UPLOAD_BODY_H

#include "cloud/attempt.h"
#include "http/api_handler.h"
#include "zyrovfs/cloud.h"

namespace ZYROCloud {

/** Bytes that an upload is to send, 0 without a number. Json::LogicError when `meta` is no object.
 */
uint64_t TotalBytes(const Json::Value& meta);

class UploadBody {
  public:
    /** The body begins at the source's position of now. */
    explicit UploadBody(const XferData& xfer);
    UploadBody(const UploadBody&) = delete;
    UploadBody& operator=(const UploadBody&) = delete;

    /** Must outlive the request. */
    void GiveTo(APIHandler& api);
    /** For a form, which reads the source by itself; a stream is left alone. */
    void GiveRewindTo(APIHandler& api);

  private:
    bool IsFile() const { return start_ >= 0; }
    bool GoTo(curl_off_t offset) const;
    static size_t Read(char* data, size_t size, size_t count, void* body);
    static int Seek(void* body, curl_off_t offset, int origin);

    const XferData& xfer_;
    off64_t start_;            ///< position of the body's first byte; negative for a stream
    unsigned int piece_left_;  ///< bytes of the piece at that time, in a source that is limited
    bool read_ = false;        ///< some of it went
};

/** One attempt of an upload that a driver has described on its handler, as a plain body or as a
 * form: the bytes of `xfer` from its position on. */
bool SendUpload(Cloud& cloud, const XferData& xfer);

/**
 * The plan of an upload that is one request, and begins again at the source's first byte. What a
 * service does about refusals, and its `refused` line, are the driver's to add. `xfer` and `what`,
 * the log's name for the upload, must outlive the loop.
 */
AttemptPlan WholeUploadPlan(Cloud& cloud, const XferData& xfer, const std::string& what,
                            ZYROVFS::SourceLine at = ZYROVFS::SourceLine::Here());

}  // namespace ZYROCloud

#endif
