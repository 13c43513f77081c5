#include "server/server_account.h"

#include <gtest/gtest.h>
#include <zosplatform/process.h>

#include "support/fake_location.h"
#include "support/profiles.h"
#include "support/seams.h"

extern "C" int ZYRODZOSIsPrivilegedMode(void) {
    return 0;
}

namespace ZYROVFS::Server {
namespace {

using profiles::kUser;
using Calls = std::vector<std::string>;

class ServerAccount : public profiles::ProfileTest {
  protected:
    void SetUp() override {
        ProfileTest::SetUp();
        fake_location::Reset();
    }
};

TEST_F(ServerAccount, NameIsTheEmailUpToItsLastAtSign) {
    EXPECT_EQ(AccountNameOf("amy@mail.example"), "amy");
    EXPECT_EQ(AccountNameOf("amy@corp@mail.example"), "amy@corp");
    EXPECT_EQ(AccountNameOf("amy"), "amy");
    EXPECT_EQ(AccountNameOf("@mail.example"), "");
    EXPECT_EQ(AccountNameOf(""), "");
}

TEST_F(ServerAccount, KnownPathIsNotAskedFor) {
    Json::Value out;
    EXPECT_TRUE(WriteAccountPath(kUser, "sharing://amy", "/fuse/x", out));
    EXPECT_EQ(out["path"], "/fuse/x");
    EXPECT_TRUE(fake_location::Calls().empty());
}

TEST_F(ServerAccount, PathThatIsNotFoundIsReportedForTheCaller) {
    Json::Value out;
    out["path"] = "";
    EXPECT_FALSE(WriteAccountPath(kUser, "sharing://amy", "", out, {"caller.cpp", 7}));
    EXPECT_EQ(GetError(), VFS_ERR_FAILED);
    EXPECT_STREQ(GetErrorFile(), "caller.cpp");
    EXPECT_EQ(GetErrorLine(), 7);
    EXPECT_TRUE(
        seams::LoggedPart("caller.cpp:7 Failed to get the path by sharing://amy, uid 1234"));
    EXPECT_EQ(out["path"], "");
}

TEST_F(ServerAccount, MountHandsTheSecretOverAsThePassword) {
    EXPECT_TRUE(MountAccount(kUser, "amy@mail.example", "{\"token\":1}",
                             "sharing://amy@mail.example", Json::Value(), false));
    EXPECT_EQ(fake_location::Calls(), Calls{"mount sharing://amy@mail.example"});
}

TEST_F(ServerAccount, UnmountOfWhatIsNotMountedIsFine) {
    EXPECT_TRUE(UnmountServer(kUser, "ftp://h", "pub"));
    EXPECT_TRUE(UnmountServer(kUser, "ftp://h", nullptr));
    EXPECT_EQ(fake_location::Calls(), (Calls{"find ftp://h/pub", "find ftp://h"}));
}

TEST_F(ServerAccount, UnmountOfWhatIsNoUriFails) {
    EXPECT_FALSE(UnmountServer(kUser, "no uri", nullptr));
    EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM);
}

}  // namespace
}  // namespace ZYROVFS::Server
