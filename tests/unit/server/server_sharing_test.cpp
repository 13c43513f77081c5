#include "server/server_sharing.h"

#include <gtest/gtest.h>
#include <zosplatform/process.h>

#include "server/server_mgr.h"
#include "support/fake_location.h"
#include "support/profiles.h"
#include "support/seams.h"
#include "zyrovfs/protocol.h"

extern "C" int ZYRODZOSIsPrivilegedMode(void) {
    return 0;
}

namespace ZYROVFS::Server {
namespace {

using profiles::kUser;
using Calls = std::vector<std::string>;

class Sharing : public profiles::ProfileTest {
  protected:
    void SetUp() override {
        ProfileTest::SetUp();
        fake_location::Reset();
        conf["protocol"] = "sharing";
        conf["alias"] = "Shared";
        conf["email"] = "amy@corp@mail.example";
    }
    bool Load(const Json::Value& profile) {
        ResetError();
        return server.Load(kUser, VFS_CONFIG_CONNECT, profile, true, true);
    }
    void ExpectRefused(const Json::Value& profile) {
        EXPECT_NO_THROW(EXPECT_FALSE(Load(profile)));
        EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM);
    }
    bool Create(VFS_CONFIG_MODE mode) { return server.CreateJsonObj(kUser, mode, out, true); }

