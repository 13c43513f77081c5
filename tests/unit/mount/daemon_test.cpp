// What the three daemons have in common: pid file, life, start under the lock.
#include "mount/daemon.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "support/fake_daemons.h"
#include "support/seams.h"
#include "zyrovfs/error.h"
#include "zyrovfs/vfs.h"

namespace ZYROVFS {
namespace {

using namespace fakes;

struct Row {
    const Daemon* daemon;
    const char* unit;
    bool (*init)();
    bool (*is_alive)(int);
    bool (*check_died)();
    std::string lock_pid_text;
    std::string read_pid_text;  ///< up to the path
    std::string unknown_text;
    std::string lock_text;
};

const Row kRows[] = {
    {&kDbusDaemon, "dbus.cpp", DBUS::Init, DBUS::IsAlive, DBUS::CheckDaemonDied,
     "Failed to lock dbus pid", "Failed to get dbus pid, ", "Failed to dbus's pid of uid(4001)",
     "Failed to lock dbus"},
    {&kGvfsdDaemon, "gvfsd.cpp", GVFSD::Init, GVFSD::IsAlive, GVFSD::CheckDaemonDied,
     "Failed to lock gvfsd pid, uid=4001", "Failed to get gvfsd pid, ",
     "Failed to gvfsd's pid of uid(4001)", "Failed to lock gvfsd"},
    {&kGvfsdFuseDaemon, "gvfsd-fuse.cpp", GVFSD_FUSE::Init, GVFSD_FUSE::IsAlive,
     GVFSD_FUSE::CheckDaemonDied, "Failed to lock gvfsd-fuse pid", "Failed to get gvfsd-fsue pid, ",
     "Failed to gvfsd-fuse's pid of uid(4001)", "Failed to lock gvfsd-fuse"},
};

std::ostream& operator<<(std::ostream& out, const Row& row) {
    return out << row.daemon->process;
}

std::string PidFile(const Row& row) {
    return row.daemon->pid_file(kUser);
}

class EveryDaemon : public DaemonTest, public testing::WithParamInterface<Row> {
  protected:
    const Row& row() const { return GetParam(); }
    void WritePidFile(const std::string& text) { Write(PidFile(row()), text); }

