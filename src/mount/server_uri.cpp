#include "mount/server_uri.h"

#include <strings.h>

#include <algorithm>
#include <cctype>
#include <cstring>

#include "mount/glib_handle.h"
#include "zyrovfs/utils.h"

namespace ZYROVFS {
namespace {

constexpr char kSchemeEnd[] = "://";
constexpr char kEnds[] = "/?#";
constexpr char kReserved[] = "@/?#";

bool IsNumber(const std::string& text) {
    return !text.empty() &&
           std::all_of(text.begin(), text.end(), [](unsigned char c) { return isdigit(c) != 0; });
}

bool HasPort(const std::string& host) {
    const size_t colon = host.rfind(':');
    return colon != std::string::npos && colon > 0 && IsNumber(host.substr(colon + 1));
}

/** Length of the user that `text`, an id or a URL without its scheme, begins with. */
size_t UserLength(const std::string& text, bool is_id) {
    const std::string authority = text.substr(0, text.find_first_of(kEnds));
    const size_t last = text.rfind('@');
    if (is_id && last != std::string::npos && last >= authority.size() && !HasPort(authority)) {
        const std::string host = text.substr(last + 1);
        if (HasPort(host) && host.find_first_of(kEnds) == std::string::npos) {
            return last;
        }
    }
    const size_t at = authority.rfind('@');
    return at == std::string::npos ? 0 : at;
}

const char* EscapeOf(char reserved) {
    switch (reserved) {
        case '@':
            return "%40";
        case '/':
            return "%2F";
        case '?':
            return "%3F";
        default:
            return "%23";  // '#'
    }
}

}  // namespace

std::string EscapeUser(const std::string& user) {
    std::string escaped = user;
    for (size_t at = 0; (at = escaped.find_first_of(kReserved, at)) != std::string::npos;) {
        escaped.replace(at, 1, EscapeOf(escaped[at]));
    }
    return escaped;
}

std::string ReadableUri(const std::string& id) {
    const size_t scheme = id.find(kSchemeEnd);
    if (scheme == std::string::npos) {
        return id;
    }
    const size_t begin = scheme + strlen(kSchemeEnd);
    const bool web = strncasecmp(id.c_str(), "http", strlen("http")) == 0;
    const size_t length = UserLength(id.substr(begin), !web);
    return id.substr(0, begin) + EscapeUser(id.substr(begin, length)) + id.substr(begin + length);
}

std::string WithoutUser(const std::string& uri) {
    const size_t scheme = uri.find(kSchemeEnd);
    if (scheme == std::string::npos) {
        return uri;
    }
    const size_t begin = scheme + strlen(kSchemeEnd);
    const size_t at = uri.substr(0, uri.find_first_of(kEnds, begin)).find('@', begin);
    return at == std::string::npos ? uri : uri.substr(0, begin) + uri.substr(at + 1);
}

std::string GioUri(SoupURI* uri) {
    const std::string user = uri->user == nullptr ? "" : uri->user;
    if (user.find_first_of(kReserved) == std::string::npos) {
        return Utils::DecodeURI(UniqueGText(soup_uri_to_string(uri, FALSE)).get());
    }
    const UniqueSoupUri server(soup_uri_copy(uri));
    soup_uri_set_user(server.get(), nullptr);
    std::string text = Utils::DecodeURI(UniqueGText(soup_uri_to_string(server.get(), FALSE)).get());
    return text.insert(text.find(kSchemeEnd) + strlen(kSchemeEnd), EscapeUser(user) + "@");
}

}  // namespace ZYROVFS
