#include <gio/gio.h>

#include <algorithm>
#include <array>
#include <cstdlib>
#include <cstring>
#include <initializer_list>
#include <memory>
#include <optional>
#include <string_view>
#include <vector>

#include "support.h"
#include "zosplatform/device.h"

namespace {

struct Unref {
    void operator()(void* object) const { g_object_unref(object); }
    void operator()(GUri* uri) const { g_uri_unref(uri); }
    void operator()(char** texts) const { g_strfreev(texts); }
};
using Resolver = std::unique_ptr<GProxyResolver, Unref>;
using Uri = std::unique_ptr<GUri, Unref>;
using Texts = std::unique_ptr<char*, Unref>;

/**
 * Which variables name the proxy of a scheme. HTTP_PROXY is not among them: in a CGI program that
 * one is the client's request header "Proxy".
 */
struct Row {
    const char* scheme;
    std::array<const char*, 2> variables;
};
constexpr std::array<Row, 5> kSchemes{{
    {"http", {"http_proxy", nullptr}},
    {"dav", {"http_proxy", nullptr}},
    {"https", {"https_proxy", "HTTPS_PROXY"}},
    {"davs", {"https_proxy", "HTTPS_PROXY"}},
    {"ftp", {"ftp_proxy", "FTP_PROXY"}},
}};
constexpr std::array<const char*, 2> kAllSchemes{"all_proxy", "ALL_PROXY"};
constexpr std::array<const char*, 2> kDirectHosts{"no_proxy", "NO_PROXY"};

std::string FirstSet(const std::array<const char*, 2>& variables) {
    for (const char* variable : variables) {
        const char* value = variable == nullptr ? nullptr : getenv(variable);
        if (value != nullptr && *value != '\0') {
            return value;
        }
    }
    return {};
}

/** The proxy as a URL: a variable may hold the bare "host:port". */
std::string ProxyUrl(const std::array<const char*, 2>& variables) {
    const std::string value = FirstSet(variables);
    return value.empty() || value.find("://") != std::string::npos ? value : "http://" + value;
}

std::vector<std::string> DirectHosts() {
    std::vector<std::string> hosts;
    const std::string value = FirstSet(kDirectHosts);
    const Texts pieces(g_strsplit_set(value.c_str(), ", \t", -1));
    for (char** piece = pieces.get(); *piece != nullptr; ++piece) {
        if (**piece != '\0') {
            hosts.emplace_back(*piece);
        }
    }
    return hosts;
}

/** GIO's resolver over the environment: it asks no service and no network. */
Resolver MakeResolver() {
    const std::vector<std::string> hosts = DirectHosts();
    std::vector<char*> ignored;
    for (const std::string& host : hosts) {
        if (host == "*") {
            return Resolver(g_simple_proxy_resolver_new(nullptr, nullptr));
        }
        ignored.push_back(const_cast<char*>(host.c_str()));
    }
    ignored.push_back(nullptr);
    const std::string fallback = ProxyUrl(kAllSchemes);
    Resolver resolver(
        g_simple_proxy_resolver_new(fallback.empty() ? nullptr : fallback.c_str(), ignored.data()));
    for (const Row& row : kSchemes) {
        const std::string proxy = ProxyUrl(row.variables);
        if (!proxy.empty()) {
            g_simple_proxy_resolver_set_uri_proxy(G_SIMPLE_PROXY_RESOLVER(resolver.get()),
                                                  row.scheme, proxy.c_str());
        }
    }
    return resolver;
}

Uri ParseProxy(const char* text) {
    return Uri(
        g_uri_parse(text,
                    static_cast<GUriFlags>(G_URI_FLAGS_PARSE_RELAXED |
                                           G_URI_FLAGS_SCHEME_NORMALIZE | G_URI_FLAGS_ENCODED),
                    nullptr));
}

/** "host:port" of an HTTP proxy, "" for a direct connection, nothing for any other answer. */
std::optional<std::string> AddressOf(const char* answer) {
    const Uri uri = ParseProxy(answer);
    const std::string_view scheme = uri ? g_uri_get_scheme(uri.get()) : "";
    if (scheme == "direct") {
        return "";
    }
    const char* host = uri ? g_uri_get_host(uri.get()) : nullptr;
    if ((scheme != "http" && scheme != "https") || host == nullptr || *host == '\0') {
        return std::nullopt;
    }
    const bool ipv6 = std::strchr(host, ':') != nullptr;
    return (ipv6 ? "[" + std::string(host) + "]" : std::string(host)) + ":" +
           std::to_string(g_uri_get_port(uri.get()));
}

std::optional<std::string> LookUp(const char* url) {
    const Resolver resolver = MakeResolver();
    const Texts answers(g_proxy_resolver_lookup(resolver.get(), url, nullptr, nullptr));
    for (char** answer = answers.get(); answer != nullptr && *answer != nullptr; ++answer) {
        if (auto address = AddressOf(*answer)) {
            return address;
        }
    }
    return std::nullopt;
}

/** The proxy that this thread was told of last; "" for none and for a direct connection. */
thread_local std::string last_address;

struct Proxy {
    std::string address;
    std::string auth;  ///< as the variable has it, escapes included: it may be put into a URL again
};

std::vector<Proxy> AllProxies() {
    std::vector<Proxy> proxies;
    for (const auto& variables :
         {kSchemes[0].variables, kSchemes[2].variables, kSchemes[4].variables, kAllSchemes}) {
        const std::string url = ProxyUrl(variables);
        const std::string address = url.empty() ? "" : AddressOf(url.c_str()).value_or("");
        const Uri uri = ParseProxy(url.c_str());
        const char* auth = uri ? g_uri_get_userinfo(uri.get()) : nullptr;
        if (!address.empty()) {
            proxies.push_back({address, auth == nullptr ? "" : auth});
        }
    }
    return proxies;
}

/** Where there are several proxies, each gets its own: the caller has asked for an address. */
std::string FindAuth() {
    const std::vector<Proxy> proxies = AllProxies();
    const bool only_one = std::all_of(proxies.begin(), proxies.end(), [&](const Proxy& each) {
        return each.address == proxies[0].address;
    });
    for (const Proxy& proxy : proxies) {
        if (!proxy.auth.empty() && (only_one || proxy.address == last_address)) {
            return proxy.auth;
        }
    }
    return {};
}

int Deliver(const std::string& text, char* buffer, int size) {
    if (text.size() >= static_cast<size_t>(size)) {
        SET_PLATFORM_ERROR(ZOS_ERR_BUFFER_TOO_SMALL);
        return -1;
    }
    text.copy(buffer, text.size());
    buffer[text.size()] = '\0';
    return 1;
}

}  // namespace

int ZYROProxyGetAddrByUrl(const char* url, char* address, int size) {
    if (url == nullptr || address == nullptr || size <= 0) {
        SET_PLATFORM_ERROR(ZOS_ERR_BAD_PARAMETER);
        return -1;
    }
    address[0] = '\0';
    return zos::OrOutOfMemory(-1, [&] {
        const auto found = LookUp(url);
        if (!found) {
            SET_PLATFORM_ERROR(ZOS_ERR_BAD_FORMAT);
            return 0;
        }
        last_address = *found;
        return Deliver(*found, address, size);
    });
}

int ZYROProxyGetAuth(char* auth, int size) {
    if (auth == nullptr || size <= 0) {
        SET_PLATFORM_ERROR(ZOS_ERR_BAD_PARAMETER);
        return -1;
    }
    auth[0] = '\0';
    return zos::OrOutOfMemory(-1, [&] { return Deliver(FindAuth(), auth, size); });
}