    /** The daemon is started and the pid file names it. */
    void ExpectStart() {
        EXPECT_TRUE(row().init()) << seams::LogDump();
        ASSERT_TRUE(Started(row().daemon->process));
        EXPECT_EQ(Read(PidFile(row())), Report(row().daemon->process, "pids"));
        EXPECT_TRUE(row().is_alive(std::stoi(Read(PidFile(row())))));
    }
};

TEST_P(EveryDaemon, WithoutPidFileCountsAsDeadWithoutComplaint) {
    int pid = 77;
    EXPECT_TRUE(ReadPid(*row().daemon, pid));
    EXPECT_EQ(pid, 0);
    EXPECT_TRUE(row().check_died());
    EXPECT_EQ(seams::LogDump(), "");
}

TEST_P(EveryDaemon, IsStartedOnceAndThenFound) {
    ExpectStart();
    EXPECT_FALSE(row().check_died());
    EXPECT_TRUE(row().init());
    EXPECT_EQ(Starts(row().daemon->process), 1);
}

TEST_P(EveryDaemon, WaitsThreeSecondsForTheStartAndNotForOneThatLives) {
    seams::WatchChildren();
    ExpectStart();
    EXPECT_THAT(seams::Sleeps(), testing::ElementsAre(3));
    EXPECT_TRUE(row().init());
    EXPECT_THAT(seams::Sleeps(), testing::ElementsAre(3));
}

TEST_P(EveryDaemon, LivingProcessOfRightNameAndUserIsLeftAlone) {
    const LiveProcess daemon(row().daemon->process, kUser);
    WritePidFile(std::to_string(daemon.pid()) + "\n");
    Write(paths::DbusAddress(kUser), "unix:path=/known\n");
    EXPECT_FALSE(row().check_died());
    EXPECT_TRUE(row().init());
    EXPECT_EQ(Starts(row().daemon->process), 0);
    EXPECT_EQ(Read(PidFile(row())), std::to_string(daemon.pid()) + "\n");
}

TEST_P(EveryDaemon, PidOfADeadProcessStartsANewDaemon) {
    LiveProcess daemon(row().daemon->process, kUser);
    WritePidFile(std::to_string(daemon.pid()) + "\n");
    daemon.End();
    EXPECT_TRUE(row().check_died());
    ExpectStart();
}

TEST_P(EveryDaemon, PidOfALivingProcessOfAnotherNameStartsANewDaemon) {
    const LiveProcess stranger("sshd", kUser);
    WritePidFile(std::to_string(stranger.pid()) + "\n");
    EXPECT_TRUE(row().check_died());
    ExpectStart();
}

TEST_P(EveryDaemon, PidOfALivingProcessOfAnotherUserStartsANewDaemon) {
    const LiveProcess stranger(row().daemon->process, kUser + 1);
    WritePidFile(std::to_string(stranger.pid()) + "\n");
    EXPECT_TRUE(row().check_died());
    ExpectStart();
}

TEST_P(EveryDaemon, NamesOfOtherDaemonsAreNotConfused) {
    const LiveProcess other(row().daemon == &kGvfsdDaemon ? "gvfsd-fuse" : "gvfsd", kUser);
    EXPECT_FALSE(row().is_alive(other.pid()));
}

TEST_P(EveryDaemon, TextThatIsNoPidStartsANewDaemon) {
    for (const char* text : {"amy\n", "-1\n", "99999999999999999999\n", "4294967297\n", " \n"}) {
        WritePidFile(text);
        EXPECT_TRUE(row().check_died()) << text;
        int pid = 1;
        EXPECT_TRUE(ReadPid(*row().daemon, pid)) << text;
        EXPECT_EQ(pid, 0) << text;
    }
    ExpectStart();
}

TEST_P(EveryDaemon, EmptyPidFileCannotBeReadAndDoesNotCountAsDead) {
    WritePidFile("");
    EXPECT_FALSE(row().check_died());
    EXPECT_TRUE(seams::LoggedPart(row().read_pid_text + PidFile(row()) + ", "));
    EXPECT_TRUE(seams::Logged(row().unknown_text)) << seams::LogDump();
}

TEST_P(EveryDaemon, EmptyPidFileStartsANewDaemon) {
    WritePidFile("");
    ExpectStart();
}

TEST_P(EveryDaemon, DirectoryInPlaceOfThePidFileFailsTheStart) {
    Write(PidFile(row()) + "/what stands in a folder", "");
    EXPECT_FALSE(row().check_died());
    EXPECT_FALSE(row().init());
    EXPECT_TRUE(seams::LoggedPart("Failed to create " + PidFile(row()) + ", ")) << seams::LogDump();
    EXPECT_TRUE(LockIsFree());
}

TEST_P(EveryDaemon, LockOfAnotherProcessIsWaitedFor110SecondsAndThenFails) {
    const ForeignLock lock;
    EXPECT_FALSE(row().check_died());
    EXPECT_EQ(seams::MicroSleeps().size(), 2200U);
    EXPECT_TRUE(seams::Logged(row().lock_pid_text)) << seams::LogDump();
    EXPECT_TRUE(seams::Logged(row().unknown_text));

    EXPECT_FALSE(row().init());
    EXPECT_TRUE(seams::Logged(row().lock_text));
    EXPECT_EQ(Starts(row().daemon->process), 0);
}

TEST_P(EveryDaemon, SharedLockOfAnotherProcessLetsThePidBeReadButNothingBeStarted) {
    const ForeignLock lock(LOCK_SH);
    EXPECT_TRUE(row().check_died());
    EXPECT_FALSE(row().init());
    EXPECT_TRUE(seams::Logged(row().lock_text));
}

TEST_P(EveryDaemon, LockIsFreeAfterAStart) {
    EXPECT_TRUE(row().init());
    EXPECT_TRUE(LockIsFree());
}

TEST_P(EveryDaemon, LinesCarryTheNameOfItsUnit) {
    WritePidFile("");
    row().check_died();
    size_t own = 0;
    for (const seams::LogLine& line : seams::LogLines()) {
        own += line.text.rfind(std::string(row().unit) + ":", 0) == 0 ? 1 : 0;
    }
    EXPECT_EQ(own, 2U) << seams::LogDump();
}

TEST_P(EveryDaemon, IsTheUserForGoodWithTheGroupOfUsersAndNoOther) {
    ASSERT_TRUE(row().init());
    ASSERT_TRUE(Started(row().daemon->process));
    const std::string report = Report(row().daemon->process);
    EXPECT_THAT(report, testing::HasSubstr("Uid:\t4001\t4001\t4001\t4001\n"));
    EXPECT_THAT(report, testing::HasSubstr("Gid:\t100\t100\t100\t100\n"));
    EXPECT_THAT(report, testing::ContainsRegex("Groups:[ \t]*\n"));
}

TEST_P(EveryDaemon, HasASessionOfItsOwn) {
    ASSERT_TRUE(row().init());
    ASSERT_TRUE(Started(row().daemon->process));
    const std::string own = std::to_string(getsid(0)) + "\n";
    EXPECT_THAT(Report(row().daemon->process),
                testing::Not(testing::ContainsRegex("\n *" + own + "$")));
}

TEST_P(EveryDaemon, HoldsNoDescriptorOfItsCaller) {
    const UniqueFd secret(open("/etc/passwd", O_RDONLY));
    const UniqueFd high(fcntl(secret.Get(), F_DUPFD, 900));
    ASSERT_TRUE(row().init());
    ASSERT_TRUE(Started(row().daemon->process));
    const std::string fds = Report(row().daemon->process, "fds");
    EXPECT_THAT(fds, testing::HasSubstr(" 0 -> /dev/null"));
    EXPECT_THAT(fds, testing::HasSubstr(" 1 -> /dev/null"));
    EXPECT_THAT(fds, testing::HasSubstr(" 2 -> /dev/null"));
    EXPECT_THAT(fds, testing::Not(testing::HasSubstr("/etc/passwd")));
    EXPECT_THAT(fds, testing::Not(testing::HasSubstr("mnt.lock")));
}

TEST_P(EveryDaemon, IsCollectedByTheSystemAndNotLeftToTheCaller) {
    InFreshProcess([this] {
        ASSERT_TRUE(row().init());
        ASSERT_TRUE(Started(row().daemon->process));
        EXPECT_EQ(waitpid(-1, nullptr, WNOHANG), -1);
        EXPECT_EQ(errno, ECHILD);
    });
}

TEST_P(EveryDaemon, StartsUnderAServiceThatIgnoresItsChildren) {
    InFreshProcess([this] {
        signal(SIGCHLD, SIG_IGN);
        ExpectStart();
        EXPECT_EQ(signal(SIGCHLD, SIG_DFL), SIG_IGN);
    });
}

TEST_P(EveryDaemon, StartsUnderAServiceThatHasItsChildrenCollected) {
    InFreshProcess([this] {
        struct sigaction action {};
        action.sa_handler = SIG_DFL;
        action.sa_flags = SA_NOCLDWAIT;
        sigaction(SIGCHLD, &action, nullptr);
        ExpectStart();
        sigaction(SIGCHLD, nullptr, &action);
        EXPECT_NE(action.sa_flags & SA_NOCLDWAIT, 0) << "the service's choice is back";
    });
}

TEST_P(EveryDaemon, AnotherProcessMayStartItWhileTheLockIsWaitedFor) {
    const LiveProcess winner(row().daemon->process, kUser);
    Write(paths::DbusAddress(kUser), "unix:path=/known\n");
    auto lock = std::make_unique<ForeignLock>(LOCK_SH);
    seams::OnMicroSleep([&] {
        WritePidFile(std::to_string(winner.pid()) + "\n");
        lock.reset();
    });
    EXPECT_TRUE(row().init()) << seams::LogDump();
    EXPECT_EQ(seams::MicroSleeps().size(), 1U);
    EXPECT_EQ(Starts(row().daemon->process), 0);
}

INSTANTIATE_TEST_SUITE_P(Chain, EveryDaemon, testing::ValuesIn(kRows), [](const auto& param) {
    std::string name = param.param.daemon->process;
    name.erase(std::remove(name.begin(), name.end(), '-'), name.end());
    return name;
});

}  // namespace
}  // namespace ZYROVFS
