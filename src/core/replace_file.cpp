#include "core/replace_file.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <exception>

#include "core/fd_io.h"
#include "core/handle.h"

namespace ZYROVFS {
namespace {

/**
 * By descriptor, and before the file has its name: others may write to the directory, and what
 * they put in the file's place must never be given away.
 */
void GiveAway(int fd, FileOwner owner) {
    if (fchown(fd, owner.uid, owner.gid) != 0) {
        errno = 0;  // not ours to give; the file counts, not its owner
    }
}

/** Runs a clean-up step without losing the errno that tells why it is needed. */
void RemoveKeepingErrno(const std::string& path) {
    const int saved = errno;
    unlink(path.c_str());
    errno = saved;
}

}  // namespace

bool ReplaceFile(const std::string& path, const std::string& text, mode_t mode,
                 FileOwner owner) noexcept try {
    std::string fresh = path + ".XXXXXX";
    const int created = mkostemp(fresh.data(), O_CLOEXEC);
    if (created < 0) {
        return false;
    }
    UniqueFd fd(created);
    GiveAway(fd.Get(), owner);
    if (!WriteAll(fd.Get(), text) || fchmod(fd.Get(), mode) != 0 || fsync(fd.Get()) != 0 ||
        close(fd.Release()) != 0 || rename(fresh.c_str(), path.c_str()) != 0) {
        RemoveKeepingErrno(fresh);
        return false;
    }
    return true;
} catch (const std::exception&) {
    errno = ENOMEM;
    return false;
}

}  // namespace ZYROVFS
