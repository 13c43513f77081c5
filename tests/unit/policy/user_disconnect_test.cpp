#include <gmock/gmock.h>

#include "support/failing_directory.h"
#include "support/policy.h"

namespace {

using namespace ZYROVFS;
using namespace ZYROVFS::Cfg;
using policy::HasConnections;
using policy::HasProfiles;
using policy::kAmy;
using policy::kBen;
using policy::kCleo;
using policy::kPeople;
using policy::kRoot;
using policy::Put;

class ShutOut : public policy::PolicyTest {
  protected:
    ShutOut() {
        for (const unsigned uid : kPeople) {
            policy::GiveFiles(uid);
        }
        failing_directory::no_group_list = false;
    }

    static bool Run(const std::string& policy) {
        Put(policy);
        return VFSUser().DisConnDisabledConf();
    }
    /** Exactly these lose connections and profiles. */
    static void ExpectOut(const std::vector<unsigned>& out) {
        for (const unsigned uid : kPeople) {
            const bool stays = std::find(out.begin(), out.end(), uid) == out.end();
            EXPECT_EQ(HasConnections(uid), stays) << uid;
            EXPECT_EQ(HasProfiles(uid), stays) << uid;
        }
    }
};

using DisConnDisabledConf = ShutOut;
using FilterNonAdminEntities = ShutOut;
using DisableConnByMap = ShutOut;

TEST_F(DisConnDisabledConf, WithoutSettingsOnlyAdministratorsStay) {
    EXPECT_TRUE(Run("{}"));
    ExpectOut({kAmy, kBen, kCleo});
}

TEST_F(DisConnDisabledConf, OwnEntryThatSaysYesOrNothingLetsStay) {
    EXPECT_TRUE(Run(R"({"user_settings":{"4001":{"enabled":true},"4002":{}}})"));
    ExpectOut({kCleo});
}

TEST_F(DisConnDisabledConf, OwnEntryThatSaysNoIsOverruledByAnyGroup) {
    EXPECT_TRUE(Run(R"({"user_settings":{"4001":{"enabled":false},"4002":{"enabled":false}},)"
                    R"("group_settings":{"1602":{"enabled":true}}})"));
    ExpectOut({kAmy, kCleo});
}

TEST_F(DisConnDisabledConf, OneEnabledGroupOfSeveralIsEnough) {
    EXPECT_TRUE(Run(R"({"group_settings":{"1601":{"enabled":false},"1602":{"enabled":true}}})"));
    ExpectOut({kAmy, kCleo});
}

TEST_F(DisConnDisabledConf, PrimaryGroupCounts) {
    EXPECT_TRUE(Run(R"({"group_settings":{"100":{"enabled":true}}})"));
    ExpectOut({});
}

TEST_F(DisConnDisabledConf, TypeIsNotAsked) {
    EXPECT_TRUE(Run(R"({"user_enabled_type":"all"})"));
    ExpectOut({kAmy, kBen, kCleo});
}

TEST_F(DisConnDisabledConf, RuntimeFoldersGoToo) {
    std::filesystem::create_directories(paths::RuntimeDir(kAmy));
    EXPECT_TRUE(Run("{}"));
    EXPECT_FALSE(std::filesystem::exists(paths::RuntimeDir(kAmy)));
}

TEST_F(DisConnDisabledConf, UserWhoIsGoneStaysAndIsLogged) {
    policy::GiveFiles(9999);
    EXPECT_TRUE(Run("{}"));
    EXPECT_TRUE(HasProfiles(9999));
    EXPECT_TRUE(seams::LoggedPart("Failed to get user (9999), zyroerr=[0x1D00 user.cpp:"))
        << seams::LogDump();
}

TEST_F(DisConnDisabledConf, SettingsOfUsersWhoAreGoneDoNoHarm) {
    EXPECT_TRUE(Run(R"({"user_settings":{"9999":{"enabled":false},"-1":{"enabled":false},)"
                    R"("text":{"enabled":false}},"group_settings":{"text":{"enabled":true}}})"));
    ExpectOut({kAmy, kBen, kCleo});
}

TEST_F(DisConnDisabledConf, UserWhoseGroupsCannotBeListedStaysAndIsLogged) {
    failing_directory::no_group_list = true;
    EXPECT_TRUE(Run("{}"));
    ExpectOut({});
    EXPECT_TRUE(seams::Logged("Failed to list belonging groups for user [amy]"))
        << seams::LogDump();
}

TEST_F(DisConnDisabledConf, NobodyIsShutOutWhileADirectoryServiceDoesNotAnswer) {
    // This machine knows the group, and the directory who is in it.
    std::ofstream("/etc/group") << "users:x:100:\nadministrators:x:1600:\n";
    accounts::BindToServices("ldap");
    std::filesystem::remove("/etc/ldap.group");
    EXPECT_TRUE(Run(R"({"group_settings":{"1601":{"enabled":true}}})"));
    ExpectOut({});
    EXPECT_TRUE(
        seams::LoggedPart("Failed to find out whether user (4004) is an administrator, zyroerr=["))
        << seams::LogDump();
    std::ofstream("/etc/ldap.group") << "administrators:x:1600:chief\npainters:x:1601:amy\n";
    EXPECT_TRUE(Run(R"({"group_settings":{"1601":{"enabled":true}}})"));
    ExpectOut({kBen, kCleo});
}

TEST_F(FilterNonAdminEntities, KeepsTheConnectionsOfThoseNobodyCanTellAbout) {
    accounts::BindToServices("ldap");
    std::filesystem::remove("/etc/ldap.group");
    EXPECT_TRUE(VFSUser().FilterNonAdminEntities());
    ExpectOut({});
}

TEST_F(DisConnDisabledConf, DamagedEntryOfAUserLetsStay) {
    EXPECT_TRUE(Run(R"({"user_settings":{"4001":7,"4002":{"enabled":"no"},"4003":null}})"));
    ExpectOut({kCleo});
}

TEST_F(DisConnDisabledConf, DamagedSettingsAreNone) {
    EXPECT_NO_THROW(EXPECT_TRUE(Run(R"({"user_settings":[1],"group_settings":"x"})")));
    ExpectOut({kAmy, kBen, kCleo});
    EXPECT_NO_THROW(EXPECT_TRUE(Run(R"({"group_settings":{"100":{"enabled":{}}}})")));
}

TEST_F(DisConnDisabledConf, NamesThatAreNoUidsBelongToNobody) {
    for (const char* name : {"text", "-1", "04001", "4001x", "4294967296", " 4003"}) {
        std::filesystem::create_directories(std::string(paths::kConnectRoot) + "/" + name);
    }
    std::ofstream(std::string(paths::kConnectRoot) + "/4777") << "a file";
    EXPECT_TRUE(Run("{}"));
    EXPECT_FALSE(seams::LoggedPart("4777"));
    EXPECT_FALSE(seams::LoggedPart("(0)"));
    EXPECT_TRUE(std::filesystem::exists(std::string(paths::kConnectRoot) + "/text"));
    ExpectOut({kAmy, kBen, kCleo});
}

TEST_F(DisConnDisabledConf, FolderThatCannotBeOpenedMeansNobody) {
    std::filesystem::remove_all(paths::kConnectRoot);
    EXPECT_TRUE(Run("{}"));
    EXPECT_TRUE(seams::Logged("Failed to opendir, path=/var/tmp/zyrovfs")) << seams::LogDump();
}

TEST_F(FilterNonAdminEntities, ConnectionsOfAllButAdministratorsGoAndProfilesStay) {
    EXPECT_TRUE(VFSGroup().FilterNonAdminEntities());
    for (const unsigned uid : {kAmy, kBen, kCleo}) {
        EXPECT_FALSE(HasConnections(uid)) << uid;
        EXPECT_TRUE(HasProfiles(uid)) << uid;
    }
    EXPECT_TRUE(HasConnections(kRoot));
}

TEST_F(FilterNonAdminEntities, AdministratorByThePrimaryGroupIsSpared) {
    accounts::AddUser("prime", 4005, 1600);
    policy::GiveFiles(4005);
    EXPECT_TRUE(VFSUser().FilterNonAdminEntities());
    EXPECT_TRUE(HasConnections(4005));
}

TEST_F(FilterNonAdminEntities, UserWhoIsGoneIsNoAdministrator) {
    policy::GiveFiles(9999);
    EXPECT_TRUE(VFSUser().FilterNonAdminEntities());
    EXPECT_FALSE(HasConnections(9999));
}

TEST_F(FilterNonAdminEntities, WithoutTheFolderNothingIsDone) {
    std::filesystem::remove_all(paths::kConnectRoot);
    EXPECT_TRUE(VFSUser().FilterNonAdminEntities());
    EXPECT_TRUE(seams::Logged("Failed to opendir, path=/var/tmp/zyrovfs"));
}

TEST_F(DisableConnByMap, TakesThoseWithTheValueTrue) {
    EXPECT_TRUE(VFSUser().DisableConnByMap({{"4001", true}, {"4002", false}}));
    EXPECT_FALSE(HasConnections(kAmy));
    EXPECT_TRUE(HasProfiles(kAmy));
    EXPECT_TRUE(HasConnections(kBen));
}

TEST_F(DisableConnByMap, LineComesOnSuccess) {
    EXPECT_TRUE(VFSUser().DisableConnByMap({{"4001", true}}));
    EXPECT_TRUE(seams::Logged("DeleteUser 4001 failed")) << seams::LogDump();
    EXPECT_FALSE(seams::LoggedPart("DeleteUser 4002"));
}

TEST_F(DisableConnByMap, IdsThatAreNoNumbersHitNobody) {
    EXPECT_NO_THROW(EXPECT_TRUE(VFSUser().DisableConnByMap(
        {{"", true}, {"-1", true}, {"text", true}, {"4001 ", true}, {"99999999999", true}})));
    ExpectOut({});
}

}  // namespace
