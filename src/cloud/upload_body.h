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
#include "cloud/size_limit.h"
#include "http/api_handler.h"
#include "zyrovfs/cloud.h"

namespace ZYROCloud {

/** Member of an upload's metadata: size of a source that is not known, if all is as usual. */
inline constexpr const char* kLikelyBytes = "likely_bytes";

/**
 * What a driver knows of the bytes that it is to send. "filesize" -1 is a source that just ends;
 * "total_bytes" is then the most that may come, such as the length of a browser's request, or -1,
 * too. Announced as the size of the file it would be a lie.
 */
struct UploadSize {
    /** Json::LogicError when `meta` is no object. */
    explicit UploadSize(const Json::Value& meta);

    bool known;
    uint64_t total;  ///< kSizeNotKnown for no bound at all; 0 without the member
};

/** Bytes of a source that went out with a request. */
struct SentBytes {
    uint64_t count = 0;
    bool ended = false;  ///< the source has no more
};

class UploadBody {
  public:
    /** The body begins at the source's position of now. `announced` bytes are taken, no more, and
     * fewer end the request: the service would wait for the rest. */
    explicit UploadBody(const XferData& xfer, uint64_t announced = kSizeNotKnown);
    UploadBody(const UploadBody&) = delete;
    UploadBody& operator=(const UploadBody&) = delete;

    /** Must outlive the request. */
    void GiveTo(APIHandler& api);
    /** For a form, which reads the source by itself; a stream is left alone. */
    void GiveRewindTo(APIHandler& api);

    /** Of a body that was given whole; a form's is not counted. */
    const SentBytes& Sent() const { return sent_; }

  private:
    bool IsFile() const { return start_ >= 0; }
    bool GoTo(curl_off_t offset);
    size_t ReadPiece(char* data, size_t room);
    static size_t Read(char* data, size_t size, size_t count, void* body);
    static int Seek(void* body, curl_off_t offset, int origin);

    const XferData& xfer_;
    const uint64_t announced_;
    off64_t start_;            ///< position of the body's first byte; negative for a stream
    unsigned int piece_left_;  ///< bytes of the piece at that time, in a source that is limited
    SentBytes sent_;
};

/** One attempt of an upload that a driver has described on its handler, as a plain body or as a
 * form: the bytes of `xfer` from its position on. `announced` and `sent` are for plain bodies. */
bool SendUpload(Cloud& cloud, const XferData& xfer, uint64_t announced = kSizeNotKnown,
                SentBytes* sent = nullptr);

/** Whether a source that was read up to here has no more; asks it for one byte. */
bool IsAtEnd(const XferData& xfer);

/**
 * The plan of an upload that is one request, and begins again where the source stands
 * now. What a
 * service does about refusals, and its `refused` line, are the driver's to add. `xfer` and `what`,
 * the log's name for the upload, must outlive the loop.
 */
AttemptPlan WholeUploadPlan(Cloud& cloud, const XferData& xfer, const std::string& what,
                            ZYROVFS::SourceLine at = ZYROVFS::SourceLine::Here());

}  // namespace ZYROCloud

#endif
