#include "server/server_base.h"

#include <gtest/gtest.h>

#include "support/fake_server.h"
#include "support/profiles.h"

namespace ZYROVFS::Server {
namespace {

using profiles::kUser;

class ServerBaseTest : public profiles::ProfileTest {
  protected:
    void SetUp() override {
        ProfileTest::SetUp();
        Json::Value conf;
        conf["protocol"] = "ftp";
        conf["hostname"] = "nas";
        conf["alias"] = "mine";
        ASSERT_TRUE(server_.Load(kUser, VFS_CONFIG_SERVER, conf, false, false));
    }

    static void PutConnection(const Json::Value& record) {
        Json::Value servers;
        servers["ftp://nas"] = record;
        profiles::Put(VFS_CONFIG_CONNECT, servers);
    }

    fake::Scope fakes_;
    fake::FakeServer server_;
};

Json::Value RecordWithPath(const Json::Value& path) {
    Json::Value record;
    record["path"] = path;
    return record;
}

TEST_F(ServerBaseTest, AliasOf255BytesPassesAndOf256Fails) {
    EXPECT_TRUE(server_.IsAliasValid(""));
    EXPECT_TRUE(server_.IsAliasValid(std::string(255, 'a').c_str()));
    EXPECT_FALSE(server_.IsAliasValid(std::string(256, 'a').c_str()));
    std::string umlauts;
    for (int i = 0; i < 128; ++i) {
        umlauts += "\xc3\xa4";
    }
    EXPECT_FALSE(server_.IsAliasValid(umlauts.c_str())) << "bytes count, not characters";
}

TEST_F(ServerBaseTest, ConnectedWhileItsRecordAndItsLocalPathStand) {
    profiles::PutText("/var/tmp/mounted/here", "");
    PutConnection(RecordWithPath("/var/tmp/mounted"));
    EXPECT_EQ(server_.GetConnectStatus(kUser), 1);
}

TEST_F(ServerBaseTest, NotConnectedWhenThePathHasGoneButTheRecordStands) {
    PutConnection(RecordWithPath("/var/tmp/mounted-no-more"));
    EXPECT_EQ(server_.GetConnectStatus(kUser), 0);
}

TEST_F(ServerBaseTest, NotConnectedWithoutARecord) {
    EXPECT_EQ(server_.GetConnectStatus(kUser), 0);
    EXPECT_EQ(GetError(), VFS_ERR_CONFIG_NOT_FOUND);
}

TEST_F(ServerBaseTest, SavedProfileOfTheSameIdPlaysNoPart) {
    Json::Value servers;
    servers["ftp://nas"] = RecordWithPath("/tmp");
    profiles::Put(VFS_CONFIG_SERVER, servers);
    EXPECT_EQ(server_.GetConnectStatus(kUser), 0);
}

TEST_F(ServerBaseTest, RecordOfAWrongShapeIsNotConnected) {
    for (const Json::Value& path : {Json::Value(), Json::Value(5), Json::Value(Json::arrayValue),
                                    Json::Value(Json::objectValue), Json::Value("")}) {
        PutConnection(RecordWithPath(path));
        EXPECT_EQ(server_.GetConnectStatus(kUser), 0) << path;
    }
    for (const Json::Value& record : {Json::Value("/tmp"), Json::Value(Json::arrayValue),
                                      Json::Value(true), Json::Value(Json::objectValue)}) {
        PutConnection(record);
        EXPECT_EQ(server_.GetConnectStatus(kUser), 0) << record;
    }
}

TEST_F(ServerBaseTest, NotConnectedWithoutAnId) {
    PutConnection(RecordWithPath("/tmp"));
    EXPECT_EQ(server_.GetConnectStatus(kUser), 1);
    fake::Fail("GetServerID", {VFS_ERR_INVALID_SERVER});
    EXPECT_EQ(server_.GetConnectStatus(kUser), 0);
}

}  // namespace
}  // namespace ZYROVFS::Server
