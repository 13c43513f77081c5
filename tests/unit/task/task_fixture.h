/** The queue "copy" of the acting user 1001, its files, and processes to stand in it. */
#ifndef ZYROVFS_TESTS_TASK_FIXTURE_H
#define ZYROVFS_TESTS_TASK_FIXTURE_H

#include <gtest/gtest.h>
#include <sys/mount.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <zosplatform/error.h>

#include <csignal>
#include <cstdio>
#include <cstring>
#include <filesystem>
#include <string>

#include "support/other_process.h"
#include "support/scratch.h"
#include "support/seams.h"
#include "zyrovfs/error.h"
#include "zyrovfs/task.h"

namespace task_fixture {

inline const std::string kUser = "/var/tmp/user/1001";
inline const std::string kFolder = kUser + "/zyrovfs/task/copy";
inline const std::string kQueue = kFolder + "/copy";
inline const std::string kLock = kQueue + ".lock";
inline const std::string kStamp = kQueue + ".clean.stamp";
inline const std::string kFresh = kQueue + ".tmp";

/** A process that lives until the test ends. */
class Living : public support::OtherProcess {
  public:
    Living() : OtherProcess([] { return true; }) {}
};

/** A process id that nobody has: its process has ended and was collected. */
inline pid_t DeadPid() {
    const pid_t pid = scratch::Start([] { return 0; });
    scratch::End(pid);
    return pid;
}

inline std::string Line(const std::string& id, pid_t pid) {
    return id + "\t" + std::to_string(pid) + "\n";
}

/** The platform error as log lines quote it. */
inline std::string PlatformError() {
    char text[256];
    snprintf(text, sizeof text, "[0x%04X %s:%d]", YLIBCErrGet(), YLIBCErrorGetFile(),
             YLIBCErrorGetLine());
    return text;
}

/** A file system of its own over a folder. */
class Disk {
  public:
    Disk(const std::string& folder, const char* options, unsigned long flags = 0)
        : folder_(folder) {
        std::filesystem::create_directories(folder);
        mounted_ = mount("tmpfs", folder.c_str(), "tmpfs", flags, options) == 0;
    }
    Disk(const Disk&) = delete;
    Disk& operator=(const Disk&) = delete;
    ~Disk() { umount2(folder_.c_str(), MNT_DETACH); }

    bool mounted() const { return mounted_; }
    /** Leaves no room for another page. */
    void Fill() const { scratch::PutText(folder_ + "/ballast", std::string(1 << 20, 'x')); }

  private:
    std::string folder_;
    bool mounted_ = false;
};

class TaskTest : public testing::Test {
  protected:
    void SetUp() override {
        setenv("ZYROVFS_UID", "1001", 1);
        std::filesystem::remove_all("/var/tmp/user");
        YLIBCErrSetEx(0, "", 0);
        ZYROVFS::VFSSetErrEx(ZYROVFS::VFS_ERR_BUSY, "before.cpp", 7);
    }
    void TearDown() override {
        // Whatever became of an operation, the cell is not its place to tell.
        EXPECT_EQ(ZYROVFS::GetError(), ZYROVFS::VFS_ERR_BUSY);
        EXPECT_EQ(geteuid(), 0U);
        if (std::filesystem::is_regular_file(kLock)) {
            EXPECT_TRUE(support::OthersCanLock(kLock.c_str(), 2)) << "the lock is still held";
        }
    }

    static void PutQueue(const std::string& text) {
        std::filesystem::create_directories(kFolder);
        scratch::PutText(kQueue, text);
    }
    static std::string Queue() { return scratch::Text(kQueue); }

    ZYROVFS::TaskMgr tasks_{3};
};

}  // namespace task_fixture

#endif
