#include "mount/program.h"

#include <fcntl.h>
#include <linux/close_range.h>
#include <unistd.h>
#include <zosplatform/process.h>

#include <array>
#include <cerrno>
#include <csignal>
#include <cstdlib>

#include "core/handle.h"
#include "core/paths.h"
#include "mount/bus_address.h"
#include "mount/fork_as_user.h"

namespace ZYROVFS {
namespace {

constexpr uid_t kOwnIdentity = static_cast<uid_t>(-1);

/** What the child tells through its pipe, which a program that has started closes. */
struct Told {
    pid_t daemon;  ///< of a daemon that was forked, otherwise 0
    IdentityStep step;
    int error;
};

/** All that the child needs, made before it is there: it may not allocate. */
struct Start {
    std::vector<char*> argv;
    std::vector<char*> environment;
    std::vector<int> descriptors;
    int told;
    uid_t uid;
};

void Tell(const Start& start, const Told& told) {
    if (write(start.told, &told, sizeof told) != sizeof told) {
        _exit(1);  // the parent is gone
    }
}

[[noreturn]] void GiveUp(const Start& start, IdentityStep step = IdentityStep::kDone) {
    Tell(start, {0, step, errno});
    _exit(1);
}

/** A program inherits what is blocked and what is ignored. */
void ResetSignals() {
    struct sigaction action {};
    action.sa_handler = SIG_DFL;
    for (int number = 1; number < NSIG; ++number) {
        sigaction(number, &action, nullptr);
    }
    sigset_t none;
    sigemptyset(&none);
    sigprocmask(SIG_SETMASK, &none, nullptr);
}

/** Whatever the process has open beyond `first` ends with its program. */
void CloseOnExecFrom(unsigned first) {
    if (close_range(first, ~0U, CLOSE_RANGE_CLOEXEC) == 0) {
        return;
    }
    const long end = sysconf(_SC_OPEN_MAX);
    for (int fd = static_cast<int>(first); fd < end; ++fd) {
        fcntl(fd, F_SETFD, FD_CLOEXEC);
    }
}

void TakeDescriptors(const Start& start) {
    for (size_t i = 0; i < start.descriptors.size(); ++i) {
        if (dup2(start.descriptors[i], static_cast<int>(i)) < 0) {
            GiveUp(start);
        }
    }
    CloseOnExecFrom(start.descriptors.size());
}

/** Real and effective ids that differ make the loader and GLib distrust the environment, and the
 * new program loses the saved one. */
void LevelIds() {
    if (geteuid() != 0) {
        return;
    }
    if (getgid() != getegid()) {
        setregid(getegid(), getegid());
    }
    if (getuid() != 0) {
        setreuid(0, 0);
    }
}

[[noreturn]] void Execute(const Start& start) {
    execve(start.argv.front(), start.argv.data(), start.environment.data());
    GiveUp(start);
}

[[noreturn]] void BecomeChild(const Start& start) {
    ResetSignals();
    TakeDescriptors(start);
    RegainRoot();
    LevelIds();
    Execute(start);
}

/** The process in between ends at once, so that the daemon belongs to nobody. */
[[noreturn]] void BecomeDaemon(const Start& start) {
    ResetSignals();
    TakeDescriptors(start);
    setsid();
    const pid_t daemon = _Fork();
    if (daemon < 0) {
        GiveUp(start);
    }
    if (daemon > 0) {
        Tell(start, {daemon, IdentityStep::kDone, 0});
        _exit(0);
    }
    const IdentityStep step =
        start.uid == kOwnIdentity ? IdentityStep::kDone : TryBecomeUserBySavedRoot(start.uid);
    if (step != IdentityStep::kDone) {
        GiveUp(start, step);
    }
    if (chdir("/") != 0) {
        GiveUp(start);
    }
    Execute(start);
}

std::vector<char*> Pointers(const std::vector<std::string>& texts) {
    std::vector<char*> pointers;
    for (const std::string& text : texts) {
        pointers.push_back(const_cast<char*>(text.c_str()));
    }
    pointers.push_back(nullptr);
    return pointers;
}

/** Copies above the numbers that the child fills: a caller may have closed its own 0, 1 and 2, and
 * then anything opened since stands there. */
class Above {
  public:
    bool Add(int fd) {
        constexpr int kFirst = 16;
        copies_.emplace_back(fcntl(fd, F_DUPFD_CLOEXEC, kFirst));
        return static_cast<bool>(copies_.back());
    }
    int Last() const { return copies_.back().Get(); }

