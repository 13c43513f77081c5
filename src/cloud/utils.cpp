#include <string>

#include "zyrovfs/cloud_utils.h"

namespace ZYROCloud::Utils {
namespace {

struct Scheme {
    const char* name;
    size_t length;  ///< how much of the name decides
    _tag_cloud_type type;
};

/** The first row that fits decides, so a longer match of a name stands before a shorter one. */
constexpr Scheme kSchemes[] = {
    {"google", 6, CLOUD_TYPE_GOOGLE},     {"dropbox", 7, CLOUD_TYPE_DROPBOX},
    {"onedrive", 8, CLOUD_TYPE_ONEDRIVE}, {"onedrive", 5, CLOUD_TYPE_ONEDRIVE_SHORT},
    {"box", 3, CLOUD_TYPE_BOX},           {"hubic", 5, CLOUD_TYPE_HUBIC},
    {"awss3", 5, CLOUD_TYPE_AWSS3},
};

/** Backslashes stay single, also in front of the closing quote of whoever puts the text in quotes:
 * names were sent that way from the start. */
std::string EscapeQuote(const std::string& text, char quote) {
    std::string escaped;
    escaped.reserve(text.size());
    for (const char c : text) {
        if (c == quote) {
            escaped += '\\';
        }
        escaped += c;
    }
    return escaped;
}

}  // namespace

_tag_cloud_type GetCloudTypeFromURI(const std::string& uri) {
    const size_t end = uri.find("://");
    if (end == std::string::npos) {
        return CLOUD_TYPE_UNKNOWN;
    }
    const std::string scheme = uri.substr(0, end);
    for (const Scheme& known : kSchemes) {
        if (scheme.compare(0, known.length, known.name, known.length) == 0) {
            return known.type;
        }
    }
    return CLOUD_TYPE_VFS;
}

std::string EscapeSingleQuote(const std::string& text) {
    return EscapeQuote(text, '\'');
}

std::string EscapeDoubleQuote(const std::string& text) {
    return EscapeQuote(text, '"');
}

}  // namespace ZYROCloud::Utils
