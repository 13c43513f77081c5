#include "core/fd_io.h"

#include <unistd.h>

#include <cerrno>

namespace ZYROVFS {

bool WriteAll(int fd, const std::string& text) {
    size_t done = 0;
    while (done < text.size()) {
        const ssize_t n = write(fd, text.data() + done, text.size() - done);
        if (n >= 0) {
            done += static_cast<size_t>(n);
        } else if (errno != EINTR) {
            return false;
        }
    }
    return true;
}

bool ReadAll(int fd, std::string& text) {
    char buffer[65536];
    for (;;) {
        const ssize_t n = read(fd, buffer, sizeof buffer);
        if (n == 0) {
            return true;
        }
        if (n > 0) {
            text.append(buffer, static_cast<size_t>(n));
        } else if (errno != EINTR) {
            return false;
        }
    }
}

}  // namespace ZYROVFS
