#include <string>

#include "core/log.h"
#include "mount/glib_handle.h"
#include "mount/server_uri.h"
#include "zyrovfs/server.h"
#include "zyrovfs/utils.h"

namespace ZYROVFS {
namespace {

/** Null, with the failure logged in the name of `at`, for what is no URI. */
UniqueSoupUri Parse(const char* text, SourceLine at = SourceLine::Here()) {
    if (text == nullptr) {
        LOG_ERROR_AT(at, "Wrong parameters");
        return nullptr;
    }
    UniqueSoupUri uri(soup_uri_new(ReadableUri(text).c_str()));
    if (uri == nullptr || uri->scheme == nullptr) {
        LOG_ERROR_AT(at, "Wrong uri, %s", text);
        return nullptr;
    }
    return uri;
}

/** Null for a part that the URI does not have. */
UniqueGText DecodePart(const char* part) {
    return UniqueGText(part == nullptr ? nullptr : soup_uri_decode(part));
}

/** The server that a URI names, as text: scheme, host, port, and the user when asked for. */
bool PrintServer(const char* text, bool with_user, std::string& base,
                 SourceLine at = SourceLine::Here()) {
    const UniqueSoupUri uri = Parse(text, at);
    if (uri == nullptr) {
        return false;
    }
    const UniqueSoupUri server(soup_uri_new(nullptr));
    if (server == nullptr) {
        LOG_ERROR_AT(at, "Can't new uri, %s", text);
        return false;
    }
    soup_uri_set_scheme(server.get(), uri->scheme);
    soup_uri_set_host(server.get(), DecodePart(uri->host).get());
    soup_uri_set_port(server.get(), uri->port);
    if (with_user) {
        soup_uri_set_user(server.get(), DecodePart(uri->user).get());
    }
    soup_uri_set_path(server.get(), "");
    base = Utils::DecodeURI(UniqueGText(soup_uri_to_string(server.get(), FALSE)).get());
    return true;
}

/** Decoded host of a URI that has one. */
bool HostOf(const char* text, std::string& host, unsigned& port,
            SourceLine at = SourceLine::Here()) {
    const UniqueSoupUri uri = Parse(text, at);
    if (uri == nullptr) {
        return false;
    }
    const UniqueGText decoded = DecodePart(uri->host);
    if (decoded == nullptr) {
        LOG_ERROR_AT(at, "Wrong uri, %s", text);
        return false;
    }
    host = decoded.get();
    port = uri->port;
    return true;
}

}  // namespace

namespace Utils {

std::string DecodeURI(const char* text) {
    const UniqueGText decoded = DecodePart(text);
    std::string result = decoded == nullptr ? "" : decoded.get();
    if (result.size() > 2 && result.back() == '/') {
        result.pop_back();
    }
    return result;
}

bool GetURIParts(const char* uri, std::string& base, std::string& rest) {
    std::string server;
    if (!PrintServer(uri, true, server)) {
        return false;
    }
    // A plain cut: ids of connections are used as prefixes, so both sides begin with one text.
    const std::string whole = uri;
    rest = server.size() < whole.size() ? whole.substr(server.size()) : "";
    base = server;
    return true;
}

bool GetBaseURI(const char* uri, std::string& base, bool withUser) {
    return PrintServer(uri, withUser, base);
}

bool GetProtocol(const char* uri, std::string& out) {
    const UniqueSoupUri parsed = Parse(uri);
    if (parsed == nullptr) {
        return false;
    }
    out = parsed->scheme;
    return true;
}

bool GetHostWithPort(const char* uri, std::string& out) {
    std::string host;
    unsigned port = 0;
    if (!HostOf(uri, host, port)) {
        return false;
    }
    out = port == 0 ? host : host + ":" + std::to_string(port);
    return true;
}

bool ConvDavProtocol(const std::string& in, std::string& out) {
    static constexpr struct {
        const char* scheme;
        size_t length;
        const char* replacement;
    } kSchemes[] = {{"dav://", 6, "http://"}, {"davs://", 7, "https://"}};
    // Searched anywhere and cut at the front: callers pass texts that begin with their scheme.
    for (const auto& row : kSchemes) {
        if (in.find(row.scheme) != std::string::npos) {
            out = row.replacement + in.substr(row.length);
            return true;
        }
    }
    out = in;
    return true;
}

}  // namespace Utils

namespace Server {

bool GetSFTPHost(const char* uri, std::string& host) {
    constexpr unsigned kSshPort = 22;
    std::string name;
    unsigned port = 0;
    if (!HostOf(uri, name, port)) {
        return false;
    }
    if (port == 0 || port == kSshPort) {
        host = name;
        return true;
    }
    const bool bracketed = name[0] == '[';
    host = (bracketed ? name : "[" + name + "]") + ":" + std::to_string(port);
    return true;
}

}  // namespace Server
}  // namespace ZYROVFS
