#include <gmock/gmock.h>
#include <sys/mount.h>
#include <sys/stat.h>

#include "support/policy.h"

namespace {

using namespace ZYROVFS;
using namespace ZYROVFS::Cfg;
using policy::HasConnections;
using policy::HasProfiles;
using policy::kAmy;
using policy::kBen;
using policy::kCleo;
using policy::kPainters;
using policy::kPeople;
using policy::kRoot;
using policy::Parsed;
using policy::Put;
using policy::Stored;
using policy::Type;
using policy::UserSetting;

class Change : public policy::PolicyTest {
  protected:
    Change() {
        for (const unsigned uid : kPeople) {
            policy::GiveFiles(uid);
        }
    }

    static void ExpectAllKeepAll() {
        for (const unsigned uid : kPeople) {
            EXPECT_TRUE(HasConnections(uid)) << uid;
            EXPECT_TRUE(HasProfiles(uid)) << uid;
        }
    }
    static Json::Value WithType(const char* type, Json::Value conf) {
        conf["user_enabled_type"] = type;
        return conf;
    }
};

using Set = Change;

TEST_F(Set, FromAllToAdminRemovesConnectionsOfNonAdminsAndKeepsTheirProfiles) {
    Put(R"({"user_enabled_type":"all"})");
    EXPECT_TRUE(policy::Set(Type("admin")));
    for (const unsigned uid : {kAmy, kBen, kCleo}) {
        EXPECT_FALSE(HasConnections(uid)) << uid;
        EXPECT_TRUE(HasProfiles(uid)) << uid;
    }
    EXPECT_TRUE(HasConnections(kRoot));
    EXPECT_EQ(Stored(), Type("admin"));
}

TEST_F(Set, FromCustomToAdminDoesTheSame) {
    Put(R"({"user_enabled_type":"custom","user_settings":{"4001":{"enabled":true}}})");
    EXPECT_TRUE(policy::Set(Type("admin")));
    EXPECT_FALSE(HasConnections(kAmy)) << "enabled or not";
    EXPECT_TRUE(HasProfiles(kAmy));
    EXPECT_TRUE(HasConnections(kRoot));
}

TEST_F(Set, FromAllToCustomDeletesAlsoTheProfilesOfThoseWhoAreNotEnabled) {
    Put(R"({"user_enabled_type":"all"})");
    EXPECT_TRUE(policy::Set(WithType("custom", UserSetting(kAmy, true))));
    EXPECT_TRUE(HasConnections(kAmy));
    EXPECT_TRUE(HasProfiles(kAmy));
    for (const unsigned uid : {kBen, kCleo}) {
        EXPECT_FALSE(HasConnections(uid)) << uid;
        EXPECT_FALSE(HasProfiles(uid)) << uid;
    }
    EXPECT_TRUE(HasConnections(kRoot));
    EXPECT_TRUE(HasProfiles(kRoot));
    EXPECT_EQ(Stored(), Parsed(R"({"user_enabled_type":"custom",)"
                               R"("user_settings":{"4001":{"enabled":true}}})"));
}

TEST_F(Set, FromAdminToCustomAppliesTheSettingsAndShutsNobodyOut) {
    Put(R"({"user_enabled_type":"admin"})");
    EXPECT_TRUE(policy::Set(WithType("custom", UserSetting(kAmy, true))));
    EXPECT_EQ(Stored()["user_settings"], Parsed(R"({"4001":{"enabled":true}})"));
    ExpectAllKeepAll();
}

TEST_F(Set, ToAllDoesNothingMore) {
    for (const char* old : {"admin", "custom"}) {
        Put(std::string(R"({"user_enabled_type":")") + old + "\"}");
        EXPECT_TRUE(policy::Set(WithType("all", UserSetting(kAmy, true))));
        EXPECT_EQ(Stored(), Type("all")) << "settings stay unapplied";
    }
    ExpectAllKeepAll();
}

TEST_F(Set, SameTypeWithASettingsListChangesNothing) {
    for (const char* type : {"all", "admin", "custom"}) {
        Put(std::string(R"({"user_enabled_type":")") + type + "\"}");
        EXPECT_TRUE(policy::Set(WithType(type, UserSetting(kAmy, true))));
        EXPECT_EQ(Stored(), Type(type));
    }
    ExpectAllKeepAll();
}

TEST_F(Set, FirstCustomOfAMachineLeavesTheSettingsUnapplied) {
    EXPECT_TRUE(policy::Set(WithType("custom", UserSetting(kAmy, true))));
    EXPECT_EQ(Stored(), Type("custom"));
    ExpectAllKeepAll();
}

TEST_F(Set, FirstTypeOfAMachineShutsNobodyOut) {
    EXPECT_TRUE(policy::Set(Type("admin")));
    EXPECT_EQ(Stored(), Type("admin"));
    ExpectAllKeepAll();
}

TEST_F(Set, SettingsWithoutATypeAreAppliedAndShutOut) {
    Put(R"({"user_enabled_type":"custom","user_settings":{"4001":{"enabled":true},)"
        R"("4002":{"enabled":true}}})");
    EXPECT_TRUE(policy::Set(UserSetting(kBen, false)));
    EXPECT_EQ(Stored()["user_settings"],
              Parsed(R"({"4001":{"enabled":true},"4002":{"enabled":false}})"))
        << "who is not mentioned stays";
    EXPECT_TRUE(HasProfiles(kAmy));
    EXPECT_FALSE(HasConnections(kBen));
    EXPECT_FALSE(HasProfiles(kBen));
}

TEST_F(Set, DisconnectionsComeBeforeTheFile) {
    Put(R"({"user_enabled_type":"all"})");
    VFSUser cfg;
    Json::Value conf = Type("admin");
    EXPECT_TRUE(cfg.Set(conf));
    EXPECT_FALSE(HasConnections(kAmy));
    EXPECT_EQ(Stored(), Type("all"));
}

TEST_F(Set, GroupSettingsAreKeptByGid) {
    Json::Value conf = Parsed(R"({"group_settings":[{"gid":"1601","enabled":true}]})");
    EXPECT_TRUE(policy::Set<VFSGroup>(conf));
    EXPECT_EQ(Stored(), Parsed(R"({"group_settings":{"1601":{"enabled":true}}})"));
    EXPECT_TRUE(HasProfiles(kAmy));
    EXPECT_TRUE(HasProfiles(kBen));
    EXPECT_FALSE(HasProfiles(kCleo));
}

TEST_F(Set, UnknownTypeIsRefusedAndNothingIsWritten) {
    Put(R"({"user_enabled_type":"all"})");
    for (const char* text : {R"({"user_enabled_type":"everybody"})", R"({"user_enabled_type":""})",
                             R"({"user_enabled_type":null})", R"({"user_enabled_type":1})",
                             R"({"user_enabled_type":"All","user_settings":[]})"}) {
        ResetError();
        EXPECT_FALSE(policy::Set(Parsed(text))) << text;
        EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM) << text;
    }
    EXPECT_TRUE(seams::Logged("Bad parameter: Unknown enabled user type: everybody"))
        << seams::LogDump();
    EXPECT_EQ(policy::Text(), R"({"user_enabled_type":"all"})");
    ExpectAllKeepAll();
}

