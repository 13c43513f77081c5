// Set: what is merged, what is mounted anew, under which id it ends up, and the code of each step.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "support/fake_server.h"
#include "support/profiles.h"

namespace ZYROVFS::Server {
namespace {

using profiles::kUser;
using profiles::Put;
using profiles::Stored;
using testing::ElementsAre;
using testing::IsEmpty;

const char* const kId = "ftp://nas";

class SetTest : public profiles::ProfileTest {
  protected:
    void SetUp() override {
        ProfileTest::SetUp();
        for (const VFS_CONFIG_MODE mode : {VFS_CONFIG_SERVER, VFS_CONFIG_CONNECT}) {
            Json::Value servers;
            servers[kId] = Record();
            Put(mode, servers);
        }
    }

    static Json::Value Record() {
        Json::Value record;
        record["protocol"] = "ftp";
        record["hostname"] = "nas";
        record["alias"] = "mine";
        record["password"] = fake::Sealed("secret");
        record["path"] = "/tmp";
        return record;
    }

    static Json::Value Changes(const char* key, const Json::Value& value) {
        Json::Value changes;
        changes[key] = value;
        return changes;
    }

    bool Run(VFS_CONFIG_MODE mode, const Json::Value& changes, bool force = false) {
        return Set(kUser, mode, id_, changes, force);
    }

    static void ExpectLog(const std::string& text) {
        EXPECT_TRUE(seams::Logged(text)) << text << "\namong\n" << seams::LogDump();
    }

