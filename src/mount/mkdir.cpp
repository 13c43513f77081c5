#include "mount/mkdir.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <utility>

#include "core/entry_name.h"
#include "core/error_cell.h"
#include "core/handle.h"
#include "core/identity.h"
#include "core/log.h"
#include "zyrovfs/utils.h"

namespace ZYROVFS::Utils {
namespace {

constexpr unsigned kLeaveAlone = static_cast<unsigned>(-1);

int FailMkdir(int error, unsigned platform_error, SourceLine at = SourceLine::Here()) {
    SetPlatformErr(platform_error, at);
    errno = error;
    return -1;
}

/** Clears the umask for a scope, when asked to. */
class NoUmask {
  public:
    explicit NoUmask(bool clear) : clear_(clear), saved_(clear ? umask(0) : 0) {}
    NoUmask(const NoUmask&) = delete;
    NoUmask& operator=(const NoUmask&) = delete;
    ~NoUmask() {
        if (clear_) {
            umask(saved_);
        }
    }

  private:
    bool clear_;
    mode_t saved_;
};

mode_t ModeUnderUmask() {
    const mode_t mask = umask(0);
    umask(mask);
    return 0777 & ~mask;
}

struct Rules {
    bool replace_non_dir;
    bool change_owner;
    uid_t uid;
    gid_t gid;
    mode_t mode;
};

Rules MakeRules(int replace_non_dir, unsigned uid, unsigned gid, unsigned mode) {
    return {
        replace_non_dir != 0,
        uid != kLeaveAlone || gid != kLeaveAlone,
        uid == kLeaveAlone ? geteuid() : uid,
        gid == kLeaveAlone ? getegid() : gid,
        mode == kLeaveAlone ? ModeUnderUmask() : static_cast<mode_t>(mode),
    };
}

/** Who stands above may do as root likes; a link that others could have put there is none to
 * follow.
 */
bool IsRootsLink(int above, const char* name, const char* path) {
    struct stat folder {};
    struct stat link {};
    return !IsOurFolder(path) && fstat(above, &folder) == 0 &&
           fstatat(above, name, &link, AT_SYMLINK_NOFOLLOW) == 0 && folder.st_uid == 0 &&
           (folder.st_mode & (S_IWGRP | S_IWOTH)) == 0 && link.st_uid == 0;
}

UniqueFd EnterFolder(int above, const char* name, const char* path) {
    constexpr int kEnter = O_PATH | O_DIRECTORY | O_CLOEXEC;
    UniqueFd folder(openat(above, name, kEnter | O_NOFOLLOW));
    if (!folder && errno == ENOTDIR && IsRootsLink(above, name, path)) {
        folder.Reset(openat(above, name, kEnter));
    }
    return folder;
}

bool IsThere(int above, const char* name) {
    struct stat info {};
    return fstatat(above, name, &info, AT_SYMLINK_NOFOLLOW) == 0;
}

/** `path` is the whole of it up to there. */
struct Component {
    int above;
    const char* name;
    const char* path;
    bool last;
};

int MakeFolder(const Component& at, const Rules& rules) {
    if (mkdirat(at.above, at.name, SafeFolderMode(at.path, rules.mode)) != 0) {
        // Made by somebody else meanwhile: theirs to own.
        return errno == EEXIST ? 0 : FailMkdir(errno, ZOS_ERR_SYSTEM);
    }
    if (rules.change_owner &&
        fchownat(at.above, at.name, rules.uid, rules.gid, AT_SYMLINK_NOFOLLOW) != 0) {
        const int error = errno;
        LOG_ERROR("Failed to chown %s, %m", at.path);
        return FailMkdir(error, ZOS_ERR_SYSTEM);
    }
    return 0;
}

int MakeInPlace(const Component& at, const Rules& rules) {
    if (IsThere(at.above, at.name)) {
        if (!rules.replace_non_dir) {
            return at.last ? FailMkdir(EEXIST, ZOS_ERR_EXISTS)
                           : FailMkdir(ENOTDIR, ZOS_ERR_NOT_A_FOLDER);
        }
        if (unlinkat(at.above, at.name, 0) != 0) {
            LOG_ERROR("Failed to remove %s, %m", at.path);
        }
    }
    return MakeFolder(at, rules);
}

/** Goes one component down, by descriptor: what is made stands where we have come to. */
int PassComponent(UniqueFd& folder, const Component& at, const Rules& rules) {
    UniqueFd next = EnterFolder(at.above, at.name, at.path);
    if (!next) {
        if (MakeInPlace(at, rules) != 0) {
            return -1;
        }
        next = EnterFolder(at.above, at.name, at.path);
        if (!next && !at.last) {
            return FailMkdir(errno, ZOS_ERR_SYSTEM);
        }
    }
    folder = std::move(next);
    return 0;
}

/** Works on a copy of the path, which it cuts behind one component after the other. */
int Walk(char* path, size_t& reached, const Rules& rules) {
    UniqueFd folder(open(*path == '/' ? "/" : ".", O_PATH | O_DIRECTORY | O_CLOEXEC));
    char* begin = path + strspn(path, "/");
    while (*begin != '\0') {
        char* end = begin + strcspn(begin, "/");
        char* next = end + strspn(end, "/");
        reached = static_cast<size_t>(end - path);

        const char separator = *end;
        *end = '\0';
        if (PassComponent(folder, {folder.Get(), begin, path, *next == '\0'}, rules) != 0) {
            return -1;
        }
        *end = separator;
        begin = next;
    }
    return 0;
}

}  // namespace

int MkdirP(const char* path, char** stop, int replaceNonDir, unsigned int uid, unsigned int gid,
           unsigned int mode) {
    if (path == nullptr || *path == '\0') {
        LOG_ERROR("Invaild Argument (%s)=[%d]\n", "path is null or empty", 1);
        return FailMkdir(EINVAL, ZOS_ERR_BAD_PARAMETER);
    }
    const UniqueCString copy(strdup(path));
    if (copy == nullptr) {
        return FailMkdir(ENOMEM, ZOS_ERR_OUT_OF_MEMORY);
    }
    const NoUmask no_umask(mode != kLeaveAlone);
    size_t reached = 0;
    const int result = Walk(copy.get(), reached, MakeRules(replaceNonDir, uid, gid, mode));
    if (stop != nullptr) {
        *stop = const_cast<char*>(path) + reached;
    }
    return result;
}

bool CreateFolder(const char* path, char** stop, bool replaceNonDir, unsigned int uid,
                  unsigned int gid, unsigned int mode) {
    int result = 0;
    int error = 0;
    {
        const EffectiveUid as_root(0);
        errno = 0;
        result = MkdirP(path, stop, replaceNonDir ? 1 : 0, uid, gid, mode);
        error = errno;
    }
    errno = error;
    if (result == 0 || (YLIBCErrGet() == ZOS_ERR_SYSTEM && error == EEXIST)) {
        return true;
    }
    LOG_ERROR("Failed to mkdir %s " PLATFORM_ERROR_FORMAT ", %m", path == nullptr ? "" : path,
              ZYROERR_ARGS);
    return false;
}

OwnedFolder CreateOwnedFolder(const std::string& path, uid_t user) {
    constexpr unsigned kOpenToAll = 0777;
    OwnedFolder folder = OwnedFolder::Open(path, user);
    if (!folder &&
        CreateFolder(path.c_str(), nullptr, true, kLeaveAlone, kLeaveAlone, kOpenToAll)) {
        folder = OwnedFolder::Open(path, user);
    }
    return folder;
}

OwnedFolder CreateParentFolder(const std::string& path, uid_t user, SourceLine at) {
    const std::string above = SplitPath(path).folder;
    OwnedFolder folder = CreateOwnedFolder(above, user);
    if (!folder) {
        LOG_ERROR_AT(at, "Failed to mkdir %s, %m", above.c_str());
    }
    return folder;
}

}  // namespace ZYROVFS::Utils
