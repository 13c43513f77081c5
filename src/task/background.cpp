#include "task/background.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>

#include "core/handle.h"

namespace ZYROVFS::task {
namespace {

/** Descriptors of one file or pipe. */
bool AreTheSame(const struct stat& one, const struct stat& other) {
    return one.st_dev == other.st_dev && one.st_ino == other.st_ino;
}

}  // namespace

void LetGoOfOutput() {
    constexpr long kHighest = 1024;  // no program of the web layer has more
    const UniqueFd null(open("/dev/null", O_RDWR | O_CLOEXEC));
    struct stat output {};
    struct stat errors {};
    const bool has_output = fstat(STDOUT_FILENO, &output) == 0;
    const bool has_errors = fstat(STDERR_FILENO, &errors) == 0;
    const int end = static_cast<int>(std::min(sysconf(_SC_OPEN_MAX), kHighest));
    for (int fd = 0; fd < end; ++fd) {
        struct stat info {};
        const bool is_open = fd != null.Get() && fstat(fd, &info) == 0;
        if (is_open && (fd <= STDERR_FILENO || (has_output && AreTheSame(info, output)) ||
                        (has_errors && AreTheSame(info, errors)))) {
            dup2(null.Get(), fd);
        }
    }
}

}  // namespace ZYROVFS::task
