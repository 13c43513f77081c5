#include "server/server_cloud.h"

#include <gtest/gtest.h>
#include <zosplatform/process.h>

#include "server/server_box.h"
#include "server/server_dropbox.h"
#include "server/server_gdrive.h"
#include "server/server_mgr.h"
#include "server/server_onedrive.h"
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

class CloudProfile : public profiles::ProfileTest {
  protected:
    void SetUp() override {
        ProfileTest::SetUp();
        fake_location::Reset();
        seams::Reset();
        conf["protocol"] = "box";
        conf["alias"] = "My Box";
        conf["email"] = "amy@mail.example";
        conf["account_info"] = "{\"login\":\"amy@mail.example\"}";
        conf["client_id"] = "client";
        conf["access_token"] = "canary-access";
        conf["refresh_token"] = "canary-refresh";
        conf["expire_time"] = "1700000000";
    }
    void TearDown() override { EXPECT_FALSE(seams::LoggedPart("canary")) << seams::LogDump(); }
    bool LoadInto(ServerBase& server, bool decrypt = false) {
        ResetError();
        return server.Load(kUser, VFS_CONFIG_SERVER, conf, decrypt, false);
    }
    bool Load() { return LoadInto(box); }
    Json::Value Stored(ServerBase& server, bool encrypt = false) {
        Json::Value out;
        EXPECT_TRUE(server.CreateJsonObj(kUser, VFS_CONFIG_SERVER, out, encrypt));
        return out;
    }

    Json::Value conf;
    BoxServer box;
};

TEST_F(CloudProfile, EveryRequiredKeyIsRequired) {
    ASSERT_TRUE(Load());
    for (const char* key :
         {"protocol", "alias", "access_token", "refresh_token", "client_id", "expire_time"}) {
        SCOPED_TRACE(key);
        const Json::Value whole = conf;
        conf.removeMember(key);
        EXPECT_FALSE(Load());
        EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM);
        conf = whole;
    }
    conf.removeMember("expire_time");
    conf["expires_in"] = "3600";
    EXPECT_TRUE(Load()) << "either tells the token's end";
}

TEST_F(CloudProfile, WrongTypesAreRefusedWithoutAnException) {
    for (const std::string& key : conf.getMemberNames()) {
        SCOPED_TRACE(key);
        const Json::Value whole = conf;
        for (const Json::Value& wrong :
             {Json::Value(Json::objectValue), Json::Value(7), Json::Value(Json::arrayValue),
              Json::Value(std::string("a\0b", 3)), Json::Value("\xff")}) {
            conf[key] = wrong;
            EXPECT_NO_THROW(EXPECT_FALSE(Load())) << wrong;
            EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM);
        }
        conf = whole;
    }
    conf = "text";
    EXPECT_NO_THROW(EXPECT_FALSE(Load()));
}

TEST_F(CloudProfile, AliasHasAtMost255Bytes) {
    conf["alias"] = std::string(255, 'a');
    EXPECT_TRUE(Load());
    conf["alias"] = std::string(256, 'a');
    EXPECT_FALSE(Load());
    EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM);
}

TEST_F(CloudProfile, EmptyAliasIsStoredAsTheEmail) {
    conf["alias"] = "";
    ASSERT_TRUE(Load());
    EXPECT_EQ(Stored(box)["alias"], "amy@mail.example");
}

TEST_F(CloudProfile, WithoutRefreshTokenItIsStoredAsEmptyTextWhereTheServiceHasNone) {
    conf.removeMember("refresh_token");
    conf.removeMember("expire_time");
    DropboxServer dropbox;
    ASSERT_TRUE(LoadInto(dropbox));
    const Json::Value stored = Stored(dropbox, true);
    EXPECT_EQ(stored["refresh_token"], "");
    EXPECT_EQ(stored["expire_time"], "");
    conf = stored;
    ASSERT_TRUE(LoadInto(dropbox, true));
    EXPECT_EQ(Stored(dropbox)["access_token"], "canary-access");
    EXPECT_EQ(Stored(dropbox)["refresh_token"], "");
    EXPECT_TRUE(seams::LogLines().empty()) << seams::LogDump();
}

