/** A host that accepts and says nothing, and programs of the caller's that wait for it. */
#ifndef ZYROVFS_TESTS_SILENT_HOST_H
#define ZYROVFS_TESTS_SILENT_HOST_H

#include <netinet/in.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <functional>
#include <stdexcept>
#include <string>

#include "support/machine.h"

namespace machine {

inline pid_t ChildOf(pid_t parent) {
    const std::string pid = std::to_string(parent);
    return atoi(Read("/proc/" + pid + "/task/" + pid + "/children").c_str());
}

/** A program of the caller's that runs beside the test; one that hangs is killed in the end. */
class Program {
  public:
    explicit Program(const std::function<int()>& body) {
        fflush(nullptr);
        pid_ = fork();
        if (pid_ == 0) {
            _exit(body());
        }
    }
    Program(const Program&) = delete;
    Program& operator=(const Program&) = delete;
    ~Program() {
        if (pid_ > 0 && !IsDone()) {
            kill(pid_, SIGKILL);
            waitpid(pid_, nullptr, 0);
        }
    }
    pid_t Pid() const { return pid_; }
    bool IsDone() {
        if (!done_ && waitpid(pid_, &status_, WNOHANG) == pid_) {
            done_ = true;
        }
        return done_;
    }
    /** The exit status; -1 when it is still running after ten seconds, or was killed. */
    int Result() {
        return Eventually([this] { return IsDone(); }) && WIFEXITED(status_) ? WEXITSTATUS(status_)
                                                                             : -1;
    }

  private:
    pid_t pid_ = -1;
    int status_ = 0;
    bool done_ = false;
};

/** A loopback port that accepts and says nothing. */
class SilentHost {
  public:
    SilentHost() : listener_(socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0)) {
        sockaddr_in address{};
        address.sin_family = AF_INET;
        address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
        socklen_t size = sizeof address;
        if (bind(listener_, reinterpret_cast<sockaddr*>(&address), size) != 0 ||
            listen(listener_, 8) != 0 ||
            getsockname(listener_, reinterpret_cast<sockaddr*>(&address), &size) != 0) {
            throw std::runtime_error("no silent host");
        }
        port_ = ntohs(address.sin_port);
    }
    SilentHost(const SilentHost&) = delete;
    SilentHost& operator=(const SilentHost&) = delete;
    ~SilentHost() { Close(); }
    unsigned Port() const { return port_; }
    /** Connections that wait in the queue are reset with it. */
    void Close() {
        if (listener_ >= 0) {
            close(listener_);
            listener_ = -1;
        }
    }

  private:
    int listener_;
    unsigned port_ = 0;
};

}  // namespace machine

#endif