TEST_F(Set, InputOfOtherShapesIsRefusedWhole) {
    Put(R"({"user_enabled_type":"custom"})");
    for (const char* text :
         {"null", "7", "\"all\"", "[]", R"({"user_enabled_type":{}})",
          R"({"user_enabled_type":[]})", R"({"user_settings":7})", R"({"user_settings":{}})",
          R"({"user_settings":"4001"})", R"({"user_settings":[7]})", R"({"user_settings":[null]})",
          R"({"user_settings":[[]]})", R"({"user_settings":[{"uid":{},"enabled":true}]})",
          R"({"user_settings":[{"enabled":true}]})",
          R"({"user_settings":[{"uid":4001,"enabled":"yes"}]})",
          R"({"user_settings":[{"uid":4001,"enabled":true},{"uid":4002,"enabled":[]}]})"}) {
        ResetError();
        seams::Reset();
        EXPECT_NO_THROW(EXPECT_FALSE(policy::Set(Parsed(text)))) << text;
        EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM) << text;
        EXPECT_FALSE(seams::LogLines().empty()) << text;
    }
    EXPECT_EQ(policy::Text(), R"({"user_enabled_type":"custom"})");
    ExpectAllKeepAll();
}

TEST_F(Set, ASettingWithoutEnabledIsRefusedAndShutsNobodyOut) {
    Put(R"({"user_enabled_type":"custom","user_settings":{"4001":{"enabled":true}}})");
    for (const char* element :
         {R"({"uid":4001})", R"({"uid":4001,"enabled":null})", R"({"uid":4001,"Enabled":true})"}) {
        ResetError();
        EXPECT_FALSE(policy::Set(Parsed("{\"user_settings\":[" + std::string(element) + "]}")))
            << element;
        EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM) << element;
        ExpectAllKeepAll();
    }
    ResetError();
    EXPECT_FALSE(policy::Set<VFSGroup>(Parsed(R"({"group_settings":[{"gid":1601}]})")));
    EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM);
    ExpectAllKeepAll();
    EXPECT_EQ(Stored(), Parsed(R"({"user_enabled_type":"custom",)"
                               R"("user_settings":{"4001":{"enabled":true}}})"));
}

