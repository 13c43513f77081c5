#include <openssl/bio.h>
#include <openssl/pem.h>
#include <openssl/ssl.h>
#include <openssl/x509_vfy.h>
#include <strings.h>
#include <sys/stat.h>

#include <cerrno>
#include <cstring>

#include "core/entry_name.h"
#include "core/no_throw.h"
#include "core/owned_folder.h"
#include "core/paths.h"
#include "mount/curl.h"
#include "mount/mkdir.h"
#include "zyrovfs/global.h"
#include "zyrovfs/utils.h"

namespace ZYROVFS {
namespace {

using UniqueBio = std::unique_ptr<BIO, FreeWith<BIO_free_all>>;

// The callback of a handshake has no argument of its own, so it finds its orders here.
std::string _strCertPath;
bool save_failed = false;

/** Folder and file of a server, and the address to ask, without the user. */
struct Location {
    std::string url;
    OwnedFolder folder;
    std::string name;  ///< in the folder
    std::string file;  ///< the same as a path
};

enum class Verdict { kTrusted, kUntrusted, kFailed };

/**
 * Writes a certificate to the user's folder. The file may still be the link to the CA bundle of an
 * earlier trust, or one that the user put there: opened for writing by root, the link's target
 * would be overwritten, the bundle of the whole system. So a new file takes its place.
 */
bool SavePem(X509* certificate, const std::string& path) {
    const UniqueBio bio(BIO_new(BIO_s_mem()));
    if (bio == nullptr || certificate == nullptr ||
        PEM_write_bio_X509(bio.get(), certificate) != 1) {
        LOG_ERROR("Failed to write certificate as text");
        return false;
    }
    char* text = nullptr;
    const long length = BIO_get_mem_data(bio.get(), &text);
    // Readable whatever the umask: the user's backends read what root writes here.
    const EntryPath place = SplitPath(path);
    if (!OwnedFolder::Open(place.folder, GetActorUID())
             .Replace(place.name, std::string(text, static_cast<size_t>(length)), 0644)) {
        LOG_ERROR("Failed to write %s, %m", path.c_str());
        return false;
    }
    return true;
}

/** Called for each certificate of the chain, the server's own last: that one stays. The handshake
 * goes on in any case; whether the certificate is good is for the user to say. */
int SaveCertificate(int, X509_STORE_CTX* store) noexcept {
    try {
        save_failed = !SavePem(X509_STORE_CTX_get_current_cert(store), _strCertPath);
    } catch (const std::exception& e) {
        LOG_ERROR("Unexpected failure, %s", e.what());
        save_failed = true;
    }
    return 1;
}

CURLcode SaverCtxFn(CURL*, void* ctx, void* path) noexcept try {
    if (path == nullptr) {
        LOG_ERROR("No cert path");
        return static_cast<CURLcode>(51);
    }
    if (ctx == nullptr) {
        return CURLE_SSL_CERTPROBLEM;
    }
    _strCertPath = static_cast<const char*>(path);
    auto* ssl = static_cast<SSL_CTX*>(ctx);
    SSL_CTX_set_verify_depth(ssl, 1);
    SSL_CTX_set_verify(ssl, SSL_VERIFY_PEER, SaveCertificate);
    return CURLE_OK;
} catch (const std::exception&) {
    return CURLE_OUT_OF_MEMORY;
}

/** The folder above is that of the user's profiles, which a user who never saved one does not have
 * yet. */
OwnedFolder OpenSslFolder(uid_t uid) {
    const std::string path = paths::SslDir(uid);
    OwnedFolder folder = OwnedFolder::Open(path, uid);
    if (folder) {
        return folder;
    }
    const OwnedFolder above = Utils::CreateOwnedFolder(paths::UserConfigDir(uid), uid);
    if (above && (above.MakeFolder(SplitPath(path).name, 0700, {uid, 0}) || errno == EEXIST)) {
        folder = OwnedFolder::Open(path, uid);
    }
    return folder;
}

/** dav is http under another name. */
std::string WebUrl(const char* url) {
    static constexpr const char* kSchemes[][2] = {{"dav://", "http://"}, {"davs://", "https://"}};
    for (const auto& [dav, http] : kSchemes) {
        if (strncasecmp(url, dav, strlen(dav)) == 0) {
            return http + std::string(url + strlen(dav));
        }
    }
    return url;
}

bool Locate(const char* given, Location& location) {
    const std::string url = WebUrl(given);
    std::string host;
    // The host is a file name from here on, and an escaped slash in it has been decoded.
    if (!Utils::GetHostWithPort(url.c_str(), host) || host.find('/') != std::string::npos) {
        LOG_ERROR("Failed to get host from %s", url.c_str());
        return Fail(VFS_ERR_HOST_UNREACHABLE);
    }
    const std::string path = paths::SslDir(GetActorUID());
    location.folder = OpenSslFolder(GetActorUID());
    if (!location.folder) {
        LOG_ERROR("Failed to create ssl folder %s", path.c_str());
        return Fail(VFS_ERR_FAILED);
    }
    std::string base;
    std::string rest;
    if (!Utils::GetURIParts(url.c_str(), base, rest) ||
        !Utils::GetBaseURI(url.c_str(), base, false)) {
        LOG_ERROR("Failed to parse url %s", url.c_str());
        return Fail(VFS_ERR_HOST_UNREACHABLE);
    }
    location.url = base + rest;
    location.name = host;
    location.file = path + "/" + host;
    return true;
}

bool Download(const char* user, const char* password, const Location& location) {
    if (!Utils::DownloadCert(user, password, location.url.c_str(), location.file.c_str())) {
        LOG_ERROR("Failed to download cert %s", location.url.c_str());
        return false;
    }
    return true;
}

/** Whether something stands in the file's place that can say whom to trust: a file, or a link to
 * the bundle. What else a FIFO or a link may be for, it is no certificate. */
bool HasSavedFile(const Location& location) {
    struct stat info {};
    std::string target;
    if (!location.folder.Stat(location.name, info)) {
        return false;
    }
    if (S_ISLNK(info.st_mode)) {
        return location.folder.ReadLink(location.name, target) && target == paths::kCaBundle;
    }
    return S_ISREG(info.st_mode) || S_ISDIR(info.st_mode);
}

/** What the user's own file says. One that no longer fits the server is removed: the certificate
 * was renewed, and what was trusted is gone. */
Verdict AskSavedFile(const char* user, const char* password, const Location& location) {
    if (!HasSavedFile(location)) {
        return Verdict::kUntrusted;
    }
    if (Utils::VerifyCert(user, password, location.url.c_str(), location.file.c_str())) {
        return Verdict::kTrusted;
    }
    if (GetError() != VFS_ERR_CERT_UNTRUSTED) {
        LOG_ERROR("Failed to verify cert %s by %s", location.url.c_str(), location.file.c_str());
        return Verdict::kFailed;
    }
    if (!location.folder.Remove(location.name)) {
        LOG_ERROR("Failed to unlink %s, %m", location.file.c_str());
    }
    return Verdict::kUntrusted;
}

bool LinkToBundle(const Location& location) {
    if (HasSavedFile(location)) {
        return true;
    }
    location.folder.Remove(location.name);  // what is no certificate
    if (!location.folder.MakeLink(location.name, paths::kCaBundle)) {
        LOG_ERROR("Failed to create symlink to %s, %m", location.file.c_str());
        return Fail(VFS_ERR_FAILED);
    }
    return true;
}

bool VerifyPeer(const char* user, const char* password, const char* url, bool force) {
    Location location;
    if (!Locate(url, location)) {
        return false;
    }
    if (force) {
        return Download(user, password, location);
    }
    const Verdict verdict = AskSavedFile(user, password, location);
    if (verdict != Verdict::kUntrusted) {
        return verdict == Verdict::kTrusted;
    }
    return Utils::VerifyCert(user, password, location.url.c_str(), paths::kCaBundle) &&
           LinkToBundle(location);
}

}  // namespace

bool Utils::DownloadCert(const char* user, const char* password, const char* url,
                         const char* certPath) {
    if (url == nullptr || certPath == nullptr) {
        LOG_ERROR("Wrong parameters");
        return Fail(VFS_ERR_BAD_PARAM);
    }
    return NoThrow(VFS_ERR_FAILED, [&] {
        const UniqueCurl curl = NewCurl();
        save_failed = false;
        if (curl == nullptr || !SetCurlVerification(curl.get(), false) ||
            !SetCurlOption(curl.get(), CURLOPT_SSL_CTX_FUNCTION, &SaverCtxFn) ||
            !SetCurlOption(curl.get(), CURLOPT_SSL_CTX_DATA, const_cast<char*>(certPath)) ||
            !SetCurlTarget(curl.get(), user, password, url) || !PerformCurl(curl.get(), url)) {
            return false;
        }
        const EntryPath place = SplitPath(certPath);
        struct stat info {};
        if (save_failed || !OwnedFolder::Open(place.folder, GetActorUID()).Stat(place.name, info)) {
            LOG_ERROR("Failed to save cert %s", certPath);
            return Fail(VFS_ERR_FAILED);
        }
        return true;
    });
}

bool Utils::SSLVerifyPeer(const char* user, const char* password, const char* url, bool force) {
    if (url == nullptr) {
        LOG_ERROR("Bad Parameters: szURL is null");
        return Fail(VFS_ERR_BAD_PARAM);
    }
    return NoThrow(VFS_ERR_FAILED, [&] { return VerifyPeer(user, password, url, force); });
}

}  // namespace ZYROVFS
