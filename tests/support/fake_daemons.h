/**
 * Programs put in the place of a user's daemons on the private host. Each writes down how it was
 * started, into /tmp/fakes, and then does as the test says.
 */
#ifndef ZYROVFS_TESTS_FAKE_DAEMONS_H
#define ZYROVFS_TESTS_FAKE_DAEMONS_H

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/file.h>
#include <sys/mount.h>
#include <sys/prctl.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <csignal>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <functional>
#include <sstream>
#include <string>
#include <thread>

#include "core/handle.h"
#include "core/paths.h"
#include "support/helper_in_process.h"

namespace fakes {

namespace paths = ZYROVFS::paths;

constexpr unsigned kUser = 4001;
constexpr const char* kReports = "/tmp/fakes";
constexpr const char* kAddress = "unix:path=/tmp/fakes/bus,guid=0123";

inline std::string Read(const std::string& path) {
    std::ifstream file(path);
    std::stringstream text;
    text << file.rdbuf();
    return text.str();
}

/** Writes a file; folders that are missing are open to all, as the library makes them. */
inline void Write(const std::string& path, const std::string& text) {
    const mode_t mask = umask(0);
    std::filesystem::create_directories(std::filesystem::path(path).parent_path());
    umask(mask);
    std::ofstream(path) << text;
}

/** Waits, up to ten seconds of real time, for another process to bring something about. */
inline bool Eventually(const std::function<bool()>& condition) {
    for (int i = 0; i < 1000; ++i) {
        if (condition()) {
            return true;
        }
        std::this_thread::sleep_for(std::chrono::milliseconds(10));
    }
    return false;
}

/** Puts a script in the place of a program. */
inline void Install(const std::string& program, const std::string& script) {
    std::filesystem::remove(program);
    Write(program, "#!/bin/bash\n" + script);
    chmod(program.c_str(), 0755);
}

/** How a daemon was started; written before the rest of its script runs. */
constexpr const char* kReport = R"(
report=/tmp/fakes/$(basename "$0")
ls -l /proc/$$/fd >"$report.fds"
tr '\0' '\n' </proc/$$/environ >"$report.env"
echo $$ >>"$report.pids"
{ echo "$*"; grep -E '^(Uid|Gid|Groups):' /proc/$$/status; ps -o sid= -p $$; } >"$report.new"
mv "$report.new" "$report"
)";

constexpr const char* kStay = "sleep 1000 & wait\n";

inline void InstallBus(const std::string& says, const std::string& then = kStay) {
    Install(paths::kDbusDaemon, std::string(kReport) + "fd=${2#--print-address=}\nprintf '" + says +
                                    "' >&$fd\nexec {fd}>&-\n" + then);
}
inline void InstallGvfsd(const std::string& then = kStay) {
    Install(paths::kGvfsd, kReport + then);
}
inline void InstallFuse(const std::string& then = kStay) {
    Install(paths::kGvfsdFuse, kReport + then);
}
inline void InstallAll() {
    InstallBus(std::string(kAddress) + "\\n");
    InstallGvfsd();
    InstallFuse();
}

/** What a fake daemon wrote down: "", "env", "fds" or "pids". Empty when it was not started. */
inline std::string Report(const std::string& name, const std::string& what = "") {
    const std::string path = std::string(kReports) + "/" + name;
    return Read(what.empty() ? path : path + "." + what);
}

inline bool Started(const std::string& name) {
    return Eventually([&] { return !Report(name).empty(); });
}

/** How often a fake was started. A start that has not come yet is not seen. */
inline long Starts(const std::string& name) {
    const std::string pids = Report(name, "pids");
    return std::count(pids.begin(), pids.end(), '\n');
}

/** Ends everything that this process has below it, and collects it. */
inline void EndChildren() {
    const std::string list = "/proc/self/task/" + std::to_string(getpid()) + "/children";
    for (std::string pids = Read(list); !pids.empty(); pids = Read(list)) {
        std::istringstream numbers(pids);
        for (pid_t pid = 0; numbers >> pid;) {
            kill(pid, SIGKILL);
            waitpid(pid, nullptr, 0);
        }
    }
}

