#include "mount/program_child.h"

#include <fcntl.h>
#include <linux/close_range.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>

namespace ZYROVFS {
namespace {

void SendReport(const Start& start, const StartReport& report) {
    if (write(start.report_fd, &report, sizeof report) != sizeof report) {
        _exit(1);  // the parent is gone
    }
}

[[noreturn]] void Fail(const Start& start, IdentityStep step = IdentityStep::kDone) {
    SendReport(start, {0, step, errno});
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
            Fail(start);
        }
    }
    CloseOnExecFrom(start.descriptors.size());
}

/** Real and effective ids that differ make the loader and GLib distrust the environment, and the
 * new program loses the saved one. */
bool LevelIds() {
    if (geteuid() != 0) {
        return true;
    }
    return (getgid() == getegid() || setregid(getegid(), getegid()) == 0) &&
           (getuid() == 0 || setreuid(0, 0) == 0);
}

[[noreturn]] void Execute(const Start& start) {
    execve(start.argv.front(), start.argv.data(), start.environment.data());
    Fail(start);
}

}  // namespace

void BecomeChild(const Start& start) {
    ResetSignals();
    TakeDescriptors(start);
    RegainRoot();
    if (!LevelIds()) {
        Fail(start);
    }
    Execute(start);
}

/** The process in between ends at once, so that the daemon belongs to nobody. */
void BecomeDaemon(const Start& start) {
    ResetSignals();
    TakeDescriptors(start);
    setsid();
    const pid_t daemon = _Fork();
    if (daemon < 0) {
        Fail(start);
    }
    if (daemon > 0) {
        SendReport(start, {daemon, IdentityStep::kDone, 0});
        _exit(0);
    }
    const IdentityStep step =
        start.uid == kOwnIdentity ? IdentityStep::kDone : TryBecomeUserBySavedRoot(start.uid);
    if (step != IdentityStep::kDone) {
        Fail(start, step);
    }
    if (chdir("/") != 0) {
        Fail(start);
    }
    Execute(start);
}

}  // namespace ZYROVFS
