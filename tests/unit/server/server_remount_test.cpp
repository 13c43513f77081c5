// The one recovery of the feature: what is waited for, what is ended, what is tried again.
#include "server/server_remount.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/prctl.h>
#include <sys/wait.h>

#include <csignal>

#include "support/fake_server.h"
#include "support/profiles.h"

namespace ZYROVFS::Server {
namespace {

using profiles::kUser;
using testing::ElementsAre;

class RemountTest : public profiles::ProfileTest {
  protected:
    void SetUp() override {
        ProfileTest::SetUp();
        std::filesystem::remove_all(paths::RuntimeDir(kUser));
        conf_["protocol"] = "ftp";
        conf_["hostname"] = "nas";
        conf_["alias"] = "mine";
        conf_["password"] = "secret";
        ASSERT_TRUE(mgr_.Load(kUser, VFS_CONFIG_CONNECT, conf_, false, false));
        fake::Now().calls.clear();
    }

    MountOutcome Run(bool force = false) {
        return MountAndDescribe(mgr_, kUser, conf_, force, profile_);
    }

    fake::Scope fakes_;
    ServerMgr mgr_;
    Json::Value conf_;
    Json::Value profile_;
};

TEST_F(RemountTest, MountsAndDescribesOnce) {
    EXPECT_EQ(Run(true), MountOutcome::kDone);
    EXPECT_THAT(fake::Operations(), ElementsAre("Mount", "CreateJsonObj"));
    const fake::Call mount = fake::Calls("Mount")[0];
    EXPECT_EQ(mount.mode, VFS_CONFIG_CONNECT);
    EXPECT_EQ(mount.conf, conf_);
    EXPECT_TRUE(mount.flag) << "force";
    EXPECT_TRUE(fake::Calls("CreateJsonObj")[0].flag) << "credentials enciphered";
    EXPECT_EQ(profile_["password"], fake::Sealed("secret"));
    EXPECT_TRUE(seams::Sleeps().empty());
}

TEST_F(RemountTest, FailedMountIsNeverTriedAgain) {
    for (const __tag_vfs_err_ code :
         {VFS_ERR_FAILED, VFS_ERR_WRONG_PASSWORD, VFS_ERR_IDENTITY_QUESTION}) {
        fake::Now().calls.clear();
        fake::Fail("Mount", {code});
        EXPECT_EQ(Run(), MountOutcome::kMountFailed);
        EXPECT_EQ(GetError(), code);
        EXPECT_THAT(fake::Operations(), ElementsAre("Mount"));
        EXPECT_TRUE(seams::Sleeps().empty());
    }
}

TEST_F(RemountTest, OnlyTheFailedCodeIsTriedAgain) {
    for (const __tag_vfs_err_ code :
         {VFS_ERR_INVALID_SERVER, VFS_ERR_UNKNOWN, VFS_ERR_BAD_PARAM, VFS_ERR_HOST_UNREACHABLE,
          VFS_ERR_OUT_OF_MEMORY, VFS_ERR_CLOUD_FAILED}) {
        fake::Now().calls.clear();
        fake::Fail("CreateJsonObj", {code});
        EXPECT_EQ(Run(), MountOutcome::kDescribeFailed) << code;
        EXPECT_EQ(GetError(), code);
        EXPECT_THAT(fake::Operations(), ElementsAre("Mount", "CreateJsonObj"));
        EXPECT_TRUE(seams::Sleeps().empty());
    }
}

TEST_F(RemountTest, LostPathRecoversOnceWithThreeSecondsOfWaiting) {
    fake::Fail("CreateJsonObj", {VFS_ERR_FAILED});
    EXPECT_EQ(Run(true), MountOutcome::kDone);
    EXPECT_THAT(fake::Operations(),
                ElementsAre("Mount", "CreateJsonObj", "Unmount", "Mount", "CreateJsonObj"));
    EXPECT_THAT(seams::Sleeps(), ElementsAre(1U, 2U));
    EXPECT_EQ(fake::Calls("Unmount")[0].waited, 0U);
    EXPECT_EQ(fake::Calls("Unmount")[0].mode, VFS_CONFIG_CONNECT);
    EXPECT_EQ(fake::Calls("Mount")[1].waited, 3U);
    EXPECT_TRUE(fake::Calls("Mount")[1].flag) << "force goes to the second mount, too";
    EXPECT_EQ(profile_["path"], "/tmp");
}

TEST_F(RemountTest, SecondLostPathIsFinal) {
    fake::Fail("CreateJsonObj", {VFS_ERR_FAILED, VFS_ERR_FAILED});
    EXPECT_EQ(Run(), MountOutcome::kDescribeFailed);
    EXPECT_EQ(GetError(), VFS_ERR_FAILED);
    EXPECT_EQ(fake::Calls("Mount").size(), 2U);
    EXPECT_EQ(fake::Calls("Unmount").size(), 1U);
    EXPECT_THAT(seams::Sleeps(), ElementsAre(1U, 2U));
}

TEST_F(RemountTest, SecondMountMayFail) {
    fake::Fail("CreateJsonObj", {VFS_ERR_FAILED});
    fake::Fail("Mount", {VFS_ERR_NONE, VFS_ERR_WRONG_PASSWORD});
    EXPECT_EQ(Run(), MountOutcome::kMountFailed);
    EXPECT_EQ(GetError(), VFS_ERR_WRONG_PASSWORD);
}

TEST_F(RemountTest, RecoveryGoesOnWhenTheUnmountFails) {
    fake::Fail("CreateJsonObj", {VFS_ERR_FAILED});
    fake::Fail("Unmount", {VFS_ERR_BUSY});
    EXPECT_EQ(Run(), MountOutcome::kDone);
}

/** A process that looks like the user's bus, with its pid where the bus's is looked for. */
pid_t StartBus() {
    const pid_t bus = fork();
    if (bus == 0) {
        prctl(PR_SET_NAME, "dbus-daemon");
        if (setuid(kUser) != 0) {
            _exit(1);
        }
        for (;;) {
            pause();
        }
    }
    // The fork is seen under its new name and owner before it counts as the bus.
    const std::string proc = "/proc/" + std::to_string(bus);
    while (profiles::Text(proc + "/comm") != "dbus-daemon\n" ||
           profiles::Text(proc + "/status").find("Uid:\t1234") == std::string::npos) {
    }
    profiles::PutText(paths::DbusPid(kUser), std::to_string(bus) + "\n");
    return bus;
}

TEST_F(RemountTest, RecoveryEndsTheUsersBusOnce) {
    const pid_t bus = StartBus();
    fake::Fail("CreateJsonObj", {VFS_ERR_FAILED, VFS_ERR_FAILED});
    EXPECT_EQ(Run(), MountOutcome::kDescribeFailed);
    int status = 0;
    ASSERT_EQ(waitpid(bus, &status, 0), bus);
    EXPECT_TRUE(WIFSIGNALED(status));
    EXPECT_EQ(WTERMSIG(status), SIGTERM);
}

TEST_F(RemountTest, MountThatIsDescribedLeavesTheBusAlone) {
    const pid_t bus = StartBus();
    EXPECT_EQ(Run(), MountOutcome::kDone);
    fake::Fail("CreateJsonObj", {VFS_ERR_UNKNOWN});
    EXPECT_EQ(Run(), MountOutcome::kDescribeFailed);
    int status = 0;
    EXPECT_EQ(waitpid(bus, &status, WNOHANG), 0) << "still running";
    kill(bus, SIGKILL);
    waitpid(bus, &status, 0);
}

}  // namespace
}  // namespace ZYROVFS::Server
