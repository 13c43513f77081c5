#include "mount/program.h"

#include <fcntl.h>
#include <unistd.h>
#include <zosplatform/process.h>

#include <cerrno>
#include <csignal>

#include "core/handle.h"
#include "mount/fork_as_user.h"
#include "mount/program_child.h"

namespace ZYROVFS {
namespace {

std::vector<char*> Pointers(const std::vector<std::string>& texts) {
    std::vector<char*> pointers;
    pointers.reserve(texts.size() + 1);
    for (const std::string& text : texts) {
        pointers.push_back(const_cast<char*>(text.c_str()));
    }
    pointers.push_back(nullptr);
    return pointers;
}

/** Copies above the numbers that the child fills: a caller may have closed its own 0, 1 and 2, and
 * then anything opened since stands there. */
class HighCopies {
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
StartReport ReadReport(int pipe) {
    StartReport report{0, IdentityStep::kDone, 0};
    for (;;) {
        StartReport piece{};
        const ssize_t n = read(pipe, &piece, sizeof piece);
        if (n < 0 && errno == EINTR) {
            continue;
        }
        if (n != sizeof piece) {
            return report;
        }
        if (piece.daemon != 0) {
            report.daemon = piece.daemon;
        } else {
            report.step = piece.step;
            report.error = piece.error;
        }
    }
}

/** The pid that was forked, or -1 with errno. */
pid_t ForkReporting(const Program& program, uid_t uid, int report_end,
                    void (*become)(const Start&)) {
    const UniqueFd null(open("/dev/null", O_RDWR | O_CLOEXEC));
    Start start{Pointers(program.command), Pointers(program.environment), {}, -1, uid};
    HighCopies copies;
    for (const int fd : program.descriptors) {
        if (!copies.Add(fd < 0 ? null.Get() : fd)) {
            return -1;
        }
        start.descriptors.push_back(copies.Last());
    }
    if (!copies.Add(report_end)) {
        return -1;
    }
    start.report_fd = copies.Last();
    return ForkInto(start, become);
}

/** The same; `report` says what came of it. */
pid_t Launch(const Program& program, uid_t uid, void (*become)(const Start&), StartReport& report) {
    int ends[2];
    if (pipe2(ends, O_CLOEXEC) != 0) {
        return -1;
    }
    const UniqueFd answer(ends[0]);
    UniqueFd report_end(ends[1]);
    const pid_t pid = ForkReporting(program, uid, report_end.Get(), become);
    if (pid > 0) {
        report_end.Reset();
        report = ReadReport(answer.Get());
    }
    return pid;
}

}  // namespace

pid_t StartChild(const Program& program) {
    StartReport report{};
    const pid_t pid = Launch(program, kOwnIdentity, BecomeChild, report);
    if (pid > 0 && report.error != 0) {
        WaitForChild(pid);
        errno = report.error;
        return -1;
    }
    return pid;
}

pid_t StartDaemon(const Program& program, uid_t uid, SourceLine at) {
    StartReport report{};
    const pid_t between = Launch(program, uid, BecomeDaemon, report);
    if (between < 0) {
        return -1;
    }
    WaitForChild(between);
    errno = report.error;
    if (report.step != IdentityStep::kDone) {
        LogIdentity(report.step, uid, at);
    }
    return report.error == 0 && report.daemon > 0 ? report.daemon : -1;
}

}  // namespace ZYROVFS
