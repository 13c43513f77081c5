/**
 * The helper program, played by the forked child itself: it has the test's scripts, seams and
 * journals. For one test program, whose execve it is; any other program is really executed.
 */
#ifndef ZYROVFS_TESTS_HELPER_IN_PROCESS_H
#define ZYROVFS_TESTS_HELPER_IN_PROCESS_H

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cstring>

#include "server/helper_program.h"

namespace helper_in_process {

/** What an execution closes, as far as somebody waits for it. */
inline void ClosePipes() {
    for (int fd = STDERR_FILENO + 1; fd < 256; ++fd) {
        struct stat info {};
        const int flags = fcntl(fd, F_GETFD);
        if (flags >= 0 && (flags & FD_CLOEXEC) != 0 && fstat(fd, &info) == 0 &&
            (S_ISFIFO(info.st_mode) || S_ISSOCK(info.st_mode))) {
            close(fd);
        }
    }
}

}  // namespace helper_in_process

extern "C" int execve(const char* path, char* const argv[], char* const environment[]) {
    const char* name = strrchr(path, '/');
    if (name != nullptr && strcmp(name, "/zyrovfs-helper") == 0) {
        helper_in_process::ClosePipes();
        environ = const_cast<char**>(environment);
        ZYROVFS::RunHelper(argv[1]);
        _exit(2);
    }
    return static_cast<int>(syscall(SYS_execve, path, argv, environment));
}

#endif
