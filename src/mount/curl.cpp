#include "mount/curl.h"

#include <zosplatform/device.h>

#include <climits>
#include <cstring>

#include "core/no_throw.h"
#include "core/paths.h"
#include "mount/cert_info.h"
#include "zyrovfs/utils.h"

namespace ZYROVFS {
namespace {

struct CodeRow {
    int curl;
    __tag_vfs_err_ code;
};

// All codes that are not here are VFS_ERR_FAILED.
constexpr CodeRow kCodes[] = {
    {CURLE_COULDNT_RESOLVE_PROXY, VFS_ERR_HOST_UNREACHABLE},
    {CURLE_COULDNT_RESOLVE_HOST, VFS_ERR_HOST_UNREACHABLE},
    {CURLE_COULDNT_CONNECT, VFS_ERR_HOST_UNREACHABLE},
    {CURLE_OPERATION_TIMEDOUT, VFS_ERR_HOST_UNREACHABLE},
    {CURLE_SSL_CONNECT_ERROR, VFS_ERR_HOST_UNREACHABLE},
    {CURLE_REMOTE_ACCESS_DENIED, VFS_ERR_ACCESS_DENIED},
    {CURLE_LOGIN_DENIED, VFS_ERR_ACCESS_DENIED},
    {51, VFS_ERR_CERT_UNTRUSTED},  // what older releases of libcurl say for the next one
    {CURLE_PEER_FAILED_VERIFICATION, VFS_ERR_CERT_UNTRUSTED},
};

__tag_vfs_err_ CodeOf(CURLcode code) {
    for (const CodeRow& row : kCodes) {
        if (row.curl == static_cast<int>(code)) {
            return row.code;
        }
    }
    return VFS_ERR_FAILED;
}

size_t Discard(char*, size_t size, size_t count, void*) {
    return size * count;
}

void SetUserAgent(CURL* curl) {
    char agent[512];
    if (YLIBDsinfoUserAgentGet("fileharbor", agent, sizeof agent) != 0) {
        LOG_ERROR("Failed to get UserAgent " PLATFORM_ERROR_FORMAT, ZYROERR_ARGS);
        return;
    }
    SetCurlOption(curl, CURLOPT_USERAGENT, agent);
}

/** Appends one part of a path. libcurl takes length 0 for "up to the NUL", so empty parts stay. */
bool AppendEscaped(std::string& out, const char* part, size_t length) {
    if (length == 0) {
        return true;
    }
    if (length > INT_MAX) {
        return false;
    }
    const std::unique_ptr<char, FreeWith<curl_free>> escaped(
        curl_easy_escape(nullptr, part, static_cast<int>(length)));
    if (escaped == nullptr) {
        return false;
    }
    out += escaped.get();
    return true;
}

bool EscapePath(const std::string& url, std::string& out) {
    const size_t scheme = url.find("://");
    if (scheme == std::string::npos) {
        LOG_ERROR("Failed to find :// from %s", url.c_str());
        return false;
    }
    size_t slash = url.find('/', scheme + strlen("://"));
    std::string escaped = url.substr(0, slash);
    while (slash != std::string::npos) {
        const size_t next = url.find('/', slash + 1);
        const size_t end = next == std::string::npos ? url.size() : next;
        escaped += '/';
        if (!AppendEscaped(escaped, url.data() + slash + 1, end - slash - 1)) {
            LOG_ERROR("Failed to escape %s", url.c_str());
            return false;
        }
        slash = next;
    }
    out = std::move(escaped);
    return true;
}

}  // namespace

bool Utils::CurlURLEscape(const std::string& url, std::string& out) {
    return NoThrow(VFS_ERR_FAILED, [&] { return EscapePath(url, out); });
}

UniqueCurl NewCurl() {
    UniqueCurl curl(curl_easy_init());
    if (curl == nullptr) {
        LOG_ERROR("Failed to init curl.");
        Fail(VFS_ERR_FAILED);
        return nullptr;
    }
    SetUserAgent(curl.get());
    const bool set = SetCurlOption(curl.get(), CURLOPT_FAILONERROR, 1L) &&
                     SetCurlOption(curl.get(), CURLOPT_FOLLOWLOCATION, 1L) &&
                     // libcurl before 8.3 would follow a server in circles for ever.
                     SetCurlOption(curl.get(), CURLOPT_MAXREDIRS, 30L) &&
                     SetCurlOption(curl.get(), CURLOPT_LOW_SPEED_LIMIT, 16L) &&
                     SetCurlOption(curl.get(), CURLOPT_LOW_SPEED_TIME, 60L) &&
                     SetCurlOption(curl.get(), CURLOPT_CONNECTTIMEOUT, 90L) &&
                     SetCurlOption(curl.get(), CURLOPT_WRITEFUNCTION, &Discard);
    return set ? std::move(curl) : nullptr;
}

bool SetCurlVerification(CURL* curl, bool on) {
    return SetCurlOption(curl, CURLOPT_SSL_VERIFYPEER, on ? 1L : 0L) &&
           SetCurlOption(curl, CURLOPT_SSL_VERIFYHOST, on ? 2L : 0L) &&
           (!on || SetCurlOption(curl, CURLOPT_CAINFO, paths::kCaBundle));
}

bool SetCurlTarget(CURL* curl, const char* user, const char* password, const std::string& url) {
    std::string escaped;
    if (!Utils::CurlURLEscape(url, escaped)) {
        LOG_ERROR("Failed to escape url %s", url.c_str());
        escaped = url;
    }
    const auto credential = [curl](CURLoption option, const char* text) {
        return text == nullptr || *text == '\0' || SetCurlOption(curl, option, text);
    };
    return SetCurlOption(curl, CURLOPT_URL, escaped.c_str()) &&
           credential(CURLOPT_USERNAME, user) && credential(CURLOPT_PASSWORD, password);
}

bool PerformCurl(CURL* curl, const std::string& url) {
    if (!SetCurlOption(curl, CURLOPT_IPRESOLVE, static_cast<long>(CURL_IPRESOLVE_WHATEVER))) {
        return false;
    }
    CURLcode code = curl_easy_perform(curl);
    if (code == CURLE_COULDNT_RESOLVE_PROXY || code == CURLE_COULDNT_RESOLVE_HOST) {
        if (!SetCurlOption(curl, CURLOPT_IPRESOLVE, static_cast<long>(CURL_IPRESOLVE_V4))) {
            return false;
        }
        code = curl_easy_perform(curl);
    }
    // A server that answers has shaken hands; what it says, a refused password even, is no matter
    // of trust.
    if (code == CURLE_OK || code == CURLE_HTTP_RETURNED_ERROR) {
        return true;
    }
    const __tag_vfs_err_ error = CodeOf(code);
    if (error == VFS_ERR_CERT_UNTRUSTED) {
        VFSSetJson(KeptCertificate());
    } else {
        LOG_ERROR("%s, code=%d, err=%s", url.c_str(), static_cast<int>(code),
                  curl_easy_strerror(code));
    }
    return Fail(error);
}

}  // namespace ZYROVFS
