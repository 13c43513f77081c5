/** Files for one test, and processes beside it. */
#ifndef ZYROVFS_TESTS_SCRATCH_H
#define ZYROVFS_TESTS_SCRATCH_H

#include <grp.h>
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>
#include <functional>
#include <sstream>
#include <string>

namespace scratch {

inline std::string Text(const std::string& path) {
    std::ifstream file(path, std::ios::binary);
    std::stringstream text;
    text << file.rdbuf();
    return text.str();
}

inline void PutText(const std::string& path, const std::string& text) {
    std::ofstream(path, std::ios::binary) << text;
}

/** A folder of the test's own, gone in the end. */
class ScratchTest : public testing::Test {
  protected:
    ScratchTest() {
        std::string name = "/tmp/scratch.XXXXXX";
        directory_ = mkdtemp(name.data());
    }
    ~ScratchTest() override { std::filesystem::remove_all(directory_); }

    std::string Path(const std::string& name) const { return directory_ + "/" + name; }
    std::string Put(const std::string& name, const std::string& text) const {
        PutText(Path(name), text);
        return Path(name);
    }

    std::string directory_;
};

/** Starts a child that ends with what `body` answers. */
inline pid_t Start(const std::function<int()>& body) {
    const pid_t pid = fork();
    if (pid == 0) {
        _exit(body());
    }
    return pid;
}

/** Exit status of a child, or minus the signal that ended it. */
inline int End(pid_t pid) {
    int status = 0;
    EXPECT_EQ(waitpid(pid, &status, 0), pid);
    return WIFEXITED(status) ? WEXITSTATUS(status) : -WTERMSIG(status);
}

inline int InChild(const std::function<int()>& body) {
    return End(Start(body));
}

/** In a child, for good: an ordinary user in the group that all users have. */
inline bool BecomeUser(uid_t uid, gid_t gid = 100) {
    return setgroups(0, nullptr) == 0 && setresgid(gid, gid, gid) == 0 &&
           setresuid(uid, uid, uid) == 0;
}

}  // namespace scratch

#endif
