// Add, Get, Delete, Connect and Disconnect: order, codes, log texts, and what is stored.
#include "zyrovfs/server.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <functional>

#include "support/catalogue.h"
#include "support/fake_server.h"
#include "support/profiles.h"

namespace ZYROVFS::Server {
namespace {

using profiles::kUser;
using profiles::Put;
using profiles::Stored;
using testing::ElementsAre;
using testing::IsEmpty;

const char* const kId = "ftp://amy@nas";

class ServerTest : public profiles::ProfileTest {
  protected:
    void SetUp() override {
        ProfileTest::SetUp();
        catalogue::Clear();
        catalogue::Add("ftp", "FTP", "list,read");
    }

    static Json::Value Conf() {
        Json::Value conf;
        conf["protocol"] = "ftp";
        conf["hostname"] = "nas";
        conf["account"] = "amy";
        conf["alias"] = "mine";
        conf["password"] = "secret";
        return conf;
    }

    /** As it stands in a file. */
    static Json::Value Record() {
        Json::Value record = Conf();
        record["password"] = fake::Sealed("secret");
        record["path"] = "/tmp";
        return record;
    }

    static void PutRecord(VFS_CONFIG_MODE mode, const Json::Value& record = Record()) {
        Json::Value servers;
        servers[kId] = record;
        Put(mode, servers);
    }

    bool AddConf(VFS_CONFIG_MODE mode, const Json::Value& conf, bool force = false) {
        return Add(kUser, mode, id_, conf, force, out_);
    }

    static void ExpectLog(const std::string& text) {
        EXPECT_TRUE(seams::Logged(text)) << text << "\namong\n" << seams::LogDump();
    }

