// Launch of the fuse daemon and repair of its mount point. What it shares: daemon_test.cpp.
#include <gmock/gmock.h>
#include <grp.h>
#include <gtest/gtest.h>
#include <zosplatform/error.h>

#include "support/fake_daemons.h"
#include "support/seams.h"
#include "support/stranger.h"
#include "zyrovfs/error.h"
#include "zyrovfs/utils.h"
#include "zyrovfs/vfs.h"

namespace ZYROVFS {
namespace {

using namespace fakes;
using testing::HasSubstr;
using testing::StartsWith;

const std::string kTree = "/var/tmp/user/4001/gvfs";

constexpr const char* kRealUmount = "/bin/umount.real";

class Fuse : public DaemonTest {
  protected:
    void SetUp() override {
        DaemonTest::SetUp();
        Write("/var/tmp/user/4001/zyrovfs/keep", "");
        seams::WatchChildren();
    }
    void TearDown() override {
        DaemonTest::TearDown();
        std::error_code none;
        std::filesystem::rename(kRealUmount, paths::kUmount, none);
    }

    /** /bin/umount notes its calls and then does nothing of the kind. */
    static void BreakUmount() {
        if (!std::filesystem::exists(kRealUmount)) {
            std::filesystem::rename(paths::kUmount, kRealUmount);
        }
        Install(paths::kUmount, "echo \"$* $(id -u) $(id -ru)\" >>/tmp/fakes/umount\nexit 32\n");
    }
    static bool IsStale() { return access(kTree.c_str(), F_OK) != 0 && errno == ENOTCONN; }
};

TEST_F(Fuse, IsMountedAtTheUsersTreeForAllToUse) {
    ASSERT_TRUE(GVFSD_FUSE::Init()) << seams::LogDump();
    ASSERT_TRUE(Started("gvfsd-fuse"));
    EXPECT_THAT(Report("gvfsd-fuse"),
                StartsWith(kTree + " -f -o big_writes -o direct_io -o allow_other\n"));
}

TEST_F(Fuse, MountPointIsMadeAndBelongsToTheUser) {
    ASSERT_TRUE(GVFSD_FUSE::Init());
    struct stat info {};
    ASSERT_EQ(stat(kTree.c_str(), &info), 0);
    EXPECT_TRUE(S_ISDIR(info.st_mode));
    EXPECT_EQ(info.st_uid, kUser);
    EXPECT_EQ(info.st_gid, 100U);
}

TEST_F(Fuse, FileInPlaceOfTheMountPointIsReplaced) {
    Write(kTree, "no folder");
    ASSERT_TRUE(GVFSD_FUSE::Init()) << seams::LogDump();
    EXPECT_TRUE(std::filesystem::is_directory(kTree));
}

TEST_F(Fuse, PidIsOfTheDaemonAndNotOfTheHelper) {
    ASSERT_TRUE(GVFSD_FUSE::Init());
    ASSERT_TRUE(Started("gvfsd-fuse"));
    EXPECT_EQ(Read("/var/tmp/user/4001/zyrovfs/gvfsd-fuse.pid"), Report("gvfsd-fuse", "pids"));
}

TEST_F(Fuse, WhatTheCallerHasNotYetWrittenIsNotTakenForThePid) {
    InFreshProcess([] {
        printf("4711");
        ASSERT_TRUE(GVFSD_FUSE::Init());
        ASSERT_TRUE(Started("gvfsd-fuse"));
        EXPECT_EQ(Read(paths::GvfsdFusePid(kUser)), Report("gvfsd-fuse", "pids"));
    });
}

TEST_F(Fuse, SuccessClearsBothErrorCells) {
    VFSSetErrEx(VFS_ERR_BUSY, "earlier.cpp", 1);
    YLIBCErrSetEx(0x900, "earlier.cpp", 2);
    ASSERT_TRUE(GVFSD_FUSE::Init());
    EXPECT_EQ(GetError(), VFS_ERR_NONE);
    EXPECT_EQ(YLIBCErrGet(), 0U);
}

TEST_F(Fuse, LivingDaemonLeavesTheErrorCells) {
    const LiveProcess daemon("gvfsd-fuse", kUser);
    Write(paths::GvfsdFusePid(kUser), std::to_string(daemon.pid()) + "\n");
    VFSSetErrEx(VFS_ERR_BUSY, "earlier.cpp", 1);
    ASSERT_TRUE(GVFSD_FUSE::Init());
    EXPECT_EQ(GetError(), VFS_ERR_BUSY);
}

TEST_F(Fuse, LaunchThatFailsIsNotRepeated) {
    std::filesystem::remove(paths::kGvfsdFuse);
    BreakUmount();
    EXPECT_FALSE(GVFSD_FUSE::Init());
    EXPECT_TRUE(seams::LoggedPart("Error launching gvfsd-fuse: ")) << seams::LogDump();
    EXPECT_TRUE(seams::Logged("Failed to run gvfsd-fuse, uid=4001, 1"));
    EXPECT_TRUE(seams::Logged("Failed to run gvfsd-fuse, uid=4001"));
    EXPECT_EQ(Report("umount"), "");
    EXPECT_FALSE(std::filesystem::exists(paths::GvfsdFusePid(kUser)));
    EXPECT_TRUE(LockIsFree());
}

TEST_F(Fuse, HelperThatCannotBecomeTheUserIsALaunchThatFails) {
    for (const char* call : {"setregid", "setreuid"}) {
        seams::WatchChildren();
        BreakUmount();
        seams::FailIdentity(call, EPERM);
        EXPECT_FALSE(GVFSD_FUSE::Init()) << call;
        EXPECT_TRUE(seams::LoggedPart("Failed to set ")) << seams::LogDump();
        EXPECT_TRUE(seams::Logged("Failed to run gvfsd-fuse, uid=4001, 1")) << seams::LogDump();
        EXPECT_EQ(Starts("gvfsd-fuse"), 0) << call;
        EXPECT_EQ(Report("umount"), "") << call;
        seams::Reset();
    }
}

TEST_F(Fuse, StaleMountPointIsUnmountedAndTheLaunchRepeated) {
    ASSERT_TRUE(MakeStaleMount(kTree));
    ASSERT_TRUE(IsStale());
    EXPECT_TRUE(GVFSD_FUSE::Init()) << seams::LogDump();
    ASSERT_TRUE(Started("gvfsd-fuse"));
    EXPECT_FALSE(IsStale());
    EXPECT_TRUE(seams::LoggedPart("Failed to access " + kTree + ", ")) << seams::LogDump();
    EXPECT_TRUE(seams::Logged("Failed to run gvfsd-fuse, uid=4001, 2"));
    EXPECT_FALSE(seams::Logged("Failed to run gvfsd-fuse, uid=4001"));
    EXPECT_EQ(Read(paths::GvfsdFusePid(kUser)), Report("gvfsd-fuse", "pids"));
    EXPECT_EQ(GetError(), VFS_ERR_NONE);
}

TEST_F(Fuse, StaleMountPointThatStaysIsRepairedOnceOnly) {
    ASSERT_TRUE(MakeStaleMount(kTree));
    BreakUmount();
    EXPECT_FALSE(GVFSD_FUSE::Init());
    EXPECT_EQ(Report("umount"), kTree + " 0 0\n") << "once, and as root in full";
    EXPECT_EQ(Starts("gvfsd-fuse"), 0);
    EXPECT_TRUE(seams::Logged("Failed to umount " + kTree)) << seams::LogDump();
    EXPECT_TRUE(seams::Logged("Failed to run gvfsd-fuse, uid=4001"));
    EXPECT_TRUE(LockIsFree());
}

TEST_F(Fuse, SecondFailureOfAnotherKindEndsTheLaunch) {
    ASSERT_TRUE(MakeStaleMount(kTree));
    std::filesystem::remove(paths::kGvfsdFuse);
    EXPECT_FALSE(GVFSD_FUSE::Init());
    EXPECT_FALSE(IsStale());
    EXPECT_TRUE(seams::Logged("Failed to run gvfsd-fuse, uid=4001, 2"));
    EXPECT_TRUE(seams::Logged("Failed to run gvfsd-fuse, uid=4001, 1"));
    EXPECT_TRUE(seams::Logged("Failed to run gvfsd-fuse, uid=4001"));
}

TEST_F(Fuse, RepairThatCannotBecomeRootRunsNothing) {
    ASSERT_TRUE(MakeStaleMount(kTree));
    BreakUmount();
    InFreshProcess([] {
        seams::WatchChildren();
        ASSERT_EQ(setgroups(0, nullptr), 0);
        ASSERT_EQ(setresgid(100, 100, 100), 0);
        ASSERT_EQ(setresuid(kUser, kUser, kUser), 0);
        EXPECT_FALSE(GVFSD_FUSE::Init());
        EXPECT_TRUE(seams::LoggedPart("Failed to set uid 4001 4001 4001, ")) << seams::LogDump();
    });
    EXPECT_EQ(Report("umount"), "");
}

TEST_F(Fuse, PathThatTheUserCannotMakeIsNoMountPoint) {
    chmod("/var/tmp/user/4001", 0755);
    EXPECT_FALSE(GVFSD_FUSE::Init());
    EXPECT_TRUE(seams::LoggedPart("Failed to mkdir " + kTree + ", ")) << seams::LogDump();
    EXPECT_TRUE(seams::Logged("Failed to run gvfsd-fuse, uid=4001, 2"));
}

/** Links that lead root's umount to a file system that is none of the user's business. */
class FuseTreeThatIsALink : public Fuse {
  protected:
    void SetUp() override {
        Fuse::SetUp();
        std::filesystem::create_directories(kElsewhere);
        ASSERT_EQ(mount("tmpfs", kElsewhere, "tmpfs", 0, nullptr), 0);
    }
    void TearDown() override {
        EXPECT_EQ(umount(kElsewhere), 0) << "root has unmounted it already";
        Fuse::TearDown();
    }
    static constexpr const char* kElsewhere = "/mnt";
};

TEST_F(FuseTreeThatIsALink, OfAStrangersIsMovedAsideAndNotFollowed) {
    ASSERT_TRUE(stranger::Link(kElsewhere, kTree));
    EXPECT_TRUE(GVFSD_FUSE::Init()) << seams::LogDump();
    EXPECT_TRUE(std::filesystem::is_directory(std::filesystem::symlink_status(kTree)));
}

TEST_F(FuseTreeThatIsALink, OfTheUsersOwnIsNotFollowedEither) {
    ASSERT_TRUE(MakeStaleMount("/tmp/stale"));
    ASSERT_TRUE(stranger::As(kUser, [] { return symlink("/tmp/stale", kTree.c_str()) == 0; }));
    EXPECT_TRUE(GVFSD_FUSE::Init()) << seams::LogDump();
    EXPECT_EQ(umount2("/tmp/stale", MNT_DETACH), 0) << "root has unmounted it already";
    EXPECT_TRUE(std::filesystem::is_directory(std::filesystem::symlink_status(kTree)));
}

TEST_F(Fuse, StaleMountPointIsRepairedUnderAServiceThatIgnoresItsChildren) {
    ASSERT_TRUE(MakeStaleMount(kTree));
    InFreshProcess([] {
        signal(SIGCHLD, SIG_IGN);
        EXPECT_TRUE(GVFSD_FUSE::Init()) << seams::LogDump();
        ASSERT_TRUE(Started("gvfsd-fuse"));
        EXPECT_EQ(Read(paths::GvfsdFusePid(kUser)), Report("gvfsd-fuse", "pids"));
    });
}

TEST_F(Fuse, LaunchThatFailsIsSeenByAServiceThatIgnoresItsChildren) {
    std::filesystem::remove(paths::kGvfsdFuse);
    BreakUmount();
    InFreshProcess([] {
        signal(SIGCHLD, SIG_IGN);
        EXPECT_FALSE(GVFSD_FUSE::Init());
        EXPECT_TRUE(seams::Logged("Failed to run gvfsd-fuse, uid=4001"));
    });
    EXPECT_EQ(Report("umount"), "") << "there is nothing to repair";
}

TEST_F(Fuse, RepairRestoresTheServicesChoiceAboutItsChildren) {
    ASSERT_TRUE(MakeStaleMount(kTree));
    InFreshProcess([] {
        struct sigaction action {};
        action.sa_handler = SIG_DFL;
        action.sa_flags = SA_NOCLDWAIT;
        sigaction(SIGCHLD, &action, nullptr);
        EXPECT_TRUE(GVFSD_FUSE::Init());
        sigaction(SIGCHLD, nullptr, &action);
        EXPECT_NE(action.sa_flags & SA_NOCLDWAIT, 0);
    });
}

}  // namespace
}  // namespace ZYROVFS
