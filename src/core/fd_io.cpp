#include "core/fd_io.h"

#include <unistd.h>
#include <zosplatform/file.h>

#include <cerrno>

namespace ZYROVFS {

bool WriteAll(int fd, const std::string& text) {
    return ZYROWriteFileFd(fd, text.data(), text.size()) == static_cast<ssize_t>(text.size());
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
