// Adding to a queue and asking for a turn or for room.
#include <gmock/gmock.h>
#include <sys/file.h>
#include <unistd.h>

#include <cerrno>
#include <list>
#include <new>

#include "task_fixture.h"

namespace {
bool no_memory = false;
}

void* operator new(size_t size, const std::nothrow_t&) noexcept {
    return no_memory ? nullptr : ::operator new(size);
}

namespace ZYROVFS {
namespace {

namespace fs = std::filesystem;
using namespace task_fixture;
using scratch::Text;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::SizeIs;

int Runnable(TaskMgr& tasks, const char* id, pid_t pid) {
    return static_cast<int>(tasks.IsRunnable("copy", id, pid, nullptr, nullptr));
}

/** A regular file that users cannot be made to share a folder with: the registry cannot be made. */
class ReadOnlyUserFolder {
  public:
    ReadOnlyUserFolder() : disk_("/var/tmp/user", nullptr, MS_RDONLY) {
        EXPECT_TRUE(disk_.mounted());
    }

  private:
    Disk disk_;
};

/** Writes are cut at this size of a file, as a full disk cuts them. */
class FileSizeLimit {
  public:
    explicit FileSizeLimit(rlim_t bytes) {
        getrlimit(RLIMIT_FSIZE, &saved_);
        const rlimit limit{bytes, saved_.rlim_max};
        setrlimit(RLIMIT_FSIZE, &limit);
        signal(SIGXFSZ, SIG_IGN);
    }
    ~FileSizeLimit() { setrlimit(RLIMIT_FSIZE, &saved_); }

