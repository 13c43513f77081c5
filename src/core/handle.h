/** Owners of what C interfaces hand out. */
#ifndef ZYROVFS_CORE_HANDLE_H
#define ZYROVFS_CORE_HANDLE_H

#include <dirent.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <memory>
#include <utility>

namespace ZYROVFS {

/** Owns one file descriptor. */
class UniqueFd {
  public:
    UniqueFd() = default;
    explicit UniqueFd(int fd) : fd_(fd) {}
    UniqueFd(UniqueFd&& other) noexcept : fd_(other.Release()) {}
    UniqueFd& operator=(UniqueFd&& other) noexcept {
        Reset(other.Release());
        return *this;
    }
    UniqueFd(const UniqueFd&) = delete;
    UniqueFd& operator=(const UniqueFd&) = delete;
    ~UniqueFd() { Reset(); }

    int Get() const { return fd_; }
    explicit operator bool() const { return fd_ >= 0; }
    int Release() { return std::exchange(fd_, -1); }
    void Reset(int fd = -1) {
        if (fd_ >= 0) {
            close(fd_);
        }
        fd_ = fd;
    }

  private:
    int fd_ = -1;
};

/** Frees with the function that belongs to the pointer: `std::unique_ptr<X, FreeWith<x_free>>`. */
template <auto Free>
struct FreeWith {
    template <typename T>
    void operator()(T* p) const {
        Free(p);
    }
};

using UniqueDir = std::unique_ptr<DIR, FreeWith<closedir>>;
using UniqueFile = std::unique_ptr<FILE, FreeWith<fclose>>;
using UniqueCString = std::unique_ptr<char, FreeWith<std::free>>;

/** Runs a step on every way out of a scope. */
template <typename F>
class ScopeExit {
  public:
    explicit ScopeExit(F step) : step_(std::move(step)) {}
    ScopeExit(const ScopeExit&) = delete;
    ScopeExit& operator=(const ScopeExit&) = delete;
    ~ScopeExit() { step_(); }

  private:
    F step_;
};

}  // namespace ZYROVFS

#endif
