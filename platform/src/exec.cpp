#include <fcntl.h>
#include <spawn.h>
#include <sys/wait.h>

#include <csignal>
#include <cstdarg>
#include <vector>

#include "exec.h"
#include "support.h"
#include "zosplatform/file.h"
#include "zosplatform/process.h"

namespace {

constexpr int kFailed = -1;

/**
 * Makes sure that the status of a child can be had. A caller that ignores its children would have
 * the kernel drop it, and one that collects them all in a handler would take it first: SIGCHLD is
 * held back and no longer ignored until the child has ended.
 */
class ChildStatusGuard {
  public:
    ChildStatusGuard() {
        sigset_t child;
        sigemptyset(&child);
        sigaddset(&child, SIGCHLD);
        pthread_sigmask(SIG_BLOCK, &child, &mask_);
        sigaction(SIGCHLD, nullptr, &action_);
        if (Ignores(action_)) {
            struct sigaction collect = action_;
            collect.sa_flags &= ~SA_NOCLDWAIT;
            if (collect.sa_handler == SIG_IGN) {
                collect.sa_handler = SIG_DFL;
            }
            sigaction(SIGCHLD, &collect, nullptr);
        }
    }
    ChildStatusGuard(const ChildStatusGuard&) = delete;
    ChildStatusGuard& operator=(const ChildStatusGuard&) = delete;
    ~ChildStatusGuard() {
        const int saved = errno;
        if (Ignores(action_)) {
            sigaction(SIGCHLD, &action_, nullptr);
        }
        pthread_sigmask(SIG_SETMASK, &mask_, nullptr);
        errno = saved;
    }

  private:
    static bool Ignores(const struct sigaction& action) {
        return (action.sa_flags & SA_NOCLDWAIT) != 0 ||
               ((action.sa_flags & SA_SIGINFO) == 0 && action.sa_handler == SIG_IGN);
    }

    sigset_t mask_{};
    struct sigaction action_ {};
};

/** How a program starts here: no input, no open files, no signal blocked or ignored. */
class StartRules {
  public:
    explicit StartRules(zos::Output output) {
        posix_spawn_file_actions_init(&files_);
        posix_spawn_file_actions_addopen(&files_, STDIN_FILENO, "/dev/null", O_RDONLY, 0);
        posix_spawn_file_actions_addopen(&files_, STDOUT_FILENO, "/dev/null", O_WRONLY, 0);
        if (output == zos::Output::kNone) {
            posix_spawn_file_actions_adddup2(&files_, STDOUT_FILENO, STDERR_FILENO);
        }
        posix_spawn_file_actions_addclosefrom_np(&files_, STDERR_FILENO + 1);
        posix_spawnattr_init(&attributes_);
        sigset_t signals;
        sigemptyset(&signals);
        posix_spawnattr_setsigmask(&attributes_, &signals);
        sigfillset(&signals);
        posix_spawnattr_setsigdefault(&attributes_, &signals);
        posix_spawnattr_setflags(&attributes_, POSIX_SPAWN_SETSIGMASK | POSIX_SPAWN_SETSIGDEF);
    }
    StartRules(const StartRules&) = delete;
    StartRules& operator=(const StartRules&) = delete;
    ~StartRules() {
        posix_spawn_file_actions_destroy(&files_);
        posix_spawnattr_destroy(&attributes_);
    }

    int Start(pid_t& pid, const char* path, const char* const argv[]) const {
        return posix_spawn(&pid, path, &files_, &attributes_, const_cast<char**>(argv), environ);
    }

  private:
    posix_spawn_file_actions_t files_;
    posix_spawnattr_t attributes_;
};

/** Exit status, or -1: killed, ended with 127, or collected by another thread of the caller. */
int Collect(pid_t pid) {
    constexpr int kShellCouldNotStartIt = 127;
    int status = 0;
    while (waitpid(pid, &status, 0) < 0) {
        if (errno != EINTR) {
            return kFailed;
        }
    }
    const bool ended = WIFEXITED(status) && WEXITSTATUS(status) != kShellCouldNotStartIt;
    return ended ? WEXITSTATUS(status) : kFailed;
}

}  // namespace

int zos::Run(const char* path, const char* const argv[], Output output) {
    const ChildStatusGuard guard;
    pid_t pid = -1;
    const int error = StartRules(output).Start(pid, path, argv);
    if (error != 0) {
        errno = error;
        SET_SYSTEM_ERROR(ZOS_ERR_OPEN_FAILED);
        return kFailed;
    }
    const int status = Collect(pid);
    if (status < 0) {
        SET_PLATFORM_ERROR(ZOS_ERR_SYSTEM);
    }
    return status;
}

int YLIBCExecv(const char* path, const char* const argv[]) {
    if (path == nullptr || argv == nullptr || argv[0] == nullptr) {
        SET_PLATFORM_ERROR(ZOS_ERR_BAD_PARAMETER);
        return kFailed;
    }
    return zos::Run(path, argv, zos::Output::kErrors);
}

int YLIBCExec(const char* path, ...) {
    std::vector<const char*> argv;
    const auto append = [&argv](const char* argument) {
        return zos::OrOutOfMemory(false, [&] {
            argv.push_back(argument);
            return true;
        });
    };
    bool appended = append(path);
    va_list args;
    va_start(args, path);
    while (appended && argv.back() != nullptr) {
        appended = append(va_arg(args, const char*));
    }
    va_end(args);
    return appended ? YLIBCExecv(path, argv.data()) : kFailed;
}

int YLIBServicectlStart(const char* service, int) {
    if (service == nullptr || *service == '\0') {
        SET_PLATFORM_ERROR(ZOS_ERR_BAD_PARAMETER);
        return kFailed;
    }
    if (YLIBCFileCheckDir("/run/systemd/system") == 0) {
        return 0;
    }
    const char* const argv[] = {
        "systemctl", "--quiet", "--no-ask-password", "--no-block", "start", "--", service, nullptr};
    return zos::Run("/usr/bin/systemctl", argv, zos::Output::kNone) == 0 ? 0 : kFailed;
}
