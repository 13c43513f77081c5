#include "password.h"

#include <fcntl.h>
#include <poll.h>
#include <termios.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstring>
#include <iterator>
#include <utility>

#include "file.h"

namespace tool {
namespace {

volatile sig_atomic_t caught_signal = 0;

/**
 * Keeps signals that would end the program for Wait, so that the echo comes back before they have
 * their way.
 */
class SignalCatcher {
  public:
    SignalCatcher() {
        struct sigaction action {};
        action.sa_handler = [](int signal) { caught_signal = signal; };
        caught_signal = 0;
        sigset_t held;
        sigemptyset(&held);
        for (size_t i = 0; i < std::size(kSignals); ++i) {
            sigaction(kSignals[i], &action, &before_[i]);
            sigaddset(&held, kSignals[i]);
        }
        sigprocmask(SIG_BLOCK, &held, &mask_);
    }
    SignalCatcher(const SignalCatcher&) = delete;
    SignalCatcher& operator=(const SignalCatcher&) = delete;
    ~SignalCatcher() {
        sigprocmask(SIG_SETMASK, &mask_, nullptr);
        for (size_t i = 0; i < std::size(kSignals); ++i) {
            sigaction(kSignals[i], &before_[i], nullptr);
        }
        if (caught_signal != 0) {
            raise(caught_signal);
        }
    }

    /** Until there is something to read; false when a signal came first. */
    bool Wait(int fd) const {
        pollfd poll_fd = {fd, POLLIN, 0};
        return ppoll(&poll_fd, 1, nullptr, &mask_) == 1;
    }

  private:
    static constexpr int kSignals[] = {SIGINT, SIGTERM, SIGQUIT, SIGHUP};
    struct sigaction before_[std::size(kSignals)];
    sigset_t mask_;
};

/** A terminal that does not show what is typed. */
class Terminal {
  public:
    Terminal() : fd_(open("/dev/tty", O_RDWR | O_CLOEXEC)) {
        if (fd_ >= 0 && tcgetattr(fd_, &before_) == 0) {
            termios silent = before_;
            silent.c_lflag &= ~static_cast<tcflag_t>(ECHO);
            silent_ = tcsetattr(fd_, TCSAFLUSH, &silent) == 0;
        }
    }
    Terminal(const Terminal&) = delete;
    Terminal& operator=(const Terminal&) = delete;
    ~Terminal() {
        if (silent_) {
            tcsetattr(fd_, TCSAFLUSH, &before_);
        }
        if (fd_ >= 0) {
            close(fd_);
        }
    }

    explicit operator bool() const { return silent_; }
    void Write(const char* text) {
        if (write(fd_, text, std::strlen(text)) < 0) {
            silent_ = silent_ && errno == EINTR;
        }
    }
    /** Up to a newline; false at the end of input or on a signal. */
    bool ReadLine(const SignalCatcher& signals, std::string& line) {
        char c = 0;
        while (signals.Wait(fd_) && read(fd_, &c, 1) == 1) {
            if (c == '\n') {
                return true;
            }
            line += c;
        }
        return false;
    }

  private:
    int fd_;
    termios before_{};
    bool silent_ = false;
};

bool Ask(std::string& password, std::string& problem) {
    const SignalCatcher signals;
    Terminal terminal;
    if (!terminal) {
        problem = "There is no terminal to ask for the password; use --password-file.";
        return false;
    }
    terminal.Write("Password: ");
    const bool read = terminal.ReadLine(signals, password);
    terminal.Write("\n");
    if (!read) {
        problem = "No password was given.";
    }
    return read;
}

}  // namespace

void AddPasswordOptions(CLI::App& command, PasswordOptions& options) {
    CLI::Option* ask = command.add_flag("--ask-password", options.ask, "Ask for the password");
    CLI::Option* file =
        command.add_option("--password-file", options.file, "Read the password from a file");
    file->type_name("FILE")->excludes(ask);
    command
        .add_flag("--password-stdin", options.from_stdin, "Read the password from standard input")
        ->excludes(ask)
        ->excludes(file);
}

bool ReadPassword(const PasswordOptions& options, std::string& password, std::string& problem) {
    if (options.ask) {
        return Ask(password, problem);
    }
    const std::string path = options.from_stdin ? "/dev/stdin" : options.file;
    if (!ReadFile(path, password)) {
        problem = std::string("Reading the ") + options.word + " from " + path +
                  " failed: " + std::strerror(errno);
        return false;
    }
    if (!password.empty() && password.back() == '\n') {
        password.pop_back();
    }
    if (password.find('\0') != std::string::npos || password.find('\n') != std::string::npos) {
        problem = std::string("The ") + options.word + " in " + path + " is not one line of text.";
        return false;
    }
    return true;
}

}  // namespace tool
