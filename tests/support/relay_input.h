/** A browser's request that carries a file, as a CGI program finds it in its standard input. */
#ifndef ZYROVFS_TESTS_RELAY_INPUT_H
#define ZYROVFS_TESTS_RELAY_INPUT_H

#include <gtest/gtest.h>
#include <sys/mman.h>
#include <unistd.h>

#include <string>
#include <thread>
#include <utility>

#include "core/handle.h"

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

inline ZYROVFS::UniqueFd FileOf(const std::string& bytes) {
    ZYROVFS::UniqueFd file(memfd_create("request", MFD_CLOEXEC));
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
        if (old_) {
            dup2(old_.Get(), STDIN_FILENO);
        } else {
            close(STDIN_FILENO);
        }
    }

  private:
    ZYROVFS::UniqueFd old_;
};

/** Somebody at the other end of a pipe, who writes these bytes and goes. */
class Sender {
  public:
    explicit Sender(std::string bytes) {
        int ends[2] = {-1, -1};
        EXPECT_EQ(pipe(ends), 0);
        from_.Reset(ends[0]);
        thread_ = std::thread([to = ends[1], bytes = std::move(bytes)] {
            for (size_t at = 0; at < bytes.size();) {
                const ssize_t n = write(to, bytes.data() + at, bytes.size() - at);
                if (n < 0) {
                    break;  // nobody reads on
                }
                at += static_cast<size_t>(n);
            }
            close(to);
        });
    }
    Sender(const Sender&) = delete;
    Sender& operator=(const Sender&) = delete;
    ~Sender() {
        from_.Reset();
        thread_.join();
    }

    int Get() const { return from_.Get(); }

  private:
    ZYROVFS::UniqueFd from_;
    std::thread thread_;
};

}  // namespace relay_input

#endif