TEST_F(Set, RefusedSettingsLeaveTheTypeAsItWas) {
    Put(R"({"user_enabled_type":"admin"})");
    VFSUser cfg;
    Json::Value conf = Parsed(R"({"user_enabled_type":"custom","user_settings":[7]})");
    EXPECT_FALSE(cfg.Set(conf));
    std::string type;
    cfg.GetUserEnabledType(type);
    EXPECT_EQ(type, "admin");
}

TEST_F(Set, UidsThatDoNotExistAreNegativeOrTextAreKeptAsTheyAre) {
    Put(R"({"user_enabled_type":"admin"})");
    Json::Value conf = Parsed(
        R"({"user_enabled_type":"custom","user_settings":[{"uid":99999,"enabled":true},)"
        R"({"uid":-5,"enabled":true},{"uid":"text","enabled":true},{"uid":"4001","enabled":1}]})");
    EXPECT_TRUE(policy::Set(conf));
    EXPECT_EQ(Stored()["user_settings"].getMemberNames(),
              (std::vector<std::string>{"-5", "4001", "99999", "text"}));
    EXPECT_EQ(Stored()["user_settings"]["4001"]["enabled"], Json::Value(true));
}

TEST_F(Set, DamagedSettingsAreReplacedWhereTheyAreSet) {
    Put(R"({"user_enabled_type":"custom","user_settings":{"4001":7,"4002":"x"}})");
    EXPECT_TRUE(policy::Set(UserSetting(kAmy, true)));
    EXPECT_EQ(Stored()["user_settings"], Parsed(R"({"4001":{"enabled":true},"4002":"x"})"));
    Put(R"({"user_enabled_type":"custom","user_settings":[1]})");
    EXPECT_TRUE(policy::Set(UserSetting(kAmy, true)));
    EXPECT_EQ(Stored()["user_settings"], Parsed(R"({"4001":{"enabled":true}})"));
}

TEST_F(Set, OtherMembersOfTheFileAndOfEntriesStay) {
    Put(R"({"later":[1],"user_enabled_type":"custom","user_settings":{"4001":{"note":"x"}}})");
    EXPECT_TRUE(policy::Set(UserSetting(kAmy, true)));
    EXPECT_EQ(Stored()["later"], Parsed("[1]"));
    EXPECT_EQ(Stored()["user_settings"]["4001"], Parsed(R"({"enabled":true,"note":"x"})"));
}

