// Launch of the bus, its address, its end. What it shares with the others: daemon_test.cpp.
#include <glib.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <poll.h>

#include "support/fake_daemons.h"
#include "support/seams.h"
#include "support/stranger.h"
#include "zyrovfs/error.h"
#include "zyrovfs/global.h"
#include "zyrovfs/utils.h"
#include "zyrovfs/vfs.h"

namespace {

bool patience_is_over = false;
int longest_wait = 0;

}  // namespace

/** The wait for an address: real, unless the test has it run out. */
extern "C" gint g_poll(GPollFD* fds, guint count, gint timeout) {
    longest_wait = std::max(longest_wait, timeout);
    if (patience_is_over) {
        return 0;
    }
    pollfd fd{fds->fd, static_cast<short>(fds->events), 0};
    return poll(&fd, count, timeout);
}

namespace ZYROVFS {
namespace {

using namespace fakes;
using testing::HasSubstr;
using testing::Not;

class Bus : public DaemonTest {
  protected:
    static std::string EnvAddress() {
        const char* address = getenv("DBUS_SESSION_BUS_ADDRESS");
        return address == nullptr ? "" : address;
    }
    void BusLives() {
        bus_ = std::make_unique<LiveProcess>("dbus-daemon", kUser);
        Write(paths::DbusPid(kUser), std::to_string(bus_->pid()) + "\n");
    }
    static void ExpectNoBus() {
        EXPECT_FALSE(DBUS::Init());
        EXPECT_TRUE(seams::Logged("Error launching D-Bus")) << seams::LogDump();
        EXPECT_TRUE(seams::Logged("Failed to run dbus, uid=4001"));
        EXPECT_EQ(EnvAddress(), "");
        EXPECT_FALSE(std::filesystem::exists(paths::DbusPid(kUser)));
        EXPECT_FALSE(std::filesystem::exists(paths::DbusAddress(kUser)));
        EXPECT_TRUE(LockIsFree());
    }