    fake::Scope fakes_;
    std::string id_ = kId;
};

TEST_F(SetTest, OverlaysTheGivenMembersAndKeepsTheRest) {
    EXPECT_TRUE(Run(VFS_CONFIG_SERVER, Changes("alias", "new")));
    const Json::Value stored = Stored(VFS_CONFIG_SERVER)[kId];
    EXPECT_EQ(stored["alias"], "new");
    EXPECT_EQ(stored["hostname"], "nas");
    EXPECT_EQ(stored["password"], fake::Sealed("secret")) << "deciphered and enciphered again";
    EXPECT_EQ(Stored(VFS_CONFIG_CONNECT)[kId], Record()) << "one file";
    EXPECT_EQ(id_, kId);
    const std::vector<fake::Call> loads = fake::Calls("Load");
    ASSERT_EQ(loads.size(), 2U);
    EXPECT_TRUE(loads[0].flag) << "what is stored is enciphered";
    EXPECT_FALSE(loads[1].flag) << "what is merged is plain text";
    EXPECT_EQ(loads[1].conf["password"], "secret");
    EXPECT_FALSE(loads[0].online || loads[1].online);
}

TEST_F(SetTest, NullMembersLeaveWhatIsStored) {
    Json::Value changes = Changes("alias", Json::Value());
    changes["hostname"] = Json::Value();
    changes["codepage"] = "UTF-8";
    EXPECT_TRUE(Run(VFS_CONFIG_SERVER, changes));
    const Json::Value stored = Stored(VFS_CONFIG_SERVER)[kId];
    EXPECT_EQ(stored["alias"], "mine");
    EXPECT_EQ(stored["hostname"], "nas");
    EXPECT_EQ(stored["codepage"], "UTF-8");
}

TEST_F(SetTest, ChangeOfHostGivesANewIdAndTheOldOneIsGone) {
    EXPECT_TRUE(Run(VFS_CONFIG_SERVER, Changes("hostname", "other")));
    EXPECT_EQ(id_, "ftp://other");
    EXPECT_EQ(Stored(VFS_CONFIG_SERVER).getMemberNames(), std::vector<std::string>{"ftp://other"});
}

TEST_F(SetTest, SavedProfileIsNeverRemounted) {
    EXPECT_TRUE(Run(VFS_CONFIG_SERVER, Changes("hostname", "other")));
    EXPECT_THAT(fake::Calls("Mount"), IsEmpty());
    EXPECT_THAT(fake::Calls("Unmount"), IsEmpty());
    EXPECT_THAT(fake::Calls("IsUpdateNeedsRemount"), IsEmpty());
}

TEST_F(SetTest, ChangeThatDoesNotMatterToTheMountLeavesItAlone) {
    EXPECT_TRUE(Run(VFS_CONFIG_CONNECT, Changes("alias", "new")));
    EXPECT_THAT(fake::Calls("Mount"), IsEmpty());
    EXPECT_THAT(fake::Calls("Unmount"), IsEmpty());
    EXPECT_EQ(Stored(VFS_CONFIG_CONNECT)[kId]["alias"], "new");
}

TEST_F(SetTest, ChangeThatMattersMountsAnewWithTheChangesAsGiven) {
    Json::Value changes = Changes("hostname", "other");
    changes["alias"] = Json::Value();
    EXPECT_TRUE(Run(VFS_CONFIG_CONNECT, changes, true));
    EXPECT_EQ(id_, "ftp://other");
    EXPECT_EQ(fake::Calls("Unmount").size(), 1U);
    ASSERT_EQ(fake::Calls("Mount").size(), 1U);
    EXPECT_EQ(fake::Calls("Mount")[0].conf, changes) << "not the merged profile";
    EXPECT_TRUE(fake::Calls("Mount")[0].flag);
    EXPECT_EQ(fake::Calls("IsUpdateNeedsRemount")[0].conf, changes);
    const Json::Value stored = Stored(VFS_CONFIG_CONNECT)["ftp://other"];
    EXPECT_EQ(stored["alias"], "mine");
    EXPECT_EQ(stored["path"], "/tmp");
}

TEST_F(SetTest, UnmountComesFromTheOldProfileAndMayFail) {
    fake::Fail("Unmount", {VFS_ERR_BUSY});
    EXPECT_TRUE(Run(VFS_CONFIG_CONNECT, Changes("hostname", "other")));
    const std::vector<std::string> operations = fake::Operations();
    const auto unmount = std::find(operations.begin(), operations.end(), "Unmount");
    EXPECT_EQ(std::count(operations.begin(), unmount, "Load"), 1) << "before the merged one loads";
}

TEST_F(SetTest, AbsentProfileIsNotFound) {
    id_ = "ftp://absent";
    EXPECT_FALSE(Run(VFS_CONFIG_SERVER, Changes("alias", "new")));
    EXPECT_EQ(GetError(), VFS_ERR_CONFIG_NOT_FOUND);
    profiles::PutText(profiles::File(VFS_CONFIG_SERVER), "no json");
    EXPECT_FALSE(Run(VFS_CONFIG_SERVER, Changes("alias", "new")));
    EXPECT_EQ(GetError(), VFS_ERR_CONFIG_NOT_FOUND) << "whatever kept it from being read";
}

TEST_F(SetTest, StoredProfileThatDoesNotLoadIsABadParameter) {
    fake::Fail("Load", {VFS_ERR_UNKNOWN});
    EXPECT_FALSE(Run(VFS_CONFIG_SERVER, Changes("alias", "new")));
    EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM);
    ExpectLog("serverMgr load failed, uid=1234, mode=0, serverID=ftp://nas, code=1");
}

TEST_F(SetTest, CredentialsThatCannotBeDecipheredKeepTheirCode) {
    // The load deciphers first, for itself.
    fake::Fail("DecryptCredentials", {VFS_ERR_NONE, VFS_ERR_FAILED});
    EXPECT_FALSE(Run(VFS_CONFIG_SERVER, Changes("alias", "new")));
    EXPECT_EQ(GetError(), VFS_ERR_FAILED);
    EXPECT_STREQ(GetErrorFile(), "fake") << "the error is the type's own";
    ExpectLog("DecryptCredential failed, uid=1234, mode=0, serverID=ftp://nas, code=3");
    EXPECT_EQ(Stored(VFS_CONFIG_SERVER)[kId], Record());
}

/** Failures after the merge, which both roads share. */
TEST_F(SetTest, MergedProfileThatDoesNotLoadIsABadParameterOnBothRoads) {
    for (const char* key : {"hostname", "alias"}) {
        fake::Fail("Load", {VFS_ERR_NONE, VFS_ERR_UNKNOWN});
        EXPECT_FALSE(Run(VFS_CONFIG_CONNECT, Changes(key, "new")));
        EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM);
        ExpectLog("serverMgr load failed, uid=1234, mode=1, serverID=ftp://nas, code=1");
        EXPECT_EQ(Stored(VFS_CONFIG_CONNECT)[kId], Record());
    }
}

TEST_F(SetTest, IdThatCannotBeWorkedOutIsAFailureOnBothRoads) {
    for (const char* key : {"hostname", "alias"}) {
        // Each of the two loads asks once for the connect status.
        fake::Fail("GetServerID", {VFS_ERR_NONE, VFS_ERR_NONE, VFS_ERR_INVALID_SERVER});
        EXPECT_FALSE(Run(VFS_CONFIG_CONNECT, Changes(key, "new")));
        EXPECT_EQ(GetError(), VFS_ERR_FAILED);
        ExpectLog("Failed to get server ID, uid=1234, mode=1, code=5");
        EXPECT_THAT(fake::Calls("Mount"), IsEmpty());
    }
}

