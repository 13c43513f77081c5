#include <gmock/gmock.h>
#include <signal.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>
#include <zosplatform/process.h>

#include <cerrno>
#include <climits>
#include <functional>
#include <string>

#include "support/kill_seam.h"
#include "support/other_process.h"
#include "support/seams.h"
#include "zyrovfs/utils.h"

namespace {

std::function<int(pid_t)> instead_of_alive;

}  // namespace

extern "C" int YLIBCProcAlive(pid_t pid) {
    return instead_of_alive ? instead_of_alive(pid)
                            : kill_seam::Real<int(pid_t)>("YLIBCProcAlive")(pid);
}

namespace ZYROVFS::Utils {
namespace {

using support::OtherProcess;

constexpr const char* kName = "gvfsd-fuse";
constexpr unsigned kAmy = 1001;

/** A process with a name and an owner, as a daemon of a user. */
bool BecomeDaemon() {
    return prctl(PR_SET_NAME, kName) == 0 && setresuid(kAmy, kAmy, kAmy) == 0;
}

bool BecomeDaemonThatWillNotEnd() {
    signal(SIGTERM, SIG_IGN);
    return BecomeDaemon();
}

class Processes : public testing::Test {
  protected:
    void TearDown() override {
        kill_seam::instead = nullptr;
        instead_of_alive = nullptr;
    }
};

using IsProcAliveTest = Processes;
using KillProcTest = Processes;

TEST_F(IsProcAliveTest, NeedsPidNameAndOwner) {
    OtherProcess daemon(BecomeDaemon);
    ASSERT_TRUE(daemon.ok());
    EXPECT_TRUE(IsProcAlive(daemon.pid(), kName, kAmy));
    EXPECT_FALSE(IsProcAlive(daemon.pid(), "gvfsd", kAmy)) << "a name is compared whole";
    EXPECT_FALSE(IsProcAlive(daemon.pid(), "gvfsd-fuse2", kAmy));
    EXPECT_FALSE(IsProcAlive(daemon.pid(), "GVFSD-FUSE", kAmy));
    EXPECT_FALSE(IsProcAlive(daemon.pid(), "", kAmy));
    EXPECT_FALSE(IsProcAlive(daemon.pid(), kName, kAmy + 1));
    EXPECT_FALSE(IsProcAlive(daemon.pid(), kName, 0));
}

TEST_F(IsProcAliveTest, NullNameAndImpossiblePidsAreDead) {
    OtherProcess daemon(BecomeDaemon);
    EXPECT_FALSE(IsProcAlive(daemon.pid(), nullptr, kAmy));
    for (const int pid : {0, -1, INT_MIN, INT_MAX}) {
        EXPECT_FALSE(IsProcAlive(pid, kName, kAmy)) << pid;
    }
}

TEST_F(IsProcAliveTest, ProcessThatEndedIsDeadEvenBeforeItIsCollected) {
    OtherProcess daemon(BecomeDaemon);
    ASSERT_EQ(::kill(daemon.pid(), SIGKILL), 0);
    siginfo_t info{};
    ASSERT_EQ(waitid(P_PID, static_cast<id_t>(daemon.pid()), &info, WEXITED | WNOWAIT), 0);
    EXPECT_FALSE(IsProcAlive(daemon.pid(), kName, kAmy));
}

TEST_F(IsProcAliveTest, ProcessWithoutARecordIsDead) {
    instead_of_alive = [](pid_t) { return 1; };  // gone between the two looks
    EXPECT_FALSE(IsProcAlive(INT_MAX, kName, kAmy));
}

TEST_F(KillProcTest, EndsTheProcessBySigtermWithoutWaiting) {
    OtherProcess daemon(BecomeDaemon);
    EXPECT_TRUE(KillProc(daemon.pid(), kName, kAmy, false));
    EXPECT_EQ(daemon.EndedBy(), SIGTERM);
    EXPECT_THAT(seams::MicroSleeps(), testing::IsEmpty());
}

TEST_F(KillProcTest, PidReusedByAnotherNameOrOwnerIsNotTouchedAndCountsAsKilled) {
    OtherProcess daemon(BecomeDaemon);
    EXPECT_TRUE(KillProc(daemon.pid(), "dbus-daemon", kAmy, true));
    EXPECT_TRUE(KillProc(daemon.pid(), kName, kAmy + 1, true));
    EXPECT_TRUE(KillProc(daemon.pid(), nullptr, kAmy, true));
    EXPECT_TRUE(daemon.Runs());
    EXPECT_THAT(seams::MicroSleeps(), testing::IsEmpty());
    EXPECT_THAT(seams::LogLines(), testing::IsEmpty());
}

TEST_F(KillProcTest, ProcessesThatDoNotExistCountAsKilled) {
    kill_seam::instead = [](pid_t pid, int) {
        ADD_FAILURE() << "a signal for " << pid;
        return 0;
    };
    for (const int pid : {0, -1, INT_MIN, INT_MAX}) {
        EXPECT_TRUE(KillProc(pid, kName, kAmy, true)) << pid;
    }
}

TEST_F(KillProcTest, WaitEndsWithTheProcess) {
    OtherProcess daemon(BecomeDaemonThatWillNotEnd);
    ASSERT_TRUE(daemon.ok());
    seams::OnMicroSleep([&daemon, pauses = 0]() mutable {
        if (++pauses == 7) {
            daemon.End();
        }
    });
    EXPECT_TRUE(KillProc(daemon.pid(), kName, kAmy, true));
    EXPECT_EQ(seams::MicroSleeps(), std::vector<unsigned>(7, 500000U));
}

TEST_F(KillProcTest, WaitEndsAfterThirtySecondsAndTheResultIsTrueAllTheSame) {
    OtherProcess daemon(BecomeDaemonThatWillNotEnd);
    ASSERT_TRUE(daemon.ok());
    EXPECT_TRUE(KillProc(daemon.pid(), kName, kAmy, true));
    EXPECT_EQ(seams::MicroSleeps(), std::vector<unsigned>(60, 500000U));
    EXPECT_TRUE(daemon.Runs());
}

TEST_F(KillProcTest, CallerWhoMayNotIsToldAndLogged) {
    OtherProcess daemon(BecomeDaemon);
    ASSERT_TRUE(daemon.ok());
    kill_seam::instead = [](pid_t, int) {
        errno = EPERM;
        return -1;
    };
    EXPECT_FALSE(KillProc(daemon.pid(), kName, kAmy, true));
    EXPECT_TRUE(seams::LoggedPart("Failed to kill " + std::to_string(daemon.pid()) +
                                  ", reason=Operation not permitted(1)"))
        << seams::LogDump();
    EXPECT_THAT(seams::MicroSleeps(), testing::IsEmpty());
    kill_seam::instead = nullptr;
}

TEST_F(KillProcTest, ProcessThatWentMeanwhileGivesFalseWithoutALogLine) {
    OtherProcess daemon(BecomeDaemon);
    ASSERT_TRUE(daemon.ok());
    kill_seam::instead = [](pid_t, int) {
        errno = ESRCH;
        return -1;
    };
    EXPECT_FALSE(KillProc(daemon.pid(), kName, kAmy, true));
    EXPECT_THAT(seams::LogLines(), testing::IsEmpty());
    kill_seam::instead = nullptr;
}

}  // namespace
}  // namespace ZYROVFS::Utils