    fake::Scope fakes_;
    std::string id_;
    Json::Value out_;
};

using AddTest = ServerTest;

TEST_F(AddTest, SavedProfileIsStoredWithoutAMount) {
    EXPECT_TRUE(AddConf(VFS_CONFIG_SERVER, Conf()));
    EXPECT_EQ(id_, kId);
    EXPECT_EQ(Stored(VFS_CONFIG_SERVER)[kId], out_);
    EXPECT_EQ(out_["password"], fake::Sealed("secret")) << "the caller gets the stored object";
    EXPECT_TRUE(Stored(VFS_CONFIG_CONNECT).isNull());
    EXPECT_THAT(fake::Calls("Mount"), IsEmpty());
    const fake::Call load = fake::Calls("Load")[0];
    EXPECT_FALSE(load.flag) << "credentials of a new profile are plain text";
    EXPECT_TRUE(load.online);
}

TEST_F(AddTest, ConnectionIsMountedThenStored) {
    EXPECT_TRUE(AddConf(VFS_CONFIG_CONNECT, Conf(), true));
    EXPECT_EQ(Stored(VFS_CONFIG_CONNECT)[kId], out_);
    EXPECT_EQ(out_["path"], "/tmp");
    EXPECT_TRUE(Stored(VFS_CONFIG_SERVER).isNull());
    ASSERT_EQ(fake::Calls("Mount").size(), 1U);
    EXPECT_EQ(fake::Calls("Mount")[0].conf, Conf());
    EXPECT_TRUE(fake::Calls("Mount")[0].flag);
}

TEST_F(AddTest, IdWithAProfileIsIgnoredAndOverwritten) {
    PutRecord(VFS_CONFIG_SERVER);
    Json::Value conf = Conf();
    conf["hostname"] = "other";
    id_ = kId;
    EXPECT_TRUE(AddConf(VFS_CONFIG_SERVER, conf));
    EXPECT_EQ(id_, "ftp://amy@other");
    EXPECT_FALSE(fake::Calls("Load")[0].flag);
}

TEST_F(AddTest, IdAloneConnectsTheSavedProfile) {
    PutRecord(VFS_CONFIG_SERVER);
    id_ = kId;
    EXPECT_TRUE(AddConf(VFS_CONFIG_CONNECT, Json::Value()));
    EXPECT_EQ(id_, kId);
    EXPECT_EQ(out_["path"], "/tmp") << "the connection object";
    EXPECT_EQ(out_["password"], fake::Sealed("secret")) << "deciphered once, enciphered once";
    EXPECT_EQ(Stored(VFS_CONFIG_CONNECT)[kId], out_);
    EXPECT_TRUE(fake::Calls("Load")[0].flag) << "stored credentials are enciphered";
    EXPECT_EQ(fake::Calls("Mount")[0].conf, Record());
}

TEST_F(AddTest, IdAloneThatIsNotSavedFails) {
    PutRecord(VFS_CONFIG_CONNECT);
    id_ = kId;
    EXPECT_FALSE(AddConf(VFS_CONFIG_CONNECT, Json::Value()));
    EXPECT_EQ(GetError(), VFS_ERR_FAILED);
    ExpectLog("CfgGetByID failed, uid=1234, mode=1, serverID=ftp://amy@nas, code=17");
    EXPECT_THAT(fake::Now().calls, IsEmpty());
}

TEST_F(AddTest, ConnectionThatIsRecordedCountsAsAdded) {
    Json::Value record = Record();
    record["alias"] = "recorded before";
    PutRecord(VFS_CONFIG_CONNECT, record);
    const std::string before = profiles::Text(profiles::File(VFS_CONFIG_CONNECT));
    EXPECT_TRUE(AddConf(VFS_CONFIG_CONNECT, Conf()));
    EXPECT_EQ(GetError(), VFS_ERR_CONNECT_EXISTS) << "stays in the cell";
    EXPECT_EQ(profiles::Text(profiles::File(VFS_CONFIG_CONNECT)), before);
    EXPECT_EQ(out_["alias"], "mine");
    EXPECT_EQ(fake::Calls("Mount").size(), 1U);
}

TEST_F(AddTest, SavedProfileOfATakenIdFails) {
    PutRecord(VFS_CONFIG_SERVER);
    EXPECT_FALSE(AddConf(VFS_CONFIG_SERVER, Conf()));
    EXPECT_EQ(GetError(), VFS_ERR_SERVER_EXISTS);
    ExpectLog("CfgAppend failed, uid=1234, mode=0, code=14");
    EXPECT_TRUE(out_.isNull());
}

TEST_F(AddTest, FullStoreRefusesBeforeAnythingHappens) {
    Json::Value servers;
    for (int i = 0; i < 99; ++i) {
        servers["ftp://host" + std::to_string(i)] = Conf();
    }
    Put(VFS_CONFIG_SERVER, servers);
    EXPECT_TRUE(AddConf(VFS_CONFIG_SERVER, Conf())) << "the 100th";
    Json::Value conf = Conf();
    conf["hostname"] = "one-too-many";
    fake::Now().calls.clear();
    EXPECT_FALSE(AddConf(VFS_CONFIG_SERVER, conf));
    EXPECT_EQ(GetError(), VFS_ERR_CONFIG_FULL);
    EXPECT_THAT(fake::Now().calls, IsEmpty());
    conf["protocol"] = "dav";
    EXPECT_TRUE(AddConf(VFS_CONFIG_SERVER, conf)) << "another protocol has room";
    EXPECT_TRUE(AddConf(VFS_CONFIG_CONNECT, Conf())) << "so has the other file";
}

TEST_F(AddTest, UnreadableStoreCountsAsFull) {
    profiles::PutText(profiles::File(VFS_CONFIG_SERVER), "no json");
    EXPECT_FALSE(AddConf(VFS_CONFIG_SERVER, Conf()));
    EXPECT_EQ(GetError(), VFS_ERR_CONFIG_FULL);
}

TEST_F(AddTest, CodesOfTheStepsArePassedOn) {
    fake::Fail("Load", {VFS_ERR_TOKEN_REVOKED});
    EXPECT_FALSE(AddConf(VFS_CONFIG_SERVER, Conf()));
    EXPECT_EQ(GetError(), VFS_ERR_TOKEN_REVOKED);
    ExpectLog("serverMgr load failed, code=27");

    // The second call: the first is the connect status's own.
    fake::Fail("GetServerID", {VFS_ERR_NONE, VFS_ERR_INVALID_SERVER});
    EXPECT_FALSE(AddConf(VFS_CONFIG_SERVER, Conf()));
    EXPECT_EQ(GetError(), VFS_ERR_INVALID_SERVER);
    ExpectLog("Failed to get server ID, uid=1234, mode=0, code=5");

    fake::Fail("CreateJsonObj", {VFS_ERR_FAILED});
    EXPECT_FALSE(AddConf(VFS_CONFIG_SERVER, Conf()));
    EXPECT_EQ(GetError(), VFS_ERR_FAILED);
    ExpectLog("createJsonObj failed, uid=1234, mode=0, code=3");
    EXPECT_THAT(seams::Sleeps(), IsEmpty()) << "there is no mount to recover";

    fake::Fail("Mount", {VFS_ERR_WRONG_PASSWORD});
    EXPECT_FALSE(AddConf(VFS_CONFIG_CONNECT, Conf()));
    EXPECT_EQ(GetError(), VFS_ERR_WRONG_PASSWORD);
    ExpectLog("Mount failed, uid=1234, mode=1, code=9");

    fake::Fail("CreateJsonObj", {VFS_ERR_UNKNOWN});
    EXPECT_FALSE(AddConf(VFS_CONFIG_CONNECT, Conf()));
    EXPECT_EQ(GetError(), VFS_ERR_UNKNOWN);
    ExpectLog("CreateJsonObj failed, uid=1234, mode=1, code=1");
    EXPECT_TRUE(Stored(VFS_CONFIG_SERVER).isNull());
    EXPECT_TRUE(Stored(VFS_CONFIG_CONNECT).isNull());
}

TEST_F(AddTest, SecondLostPathFailsAfterOneRecoveryOfThreeSeconds) {
    fake::Fail("CreateJsonObj", {VFS_ERR_FAILED, VFS_ERR_FAILED});
    EXPECT_FALSE(AddConf(VFS_CONFIG_CONNECT, Conf()));
    EXPECT_EQ(GetError(), VFS_ERR_FAILED);
    EXPECT_THAT(seams::Sleeps(), ElementsAre(1U, 2U));
    EXPECT_EQ(fake::Calls("Mount").size(), 2U);
    ExpectLog("CreateJsonObj failed, uid=1234, mode=1, code=3");
    EXPECT_TRUE(Stored(VFS_CONFIG_CONNECT).isNull());
}

TEST_F(AddTest, LostPathThatIsFoundAfterTheRecoveryIsAdded) {
    fake::Fail("CreateJsonObj", {VFS_ERR_FAILED});
    EXPECT_TRUE(AddConf(VFS_CONFIG_CONNECT, Conf()));
    EXPECT_EQ(Stored(VFS_CONFIG_CONNECT)[kId], out_);
}

TEST_F(AddTest, ProfileThatIsNoProfileIsABadParameter) {
    for (const Json::Value& conf :
         {Json::Value(), Json::Value("ftp"), Json::Value(1), Json::Value(true),
          Json::Value(Json::arrayValue), Json::Value(Json::objectValue)}) {
        for (const VFS_CONFIG_MODE mode : {VFS_CONFIG_SERVER, VFS_CONFIG_CONNECT}) {
            id_.clear();
            ResetError();
            EXPECT_FALSE(AddConf(mode, conf)) << conf;
            EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM) << conf;
        }
    }
    Json::Value conf = Conf();
    conf["protocol"] = Json::Value(Json::objectValue);
    EXPECT_FALSE(AddConf(VFS_CONFIG_SERVER, conf));
    EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM);
}

