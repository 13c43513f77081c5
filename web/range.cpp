#include "range.h"

#include <algorithm>
#include <charconv>

#include "failure.h"

namespace web {
namespace {

bool ReadNumber(const std::string& text, long long& number) {
    const char* end = text.data() + text.size();
    const auto [stop, error] = std::from_chars(text.data(), end, number);
    return error == std::errc() && stop == end && number >= 0;
}

}  // namespace

std::optional<Range> ReadRange(const std::string& header, long long size) {
    const std::string unit = "bytes=";
    const size_t dash = header.find('-');
    if (header.rfind(unit, 0) != 0 || dash == std::string::npos ||
        header.find(',') != std::string::npos) {
        return std::nullopt;
    }
    const std::string first = header.substr(unit.size(), dash - unit.size());
    const std::string last = header.substr(dash + 1);
    Range range{0, size - 1};
    long long number = 0;
    if (first.empty()) {
        if (!ReadNumber(last, number)) {
            return std::nullopt;
        }
        range.from = number == 0 ? size : std::max(size - number, 0LL);
    } else if (!ReadNumber(first, range.from) || (!last.empty() && !ReadNumber(last, number)) ||
               (!last.empty() && number < range.from)) {
        return std::nullopt;
    } else if (!last.empty()) {
        range.to = std::min(number, size - 1);
    }
    if (range.from >= size) {
        throw Failure(416, "The file has no such part.");
    }
    return range;
}

}  // namespace web
