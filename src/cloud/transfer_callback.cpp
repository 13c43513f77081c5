#include <sys/types.h>
#include <unistd.h>
#include <zosplatform/file.h>
#include <zosplatform/process.h>

#include <algorithm>
#include <cerrno>
#include <charconv>
#include <cstdint>
#include <cstring>
#include <iterator>
#include <string_view>

#include "cloud/transfer.h"
#include "core/error_cell.h"
#include "core/log.h"
#include "http/error_handler_table.h"

namespace ZYROCloud {

using namespace ZYROVFS;

namespace {

constexpr long long kMostAtOnce = 131072;
constexpr unsigned int kPlatformFailed = 0x8000;

struct ErrnoRow {
    int error;
    unsigned int platform;
};

constexpr ErrnoRow kReadErrors[] = {{EBADF, 0x600}, {EIO, 0x600}, {EFAULT, 0x300}};
constexpr ErrnoRow kWriteErrors[] = {
    {EFAULT, 0x300}, {EIO, 0x600}, {EBADF, 0x600}, {ENOSPC, 0x2900}, {EDQUOT, 0x2400},
};

/** Sets the platform error for errno; one that is not in the table is logged. */
template <size_t N>
void ReportErrno(const ErrnoRow (&rows)[N], const char* text, SourceLine at) {
    const int error = errno;
    const auto* row = std::find_if(std::begin(rows), std::end(rows),
                                   [error](const ErrnoRow& r) { return r.error == error; });
    if (row != std::end(rows)) {
        SetPlatformErr(row->platform, at);
        return;
    }
    LOG_ERROR_AT(at, text, error, strerror(error));
    SetPlatformErr(kPlatformFailed, at);
}

unsigned long long Done() {
    return transfer.bytes_total - transfer.bytes_left;
}

// --- sending a file ------------------------------------------------------------------------------

size_t LimitSending(size_t want) {
    if (transfer.speed_cb != nullptr) {
        const long long value = transfer.speed_cb(want, Done());
        if (value > 0 && static_cast<unsigned long long>(value) <= want) {
            want = static_cast<size_t>(value);
        }
    }
    return want;
}

/** Position in a source whose end is known, -1 in any other. */
off64_t SourcePosition(int fd) {
    return transfer.source_end < 0 ? -1 : lseek64(fd, 0, SEEK_CUR);
}

/**
 * Copying from a page to a few bytes further within a page is half as fast on some processors, and
 * libcurl's buffer begins just so: behind the 16 bytes that malloc keeps in front of a mapping. One
 * piece that is half a page shorter moves all that follow out of step.
 */
size_t OutOfStep(const char* data, off64_t position, size_t want) {
    constexpr uintptr_t kPage = 4096;
    constexpr uintptr_t kClose = 256;
    const uintptr_t ahead = (reinterpret_cast<uintptr_t>(data) - position) % kPage;
    return ahead > 0 && ahead < kClose && want > 2 * kPage ? want - kPage / 2 : want;
}

size_t SendPiece(XferContext& context, char* data, size_t want) {
    if (IsStopAsked()) {
        return CURL_READFUNC_ABORT;
    }
    want = LimitSending(want);
    if (context.limited) {
        want = std::min<size_t>(want, context.chunk_left);
    }
    // What was announced is what is sent. A file that has grown would run into what follows the
    // body on the wire; one that has become shorter would leave the service waiting.
    const off64_t position = SourcePosition(context.fd);
    long long left = 0;
    if (position >= 0) {
        left = std::max(0LL, transfer.source_end - static_cast<long long>(position));
        want = std::min(OutOfStep(data, position, want), static_cast<size_t>(left));
    }
    const ssize_t n = ReadSource(context.fd, data, want);
    if (n < 0) {
        return CURL_READFUNC_ABORT;
    }
    if (n == 0 && want > 0 && left > 0) {
        LOG_ERROR("The file ended %lld bytes before its size", left);
        SetPlatformErr(kPlatformShort);
        return CURL_READFUNC_ABORT;
    }
    // By the position: a retry sends again what was counted before.
    transfer.bytes_left = position >= 0 ? static_cast<unsigned long long>(left - n)
                                        : transfer.bytes_left - static_cast<size_t>(n);
    if (context.limited) {
        context.chunk_left -= static_cast<unsigned int>(n);
    }
    if (transfer.progress_cb != nullptr) {
        transfer.progress_cb(static_cast<size_t>(n), Done());
    }
    return static_cast<size_t>(n);
}

// --- receiving -----------------------------------------------------------------------------------

bool ToBuffer(XferContext& context, const char* data, size_t size) {
    // Services are asked for one byte more than is wanted, and callers have room for it. One that
    // sends more than it was asked for does not get to write behind that.
    const unsigned long long room = transfer.bytes_total + 1;
    if (context.buffer_used > room || size > room - context.buffer_used) {
        LOG_ERROR("More data than asked for, %llu, %zu, %llu", context.buffer_used, size, room);
        return false;
    }
    memcpy(context.buffer + context.buffer_used, data, size);
    context.buffer_used += size;
    return true;
}

bool ToFile(int fd, const char* data, size_t size) {
    const ssize_t written = ZYROWriteFileFd(fd, data, size);
    if (written < 0) {
        ReportErrno(kWriteErrors, "Unable to writefile, errno=%d(%s)", SourceLine::Here());
        return false;
    }
    if (static_cast<size_t>(written) < size) {
        SetPlatformErr(kPlatformShort);
        return false;
    }
    return true;
}

bool Keep(XferContext& context, const char* data, size_t size) {
    if (context.fd == -1 && context.buffer != nullptr) {
        return ToBuffer(context, data, size);
    }
    if (context.fd != -1 && context.buffer == nullptr) {
        return ToFile(context.fd, data, size);
    }
    LOG_ERROR("Wrong callback data");
    return false;
}

size_t ReceivePiece(XferContext& context, const char* data, size_t size) {
    context.can_retry = false;
    if (transfer.answer.refused || IsStopAsked()) {
        return RefuseChunk(size);
    }
    if (transfer.answer.received == 0 && !BeginsWhereAsked(context.curl)) {
        return RefuseChunk(size);
    }
    LimitReceiving(size, Done(), context.curl);
    if (!Keep(context, data, size)) {
        return RefuseChunk(size);
    }
    transfer.answer.received += size;
    transfer.bytes_left -= size;
    if (transfer.progress_cb != nullptr) {
        transfer.progress_cb(size, Done());
    }
    return size;
}

// --- where an answer begins ----------------------------------------------------------------------

bool IsHttp(CURL* curl) {
    const char* scheme = nullptr;
    return curl_easy_getinfo(curl, CURLINFO_SCHEME, &scheme) == CURLE_OK && scheme != nullptr &&
           strncasecmp(scheme, "http", 4) == 0;
}

std::string_view HeaderOf(CURL* curl, const char* name) {
    curl_header* header = nullptr;
    return curl_easy_header(curl, name, 0, CURLH_HEADER, -1, &header) == CURLHE_OK ? header->value
                                                                                   : "";
}

/** First byte of a partial answer, from "bytes FIRST-LAST/SIZE". A service that honours a range
 * without naming it is believed. False for parts in envelopes, and for what cannot be read. */
bool PartBegin(CURL* curl, unsigned long long asked, unsigned long long& begin) {
    constexpr std::string_view kUnit = "bytes ";
    constexpr std::string_view kEnvelopes = "multipart/";
    std::string_view range = HeaderOf(curl, "Content-Range");
    if (range.empty()) {
        begin = asked;
        return HeaderOf(curl, "Content-Type").substr(0, kEnvelopes.size()) != kEnvelopes;
    }
    if (range.substr(0, kUnit.size()) != kUnit) {
        return false;
    }
    range.remove_prefix(kUnit.size());
    const auto [stop, error] = std::from_chars(range.data(), range.data() + range.size(), begin);
    return error == std::errc() && stop != range.data() + range.size() && *stop == '-';
}

}  // namespace

bool BeginsWhereAsked(void* curl) {
    constexpr long kPartialContent = 206;
    if (curl == nullptr || !IsHttp(curl)) {
        return true;  // the other protocols seek, or say that they cannot
    }
    long status = 0;
    curl_easy_getinfo(curl, CURLINFO_RESPONSE_CODE, &status);
    unsigned long long begin = 0;
    if (status == kPartialContent && !PartBegin(curl, transfer.answer.from, begin)) {
        LOG_ERROR("Unknown part of the file in the answer");
        return false;
    }
    if (begin != transfer.answer.from) {
        LOG_ERROR("Answer begins at %llu in place of %llu", begin, transfer.answer.from);
        return false;
    }
    return true;
}

bool IsStopAsked() {
    const pid_t watched = transfer.watched_pid;
    // A copy watches its own process, about which nobody needs to ask.
    const bool stop = (transfer.cancel_cb != nullptr && transfer.cancel_cb() != 0) ||
                      (watched != 0 && watched != transfer.own_pid && YLIBCProcAlive(watched) != 1);
    if (stop) {
        SetPlatformErr(kPlatformCancelled);
    }
    return stop;
}

ssize_t ReadSource(int fd, char* data, size_t size, SourceLine at) {
    ssize_t n = 0;
    do {
        n = read(fd, data, size);
    } while (n < 0 && errno == EINTR);
    if (n < 0) {
        ReportErrno(kReadErrors, "Unable to readfile, errno=%d(%s)", at);
    }
    return n;
}

size_t RefuseChunk(size_t size) {
    if (size == kWriteFailed && !transfer.answer.refused) {
        // The transfer goes on, and would end as a success with this chunk missing.
        transfer.answer.refused = true;
        transfer.answer.refused_for = YLIBCErrGet();
    }
    return kWriteFailed;
}

void LimitReceiving(size_t chunk, unsigned long long done, void* curl) {
    if (transfer.speed_cb == nullptr) {
        return;
    }
    long long value = transfer.speed_cb(chunk, done);
    if (value < 1 || value > kMostAtOnce) {
        value = kMostAtOnce;
    }
    if (curl != nullptr) {
        curl_easy_setopt(curl, CURLOPT_BUFFERSIZE, static_cast<long>(value));
    }
}

size_t FileReadCallback(char* data, size_t size, size_t count, void* context) {
    return context == nullptr ? CURL_READFUNC_ABORT
                              : SendPiece(*static_cast<XferContext*>(context), data, size * count);
}

size_t FileWriteCallback(char* data, size_t size, size_t count, void* context) {
    return context == nullptr
               ? RefuseChunk(size * count)
               : ReceivePiece(*static_cast<XferContext*>(context), data, size * count);
}

}  // namespace ZYROCloud