  private:
    std::vector<UniqueFd> copies_;
};

/** Signals are held back while the child is made, so that no handler of the caller's runs in it. */
class SignalsHeldBack {
  public:
    SignalsHeldBack() {
        sigset_t all;
        sigfillset(&all);
        pthread_sigmask(SIG_SETMASK, &all, &before_);
    }
    SignalsHeldBack(const SignalsHeldBack&) = delete;
    SignalsHeldBack& operator=(const SignalsHeldBack&) = delete;
    ~SignalsHeldBack() { pthread_sigmask(SIG_SETMASK, &before_, nullptr); }

  private:
    sigset_t before_{};
};

pid_t ForkInto(const Start& start, void (*become)(const Start&)) {
    const SignalsHeldBack held_back;
    const pid_t pid = YLIBCProcFork();
    if (pid == 0) {
        become(start);
    }
    return pid;
}

/** Until the pipe's other end is gone: the program runs, or nothing does. */
Told Listen(int pipe) {
    Told told{0, IdentityStep::kDone, 0};
    for (;;) {
        Told piece{};
        const ssize_t n = read(pipe, &piece, sizeof piece);
        if (n < 0 && errno == EINTR) {
            continue;
        }
        if (n != sizeof piece) {
            return told;
        }
        if (piece.daemon != 0) {
            told.daemon = piece.daemon;
        } else {
            told.step = piece.step;
            told.error = piece.error;
        }
    }
}

/** The pid that was forked, or -1 with errno. */
pid_t ForkTelling(const Program& program, uid_t uid, int teller, void (*become)(const Start&)) {
    const UniqueFd null(open("/dev/null", O_RDWR | O_CLOEXEC));
    Start start{Pointers(program.command), Pointers(program.environment), {}, -1, uid};
    Above above;
    for (const int fd : program.descriptors) {
        if (!above.Add(fd < 0 ? null.Get() : fd)) {
            return -1;
        }
        start.descriptors.push_back(above.Last());
    }
    if (!above.Add(teller)) {
        return -1;
    }
    start.told = above.Last();
    return ForkInto(start, become);
}

/** The same; `told` says what came of it. */
pid_t Launch(const Program& program, uid_t uid, void (*become)(const Start&), Told& told) {
    int ends[2];
    if (pipe2(ends, O_CLOEXEC) != 0) {
        return -1;
    }
    const UniqueFd answer(ends[0]);
    UniqueFd teller(ends[1]);
    const pid_t pid = ForkTelling(program, uid, teller.Get(), become);
    if (pid > 0) {
        teller.Reset();
        told = Listen(answer.Get());
    }
    return pid;
}

}  // namespace

std::vector<std::string> UserEnvironment(uid_t uid) {
    // A proxy's names are those of the platform's resolver, which answers backends that ask.
    constexpr std::array kKept = {
        "LANG",        "LC_ALL",      "LC_CTYPE",  "LC_MESSAGES", "TZ",
        "http_proxy",  "https_proxy", "ftp_proxy", "all_proxy",   "no_proxy",
        "HTTPS_PROXY", "FTP_PROXY",   "ALL_PROXY", "NO_PROXY",
    };
    std::vector<std::string> environment = {
        "PATH=/usr/local/sbin:/usr/local/bin:/usr/sbin:/usr/bin:/sbin:/bin",
        "ZYROVFS_UID=" + std::to_string(uid),
        "XDG_RUNTIME_DIR=" + paths::RuntimeDir(uid),
    };
    const std::string bus = BusAddressOf(uid);
    if (!bus.empty()) {
        environment.push_back("DBUS_SESSION_BUS_ADDRESS=" + bus);
    }
    for (const char* name : kKept) {
        if (const char* value = getenv(name)) {
            environment.push_back(std::string(name) + "=" + value);
        }
    }
    return environment;
}

pid_t StartChild(const Program& program) {
    Told told{};
    const pid_t pid = Launch(program, kOwnIdentity, BecomeChild, told);
    if (pid > 0 && told.error != 0) {
        WaitForChild(pid);
        errno = told.error;
        return -1;
    }
    return pid;
}

pid_t StartDaemon(const Program& program, uid_t uid, SourceLine at) {
    Told told{};
    const pid_t between = Launch(program, uid, BecomeDaemon, told);
    if (between < 0) {
        return -1;
    }
    WaitForChild(between);
    errno = told.error;
    if (told.step != IdentityStep::kDone) {
        LogIdentity(told.step, uid, at);
    }
    return told.error == 0 && told.daemon > 0 ? told.daemon : -1;
}

}  // namespace ZYROVFS