TEST_F(AddTest, SavedProfileThatIsNoProfileIsABadParameter) {
    for (const Json::Value& record :
         {Json::Value("text"), Json::Value(1), Json::Value(), Json::Value(Json::arrayValue)}) {
        PutRecord(VFS_CONFIG_SERVER, record);
        id_ = kId;
        EXPECT_FALSE(AddConf(VFS_CONFIG_CONNECT, Json::Value())) << record;
        EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM) << record;
    }
}

using GetTest = ServerTest;

TEST_F(GetTest, GivesThePlainProfileWithTheCataloguesWords) {
    PutRecord(VFS_CONFIG_SERVER);
    EXPECT_TRUE(Get(kUser, VFS_CONFIG_SERVER, kId, true, true, out_));
    EXPECT_EQ(out_["password"], "secret");
    EXPECT_EQ(out_["api"], "list,read");
    EXPECT_EQ(out_["protocol_name"], "FTP");
    const fake::Call load = fake::Calls("Load")[0];
    EXPECT_TRUE(load.flag && load.online);
    EXPECT_TRUE(Get(kUser, VFS_CONFIG_SERVER, kId, true, false, out_));
    EXPECT_FALSE(fake::Calls("Load")[1].online);
    EXPECT_EQ(Stored(VFS_CONFIG_SERVER)[kId], Record()) << "reading changes nothing";
}