/** A clean machine and an environment that acts for kUser. */
class DaemonTest : public testing::Test {
  protected:
    void SetUp() override {
        // Daemons come to this process when the one that started them goes, so that none of them
        // lives on into the next test.
        prctl(PR_SET_CHILD_SUBREAPER, 1);
        for (const char* tree : {"/var/tmp/user", "/tmp/zyrovfs", kReports}) {
            std::filesystem::remove_all(tree);
        }
        mkdir(kReports, 0777);
        chmod(kReports, 0777);
        setenv("ZYROVFS_UID", std::to_string(kUser).c_str(), 1);
        unsetenv("DBUS_SESSION_BUS_ADDRESS");
        InstallAll();
    }
    void TearDown() override {
        EndChildren();
        umount2(paths::FuseTree(kUser).c_str(), MNT_DETACH);
    }
};

/** A living process of a given name and owner. */
class LiveProcess {
  public:
    LiveProcess(const char* name, uid_t uid) {
        int ready[2];
        if (pipe(ready) != 0) {
            abort();
        }
        pid_ = fork();
        if (pid_ == 0) {
            prctl(PR_SET_NAME, name);
            prctl(PR_SET_PDEATHSIG, SIGKILL);
            if (syscall(SYS_setresuid, uid, uid, uid) != 0 || write(ready[1], "", 1) != 1) {
                _exit(1);
            }
            for (;;) {
                pause();
            }
        }
        char byte = 0;
        if (read(ready[0], &byte, 1) != 1) {
            abort();
        }
        close(ready[0]);
        close(ready[1]);
    }
    LiveProcess(const LiveProcess&) = delete;
    LiveProcess& operator=(const LiveProcess&) = delete;
    ~LiveProcess() { End(); }

    int pid() const { return pid_; }
    void End() {
        if (pid_ > 0 && waitpid(pid_, nullptr, WNOHANG) == 0) {
            kill(pid_, SIGKILL);
            waitpid(pid_, nullptr, 0);
        }
        pid_ = 0;
    }

  private:
    pid_t pid_ = 0;
};

/** The user's mount lock as another process holds it. */
class ForeignLock {
  public:
    explicit ForeignLock(int operation = LOCK_EX) {
        Write(paths::MountLock(kUser), "");
        fd_.Reset(open(paths::MountLock(kUser).c_str(), O_RDONLY | O_CLOEXEC));
        if (flock(fd_.Get(), operation | LOCK_NB) != 0) {
            ADD_FAILURE() << "the mount lock was still held";
        }
    }

  private:
    ZYROVFS::UniqueFd fd_;
};

/** Whether nobody holds the mount lock any more. */
inline bool LockIsFree() {
    const ZYROVFS::UniqueFd fd(open(paths::MountLock(kUser).c_str(), O_RDONLY | O_CLOEXEC));
    return flock(fd.Get(), LOCK_EX | LOCK_NB) == 0;
}

/** A fuse mount whose daemon is gone: every access fails. */
inline bool MakeStaleMount(const std::string& path) {
    std::filesystem::create_directories(path);
    const ZYROVFS::UniqueFd fuse(open("/dev/fuse", O_RDWR | O_CLOEXEC));
    const std::string options =
        "fd=" + std::to_string(fuse.Get()) + ",rootmode=40000,user_id=0,group_id=0,allow_other";
    return mount("gvfsd-fuse", path.c_str(), "fuse", MS_NOSUID | MS_NODEV, options.c_str()) == 0;
}

/** Runs a body with expectations in a process of its own, whose state starts fresh. */
inline void InFreshProcess(const std::function<void()>& body) {
    fflush(nullptr);
    const pid_t pid = fork();
    if (pid == 0) {
        body();
        fflush(nullptr);
        _exit(testing::Test::HasFailure() ? 1 : 0);
    }
    int status = 0;
    waitpid(pid, &status, 0);
    EXPECT_EQ(status, 0) << "see the failures above";
}

}  // namespace fakes

#endif
