// The way of a process to its user: checks, identity, environment, chain.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <zosplatform/process.h>

#include <clocale>

#include "core/identity.h"
#include "mount/init_global.h"
#include "support/fake_daemons.h"
#include "support/seams.h"
#include "zyrovfs/error.h"
#include "zyrovfs/global.h"
#include "zyrovfs/vfs.h"

namespace {

int privileged_mode = 1;
int privileged_mode_questions = 0;

}  // namespace

extern "C" int ZYRODZOSIsPrivilegedMode(void) {
    ++privileged_mode_questions;
    return privileged_mode;
}

namespace ZYROVFS {
namespace {

using namespace fakes;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

std::string Env(const char* name) {
    const char* value = getenv(name);
    return value == nullptr ? "(unset)" : value;
}

/** Each body runs in a process of its own: readiness is for the life of a process. */
class Global : public DaemonTest {
  protected:
    void SetUp() override {
        DaemonTest::SetUp();
        privileged_mode = 1;
        privileged_mode_questions = 0;
        unsetenv("ZYROVFS_UID");
        unsetenv("XDG_RUNTIME_DIR");
    }

    static void MakeChainAlive(const LiveProcess& bus, const LiveProcess& gvfsd,
                               const LiveProcess& fuse) {
        Write(paths::DbusPid(kUser), std::to_string(bus.pid()) + "\n");
        Write(paths::GvfsdPid(kUser), std::to_string(gvfsd.pid()) + "\n");
        Write(paths::GvfsdFusePid(kUser), std::to_string(fuse.pid()) + "\n");
        Write(paths::DbusAddress(kUser), std::string(kAddress) + "\n");
        // The files of a chain are the user's.
        for (const std::string& file : {paths::DbusPid(kUser), paths::GvfsdPid(kUser),
                                        paths::GvfsdFusePid(kUser), paths::DbusAddress(kUser)}) {
            ASSERT_EQ(chown(file.c_str(), kUser, 0), 0);
        }
    }
    static void ExpectNothingStarted() {
        for (const char* name : {"dbus-daemon", "gvfsd", "gvfsd-fuse"}) {
            EXPECT_EQ(Starts(name), 0) << name;
        }
    }
};

TEST_F(Global, StartsTheChainInOrderAndMakesTheProcessReady) {
    InFreshProcess([] {
        seams::WatchChildren();
        ASSERT_TRUE(InitGlobal(kUser, false)) << seams::LogDump();
        EXPECT_THAT(seams::Sleeps(), ElementsAre(3, 3, 3));
        for (const char* name : {"dbus-daemon", "gvfsd", "gvfsd-fuse"}) {
            EXPECT_TRUE(Started(name)) << name;
        }
        // Each later one finds the bus, which only the first can have told.
        EXPECT_THAT(Report("dbus-daemon", "env"),
                    testing::Not(HasSubstr("DBUS_SESSION_BUS_ADDRESS")));
        EXPECT_THAT(Report("gvfsd", "env"), HasSubstr("DBUS_SESSION_BUS_ADDRESS="));
        EXPECT_THAT(Report("gvfsd-fuse", "env"), HasSubstr("DBUS_SESSION_BUS_ADDRESS="));
        EXPECT_EQ(Env("ZYROVFS_UID"), "4001");
        EXPECT_EQ(Env("XDG_RUNTIME_DIR"), "/var/tmp/user/4001");
        EXPECT_EQ(Env("DBUS_SESSION_BUS_ADDRESS"), kAddress);
        EXPECT_TRUE(LockIsFree());
    });
}

TEST_F(Global, FilesOfTheChainBelongToTheUser) {
    InFreshProcess([] {
        ASSERT_TRUE(InitGlobal(kUser, false));
        for (const std::string& file : {paths::DbusPid(kUser), paths::GvfsdPid(kUser),
                                        paths::GvfsdFusePid(kUser), paths::DbusAddress(kUser)}) {
            struct stat info {};
            EXPECT_EQ(stat(file.c_str(), &info), 0) << file;
            EXPECT_EQ(info.st_uid, kUser) << file;
        }
    });
}

TEST_F(Global, SecondCallIsTrueWithoutASystemCallHoweverTheFirstLeftTheDaemons) {
    InFreshProcess([] {
        ASSERT_TRUE(InitGlobal(kUser, false));
        std::filesystem::remove_all("/var/tmp/user");
        std::filesystem::remove_all("/tmp/zyrovfs");
        seams::Reset();
        privileged_mode_questions = 0;
        EXPECT_TRUE(InitGlobal(kUser, false));
        EXPECT_THAT(seams::IdentityCalls(), IsEmpty());
        EXPECT_THAT(seams::Sleeps(), IsEmpty());
        EXPECT_FALSE(std::filesystem::exists("/tmp/zyrovfs")) << "not even the lock";
        EXPECT_EQ(privileged_mode_questions, 1);
    });
}

TEST_F(Global, ReadinessForOneUserIsNoneForAnother) {
    InFreshProcess([] {
        ASSERT_TRUE(InitGlobal(kUser, false));
        ASSERT_TRUE(Started("dbus-daemon"));
        EXPECT_TRUE(InitGlobal(kUser + 1, false));
        EXPECT_EQ(Env("ZYROVFS_UID"), "4002");
        EXPECT_EQ(Env("XDG_RUNTIME_DIR"), "/var/tmp/user/4002");
        EXPECT_TRUE(std::filesystem::exists(paths::DbusPid(kUser + 1))) << "a chain of its own";
    });
}

TEST_F(Global, ReadinessEndsWhenTheProcessTurnsToAnotherUser) {
    InFreshProcess([] {
        ASSERT_TRUE(InitGlobal(kUser, false));
        ASSERT_TRUE(InitGlobal(kUser + 1, true)) << "as a clean-up does";
        EXPECT_EQ(Env("ZYROVFS_UID"), "4002");
        EXPECT_TRUE(InitGlobal(kUser, false));
        EXPECT_EQ(Env("ZYROVFS_UID"), "4001");
        EXPECT_EQ(Env("XDG_RUNTIME_DIR"), "/var/tmp/user/4001");
    });
}

TEST_F(Global, MountOfAReadyProcessStartsWhatHasDiedSince) {
    InFreshProcess([] {
        ASSERT_TRUE(InitForMount(kUser));
        ASSERT_TRUE(Started("gvfsd"));
        kill(std::stoi(Read(paths::GvfsdPid(kUser))), SIGKILL);
        ASSERT_TRUE(Eventually([] { return GVFSD::CheckDaemonDied(); }));
        EXPECT_TRUE(InitGlobal(kUser, false));
        EXPECT_EQ(Starts("gvfsd"), 1) << "readiness is not looked at";
        EXPECT_TRUE(InitForMount(kUser));
        EXPECT_TRUE(Eventually([] { return Starts("gvfsd") == 2; }));
        EXPECT_EQ(Starts("dbus-daemon"), 1);
        EXPECT_EQ(Starts("gvfsd-fuse"), 1);
    });
}

TEST_F(Global, FlavourWithoutTheFeatureIsRefusedBeforeAnyChange) {
    privileged_mode = 0;
    InFreshProcess([] {
        for (const bool force : {false, true}) {
            EXPECT_FALSE(InitGlobal(kUser, force));
        }
        EXPECT_TRUE(seams::Logged("not support VFS in DZOS")) << seams::LogDump();
        EXPECT_THAT(seams::IdentityCalls(), IsEmpty());
        EXPECT_EQ(Env("ZYROVFS_UID"), "(unset)");
        EXPECT_EQ(Env("XDG_RUNTIME_DIR"), "(unset)");
        EXPECT_FALSE(std::filesystem::exists("/tmp/zyrovfs"));
    });
    ExpectNothingStarted();
}

TEST_F(Global, FlavourIsAskedAgainOfAReadyProcess) {
    InFreshProcess([] {
        ASSERT_TRUE(InitGlobal(kUser, false));
        privileged_mode = 0;
        EXPECT_FALSE(InitGlobal(kUser, false));
    });
}

TEST_F(Global, ForceWithADeadDaemonIsTrueAndStartsNothing) {
    LiveProcess bus("dbus-daemon", kUser);
    LiveProcess gvfsd("gvfsd", kUser);
    LiveProcess fuse("gvfsd-fuse", kUser);
    for (LiveProcess* dead : {&fuse, &gvfsd, &bus}) {
        MakeChainAlive(bus, gvfsd, fuse);
        dead->End();
        InFreshProcess([] {
            EXPECT_TRUE(InitGlobal(kUser, true));
            EXPECT_EQ(Env("ZYROVFS_UID"), "4001");
            EXPECT_EQ(Env("XDG_RUNTIME_DIR"), "/var/tmp/user/4001");
            EXPECT_EQ(Env("DBUS_SESSION_BUS_ADDRESS"), "(unset)");
            EXPECT_EQ(geteuid(), 0U);
            EXPECT_EQ(getegid(), 0U);
        });
    }
    ExpectNothingStarted();
}

TEST_F(Global, ForceWithoutAnyDaemonStartsNothingAndDoesNotMakeReady) {
    InFreshProcess([] {
        EXPECT_TRUE(InitGlobal(kUser, true));
        EXPECT_EQ(Starts("dbus-daemon"), 0);
        EXPECT_TRUE(InitGlobal(kUser, false));
        EXPECT_EQ(Starts("dbus-daemon"), 1);
    });
}

TEST_F(Global, ForceWithALivingChainTakesTheAddressOfItsBus) {
    const LiveProcess bus("dbus-daemon", kUser);
    const LiveProcess gvfsd("gvfsd", kUser);
    const LiveProcess fuse("gvfsd-fuse", kUser);
    MakeChainAlive(bus, gvfsd, fuse);
    InFreshProcess([] {
        EXPECT_TRUE(InitGlobal(kUser, true)) << seams::LogDump();
        EXPECT_EQ(Env("DBUS_SESSION_BUS_ADDRESS"), kAddress);
        EXPECT_THAT(seams::Sleeps(), IsEmpty());
        EXPECT_TRUE(LockIsFree());
    });
    ExpectNothingStarted();
}

TEST_F(Global, ForceReachesTheDaemonsOfAReadyProcess) {
    InFreshProcess([] {
        ASSERT_TRUE(InitGlobal(kUser, false));
        ASSERT_TRUE(Started("gvfsd") && Started("gvfsd-fuse"));
        seams::Reset();
        EXPECT_TRUE(InitGlobal(kUser, true));
        EXPECT_THAT(seams::IdentityCalls(), testing::Not(IsEmpty()));
    });
}

TEST_F(Global, UnreadablePidFileDoesNotStopAForcedStart) {
    const LiveProcess gvfsd("gvfsd", kUser);
    const LiveProcess fuse("gvfsd-fuse", kUser);
    MakeChainAlive(gvfsd, gvfsd, fuse);
    std::filesystem::remove(paths::DbusPid(kUser));
    Write(paths::DbusPid(kUser), "");
    ASSERT_EQ(chown(paths::DbusPid(kUser).c_str(), kUser, 0), 0);
    InFreshProcess([] {
        EXPECT_TRUE(InitGlobal(kUser, true)) << seams::LogDump();
        EXPECT_EQ(Starts("dbus-daemon"), 1);
    });
}

TEST_F(Global, FirstFailureStopsTheChain) {
    std::filesystem::remove(paths::kDbusDaemon);
    InFreshProcess([] {
        EXPECT_FALSE(InitGlobal(kUser, false));
        EXPECT_TRUE(seams::Logged("Failed to run dbus, uid=4001"));
        EXPECT_TRUE(LockIsFree());
        EXPECT_EQ(geteuid(), 0U);
        EXPECT_EQ(Env("ZYROVFS_UID"), "4001");
    });
    ExpectNothingStarted();
}

TEST_F(Global, GvfsdThatFailsKeepsTheFuseDaemonFromStarting) {
    std::filesystem::remove(paths::kGvfsd);
    InFreshProcess([] {
        EXPECT_FALSE(InitGlobal(kUser, false));
        EXPECT_TRUE(seams::Logged("Failed to run gvfsd, uid=4001"));
    });
    EXPECT_EQ(Starts("dbus-daemon"), 1);
    EXPECT_EQ(Starts("gvfsd-fuse"), 0);
}

TEST_F(Global, FailureDoesNotMakeReady) {
    std::filesystem::remove(paths::kGvfsdFuse);
    InFreshProcess([] {
        EXPECT_FALSE(InitGlobal(kUser, false));
        InstallFuse();
        EXPECT_TRUE(InitGlobal(kUser, false)) << seams::LogDump();
        EXPECT_TRUE(Started("gvfsd-fuse"));
    });
}

TEST_F(Global, MissingAddressOfALivingBusIsInTheErrorCell) {
    const LiveProcess bus("dbus-daemon", kUser);
    const LiveProcess gvfsd("gvfsd", kUser);
    MakeChainAlive(bus, gvfsd, gvfsd);
    std::filesystem::remove(paths::DbusAddress(kUser));
    InFreshProcess([] {
        ResetError();
        EXPECT_FALSE(InitGlobal(kUser, false));
        EXPECT_EQ(GetError(), VFS_ERR_DBUS_ADDRESS);
    });
}

TEST_F(Global, LockThatCannotBeHadFailsWithoutACode) {
    const ForeignLock lock;
    InFreshProcess([] {
        ResetError();
        EXPECT_FALSE(InitGlobal(kUser, false));
        EXPECT_TRUE(seams::LoggedPart(" Failed to lock ")) << seams::LogDump();
        EXPECT_EQ(GetError(), VFS_ERR_NONE);
        EXPECT_EQ(seams::MicroSleeps().size(), 2200U);
        EXPECT_EQ(geteuid(), 0U);
    });
    ExpectNothingStarted();
}

TEST_F(Global, LocaleIsThatOfTheEnvironment) {
    InFreshProcess([] {
        setenv("LC_ALL", "C.UTF-8", 1);
        ASSERT_TRUE(InitGlobal(kUser, true));
        EXPECT_STREQ(setlocale(LC_CTYPE, nullptr), "C.UTF-8");
    });
}

// --- identity ---------------------------------------------------------------------------------

class Identity : public Global {};

TEST_F(Identity, RootBecomesTheUserAndRootAgain) {
    const LiveProcess bus("dbus-daemon", kUser);
    MakeChainAlive(bus, bus, bus);
    InFreshProcess([] {
        EXPECT_TRUE(InitGlobal(kUser, true));
        const std::vector<std::string> calls = seams::IdentityCalls();
        ASSERT_GE(calls.size(), 5U);
        EXPECT_EQ(calls[0], "seteuid(4001)");
        EXPECT_EQ(calls[1], "setegid(0)");
        EXPECT_EQ(calls[calls.size() - 3], "seteuid(0)");
        EXPECT_EQ(calls[calls.size() - 2], "setegid(0)");
        EXPECT_EQ(calls[calls.size() - 1], "seteuid(0)");
    });
}

TEST_F(Identity, ServiceThatIsTheUserAlreadyStaysTheUserAndGetsItsGroupBack) {
    InFreshProcess([] {
        ASSERT_EQ(setresgid(0, 100, 0), 0);
        ASSERT_EQ(setresuid(0, kUser, 0), 0);
        seams::Reset();
        EXPECT_TRUE(InitGlobal(kUser, true));
        const std::vector<std::string> calls = seams::IdentityCalls();
        ASSERT_GE(calls.size(), 4U);
        EXPECT_EQ(calls[0], "setegid(0)") << "the uid is right already";
        EXPECT_EQ(geteuid(), kUser);
        EXPECT_EQ(getegid(), 100U);
    });
}

TEST_F(Identity, ServiceThatIsTheUserStartsDaemonsThatAreFullyTheUser) {
    InFreshProcess([] {
        ASSERT_EQ(setresgid(0, 100, 0), 0);
        ASSERT_EQ(setresuid(0, kUser, 0), 0);
        ASSERT_TRUE(InitGlobal(kUser, false)) << seams::LogDump();
        for (const char* name : {"dbus-daemon", "gvfsd", "gvfsd-fuse"}) {
            ASSERT_TRUE(Started(name));
            EXPECT_THAT(Report(name), HasSubstr("Uid:\t4001\t4001\t4001\t4001\n")) << name;
            EXPECT_THAT(Report(name), HasSubstr("Gid:\t100\t100\t100\t100\n")) << name;
        }
    });
}

TEST_F(Identity, GroupThatDoesNotComeBackIsToldAndChangesNoResult) {
    InFreshProcess([] {
        seams::FailIdentity("setegid", EPERM, 1);
        EXPECT_TRUE(InitGlobal(kUser, true));
        EXPECT_TRUE(seams::Logged("Faile to setegid, Operation not permitted")) << seams::LogDump();
        EXPECT_EQ(geteuid(), 0U) << "the uid goes back all the same";
    });
}

TEST_F(Identity, RootThatDoesNotComeBackIsToldTwice) {
    InFreshProcess([] {
        {
            const UserWithRootGroup user(kUser);
            seams::FailIdentity("seteuid", EPERM);
        }
        EXPECT_TRUE(seams::Logged("Faile to setegid, Operation not permitted"));
        EXPECT_TRUE(seams::Logged("Faile to seteuid, Operation not permitted"));
        EXPECT_THAT(seams::IdentityCalls(), ElementsAre("seteuid(4001)", "setegid(0)", "seteuid(0)",
                                                        "setegid(0)", "seteuid(0)"));
    });
}

TEST_F(Identity, SwitchThatFailsIsToldAndTheWorkGoesOn) {
    InFreshProcess([] {
        seams::FailIdentity("seteuid(4001)", EPERM);
        seams::FailIdentity("setegid", EPERM, 0);
        EXPECT_TRUE(InitGlobal(kUser, true));
        EXPECT_TRUE(seams::LoggedPart("Failed to set uid 4001, ")) << seams::LogDump();
        EXPECT_TRUE(seams::LoggedPart("Failed to set gid 0, "));
        EXPECT_EQ(Env("XDG_RUNTIME_DIR"), "/var/tmp/user/4001");
    });
}

}  // namespace
}  // namespace ZYROVFS
