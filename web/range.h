/** The part of a file that a header "Range" asks for. */
#ifndef ZYROVFS_WEB_RANGE_H
#define ZYROVFS_WEB_RANGE_H

#include <optional>
#include <string>

namespace web {

/** First and last byte. */
struct Range {
    long long from;
    long long to;
    long long Size() const { return to - from + 1; }
};

/**
 * The one part that a header names, of a file of `size` bytes. None without a header, and for what
 * is answered with the whole file, as it may be: several parts, and other units. Failure with
 * status 416 for a part that is not there.
 */
std::optional<Range> ReadRange(const std::string& header, long long size);

}  // namespace web

#endif
