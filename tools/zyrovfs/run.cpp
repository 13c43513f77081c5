#include "run.h"

#include <fcntl.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

namespace tool {
namespace {

/** Root's programs must not depend on the caller's PATH; messages are read, so no translations. */
char* const kEnvironment[] = {const_cast<char*>("PATH=/usr/sbin:/usr/bin:/sbin:/bin"),
                              const_cast<char*>("LC_ALL=C"), nullptr};

std::string ReadAll(int fd) {
    std::string text;
    char buffer[4096];
    for (;;) {
        const ssize_t count = read(fd, buffer, sizeof buffer);
        if (count > 0) {
            text.append(buffer, static_cast<size_t>(count));
        } else if (count == 0 || errno != EINTR) {
            return text;
        }
    }
}

int Wait(pid_t pid) {
    int status = 0;
    while (waitpid(pid, &status, 0) < 0) {
        if (errno != EINTR) {
            return -1;
        }
    }
    return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
}

int Spawn(pid_t& pid, const std::vector<std::string>& command, int output) {
    std::vector<char*> argv;
    argv.reserve(command.size() + 1);
    for (const std::string& argument : command) {
        argv.push_back(const_cast<char*>(argument.c_str()));
    }
    argv.push_back(nullptr);
    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    posix_spawn_file_actions_addopen(&actions, STDIN_FILENO, "/dev/null", O_RDONLY, 0);
    posix_spawn_file_actions_adddup2(&actions, output, STDOUT_FILENO);
    posix_spawn_file_actions_adddup2(&actions, output, STDERR_FILENO);
    const int error = posix_spawn(&pid, argv[0], &actions, nullptr, argv.data(), kEnvironment);
    posix_spawn_file_actions_destroy(&actions);
    return error;
}

}  // namespace

RunResult Run(const std::vector<std::string>& command) {
    RunResult result;
    int ends[2];
    if (pipe2(ends, O_CLOEXEC) < 0) {
        result.output = std::strerror(errno);
        return result;
    }
    pid_t pid = 0;
    const int error = Spawn(pid, command, ends[1]);
    close(ends[1]);
    if (error == 0) {
        result.output = ReadAll(ends[0]);
        result.status = Wait(pid);
    } else {
        result.output = command[0] + ": " + std::strerror(error);
    }
    close(ends[0]);
    return result;
}

}  // namespace tool
