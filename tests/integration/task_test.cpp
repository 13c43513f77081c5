// The task registry of the shipped library under many processes at once: no line is lost or
// doubled, never more than the limit run, and a cleaner that is killed takes nobody's place.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/mman.h>
#include <sys/wait.h>
#include <unistd.h>
#include <zyrovfs/zyrovfs_netdrive.h>

#include <atomic>
#include <csignal>
#include <cstdlib>
#include <ctime>
#include <filesystem>
#include <sstream>
#include <string>
#include <vector>

#include "support/machine.h"

/** The library's waits at a test's pace: a cleaner's three seconds pass in three milliseconds. */
extern "C" __attribute__((visibility("default"))) unsigned sleep(unsigned seconds) {
    const timespec pause{0, static_cast<long>(seconds) * 1000000};
    nanosleep(&pause, nullptr);
    return 0;
}

namespace {

using ZYROVFS::TaskMgr;

constexpr unsigned kLimit = 3;
constexpr const char* kFolder = "/var/tmp/user/4001/zyrovfs/task/copy";
const std::string kQueue = std::string(kFolder) + "/copy";

/** What all processes of a test see. */
struct Shared {
    std::atomic<int> running;
    std::atomic<int> most;
    std::atomic<int> turns;
    std::atomic<int> faults;
    std::atomic<bool> over;
};

Shared* MakeShared() {
    return new (mmap(nullptr, sizeof(Shared), PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS,
                     -1, 0)) Shared{};
}

void Pause(long milliseconds) {
    const timespec pause{milliseconds / 1000, milliseconds % 1000 * 1000000};
    nanosleep(&pause, nullptr);
}

std::vector<std::string> Lines() {
    std::vector<std::string> lines;
    std::istringstream text(machine::Read(kQueue));
    for (std::string line; std::getline(text, line);) {
        lines.push_back(line);
    }
    return lines;
}

std::string LineOf(const std::string& id, pid_t pid) {
    return id + "\t" + std::to_string(pid);
}

pid_t Fork() {
    fflush(nullptr);
    return fork();
}

class Tasks : public testing::Test {
  protected:
    void SetUp() override {
        setenv("ZYROVFS_UID", "4001", 1);
        std::filesystem::remove_all("/var/tmp/user/4001");
    }
    void TearDown() override { munmap(shared_, sizeof(Shared)); }

    Shared* shared_ = MakeShared();
};

/** One job from its arrival to its end; false when the registry failed it. */
bool TakeTurn(TaskMgr& tasks, const std::string& id, Shared& shared) {
    const pid_t me = getpid();
    tasks.IsAddable("copy", me);
    if (!tasks.Add("copy", id.c_str(), me)) {
        return false;
    }
    int64_t place = 0;
    for (int asked = 0; place == 0 && asked < 20000; ++asked) {
        Pause(asked > 0 ? 5 : 0);
        place = tasks.IsRunnable("copy", id.c_str(), me, nullptr, nullptr);
    }
    if (place < 1 || place > kLimit) {
        return false;
    }
    const int now = ++shared.running;
    int most = shared.most;
    while (now > most && !shared.most.compare_exchange_weak(most, now)) {
    }
    Pause(3);
    ++shared.turns;
    --shared.running;
    return true;
}

/** A process that does one job after another; each leaves by a clean-up of its own line. */
int Work(int number, int jobs, Shared& shared) {
    TaskMgr tasks(kLimit);
    for (int job = 0; job < jobs; ++job) {
        const std::string id = "job-" + std::to_string(number) + "-" + std::to_string(job);
        if (!TakeTurn(tasks, id, shared)) {
            ++shared.faults;
        }
        // A job's line goes with its process, and this one has more to do: it goes by its pid.
        while (tasks.Clean("copy", id.c_str(), getpid(), nullptr, nullptr, false) &&
               machine::Read(kQueue).find(LineOf(id, getpid()) + "\n") != std::string::npos) {
            Pause(20);
        }
    }
    return 0;
}

TEST_F(Tasks, FiftyProcessesTakeTurnsAndNeverMoreThanTheLimitRun) {
    constexpr int kProcesses = 50;
    std::vector<pid_t> workers;
    for (int i = 0; i < kProcesses; ++i) {
        const pid_t pid = Fork();
        if (pid == 0) {
            // A process that has ended is out of the queue: one job each, and no clean-up needed.
            TaskMgr tasks(kLimit);
            if (!TakeTurn(tasks, "job-" + std::to_string(i), *shared_)) {
                ++shared_->faults;
            }
            tasks.Clean("copy", nullptr, 0, nullptr, nullptr, false);
            _exit(0);
        }
        workers.push_back(pid);
    }
    for (const pid_t pid : workers) {
        waitpid(pid, nullptr, 0);
    }
    EXPECT_EQ(shared_->turns, kProcesses);
    EXPECT_EQ(shared_->faults, 0);
    EXPECT_EQ(shared_->running, 0);
    EXPECT_LE(shared_->most, static_cast<int>(kLimit));
    EXPECT_GE(shared_->most, 2) << "nothing ran side by side";
}

/** Adds and asks and cleans until told to stop, then tells which lines it must still have. */
int Churn(int number, int jobs, Shared& shared) {
    TaskMgr tasks(kLimit);
    for (int job = 0; job < jobs; ++job) {
        const std::string id = "job-" + std::to_string(number) + "-" + std::to_string(job);
        if (!tasks.Add("copy", id.c_str(), getpid())) {
            ++shared.faults;
        }
        tasks.IsAddable("copy", getpid());
        // Its own line is there and must be found: a job that lost it would be added once more.
        tasks.IsRunnable("copy", id.c_str(), getpid(), nullptr, nullptr);
        if (!tasks.Clean("copy", nullptr, 0, nullptr, nullptr, false)) {
            ++shared.faults;
        }
    }
    ++shared.turns;
    while (!shared.over) {
        Pause(5);
    }
    return 0;
}

/** Without the stamp every clean-up does its work. */
class NoStamp {
  public:
    NoStamp() : pid_(Fork()) {
        if (pid_ == 0) {
            for (;;) {
                unlink((kQueue + ".clean.stamp").c_str());
                Pause(1);
            }
        }
    }
    NoStamp(const NoStamp&) = delete;
    NoStamp& operator=(const NoStamp&) = delete;
    ~NoStamp() {
        kill(pid_, SIGKILL);
        waitpid(pid_, nullptr, 0);
    }

