#include "http/handle_key.h"

#include <openssl/evp.h>
#include <sys/stat.h>

#include <cstdlib>
#include <stdexcept>
#include <tuple>

#include "core/paths.h"
#include "zyrovfs/global.h"

namespace ZYROCloud {

using namespace ZYROVFS;

namespace {

constexpr char kPin[] = "pin ";

/** Where libcurl finds its proxies. It compares the hosts of two proxies, but not who logs in. */
constexpr const char* kProxyVariables[] = {"http_proxy", "https_proxy", "HTTPS_PROXY",
                                           "ftp_proxy",  "FTP_PROXY",   "all_proxy",
                                           "ALL_PROXY",  "no_proxy",    "NO_PROXY"};

/** Changes with the contents: files of this kind are replaced or written, never edited unseen. */
std::string Identity(const std::string& path) {
    struct stat info {};
    if (stat(path.c_str(), &info) != 0) {
        return path + " missing";
    }
    std::string text = path;
    for (const auto number :
         {static_cast<long long>(info.st_dev), static_cast<long long>(info.st_ino),
          static_cast<long long>(info.st_size), static_cast<long long>(info.st_mtim.tv_sec),
          static_cast<long long>(info.st_mtim.tv_nsec), static_cast<long long>(info.st_ctim.tv_sec),
          static_cast<long long>(info.st_ctim.tv_nsec)}) {
        text += ' ' + std::to_string(number);
    }
    return text;
}

std::string Roots() {
    return "roots " + Identity(paths::kCaBundle);
}

std::string EnvironmentProxies() {
    std::string text;
    for (const char* name : kProxyVariables) {
        const char* value = getenv(name);
        if (value != nullptr) {
            text += std::string(name) + "=" + value + "\n";
        }
    }
    return text;
}

}  // namespace

bool HandleKey::operator==(const HandleKey& other) const {
    return std::tie(user, trust, credentials, route, share) ==
           std::tie(other.user, other.trust, other.credentials, other.route, other.share);
}

bool HandleKey::IsPinned() const {
    return trust.compare(0, sizeof kPin - 1, kPin) == 0;
}

namespace handle_key {

HandleKey ForServices(const void* share) {
    // The common store keeps its sessions, however long the roots behind them have changed.
    static const std::string first_roots = Roots();
    const std::string roots = Roots();
    return {GetActorUID(), roots, "", EnvironmentProxies(), roots == first_roots ? share : nullptr};
}

std::string Pin(const std::string& path, const char* text) {
    return kPin + path + "\n" + (text == nullptr ? "" : text);
}

std::string KnownHosts(const std::string& path) {
    return "hosts " + Identity(path);
}

std::string Direct() {
    return "direct";
}

std::string Credentials(const std::string& user, const std::string& password) {
    std::string both = user;
    both += '\0';
    both += password;
    unsigned char digest[EVP_MAX_MD_SIZE];
    unsigned int length = 0;
    if (EVP_Digest(both.data(), both.size(), digest, &length, EVP_sha256(), nullptr) != 1) {
        throw std::runtime_error("no digest");
    }
    return std::string(reinterpret_cast<const char*>(digest), length);
}

}  // namespace handle_key

}  // namespace ZYROCloud
