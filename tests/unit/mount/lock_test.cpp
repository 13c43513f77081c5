#include <fcntl.h>
#include <gmock/gmock.h>
#include <sys/file.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>
#include <zosplatform/error.h>

#include <cerrno>
#include <csignal>
#include <filesystem>
#include <string>

#include "support/other_process.h"
#include "support/scratch.h"
#include "support/seams.h"
#include "zyrovfs/utils.h"

namespace ZYROVFS::Utils {
namespace {

namespace fs = std::filesystem;
using support::OtherProcess;
using support::OthersCanLock;

constexpr const char* kRoot = "/tmp/zyrovfs";
constexpr const char* kFolder = "/tmp/zyrovfs/lock/user/1001";
constexpr const char* kFile = "/tmp/zyrovfs/lock/user/1001/mnt.lock";

mode_t ModeOf(const std::string& path) {
    struct stat info {};
    return stat(path.c_str(), &info) == 0 ? info.st_mode & 07777 : 0;
}

void MakeFile() {
    fs::create_directories(kFolder);
    const int fd = open(kFile, O_WRONLY | O_CREAT | O_CLOEXEC, 0666);
    ASSERT_GE(fd, 0);
    close(fd);
}

/** Takes the lock as any other program would. */
bool HoldFile(int operation) {
    const int fd = open(kFile, O_RDONLY | O_CLOEXEC);
    return fd >= 0 && flock(fd, operation | LOCK_NB) == 0;
}

/** This process's descriptor of the lock file, or -1. */
int DescriptorOfLock() {
    for (const auto& entry : fs::directory_iterator("/proc/self/fd")) {
        std::error_code error;
        if (fs::read_symlink(entry, error) == kFile) {
            return std::stoi(entry.path().filename());
        }
    }
    return -1;
}

class MountLock : public testing::Test {
  protected:
    void SetUp() override {
        setenv("ZYROVFS_UID", "1001", 1);
        fs::remove_all(kRoot);
        YLIBCErrSetEx(0, "", 0);
    }
    void TearDown() override {
        while (DescriptorOfLock() >= 0) {
            UnLockMnt();
        }
    }
};

TEST_F(MountLock, MakesItsFileBelowFoldersOpenToAllWhateverTheUmask) {
    const mode_t saved = umask(077);
    EXPECT_TRUE(LockMnt(true));
    EXPECT_EQ(umask(saved), 077U);
    for (const char* folder : {kRoot, "/tmp/zyrovfs/lock", "/tmp/zyrovfs/lock/user", kFolder}) {
        EXPECT_EQ(ModeOf(folder), 01777U) << folder;
    }
    EXPECT_TRUE(fs::is_regular_file(kFile));
    EXPECT_EQ(ModeOf(kFile), 0644U) << "the user's own processes open it to read";
    EXPECT_FALSE(OthersCanLock(kFile, LOCK_SH));
}

TEST_F(MountLock, EachActingUserHasAFileOfHisOwn) {
    OtherProcess holder([] {
        setenv("ZYROVFS_UID", "1002", 1);
        return LockMnt(true);
    });
    ASSERT_TRUE(holder.ok());
    EXPECT_TRUE(LockMnt(true));
    EXPECT_TRUE(fs::exists("/tmp/zyrovfs/lock/user/1002/mnt.lock"));
    EXPECT_THAT(seams::MicroSleeps(), testing::IsEmpty());
}

TEST_F(MountLock, AUserWithoutRootRightsTakesHisOwn) {
    ASSERT_EQ(seteuid(1001), 0);
    const bool locked = LockMnt(true);
    const uid_t after = geteuid();
    ASSERT_EQ(seteuid(0), 0);
    EXPECT_TRUE(locked);
    EXPECT_EQ(after, 1001U);
}

TEST_F(MountLock, SharedLocksOfTwoProcessesStandTogether) {
    OtherProcess holder([] { return LockMnt(false); });
    ASSERT_TRUE(holder.ok());
    EXPECT_TRUE(LockMnt(false));
    EXPECT_THAT(seams::MicroSleeps(), testing::IsEmpty());
}

TEST_F(MountLock, WaitForAnotherProcessEndsAfter2200PausesOf50Milliseconds) {
    MakeFile();
    OtherProcess holder([] { return HoldFile(LOCK_EX); });
    ASSERT_TRUE(holder.ok());
    for (const bool exclusive : {true, false}) {
        seams::Reset();
        YLIBCErrSetEx(0, "", 0);
        EXPECT_FALSE(LockMnt(exclusive));
        EXPECT_EQ(seams::MicroSleeps(), std::vector<unsigned>(2200, 50000U));
        EXPECT_EQ(YLIBCErrGet(), 0x400U);
        EXPECT_STREQ(YLIBCErrorGetFile(), "lock.cpp");
        EXPECT_TRUE(seams::Logged(std::string("Failed to lock ") + kFile +
                                  ", Resource temporarily unavailable"))
            << seams::LogDump();
        EXPECT_EQ(seams::LogLines().size(), 1U) << seams::LogDump();
        EXPECT_EQ(DescriptorOfLock(), -1) << "each attempt gives back what it took";
    }
}

/** On a busy machine each pause takes longer, and the wait as a whole must not. */
TEST_F(MountLock, WaitForAnotherProcessEndsAfter110SecondsHoweverLongThePausesTake) {
    MakeFile();
    OtherProcess holder([] { return HoldFile(LOCK_EX); });
    ASSERT_TRUE(holder.ok());
    seams::OnMicroSleep([] { seams::PassTime(950000); });
    EXPECT_FALSE(LockMnt(true));
    EXPECT_EQ(seams::MicroSleeps().size(), 110U);
}

TEST_F(MountLock, ExclusiveWaitsForTheSharedLockOfAnotherProcess) {
    MakeFile();
    OtherProcess holder([] { return HoldFile(LOCK_SH); });
    ASSERT_TRUE(holder.ok());
    EXPECT_FALSE(LockMnt(true));
    EXPECT_EQ(seams::MicroSleeps().size(), 2200U);
    EXPECT_TRUE(LockMnt(false));
}

TEST_F(MountLock, ReleasedHalfWayIsTakenAtTheNextAttempt) {
    MakeFile();
    OtherProcess holder([] { return HoldFile(LOCK_EX); });
    ASSERT_TRUE(holder.ok());
    seams::OnMicroSleep([&holder, pauses = 0]() mutable {
        if (++pauses == 1100) {
            holder.End();
        }
    });
    EXPECT_TRUE(LockMnt(true));
    EXPECT_EQ(seams::MicroSleeps().size(), 1100U);
    EXPECT_FALSE(OthersCanLock(kFile, LOCK_SH));
    EXPECT_THAT(seams::LogLines(), testing::IsEmpty());
}

TEST_F(MountLock, ReleasedInTheLastPauseIsStillTaken) {
    MakeFile();
    OtherProcess holder([] { return HoldFile(LOCK_EX); });
    ASSERT_TRUE(holder.ok());
    seams::OnMicroSleep([&holder, pauses = 0]() mutable {
        if (++pauses == 2200) {
            holder.End();
        }
    });
    EXPECT_TRUE(LockMnt(true));
}

TEST_F(MountLock, FileMadeUnderAStrictUmaskByAnOlderVersionIsOpenedToItsUser) {
    MakeFile();
    ASSERT_EQ(chmod(kFile, 0600), 0);
    ASSERT_EQ(seteuid(1001), 0);
    const bool locked = LockMnt(false);
    ASSERT_EQ(seteuid(0), 0);
    EXPECT_TRUE(locked) << seams::LogDump();
    EXPECT_EQ(ModeOf(kFile), 0644U);
}

TEST_F(MountLock, FileThatCannotBeOpenedFailsAtOnce) {
    MakeFile();
    ASSERT_EQ(chmod(kFile, 0600), 0);
    const int status = support::ExitOf([] {
        return scratch::BecomeUser(1001) && !LockMnt(false) && seams::MicroSleeps().empty() &&
                       YLIBCErrGet() == 0x900 && seams::LoggedPart("mnt.lock, Permission denied")
                   ? 0
                   : 1;
    });
    EXPECT_EQ(status, 0);
}

TEST_F(MountLock, SharedInsideExclusiveSucceedsAndCounts) {
    ASSERT_TRUE(LockMnt(true));
    EXPECT_TRUE(LockMnt(false));
    EXPECT_EQ(UnLockMnt(), 0);
    EXPECT_FALSE(OthersCanLock(kFile, LOCK_SH)) << "the exclusive level is still held";
    EXPECT_EQ(UnLockMnt(), 0);
    EXPECT_TRUE(OthersCanLock(kFile, LOCK_EX));
}

TEST_F(MountLock, EqualLocksNestAndCount) {
    for (const bool exclusive : {true, false}) {
        for (int level = 0; level < 5; ++level) {
            ASSERT_TRUE(LockMnt(exclusive)) << level;
        }
        for (int level = 0; level < 4; ++level) {
            EXPECT_EQ(UnLockMnt(), 0);
            EXPECT_FALSE(OthersCanLock(kFile, LOCK_EX)) << level;
        }
        EXPECT_EQ(UnLockMnt(), 0);
        EXPECT_TRUE(OthersCanLock(kFile, LOCK_EX));
    }
}

TEST_F(MountLock, ExclusiveInsideSharedFailsAtOnceWithoutTheWait) {
    ASSERT_TRUE(LockMnt(false));
    EXPECT_FALSE(LockMnt(true));
    EXPECT_THAT(seams::MicroSleeps(), testing::IsEmpty());
    EXPECT_EQ(YLIBCErrGet(), 0x400U);
    EXPECT_TRUE(seams::LoggedPart(std::string("Failed to lock ") + kFile)) << seams::LogDump();
    EXPECT_FALSE(OthersCanLock(kFile, LOCK_EX)) << "the shared lock stays";
    EXPECT_TRUE(OthersCanLock(kFile, LOCK_SH));
    EXPECT_EQ(UnLockMnt(), 0);
    EXPECT_TRUE(OthersCanLock(kFile, LOCK_EX)) << "a refused upgrade counts for nothing";
}

TEST_F(MountLock, ExclusiveAfterASharedOneWasGivenBackSucceeds) {
    ASSERT_TRUE(LockMnt(false));
    ASSERT_EQ(UnLockMnt(), 0);
    EXPECT_TRUE(LockMnt(true));
}

TEST_F(MountLock, UnlockWithNothingHeldReturnsZeroAndDoesNothing) {
    YLIBCErrSetEx(0x1234, "other.cpp", 5);
    EXPECT_EQ(UnLockMnt(), 0);
    EXPECT_EQ(ForceUnLockMnt(), 0);
    EXPECT_EQ(YLIBCErrGet(), 0x1234U);
    EXPECT_THAT(seams::LogLines(), testing::IsEmpty());
    EXPECT_FALSE(fs::exists(kRoot));
}

TEST_F(MountLock, UnbalancedUnlockLeavesTheNextLockSound) {
    ASSERT_TRUE(LockMnt(true));
    EXPECT_EQ(UnLockMnt(), 0);
    EXPECT_EQ(UnLockMnt(), 0);
    EXPECT_EQ(UnLockMnt(), 0);
    ASSERT_TRUE(LockMnt(true));
    EXPECT_FALSE(OthersCanLock(kFile, LOCK_SH));
    EXPECT_EQ(UnLockMnt(), 0);
    EXPECT_TRUE(OthersCanLock(kFile, LOCK_EX));
}

TEST_F(MountLock, ForceGivesBackOneLevelOnlyAsTheOtherDoes) {
    ASSERT_TRUE(LockMnt(true));
    ASSERT_TRUE(LockMnt(true));
    EXPECT_EQ(ForceUnLockMnt(), 0);
    EXPECT_FALSE(OthersCanLock(kFile, LOCK_SH));
    EXPECT_EQ(ForceUnLockMnt(), 0);
    EXPECT_TRUE(OthersCanLock(kFile, LOCK_EX));
}

TEST_F(MountLock, FailedUnlockIsReportedAndLeavesNothingHeld) {
    ASSERT_TRUE(LockMnt(true));
    const int fd = DescriptorOfLock();
    ASSERT_GE(fd, 0);
    ASSERT_EQ(close(fd), 0);
    EXPECT_EQ(UnLockMnt(), -1);
    EXPECT_EQ(YLIBCErrGet(), 0x500U);
    EXPECT_EQ(UnLockMnt(), 0) << "nothing is held any more";
    EXPECT_TRUE(LockMnt(true));
}

TEST_F(MountLock, StaysWithAForkedChildWhenItsOwnerIsKilled) {
    MakeFile();
    int child_pipe[2];
    ASSERT_EQ(pipe(child_pipe), 0);
    OtherProcess owner([&child_pipe] {
        const bool locked = LockMnt(true);
        const pid_t child = fork();
        if (child == 0) {
            for (;;) {
                pause();
            }
        }
        return locked && write(child_pipe[1], &child, sizeof child) == sizeof child;
    });
    ASSERT_TRUE(owner.ok());
    pid_t child = 0;
    ASSERT_EQ(read(child_pipe[0], &child, sizeof child), static_cast<ssize_t>(sizeof child));
    owner.End();
    EXPECT_FALSE(OthersCanLock(kFile, LOCK_SH)) << "the child has the same open file";
    ASSERT_EQ(kill(child, SIGKILL), 0);
    bool free = false;
    for (int i = 0; i < 2000 && !free; ++i) {
        const timespec pause{0, 1000000};
        nanosleep(&pause, nullptr);
        free = OthersCanLock(kFile, LOCK_EX);
    }
    EXPECT_TRUE(free);
    close(child_pipe[0]);
    close(child_pipe[1]);
}

TEST_F(MountLock, IsNotHandedToAProgramThatIsExecuted) {
    ASSERT_TRUE(LockMnt(true));
    const int fd = DescriptorOfLock();
    ASSERT_GE(fd, 0);
    EXPECT_EQ(fcntl(fd, F_GETFD) & FD_CLOEXEC, FD_CLOEXEC);
}

TEST_F(MountLock, FolderInTheFilesPlaceIsRefused) {
    fs::create_directories(kFile);
    EXPECT_FALSE(LockMnt(true));
    EXPECT_EQ(YLIBCErrGet(), 0x900U);
    EXPECT_TRUE(seams::Logged(std::string("Failed to lock ") + kFile + ", Is a directory"))
        << seams::LogDump();
    EXPECT_THAT(seams::MicroSleeps(), testing::IsEmpty());
}

TEST_F(MountLock, FifoInTheFilesPlaceIsRefusedAndNotWaitedFor) {
    fs::create_directories(kFolder);
    ASSERT_EQ(mkfifo(kFile, 0666), 0);
    alarm(20);
    EXPECT_FALSE(LockMnt(true));
    alarm(0);
    EXPECT_EQ(YLIBCErrGet(), 0x900U);
}

TEST_F(MountLock, DanglingLinkInTheFilesPlaceMakesNoFileElsewhere) {
    fs::create_directories(kFolder);
    fs::create_symlink("/etc/planted", kFile);
    EXPECT_FALSE(LockMnt(true));
    EXPECT_EQ(YLIBCErrGet(), 0x900U);
    EXPECT_FALSE(fs::exists("/etc/planted"));
}

TEST_F(MountLock, FileInTheFoldersPlaceIsReplaced) {
    fs::create_directories("/tmp/zyrovfs/lock/user");
    const int fd = open(kFolder, O_WRONLY | O_CREAT | O_CLOEXEC, 0600);
    ASSERT_GE(fd, 0);
    close(fd);
    EXPECT_TRUE(LockMnt(true));
    EXPECT_TRUE(fs::is_directory(kFolder));
}

TEST_F(MountLock, FolderThatCannotBeMadeIsLoggedTwice) {
    fs::create_directories(kRoot);
    ASSERT_EQ(mount("none", kRoot, "tmpfs", MS_RDONLY, nullptr), 0);
    EXPECT_FALSE(LockMnt(true));
    ASSERT_EQ(umount(kRoot), 0);
    EXPECT_TRUE(
        seams::Logged(std::string("Failed to mkdir ") + kFolder + ", Read-only file system"))
        << seams::LogDump();
    EXPECT_TRUE(seams::Logged("Failed to lock init")) << seams::LogDump();
    EXPECT_TRUE(seams::LoggedPart("lock.cpp:")) << "the folder's failure is told by its user";
}

TEST_F(MountLock, FileThatCannotBeMadeGivesTheOpenError) {
    fs::create_directories(kFolder);
    ASSERT_EQ(mount("none", kFolder, "tmpfs", MS_RDONLY, nullptr), 0);
    EXPECT_FALSE(LockMnt(false));
    ASSERT_EQ(umount(kFolder), 0);
    EXPECT_EQ(YLIBCErrGet(), 0x900U);
    EXPECT_TRUE(seams::Logged(std::string("Failed to lock ") + kFile + ", Read-only file system"))
        << seams::LogDump();
}

}  // namespace
}  // namespace ZYROVFS::Utils
