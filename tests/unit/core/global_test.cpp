#include "zyrovfs/global.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include "zyrovfs/error.h"

namespace ZYROVFS {
namespace {

TEST(ErrorCell, StartsWithoutError) {
    ResetError();
    EXPECT_EQ(GetError(), VFS_ERR_NONE);
    EXPECT_EQ(GetErrorFile(), nullptr);
    EXPECT_EQ(GetErrorLine(), 0);
}

TEST(ErrorCell, KeepsTheLastFailure) {
    static const char file[] = "unit.cpp";
    VFSSetErrEx(VFS_ERR_BUSY, "other.cpp", 1);
    VFSSetErrEx(VFS_ERR_CONFIG_FULL, file, 12);
    EXPECT_EQ(GetError(), VFS_ERR_CONFIG_FULL);
    EXPECT_EQ(GetErrorFile(), file) << "the pointer is kept, the text is not copied";
    EXPECT_EQ(GetErrorLine(), 12);
}

TEST(ErrorCell, ResetLeavesTheDetail) {
    Json::Value detail;
    detail["host"] = "nas.example";
    VFSSetJson(detail);
    ResetError();
    Json::Value kept;
    VFSGetJson(kept);
    EXPECT_EQ(kept, detail);
}

TEST(InitEnv, NullArgumentChangesNothing) {
    setenv("ZYROVFS_UID", "77", 1);
    unsetenv("XDG_RUNTIME_DIR");
    VFSSetErrEx(VFS_ERR_BUSY, "unit.cpp", 3);
    EXPECT_FALSE(InitEnv(nullptr, "unix:path=/bus"));
    EXPECT_FALSE(InitEnv("1000", nullptr));
    EXPECT_STREQ(getenv("ZYROVFS_UID"), "77");
    EXPECT_EQ(getenv("XDG_RUNTIME_DIR"), nullptr);
    EXPECT_EQ(GetError(), VFS_ERR_BUSY);
}

TEST(InitEnv, RootGetsTheDirectoryOfTheNewUser) {
    ASSERT_EQ(geteuid(), 0U);
    EXPECT_TRUE(InitEnv("1234", "unix:path=/bus"));
    EXPECT_STREQ(getenv("ZYROVFS_UID"), "1234");
    EXPECT_STREQ(getenv("XDG_RUNTIME_DIR"), "/var/tmp/user/1234");
    EXPECT_STREQ(getenv("DBUS_SESSION_BUS_ADDRESS"), "unix:path=/bus");
}

TEST(InitEnv, ThatSucceedsLeavesAnOldCodeInTheCell) {
    VFSSetErrEx(VFS_ERR_BUSY, "unit.cpp", 3);
    EXPECT_TRUE(InitEnv("1234", "unix:path=/bus"));
    EXPECT_EQ(GetError(), VFS_ERR_BUSY);
    EXPECT_STREQ(GetErrorFile(), "unit.cpp");
    EXPECT_EQ(GetErrorLine(), 3);
    ResetError();
}

TEST(InitEnv, OfAnotherUserThanRootGetsHisOwnDirectoryWhateverTheText) {
    ASSERT_EQ(seteuid(1000), 0);
    const bool ready = InitEnv("1234", "unix:path=/bus");
    ASSERT_EQ(seteuid(0), 0);
    EXPECT_TRUE(ready);
    EXPECT_STREQ(getenv("ZYROVFS_UID"), "1234");
    EXPECT_STREQ(getenv("XDG_RUNTIME_DIR"), "/var/tmp/user/1000");
}

TEST(ActorUID, IsTheUserWhomRootActsFor) {
    setenv("ZYROVFS_UID", "4321", 1);
    EXPECT_EQ(GetActorUID(), 4321U);
}

TEST(ActorUID, IsRootWithoutTheVariable) {
    unsetenv("ZYROVFS_UID");
    EXPECT_EQ(GetActorUID(), 0U);
}

TEST(ActorUID, TextThatIsNoNumberCountsAsZero) {
    setenv("ZYROVFS_UID", "amy", 1);
    EXPECT_EQ(GetActorUID(), 0U);
}

TEST(ActorUID, OtherUsersAreAlwaysTheirOwnActor) {
    setenv("ZYROVFS_UID", "4321", 1);
    ASSERT_EQ(seteuid(1000), 0);
    const uid_t actor = GetActorUID();
    ASSERT_EQ(seteuid(0), 0);
    EXPECT_EQ(actor, 1000U);
}

}  // namespace
}  // namespace ZYROVFS
