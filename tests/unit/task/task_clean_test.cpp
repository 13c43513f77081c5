// Cleaning a queue: what stays, what each failure leaves, and a cleaner that is killed.
#include <dlfcn.h>
#include <fcntl.h>
#include <gmock/gmock.h>
#include <sys/file.h>
#include <sys/wait.h>
#include <unistd.h>
#include <zosplatform/file.h>
#include <zosplatform/process.h>

#include <cerrno>
#include <ctime>
#include <functional>
#include <list>

#include "task_fixture.h"

namespace {

bool no_fork = false;
pid_t forked = 0;
bool no_close = false;
std::function<void()> before_close;
std::function<void()> before_rename;
std::function<void()> before_touch;
std::function<void(const std::string&)> before_unlink;

template <typename Function>
Function* Real(const char* name) {
    return reinterpret_cast<Function*>(dlsym(RTLD_NEXT, name));
}

void Call(const std::function<void()>& hook) {
    if (hook) {
        hook();
    }
}

}  // namespace

extern "C" {

int fclose(FILE* file) {
    Call(before_close);
    const int result = Real<int(FILE*)>("fclose")(file);
    if (no_close) {
        errno = EIO;
        return EOF;
    }
    return result;
}

int renameat(int from_folder, const char* from, int to_folder, const char* to) noexcept {
    Call(before_rename);
    return Real<int(int, const char*, int, const char*)>("renameat")(from_folder, from, to_folder,
                                                                     to);
}

int unlinkat(int folder, const char* name, int flags) noexcept {
    if (before_unlink) {
        before_unlink(name);
    }
    return Real<int(int, const char*, int)>("unlinkat")(folder, name, flags);
}

int YLIBCFileTouch(const char* path) {
    Call(before_touch);
    return Real<int(const char*)>("YLIBCFileTouch")(path);
}

pid_t YLIBCProcFork() {
    if (no_fork) {
        errno = EAGAIN;
        return -1;
    }
    return forked = Real<pid_t()>("YLIBCProcFork")();
}

}  // extern "C"

namespace ZYROVFS {
namespace {

namespace fs = std::filesystem;
using namespace task_fixture;
using scratch::PutText;
using testing::ElementsAre;
using testing::IsEmpty;

constexpr pid_t kNobody = 0;

class TaskClean : public TaskTest {
  protected:
    void TearDown() override {
        no_fork = false;
        forked = 0;
        no_close = false;
        before_close = before_rename = before_touch = nullptr;
        before_unlink = nullptr;
        TaskTest::TearDown();
    }

    bool Clean(const char* id = nullptr, pid_t pid = kNobody, TaskMgr::Check check = nullptr,
               void* data = nullptr) {
        return tasks_.Clean("copy", id, pid, check, data, false);
    }
    bool CleanBehind() { return tasks_.Clean("copy", nullptr, kNobody, nullptr, nullptr, true); }

    /** A queue of two living jobs with a dead one between them. */
    void PutThree() { PutQueue(Staying(Line("dead", DeadPid()))); }
    std::string Staying(const std::string& between = "") {
        return Line("first", first_.pid()) + between + Line("last", last_.pid());
    }

    /** A failed clean-up leaves the queue, and neither a new file nor a stamp. */
    void ExpectUntouched(const std::string& queue) {
        EXPECT_EQ(Queue(), queue);
        EXPECT_FALSE(fs::is_regular_file(kFresh));
        EXPECT_FALSE(fs::exists(kStamp));
    }

    static void PutStamp(time_t when) {
        PutText(kStamp, "");
        const timespec times[] = {{when, 0}, {when, 0}};
        ASSERT_EQ(utimensat(AT_FDCWD, kStamp.c_str(), times, 0), 0);
    }