TEST_F(GetTest, LeavesCredentialsOutUnlessAsked) {
    PutRecord(VFS_CONFIG_CONNECT);
    EXPECT_TRUE(Get(kUser, VFS_CONFIG_CONNECT, kId, false, false, out_));
    EXPECT_FALSE(out_.isMember("password"));
    EXPECT_EQ(out_["alias"], "mine");
}

TEST_F(GetTest, KeepsTheCodeOfTheStore) {
    EXPECT_FALSE(Get(kUser, VFS_CONFIG_SERVER, kId, true, false, out_));
    EXPECT_EQ(GetError(), VFS_ERR_CONFIG_NOT_FOUND);
    ExpectLog("CfgGetByID failed, uid=1234, mode=0 , serverID=ftp://amy@nas, code=17");
    profiles::PutText(profiles::File(VFS_CONFIG_SERVER), "no json");
    EXPECT_FALSE(Get(kUser, VFS_CONFIG_SERVER, kId, true, false, out_));
    EXPECT_EQ(GetError(), VFS_ERR_CONFIG_READ);
    EXPECT_FALSE(Get(kUser, VFS_CONFIG_SERVER, nullptr, true, false, out_));
    EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM);
}

TEST_F(GetTest, ProfileThatDoesNotLoadOrDescribeIsUnknown) {
    PutRecord(VFS_CONFIG_CONNECT);
    fake::Fail("Load", {VFS_ERR_UNAUTHORIZED});
    EXPECT_FALSE(Get(kUser, VFS_CONFIG_CONNECT, kId, true, false, out_));
    EXPECT_EQ(GetError(), VFS_ERR_UNKNOWN);
    ExpectLog("serverMgr load failed, uid=1234, mode=1, serverID=ftp://amy@nas, code=25");
    fake::Fail("CreateJsonObj", {VFS_ERR_FAILED});
    EXPECT_FALSE(Get(kUser, VFS_CONFIG_CONNECT, kId, true, false, out_));
    EXPECT_EQ(GetError(), VFS_ERR_UNKNOWN);
    ExpectLog("serverMgr create json obj failed, uid=1234, mode=1, serverID=ftp://amy@nas, code=3");
    EXPECT_THAT(seams::Sleeps(), IsEmpty()) << "reading recovers nothing";
}

TEST_F(GetTest, ProtocolWithoutACatalogueFileCannotBeRead) {
    PutRecord(VFS_CONFIG_SERVER);
    catalogue::Clear();
    EXPECT_FALSE(Get(kUser, VFS_CONFIG_SERVER, kId, true, false, out_));
    EXPECT_EQ(GetError(), VFS_ERR_FAILED);
    ExpectLog("Failed to get protocol ftp");
}

TEST_F(GetTest, DamagedRecordsAreUnknown) {
    for (const Json::Value& record :
         {Json::Value("text"), Json::Value(1), Json::Value(), Json::Value(Json::arrayValue)}) {
        PutRecord(VFS_CONFIG_SERVER, record);
        EXPECT_FALSE(Get(kUser, VFS_CONFIG_SERVER, kId, true, false, out_)) << record;
        EXPECT_EQ(GetError(), VFS_ERR_UNKNOWN) << record;
    }
}

