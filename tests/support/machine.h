/** The private host as integration tests use it: commands, throwaway users, the remote side. */
#ifndef ZYROVFS_TESTS_MACHINE_H
#define ZYROVFS_TESTS_MACHINE_H

#include <gtest/gtest.h>
#include <sys/wait.h>

#include <array>
#include <cstdio>
#include <fstream>
#include <functional>
#include <sstream>
#include <stdexcept>
#include <string>

#include <unistd.h>

#include "support/locations.h"

namespace machine {

struct Outcome {
    int status;
    std::string output;  ///< standard output and standard error
};

/** Runs a shell command and waits for it. */
inline Outcome Run(const std::string& command) {
    FILE* pipe = popen(("{ " + command + "\n} 2>&1").c_str(), "r");
    if (pipe == nullptr) {
        return {-1, "popen failed"};
    }
    std::string output;
    std::array<char, 4096> buffer;
    size_t n = 0;
    while ((n = fread(buffer.data(), 1, buffer.size(), pipe)) > 0) {
        output.append(buffer.data(), n);
    }
    const int status = pclose(pipe);
    // What the command line tool says of a failure that has no code: none may end so.
    EXPECT_EQ(output.find("No cause was given"), std::string::npos) << command << "\n" << output;
    return {WIFEXITED(status) ? WEXITSTATUS(status) : -1, output};
}

/** Run for what a test needs done before it can begin. */
inline std::string Must(const std::string& command) {
    const Outcome outcome = Run(command);
    if (outcome.status != 0) {
        throw std::runtime_error(command + ": " + outcome.output);
    }
    return outcome.output;
}

/** A command as a user who logged in would run it. */
inline Outcome RunAs(const std::string& user, const std::string& command) {
    std::ofstream("/tmp/as-" + user) << command << '\n';
    return Run("setpriv --reuid=" + user + " --regid=100 --clear-groups sh /tmp/as-" + user);
}

inline void AddUser(const std::string& name, unsigned uid) {
    Must("useradd --create-home --uid " + std::to_string(uid) + " --gid 100 " + name);
}

/** tests/support/servers/remote with these arguments. */
inline std::string Remote(const std::string& arguments) {
    return Must(SourceDir() + "/tests/support/servers/remote " + arguments);
}

inline std::string Read(const std::string& path) {
    std::ifstream file(path, std::ios::binary);
    std::stringstream text;
    text << file.rdbuf();
    return text.str();
}

/**
 * Waits until a condition holds, for at most ten seconds: the fuse tree learns of mounts, and
 * writes back what was closed, a moment after the call that caused it.
 */
inline bool Eventually(const std::function<bool()>& condition) {
    for (int i = 0; i < 200; ++i) {
        if (condition()) {
            return true;
        }
        usleep(50000);
    }
    return false;
}

/** Runs a body in a child process, as a CGI program of its own would; its result is the status. */
inline int InProcess(const std::function<int()>& body) {
    fflush(nullptr);
    const pid_t pid = fork();
    if (pid == 0) {
        _exit(body());
    }
    int status = 0;
    waitpid(pid, &status, 0);
    return WIFEXITED(status) ? WEXITSTATUS(status) : -WTERMSIG(status);
}

}  // namespace machine

#endif
