// Files in an owned folder.
#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <climits>
#include <exception>

#include "core/entry_name.h"
#include "core/fd_io.h"
#include "core/owned_folder.h"
#include "core/user_mount.h"

namespace ZYROVFS {
namespace {

/** Nothing is followed, waited for, made a terminal of, or handed to a program. */
constexpr int kNoTrap = O_NOFOLLOW | O_NONBLOCK | O_NOCTTY | O_CLOEXEC;
/** How often somebody else may make or remove the file while we do. */
constexpr int kMostRaces = 10;

/**
 * By descriptor, and before the file has its name: others may write to the folder, and what they
 * put in the file's place must never be given away.
 */
void GiveAway(int fd, FileOwner owner) {
    if (fchown(fd, owner.uid, owner.gid) != 0) {
        errno = 0;  // not ours to give; the file counts, not its owner
    }
}

/** A further name may be one that a stranger gave to a file of root's. */
bool IsPlainFile(const struct stat& info, bool for_writing) {
    if (!S_ISREG(info.st_mode)) {
        errno = S_ISDIR(info.st_mode) ? EISDIR : EINVAL;
        return false;
    }
    if (for_writing && info.st_nlink > 1) {
        errno = EMLINK;
        return false;
    }
    return true;
}

bool IsNameOrInvalid(const std::string& name) {
    if (IsEntryName(name)) {
        return true;
    }
    errno = EINVAL;
    return false;
}

/** Where the folder may not be read, or knows nothing of the like, the file itself is safe. */
bool Flush(const OwnedFolder& folder) {
    const UniqueFd fd = folder.OpenForReading();
    return !fd || fsync(fd.Get()) == 0 || errno == EINVAL;
}

bool WriteFresh(int fd, const std::string& text, mode_t mode, FileOwner owner) {
    GiveAway(fd, owner);
    return WriteAll(fd, text) && fchmod(fd, mode) == 0 && fsync(fd) == 0;
}

}  // namespace

bool OwnedFolder::Stat(const std::string& name, struct stat& info) const {
    if (!fd_ || !IsNameOrInvalid(name)) {
        return false;
    }
    if (IsUsersMount(fd_.Get(), name.c_str())) {
        errno = EPERM;
        return false;
    }
    if (fstatat(fd_.Get(), name.c_str(), &info, AT_SYMLINK_NOFOLLOW) != 0) {
        return false;
    }
    if (Trusts(info)) {
        return true;
    }
    struct stat own {};
    const bool planted = ours_ && fstat(fd_.Get(), &own) == 0 &&
                         (own.st_mode & (S_IWGRP | S_IWOTH)) != 0 && MoveAside(name);
    errno = planted ? ENOENT : EPERM;
    return false;
}

bool OwnedFolder::MoveStrangerAside(const std::string& name) const {
    struct stat info {};
    if (!fd_ || fstatat(fd_.Get(), name.c_str(), &info, AT_SYMLINK_NOFOLLOW) != 0) {
        return fd_ && errno == ENOENT;
    }
    return Trusts(info) || MoveAside(name);
}

UniqueFd OwnedFolder::OpenFile(const std::string& name, int flags) const {
    struct stat info {};
    if (!Stat(name, info)) {
        return UniqueFd();
    }
    UniqueFd fd(openat(fd_.Get(), name.c_str(), flags | kNoTrap));
    if (fd && fstat(fd.Get(), &info) == 0) {
        // Once more, of what was opened: it may have been exchanged since.
        if (!Trusts(info)) {
            errno = EPERM;
        } else if (IsPlainFile(info, (flags & O_ACCMODE) != O_RDONLY)) {
            return fd;
        }
    }
    return UniqueFd();
}

UniqueFd OwnedFolder::MakeFile(const std::string& name, int flags, mode_t mode) const {
    return UniqueFd(IsNameOrInvalid(name)
                        ? openat(fd_.Get(), name.c_str(), flags | kNoTrap | O_CREAT | O_EXCL, mode)
                        : -1);
}

UniqueFd OwnedFolder::OpenOrMake(const std::string& name, int flags, mode_t mode) const {
    // In two steps: with O_CREAT the kernel may refuse to open what another owner has in a sticky
    // folder, root's file to the user or the user's to root.
    for (int race = 0; race < kMostRaces; ++race) {
        UniqueFd fd = OpenFile(name, flags);
        if (fd || errno != ENOENT) {
            return fd;
        }
        fd = MakeFile(name, flags, mode);
        if (fd || errno != EEXIST) {
            return fd;
        }
    }
    return UniqueFd();
}

UniqueFd OwnedFolder::Lock(const std::string& name, int operation, mode_t mode) const {
    UniqueFd fd = OpenOrMake(name, O_RDONLY, mode);
    if (fd && flock(fd.Get(), operation) != 0) {
        return UniqueFd();
    }
    return fd;
}

bool OwnedFolder::Read(const std::string& name, size_t limit, std::string& text) const {
    text.clear();
    const UniqueFd fd = OpenFile(name, O_RDONLY);
    struct stat info {};
    if (!fd || fstat(fd.Get(), &info) != 0) {
        return false;
    }
    if (static_cast<size_t>(info.st_size) > limit) {
        errno = EFBIG;
        return false;
    }
    return ReadUpTo(fd.Get(), limit, text);
}

bool OwnedFolder::Replace(const std::string& name, const std::string& text, mode_t mode,
                          FileOwner owner) const noexcept try {
    struct stat old {};
    if (!fd_) {
        return false;
    }
    Stat(name, old);  // a stranger's file in a sticky folder would keep the user from its place
    const std::string fresh = RandomName(name);
    UniqueFd fd =
        fresh.empty() || !IsNameOrInvalid(name) ? UniqueFd() : MakeFile(fresh, O_WRONLY, 0600);
    if (!fd) {
        return false;
    }
    if (WriteFresh(fd.Get(), text, mode, owner) && close(fd.Release()) == 0 &&
        Rename(fresh, name)) {
        return Flush(*this);
    }
    const int saved = errno;
    unlinkat(fd_.Get(), fresh.c_str(), 0);
    errno = saved;
    return false;
} catch (const std::exception&) {
    errno = ENOMEM;
    return false;
}

bool OwnedFolder::Remove(const std::string& name) const {
    return IsNameOrInvalid(name) && unlinkat(fd_.Get(), name.c_str(), 0) == 0;
}

bool OwnedFolder::Rename(const std::string& from, const std::string& to) const {
    return IsNameOrInvalid(from) && IsNameOrInvalid(to) &&
           renameat(fd_.Get(), from.c_str(), fd_.Get(), to.c_str()) == 0;
}

bool OwnedFolder::MakeLink(const std::string& name, const char* target) const {
    return IsNameOrInvalid(name) && symlinkat(target, fd_.Get(), name.c_str()) == 0;
}

bool OwnedFolder::ReadLink(const std::string& name, std::string& target) const {
    char buffer[PATH_MAX];
    struct stat info {};
    const ssize_t length =
        Stat(name, info) ? readlinkat(fd_.Get(), name.c_str(), buffer, sizeof buffer) : -1;
    if (length < 0) {
        return false;
    }
    target.assign(buffer, static_cast<size_t>(length));
    return true;
}

bool OwnedFolder::MakeFolder(const std::string& name, mode_t mode, FileOwner owner) const {
    if (!IsNameOrInvalid(name) || mkdirat(fd_.Get(), name.c_str(), 0700) != 0) {
        return false;
    }
    const UniqueFd made(
        openat(fd_.Get(), name.c_str(), O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC));
    if (made && fchown(made.Get(), owner.uid, owner.gid) == 0 && fchmod(made.Get(), mode) == 0) {
        return true;
    }
    const int saved = errno;
    unlinkat(fd_.Get(), name.c_str(),
             AT_REMOVEDIR);  // half made, it would pass for ready next time
    errno = saved;
    return false;
}

}  // namespace ZYROVFS