  private:
    rlimit saved_{};
};

struct Question {
    int answer;
    std::vector<std::string> asked;
};

int Answer(const char* name, const char* id, int pid, void* data) {
    auto* question = static_cast<Question*>(data);
    question->asked.push_back(std::string(name) + " " + id + " " + std::to_string(pid));
    return question->answer;
}

// --- where --------------------------------------------------------------------------------------

TEST_F(TaskTest, ATypesPathIsBelowTheRuntimeFolderOfTheActingUser) {
    std::string path;
    EXPECT_TRUE(TaskMgr::GetTaskPath("copy", path));
    EXPECT_EQ(path, "/var/tmp/user/1001/zyrovfs/task/copy");
    EXPECT_FALSE(fs::exists("/var/tmp/user"));
}

TEST_F(TaskTest, ANullOrEmptyNameHasNoPath) {
    std::string path = "before";
    EXPECT_FALSE(TaskMgr::GetTaskPath(nullptr, path));
    EXPECT_FALSE(TaskMgr::GetTaskPath("", path));
    EXPECT_EQ(path, "before");
}

// --- Add ----------------------------------------------------------------------------------------

TEST_F(TaskTest, AddAppendsIdAndProcessInFoldersOpenToAll) {
    const mode_t saved = umask(022);
    EXPECT_TRUE(tasks_.Add("copy", "first", 11));
    EXPECT_TRUE(tasks_.Add("copy", "second", 12));
    umask(saved);
    EXPECT_EQ(Queue(), "first\t11\nsecond\t12\n");
    struct stat info {};
    ASSERT_EQ(stat(kFolder.c_str(), &info), 0);
    EXPECT_EQ(info.st_mode & 07777, 01777U) << "and nobody takes what is another's";
    EXPECT_TRUE(fs::exists(kLock));
    EXPECT_THAT(seams::LogLines(), IsEmpty()) << seams::LogDump();
}

TEST_F(TaskTest, AddWithoutNameOrIdChangesNothing) {
    EXPECT_FALSE(tasks_.Add(nullptr, "job", 11));
    EXPECT_FALSE(tasks_.Add("", "job", 11));
    EXPECT_FALSE(tasks_.Add("copy", nullptr, 11));
    EXPECT_FALSE(tasks_.Add("copy", "", 11));
    EXPECT_FALSE(fs::exists("/var/tmp/user"));
}

TEST_F(TaskTest, AddRefusesAnIdThatALineCannotHold) {
    EXPECT_FALSE(tasks_.Add("copy", "one\t1\ntwo", 11));
    EXPECT_FALSE(tasks_.Add("copy", "tab\tbed", 11));
    EXPECT_FALSE(fs::exists(kQueue));
    EXPECT_THAT(seams::LogLines(), SizeIs(2));
}

TEST_F(TaskTest, ARegistryFolderThatCannotBeMadeFailsTheAddWithALogLine) {
    const ReadOnlyUserFolder read_only;
    EXPECT_FALSE(tasks_.Add("copy", "job", 11));
    EXPECT_EQ(YLIBCErrGet(), unsigned{ZOS_ERR_SYSTEM});
    EXPECT_TRUE(
        seams::Logged("Failed to mkdir " + kFolder + PlatformError() + ", Read-only file system"))
        << seams::LogDump();
    EXPECT_EQ(Runnable(tasks_, "job", 11), 0);
    EXPECT_TRUE(tasks_.IsAddable("copy", 11));
    EXPECT_TRUE(tasks_.Clean("copy", "job", 11, nullptr, nullptr, false));
}

TEST_F(TaskTest, AFileInPlaceOfTheRegistrysFolderIsReplaced) {
    fs::create_directories(kUser);
    scratch::PutText(kUser + "/zyrovfs", "in the way");
    EXPECT_TRUE(tasks_.Add("copy", "job", 11));
    EXPECT_EQ(Queue(), "job\t11\n");
}

TEST_F(TaskTest, AddWithoutTheLockFailsWithALogLine) {
    fs::create_directories(kLock);
    EXPECT_FALSE(tasks_.Add("copy", "job", 11));
    EXPECT_TRUE(seams::Logged("Failed to lock " + kLock + PlatformError() + ", Is a directory"))
        << seams::LogDump();
    EXPECT_FALSE(fs::exists(kQueue));
}

TEST_F(TaskTest, TheLockIsWaitedForTenMinutes) {
    fs::create_directories(kFolder);
    scratch::PutText(kLock, "");
    const support::OtherProcess holder([] {
        const int fd = open(kLock.c_str(), O_RDONLY | O_CLOEXEC);
        return fd >= 0 && flock(fd, LOCK_EX | LOCK_NB) == 0;
    });
    ASSERT_TRUE(holder.ok());
    EXPECT_FALSE(tasks_.Add("copy", "job", 11));
    long waited = 0;
    for (const unsigned pause : seams::MicroSleeps()) {
        waited += pause;
    }
    EXPECT_EQ(waited, 600L * 1000 * 1000);
    EXPECT_EQ(YLIBCErrGet(), unsigned{ZOS_ERR_TRY_AGAIN});
    fs::remove(kLock);
}

TEST_F(TaskTest, AQueueThatCannotBeOpenedIsTriedTenTimesWithASecondAfterEach) {
    fs::create_directories(kQueue);
    EXPECT_FALSE(tasks_.Add("copy", "job", 11));
    EXPECT_THAT(seams::Sleeps(), ElementsAre(1, 1, 1, 1, 1, 1, 1, 1, 1, 1));
    ASSERT_THAT(seams::LogLines(), SizeIs(11));
    for (size_t i = 0; i < 10; ++i) {
        EXPECT_THAT(seams::LogLines()[i].text,
                    HasSubstr(" Failed to open " + kQueue + " (Is a directory)."));
    }
    EXPECT_THAT(seams::LogLines()[10].text, HasSubstr(" Failed to wiret data"));
}

TEST_F(TaskTest, AQueueThatCanBeOpenedAtTheThirdTryTakesTheLine) {
    fs::create_directories(kQueue);
    seams::OnSleep([] {
        if (seams::Sleeps().size() == 2) {
            fs::remove(kQueue);
        }
    });
    EXPECT_TRUE(tasks_.Add("copy", "job", 11));
    EXPECT_THAT(seams::Sleeps(), ElementsAre(1, 1));
    EXPECT_EQ(Queue(), "job\t11\n");
}

TEST_F(TaskTest, AShortWriteFailsAndLeavesNoPartOfALine) {
    PutQueue("first\t11\n");
    {
        const FileSizeLimit limit(12);
        EXPECT_FALSE(tasks_.Add("copy", "second", 12));
    }
    EXPECT_TRUE(seams::Logged("Failed to write " + kQueue + ". (No space left on device)"))
        << seams::LogDump();
    EXPECT_EQ(Queue(), "first\t11\n");
}

TEST_F(TaskTest, AWriteThatFailsIsLoggedWithItsCause) {
    PutQueue("first\t11\n");
    {
        const FileSizeLimit limit(9);
        EXPECT_FALSE(tasks_.Add("copy", "second", 12));
    }
    EXPECT_TRUE(seams::Logged("Failed to write " + kQueue + ". (File too large)"))
        << seams::LogDump();
    EXPECT_EQ(Queue(), "first\t11\n");
}

TEST_F(TaskTest, ALinkInPlaceOfTheQueueIsNotFollowed) {
    fs::create_directories(kFolder);
    const std::string other = kUser + "/precious";
    scratch::PutText(other, "untouched");
    fs::create_symlink(other, kQueue);
    EXPECT_FALSE(tasks_.Add("copy", "job", 11));
    EXPECT_EQ(Runnable(tasks_, "job", 11), 0);
    EXPECT_TRUE(tasks_.IsAddable("copy", 11));
    EXPECT_FALSE(tasks_.Clean("copy", nullptr, 0, nullptr, nullptr, false));
    EXPECT_EQ(Text(other), "untouched");
}

TEST_F(TaskTest, AFifoInPlaceOfTheQueueHangsNobody) {
    fs::create_directories(kFolder);
    ASSERT_EQ(mkfifo(kQueue.c_str(), 0666), 0);
    EXPECT_FALSE(tasks_.Add("copy", "job", 11));
    EXPECT_EQ(Runnable(tasks_, "job", 11), 0);
    EXPECT_TRUE(tasks_.IsAddable("copy", 11));
    EXPECT_FALSE(tasks_.Clean("copy", nullptr, 0, nullptr, nullptr, false));
}

// --- IsRunnable ---------------------------------------------------------------------------------

TEST_F(TaskTest, IsRunnableWithoutNameOrIdIsZero) {
    PutQueue(Line("", 11));
    EXPECT_EQ(tasks_.IsRunnable(nullptr, "job", 11, nullptr, nullptr), 0);
    EXPECT_EQ(tasks_.IsRunnable("", "job", 11, nullptr, nullptr), 0);
    EXPECT_EQ(tasks_.IsRunnable("copy", nullptr, 11, nullptr, nullptr), 0);
    EXPECT_EQ(tasks_.IsRunnable("copy", "", 11, nullptr, nullptr), 0);
    EXPECT_EQ(Queue(), Line("", 11));
}

TEST_F(TaskTest, WithoutAQueueTheJobIsAddedAndRunsAtOnce) {
    EXPECT_EQ(Runnable(tasks_, "job", 11), 1);
    EXPECT_EQ(Queue(), "job\t11\n");
}

TEST_F(TaskTest, IsRunnableForAJobWithNoLineAddsItAndAnswersZeroOnThisCall) {
    PutQueue(Line("other", DeadPid()));
    const std::string before = Queue();
    EXPECT_EQ(Runnable(tasks_, "job", 11), 0);
    EXPECT_EQ(Queue(), before + "job\t11\n");
    EXPECT_TRUE(seams::Logged("Failed to find job, pid 11")) << seams::LogDump();
    EXPECT_EQ(Runnable(tasks_, "job", 11), 1);
}

TEST_F(TaskTest, AJobThatLostItsLineQueuesAgainAtTheEnd) {
    const Living first;
    const Living second;
    PutQueue(Line("lost", 11) + Line("first", first.pid()));
    ASSERT_EQ(Runnable(tasks_, "lost", 11), 1);
    PutQueue(Line("first", first.pid()) + Line("second", second.pid()));
    EXPECT_EQ(Runnable(tasks_, "lost", 11), 0);
    EXPECT_EQ(Runnable(tasks_, "lost", 11), 3);
}

TEST_F(TaskTest, AJobWhoseOwnLineIsFirstGetsOneWhateverTheLimit) {
    PutQueue(Line("job", 11));
    for (const unsigned limit : {0U, 1U, 3U, 4294967295U}) {
        TaskMgr tasks(limit);
        EXPECT_EQ(Runnable(tasks, "job", 11), 1) << limit;
    }
}

TEST_F(TaskTest, WithALimitOfThreeThreeRunAndTheFourthWaits) {
    const std::list<Living> living(4);
    std::string text;
    for (const Living& process : living) {
        text += Line("job", process.pid());
    }
    PutQueue(text);
    int place = 0;
    for (const Living& process : living) {
        ++place;
        EXPECT_EQ(Runnable(tasks_, "job", process.pid()), place <= 3 ? place : 0);
    }
    EXPECT_EQ(Queue(), text);
}

TEST_F(TaskTest, SetMaxTaskOfZeroSetsThree) {
    const std::list<Living> living(3);
    std::string text;
    for (const Living& process : living) {
        text += Line("job", process.pid());
    }
    PutQueue(text);
    TaskMgr tasks(1);
    EXPECT_EQ(Runnable(tasks, "job", living.back().pid()), 0);
    tasks.SetMaxTask(0);
    EXPECT_EQ(Runnable(tasks, "job", living.back().pid()), 3);
    EXPECT_FALSE(tasks.IsAddable("copy", 11));
    tasks.SetMaxTask(2);
    EXPECT_EQ(Runnable(tasks, "job", living.back().pid()), 0);
    tasks.SetMaxTask(4);
    EXPECT_TRUE(tasks.IsAddable("copy", 11));
}

TEST_F(TaskTest, TheConstructorWithZeroKeepsZeroAndNoOneIsRunnableBehindALivingEntry) {
    const Living first;
    PutQueue(Line("first", first.pid()) + Line("job", 11));
    TaskMgr tasks(0);
    EXPECT_EQ(Runnable(tasks, "first", first.pid()), 1);
    EXPECT_EQ(Runnable(tasks, "job", 11), 0);
    EXPECT_FALSE(tasks.IsAddable("copy", 11));
}

TEST_F(TaskTest, DeadEntriesBeforeAJobDoNotCountAgainstTheLimit) {
    const Living living;
    std::string text;
    for (int i = 0; i < 5; ++i) {
        text += Line("dead", DeadPid());
    }
    PutQueue(text + Line("living", living.pid()) + Line("job", 11));
    EXPECT_EQ(Runnable(tasks_, "job", 11), 2);
    TaskMgr one(1);
    EXPECT_EQ(Runnable(one, "job", 11), 0);
}

TEST_F(TaskTest, AProcessThatHasEndedUncollectedIsDead) {
    const pid_t zombie = scratch::Start([] { return 0; });
    siginfo_t info{};
    ASSERT_EQ(waitid(P_PID, static_cast<id_t>(zombie), &info, WEXITED | WNOWAIT), 0);
    PutQueue(Line("zombie", zombie) + Line("job", 11));
    TaskMgr one(1);
    EXPECT_EQ(Runnable(one, "job", 11), 1);
    scratch::End(zombie);
}

TEST_F(TaskTest, ARecycledProcessIdCountsAsTheNewProcessUnlessTheCallerKnowsBetter) {
    // The line of a job that has ended; its number now belongs to somebody else's process.
    const Living stranger;
    PutQueue(Line("ended", stranger.pid()) + Line("job", 11));
    TaskMgr one(1);
    EXPECT_EQ(Runnable(one, "job", 11), 0);
    Question not_mine{0, {}};
    EXPECT_EQ(one.IsRunnable("copy", "job", 11, Answer, &not_mine), 1);
}

TEST_F(TaskTest, SiblingEntriesOfTheSameProcessTakeNoPlace) {
    const Living me;
    PutQueue(Line("a", me.pid()) + Line("b", me.pid()) + Line("c", me.pid()));
    TaskMgr one(1);
    EXPECT_EQ(Runnable(one, "c", me.pid()), 1);
}

TEST_F(TaskTest, TheSameIdOfAnotherProcessIsAnotherJob) {
    const Living other;
    PutQueue(Line("job", other.pid()) + Line("job", 11));
    EXPECT_EQ(Runnable(tasks_, "job", 11), 2);
}

TEST_F(TaskTest, AnEntryOfWhichTheCheckSaysZeroDoesNotCompete) {
    const Living first;
    const Living second;
    PutQueue(Line("a", first.pid()) + Line("dead", DeadPid()) + Line("b", second.pid()) +
             Line("job", 11) + Line("behind", first.pid()));
    Question question{0, {}};
    TaskMgr one(1);
    EXPECT_EQ(one.IsRunnable("copy", "job", 11, Answer, &question), 1);
    EXPECT_THAT(question.asked, ElementsAre("copy a " + std::to_string(first.pid()),
                                            "copy b " + std::to_string(second.pid())));
}

TEST_F(TaskTest, TheCheckStopsTheQuestionWithMinusOne) {
    const Living first;
    const Living second;
    PutQueue(Line("a", first.pid()) + Line("b", second.pid()) + Line("job", 11));
    Question question{-1, {}};
    EXPECT_EQ(tasks_.IsRunnable("copy", "job", 11, Answer, &question), -1);
    EXPECT_THAT(question.asked, SizeIs(1));
}

TEST_F(TaskTest, AnEntryOfWhichTheCheckSaysAnythingElseCounts) {
    const Living first;
    const Living second;
    PutQueue(Line("a", first.pid()) + Line("b", second.pid()) + Line("job", 11));
    for (const int answer : {1, 2, -2}) {
        Question question{answer, {}};
        EXPECT_EQ(tasks_.IsRunnable("copy", "job", 11, Answer, &question), 3) << answer;
    }
}

TEST_F(TaskTest, TheCheckIsAskedBeforeTheLimitIsLookedAt) {
    const Living first;
    const Living second;
    PutQueue(Line("a", first.pid()) + Line("b", second.pid()) + Line("job", 11));
    Question question{1, {}};
    TaskMgr one(1);
    EXPECT_EQ(one.IsRunnable("copy", "job", 11, Answer, &question), 0);
    EXPECT_THAT(question.asked, SizeIs(1));
    TaskMgr none(0);
    Question stop{-1, {}};
    EXPECT_EQ(none.IsRunnable("copy", "job", 11, Answer, &stop), -1);
}

TEST_F(TaskTest, AFullQueueAnswersZeroAndAddsNobody) {
    const std::list<Living> living(3);
    std::string text;
    for (const Living& process : living) {
        text += Line("job", process.pid());
    }
    PutQueue(text);
    EXPECT_EQ(Runnable(tasks_, "newcomer", 11), 0);
    EXPECT_EQ(Queue(), text);
}

TEST_F(TaskTest, IsRunnableReadsUnderASharedLock) {
    const Living other;
    PutQueue(Line("a", other.pid()) + Line("job", 11));
    const auto try_locks = [](const char*, const char*, int, void*) {
        EXPECT_TRUE(support::OthersCanLock(kLock.c_str(), LOCK_SH));
        EXPECT_FALSE(support::OthersCanLock(kLock.c_str(), LOCK_EX));
        return 1;
    };
    EXPECT_EQ(tasks_.IsRunnable("copy", "job", 11, try_locks, nullptr), 2);
}

TEST_F(TaskTest, IsRunnableWithoutTheLockIsZeroWithALogLine) {
    PutQueue("job\t11\n");
    fs::create_directories(kLock);
    EXPECT_EQ(Runnable(tasks_, "job", 11), 0);
    EXPECT_TRUE(
        seams::Logged("Failed to lock " + kLock + " " + PlatformError() + ", Is a directory"))
        << seams::LogDump();
}

TEST_F(TaskTest, IsRunnableWithAQueueThatCannotBeOpenedIsZeroWithALogLine) {
    fs::create_directories(kQueue);
    EXPECT_EQ(Runnable(tasks_, "job", 11), 0);
    EXPECT_TRUE(seams::Logged("Failed to open " + kQueue + ", Is a directory")) << seams::LogDump();
    EXPECT_THAT(seams::Sleeps(), IsEmpty());
}

TEST_F(TaskTest, AQueueThatCannotBeReadToItsEndAddsNobody) {
    PutQueue("job\t11\n");
    // Opens like any file, and every read from its beginning fails.
    ASSERT_EQ(mount("/proc/self/mem", kQueue.c_str(), nullptr, MS_BIND, nullptr), 0);
    EXPECT_EQ(Runnable(tasks_, "job", 11), 0);
    EXPECT_TRUE(tasks_.IsAddable("copy", 11));
    ASSERT_EQ(umount(kQueue.c_str()), 0);
    EXPECT_TRUE(seams::Logged("Failed to read " + kQueue + ", Input/output error"))
        << seams::LogDump();
    EXPECT_EQ(Queue(), "job\t11\n");
}

// --- IsAddable ----------------------------------------------------------------------------------

TEST_F(TaskTest, ThereIsRoomWithoutANameOrAQueue) {
    TaskMgr none(0);
    EXPECT_TRUE(none.IsAddable(nullptr, 11));
    EXPECT_TRUE(none.IsAddable("", 11));
    EXPECT_TRUE(none.IsAddable("copy", 11));
    EXPECT_FALSE(fs::exists("/var/tmp/user"));
}

TEST_F(TaskTest, ThereIsNoRoomOnceThreeLivingEntriesOfOtherProcessesStandInTheFile) {
    const std::list<Living> living(3);
    std::string text = Line("dead", DeadPid()) + Line("own", getpid());
    for (const Living& process : living) {
        PutQueue(text);
        EXPECT_TRUE(tasks_.IsAddable("copy", getpid()));
        text += Line("job", process.pid());
    }
    PutQueue(text);
    EXPECT_FALSE(tasks_.IsAddable("copy", getpid()));
    EXPECT_TRUE(tasks_.IsAddable("copy", living.back().pid()) == false);
    fs::remove(kQueue);
    EXPECT_TRUE(tasks_.IsAddable("copy", getpid()));
}

TEST_F(TaskTest, IsAddableWaitsForReadersToo) {
    PutQueue("");
    scratch::PutText(kLock, "");
    support::OtherProcess reader([] {
        const int fd = open(kLock.c_str(), O_RDONLY | O_CLOEXEC);
        return fd >= 0 && flock(fd, LOCK_SH | LOCK_NB) == 0;
    });
    ASSERT_TRUE(reader.ok());
    seams::OnMicroSleep([&] { reader.End(); });
    EXPECT_TRUE(tasks_.IsAddable("copy", 11));
    EXPECT_THAT(seams::MicroSleeps(), SizeIs(1));
}

TEST_F(TaskTest, AFaultInTheRegistryDoesNotStopTheUsersWork) {
    TaskMgr none(0);
    const Living living;
    PutQueue(Line("job", living.pid()));
    ASSERT_FALSE(none.IsAddable("copy", 11));

    no_memory = true;
    EXPECT_TRUE(none.IsAddable("copy", 11));
    no_memory = false;
    EXPECT_EQ(YLIBCErrGet(), unsigned{ZOS_ERR_OUT_OF_MEMORY});
    EXPECT_TRUE(seams::Logged("Out of memory" + PlatformError())) << seams::LogDump();

    fs::remove(kLock);
    fs::create_directories(kLock);
    EXPECT_TRUE(none.IsAddable("copy", 11));
    EXPECT_TRUE(seams::Logged("Failed to lock " + kLock + ", Is a directory" + PlatformError()))
        << seams::LogDump();

    fs::remove(kLock);
    fs::remove(kQueue);
    fs::create_directories(kQueue);
    EXPECT_TRUE(none.IsAddable("copy", 11));
    EXPECT_TRUE(seams::Logged("Failed to open " + kQueue + ", Is a directory")) << seams::LogDump();
}

TEST_F(TaskTest, AnObjectWithoutMemoryForItsLimitTakesThree) {
    no_memory = true;
    TaskMgr poor(1);
    no_memory = false;
    poor.SetMaxTask(7);
    const std::list<Living> living(3);
    std::string text;
    for (const Living& process : living) {
        text += Line("job", process.pid());
    }
    PutQueue(text);
    EXPECT_EQ(Runnable(poor, "job", living.back().pid()), 3);
    EXPECT_FALSE(poor.IsAddable("copy", 11));
}

// --- bad queue files ----------------------------------------------------------------------------

TEST_F(TaskTest, LinesThatTellNoJobAreSkipped) {
    const Living living;
    const std::string pid = std::to_string(living.pid());
    std::string junk;
    junk += "\n\t\t\n";
    junk += "one-token\n";
    junk += pid + "\n";
    junk += std::string("\0\xff\x01 binary\t", 11) + pid + "\n";
    junk += std::string("\xfe\xff\x80\n", 4);
    junk += "not-a-number\tpid\n";
    junk += "trailing\t" + pid + "x\n";
    junk += "minus\t-1\n";
    junk += "zero\t0\n";
    junk += "32-bit\t4294967297\n";
    junk += "64-bit\t99999999999999999999999999\n";
    junk += std::string(1 << 20, 'x') + "\n";
    junk += std::string(1 << 20, 'x') + "\t" + std::string(1 << 20, '9') + "\n";
    PutQueue(junk + Line("job", 11));
    TaskMgr one(1);
    EXPECT_EQ(Runnable(one, "job", 11), 1);
    EXPECT_TRUE(one.IsAddable("copy", 11));
    EXPECT_THAT(seams::LogLines(), IsEmpty()) << seams::LogDump();
}

TEST_F(TaskTest, ALineOfOneMebibyteThatTellsAJobCounts) {
    const Living living;
    const std::string id(1 << 20, 'x');
    PutQueue(Line(id, living.pid()) + Line("job", 11));
    EXPECT_EQ(Runnable(tasks_, "job", 11), 2);
    EXPECT_EQ(Runnable(tasks_, id.c_str(), living.pid()), 1);
}

TEST_F(TaskTest, WordsBeyondTheSecondAndDoubledTabsAreNothingToALine) {
    const Living living;
    PutQueue("\tspaced out\t\t" + std::to_string(living.pid()) + "\tmore\n" + "job\t11");
    EXPECT_EQ(Runnable(tasks_, "job", 11), 2);
    EXPECT_EQ(Runnable(tasks_, "spaced out", living.pid()), 1);
}

TEST_F(TaskTest, AnEmptyQueueHasRoomAndTakesTheJob) {
    PutQueue("");
    EXPECT_TRUE(tasks_.IsAddable("copy", 11));
    EXPECT_EQ(Runnable(tasks_, "job", 11), 0);
    EXPECT_EQ(Queue(), "job\t11\n");
}

TEST_F(TaskTest, ANameTooLongForAFileFailsAsARegistryThatCannotBeMade) {
    const std::string name(5000, 'n');
    EXPECT_FALSE(tasks_.Add(name.c_str(), "job", 11));
    EXPECT_EQ(tasks_.IsRunnable(name.c_str(), "job", 11, nullptr, nullptr), 0);
    EXPECT_TRUE(tasks_.IsAddable(name.c_str(), 11));
    EXPECT_TRUE(tasks_.Clean(name.c_str(), "job", 11, nullptr, nullptr, false));
    EXPECT_TRUE(seams::LoggedPart(", File name too long"));
}

TEST_F(TaskTest, AnExceptionOfTheCheckEndsTheQuestionAndGivesTheLockBack) {
    const Living living;
    PutQueue(Line("a", living.pid()) + Line("job", 11));
    const auto throws = [](const char*, const char*, int, void*) -> int {
        throw std::runtime_error("out of its depth");
    };
    EXPECT_EQ(tasks_.IsRunnable("copy", "job", 11, throws, nullptr), 0);
    EXPECT_TRUE(seams::Logged("Unexpected failure, out of its depth")) << seams::LogDump();
}

// --- identity -----------------------------------------------------------------------------------

/** Runs a step as the user, with root's identity saved, as a CGI program runs. */
template <typename Step>
void AsSavedRoot(uid_t uid, Step step) {
    unsetenv("ZYROVFS_UID");
    ASSERT_EQ(seteuid(uid), 0);
    seams::Reset();
    step();
    seams::Reset();  // and every planned failure with it
    ASSERT_EQ(seteuid(0), 0);
}

TEST_F(TaskTest, EveryOperationWorksAsRootForTheActingUserAndSwitchesBack) {
    const auto calls = [] {
        const auto seen = seams::IdentityCalls();
        seams::Reset();
        return seen;
    };
    AsSavedRoot(1001, [&] {
        const auto there_and_back = ElementsAre("seteuid(0)", "seteuid(1001)");
        EXPECT_TRUE(tasks_.Add("copy", "job", 11));
        EXPECT_THAT(calls(), there_and_back);
        EXPECT_EQ(Runnable(tasks_, "job", 11), 1);
        EXPECT_THAT(calls(), there_and_back);
        EXPECT_EQ(Runnable(tasks_, "another", 11), 0);
        EXPECT_THAT(calls(), there_and_back);
        EXPECT_TRUE(tasks_.IsAddable("copy", 11));
        EXPECT_THAT(calls(), there_and_back);
        EXPECT_TRUE(tasks_.Clean("copy", nullptr, 12, nullptr, nullptr, false));
        EXPECT_THAT(calls(), there_and_back);
        EXPECT_EQ(geteuid(), 1001U);
    });
    EXPECT_EQ(Queue(), "");
    EXPECT_FALSE(fs::exists("/var/tmp/user/0"));
}

TEST_F(TaskTest, RootSwitchesNothing) {
    EXPECT_TRUE(tasks_.Add("copy", "job", 11));
    EXPECT_EQ(Runnable(tasks_, "job", 11), 1);
    EXPECT_TRUE(tasks_.IsAddable("copy", 11));
    EXPECT_TRUE(tasks_.Clean("copy", nullptr, 12, nullptr, nullptr, false));
    EXPECT_THAT(seams::IdentityCalls(), IsEmpty());
}

TEST_F(TaskTest, AFailedSwitchIsLoggedAndTheOperationGoesOn) {
    PutQueue("job\t11\n");
    fs::permissions(kFolder, fs::perms::all | fs::perms::sticky_bit);
    AsSavedRoot(1001, [&] {
        seams::FailIdentity("seteuid(0)", EPERM);
        EXPECT_EQ(Runnable(tasks_, "job", 11), 1);
        EXPECT_TRUE(seams::Logged("Fail to seteuid(0).")) << seams::LogDump();
        EXPECT_THAT(seams::IdentityCalls(), ElementsAre("seteuid(0)", "seteuid(1001)"));
    });
    fs::remove(kLock);
    AsSavedRoot(1001, [&] {
        seams::FailIdentity("seteuid(1001)", EPERM);
        EXPECT_EQ(Runnable(tasks_, "job", 11), 1);
        EXPECT_TRUE(seams::Logged("Fail to seteuid(1001).")) << seams::LogDump();
    });
}

}  // namespace
}  // namespace ZYROVFS