TEST_F(CloudProfile, WithBothEndsGivenBoxComputesAndTheOthersKeepTheStored) {
    conf["expires_in"] = "3600";
    const time_t now = time(nullptr);
    ASSERT_TRUE(Load());
    EXPECT_NEAR(std::stoll(Stored(box)["expire_time"].asString()), now + 3600, 60);
    const Json::Value both = conf;
    DropboxServer dropbox;
    GDriveServer google;
    OneDriveServer onedrive;
    for (CloudServer* other : std::vector<CloudServer*>{&dropbox, &google, &onedrive}) {
        conf = both;
        ASSERT_TRUE(LoadInto(*other));
        EXPECT_EQ(Stored(*other)["expire_time"], "1700000000");
        conf.removeMember("expire_time");
        ASSERT_TRUE(LoadInto(*other));
        EXPECT_NEAR(std::stoll(Stored(*other)["expire_time"].asString()), now + 3600, 60);
    }
}

TEST_F(CloudProfile, LifeOfATokenIsReadAsFarAsItIsANumber) {
    const time_t now = time(nullptr);
    for (const auto& [text, seconds] : std::vector<std::pair<const char*, long long>>{
             {"60", 60}, {"60 seconds", 60}, {"soon", 0}, {"", 0}, {"-60", -60}}) {
        conf["expires_in"] = text;
        ASSERT_TRUE(Load());
        EXPECT_NEAR(std::stoll(Stored(box)["expire_time"].asString()), now + seconds, 30) << text;
    }
    conf["expires_in"] = "99999999999999999999999";
    ASSERT_TRUE(Load());
    EXPECT_EQ(Stored(box)["expire_time"], "9223372036854775807");
    EXPECT_FALSE(Stored(box).isMember("expires_in"));
}

TEST_F(CloudProfile, OfflineWithoutAStoredEmailTheIdIsTheBareScheme) {
    conf.removeMember("email");
    conf.removeMember("account_info");
    ASSERT_TRUE(Load());
    std::string id;
    EXPECT_TRUE(box.GetServerID(id));
    EXPECT_EQ(id, "box://");
    EXPECT_EQ(Stored(box)["account_info"], "");
}

TEST_F(CloudProfile, StoredObjectHasExactlyItsKeys) {
    ASSERT_TRUE(Load());
    conf["path"] = "";
    EXPECT_EQ(Stored(box), conf);
}

TEST_F(CloudProfile, TokensAreStoredEncipheredAndComeBack) {
    ASSERT_TRUE(Load());
    conf = Stored(box, true);
    EXPECT_EQ(conf["access_token"].asString().find("canary"), std::string::npos);
    EXPECT_EQ(conf["refresh_token"].asString().find("canary"), std::string::npos);
    ASSERT_TRUE(LoadInto(box, true));
    EXPECT_EQ(Stored(box)["access_token"], "canary-access");
    EXPECT_EQ(Stored(box)["refresh_token"], "canary-refresh");
}

TEST_F(CloudProfile, TokenThatDoesNotFitEncipheredIsAFailure) {
    conf["refresh_token"] = std::string(4096, 't');
    ASSERT_TRUE(Load());
    Json::Value out;
    EXPECT_FALSE(box.CreateJsonObj(kUser, VFS_CONFIG_SERVER, out, true));
    EXPECT_EQ(GetError(), VFS_ERR_UNKNOWN);
    EXPECT_TRUE(seams::LoggedPart("SzEncrypt failed, zyroerr=[0x"));
}

TEST_F(CloudProfile, AccessTokenThatDoesNotDecipherLeavesTheOtherAsItWas) {
    ASSERT_TRUE(Load());
    Json::Value stored = Stored(box, true);
    const Json::Value whole = stored;
    stored["access_token"] = "plain";
    EXPECT_FALSE(box.DecryptCredentials(kUser, VFS_CONFIG_SERVER, stored));
    EXPECT_EQ(GetError(), VFS_ERR_FAILED);
    EXPECT_TRUE(seams::LoggedPart("SzDecrypt failed, zyroerr=[0x"));
    EXPECT_EQ(stored["refresh_token"], whole["refresh_token"]);
    conf = stored;
    EXPECT_TRUE(LoadInto(box, true)) << "taking a profile in does not look at it";
}

TEST_F(CloudProfile, CredentialsAreRemovedWhereTheyAre) {
    Json::Value object = conf;
    EXPECT_TRUE(box.RemoveCredentials(kUser, VFS_CONFIG_SERVER, object));
    EXPECT_FALSE(object.isMember("access_token"));
    EXPECT_FALSE(object.isMember("refresh_token"));
    EXPECT_EQ(object.size(), conf.size() - 2);
    EXPECT_TRUE(box.RemoveCredentials(kUser, VFS_CONFIG_SERVER, object));
}

