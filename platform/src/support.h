/** What the units of the platform share. Nothing of it is visible outside of the library. */
#ifndef ZOSPLATFORM_SRC_SUPPORT_H
#define ZOSPLATFORM_SRC_SUPPORT_H

#include <sys/types.h>
#include <unistd.h>

#include <cerrno>
#include <new>
#include <string>
#include <utility>

#include "zosplatform/error.h"

/** Sets the platform error in the name of this unit and line. */
#define SET_PLATFORM_ERROR(code) YLIBCErrSetEx((code), __FILE_NAME__, __LINE__)

/** The same for a failed system call: by errno, or `otherwise` where errno has no code. */
#define SET_SYSTEM_ERROR(otherwise) SET_PLATFORM_ERROR(zos::CodeOfErrno(errno, (otherwise)))

namespace zos {

/** Owns one file descriptor. Closing leaves errno alone, so a failure can still be told. */
class Fd {
  public:
    explicit Fd(int fd = -1) : fd_(fd) {}
    Fd(Fd&& other) noexcept : fd_(other.Release()) {}
    Fd& operator=(Fd&& other) noexcept {
        std::swap(fd_, other.fd_);
        return *this;
    }
    Fd(const Fd&) = delete;
    Fd& operator=(const Fd&) = delete;
    ~Fd() {
        if (fd_ >= 0) {
            const int saved = errno;
            close(fd_);
            errno = saved;
        }
    }

    int Get() const { return fd_; }
    explicit operator bool() const { return fd_ >= 0; }
    int Release() { return std::exchange(fd_, -1); }

  private:
    int fd_;
};

/** Runs the body of a C function: memory that runs out is its failure, not an exception. */
template <typename Result, typename Body>
Result OrOutOfMemory(Result failure, Body body) noexcept {
    try {
        return body();
    } catch (const std::exception&) {
        SET_PLATFORM_ERROR(ZOS_ERR_OUT_OF_MEMORY);
        return failure;
    }
}

unsigned int CodeOfErrno(int error, unsigned int otherwise);

/**
 * Opens a file that has to be a regular one: a FIFO is not waited for. With `dir` AT_FDCWD `path`
 * stands for itself. `flags` 0 is for reading, no link followed with O_NOFOLLOW. Without a file
 * errno tells why.
 */
Fd OpenRegular(int dir, const std::string& path, int flags);

bool ReadAll(int fd, std::string& text);

/**
 * A file that is complete before it gets its name: made beside the place where it will stand,
 * written, flushed to disk, and only then named. Without a name it goes again.
 */
class FreshFile {
  public:
    explicit FreshFile(int dir) : dir_(dir) {}
    FreshFile(const FreshFile&) = delete;
    FreshFile& operator=(const FreshFile&) = delete;
    ~FreshFile();

    /** Makes the file and writes it. The mode is taken as it is; an owner of -1 is left alone.
     */
    bool Write(const std::string& text, mode_t mode, uid_t uid, gid_t gid);
    /** Takes the place of `name`, whatever stands there. */
    bool Replace(const std::string& name);
    /** Becomes `name` if nothing stands there, else fails with EEXIST. */
    bool Publish(const std::string& name);

  private:
    Fd Create();

    int dir_;
    std::string name_;
};

}  // namespace zos

#endif
