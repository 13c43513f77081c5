#include "support/other_process.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <ctime>

namespace support {

OtherProcess::OtherProcess(const std::function<bool()>& begin) {
    int report[2];
    if (pipe2(report, O_CLOEXEC) != 0) {
        return;
    }
    pid_ = fork();
    if (pid_ == 0) {
        prctl(PR_SET_PDEATHSIG, SIGKILL);
        const char answer = begin() ? 'y' : 'n';
        if (write(report[1], &answer, 1) != 1) {
            _exit(1);
        }
        for (;;) {
            pause();
        }
    }
    close(report[1]);
    char answer = 'n';
    ok_ = read(report[0], &answer, 1) == 1 && answer == 'y';
    close(report[0]);
}

OtherProcess::~OtherProcess() {
    End();
}

void OtherProcess::End() {
    if (pid_ > 0) {
        kill(pid_, SIGKILL);
        waitpid(pid_, nullptr, 0);
        pid_ = -1;
    }
}

bool OtherProcess::Runs() const {
    siginfo_t info{};
    return waitid(P_PID, static_cast<id_t>(pid_), &info, WEXITED | WNOHANG | WNOWAIT) == 0 &&
           info.si_pid == 0;
}

int OtherProcess::EndedBy() {
    for (int i = 0; i < 2000; ++i) {
        int status = 0;
        if (waitpid(pid_, &status, WNOHANG) == pid_) {
            pid_ = -1;
            return WIFSIGNALED(status) ? WTERMSIG(status) : 0;
        }
        const timespec pause{0, 1000000};
        nanosleep(&pause, nullptr);
    }
    return 0;
}

int ExitOf(const std::function<int()>& body) {
    const pid_t pid = fork();
    if (pid == 0) {
        _exit(body());
    }
    int status = 0;
    waitpid(pid, &status, 0);
    return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
}

bool OthersCanLock(const char* path, int operation) {
    const int fd = open(path, O_RDONLY | O_CLOEXEC);
    const bool locked = fd >= 0 && flock(fd, operation | LOCK_NB) == 0;
    if (fd >= 0) {
        close(fd);
    }
    return locked;
}

}  // namespace support
