#include "mount/mkdir.h"

#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>

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
        mode == kLeaveAlone ? 0777 : static_cast<mode_t>(mode),
    };
}

bool IsFolder(const char* path) {
    struct stat info {};
    return stat(path, &info) == 0 && S_ISDIR(info.st_mode);
}

bool IsThere(const char* path) {
    struct stat info {};
    return lstat(path, &info) == 0;
}

int MakeFolder(const char* path, const Rules& rules) {
    if (mkdir(path, rules.mode) != 0) {
        // Made by somebody else meanwhile: theirs to own.
        return errno == EEXIST ? 0 : FailMkdir(errno, ZOS_ERR_SYSTEM);
    }
    if (rules.change_owner && chown(path, rules.uid, rules.gid) != 0) {
        const int error = errno;
        LOG_ERROR("Failed to chown %s, %m", path);
        return FailMkdir(error, ZOS_ERR_SYSTEM);
    }
    return 0;
}

/** `path` ends behind the component in question. */
int PassComponent(const char* path, bool last, const Rules& rules) {
    if (IsFolder(path)) {
        return 0;
    }
    if (IsThere(path)) {
        if (!rules.replace_non_dir) {
            return last ? FailMkdir(EEXIST, ZOS_ERR_EXISTS)
                        : FailMkdir(ENOTDIR, ZOS_ERR_NOT_A_FOLDER);
        }
        if (remove(path) != 0) {
            LOG_ERROR("Failed to remove %s, %m", path);
        }
    }
    return MakeFolder(path, rules);
}

/** Works on a copy of the path, which it cuts behind one component after the other. */
int Walk(char* path, size_t& reached, const Rules& rules) {
    char* begin = path + strspn(path, "/");
    while (*begin != '\0') {
        char* end = begin + strcspn(begin, "/");
        char* next = end + strspn(end, "/");
        const bool last = *next == '\0';
        reached = static_cast<size_t>(end - path);

        const char separator = *end;
        *end = '\0';
        if (PassComponent(path, last, rules) != 0) {
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

bool CreateParentFolder(const std::string& path, SourceLine at) {
    constexpr unsigned kOpenToAll = 0777;
    const size_t slash = path.find_last_of('/');
    const std::string folder = slash == std::string::npos ? "."
                               : slash == 0               ? "/"
                                                          : path.substr(0, slash);
    if (CreateFolder(folder.c_str(), nullptr, true, kLeaveAlone, kLeaveAlone, kOpenToAll)) {
        return true;
    }
    LOG_ERROR_AT(at, "Failed to mkdir %s, %m", folder.c_str());
    return false;
}

}  // namespace ZYROVFS::Utils