using DeleteTest = ServerTest;

TEST_F(DeleteTest, RemovesTheRecordThenTakesTheMountDown) {
    for (const VFS_CONFIG_MODE mode : {VFS_CONFIG_SERVER, VFS_CONFIG_CONNECT}) {
        PutRecord(VFS_CONFIG_SERVER);
        PutRecord(VFS_CONFIG_CONNECT);
        fake::Now().calls.clear();
        EXPECT_TRUE(Delete(kUser, mode, kId));
        EXPECT_FALSE(Stored(mode).isMember(kId));
        const VFS_CONFIG_MODE other =
            mode == VFS_CONFIG_SERVER ? VFS_CONFIG_CONNECT : VFS_CONFIG_SERVER;
        EXPECT_TRUE(Stored(other).isMember(kId)) << "one file at a time";
        ASSERT_EQ(fake::Calls("Unmount").size(), 1U) << "a saved profile's connection, too";
        EXPECT_EQ(fake::Calls("Unmount")[0].mode, mode);
        ASSERT_EQ(fake::Calls("DeletePostProcess").size(), 1U);
        EXPECT_EQ(fake::Calls("DeletePostProcess")[0].mode, mode);
        EXPECT_EQ(fake::Now().calls.back().operation, "DeletePostProcess");
        const fake::Call load = fake::Calls("Load")[0];
        EXPECT_TRUE(load.flag && !load.online);
    }
}

TEST_F(DeleteTest, OfAnAbsentIdChangesNothingAndSucceeds) {
    PutRecord(VFS_CONFIG_SERVER);
    const std::string before = profiles::Text(profiles::File(VFS_CONFIG_SERVER));
    EXPECT_TRUE(Delete(kUser, VFS_CONFIG_SERVER, "ftp://other"));
    EXPECT_EQ(GetError(), VFS_ERR_CONFIG_NOT_FOUND) << "stays in the cell";
    EXPECT_EQ(profiles::Text(profiles::File(VFS_CONFIG_SERVER)), before);
    EXPECT_THAT(fake::Now().calls, IsEmpty());
}

TEST_F(DeleteTest, NullIdIsABadParameter) {
    EXPECT_FALSE(Delete(kUser, VFS_CONFIG_SERVER, nullptr));
    EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM);
}

TEST_F(DeleteTest, UnreadableStoreIsNoAbsentProfile) {
    profiles::PutText(profiles::File(VFS_CONFIG_SERVER), "no json");
    EXPECT_FALSE(Delete(kUser, VFS_CONFIG_SERVER, kId));
    EXPECT_EQ(GetError(), VFS_ERR_CONFIG_READ);
}

TEST_F(DeleteTest, ProfileThatDoesNotLoadIsGoneAndReported) {
    PutRecord(VFS_CONFIG_CONNECT);
    fake::Fail("Load", {VFS_ERR_UNKNOWN});
    EXPECT_FALSE(Delete(kUser, VFS_CONFIG_CONNECT, kId));
    EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM);
    ExpectLog("serverMgr load failed, uid=1234, mode=1, serverID=ftp://amy@nas, code=1");
    EXPECT_FALSE(Stored(VFS_CONFIG_CONNECT).isMember(kId));
    EXPECT_THAT(fake::Calls("Unmount"), IsEmpty());
}

TEST_F(DeleteTest, FailedUnmountAndCleanUpDoNotFailIt) {
    PutRecord(VFS_CONFIG_CONNECT);
    fake::Fail("Unmount", {VFS_ERR_BUSY});
    fake::Fail("DeletePostProcess", {VFS_ERR_INVALID_SERVER});
    EXPECT_TRUE(Delete(kUser, VFS_CONFIG_CONNECT, kId));
    ExpectLog("Server mgr delete failed, uid=1234, mode=1, serverID=ftp://amy@nas, code=5");
}

