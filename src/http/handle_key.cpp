#include "http/handle_key.h"

#include <openssl/evp.h>

#include <cstdlib>
#include <initializer_list>
#include <stdexcept>
#include <tuple>

#include "core/file_memo.h"
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

/** Changes with the contents. */
std::string Identity(const std::string& path) {
    FileIdentity file;
    if (!Identify(path, file)) {
        return path + " missing";
    }
    std::string text = path;
    for (const auto number :
         {static_cast<long long>(file.device), static_cast<long long>(file.inode),
          static_cast<long long>(file.size), static_cast<long long>(file.modified.tv_sec),
          static_cast<long long>(file.modified.tv_nsec),
          static_cast<long long>(file.changed.tv_sec),
          static_cast<long long>(file.changed.tv_nsec)}) {
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

/** Of texts without NUL, in digits. */
std::string Digest(std::initializer_list<std::string> texts) {
    std::string all;
    for (const std::string& text : texts) {
        all += text;
        all += '\0';
    }
    unsigned char digest[EVP_MAX_MD_SIZE];
    unsigned int length = 0;
    if (EVP_Digest(all.data(), all.size(), digest, &length, EVP_sha256(), nullptr) != 1) {
        throw std::runtime_error("no digest");
    }
    constexpr char kDigits[] = "0123456789abcdef";
    std::string hex;
    for (unsigned int i = 0; i < length; ++i) {
        hex += kDigits[digest[i] >> 4];
        hex += kDigits[digest[i] & 15];
    }
    return hex;
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
    return Digest({user, password});
}

std::string Label(const HandleKey& key) {
    return Digest({std::to_string(key.user), key.trust, key.credentials, key.route});
}

}  // namespace handle_key

}  // namespace ZYROCloud
