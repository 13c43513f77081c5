#include <gmock/gmock.h>

#include "support/failing_directory.h"
#include "support/policy.h"

namespace {

using namespace ZYROVFS;
using namespace ZYROVFS::Cfg;
using policy::kAmy;
using policy::kBen;
using policy::kCleo;
using policy::kRoot;
using policy::Put;

constexpr _VFS_USER_CONFIG_ kAsk{1};
constexpr _VFS_USER_CONFIG_ kDoNotAsk{0};

class Check : public policy::PolicyTest {
  protected:
    Check() {
        accounts::AddUser("sierra", 1025);
        failing_directory::no_group_list = false;
    }
};

using Permission = Check;

const char* const kUnderAll = R"({"user_enabled_type":"all"})";
const char* const kUnderAdmin =
    R"({"user_enabled_type":"admin","user_settings":{"4001":{"enabled":true}},)"
    R"("group_settings":{"1601":{"enabled":true}}})";
const char* const kUnderCustom =
    R"({"user_enabled_type":"custom","user_settings":{"4001":{"enabled":false},)"
    R"("4003":{"enabled":true}},"group_settings":{"1601":{"enabled":true}}})";

bool May(unsigned uid, const char* protocol = nullptr) {
    return CheckPermissionByUID(uid, kAsk, protocol);
}

PERMISSION_RULE Rule(unsigned uid, _VFS_USER_CONFIG_ config = kAsk,
                     const char* protocol = nullptr) {
    const PermissionDecision decision = ExplainPermission(uid, config, protocol);
    EXPECT_EQ(decision.allowed, CheckPermissionByUID(uid, config, protocol));
    return decision.rule;
}

TEST_F(Permission, AdministratorPassesUnderAdminAndUnderCustomWithNoEntry) {
    for (const char* policy : {kUnderAdmin, kUnderCustom, R"({"user_enabled_type":"custom"})"}) {
        Put(policy);
        EXPECT_TRUE(May(kRoot)) << policy;
        EXPECT_EQ(Rule(kRoot), PERMISSION_ADMINISTRATOR);
    }
}

TEST_F(Permission, NobodyPassesAsAnAdministratorWhileADirectoryServiceDoesNotAnswer) {
    Put(kUnderCustom);
    accounts::BindToServices("ldap");
    std::filesystem::remove("/etc/ldap.group");
    EXPECT_TRUE(May(kRoot)) << "whom this machine knows";
    EXPECT_EQ(Rule(kCleo), PERMISSION_USER_ENABLED);
    EXPECT_EQ(Rule(kBen), PERMISSION_GROUP_ENABLED);
    Put(kUnderAdmin);
    EXPECT_FALSE(May(kCleo));
    EXPECT_EQ(Rule(kCleo), PERMISSION_NO_GROUPS) << "a no that tells why";
}

TEST_F(Permission, IsAskedOfADamagedPolicyWithoutLeavingTheCallerAtRoot) {
    Put("cut");
    const policy::EffectiveUser user(kAmy);
    EXPECT_FALSE(CheckPermissionByUID(kAmy, kAsk, nullptr));
    EXPECT_EQ(geteuid(), kAmy);
    EXPECT_FALSE(CheckPermissionByBelongingGID(kAmy, kAsk, nullptr));
    EXPECT_EQ(geteuid(), kAmy);
    EXPECT_FALSE(CheckPermissionByUserName("amy", kAsk, nullptr));
    EXPECT_EQ(geteuid(), kAmy);
    EXPECT_FALSE(ExplainPermission(kAmy, kAsk, nullptr).allowed);
    EXPECT_EQ(geteuid(), kAmy);
}

TEST_F(Permission, AdministratorCannotBeShutOutByTheOwnEntry) {
    Put(R"({"user_enabled_type":"custom","user_settings":{"4004":{"enabled":false}}})");
    EXPECT_TRUE(May(kRoot));
    EXPECT_TRUE(CheckPermissionByBelongingGID(kRoot, kDoNotAsk, nullptr));
}

TEST_F(Permission, Uid1025IsRefusedEvenWithSharing) {
    Put(kUnderAll);
    EXPECT_FALSE(May(1025));
    EXPECT_FALSE(May(1025, "sharing"));
    EXPECT_FALSE(CheckPermissionByUID(1025, kDoNotAsk, nullptr));
    EXPECT_FALSE(CheckPermissionByBelongingGID(1025, kAsk, nullptr));
    EXPECT_EQ(Rule(1025), PERMISSION_REFUSED_UID);
}

TEST_F(Permission, Uid1025PassesAsAnAdministrator) {
    std::ofstream("/etc/passwd") << accounts::UserLine("both", 1025, 1600) << '\n';
    EXPECT_TRUE(May(1025));
}

TEST_F(Permission, UnderCustomAUserWhoIsNotEnabledPassesByOneOfTheGroups) {
    Put(kUnderCustom);
    EXPECT_TRUE(May(kAmy)) << "entry false, painters true";
    EXPECT_TRUE(May(kBen)) << "no entry, painters true";
    const PermissionDecision decision = ExplainPermission(kAmy, kAsk, nullptr);
    EXPECT_EQ(decision.rule, PERMISSION_GROUP_ENABLED);
    EXPECT_EQ(decision.gid, policy::kPainters);
}

TEST_F(Permission, UnderCustomAUserWithNoEntryAndNoEnabledGroupIsRefused) {
    Put(R"({"user_enabled_type":"custom","group_settings":{"1602":{"enabled":true}}})");
    EXPECT_FALSE(May(kCleo));
    EXPECT_FALSE(May(kAmy)) << "of the painters, not of the rowers";
    EXPECT_EQ(Rule(kCleo), PERMISSION_NOT_ENABLED);
    EXPECT_TRUE(May(kBen)) << "of both";
}

TEST_F(Permission, UnderCustomAnEnabledUserPasses) {
    Put(kUnderCustom);
    EXPECT_TRUE(May(kCleo));
    EXPECT_EQ(Rule(kCleo), PERMISSION_USER_ENABLED);
}

TEST_F(Permission, UnderAdminANonAdminIsRefusedUnlessForSharing) {
    Put(kUnderAdmin);
    for (const unsigned uid : {kAmy, kBen, kCleo}) {
        EXPECT_FALSE(May(uid)) << uid;
        EXPECT_FALSE(May(uid, "ftp")) << uid;
        EXPECT_TRUE(May(uid, "sharing")) << uid;
    }
    EXPECT_EQ(Rule(kAmy, kAsk, "sharing"), PERMISSION_SHARING);
}

TEST_F(Permission, ProtocolThatStartsWithSharingCountsAsSharing) {
    EXPECT_TRUE(May(kAmy, "sharing"));
    EXPECT_TRUE(May(kAmy, "sharing://amy@mail.example"));
    EXPECT_TRUE(May(kAmy, "sharingmore"));
    EXPECT_FALSE(May(kAmy, "sharin"));
    EXPECT_FALSE(May(kAmy, "Sharing"));
    EXPECT_FALSE(May(kAmy, " sharing"));
    EXPECT_FALSE(May(kAmy, ""));
}

TEST_F(Permission, UnderAllEveryonePasses) {
    Put(kUnderAll);
    for (const unsigned uid : {kAmy, kBen, kCleo, kRoot}) {
        EXPECT_TRUE(May(uid)) << uid;
        EXPECT_TRUE(CheckPermissionByBelongingGID(uid, kAsk, nullptr)) << uid;
    }
}

TEST_F(Permission, WithTheLowestBitClearEveryUidPassesBut1025) {
    Put(kUnderAdmin);
    for (const unsigned uid : {kAmy, kCleo, 9999U, 0U, 4294967295U}) {
        EXPECT_TRUE(CheckPermissionByUID(uid, kDoNotAsk, nullptr)) << uid;
        EXPECT_TRUE(CheckPermissionByUID(uid, {2}, nullptr)) << "other bits do not count";
    }
    EXPECT_FALSE(CheckPermissionByUID(1025, kDoNotAsk, nullptr));
    EXPECT_EQ(Rule(kAmy, kDoNotAsk), PERMISSION_NOT_CONSULTED);
}

TEST_F(Permission, ByGroupsWithTheLowestBitClearIsNo) {
    Put(kUnderAll);
    EXPECT_FALSE(CheckPermissionByBelongingGID(kAmy, kDoNotAsk, nullptr));
    EXPECT_FALSE(CheckPermissionByBelongingGID(kAmy, kDoNotAsk, "sharing"));
}

TEST_F(Permission, WithoutAPolicyOnlyAdministratorsPass) {
    EXPECT_FALSE(May(kAmy));
    EXPECT_TRUE(May(kRoot));
}

TEST_F(Permission, UidsThatDoNotExistAreRefused) {
    Put(kUnderCustom);
    for (const unsigned uid : {9999U, static_cast<unsigned>(-1), static_cast<unsigned>(-5)}) {
        EXPECT_FALSE(May(uid)) << uid;
        EXPECT_EQ(Rule(uid), PERMISSION_NO_SUCH_USER);
    }
    EXPECT_TRUE(seams::LoggedPart("Failed to get user (9999), zyroerr=[0x1D00 user.cpp:"))
        << seams::LogDump();
    EXPECT_TRUE(seams::LoggedPart("Failed to get user (-1), "));
}

TEST_F(Permission, GroupsThatCannotBeListedAreANo) {
    Put(kUnderCustom);
    failing_directory::no_group_list = true;
    EXPECT_FALSE(May(kBen));
    EXPECT_EQ(Rule(kBen), PERMISSION_NO_GROUPS);
}

TEST_F(Permission, ByNameIsByTheUidOfThatName) {
    Put(kUnderCustom);
    EXPECT_TRUE(CheckPermissionByUserName("cleo", kAsk, nullptr));
    EXPECT_TRUE(CheckPermissionByUserName("chief", kAsk, nullptr));
    EXPECT_FALSE(CheckPermissionByUserName("sierra", kAsk, "sharing"));
}

TEST_F(Permission, ByNameOfNobodyIsNo) {
    Put(kUnderAll);
    for (const char* name : {"gone", "", "4001", "a:b\n"}) {
        EXPECT_FALSE(CheckPermissionByUserName(name, kDoNotAsk, "sharing")) << name;
    }
    EXPECT_FALSE(CheckPermissionByUserName(nullptr, kDoNotAsk, nullptr));
    EXPECT_TRUE(seams::LoggedPart("Failed to get user (gone), zyroerr=[0x1D00 user.cpp:"))
        << seams::LogDump();
}

TEST_F(Permission, FailureIsANoAndLeavesTheCellAlone) {
    for (const char* text : {"", "{\"user_enabled", "[]", R"({"user_settings":{"4001":7}})",
                             R"({"user_enabled_type":[],"group_settings":{"100":"x"}})"}) {
        Put(text);
        VFSSetErrEx(VFS_ERR_TIMEOUT, "mine.cpp", 7);
        EXPECT_NO_THROW(EXPECT_FALSE(May(kAmy))) << text;
        EXPECT_FALSE(CheckPermissionByUserName("gone", kAsk, nullptr));
        EXPECT_EQ(GetError(), VFS_ERR_TIMEOUT) << text;
        EXPECT_STREQ(GetErrorFile(), "mine.cpp");
        EXPECT_EQ(GetErrorLine(), 7);
    }
    EXPECT_TRUE(seams::LoggedPart("JsonFromFile failed: ")) << "the log tells";
}

TEST_F(Permission, NothingIsChanged) {
    Put(kUnderCustom);
    May(kAmy);
    May(9999);
    EXPECT_EQ(policy::Text(), kUnderCustom);
}

}  // namespace
