#include <algorithm>
#include <cerrno>
#include <climits>
#include <cstdio>
#include <cstring>

#include "cloud/guard.h"
#include "cloud/relay.h"
#include "cloud/relay_stdin.h"
#include "cloud/transfer.h"
#include "cloud/upload_body.h"
#include "core/error_cell.h"
#include "core/handle.h"
#include "core/log.h"
#include "http/error_handler_table.h"

namespace ZYROCloud {

using namespace ZYROVFS;

RelayUpload relay_upload;

namespace {

constexpr int kFailed = -9;
/** What a read function gives libcurl for a failed read: more than it has room for. */
constexpr size_t kReadFailed = static_cast<size_t>(-1);
constexpr size_t kMostAtOnce = 131072;
/** Of the boundary's text with the line break in front and a NUL behind. */
constexpr size_t kBoundaryRoom = 256;

_tag_cgi_upload_progress_& Progress() {
    return *relay_upload.progress;
}

/** Bytes of the request that were not consumed yet. */
unsigned long long BytesAhead() {
    return Progress().total - std::min(Progress().current, Progress().total);
}

/** No more than libcurl has room for; drivers give it an upload buffer for the most at once. */
size_t Wanted(size_t room, const XferContext& context) {
    size_t want = std::min(room, kMostAtOnce);
    if (relay_upload.speed_cb != nullptr) {
        const auto value = static_cast<unsigned long long>(
            relay_upload.speed_cb(relay_upload.last_read, Progress().current, Progress().total));
        want = value == 0 || value > room ? room : static_cast<size_t>(value);
    }
    return context.limited ? std::min<size_t>(want, context.chunk_left) : want;
}

ssize_t ReadInput(char* data, size_t size) {
    return RelayStdinRead(relay_upload.stdin_fd, data, size, &Progress().error);
}

/** Never reads into the tail, so that all of it is searched. */
size_t ReadAhead(char* data, size_t want) {
    const unsigned long long ahead = relay_upload.tail_start - Progress().current;
    const ssize_t n =
        ReadInput(data, static_cast<size_t>(std::min<unsigned long long>(want, ahead)));
    if (n < 0) {
        return kReadFailed;
    }
    if (n == 0) {
        // As the end of the file it would leave a part in the place of the whole.
        LOG_ERROR("The request ended %llu bytes before its length", BytesAhead());
        SetPlatformErr(kPlatformShort);
        return CURL_READFUNC_ABORT;
    }
    return static_cast<size_t>(n);
}

/** Reads the rest of the request and finds the end of the file in it. */
bool LoadTail(XferContext& context) {
    RelayTail& tail = relay_upload.tail;
    if (!tail.Load(static_cast<size_t>(BytesAhead()), ReadInput) ||
        !tail.CutAt(relay_upload.boundary)) {
        return false;
    }
    Progress().current += tail.Behind();
    if (relay_upload.file_size == -1) {
        if (context.limited) {
            // The driver counts to the end of the request.
            context.chunk_left -=
                static_cast<unsigned int>(std::min<size_t>(tail.Behind(), context.chunk_left));
        }
        return true;
    }
    const unsigned long long size = relay_upload.delivered + tail.Left();
    if (size != static_cast<unsigned long long>(relay_upload.file_size)) {
        LOG_ERROR("Wrong size, %llu, %lld", size, relay_upload.file_size);
        return false;
    }
    return true;
}

/** Up to `want` bytes of the file, 0 at its end; kReadFailed or CURL_READFUNC_ABORT. */
size_t Read(XferContext& context, char* data, size_t want) {
    if (relay_upload.failed) {
        return CURL_READFUNC_ABORT;
    }
    if (want == 0) {
        return 0;  // what is ahead is the next piece's
    }
    if (Progress().current < relay_upload.tail_start) {
        return ReadAhead(data, want);
    }
    if (!relay_upload.tail.IsLoaded()) {
        if (!LoadTail(context)) {
            return CURL_READFUNC_ABORT;
        }
        want = context.limited ? std::min<size_t>(want, context.chunk_left) : want;
    }
    return relay_upload.tail.Take(data, want);
}

/** A failed read leaves the counters as they are. */
void Count(XferContext& context, size_t n) {
    relay_upload.last_read = static_cast<int>(n);
    relay_upload.delivered += n;
    Progress().current += n;
    if (relay_upload.transferred != nullptr) {
        *relay_upload.transferred += n;
    }
    if (context.limited) {
        context.chunk_left -= static_cast<unsigned int>(n);
    }
    if (relay_upload.progress_cb != nullptr) {
        relay_upload.progress_cb(Progress().current, Progress().total);
    }
}

bool FailWith(__tag_vfs_err_ code) {
    relay_upload.cloud->SetError(code, "");
    return false;
}

/** Whether a file of that size can lie in the request: what follows it must fit into the tail. */
bool IsSizePossible() {
    const auto current = Progress().current;
    const auto total = Progress().total;
    if (current > total || total > LLONG_MAX) {
        return false;
    }
    if (relay_upload.file_size == -1) {
        return true;
    }
    const auto size = static_cast<unsigned long long>(relay_upload.file_size);
    return relay_upload.file_size >= 0 && size <= total - current &&
           current + size >= relay_upload.tail_start;
}

/** Whether the driver has got the file to its last byte, whatever it says itself: a driver that
 * was told too small a size leaves the rest, and one that fails to read may take that for the end.
 */
bool IsAtEnd() {
    XferContext context;
    char byte = 0;
    return Read(context, &byte, 1) == 0;
}

Json::Value Describe() {
    Json::Value meta(Json::objectValue);
    relay_upload.cloud->GetMetaDataByURI(relay_upload.uri, meta, "Upload");
    meta["total_bytes"] = static_cast<Json::Int64>(transfer.bytes_total);
    meta["filesize"] = static_cast<Json::Int64>(relay_upload.file_size);
    if (relay_upload.file_size == -1) {
        // Nothing but "--" and a line break behind the boundary, when the file is the last field.
        const unsigned long long closing = relay_upload.boundary.size() + 4;
        meta[kLikelyBytes] =
            static_cast<Json::Int64>(BytesAhead() - std::min(closing, BytesAhead()));
    }
    return meta;
}

bool Send() {
    if (!IsSizePossible()) {
        LOG_ERROR("Wrong size, %llu, %llu, %lld", Progress().current, Progress().total,
                  relay_upload.file_size);
        return FailWith(VFS_ERR_BAD_REQUEST);
    }
    XferContext context;
    XferData xfer{RelayReadCallback, 1, &context};
    if (!relay_upload.cloud->Upload(&xfer, Describe())) {
        return relay_upload.cloud->GetErrorCode() == VFS_ERR_NONE &&
               FailWith(VFS_ERR_TRANSFER_ABORTED);
    }
    if (!IsAtEnd()) {
        LOG_ERROR("Upload left out a part of the file, %llu", relay_upload.delivered);
        return FailWith(VFS_ERR_TRANSFER_ABORTED);
    }
    return true;
}

}  // namespace

size_t RelayReadCallback(char* data, size_t size, size_t count, void* opaque) {
    auto* context = static_cast<XferContext*>(opaque);
    if (context == nullptr || data == nullptr || relay_upload.progress == nullptr ||
        IsStopAsked()) {
        return CURL_READFUNC_ABORT;
    }
    const size_t n = Read(*context, data, Wanted(size * count, *context));
    if (n == kReadFailed || n == CURL_READFUNC_ABORT) {
        relay_upload.failed = true;
        return YLIBCErrGet() == kPlatformCancelled ? CURL_READFUNC_ABORT : n;
    }
    Count(*context, n);
    return n;
}

bool Cloud::RelayUploadInit(Cloud* cloud, const char* uri, _tag_cgi_upload_progress_* progress,
                            const char* boundary, RelayProgressCallback relay_progress,
                            CancelCallback cancel, RelaySpeedCallback speed,
                            unsigned long long* transferred, long long size) {
    relay_upload = RelayUpload();
    if (progress == nullptr) {
        return false;
    }
    progress->error = 0;
    if (cloud == nullptr || uri == nullptr || boundary == nullptr || *boundary == '\0') {
        progress->error = kFailed;
        LOG_ERROR("An upload needs a driver, a target and a boundary");
        return false;
    }
    const unsigned long long total = progress->total;
    relay_upload.cloud = cloud;
    relay_upload.uri = uri;
    relay_upload.progress = progress;
    relay_upload.progress_cb = relay_progress;
    relay_upload.speed_cb = speed;
    relay_upload.transferred = transferred;
    relay_upload.tail_start = total > RelayTail::kSize ? total - RelayTail::kSize : 0;
    relay_upload.boundary = (std::string("\r\n") + boundary).substr(0, kBoundaryRoom - 1);
    relay_upload.file_size = size;
    BeginTransfer(size == -1 ? total : static_cast<unsigned long long>(size),
                  {nullptr, cancel, nullptr});
    relay_upload.stdin_fd = fileno(stdin);
    if (relay_upload.stdin_fd < 0) {
        progress->error = kFailed;
        LOG_ERROR("failed to get fileno of stdin, errno=%s", strerror(errno));
        relay_upload = RelayUpload();
        return false;
    }
    return true;
}

bool Cloud::RelayUploadFile() {
    if (relay_upload.cloud == nullptr) {
        LOG_ERROR("No upload is prepared");
        return false;
    }
    const ScopeExit forget([] { relay_upload = RelayUpload(); });
    const bool sent = Guard(*relay_upload.cloud, Send);
    if (!sent && Progress().error != kSilentInput) {
        Progress().error = GetUploadErrorCode(relay_upload.cloud);
    }
    return sent;
}

}  // namespace ZYROCloud