    std::unique_ptr<LiveProcess> bus_;
};

TEST_F(Bus, StartLeavesAddressAndPidInFilesAndTheAddressInTheEnvironment) {
    ASSERT_TRUE(DBUS::Init()) << seams::LogDump();
    EXPECT_EQ(Read("/var/tmp/user/4001/dbus/dbus.path"), std::string(kAddress) + "\n");
    EXPECT_EQ(Read("/var/tmp/user/4001/dbus/dbus.pid"), Report("dbus-daemon", "pids"));
    EXPECT_EQ(EnvAddress(), kAddress);
    struct stat info {};
    ASSERT_EQ(stat("/var/tmp/user/4001/dbus/dbus.path", &info), 0);
    EXPECT_EQ(info.st_mode & 07777, 0600U);
}

TEST_F(Bus, IsAskedForASessionBusThatPrintsItsAddressToAPipe) {
    ASSERT_TRUE(DBUS::Init());
    EXPECT_THAT(Report("dbus-daemon"),
                testing::ContainsRegex("^--session --print-address=[0-9]+\n"));
    const std::string report = Report("dbus-daemon");
    const size_t digits = strlen("--session --print-address=");
    const std::string fd = report.substr(digits, report.find('\n') - digits);
    EXPECT_THAT(Report("dbus-daemon", "fds"), HasSubstr(" " + fd + " -> pipe:"));
}

TEST_F(Bus, ServicesThatItActivatesStartNoFuseDaemonOfTheirOwn) {
    ASSERT_TRUE(DBUS::Init());
    EXPECT_THAT(Report("dbus-daemon", "env"), HasSubstr("GVFS_DISABLE_FUSE=1\n"));
    EXPECT_EQ(getenv("GVFS_DISABLE_FUSE"), nullptr) << "only the bus has it";
}

TEST_F(Bus, AddressWithoutItsNewlineIsAnAddress) {
    InstallBus("unix:path=/short");
    ASSERT_TRUE(DBUS::Init());
    EXPECT_EQ(EnvAddress(), "unix:path=/short");
}

TEST_F(Bus, OnlyTheFirstLineIsTheAddress) {
    InstallBus("unix:path=/first\\nunix:path=/second\\n");
    ASSERT_TRUE(DBUS::Init());
    EXPECT_EQ(EnvAddress(), "unix:path=/first");
    EXPECT_EQ(Read(paths::DbusAddress(kUser)), "unix:path=/first\n");
}

TEST_F(Bus, AddressThatComesLateIsWaitedFor) {
    Install(paths::kDbusDaemon, "sleep 1\necho unix:path=/late >&${2#--print-address=}\n");
    ASSERT_TRUE(DBUS::Init());
    EXPECT_EQ(EnvAddress(), "unix:path=/late");
}

TEST_F(Bus, EmptyAddressIsNoBus) {
    InstallBus("\\n");
    ExpectNoBus();
}

TEST_F(Bus, BusThatEndsWithoutAnAddressIsNoBus) {
    InstallBus("", "exit 1\n");
    ExpectNoBus();
}

TEST_F(Bus, BinaryRubbishInPlaceOfAnAddressIsNoBus) {
    InstallBus("\\377\\376\\200\\n");
    ExpectNoBus();
}

TEST_F(Bus, MissingProgramIsNoBus) {
    std::filesystem::remove(paths::kDbusDaemon);
    ExpectNoBus();
}

TEST_F(Bus, BusThatLivesAndNeverSaysItsAddressIsGivenUp) {
    Install(paths::kDbusDaemon, std::string(kReport) + kStay);
    patience_is_over = true;
    longest_wait = 0;
    ExpectNoBus();
    patience_is_over = false;
    EXPECT_GT(longest_wait, 9000);
    EXPECT_LE(longest_wait, 10000);
}

TEST_F(Bus, AddressThatCannotBeKeptFailsTheStart) {
    Write(paths::DbusAddress(kUser) + "/what stands in a folder", "");
    EXPECT_FALSE(DBUS::Init());
    EXPECT_TRUE(seams::LoggedPart("Failed to create /var/tmp/user/4001/dbus/dbus.path, "));
    EXPECT_EQ(EnvAddress(), "");
    EXPECT_TRUE(LockIsFree());
}

TEST_F(Bus, ChildThatCannotBecomeTheUserRunsNoBus) {
    for (const char* call : {"seteuid", "setregid", "setreuid"}) {
        seams::FailIdentity(call, EPERM);
        EXPECT_FALSE(DBUS::Init()) << call;
        EXPECT_TRUE(seams::Logged("Failed to run dbus, uid=4001")) << call;
        EXPECT_EQ(Starts("dbus-daemon"), 0) << call;
        seams::Reset();
    }
}

TEST_F(Bus, LivingBusGivesItsAddressFromTheFile) {
    BusLives();
    Write(paths::DbusAddress(kUser), "unix:path=/from-file\n");
    EXPECT_TRUE(DBUS::Init());
    EXPECT_EQ(EnvAddress(), "unix:path=/from-file");
    EXPECT_EQ(Starts("dbus-daemon"), 0);
}

TEST_F(Bus, AddressThatTheProcessWasToldServesWithoutAFile) {
    BusLives();
    ASSERT_TRUE(InitEnv("4001", "unix:path=/known"));
    EXPECT_TRUE(DBUS::Init());
    EXPECT_EQ(EnvAddress(), "unix:path=/known");
}

TEST_F(Bus, AddressThatItWasToldForAnotherUserDoesNot) {
    BusLives();
    ASSERT_TRUE(InitEnv("4002", "unix:path=/known"));
    setenv("ZYROVFS_UID", "4001", 1);
    EXPECT_FALSE(DBUS::Init());
    EXPECT_EQ(GetError(), VFS_ERR_DBUS_ADDRESS);
}

TEST_F(Bus, AddressInTheEnvironmentThatNobodyToldNeverWins) {
    BusLives();
    setenv("DBUS_SESSION_BUS_ADDRESS", "unix:path=/tmp/trap", 1);
    EXPECT_FALSE(DBUS::Init()) << "who listens there would be given the user's passwords";
    EXPECT_EQ(GetError(), VFS_ERR_DBUS_ADDRESS);
    Write(paths::DbusAddress(kUser), "unix:path=/from-file\n");
    EXPECT_TRUE(DBUS::Init());
    EXPECT_EQ(EnvAddress(), "unix:path=/from-file");
}

TEST_F(Bus, MissingAddressFileOfALivingBusIsADBusAddressFailure) {
    BusLives();
    ResetError();
    EXPECT_FALSE(DBUS::Init());
    EXPECT_EQ(GetError(), VFS_ERR_DBUS_ADDRESS);
    EXPECT_STREQ(GetErrorFile(), "dbus.cpp");
    EXPECT_TRUE(seams::Logged("Can't find file, /var/tmp/user/4001/dbus/dbus.path"));
    EXPECT_TRUE(LockIsFree());
}

TEST_F(Bus, EmptyAddressFileOfALivingBusIsADBusAddressFailure) {
    BusLives();
    Write(paths::DbusAddress(kUser), "\n");
    ResetError();
    EXPECT_FALSE(DBUS::Init());
    EXPECT_EQ(GetError(), VFS_ERR_DBUS_ADDRESS);
}

TEST_F(Bus, AddressThatAStrangerPlantedIsNotTheUsersBus) {
    BusLives();
    ASSERT_TRUE(stranger::File(paths::DbusAddress(kUser), "unix:path=/tmp/trap\n"));
    ResetError();
    EXPECT_FALSE(DBUS::Init()) << "who listens there would be given the user's passwords";
    EXPECT_EQ(GetError(), VFS_ERR_DBUS_ADDRESS);
    EXPECT_EQ(EnvAddress(), "");
}

TEST_F(Bus, PidThatAStrangerPlantedStartsABusOfTheUsersOwn) {
    const LiveProcess bus("dbus-daemon", kUser);
    Write(paths::RuntimeDir(kUser) + "/dbus/keep", "");
    ASSERT_TRUE(stranger::File(paths::DbusPid(kUser), std::to_string(bus.pid()) + "\n"));
    ASSERT_TRUE(stranger::File(paths::DbusAddress(kUser), "unix:path=/tmp/trap\n"));
    EXPECT_TRUE(DBUS::CheckDaemonDied());
    EXPECT_TRUE(DBUS::Init()) << seams::LogDump();
    EXPECT_EQ(EnvAddress(), kAddress);
    EXPECT_EQ(Read(paths::DbusAddress(kUser)), std::string(kAddress) + "\n");
}

TEST_F(Bus, InitTakesOneLevelFromTheLockOfItsCaller) {
    BusLives();
    Write(paths::DbusAddress(kUser), "unix:path=/known\n");
    ASSERT_TRUE(Utils::LockMnt(true));
    EXPECT_FALSE(LockIsFree());
    EXPECT_TRUE(DBUS::Init());
    EXPECT_TRUE(LockIsFree());
}

TEST_F(Bus, InitOfADeadBusLeavesTheLockOfItsCaller) {
    ASSERT_TRUE(Utils::LockMnt(true));
    EXPECT_TRUE(DBUS::Init());
    EXPECT_FALSE(LockIsFree());
    Utils::UnLockMnt();
    EXPECT_TRUE(LockIsFree());
}

TEST_F(Bus, KillEndsTheBusAndOnlyTheBus) {
    ASSERT_TRUE(DBUS::Init());
    ASSERT_TRUE(GVFSD::Init());
    ASSERT_TRUE(Started("gvfsd"));
    EXPECT_TRUE(DBUS::DoKill());
    EXPECT_TRUE(Eventually([] { return DBUS::CheckDaemonDied(); }));
    EXPECT_FALSE(GVFSD::CheckDaemonDied());
}

TEST_F(Bus, KillWaitsUpTo30Seconds) {
    Install(
        paths::kDbusDaemon,
        "trap '' TERM\necho unix:path=/deaf >&${2#--print-address=}\nwhile :; do sleep 1; done");
    ASSERT_TRUE(DBUS::Init());
    EXPECT_TRUE(DBUS::DoKill());
    EXPECT_EQ(seams::MicroSleeps().size(), 60U);
    EXPECT_THAT(seams::MicroSleeps(), testing::Each(500000U));
    kill(std::stoi(Read(paths::DbusPid(kUser))), SIGKILL);
}

TEST_F(Bus, KillSparesAStrangerWithTheBusesPid) {
    const LiveProcess stranger("sshd", kUser);
    Write(paths::DbusPid(kUser), std::to_string(stranger.pid()) + "\n");
    EXPECT_TRUE(DBUS::DoKill());
    EXPECT_EQ(waitpid(stranger.pid(), nullptr, WNOHANG), 0);
}

TEST_F(Bus, KillWithoutABusIsDone) {
    EXPECT_TRUE(DBUS::DoKill());
}

TEST_F(Bus, KillFailsWhenThePidCannotBeRead) {
    Write(paths::DbusPid(kUser), "");
    EXPECT_FALSE(DBUS::DoKill());
    EXPECT_TRUE(seams::LoggedPart("Failed to get dbus pid, /var/tmp/user/4001/dbus/dbus.pid, "));
}

}  // namespace
}  // namespace ZYROVFS
