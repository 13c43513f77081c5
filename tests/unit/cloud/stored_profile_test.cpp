#include "cloud/stored_profile.h"

#include "core/file_memo.h"
#include "support/backend.h"
#include "support/scratch.h"

namespace backend {
namespace {

using profiles::kUser;
using profiles::VFS_CONFIG_CONNECT;
using profiles::VFS_CONFIG_SERVER;
using ZYROCloud::StoredProfile;

class StoredProfiles : public BackendTest {
  protected:
    StoredProfiles() : BackendTest(Make<BoxRig>()) {}

    void SetUp() override {
        BackendTest::SetUp();
        Settle();
    }
    /** Waits for the tick of the clock of files, behind which a profile is kept. */
    static void Settle() {
        FileIdentity file;
        while (Identify(profiles::File(VFS_CONFIG_CONNECT), file) && !file.IsSettled()) {
        }
    }
    /** The access token that a driver would get; "none" for no profile. */
    std::string Token(unsigned uid = kUser) const {
        const Json::Value* profile = StoredProfile(uid, server_id, VFS_CONFIG_CONNECT);
        return profile == nullptr ? "none" : (*profile)["access_token"].asString();
    }
};

TEST_F(StoredProfiles, HaveTheirIdAndTheirCredentialsInPlainText) {
    const Json::Value* profile = StoredProfile(kUser, server_id, VFS_CONFIG_CONNECT);
    ASSERT_NE(profile, nullptr);
    EXPECT_EQ((*profile)["server_id"], server_id);
    EXPECT_EQ((*profile)["access_token"], granted.access_token);
    EXPECT_EQ((*profile)["refresh_token"], granted.refresh_token);
}

TEST_F(StoredProfiles, AreReadOnceWhileTheFileStaysAsItIs) {
    EXPECT_EQ(Token(), granted.access_token);
    catalogue::Clear();  // without which no profile can be read
    EXPECT_EQ(Token(), granted.access_token);
}

TEST_F(StoredProfiles, FollowTheFileAtOnce) {
    Token();
    Connect();
    EXPECT_EQ(Token(), granted.access_token);
    Connect();
    EXPECT_EQ(Token(), granted.access_token);
    Disconnect();
    EXPECT_EQ(Token(), "none");
}

TEST_F(StoredProfiles, OfOneUserAreNotTheProfilesOfAnother) {
    Token();
    EXPECT_EQ(Token(kUser + 1), "none");
    EXPECT_EQ(StoredProfile(kUser, server_id + ".other", VFS_CONFIG_CONNECT), nullptr);
}

TEST_F(StoredProfiles, AreNotForAProcessThatMayNotReadTheFileNow) {
    std::filesystem::permissions(profiles::File(VFS_CONFIG_CONNECT), std::filesystem::perms(0600));
    Settle();
    ASSERT_EQ(Token(), granted.access_token);
    EXPECT_EQ(0, scratch::InChild(
                     [&] { return scratch::BecomeUser(kUser + 1) && Token() == "none" ? 0 : 1; }));
}

}  // namespace
}  // namespace backend
