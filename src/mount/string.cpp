#include <iconv.h>

#include <cstring>
#include <optional>

#include "core/handle.h"
#include "core/log.h"
#include "zyrovfs/utils.h"

namespace ZYROVFS::Utils {
namespace {

const iconv_t kNoConverter = reinterpret_cast<iconv_t>(-1);

/** One pass: what does not fit or does not convert fails as a whole. */
std::optional<std::string> Convert(iconv_t converter, const std::string& text) {
    char buffer[4097];
    char* in = const_cast<char*>(text.data());
    size_t in_left = text.size();
    char* out = buffer;
    size_t out_left = sizeof buffer - 1;
    if (iconv(converter, &in, &in_left, &out, &out_left) == static_cast<size_t>(-1)) {
        return std::nullopt;
    }
    return std::string(buffer, out);
}

}  // namespace

bool ConvString(std::string& out, const char* text, const char* from, const char* to) {
    if (text == nullptr || from == nullptr || to == nullptr) {
        return false;
    }
    const std::string source = text;  // `text` may be the old text of `out`
    if (strncmp(from, to, strlen(from)) == 0) {
        out = source;
        return true;
    }
    const iconv_t converter = iconv_open(to, from);
    if (converter == kNoConverter) {
        LOG_ERROR("Failed exec iconv open from:%s to:%s", from, to);
        out = source;
        return false;
    }
    const auto converted = Convert(converter, source);
    iconv_close(converter);
    if (!converted) {
        LOG_ERROR("Failed to convert %s from %s to %s", source.c_str(), from, to);
    }
    out = converted.value_or(source);
    return converted.has_value();
}

}  // namespace ZYROVFS::Utils