TEST_F(Set, RunsAsRootAndGivesTheIdentityBack) {
    const policy::EffectiveUser user(kCleo);
    Put(R"({"user_enabled_type":"admin"})");
    {
        VFSUser cfg;
        Json::Value conf = Type("all");
        seams::Reset();
        EXPECT_TRUE(cfg.Set(conf));
        EXPECT_EQ(geteuid(), kCleo);
        EXPECT_THAT(seams::IdentityCalls(),
                    testing::ElementsAre("setresuid(-1, 0, -1)", "setresuid(-1, 0, -1)",
                                         "setresuid(-1, 4003, -1)"));
    }
    EXPECT_EQ(geteuid(), kCleo);
    EXPECT_EQ(Stored(), Type("all"));
}

TEST_F(Set, MissingFolderIsMade) {
    std::filesystem::remove_all("/usr/zyro/etc/zyrovfs");
    EXPECT_TRUE(policy::Set(Type("all")));
    EXPECT_EQ(Stored(), Type("all"));
}

TEST_F(Set, FolderThatCannotBeMadeIsAFailure) {
    std::filesystem::remove_all("/usr/zyro/etc/zyrovfs");
    ASSERT_EQ(mount("tmpfs", "/usr/zyro/etc", "tmpfs", MS_RDONLY, ""), 0);
    EXPECT_FALSE(policy::Set(Type("all")));
    EXPECT_EQ(GetError(), VFS_ERR_CONFIG_WRITE);
    EXPECT_TRUE(seams::LoggedPart("Failed to mkdir /usr/zyro/etc/zyrovfs")) << seams::LogDump();
    ASSERT_EQ(umount2("/usr/zyro/etc", MNT_DETACH), 0);
}

class Delete : public Change {
  protected:
    Delete() {
        Put(R"({"user_enabled_type":"custom","user_settings":{"4001":{"enabled":true},)"
            R"("4002":{"enabled":true},"9999":{"enabled":true}}})");
    }
    static bool Remove(const char* ids) {
        VFSUser cfg;
        Json::Value value = Parsed(ids);
        return cfg.Delete(value);
    }
    static std::vector<std::string> Left() { return Stored()["user_settings"].getMemberNames(); }
};

TEST_F(Delete, RemovesTheSettingsOfNumbersAndTexts) {
    EXPECT_TRUE(Remove(R"([4001,"9999",12345])"));
    EXPECT_EQ(Left(), std::vector<std::string>{"4002"});
    ExpectAllKeepAll();
}

TEST_F(Delete, TakesAnArrayOnly) {
    for (const char* ids : {"{}", "null", "4001", "\"4001\""}) {
        ResetError();
        EXPECT_FALSE(Remove(ids));
        EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM);
    }
    EXPECT_TRUE(seams::Logged("Bad parameter: jsonUsers should be an array"));
    EXPECT_EQ(Left().size(), 3U);
}

TEST_F(Delete, ElementThatIsNoTextStopsItAndNothingIsWritten) {
    VFSUser cfg;
    Json::Value ids = Parsed(R"([4001,{},4002])");
    EXPECT_FALSE(cfg.Delete(ids));
    EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM);
    EXPECT_TRUE(seams::Logged("Bad parameter: jsonUser's element should be convertible to string"));
    Json::Value out;
    cfg.Get(kAmy, out);
    EXPECT_TRUE(out.isNull()) << "gone from the object";
    cfg.Get(kBen, out);
    EXPECT_FALSE(out.isNull());
    EXPECT_EQ(Left().size(), 3U);
}

TEST_F(Delete, WithoutSettingsNothingIsDoneAndNothingWritten) {
    Put(R"({"user_enabled_type":"all"}  )");
    EXPECT_TRUE(Remove("[4001,{}]"));
    EXPECT_EQ(policy::Text(), R"({"user_enabled_type":"all"}  )");
    std::filesystem::remove(paths::kPolicyFile);
    EXPECT_TRUE(Remove("[4001]"));
    EXPECT_FALSE(std::filesystem::exists(paths::kPolicyFile));
}

TEST_F(Delete, DamagedSettingsHoldNothingToRemove) {
    Put(R"({"user_settings":7})");
    EXPECT_NO_THROW(EXPECT_TRUE(Remove("[4001]")));
}

}  // namespace
