#include "support.h"

#include <fcntl.h>
#include <sys/random.h>
#include <sys/stat.h>

#include <array>
#include <cinttypes>
#include <cstdio>

#include "zosplatform/file.h"

namespace zos {
namespace {

struct Row {
    int error;
    unsigned int code;
};

constexpr std::array<Row, 12> kCodes{{
    {ENOMEM, ZOS_ERR_OUT_OF_MEMORY},
    {EACCES, ZOS_ERR_NO_PERMISSION},
    {EPERM, ZOS_ERR_NO_PERMISSION},
    {EROFS, ZOS_ERR_NO_PERMISSION},
    {EAGAIN, ZOS_ERR_TRY_AGAIN},
    {EINTR, ZOS_ERR_TRY_AGAIN},
    {ENOENT, ZOS_ERR_NOT_FOUND},
    {ESRCH, ZOS_ERR_NOT_FOUND},
    {EEXIST, ZOS_ERR_EXISTS},
    {EINVAL, ZOS_ERR_BAD_PARAMETER},
    {ENOSPC, ZOS_ERR_WRITE_FAILED},
    {EDQUOT, ZOS_ERR_WRITE_FAILED},
}};

}  // namespace

unsigned int CodeOfErrno(int error, unsigned int otherwise) {
    for (const Row& row : kCodes) {
        if (row.error == error) {
            return row.code;
        }
    }
    return otherwise;
}

Fd OpenRegular(int dir, const std::string& path, int flags) {
    Fd fd(openat(dir, path.c_str(), O_CLOEXEC | O_NONBLOCK | O_NOCTTY | flags));
    struct stat info {};
    if (!fd || fstat(fd.Get(), &info) != 0) {
        return Fd();
    }
    if (!S_ISREG(info.st_mode)) {
        errno = S_ISDIR(info.st_mode) ? EISDIR : ENXIO;
        return Fd();
    }
    return fd;
}

bool ReadAll(int fd, std::string& text) {
    char buffer[65536];
    for (;;) {
        const ssize_t n = read(fd, buffer, sizeof buffer);
        if (n == 0) {
            return true;
        }
        if (n > 0) {
            text.append(buffer, static_cast<size_t>(n));
        } else if (errno != EINTR) {
            return false;
        }
    }
}

FreshFile::~FreshFile() {
    if (!name_.empty()) {
        const int saved = errno;
        unlinkat(dir_, name_.c_str(), 0);
        errno = saved;
    }
}

Fd FreshFile::Create() {
    uint64_t number = 0;
    if (getrandom(&number, sizeof number, 0) != sizeof number) {
        return Fd();
    }
    char name[32];
    std::snprintf(name, sizeof name, ".new-%016" PRIx64, number);
    name_.reserve(sizeof name);
    Fd fd(openat(dir_, name, O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC | O_NOFOLLOW, 0600));
    if (fd) {
        name_ = name;
    }
    return fd;
}

bool FreshFile::Write(const std::string& text, mode_t mode, uid_t uid, gid_t gid) {
    const Fd fd = Create();
    return fd && ZYROWriteFileFd(fd.Get(), text.data(), text.size()) == ssize_t(text.size()) &&
           fchown(fd.Get(), uid, gid) == 0 && fchmod(fd.Get(), mode) == 0 && fsync(fd.Get()) == 0;
}

bool FreshFile::Replace(const std::string& name) {
    if (renameat(dir_, name_.c_str(), dir_, name.c_str()) != 0) {
        return false;
    }
    name_.clear();
    return fsync(dir_) == 0;
}

bool FreshFile::Publish(const std::string& name) {
    return linkat(dir_, name_.c_str(), dir_, name.c_str(), 0) == 0 && fsync(dir_) == 0;
}

}  // namespace zos