TEST_F(DeleteTest, DamagedRecordsAreRemoved) {
    for (const Json::Value& record :
         {Json::Value("text"), Json::Value(1), Json::Value(), Json::Value(Json::arrayValue)}) {
        PutRecord(VFS_CONFIG_SERVER, record);
        EXPECT_FALSE(Delete(kUser, VFS_CONFIG_SERVER, kId)) << record;
        EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM) << record;
        EXPECT_FALSE(Stored(VFS_CONFIG_SERVER).isMember(kId)) << record;
    }
}

using ConnectTest = ServerTest;

TEST_F(ConnectTest, MountsTheRecordAndLeavesItAlone) {
    PutRecord(VFS_CONFIG_CONNECT);
    const std::string before = profiles::Text(profiles::File(VFS_CONFIG_CONNECT));
    EXPECT_TRUE(Connect(kUser, kId, true));
    const fake::Call mount = fake::Calls("Mount")[0];
    EXPECT_EQ(mount.mode, VFS_CONFIG_CONNECT);
    EXPECT_EQ(mount.conf, Record());
    EXPECT_TRUE(mount.flag);
    const fake::Call load = fake::Calls("Load")[0];
    EXPECT_TRUE(load.flag && !load.online);
    EXPECT_THAT(fake::Calls("CreateJsonObj"), IsEmpty());
    EXPECT_EQ(profiles::Text(profiles::File(VFS_CONFIG_CONNECT)), before);
}

TEST_F(ConnectTest, FailedMountKeepsItsCodeWithoutRecovery) {
    PutRecord(VFS_CONFIG_CONNECT);
    fake::Fail("Mount", {VFS_ERR_FAILED});
    EXPECT_FALSE(Connect(kUser, kId, false));
    EXPECT_EQ(GetError(), VFS_ERR_FAILED);
    ExpectLog("Mount failed, uid=1234, code=3");
    EXPECT_EQ(fake::Calls("Mount").size(), 1U);
    EXPECT_THAT(seams::Sleeps(), IsEmpty());
}

TEST_F(ConnectTest, DisconnectTakesTheMountDownAndKeepsTheRecord) {
    PutRecord(VFS_CONFIG_CONNECT);
    EXPECT_TRUE(Disconnect(kUser, kId));
    EXPECT_EQ(fake::Calls("Unmount").size(), 1U);
    EXPECT_THAT(fake::Calls("Mount"), IsEmpty());
    EXPECT_EQ(Stored(VFS_CONFIG_CONNECT)[kId], Record());
}

TEST_F(ConnectTest, FailedDisconnectSpeaksOfTheMountToo) {
    PutRecord(VFS_CONFIG_CONNECT);
    fake::Fail("Unmount", {VFS_ERR_BUSY});
    EXPECT_FALSE(Disconnect(kUser, kId));
    EXPECT_EQ(GetError(), VFS_ERR_BUSY);
    ExpectLog("Mount failed, uid=1234, code=19");
}

TEST_F(ConnectTest, BothNeedARecordedConnectionThatLoads) {
    PutRecord(VFS_CONFIG_SERVER);
    const auto connect = [](const char* id) { return Connect(kUser, id, false); };
    const auto disconnect = [](const char* id) { return Disconnect(kUser, id); };
    const std::function<bool(const char*)> both[] = {connect, disconnect};
    for (const auto& run : both) {
        PutRecord(VFS_CONFIG_CONNECT);
        fake::Fail("Load", {VFS_ERR_UNKNOWN});
        EXPECT_FALSE(run(kId));
        EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM);
        ExpectLog("serverMgr load failed, uid=1234, serverID=ftp://amy@nas, code=1");
        for (const char* doc : {"{}", "no json", "[]", R"({"servers":7})"}) {
            profiles::PutText(profiles::File(VFS_CONFIG_CONNECT), doc);
            EXPECT_FALSE(run(kId)) << doc;
            EXPECT_EQ(GetError(), VFS_ERR_CONFIG_NOT_FOUND) << doc;
        }
        EXPECT_FALSE(run(nullptr));
        EXPECT_EQ(GetError(), VFS_ERR_CONFIG_NOT_FOUND);
    }
}

}  // namespace
}  // namespace ZYROVFS::Server
