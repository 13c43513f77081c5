#include "gzip.h"

#include <zlib.h>

#include <cstring>

namespace web {

bool TakesGzip(const char* accept_encoding) {
    return accept_encoding != nullptr && strstr(accept_encoding, "gzip") != nullptr &&
           strstr(accept_encoding, "gzip;q=0") == nullptr;
}

std::string Gzip(const std::string& text) {
    constexpr int kGzipWindow = 15 + 16;
    constexpr int kMemory = 8;
    z_stream stream{};
    if (deflateInit2(&stream, Z_DEFAULT_COMPRESSION, Z_DEFLATED, kGzipWindow, kMemory,
                     Z_DEFAULT_STRATEGY) != Z_OK) {
        return "";
    }
    std::string out(deflateBound(&stream, text.size()), '\0');
    // zlib takes what it does not change by a pointer to what it could.
    stream.next_in = reinterpret_cast<Bytef*>(const_cast<char*>(text.data()));
    stream.avail_in = static_cast<uInt>(text.size());
    stream.next_out = reinterpret_cast<Bytef*>(out.data());
    stream.avail_out = static_cast<uInt>(out.size());
    const bool whole = deflate(&stream, Z_FINISH) == Z_STREAM_END;
    out.resize(whole ? stream.total_out : 0);
    deflateEnd(&stream);
    return out;
}

}  // namespace web
