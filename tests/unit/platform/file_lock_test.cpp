#include <fcntl.h>
#include <sys/stat.h>
#include <zosplatform/error.h>
#include <zosplatform/file.h>

#include <csignal>
#include <numeric>

#include "support/scratch.h"
#include "support/seams.h"

namespace {

constexpr int kExclusive = 1;
constexpr int kShared = 0;

class FileLock : public scratch::ScratchTest {
  protected:
    /** A child that holds the lock until the test ends it. */
    pid_t Hold(int exclusive) {
        int ready[2];
        EXPECT_EQ(pipe(ready), 0);
        const pid_t holder = scratch::Start([&] {
            int fd = -1;
            const char done = YLIBCFileLockTimeByFile(path_.c_str(), exclusive, 0, &fd) ? 'y' : 'n';
            if (write(ready[1], &done, 1) == 1) {
                pause();
            }
            return 0;
        });
        char done = 'n';
        EXPECT_EQ(read(ready[0], &done, 1), 1);
        EXPECT_EQ(done, 'y');
        close(ready[0]);
        close(ready[1]);
        return holder;
    }
    static void Stop(pid_t holder) {
        kill(holder, SIGKILL);
        EXPECT_EQ(scratch::End(holder), -SIGKILL);
    }
    bool TryLock(int exclusive, int seconds = 0) {
        int fd = -1;
        if (YLIBCFileLockTimeByFile(path_.c_str(), exclusive, seconds, &fd) == 0) {
            EXPECT_EQ(fd, -1);
            return false;
        }
        EXPECT_NE(YLIBCFileUnlockByFile(fd), 0);
        return true;
    }

    const std::string path_ = Path("lock");
};

TEST_F(FileLock, MakesTheFileForRootAlone) {
    EXPECT_TRUE(TryLock(kExclusive));
    struct stat info {};
    ASSERT_EQ(stat(path_.c_str(), &info), 0);
    EXPECT_EQ(info.st_mode & 07777, 0600U);
}

TEST_F(FileLock, ExclusiveKeepsEveryoneOut) {
    const pid_t holder = Hold(kExclusive);
    EXPECT_FALSE(TryLock(kExclusive));
    EXPECT_EQ(YLIBCErrGet(), ZOS_ERR_TRY_AGAIN);
    EXPECT_STREQ(YLIBCErrorGetFile(), "file_lock.cpp");
    EXPECT_FALSE(TryLock(kShared));
    Stop(holder);
    EXPECT_TRUE(TryLock(kExclusive));
}

TEST_F(FileLock, SharedLetsReadersIn) {
    const pid_t holder = Hold(kShared);
    EXPECT_TRUE(TryLock(kShared));
    EXPECT_FALSE(TryLock(kExclusive));
    Stop(holder);
}

TEST_F(FileLock, WaitsAsLongAsAsked) {
    const pid_t holder = Hold(kExclusive);
    EXPECT_FALSE(TryLock(kExclusive, 3));
    const auto waits = seams::MicroSleeps();
    EXPECT_EQ(std::accumulate(waits.begin(), waits.end(), 0U), 3000000U);
    EXPECT_EQ(YLIBCErrGet(), ZOS_ERR_TRY_AGAIN);
    Stop(holder);
}

TEST_F(FileLock, DoesNotWaitWithoutTime) {
    const pid_t holder = Hold(kExclusive);
    EXPECT_FALSE(TryLock(kExclusive, 0));
    EXPECT_FALSE(TryLock(kExclusive, -5));
    EXPECT_TRUE(seams::MicroSleeps().empty());
    Stop(holder);
}

TEST_F(FileLock, LinksPipesAndFoldersAreRefused) {
    ASSERT_EQ(symlink(Put("target", "keep").c_str(), path_.c_str()), 0);
    EXPECT_FALSE(TryLock(kExclusive));
    unlink(path_.c_str());
    ASSERT_EQ(mkfifo(path_.c_str(), 0600), 0);
    EXPECT_FALSE(TryLock(kExclusive));
    unlink(path_.c_str());
    ASSERT_EQ(mkdir(path_.c_str(), 0700), 0);
    EXPECT_FALSE(TryLock(kExclusive));
    EXPECT_EQ(scratch::Text(Path("target")), "keep");
}

TEST_F(FileLock, FailsWithoutAFolder) {
    int fd = 5;
    EXPECT_EQ(YLIBCFileLockTimeByFile(Path("no/lock").c_str(), kExclusive, 1, &fd), 0);
    EXPECT_EQ(YLIBCErrGet(), ZOS_ERR_NOT_FOUND);
    EXPECT_EQ(fd, -1);
}

TEST_F(FileLock, NullArgumentsAreRefused) {
    int fd = -1;
    EXPECT_EQ(YLIBCFileLockTimeByFile(nullptr, kExclusive, 1, &fd), 0);
    EXPECT_EQ(YLIBCErrGet(), ZOS_ERR_BAD_PARAMETER);
    EXPECT_EQ(YLIBCFileLockTimeByFile(path_.c_str(), kExclusive, 1, nullptr), 0);
}

TEST_F(FileLock, UnlockOfNothingFails) {
    EXPECT_EQ(YLIBCFileUnlockByFile(-1), 0);
    EXPECT_EQ(YLIBCErrGet(), ZOS_ERR_UNLOCK_FAILED);
}

TEST_F(FileLock, ProgramsThatAreStartedDoNotInheritIt) {
    int fd = -1;
    ASSERT_NE(YLIBCFileLockTimeByFile(path_.c_str(), kExclusive, 0, &fd), 0);
    EXPECT_NE(fcntl(fd, F_GETFD) & FD_CLOEXEC, 0);
    EXPECT_NE(YLIBCFileUnlockByFile(fd), 0);
}

}  // namespace