    Living first_;
    Living last_;
};

// --- what stays ---------------------------------------------------------------------------------

TEST_F(TaskClean, WithoutANameNothingIsCleaned) {
    EXPECT_FALSE(tasks_.Clean(nullptr, "job", 11, nullptr, nullptr, false));
    EXPECT_FALSE(tasks_.Clean("", "job", 11, nullptr, nullptr, false));
    EXPECT_FALSE(fs::exists("/var/tmp/user"));
}

TEST_F(TaskClean, WithoutAQueueThereIsNothingToDo) {
    EXPECT_TRUE(Clean());
    EXPECT_FALSE(fs::exists("/var/tmp/user"));
    EXPECT_THAT(seams::Sleeps(), IsEmpty());
}

TEST_F(TaskClean, TheDeadGoAndTheLivingStayInTheirOrder) {
    PutThree();
    EXPECT_TRUE(Clean());
    EXPECT_EQ(Queue(), Staying());
    EXPECT_TRUE(fs::is_regular_file(kStamp));
    EXPECT_FALSE(fs::exists(kFresh));
    EXPECT_THAT(seams::LogLines(), IsEmpty()) << seams::LogDump();
}

TEST_F(TaskClean, TheEntryThatIsMeantGoes) {
    PutQueue(Staying(Line("mine", getpid())));
    EXPECT_TRUE(Clean("mine", getpid()));
    EXPECT_EQ(Queue(), Staying());
}

TEST_F(TaskClean, WithTaskIdNullTheLineOfThatIdIsKeptUnlessItsProcessIsDeadOrEqualsPid) {
    const Living living;
    PutQueue(Line("job", living.pid()) + Line("job", DeadPid()) + Line("job", getpid()));
    EXPECT_TRUE(Clean(nullptr, getpid()));
    EXPECT_EQ(Queue(), Line("job", living.pid()));
}

TEST_F(TaskClean, TheSameIdOfAnotherLivingProcessStays) {
    PutQueue(Staying());
    EXPECT_TRUE(Clean("first", last_.pid()));
    EXPECT_EQ(Queue(), Line("first", first_.pid()));
}

TEST_F(TaskClean, AnEntryOfWhichTheCheckSaysZeroGoesAndAnyOtherStays) {
    const std::list<Living> living(4);
    std::string text = Line("dead", DeadPid());
    int number = -1;
    for (const Living& process : living) {
        text += Line(std::to_string(number++), process.pid());
    }
    PutQueue(text);
    std::vector<std::string> asked;
    const auto answer_the_id = [](const char* name, const char* id, int pid, void* data) {
        static_cast<std::vector<std::string>*>(data)->push_back(std::string(name) + id);
        EXPECT_EQ(YLIBCProcAlive(pid), 1);
        return std::stoi(id);
    };
    EXPECT_TRUE(Clean(nullptr, kNobody, answer_the_id, &asked));
    EXPECT_THAT(asked, ElementsAre("copy-1", "copy0", "copy1", "copy2"));
    EXPECT_EQ(Queue(), Line("-1", living.front().pid()) +
                           Line("1", std::next(living.begin(), 2)->pid()) +
                           Line("2", living.back().pid()));
}

TEST_F(TaskClean, ALineWithOnlyOneTokenIsDroppedSinceItIsNotCopied) {
    PutQueue(Staying("one-token\n\n\t\n" + std::to_string(first_.pid()) + "\n"));
    EXPECT_TRUE(Clean());
    EXPECT_EQ(Queue(), Staying());
}

TEST_F(TaskClean, LinesThatTellNoProcessAreDropped) {
    std::string junk = std::string("\0\xff\t", 3) + std::to_string(first_.pid()) + "\n";
    junk += "minus\t-1\nzero\t0\nwide\t4294967297\nwider\t99999999999999999999999\nword\tpid\n";
    junk += std::string(1 << 20, 'x') + "\n";
    PutQueue(Staying(junk));
    EXPECT_TRUE(Clean());
    EXPECT_EQ(Queue(), Staying());
}

TEST_F(TaskClean, ALineOfOneMebibyteAndALastLineWithoutItsNewlineAreKeptWhole) {
    const std::string id(1 << 20, 'x');
    PutQueue(Line(id, first_.pid()) + "last\t" + std::to_string(last_.pid()));
    EXPECT_TRUE(Clean());
    EXPECT_EQ(Queue(), Line(id, first_.pid()) + Line("last", last_.pid()));
    EXPECT_TRUE(tasks_.Add("copy", "next", 11));
    EXPECT_EQ(Queue(), Line(id, first_.pid()) + Line("last", last_.pid()) + "next\t11\n");
}

// --- the stamp ----------------------------------------------------------------------------------

TEST_F(TaskClean, OfTwoCleansWithinTwoSecondsTheSecondIsTrueAndDoesNothing) {
    PutThree();
    ASSERT_TRUE(Clean());
    const std::string dirty = Staying(Line("dead", DeadPid()));
    PutQueue(dirty);
    EXPECT_TRUE(Clean());
    EXPECT_EQ(Queue(), dirty);
    EXPECT_THAT(seams::Sleeps(), ElementsAre(3));
}

TEST_F(TaskClean, AStampWithinTwoSecondsOnEitherSideKeepsTheQueue) {
    constexpr time_t kNow = 1700000000;
    seams::SetTime(kNow);
    for (const int distance : {-3, -2, -1, 0, 1, 2, 3}) {
        PutThree();
        PutStamp(kNow + distance);
        const bool just_cleaned = distance >= -2 && distance <= 2;
        EXPECT_TRUE(Clean());
        EXPECT_EQ(Queue() == Staying(), !just_cleaned) << distance;
    }
}

TEST_F(TaskClean, AStampThatIsNoRegularFileDoesNotCount) {
    PutThree();
    fs::create_directories(kStamp);
    EXPECT_TRUE(Clean());
    EXPECT_EQ(Queue(), Staying());
}

TEST_F(TaskClean, TheStampIsLookedAtAgainUnderTheLock) {
    PutThree();
    const std::string before = Queue();
    PutText(kLock, "");
    support::OtherProcess other([] {
        const int fd = open(kLock.c_str(), O_RDONLY | O_CLOEXEC);
        return fd >= 0 && flock(fd, LOCK_EX | LOCK_NB) == 0;
    });
    ASSERT_TRUE(other.ok());
    seams::OnMicroSleep([&] {
        PutText(kStamp, "");
        other.End();
    });
    EXPECT_TRUE(Clean());
    EXPECT_EQ(Queue(), before);
    EXPECT_THAT(seams::Sleeps(), IsEmpty());
}

TEST_F(TaskClean, ThreeSecondsPassWithTheLockHeldForJobsThatAreAboutToEnd) {
    PutQueue(Staying());
    seams::OnSleep([&] {
        EXPECT_FALSE(support::OthersCanLock(kLock.c_str(), LOCK_SH));
        last_.End();
    });
    EXPECT_TRUE(Clean());
    EXPECT_THAT(seams::Sleeps(), ElementsAre(3));
    EXPECT_EQ(Queue(), Line("first", first_.pid()));
}

// --- in the background --------------------------------------------------------------------------

TEST_F(TaskClean, InTheBackgroundTheParentIsBackAtOnceAndTheChildDoesTheWork) {
    PutThree();
    const std::string before = Queue();
    seams::WatchChildren();
    support::OtherProcess holder([] {
        const int fd = open(kLock.c_str(), O_RDONLY | O_CREAT | O_CLOEXEC, 0600);
        return fd >= 0 && flock(fd, LOCK_EX | LOCK_NB) == 0;
    });
    ASSERT_TRUE(holder.ok());
    // Between its tries the child waits for the lock, since a recorded sleep takes no time: on a
    // busy machine it would run out of tries before the lock is free.
    seams::OnMicroSleep([] {
        const int fd = open(kLock.c_str(), O_RDONLY | O_CLOEXEC);
        flock(fd, LOCK_EX);
        close(fd);
    });
    EXPECT_TRUE(CleanBehind());
    EXPECT_EQ(Queue(), before);
    holder.End();
    EXPECT_EQ(scratch::End(forked), 0);
    EXPECT_THAT(seams::Sleeps(), ElementsAre(3));
    EXPECT_EQ(Queue(), Staying());
}

TEST_F(TaskClean, AChildThatFailsEndsAllTheSameAndNeverReturnsToTheCaller) {
    PutThree();
    fs::create_directories(kLock);
    const pid_t me = getpid();
    EXPECT_TRUE(CleanBehind());
    ASSERT_EQ(getpid(), me);
    EXPECT_EQ(scratch::End(forked), 0);
    fs::remove(kLock);

    const auto throws = [](const char*, const char*, int, void*) -> int {
        throw std::runtime_error("out of its depth");
    };
    EXPECT_TRUE(tasks_.Clean("copy", nullptr, kNobody, throws, nullptr, true));
    ASSERT_EQ(getpid(), me);
    EXPECT_EQ(scratch::End(forked), 0);
}

TEST_F(TaskClean, WhenTheForkFailsTheCallerCleansInTheForeground) {
    PutThree();
    no_fork = true;
    EXPECT_TRUE(CleanBehind());
    EXPECT_THAT(seams::Sleeps(), ElementsAre(3));
    EXPECT_EQ(Queue(), Staying());
    EXPECT_EQ(forked, 0);
}

// --- failures -----------------------------------------------------------------------------------

TEST_F(TaskClean, WithoutTheLockItFailsWithALogLine) {
    PutThree();
    const std::string before = Queue();
    fs::create_directories(kLock);
    PutText(kFresh, "another clean-up's");
    EXPECT_FALSE(Clean());
    EXPECT_TRUE(
        seams::Logged("Failed to lock " + kLock + ", " + PlatformError() + ", Is a directory"))
        << seams::LogDump();
    EXPECT_EQ(Queue(), before);
    EXPECT_EQ(scratch::Text(kFresh), "another clean-up's");
}

TEST_F(TaskClean, ANewFileThatCannotBeOpenedSetsThePlatformError0x900) {
    PutThree();
    const std::string before = Queue();
    fs::create_directories(kFresh);
    EXPECT_FALSE(Clean());
    EXPECT_EQ(YLIBCErrGet(), 0x900U);
    EXPECT_STREQ(YLIBCErrorGetFile(), "task.cpp");
    ExpectUntouched(before);
}

TEST_F(TaskClean, WhatAKilledCleanUpLeftIsReplacedAndALinkNotFollowed) {
    PutThree();
    PutText(kFresh, "half a li");
    EXPECT_TRUE(Clean());
    EXPECT_EQ(Queue(), Staying());

    fs::remove(kStamp);
    const std::string other = kUser + "/precious";
    PutText(other, "untouched");
    fs::create_symlink(other, kFresh);
    EXPECT_TRUE(Clean());
    EXPECT_EQ(Queue(), Staying());
    EXPECT_EQ(scratch::Text(other), "untouched");
}

TEST_F(TaskClean, AQueueThatCannotBeOpenedFailsWithALogLine) {
    PutThree();
    seams::OnSleep([] { fs::remove(kQueue); });
    EXPECT_FALSE(Clean());
    EXPECT_TRUE(seams::Logged("Failed to open " + kQueue + ", No such file or directory"))
        << seams::LogDump();
    ExpectUntouched("");
}

TEST_F(TaskClean, AReadThatEndsBeforeTheEndOfTheFileFailsWithALogLine) {
    PutThree();
    const std::string before = Queue();
    ASSERT_EQ(mount("/proc/self/mem", kQueue.c_str(), nullptr, MS_BIND, nullptr), 0);
    EXPECT_FALSE(Clean());
    ASSERT_EQ(umount(kQueue.c_str()), 0);
    EXPECT_TRUE(seams::Logged("Failed to save data to " + kFresh + ", Input/output error"))
        << seams::LogDump();
    ExpectUntouched(before);
}

TEST_F(TaskClean, AFullDiskFailsTheFlushAndLeavesTheQueue) {
    const Disk disk(kFolder, "size=64k");
    ASSERT_TRUE(disk.mounted());
    PutThree();
    const std::string before = Queue();
    PutText(kLock, "");
    disk.Fill();
    EXPECT_FALSE(Clean());
    EXPECT_TRUE(seams::Logged("Failed to save data to " + kFresh + ", No space left on device"))
        << seams::LogDump();
    ExpectUntouched(before);
}

TEST_F(TaskClean, ALineThatCannotBeWrittenFailsAndLeavesTheQueue) {
    const Disk disk(kFolder, "size=256k");
    ASSERT_TRUE(disk.mounted());
    const std::string id(60000, 'x');
    PutQueue(Line(id, first_.pid()));
    const std::string before = Queue();
    PutText(kLock, "");
    disk.Fill();
    EXPECT_FALSE(Clean());
    EXPECT_TRUE(
        seams::Logged("Failed to save " + id + " to " + kFresh + ", No space left on device"));
    ExpectUntouched(before);
}

TEST_F(TaskClean, ANewFileThatCannotBeClosedFailsWithALogLine) {
    PutThree();
    const std::string before = Queue();
    no_close = true;
    EXPECT_FALSE(Clean());
    no_close = false;
    EXPECT_TRUE(seams::Logged("Failed to close " + kFresh + ", Input/output error"))
        << seams::LogDump();
    ExpectUntouched(before);
}

TEST_F(TaskClean, ANewFileThatCannotBeRenamedFailsWithALogLine) {
    PutThree();
    before_rename = [] {
        fs::remove(kQueue);
        fs::create_directories(kQueue);
    };
    EXPECT_FALSE(Clean());
    EXPECT_TRUE(seams::Logged("Failed to rename " + kFresh + ", Is a directory"))
        << seams::LogDump();
    EXPECT_FALSE(fs::exists(kFresh));
    EXPECT_FALSE(fs::exists(kStamp));
}

TEST_F(TaskClean, ANewFileIsRemovedBeforeTheLockIsGivenBack) {
    PutThree();
    no_close = true;
    bool was_there = false;
    bool was_held = false;
    before_unlink = [&](const std::string& name) {
        was_there = name == "copy.tmp" && fs::exists(kFresh);
        was_held = !support::OthersCanLock(kLock.c_str(), LOCK_SH);
    };
    EXPECT_FALSE(Clean());
    EXPECT_TRUE(was_there);
    EXPECT_TRUE(was_held);
    EXPECT_FALSE(fs::exists(kFresh));
}

// --- a cleaner that is killed -------------------------------------------------------------------

void Die() {
    raise(SIGKILL);
}

int DieAsked(const char*, const char*, int, void*) {
    Die();
    return 1;
}

/** Each place at which a cleaner can be killed that leaves another state of the files. */
struct Death {
    const char* place;
    std::function<void()> plan;
    TaskMgr::Check check;
};

const Death kDeaths[] = {
    {"during the three seconds", [] { seams::OnSleep(Die); }, nullptr},
    {"between two lines", [] {}, DieAsked},
    {"with the new file written", [] { before_close = Die; }, nullptr},
    {"with the new file closed", [] { before_rename = Die; }, nullptr},
    {"with the new file in place", [] { before_touch = Die; }, nullptr},
};

TEST_F(TaskClean, ACleanerKilledAtAnyPointLosesNoLivingJobsLineAndHoldsNobodyUp) {
    for (const Death& death : kDeaths) {
        fs::remove_all(kFolder);
        PutThree();
        const int status = scratch::InChild([&] {
            death.plan();
            return Clean(nullptr, kNobody, death.check) ? 1 : 2;
        });
        EXPECT_EQ(status, -SIGKILL) << death.place;
        EXPECT_TRUE(support::OthersCanLock(kLock.c_str(), LOCK_EX)) << death.place;
        EXPECT_EQ(tasks_.IsRunnable("copy", "first", first_.pid(), nullptr, nullptr), 1);
        EXPECT_EQ(tasks_.IsRunnable("copy", "last", last_.pid(), nullptr, nullptr), 2)
            << death.place;
        EXPECT_TRUE(Clean()) << death.place;
        EXPECT_EQ(Queue(), Staying()) << death.place;
        EXPECT_FALSE(fs::exists(kFresh)) << death.place;
    }
}

}  // namespace
}  // namespace ZYROVFS
