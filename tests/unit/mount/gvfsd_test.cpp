// Launch of gvfsd. What it shares with the other daemons: daemon_test.cpp.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "support/fake_daemons.h"
#include "support/seams.h"
#include "zyrovfs/error.h"
#include "zyrovfs/vfs.h"

namespace ZYROVFS {
namespace {

using namespace fakes;
using testing::HasSubstr;
using testing::StartsWith;

class Gvfsd : public DaemonTest {};

TEST_F(Gvfsd, ReplacesAnotherOneAndStartsNoFuseDaemon) {
    ASSERT_TRUE(GVFSD::Init());
    ASSERT_TRUE(Started("gvfsd"));
    EXPECT_THAT(Report("gvfsd"), StartsWith("-r --no-fuse\n"));
}

TEST_F(Gvfsd, FindsTheBusOfTheUser) {
    Write(paths::DbusAddress(kUser), std::string(kAddress) + "\n");
    ASSERT_TRUE(GVFSD::Init());
    ASSERT_TRUE(Started("gvfsd"));
    const std::string env = Report("gvfsd", "env");
    EXPECT_THAT(env, HasSubstr(std::string("DBUS_SESSION_BUS_ADDRESS=") + kAddress + "\n"));
    EXPECT_THAT(env, HasSubstr("XDG_RUNTIME_DIR=/var/tmp/user/4001\n"));
}

TEST_F(Gvfsd, LaunchThatFailsIsToldAndLeavesNoPidFile) {
    std::filesystem::remove(paths::kGvfsd);
    ResetError();
    EXPECT_FALSE(GVFSD::Init());
    EXPECT_TRUE(seams::LoggedPart("Error launching gvfsd: ")) << seams::LogDump();
    EXPECT_TRUE(seams::Logged("Failed to run gvfsd, uid=4001"));
    EXPECT_FALSE(std::filesystem::exists(paths::GvfsdPid(kUser)));
    EXPECT_EQ(GetError(), VFS_ERR_NONE) << "the log tells the cause";
    EXPECT_TRUE(seams::Sleeps().empty());
    EXPECT_TRUE(LockIsFree());
}

TEST_F(Gvfsd, ChildThatCannotBecomeTheUserRunsNoDaemon) {
    for (const char* call : {"seteuid", "setregid", "setreuid"}) {
        seams::WatchChildren();
        seams::FailIdentity(call, EPERM);
        GVFSD::Init();
        EXPECT_TRUE(Eventually([] { return seams::LoggedPart("Failed to set "); })) << call;
        EXPECT_TRUE(Eventually([] { return GVFSD::CheckDaemonDied(); })) << call;
        EXPECT_EQ(Starts("gvfsd"), 0) << call;
        seams::Reset();
    }
}

TEST_F(Gvfsd, DaemonThatEndsAtOnceIsFoundDeadAndStartedAgain) {
    InstallGvfsd("exit 1\n");
    ASSERT_TRUE(GVFSD::Init()) << "the fixed wait is no probe";
    ASSERT_TRUE(Started("gvfsd"));
    EXPECT_TRUE(Eventually([] { return GVFSD::CheckDaemonDied(); }));
    InstallGvfsd();
    EXPECT_TRUE(GVFSD::Init());
    EXPECT_TRUE(Eventually([] { return Starts("gvfsd") == 2; }));
    EXPECT_FALSE(GVFSD::CheckDaemonDied());
}

}  // namespace
}  // namespace ZYROVFS
