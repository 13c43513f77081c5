#include <openssl/bio.h>
#include <openssl/pem.h>
#include <sys/stat.h>

#include <cerrno>

#include "core/entry_name.h"
#include "core/error_cell.h"
#include "core/no_throw.h"
#include "core/owned_folder.h"
#include "core/paths.h"
#include "mount/curl.h"
#include "mount/mkdir.h"
#include "mount/server_uri.h"
#include "mount/ssl_verify.h"
#include "zyrovfs/global.h"
#include "zyrovfs/utils.h"

namespace ZYROVFS {
namespace {

using UniqueBio = std::unique_ptr<BIO, FreeWith<BIO_free_all>>;

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

bool Locate(const char* given, Location& location) {
    const std::string url = WithoutUser(ReadableUri(WebUrl(given)));
    std::string name;
    if (!ServerFileName(url, name)) {
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
    location.name = name;
    location.file = path + "/" + name;
    return true;
}

/** The user has decided about this server; those to which it leads are another matter. */
bool SaveCertificate(const char* user, const char* password, const char* url, const char* path) {
    ServerCheck check;
    check.save = [path](X509* certificate) { return SavePem(certificate, path); };
    if (!CheckServer(user, password, url, check) && !check.led_on) {
        return false;
    }
    if (!check.saved) {
        LOG_ERROR("Failed to save cert %s", path);
        return Fail(VFS_ERR_FAILED);
    }
    return true;
}

/** The new copy stands under the one name that is looked for first. */
bool Download(const char* user, const char* password, const Location& location) {
    if (!Utils::DownloadCert(user, password, location.url.c_str(), location.file.c_str())) {
        LOG_ERROR("Failed to download cert %s", location.url.c_str());
        return false;
    }
    return true;
}

/** What the user's own file says. One that no longer fits the server is removed: the certificate
 * was renewed, and what was trusted is gone. */
Verdict AskSavedFile(const char* user, const char* password, const Location& location) {
    const std::string entry = SavedEntry(location.folder, location.name);
    if (!IsSaved(location.folder, entry)) {
        return Verdict::kUntrusted;
    }
    const std::string file = SplitPath(location.file).folder + "/" + entry;
    ServerCheck check;
    if (!ReadTrust(file, check.trust)) {
        Fail(VFS_ERR_FAILED);
    } else if (CheckServer(user, password, location.url, check)) {
        return Verdict::kTrusted;
    }
    if (GetError() != VFS_ERR_CERT_UNTRUSTED || check.led_on) {
        LOG_ERROR("Failed to verify cert %s by %s", location.url.c_str(), file.c_str());
        return Verdict::kFailed;
    }
    if (!RemoveSaved(location.folder, location.name)) {
        LOG_ERROR("Failed to unlink %s, %m", file.c_str());
    }
    return Verdict::kUntrusted;
}

bool LinkToBundle(const Location& location) {
    if (IsSaved(location.folder, SavedEntry(location.folder, location.name))) {
        return true;
    }
    location.folder.Remove(location.name);  // what is no certificate
    if (!location.folder.MakeLink(location.name, paths::kCaBundle)) {
        LOG_ERROR("Failed to create symlink to %s, %m", location.file.c_str());
        return Fail(VFS_ERR_FAILED);
    }
    return true;
}

/** A copy that no longer fits is no failure where the bundle trusts, nor is an untrusted server to
 * which the one that was asked for leads. */
template <typename Body>
bool LeavingNoError(Body body) {
    ErrorCellKept kept;
    if (body()) {
        return true;
    }
    kept.Dismiss();
    return false;
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
        return LeavingNoError([&] { return SaveCertificate(user, password, url, certPath); });
    });
}

bool Utils::SSLVerifyPeer(const char* user, const char* password, const char* url, bool force) {
    if (url == nullptr) {
        LOG_ERROR("Bad Parameters: szURL is null");
        return Fail(VFS_ERR_BAD_PARAM);
    }
    return NoThrow(VFS_ERR_FAILED, [&] {
        return LeavingNoError([&] { return VerifyPeer(user, password, url, force); });
    });
}

}  // namespace ZYROVFS
