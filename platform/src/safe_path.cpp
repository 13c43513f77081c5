#include "safe_path.h"

#include <fcntl.h>
#include <sys/random.h>
#include <sys/stat.h>

#include <algorithm>
#include <cinttypes>
#include <cstdio>

namespace zos {
namespace {

constexpr int kEnter = O_PATH | O_DIRECTORY | O_CLOEXEC;
constexpr int kNoTrap = O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK | O_NOCTTY;
constexpr mode_t kOthersMayWrite = S_IWGRP | S_IWOTH;
/** How often somebody else may make or remove the file while we do. */
constexpr int kMostRaces = 10;

bool IsRootsLink(int parent, const char* name) {
    struct stat folder {};
    struct stat link {};
    return fstat(parent, &folder) == 0 && fstatat(parent, name, &link, AT_SYMLINK_NOFOLLOW) == 0 &&
           folder.st_uid == 0 && (folder.st_mode & kOthersMayWrite) == 0 && link.st_uid == 0;
}

Fd Enter(int parent, const char* name) {
    Fd dir(openat(parent, name, kEnter | O_NOFOLLOW));
    if (!dir && errno == ENOTDIR && IsRootsLink(parent, name)) {
        dir = Fd(openat(parent, name, kEnter));
    }
    return dir;
}

/** Root's own, with no more rights for others than `mode` gives. */
bool Claim(int dir, mode_t mode) {
    struct stat info {};
    if (fstat(dir, &info) != 0) {
        return false;
    }
    const bool strangers = info.st_uid != 0;
    const mode_t others = info.st_gid == 0 ? S_IWOTH : kOthersMayWrite;
    const bool open = (info.st_mode & others & ~mode) != 0;
    if ((!strangers && !open) || geteuid() != 0) {
        return true;
    }
    return (!strangers || fchown(dir, 0, 0) == 0) &&
           fchmod(dir, strangers ? mode : info.st_mode & ~kOthersMayWrite & 07777) == 0;
}

/** A stranger's link or file would keep everybody from the folder that belongs in its place. */
void MoveStrangersFileAside(int parent, const char* name) {
    struct stat info {};
    uint64_t number = 0;
    if (geteuid() != 0 || fstatat(parent, name, &info, AT_SYMLINK_NOFOLLOW) != 0 ||
        S_ISDIR(info.st_mode) || info.st_uid == 0 ||
        getrandom(&number, sizeof number, 0) != sizeof number) {
        return;
    }
    char aside[64];
    std::snprintf(aside, sizeof aside, ".foreign.%.16s.%016" PRIx64, name, number);
    renameat2(parent, name, parent, aside, RENAME_NOREPLACE);
}

}  // namespace

Fd OpenFolderOf(const std::string& path, std::string& name) {
    const size_t last = path.rfind('/');
    name = path.substr(last == std::string::npos ? 0 : last + 1);
    Fd dir(path.empty() ? -1 : open(path.front() == '/' ? "/" : ".", kEnter));
    size_t at = 0;
    while (dir && last != std::string::npos &&
           (at = path.find_first_not_of('/', at)) != std::string::npos && at < last) {
        const size_t end = std::min(path.find('/', at), last);
        dir = Enter(dir.Get(), path.substr(at, end - at).c_str());
        at = end;
    }
    return dir;
}

Fd EnterRootsFolder(int parent, const char* name, bool make, mode_t mode) {
    if (make) {
        MoveStrangersFileAside(parent, name);
    }
    const bool made = make && mkdirat(parent, name, 0700) == 0;
    if (make && !made && errno != EEXIST) {
        return Fd();
    }
    Fd dir(openat(parent, name, O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC));
    if (!dir && errno == EACCES) {
        dir = Fd(openat(parent, name, kEnter | O_NOFOLLOW));  // to be passed, if not read
    }
    if (!dir || (made && fchmod(dir.Get(), mode) != 0) || !Claim(dir.Get(), mode)) {
        return Fd();
    }
    return dir;
}

Fd OpenOrMake(const std::string& path, int flags, mode_t mode) {
    std::string name;
    const Fd dir = path.empty() ? Fd() : OpenFolderOf(path, name);
    for (int race = 0; dir && race < kMostRaces; ++race) {
        Fd fd = OpenRegular(dir.Get(), name, flags | O_NOFOLLOW);
        if (fd || errno != ENOENT) {
            return fd;
        }
        fd = Fd(openat(dir.Get(), name.c_str(), flags | kNoTrap | O_CREAT | O_EXCL, mode));
        if (fd || errno != EEXIST) {
            return fd;
        }
    }
    return Fd();
}

}  // namespace zos
