#include <gtest/gtest.h>

#include "server/server_vfs.h"
#include "support/fake_location.h"
#include "support/profiles.h"
#include "support/seams.h"
#include "support/soup_seam.h"

namespace ZYROVFS::Server {
namespace {

using profiles::kUser;

constexpr const char* kId = "sftp://amy@nas.example:2222";

Json::Value Profile() {
    Json::Value conf;
    conf["protocol"] = "sftp";
    conf["hostname"] = "nas.example";
    conf["port"] = 2222;
    conf["alias"] = "Home";
    conf["account"] = "amy";
    conf["password"] = "secret";
    conf["codepage"] = "UTF-8";
    conf["uri_path"] = "pub";
    conf["path"] = "/somewhere";
    conf["max_connection"] = 3;
    return conf;
}

std::string Cipher(const std::string& plain) {
    char text[4096];
    EXPECT_TRUE(SzEncrypt(plain.c_str(), text, sizeof text));
    return text;
}

class VfsServerJson : public profiles::ProfileTest {
  protected:
    void SetUp() override {
        ProfileTest::SetUp();
        fake_location::Reset();
        soup_seam::Reset();
    }
    void TearDown() override { soup_seam::Reset(); }

    void Load(const Json::Value& conf, bool decrypt = false) {
        ASSERT_TRUE(server.Load(kUser, VFS_CONFIG_SERVER, conf, decrypt, false));
        ResetError();
        seams::Reset();
    }
    bool Create(VFS_CONFIG_MODE mode, bool encrypt) {
        return server.CreateJsonObj(kUser, mode, out, encrypt);
    }
    static void Connected(const Json::Value& connection) {
        Json::Value servers;
        servers[kId] = connection;
        profiles::Put(VFS_CONFIG_CONNECT, servers);
    }