  private:
    pid_t pid_;
};

TEST_F(Tasks, FiftyProcessesAtOnceLoseAndDoubleNoLine) {
    constexpr int kProcesses = 50;
    constexpr int kJobs = 4;
    const NoStamp no_stamp;
    std::vector<pid_t> workers;
    for (int i = 0; i < kProcesses; ++i) {
        const pid_t pid = Fork();
        if (pid == 0) {
            _exit(Churn(i, kJobs, *shared_));
        }
        workers.push_back(pid);
    }
    for (int i = 0; i < 12000 && shared_->turns < kProcesses; ++i) {
        Pause(5);
    }
    ASSERT_EQ(shared_->turns, kProcesses);
    EXPECT_EQ(shared_->faults, 0);

    std::vector<std::string> expected;
    for (int i = 0; i < kProcesses; ++i) {
        for (int job = 0; job < kJobs; ++job) {
            expected.push_back(LineOf("job-" + std::to_string(i) + "-" + std::to_string(job),
                                      workers[static_cast<size_t>(i)]));
        }
    }
    EXPECT_THAT(Lines(), testing::UnorderedElementsAreArray(expected));

    shared_->over = true;
    for (const pid_t pid : workers) {
        waitpid(pid, nullptr, 0);
    }
    TaskMgr tasks(kLimit);
    while (!Lines().empty()) {
        ASSERT_TRUE(tasks.Clean("copy", nullptr, 0, nullptr, nullptr, false));
    }
}

TEST_F(Tasks, AProcessWithOneJobAfterAnotherLeavesEachByItsPid) {
    std::vector<pid_t> workers;
    const NoStamp no_stamp;
    for (int i = 0; i < 6; ++i) {
        const pid_t pid = Fork();
        if (pid == 0) {
            _exit(Work(i, 3, *shared_));
        }
        workers.push_back(pid);
    }
    for (const pid_t pid : workers) {
        waitpid(pid, nullptr, 0);
    }
    EXPECT_EQ(shared_->turns, 18);
    EXPECT_EQ(shared_->faults, 0);
    EXPECT_LE(shared_->most, static_cast<int>(kLimit));
    EXPECT_THAT(Lines(), testing::IsEmpty());
}

TEST_F(Tasks, CleanersKilledAtAnyMomentLoseNoLivingJobsLine) {
    TaskMgr tasks(kLimit);
    std::vector<pid_t> jobs;
    std::vector<std::string> expected;
    for (int i = 0; i < 5; ++i) {
        const pid_t pid = Fork();
        if (pid == 0) {
            for (;;) {
                pause();
            }
        }
        jobs.push_back(pid);
        const std::string id = "job-" + std::to_string(i);
        ASSERT_TRUE(tasks.Add("copy", id.c_str(), pid));
        expected.push_back(LineOf(id, pid));
    }
    int killed = 0;
    for (int round = 0; round < 150; ++round) {
        unlink((kQueue + ".clean.stamp").c_str());
        const pid_t cleaner = Fork();
        if (cleaner == 0) {
            _exit(tasks.Clean("copy", nullptr, 0, nullptr, nullptr, false) ? 0 : 1);
        }
        const timespec moment{0, 2500000L + round * 10000L};
        nanosleep(&moment, nullptr);
        kill(cleaner, SIGKILL);
        int status = 0;
        waitpid(cleaner, &status, 0);
        killed += WIFSIGNALED(status) ? 1 : 0;
        ASSERT_EQ(Lines(), expected) << "round " << round;
    }
    EXPECT_GT(killed, 0);
    // None of them keeps the lock.
    EXPECT_EQ(tasks.IsRunnable("copy", "job-2", jobs[2], nullptr, nullptr), 3);
    EXPECT_EQ(tasks.IsRunnable("copy", "job-3", jobs[3], nullptr, nullptr), 0);
    for (const pid_t pid : jobs) {
        kill(pid, SIGKILL);
        waitpid(pid, nullptr, 0);
    }
}

}  // namespace
