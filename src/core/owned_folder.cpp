#include "core/owned_folder.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <charconv>
#include <cstring>
#include <iterator>

#include "core/entry_name.h"
#include "core/identity.h"
#include "core/paths.h"
#include "core/user_mount.h"

namespace ZYROVFS {
namespace {

constexpr int kEnter = O_PATH | O_DIRECTORY | O_CLOEXEC;
constexpr mode_t kOthersMayWrite = S_IWGRP | S_IWOTH;
constexpr size_t kLongestKeptName = 200;  // leaves room for what MoveAside adds

template <size_t N>
bool IsListed(const std::string& path, const char* const (&list)[N]) {
    return std::find(std::begin(list), std::end(list), path) != std::end(list);
}

bool IsBelow(const std::string& path, const char* folder) {
    const size_t length = strlen(folder);
    return path.compare(0, length, folder) == 0 && path.size() > length && path[length] == '/';
}

/** Whose a path of ours is: it says so behind the folder that all users share. */
uid_t UserOf(const std::string& path, uid_t otherwise) {
    for (const char* folder : paths::kFoldersOfUsers) {
        uid_t user = 0;
        const char* begin = path.c_str() + strlen(folder) + 1;
        if (IsBelow(path, folder)) {
            const auto [end, error] = std::from_chars(begin, path.c_str() + path.size(), user);
            return error == std::errc() && (*end == '/' || *end == '\0') ? user : otherwise;
        }
    }
    return otherwise;
}

/** How much of an absolute path the machine's own folders make. */
size_t MachinePart(const std::string& path) {
    for (const char* folder : paths::kMachineFolders) {
        if (path == folder || IsBelow(path, folder)) {
            return strlen(folder);
        }
    }
    return 0;
}

bool IsSharedConfig(const std::string& path) {
    return IsListed(path, paths::kSharedConfigFolders);
}

bool IsShared(const std::string& path) {
    return IsSharedConfig(path) || IsListed(path, paths::kSharedVolatileFolders);
}

/** Whether others may remove and rename what is not theirs, or in the configuration put anything of
 * theirs. Group root is root. */
bool IsLoose(const std::string& path, const struct stat& info) {
    const mode_t others = info.st_gid == 0 ? S_IWOTH : kOthersMayWrite;
    return (info.st_mode & others) != 0 && ((info.st_mode & S_ISVTX) == 0 || IsSharedConfig(path));
}

mode_t Tightened(const std::string& path, mode_t mode) {
    return SafeFolderMode(path, (IsSharedConfig(path) ? mode : mode | S_ISVTX) & 07777);
}

/** A folder that was reached by O_PATH, for what that does not allow. */
UniqueFd Reopen(int fd) {
    return UniqueFd(openat(fd, ".", O_RDONLY | O_DIRECTORY | O_CLOEXEC));
}

/**
 * An older version made it open to all. Its owner or root closes it. Where neither is here, or on a
 * disk that nobody can write to, it is taken as it is: no link below it is followed and no
 * stranger's file believed, and root's next call closes it.
 */
bool Tighten(int fd, const std::string& path, const struct stat& info) {
    if (!IsOurFolder(path)) {
        errno = EPERM;
        return false;
    }
    const EffectiveUid as_root(0);
    const UniqueFd folder = Reopen(fd);
    return (folder && fchmod(folder.Get(), Tightened(path, info.st_mode)) == 0) || errno == EROFS ||
           errno == EPERM || errno == EACCES;
}

/** What is in it stays with those whose it is: users may have live mounts below. */
bool TakeOver(int fd, const std::string& path, const struct stat& info) {
    const EffectiveUid as_root(0);
    const UniqueFd folder = Reopen(fd);
    return folder && fchown(folder.Get(), 0, 0) == 0 &&
           fchmod(folder.Get(), Tightened(path, info.st_mode)) == 0;
}

}  // namespace

bool IsOurFolder(const std::string& path) {
    return IsShared(path) || IsBelow(path, paths::kSharedConfigFolders[0]) ||
           std::any_of(std::begin(paths::kSharedVolatileFolders),
                       std::end(paths::kSharedVolatileFolders),
                       [&path](const char* folder) { return IsBelow(path, folder); });
}

mode_t SafeFolderMode(const std::string& path, mode_t mode) {
    if (IsSharedConfig(path)) {
        return mode & ~kOthersMayWrite;
    }
    return (mode & S_IWOTH) != 0 ? mode | S_ISVTX : mode;
}

bool OwnedFolder::Trusts(const struct stat& info) const {
    return info.st_uid == 0 || info.st_uid == user_;
}

/** Not deleted: whoever it was, it may be somebody's data. The folder is root's or the user's. */
bool OwnedFolder::MoveAside(const std::string& name) const {
    const std::string aside = RandomName(".foreign." + name.substr(0, kLongestKeptName));
    const EffectiveUid as_root(0);
    return !aside.empty() &&
           renameat2(fd_.Get(), name.c_str(), fd_.Get(), aside.c_str(), RENAME_NOREPLACE) == 0;
}

/** One component down; `path` is all of it up to there. */
bool OwnedFolder::Enter(const std::string& name, const std::string& path) {
    UniqueFd next(openat(fd_.Get(), name.c_str(), kEnter | O_NOFOLLOW));
    struct stat info {};
    if (next && IsUsersMount(next.Get(), "")) {
        errno = EPERM;
        return false;
    }
    if (!next || fstat(next.Get(), &info) != 0) {
        return false;
    }
    if (Trusts(info)) {
        if (IsLoose(path, info) && !Tighten(next.Get(), path, info)) {
            return false;
        }
    } else if (!IsShared(path)) {
        errno = IsOurFolder(path) && MoveAside(name) ? ENOENT : EPERM;
        return false;
    } else if (!TakeOver(next.Get(), path, info)) {
        return false;
    }
    fd_ = std::move(next);
    return true;
}

OwnedFolder OwnedFolder::Open(const std::string& path, uid_t user) {
    if (path.empty() || path.find('\0') != std::string::npos) {
        errno = path.empty() ? ENOENT : EINVAL;
        return OwnedFolder();
    }
    size_t at = MachinePart(path);
    const std::string start = at > 0 ? path.substr(0, at) : path[0] == '/' ? "/" : ".";
    OwnedFolder folder(UniqueFd(open(start.c_str(), kEnter)), UserOf(path, user),
                       IsOurFolder(path));
    while (folder && (at = path.find_first_not_of('/', at)) != std::string::npos) {
        const size_t end = std::min(path.find('/', at), path.size());
        if (!folder.Enter(path.substr(at, end - at), path.substr(0, end))) {
            folder.fd_.Reset();
        }
        at = end;
    }
    return folder;
}

UniqueFd OwnedFolder::OpenForReading() const {
    return Reopen(fd_.Get());
}

}  // namespace ZYROVFS