    Json::Value conf;
    Json::Value out;
    SharingServer server;
};

TEST_F(Sharing, EveryRequiredKeyIsRequired) {
    ASSERT_TRUE(Load(conf));
    for (const std::string& key : conf.getMemberNames()) {
        Json::Value profile = conf;
        profile.removeMember(key);
        SCOPED_TRACE(key);
        ExpectRefused(profile);
        profile[key] = Json::Value(Json::objectValue);
        ExpectRefused(profile);
        profile[key] = 7;
        ExpectRefused(profile);
        profile[key] = std::string("a\0b", 3);
        ExpectRefused(profile);
        profile[key] = "\xff";
        ExpectRefused(profile);
    }
    conf["path"] = 7;
    ExpectRefused(conf);
    ExpectRefused(Json::Value("text"));
}

TEST_F(Sharing, AliasOfAnyLengthIsAccepted) {
    conf["alias"] = std::string(1 << 20, 'a');
    ASSERT_TRUE(Load(conf));
    ASSERT_TRUE(Create(VFS_CONFIG_SERVER));
    EXPECT_EQ(out["alias"].asString().size(), size_t{1} << 20);
}

TEST_F(Sharing, IdAndUriAreTheEmail) {
    ASSERT_TRUE(Load(conf));
    std::string id;
    std::string uri;
    EXPECT_TRUE(server.GetServerID(id));
    EXPECT_TRUE(server.GetURI(uri));
    EXPECT_EQ(id, "sharing://amy@corp@mail.example");
    EXPECT_EQ(uri, id);
}

TEST_F(Sharing, AccountNameEndsAtTheLastAtSign) {
    std::string name;
    ASSERT_TRUE(Load(conf));
    EXPECT_TRUE(server.GetAccountName(name));
    EXPECT_EQ(name, "amy@corp");
    conf["email"] = "amy";
    ASSERT_TRUE(Load(conf));
    EXPECT_TRUE(server.GetAccountName(name));
    EXPECT_EQ(name, "amy");
}

TEST_F(Sharing, EmptyAliasIsStoredAsTheEmail) {
    conf["alias"] = "";
    ASSERT_TRUE(Load(conf));
    ASSERT_TRUE(Create(VFS_CONFIG_SERVER));
    EXPECT_EQ(out["alias"], "amy@corp@mail.example");
}

TEST_F(Sharing, SavedObjectHoldsNoPath) {
    conf["path"] = "/fuse/x";
    ASSERT_TRUE(Load(conf));
    ASSERT_TRUE(Create(VFS_CONFIG_SERVER));
    conf["path"] = "";
    EXPECT_EQ(json::toString(out), json::toString(conf));
    EXPECT_TRUE(fake_location::Calls().empty());
}

TEST_F(Sharing, ConnectionKeepsAPathThatIsKnown) {
    conf["path"] = "/fuse/x";
    ASSERT_TRUE(Load(conf));
    ASSERT_TRUE(Create(VFS_CONFIG_CONNECT));
    EXPECT_EQ(out["path"], "/fuse/x");
    EXPECT_TRUE(fake_location::Calls().empty());
}

TEST_F(Sharing, ConnectionAsksForAPathThatIsNotKnown) {
    fake_location::rules.path = [](const std::string&) { return "/fuse/y"; };
    ASSERT_TRUE(Load(conf));
    ASSERT_TRUE(Create(VFS_CONFIG_CONNECT));
    EXPECT_EQ(out["path"], "/fuse/y");
    EXPECT_EQ(fake_location::Calls(), Calls{"path sharing://amy%40corp@mail.example"});
}

TEST_F(Sharing, ConnectionWithoutAPathFails) {
    ASSERT_TRUE(Load(conf));
    EXPECT_FALSE(Create(VFS_CONFIG_CONNECT));
    EXPECT_EQ(GetError(), VFS_ERR_FAILED);
    EXPECT_TRUE(
        seams::Logged("Failed to get the path by sharing://amy@corp@mail.example, uid 1234"))
        << seams::LogDump();
}

TEST_F(Sharing, MountsTheAccountWithoutAPassword) {
    conf["email"] = "amy@mail.example";
    ASSERT_TRUE(Load(conf));
    ASSERT_TRUE(server.Mount(kUser, VFS_CONFIG_CONNECT, conf, false)) << seams::LogDump();
    EXPECT_EQ(fake_location::Calls(), Calls{"mount sharing://amy@mail.example"});
    EXPECT_TRUE(seams::Logged("not support VFS in DZOS")) << "the chain was to be prepared";
}

TEST_F(Sharing, FailedMountKeepsItsCode) {
    fake_location::rules.mount = [](const std::string&) { return G_IO_ERROR_CONNECTION_REFUSED; };
    ASSERT_TRUE(Load(conf));
    EXPECT_FALSE(server.Mount(kUser, VFS_CONFIG_CONNECT, conf, false));
    EXPECT_EQ(GetError(), VFS_ERR_UNAUTHORIZED);
}

TEST_F(Sharing, UnmountsTheId) {
    conf["email"] = "amy@mail.example";
    ASSERT_TRUE(Load(conf));
    EXPECT_TRUE(server.Unmount(kUser, VFS_CONFIG_CONNECT));
    EXPECT_EQ(fake_location::Calls(), Calls{"find sharing://amy@mail.example"});
}

TEST_F(Sharing, DumpShowsTheAccount) {
    Json::Value servers;
    servers["sharing://amy@corp@mail.example"]["path"] = "/tmp";
    profiles::Put(VFS_CONFIG_CONNECT, servers);
    ASSERT_TRUE(Load(conf));
    _tag_VFS_CONFIG_INFO_ info;
    info.id = "left alone";
    info.port = 7;
    info.codepage = "left over";
    info.uri_path = "left over";
    info.max_connection = 9;
    ASSERT_TRUE(server.DumpToStruct(kUser, VFS_CONFIG_CONNECT, info));
    EXPECT_EQ(info.id, "left alone");
    EXPECT_EQ(info.protocol, "sharing");
    EXPECT_EQ(info.port, 0U);
    EXPECT_EQ(info.hostname, "sharing://amy@corp@mail.example");
    EXPECT_EQ(info.uri, "sharing://amy@corp@mail.example");
    EXPECT_EQ(info.alias, "Shared");
    EXPECT_EQ(info.account, "amy@corp@mail.example");
    EXPECT_EQ(info.codepage, "");
    EXPECT_EQ(info.uri_path, "");
    EXPECT_EQ(info.connect_status, 1);
    EXPECT_EQ(info.max_connection, 9U);
}

TEST_F(Sharing, NothingIsSecretAndNothingIsLeftToClean) {
    ASSERT_TRUE(Load(conf));
    Json::Value object = conf;
    EXPECT_TRUE(server.DecryptCredentials(kUser, VFS_CONFIG_CONNECT, object));
    EXPECT_TRUE(server.RemoveCredentials(kUser, VFS_CONFIG_CONNECT, object));
    EXPECT_EQ(object, conf);
    EXPECT_TRUE(server.DeletePostProcess(kUser, VFS_CONFIG_CONNECT));
    conf["email"] = "other";
    EXPECT_FALSE(server.IsUpdateNeedsRemount(kUser, VFS_CONFIG_CONNECT, conf));
}

TEST_F(Sharing, GetWithoutCredentialsGivesTheSameObjectAsWith) {
    profiles::PutText("/usr/share/gvfs/mounts/sharing.mount",
                      "[Mount]\nProtocol=sharing\nName=Shared links\nActions=list\n");
    Json::Value servers;
    servers["sharing://amy@corp@mail.example"] = conf;
    profiles::Put(VFS_CONFIG_SERVER, servers);
    Json::Value with;
    Json::Value without;
    ASSERT_TRUE(
        Get(kUser, VFS_CONFIG_SERVER, "sharing://amy@corp@mail.example", true, false, with));
    ASSERT_TRUE(
        Get(kUser, VFS_CONFIG_SERVER, "sharing://amy@corp@mail.example", false, false, without));
    EXPECT_EQ(json::toString(with), json::toString(without));
    EXPECT_EQ(with["email"], "amy@corp@mail.example");
}

TEST_F(Sharing, CatalogueAlwaysShowsAServerOfSharing) {
    profiles::PutText("/usr/share/gvfs/mounts/sharing.mount",
                      "[Mount]\nProtocol=sharing\nName=Shared links\n");
    Json::Value list;
    ASSERT_TRUE(Protocol::ListProtocolByUID(kUser, list));
    bool seen = false;
    for (const Json::Value& protocol : list) {
        if (protocol["protocol"] == "sharing") {
            seen = true;
            EXPECT_EQ(protocol["has_server"], true);
        }
    }
    EXPECT_TRUE(seen);
}

}  // namespace
}  // namespace ZYROVFS::Server