TEST_F(CloudProfile, MountHandsTheTokensOverAsOneDocument) {
    scripted::TheScript().on_mount = [](GMountOperation* operation) {
        fake_location::PlayMount(operation);
        scripted::AskPassword(operation, "Password", G_ASK_PASSWORD_NEED_PASSWORD);
    };
    ASSERT_TRUE(Load());
    ASSERT_TRUE(box.Mount(kUser, VFS_CONFIG_CONNECT, conf, false)) << seams::LogDump();
    EXPECT_EQ(fake_location::Calls(), Calls{"mount box://amy@mail.example"});
    Json::Value handed;
    ASSERT_TRUE(json::fromString(handed, scripted::TheSeen().password));
    EXPECT_EQ(handed.size(), 4U);
    for (const char* key : {"access_token", "refresh_token", "expire_time", "account_info"}) {
        EXPECT_EQ(handed[key], conf[key]) << key;
    }
    EXPECT_TRUE(seams::Logged("not support VFS in DZOS")) << "the chain was to be prepared";
}

TEST_F(CloudProfile, FailedMountKeepsItsCode) {
    fake_location::rules.mount = [](const std::string&) { return G_IO_ERROR_CONNECTION_REFUSED; };
    ASSERT_TRUE(Load());
    EXPECT_FALSE(box.Mount(kUser, VFS_CONFIG_CONNECT, conf, false));
    EXPECT_EQ(GetError(), VFS_ERR_UNAUTHORIZED);
}

TEST_F(CloudProfile, UnmountsTheId) {
    ASSERT_TRUE(Load());
    EXPECT_TRUE(box.Unmount(kUser, VFS_CONFIG_CONNECT));
    EXPECT_EQ(fake_location::Calls(), Calls{"find box://amy@mail.example"});
}

TEST_F(CloudProfile, ConnectionAsksForAPathThatIsNotKnown) {
    fake_location::rules.path = [](const std::string&) { return "/fuse/y"; };
    ASSERT_TRUE(Load());
    Json::Value out;
    ASSERT_TRUE(box.CreateJsonObj(kUser, VFS_CONFIG_CONNECT, out, true));
    EXPECT_EQ(out["path"], "/fuse/y");
    fake_location::rules.path = nullptr;
    EXPECT_FALSE(box.CreateJsonObj(kUser, VFS_CONFIG_CONNECT, out, true));
    EXPECT_EQ(GetError(), VFS_ERR_FAILED);
    EXPECT_TRUE(seams::Logged("Failed to get the path by box://amy@mail.example, uid 1234"));
    conf["path"] = "/fuse/x";
    ASSERT_TRUE(Load());
    ASSERT_TRUE(box.CreateJsonObj(kUser, VFS_CONFIG_CONNECT, out, true));
    EXPECT_EQ(out["path"], "/fuse/x");
}

TEST_F(CloudProfile, DumpShowsTheAccount) {
    ASSERT_TRUE(Load());
    _tag_VFS_CONFIG_INFO_ info;
    info.port = 7;
    ASSERT_TRUE(box.DumpToStruct(kUser, VFS_CONFIG_CONNECT, info));
    EXPECT_EQ(info.protocol, "box");
    EXPECT_EQ(info.port, 0U);
    EXPECT_EQ(info.hostname, "box://amy@mail.example");
    EXPECT_EQ(info.uri, "box://amy@mail.example");
    EXPECT_EQ(info.alias, "My Box");
    EXPECT_EQ(info.account, "amy@mail.example");
    EXPECT_EQ(info.connect_status, 0);
}

TEST_F(CloudProfile, SetNeverUnmountsWhateverItChanges) {
    Json::Value servers;
    conf["path"] = "/fuse/x";
    ASSERT_TRUE(Load());
    servers["box://amy@mail.example"] = Stored(box, true);
    servers["box://amy@mail.example"]["path"] = "/fuse/x";
    profiles::Put(VFS_CONFIG_CONNECT, servers);
    Json::Value changes;
    changes["alias"] = "Other";
    changes["access_token"] = "canary-new";
    changes["client_id"] = "other";
    std::string id = "box://amy@mail.example";
    ASSERT_TRUE(Set(kUser, VFS_CONFIG_CONNECT, id, changes, false)) << seams::LogDump();
    EXPECT_TRUE(fake_location::Calls().empty());
    const Json::Value stored = profiles::Stored(VFS_CONFIG_CONNECT)["box://amy@mail.example"];
    EXPECT_EQ(stored["alias"], "Other");
    EXPECT_EQ(stored["path"], "/fuse/x");
}

}  // namespace
}  // namespace ZYROVFS::Server
