/** A browser's request that carries a file, as a CGI program finds it in its standard input. */
#ifndef ZYROVFS_TESTS_RELAY_INPUT_H
#define ZYROVFS_TESTS_RELAY_INPUT_H

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/mman.h>
#include <unistd.h>

#include <array>
#include <csignal>
#include <string>
#include <thread>
#include <utility>

namespace relay_input {

inline constexpr char kBoundary[] = "------WebKitFormBoundaryQ7xw2";

/** What stands behind the file: the closing line, or fields that follow. */
inline std::string Closing(const std::string& boundary = kBoundary,
                           const std::string& behind = "--\r\n") {
    return "\r\n" + boundary + behind;
}

/** Another field of the same form. */
inline std::string Field(const std::string& name, const std::string& value) {
    return "\r\nContent-Disposition: form-data; name=\"" + name + "\"\r\n\r\n" + value +
           Closing(kBoundary, "--\r\n");
}

/** An open descriptor; tests of the shipped library have no other owner for one. */
class Descriptor {
  public:
    explicit Descriptor(int fd) : fd_(fd) {}
    Descriptor(Descriptor&& other) noexcept : fd_(std::exchange(other.fd_, -1)) {}
    Descriptor(const Descriptor&) = delete;
    Descriptor& operator=(const Descriptor&) = delete;
    ~Descriptor() { Close(); }

    int Get() const { return fd_; }
    void Close() {
        if (fd_ >= 0) {
            close(std::exchange(fd_, -1));
        }
    }

  private:
    int fd_;
};

inline Descriptor FileOf(const std::string& bytes) {
    Descriptor file(memfd_create("request", MFD_CLOEXEC));
    EXPECT_EQ(write(file.Get(), bytes.data(), bytes.size()), static_cast<ssize_t>(bytes.size()));
    lseek(file.Get(), 0, SEEK_SET);
    return file;
}

/** Standard input comes from `fd` as long as this lives. */
class Input {
  public:
    explicit Input(int fd) : old_(dup(STDIN_FILENO)) { EXPECT_EQ(dup2(fd, STDIN_FILENO), 0); }
    explicit Input(const std::string& bytes) : Input(FileOf(bytes).Get()) {}
    Input(const Input&) = delete;
    Input& operator=(const Input&) = delete;
    ~Input() {
        if (old_.Get() >= 0) {
            dup2(old_.Get(), STDIN_FILENO);
        } else {
            close(STDIN_FILENO);
        }
    }

  private:
    Descriptor old_;
};

/** Somebody at the other end of a pipe, who writes these bytes and goes. */
class Sender {
  public:
    explicit Sender(const std::string& bytes) : Sender(Pipe(), bytes) {}
    Sender(const Sender&) = delete;
    Sender& operator=(const Sender&) = delete;
    ~Sender() {
        from_.Close();
        thread_.join();
    }

    int Get() const { return from_.Get(); }

  private:
    using Ends = std::array<int, 2>;

    static Ends Pipe() {
        Ends ends{-1, -1};
        EXPECT_EQ(pipe2(ends.data(), O_CLOEXEC), 0);
        return ends;
    }

    Sender(const Ends& ends, const std::string& bytes)
        : from_(ends[0]), thread_(Send, ends[1], bytes) {}

    static void Send(int to, const std::string& bytes) {
        // A reader that has gone is no reason to die.
        sigset_t broken;
        sigemptyset(&broken);
        sigaddset(&broken, SIGPIPE);
        pthread_sigmask(SIG_BLOCK, &broken, nullptr);
        for (size_t at = 0; at < bytes.size();) {
            const ssize_t n = write(to, bytes.data() + at, bytes.size() - at);
            if (n < 0) {
                break;
            }
            at += static_cast<size_t>(n);
        }
        close(to);
    }

    Descriptor from_;
    std::thread thread_;
};

}  // namespace relay_input

#endif
