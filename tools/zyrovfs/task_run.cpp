#include "task_run.h"

#include <grp.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>
#include <zosplatform/user.h>
#include <zyrovfs/task.h>

#include <cerrno>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <cstring>

#include "report.h"
#include "task_queue.h"
#include "task_turn.h"

namespace tool {
namespace {

using ZYROVFS::TaskMgr;

constexpr int kBySignal = 128;
constexpr int kCannotExecute = 126;
constexpr int kNotFound = 127;

/**
 * Signals that ask for the end are kept back and taken between two steps, so that none ends the
 * tool with its entry in the queue. One that the caller ignores (nohup) stays ignored.
 */
class HeldSignals {
  public:
    HeldSignals() {
        sigemptyset(&set_);
        sigaddset(&set_, SIGCHLD);
        signal(SIGCHLD, SIG_DFL);
        for (const int number : {SIGINT, SIGTERM, SIGHUP}) {
            struct sigaction action {};
            if (sigaction(number, nullptr, &action) == 0 && action.sa_handler != SIG_IGN) {
                sigaddset(&set_, number);
            }
        }
        sigprocmask(SIG_BLOCK, &set_, &before_);
    }
    HeldSignals(const HeldSignals&) = delete;
    HeldSignals& operator=(const HeldSignals&) = delete;
    ~HeldSignals() { LetGo(); }

    void LetGo() const { sigprocmask(SIG_SETMASK, &before_, nullptr); }

    /** The next signal, or 0 when none comes within the time; null waits as long as it takes. */
    int Take(const timespec* within, siginfo_t& info) const {
        for (;;) {
            const int number =
                within == nullptr ? sigwaitinfo(&set_, &info) : sigtimedwait(&set_, &info, within);
            if (number > 0 || errno != EINTR) {
                return number > 0 ? number : 0;
            }
        }
    }

  private:
    sigset_t set_{};
    sigset_t before_{};
};

constexpr int kQueueFailed = -1;

void TellPlace(const TaskRun& run, int64_t place, int64_t& told) {
    if (place != told) {
        fprintf(stderr, "%s: waiting at place %lld, %u may run at once\n", run.name.c_str(),
                static_cast<long long>(place), run.limit);
        told = place;
    }
}

/** 0 when the turn has come, the signal that ended the wait, or kQueueFailed. */
int Wait(const TaskRun& run, const HeldSignals& signals) {
    constexpr timespec kPause{0, 200000000};
    constexpr timespec kNoPause{0, 0};
    int64_t told = 0;
    int number = 0;
    const auto take = [&](const timespec& pause) {
        siginfo_t info{};
        number = signals.Take(&pause, info);
        number = number == SIGCHLD ? 0 : number;
        return number != 0;
    };
    const Turn turn = WaitForTurn(
        run.name, run.id, run.limit, [&](int64_t place) { TellPlace(run, place, told); },
        [&] { return take(kPause); });
    if (turn == Turn::kQueueFailed) {
        return kQueueFailed;
    }
    if (turn == Turn::kCame) {
        if (told != 0) {
            fprintf(stderr, "%s: running\n", run.name.c_str());
        }
        take(kNoPause);
    }
    return number;
}

/** In the command's process. Without an entry in the user directory HOME stays the caller's. */
void SetEnvironment(unsigned int uid) {
    PZYROUSER user = nullptr;
    if (ZYROUserGetByUID(uid, &user) == 0) {
        setenv("HOME", user->home, 1);
        setenv("USER", user->name, 1);
        setenv("LOGNAME", user->name, 1);
        ZYROUserFree(user);
    }
    setenv("XDG_RUNTIME_DIR", ("/var/tmp/user/" + std::to_string(uid)).c_str(), 1);
}

/** The command's process becomes the user in the group that all users have, for good. */
bool BecomeUser(unsigned int uid) {
    constexpr gid_t kUsers = 100;
    return setgroups(0, nullptr) == 0 && setresgid(kUsers, kUsers, kUsers) == 0 &&
           setresuid(uid, uid, uid) == 0;
}

[[noreturn]] void Execute(unsigned int uid, const TaskRun& run, const HeldSignals& signals,
                          pid_t parent) {
    std::vector<char*> argv;
    argv.reserve(run.command.size() + 1);
    for (const std::string& argument : run.command) {
        argv.push_back(const_cast<char*>(argument.c_str()));
    }
    argv.push_back(nullptr);
    SetEnvironment(uid);
    // The command must not outlive its entry, also when the tool is killed.
    if (!BecomeUser(uid) || prctl(PR_SET_PDEATHSIG, SIGTERM) != 0 || getppid() != parent) {
        perror("zyrovfs: becoming the user");
        _exit(kCannotExecute);
    }
    signals.LetGo();
    execvp(argv[0], argv.data());
    const int error = errno;
    fprintf(stderr, "zyrovfs: %s: %s\n", argv[0], strerror(error));
    _exit(error == ENOENT ? kNotFound : kCannotExecute);
}

/** True with its exit status in `status` when the command has ended. */
bool HasEnded(pid_t pid, int& status) {
    int ended = 0;
    if (waitpid(pid, &ended, WNOHANG) != pid) {
        return false;
    }
    status = WIFEXITED(ended) ? WEXITSTATUS(ended) : kBySignal + WTERMSIG(ended);
    return true;
}

int RunCommand(unsigned int uid, const TaskRun& run, const HeldSignals& signals) {
    fflush(nullptr);
    const pid_t parent = getpid();
    const pid_t pid = fork();
    if (pid == 0) {
        Execute(uid, run, signals, parent);
    }
    if (pid < 0) {
        return ReportProblem(std::string("No process could be started: ") + strerror(errno), false);
    }
    int status = 0;
    while (!HasEnded(pid, status)) {
        siginfo_t info{};
        const int number = signals.Take(nullptr, info);
        // What a terminal sends, the command has got itself.
        if (number != 0 && number != SIGCHLD && info.si_code != SI_KERNEL) {
            kill(pid, number);
        }
    }
    return status;
}

}  // namespace

int RunTask(unsigned int uid, const TaskRun& chosen, bool json) {
    TaskRun run = chosen;
    if (run.id.empty()) {
        run.id = "run-" + std::to_string(getpid());
    }
    const HeldSignals signals;
    TaskMgr tasks(run.limit);
    if (!tasks.Add(run.name.c_str(), run.id.c_str(), getpid())) {
        return ReportProblem(
            "The queue " + run.name + " cannot be written; the system log tells why.", json);
    }
    const int waited = Wait(run, signals);
    int status = kBySignal + waited;
    if (waited == 0) {
        status = RunCommand(uid, run, signals);
    } else if (waited == kQueueFailed) {
        status = ReportProblem(
            "The queue " + run.name + " cannot be read; the system log tells why.", json);
    }
    // Where that fails, the entry counts no more once this process has ended, and the next clean-up
    // takes it out.
    RemoveTask(run.name, run.id, getpid());
    return status;
}

}  // namespace tool