    VFSServer server;
    Json::Value out;
};

TEST_F(VfsServerJson, ObjectHoldsTheProfileAndNothingElse) {
    Load(Profile());
    out["left over"] = 1;
    ASSERT_TRUE(Create(VFS_CONFIG_SERVER, false));
    Json::Value wanted = Profile();
    wanted["path"] = "";
    wanted["uri_path"] = "";
    EXPECT_EQ(json::toString(out), json::toString(wanted));
}

TEST_F(VfsServerJson, PasswordIsEncipheredOnRequestAndPlainWithout) {
    Load(Profile());
    ASSERT_TRUE(Create(VFS_CONFIG_SERVER, false));
    EXPECT_EQ(out["password"], "secret");
    ASSERT_TRUE(Create(VFS_CONFIG_SERVER, true));
    EXPECT_NE(out["password"], "secret");
    char plain[4097];
    ASSERT_TRUE(SzDecrypt(out["password"].asCString(), plain, sizeof plain));
    EXPECT_STREQ(plain, "secret");
}

TEST_F(VfsServerJson, PasswordWhoseCipherIsTooLongCannotBeStored) {
    Json::Value conf = Profile();
    conf["password"] = std::string(5000, 'p');
    Load(conf);
    EXPECT_FALSE(Create(VFS_CONFIG_SERVER, true));
    EXPECT_EQ(GetError(), VFS_ERR_UNKNOWN);
    EXPECT_TRUE(seams::LoggedPart("SzEncrypt failed, zyroerr=[0x2A00 ")) << seams::LogDump();
    EXPECT_TRUE(Create(VFS_CONFIG_SERVER, false));
    EXPECT_EQ(out["password"].asString().size(), 5000U);
}

TEST_F(VfsServerJson, WithoutAnIdThereIsNoObject) {
    Load(Profile());
    soup_seam::fail_new_after = 0;
    EXPECT_FALSE(Create(VFS_CONFIG_SERVER, false));
    EXPECT_EQ(GetError(), VFS_ERR_INVALID_SERVER);
    EXPECT_TRUE(seams::Logged("Failed to get server ID"));
}

// --- saved profiles -----------------------------------------------------------------------------

TEST_F(VfsServerJson, SavedProfileTakesItsRemotePathFromTheLiveConnection) {
    Json::Value connection = Profile();
    connection["uri_path"] = "home/amy";
    Connected(connection);
    Load(Profile());
    ASSERT_TRUE(Create(VFS_CONFIG_SERVER, false));
    EXPECT_EQ(out["uri_path"], "home/amy");
    _tag_VFS_CONFIG_INFO_ info;
    server.DumpToStruct(kUser, VFS_CONFIG_SERVER, info);
    EXPECT_EQ(info.uri_path, "home/amy");
    EXPECT_TRUE(seams::LogLines().empty()) << seams::LogDump();
}

TEST_F(VfsServerJson, SavedProfileWithoutALiveConnectionLosesItsRemotePath) {
    Load(Profile());
    ASSERT_TRUE(Create(VFS_CONFIG_SERVER, false));
    EXPECT_EQ(out["uri_path"], "");
    EXPECT_TRUE(seams::Logged("Wrong parameters, sftp://amy@nas.example:2222, 1234"))
        << seams::LogDump();
    _tag_VFS_CONFIG_INFO_ info;
    server.DumpToStruct(kUser, VFS_CONFIG_SERVER, info);
    EXPECT_EQ(info.uri_path, "");
}

TEST_F(VfsServerJson, LiveConnectionWithoutARemotePathGivesNone) {
    Connected(Json::Value(Json::objectValue));
    Load(Profile());
    ASSERT_TRUE(Create(VFS_CONFIG_SERVER, false));
    EXPECT_EQ(out["uri_path"], "");
}

TEST_F(VfsServerJson, DamagedLiveConnectionIsNoCrash) {
    Json::Value wrong = Profile();
    wrong["uri_path"] = Json::Value(Json::objectValue);
    for (const Json::Value& connection : {wrong, Json::Value("text"), Json::Value(7)}) {
        Connected(connection);
        Load(Profile());
        EXPECT_NO_THROW(EXPECT_FALSE(Create(VFS_CONFIG_SERVER, false)));
        EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM);
        EXPECT_TRUE(seams::LoggedPart("Wrong JSON value"));
    }
}

// --- live connections ---------------------------------------------------------------------------

TEST_F(VfsServerJson, ConnectionTakesBothPathsFromTheMount) {
    fake_location::rules.path = [](const std::string&) { return "/var/tmp/user/1234/gvfs/x/pub"; };
    Load(Profile());
    ASSERT_TRUE(Create(VFS_CONFIG_CONNECT, false)) << seams::LogDump();
    EXPECT_EQ(out["path"], "/var/tmp/user/1234/gvfs/x/pub");
    EXPECT_EQ(out["uri_path"], "pub");
    EXPECT_EQ(fake_location::Calls(),
              std::vector<std::string>{std::string("path ") + kId + "/pub"});
}

TEST_F(VfsServerJson, ConnectionWithoutARemotePathGetsNone) {
    fake_location::rules.path = [](const std::string&) { return "/var/tmp/user/1234/gvfs/x"; };
    Json::Value conf = Profile();
    conf["uri_path"] = "";
    Load(conf);
    ASSERT_TRUE(Create(VFS_CONFIG_CONNECT, false));
    EXPECT_EQ(out["path"], "/var/tmp/user/1234/gvfs/x");
    EXPECT_EQ(out["uri_path"], "");
}

TEST_F(VfsServerJson, RemotePathOfAConnectionIsInItsCodepage) {
    fake_location::rules.path = [](const std::string&) { return "/fuse/x"; };
    Json::Value conf = Profile();
    conf["codepage"] = "ISO-8859-1";
    conf["uri_path"] = "caf\xc3\xa9";
    Load(conf);
    ASSERT_TRUE(Create(VFS_CONFIG_CONNECT, false));
    EXPECT_EQ(out["uri_path"], "caf\xe9");
}

TEST_F(VfsServerJson, MountWithoutALocalPathFailsWithTheCodeThatIsTriedAgain) {
    Load(Profile());
    EXPECT_FALSE(Create(VFS_CONFIG_CONNECT, true));
    EXPECT_EQ(GetError(), VFS_ERR_FAILED);
    EXPECT_TRUE(seams::Logged("Failed to get the path by sftp://amy@nas.example:2222, uid 1234"))
        << seams::LogDump();
}

TEST_F(VfsServerJson, KilledLookupFailsWithTheCodeThatIsTriedAgain) {
    fake_location::rules.deadly = SIGKILL;
    Load(Profile());
    EXPECT_FALSE(Create(VFS_CONFIG_CONNECT, true));
    EXPECT_EQ(GetError(), VFS_ERR_FAILED);
}

// --- credentials --------------------------------------------------------------------------------

TEST_F(VfsServerJson, LoadDeciphersOnRequest) {
    Json::Value conf = Profile();
    conf["password"] = Cipher("other secret");
    Load(conf, true);
    ASSERT_TRUE(Create(VFS_CONFIG_SERVER, false));
    EXPECT_EQ(out["password"], "other secret");
}

TEST_F(VfsServerJson, PasswordThatDoesNotDecipherStaysAsItStands) {
    ASSERT_TRUE(server.Load(kUser, VFS_CONFIG_SERVER, Profile(), true, false));
    EXPECT_TRUE(seams::LoggedPart("SzDecrypt failed, zyroerr=[0x3E00 ")) << seams::LogDump();
    ASSERT_TRUE(Create(VFS_CONFIG_SERVER, false));
    EXPECT_EQ(out["password"], "secret");
}

TEST_F(VfsServerJson, DecryptCredentialsReplacesThePassword) {
    Json::Value conf;
    conf["password"] = Cipher("secret");
    ASSERT_TRUE(server.DecryptCredentials(kUser, VFS_CONFIG_SERVER, conf));
    EXPECT_EQ(conf["password"], "secret");
}

TEST_F(VfsServerJson, DecryptCredentialsWithoutAPasswordIsFine) {
    Json::Value conf(Json::objectValue);
    EXPECT_TRUE(server.DecryptCredentials(kUser, VFS_CONFIG_SERVER, conf));
    EXPECT_FALSE(conf.isMember("password"));
}

TEST_F(VfsServerJson, DecryptCredentialsOfWrongValuesFails) {
    for (const Json::Value& value :
         {Json::Value("plain"), Json::Value(""), Json::Value(7), Json::Value(),
          Json::Value(Json::objectValue), Json::Value(std::string(1 << 20, 'x'))}) {
        Json::Value conf;
        conf["password"] = value;
        ResetError();
        EXPECT_NO_THROW(EXPECT_FALSE(server.DecryptCredentials(kUser, VFS_CONFIG_SERVER, conf)));
        EXPECT_EQ(GetError(), VFS_ERR_FAILED);
        EXPECT_EQ(conf["password"], value);
    }
}

TEST_F(VfsServerJson, RemoveCredentialsTakesThePasswordAway) {
    Json::Value conf = Profile();
    EXPECT_TRUE(server.RemoveCredentials(kUser, VFS_CONFIG_SERVER, conf));
    EXPECT_FALSE(conf.isMember("password"));
    EXPECT_EQ(conf["account"], "amy");
    EXPECT_TRUE(server.RemoveCredentials(kUser, VFS_CONFIG_SERVER, conf));
    Json::Value text("text");
    EXPECT_TRUE(server.RemoveCredentials(kUser, VFS_CONFIG_SERVER, text));
}

}  // namespace
}  // namespace ZYROVFS::Server
