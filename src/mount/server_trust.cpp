#include "mount/server_trust.h"

#include <fcntl.h>
#include <strings.h>
#include <sys/stat.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>

#include "core/entry_name.h"
#include "core/fd_io.h"
#include "core/handle.h"
#include "core/log.h"
#include "core/paths.h"
#include "zyrovfs/global.h"
#include "zyrovfs/utils.h"

namespace ZYROVFS {
namespace {

/** Far above any bundle. The folder belongs to the user, who may put anything there. */
constexpr size_t kCertFileLimit = 16 * 1024 * 1024;

/** "[::1]:443" for "::1:443"; "" for a name that is no such address. */
std::string Bracketed(const std::string& name) {
    const size_t port = name.rfind(':');
    return port == std::string::npos || name.find(':') == port
               ? ""
               : "[" + name.substr(0, port) + "]" + name.substr(port);
}

}  // namespace

std::string WebUrl(const std::string& url) {
    static constexpr const char* kSchemes[][2] = {{"dav://", "http://"}, {"davs://", "https://"}};
    for (const auto& [dav, http] : kSchemes) {
        if (strncasecmp(url.c_str(), dav, strlen(dav)) == 0) {
            return http + url.substr(strlen(dav));
        }
    }
    return url;
}

bool ServerFileName(const std::string& url, std::string& name) {
    std::string host;
    // The host is a file name from here on, and an escaped slash in it has been decoded.
    if (!Utils::GetHostWithPort(WebUrl(url).c_str(), host) || host.find('/') != std::string::npos) {
        LOG_ERROR("Failed to get host from %s", url.c_str());
        return false;
    }
    name = host;
    return true;
}

bool IsSaved(const OwnedFolder& folder, const std::string& name) {
    struct stat info {};
    std::string target;
    if (!folder.Stat(name, info)) {
        return false;
    }
    if (S_ISLNK(info.st_mode)) {
        return folder.ReadLink(name, target) && target == paths::kCaBundle;
    }
    return S_ISREG(info.st_mode) || S_ISDIR(info.st_mode);
}

std::string SavedEntry(const OwnedFolder& folder, const std::string& name) {
    const std::string other = Bracketed(name);
    const bool is_other = !IsSaved(folder, name) && !other.empty() && IsSaved(folder, other);
    return is_other ? other : name;
}

bool RemoveSaved(const OwnedFolder& folder, const std::string& name) {
    const std::string other = Bracketed(name);
    const bool other_is_gone = other.empty() || folder.Remove(other) || errno == ENOENT;
    return (folder.Remove(name) || errno == ENOENT) && other_is_gone;
}

bool ReadTrust(const std::string& file, ServerTrust& trust) {
    trust.file = file;
    const UniqueCString text(Utils::GetCertData(file.c_str()));
    if (text == nullptr) {
        return false;
    }
    if (Utils::isTrustRootCA(file.c_str())) {
        trust.kind = ServerTrust::kBundle;
    } else {
        trust.kind = ServerTrust::kPinned;
        trust.certificate = text.get();
    }
    return true;
}

ServerTrust TrustOfServer(uid_t user, const std::string& name) {
    const OwnedFolder folder = OwnedFolder::Open(paths::SslDir(user), user);
    const std::string entry = folder ? SavedEntry(folder, name) : name;
    ServerTrust trust;
    trust.file = paths::SslDir(user) + "/" + entry;
    std::string target;
    if (!folder || !IsSaved(folder, entry)) {
        LOG_ERROR("Failed to open [%s], nothing is saved", trust.file.c_str());
    } else if (folder.ReadLink(entry, target)) {
        trust.kind = target == paths::kCaBundle ? ServerTrust::kBundle : ServerTrust::kUndecided;
    } else if (folder.Read(entry, kCertFileLimit, trust.certificate)) {
        trust.kind = ServerTrust::kPinned;
        trust.certificate.resize(strlen(trust.certificate.c_str()));  // who uses it reads so far
    } else {
        LOG_ERROR("Failed to open [%s], %m", trust.file.c_str());
    }
    return trust;
}

bool Utils::isTrustRootCA(const char* path) {
    if (path == nullptr) {
        return false;
    }
    const EntryPath place = SplitPath(path);
    const OwnedFolder folder = OwnedFolder::Open(place.folder, GetActorUID());
    struct stat info {};
    if (!folder.Stat(place.name, info)) {
        return false;
    }
    if (S_ISREG(info.st_mode)) {
        return strcmp(path, paths::kCaBundle) == 0;
    }
    std::string target;
    return S_ISLNK(info.st_mode) && folder.ReadLink(place.name, target) &&
           target == paths::kCaBundle;
}

char* Utils::GetCertData(const char* path) {
    if (path == nullptr) {
        errno = EINVAL;
        LOG_ERROR("Failed to open [%s], %m", "");
        return nullptr;
    }
    // The one link that means something is read as what it means.
    const EntryPath place = SplitPath(isTrustRootCA(path) ? paths::kCaBundle : path);
    const OwnedFolder folder = OwnedFolder::Open(place.folder, GetActorUID());
    const UniqueFd fd = folder.OpenFile(place.name, O_RDONLY);
    if (!fd && errno != EISDIR) {
        LOG_ERROR("Failed to open [%s], %m", path);
        return nullptr;
    }
    std::string text;
    UniqueCString data(fd && ReadUpTo(fd.Get(), kCertFileLimit, text)
                           ? static_cast<char*>(calloc(text.size() + 1, 1))
                           : nullptr);
    if (data == nullptr) {
        LOG_ERROR("Failed to read data, %m");
        return nullptr;
    }
    text.copy(data.get(), text.size());
    return data.release();
}

}  // namespace ZYROVFS
