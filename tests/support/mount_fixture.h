/**
 * Ground of the tests that go the whole road of a mount or unmount: fork, dialogue, exit status,
 * pipe, parent. For one test program: it defines platform calls of its own.
 */
#ifndef ZYROVFS_TESTS_MOUNT_FIXTURE_H
#define ZYROVFS_TESTS_MOUNT_FIXTURE_H

#include <dlfcn.h>
#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/file.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>
#include <zosplatform/process.h>

#include <cerrno>
#include <csignal>
#include <filesystem>
#include <set>
#include <string>

#include "core/handle.h"
#include "core/paths.h"
#include "support/scripted_location.h"
#include "support/seams.h"
#include "zyrovfs/error.h"
#include "zyrovfs/utils.h"
#include "zyrovfs/vfs.h"

namespace mounting {

inline int forks = 0;
inline bool fork_fails = false;
inline bool pipe_fails = false;

}  // namespace mounting

extern "C" pid_t YLIBCProcFork(void) {
    ++mounting::forks;
    if (mounting::fork_fails) {
        errno = EAGAIN;
        return -1;
    }
    static const auto real = reinterpret_cast<pid_t (*)()>(dlsym(RTLD_NEXT, "YLIBCProcFork"));
    return real();
}

extern "C" int pipe2(int ends[2], int flags) noexcept {
    if (mounting::pipe_fails) {
        errno = EMFILE;
        return -1;
    }
    return static_cast<int>(syscall(SYS_pipe2, ends, flags));
}

namespace mounting {

constexpr uid_t kUser = 5001;

inline std::set<int> OpenDescriptors() {
    std::set<int> open;
    for (int fd = 0; fd < 256; ++fd) {
        if (fcntl(fd, F_GETFD) >= 0) {
            open.insert(fd);
        }
    }
    return open;
}

/** Whether another process could take the user's mount lock now. */
inline bool LockIsFree(uid_t uid = kUser) {
    const ZYROVFS::UniqueFd fd(open(ZYROVFS::paths::MountLock(uid).c_str(), O_RDONLY | O_CLOEXEC));
    return !fd || flock(fd.Get(), LOCK_EX | LOCK_NB) == 0;
}

/** The mount lock as another process holds it: by an open file of its own. */
inline ZYROVFS::UniqueFd HoldLock(uid_t uid = kUser) {
    const std::filesystem::path path = ZYROVFS::paths::MountLock(uid);
    std::filesystem::create_directories(path.parent_path());
    ZYROVFS::UniqueFd fd(open(path.c_str(), O_RDWR | O_CREAT | O_CLOEXEC, 0666));
    EXPECT_EQ(flock(fd.Get(), LOCK_EX | LOCK_NB), 0);
    return fd;
}

/** Sets SIGCHLD's action for a test and puts the old one back. */
class Sigchld {
  public:
    Sigchld(void (*handler)(int), int flags) {
        struct sigaction action {};
        action.sa_handler = handler;
        action.sa_flags = flags;
        sigaction(SIGCHLD, &action, &old_);
    }
    Sigchld(const Sigchld&) = delete;
    Sigchld& operator=(const Sigchld&) = delete;
    ~Sigchld() { sigaction(SIGCHLD, &old_, nullptr); }

    static bool HasNoCldWait() {
        struct sigaction action {};
        sigaction(SIGCHLD, nullptr, &action);
        return (action.sa_flags & SA_NOCLDWAIT) != 0;
    }

  private:
    struct sigaction old_ {};
};

/** Every test also checks that the parent is left as it was: nothing open, locked or uncollected.
 */
class Road : public testing::Test {
  protected:
    static void SetUpTestSuite() {
        setenv("GIO_USE_VFS", "local", 1);
        g_main_context_default();  // which keeps a descriptor open from now on
        for (const char* scheme : {"scripted", "ftp", "sftp", "dav", "davs", "box"}) {
            scripted::Register(scheme);
        }
    }

    Road() {
        seams::WatchChildren();
        scripted::Reset();
        forks = 0;
        fork_fails = pipe_fails = false;
        setenv("ZYROVFS_UID", std::to_string(kUser).c_str(), 1);
        ZYROVFS::ResetError();
        ZYROVFS::VFSSetJson(Json::Value());
        session_.SetURI("scripted://nas");
        open_ = OpenDescriptors();
    }

    ~Road() override {
        EXPECT_EQ(waitpid(-1, nullptr, WNOHANG), -1) << "a child is left";
        EXPECT_EQ(OpenDescriptors(), open_);
        EXPECT_TRUE(LockIsFree());
        EXPECT_EQ(geteuid(), 0U);
        EXPECT_EQ(getegid(), 0U);
        unsetenv("ZYROVFS_UID");
    }

    scripted::Script& Script() { return scripted::TheScript(); }
    const scripted::Seen& Seen() { return scripted::TheSeen(); }

    static Json::Value Detail() {
        Json::Value detail;
        ZYROVFS::VFSGetJson(detail);
        return detail;
    }

    ZYROVFS::VFS session_;
    std::set<int> open_;
};

/** Runs a test's steps as a service whose effective user is the user and whose real one is root. */
class AsUser {
  public:
    AsUser() { EXPECT_EQ(seteuid(kUser), 0); }
    AsUser(const AsUser&) = delete;
    AsUser& operator=(const AsUser&) = delete;
    ~AsUser() { EXPECT_EQ(seteuid(0), 0); }
};

}  // namespace mounting

#endif
