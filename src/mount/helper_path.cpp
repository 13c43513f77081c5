#include "mount/helper_path.h"

#include <dlfcn.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>

#include "core/handle.h"
#include "core/identity.h"

namespace ZYROVFS {
namespace {

constexpr const char* kName = "zyrovfs-helper";

/** The file that this code was loaded from, links resolved; empty when that is not known. */
std::string LibraryPath() {
    Dl_info info{};
    if (dladdr(reinterpret_cast<const void*>(&LibraryPath), &info) == 0 ||
        info.dli_fname == nullptr) {
        return {};
    }
    const UniqueCString path(realpath(info.dli_fname, nullptr));
    return path == nullptr ? std::string() : path.get();
}

bool MayBeRoot() {
    uid_t real = 0;
    uid_t effective = 0;
    uid_t saved = 0;
    getresuid(&real, &effective, &saved);
    return real == 0 || effective == 0 || saved == 0;
}

/** Whether only root and `owner` can say what stands there. */
bool IsClosedToOthers(const std::string& path, uid_t owner) {
    struct stat info {};
    if (stat(path.c_str(), &info) != 0 || (info.st_uid != 0 && info.st_uid != owner)) {
        return false;
    }
    const bool sticky = S_ISDIR(info.st_mode) && (info.st_mode & S_ISVTX) != 0;
    return sticky || (info.st_mode & (S_IWGRP | S_IWOTH)) == 0;
}

/** The program and every folder that leads to it. */
bool IsTrusted(const std::string& path, uid_t owner) {
    for (size_t slash = path.find('/', 1); slash != std::string::npos;
         slash = path.find('/', slash + 1)) {
        if (!IsClosedToOthers(path.substr(0, slash), owner)) {
            return false;
        }
    }
    return IsClosedToOthers("/", owner) && IsClosedToOthers(path, owner);
}

/** Links resolved; empty when there is no such program. */
std::string Resolve(const std::string& path) {
    const UniqueCString found(realpath(path.c_str(), nullptr));
    return found != nullptr && eaccess(found.get(), X_OK) == 0 ? found.get() : std::string();
}

std::string Find(const std::string& library) {
    const size_t name = library.rfind('/') + 1;
    if (library.compare(name, std::string::npos, kName) == 0) {
        return library;  // the helper itself, which needs another one
    }
    const std::string folder = library.substr(0, name);
    // The second is where a build tree has it; there, the library is at the top.
    for (const char* below : {ZYROVFS_HELPER_FROM_LIBRARY, "libexec/zyrovfs/zyrovfs-helper"}) {
        std::string path = folder.empty() ? std::string() : Resolve(folder + below);
        if (!path.empty()) {
            return path;
        }
    }
    return Resolve(ZYROVFS_HELPER);
}

}  // namespace

std::string HelperPath() {
    const EffectiveUid as_root(0);  // a user may not be able to enter the folders on the way
    const std::string library = LibraryPath();
    std::string path = Find(library);
    if (path.empty()) {
        return path;
    }
    struct stat info {};
    const uid_t owner = stat(library.c_str(), &info) == 0 ? info.st_uid : 0;
    if (MayBeRoot() && !IsTrusted(path, owner)) {
        errno = EPERM;
        return {};
    }
    return path;
}

}  // namespace ZYROVFS
