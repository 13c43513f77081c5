#include "core/loggable_url.h"

#include <algorithm>
#include <cstring>

namespace ZYROVFS {
namespace {

/** Ids of items are shorter; a long name usually has a dot or a blank in it. */
constexpr size_t kLongestShown = 64;
constexpr char kHidden[] = "***";

bool IsKey(const std::string& part) {
    return part.size() > kLongestShown && std::all_of(part.begin(), part.end(), [](char c) {
               return isalnum(static_cast<unsigned char>(c)) != 0 || c == '-' || c == '_';
           });
}

/** From `begin` on, where a path starts. */
void HideKeys(std::string& text, size_t begin) {
    while (begin < text.size()) {
        const size_t end = std::min(text.find('/', begin), text.size());
        const std::string part = text.substr(begin, end - begin);
        const std::string shown = IsKey(part) ? kHidden : part;
        text.replace(begin, part.size(), shown);
        begin += shown.size() + 1;
    }
}

}  // namespace

std::string LoggableUrl(const std::string& url) {
    if (!url.empty() && url[0] == '/') {
        return url;
    }
    std::string text = url.substr(0, url.find_first_of("?#"));
    const size_t scheme = text.find("://");
    const size_t host = scheme == std::string::npos ? 0 : scheme + strlen("://");
    const size_t end = std::min(text.find('/', host), text.size());
    const size_t at = text.rfind('@', end);
    if (at != std::string::npos && at >= host && at < end) {
        text.erase(host, at + 1 - host);
    }
    HideKeys(text, std::min(text.find('/', host), text.size()) + 1);
    return text;
}

}  // namespace ZYROVFS
