#include <unistd.h>

#include <charconv>

#include "action.h"
#include "connection.h"
#include "failure.h"
#include "name.h"
#include "response.h"

namespace web {

using ZYROCloud::Cloud;

namespace {

/** First and last byte. */
struct Range {
    long long from;
    long long to;
};

/**
 * The one part that a header names, of a file of `size` bytes. False without a header, and for what
 * is answered with the whole file, as it may be: several parts, other units, a single byte, which
 * services cannot be asked for. Failure with status 416 for a part that is not there.
 */
bool ReadRange(const std::string& header, long long size, Range& range) {
    constexpr const char* kUnit = "bytes=";
    const size_t dash = header.find('-');
    if (header.rfind(kUnit, 0) != 0 || dash == std::string::npos ||
        header.find(',') != std::string::npos) {
        return false;
    }
    const std::string first = header.substr(6, dash - 6);
    const std::string last = header.substr(dash + 1);
    const auto read = [](const std::string& text, long long& number) {
        const auto [stop, error] = std::from_chars(text.data(), text.data() + text.size(), number);
        return error == std::errc() && stop == text.data() + text.size() && number >= 0;
    };
    long long number = 0;
    if (first.empty()) {
        if (!read(last, number)) {
            return false;
        }
        range = {number < size ? size - number : 0, size - 1};
    } else if (!read(first, range.from) || (!last.empty() && !read(last, range.to))) {
        return false;
    } else if (last.empty() || range.to >= size) {
        range.to = size - 1;
    }
    if (range.from >= size || (first.empty() && number == 0)) {
        throw Failure(416, "The file has no such part.");
    }
    return range.from < range.to;
}

std::string Length(long long bytes) {
    return "Content-Length: " + std::to_string(bytes) + "\r\n";
}

}  // namespace

void Download(const User& user, const Request& request) {
    const Connection connection(user, request.Parameter("connection"));
    const std::string& path = request.Parameter("path");
    const std::string name = SplitPath(path).name;
    const std::unique_ptr<Cloud> cloud = connection.Driver();
    const std::string uri = connection.Uri(path);
    long long size = 0;
    std::string mime;
    if (!Cloud::RelayDownloadInit(cloud.get(), uri.c_str(), nullptr, "") ||
        !Cloud::RelayDownloadGetFileSizeAndMimeType(&size, mime)) {
        throw Failure(404, "\"" + name + "\" is not there.", ZYROVFS::VFS_ERR_NOT_FOUND);
    }
    Range range{0, size};
    std::string headers =
        "Accept-Ranges: bytes\r\nContent-Disposition: " + Attachment(name) + "\r\n";
    const bool part = ReadRange(request.range, size, range);
    if (part) {
        headers += "Content-Range: bytes " + std::to_string(range.from) + "-" +
                   std::to_string(range.to) + "/" + std::to_string(size) + "\r\n" +
                   Length(range.to - range.from + 1);
    } else {
        range = {0, size};
        headers += Length(size);
    }
    if (!Write(Head(part ? 206 : 200, "application/octet-stream", headers))) {
        return;
    }
    // Behind this a failure shows as an answer that is shorter than it says.
    Cloud::RelayDownloadFile(STDOUT_FILENO, range.from, range.to);
}

}  // namespace web
