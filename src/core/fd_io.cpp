#include "core/fd_io.h"

#include <unistd.h>
#include <zosplatform/file.h>

#include <cerrno>
#include <cstdint>

namespace ZYROVFS {

bool WriteAll(int fd, const std::string& text) {
    return ZYROWriteFileFd(fd, text.data(), text.size()) == static_cast<ssize_t>(text.size());
}

bool ReadAll(int fd, std::string& text) {
    return ReadUpTo(fd, SIZE_MAX, text);
}

bool ReadUpTo(int fd, size_t limit, std::string& text) {
    char buffer[65536];
    for (size_t left = limit;;) {
        const ssize_t n = read(fd, buffer, sizeof buffer);
        if (n == 0) {
            return true;
        }
        if (n > 0 && static_cast<size_t>(n) > left) {
            errno = EFBIG;
            return false;
        }
        if (n > 0) {
            left -= static_cast<size_t>(n);
            text.append(buffer, static_cast<size_t>(n));
        } else if (errno != EINTR) {
            return false;
        }
    }
}

}  // namespace ZYROVFS
