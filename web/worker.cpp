#include "worker.h"

#include <fcntl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>

#include "failure.h"

namespace web {
namespace {

/** The web server takes an answer for complete when nobody holds its pipes any more. */
bool LetGoOfServer() {
    const int nothing = open("/dev/null", O_RDWR);
    return nothing >= 0 && dup2(nothing, STDIN_FILENO) >= 0 && dup2(nothing, STDOUT_FILENO) >= 0 &&
           dup2(nothing, STDERR_FILENO) >= 0 && close(nothing) == 0;
}

[[noreturn]] void Detach(const std::function<void()>& work) {
    if (setsid() < 0 || !LetGoOfServer()) {
        _exit(1);
    }
    const pid_t pid = fork();
    if (pid == 0) {
        work();
    }
    _exit(pid < 0 ? 1 : 0);
}

}  // namespace

void StartWorker(const std::function<void()>& work) {
    const pid_t pid = fork();
    if (pid == 0) {
        Detach(work);
    }
    int status = 0;
    while (pid > 0 && waitpid(pid, &status, 0) < 0 && errno == EINTR) {
    }
    if (pid < 0 || status != 0) {
        throw Failure(500, "No process could be started.").Advise("Try again in a few minutes.");
    }
}

}  // namespace web