TEST_F(SetTest, ProfileThatCannotBeDescribedIsABadParameterOnBothRoads) {
    for (const char* key : {"hostname", "alias"}) {
        fake::Fail("CreateJsonObj", {VFS_ERR_UNKNOWN});
        EXPECT_FALSE(Run(VFS_CONFIG_CONNECT, Changes(key, "new")));
        EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM);
        ExpectLog("CreateJsonObj failed, uid=1234, mode=1, serverID=ftp://nas, code=1");
        EXPECT_EQ(id_, kId);
        EXPECT_THAT(seams::Sleeps(), IsEmpty());
    }
}

TEST_F(SetTest, LostPathWithoutAMountIsNotRecovered) {
    fake::Fail("CreateJsonObj", {VFS_ERR_FAILED});
    EXPECT_FALSE(Run(VFS_CONFIG_CONNECT, Changes("alias", "new")));
    EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM);
    EXPECT_THAT(seams::Sleeps(), IsEmpty());
}

TEST_F(SetTest, LostPathOfTheNewMountRecoversOnce) {
    fake::Fail("CreateJsonObj", {VFS_ERR_FAILED});
    EXPECT_TRUE(Run(VFS_CONFIG_CONNECT, Changes("hostname", "other")));
    EXPECT_THAT(seams::Sleeps(), ElementsAre(1U, 2U));
    EXPECT_EQ(fake::Calls("Unmount").size(), 2U) << "the old mount, and the stale new one";
    id_ = "ftp://other";
    seams::Reset();
    fake::Fail("CreateJsonObj", {VFS_ERR_FAILED, VFS_ERR_FAILED});
    EXPECT_FALSE(Run(VFS_CONFIG_CONNECT, Changes("hostname", "third")));
    EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM);
    EXPECT_THAT(seams::Sleeps(), ElementsAre(1U, 2U));
    ExpectLog("CreateJsonObj failed, uid=1234, mode=1, serverID=ftp://other, code=3");
}

TEST_F(SetTest, RefusedMountKeepsItsCodeAndTellsTheNewId) {
    fake::Fail("Mount", {VFS_ERR_IDENTITY_QUESTION});
    EXPECT_FALSE(Run(VFS_CONFIG_CONNECT, Changes("hostname", "other")));
    EXPECT_EQ(GetError(), VFS_ERR_IDENTITY_QUESTION);
    EXPECT_STREQ(GetErrorFile(), "fake");
    EXPECT_EQ(id_, "ftp://other");
    ExpectLog("Mount failed, uid=1234, mode=1, serverID=ftp://other, code=20");
    EXPECT_EQ(Stored(VFS_CONFIG_CONNECT)[kId], Record()) << "the file is as it was";
}

TEST_F(SetTest, NewIdThatIsTakenFails) {
    Json::Value servers;
    servers[kId] = Record();
    servers["ftp://other"] = Record();
    Put(VFS_CONFIG_SERVER, servers);
    EXPECT_FALSE(Run(VFS_CONFIG_SERVER, Changes("hostname", "other")));
    EXPECT_EQ(GetError(), VFS_ERR_FAILED);
    EXPECT_EQ(id_, kId);
    ExpectLog(
        "CfgSetByID failed, uid=1234, mode=0, serverID=ftp://nas, newServerID=ftp://other, "
        "code=14");
}

TEST_F(SetTest, ChangesThatAreNoObjectAreABadParameter) {
    for (const Json::Value& changes :
         {Json::Value("text"), Json::Value(1), Json::Value(true), Json::Value(Json::arrayValue)}) {
        for (const VFS_CONFIG_MODE mode : {VFS_CONFIG_SERVER, VFS_CONFIG_CONNECT}) {
            ResetError();
            EXPECT_FALSE(Run(mode, changes)) << changes;
            EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM) << changes;
            EXPECT_EQ(Stored(mode)[kId], Record());
        }
    }
    EXPECT_THAT(fake::Calls("Unmount"), IsEmpty()) << "refused before anything was touched";
    EXPECT_TRUE(Run(VFS_CONFIG_SERVER, Json::Value())) << "no changes are fine";
}

TEST_F(SetTest, DamagedRecordsAreABadParameter) {
    for (const Json::Value& record :
         {Json::Value("text"), Json::Value(1), Json::Value(), Json::Value(Json::arrayValue)}) {
        Json::Value servers;
        servers[kId] = record;
        Put(VFS_CONFIG_SERVER, servers);
        EXPECT_FALSE(Run(VFS_CONFIG_SERVER, Changes("alias", "new"))) << record;
        EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM) << record;
        EXPECT_EQ(Stored(VFS_CONFIG_SERVER)[kId], record);
    }
}

}  // namespace
}  // namespace ZYROVFS::Server
