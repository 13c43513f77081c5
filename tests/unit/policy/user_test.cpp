#include <gmock/gmock.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <zosplatform/user.h>

#include <cerrno>

#include "core/handle.h"
#include "support/other_process.h"
#include "support/policy.h"

namespace {
/** What ZYROLDAPIsBinded says here: that of a machine with lists of its own. */
int bound = 0;
}  // namespace

int ZYROLDAPIsBinded(void) {
    return bound;
}

namespace {

using namespace ZYROVFS;
using namespace ZYROVFS::Cfg;
using policy::Get;
using policy::kAmy;
using policy::Put;
using policy::Set;
using policy::Stored;
using policy::Type;

using Store = policy::PolicyTest;

std::string TypeNow() {
    std::string type;
    EXPECT_TRUE(VFSUser().GetUserEnabledType(type));
    return type;
}

bool IsEnabledNow(unsigned uid) {
    Json::Value out = Get(uid);
    return out["enabled"].asBool();
}

/** Through the base class, whose files are those of users, so that no kind's own hides it. */
class Document : public VFSUser {
  public:
    using VFSEntityCfg::dirty_;
    using VFSEntityCfg::settings_;
    using VFSEntityCfg::value_;
};

TEST_F(Store, MissingFileReadsAsAdminAndNobodyIsEnabled) {
    EXPECT_EQ(TypeNow(), "admin");
    EXPECT_FALSE(IsEnabledNow(kAmy));
    EXPECT_TRUE(Get(kAmy).isNull());
    EXPECT_EQ(GetError(), VFS_ERR_NONE);
}

TEST_F(Store, TypeAllGivesTrueEvenForAStoredFalse) {
    Put(R"({"user_enabled_type":"all","user_settings":{"4001":{"enabled":false}}})");
    EXPECT_TRUE(IsEnabledNow(kAmy));
    EXPECT_TRUE(IsEnabledNow(4999));
    EXPECT_EQ(TypeNow(), "all");
}

TEST_F(Store, TypeAdminGivesFalseEvenForAStoredTrue) {
    Put(R"({"user_enabled_type":"admin","user_settings":{"4001":{"enabled":true}}})");
    EXPECT_FALSE(IsEnabledNow(kAmy));
}

TEST_F(Store, TypeCustomLeavesWhatIsStored) {
    Put(R"({"user_enabled_type":"custom","user_settings":{"4001":{"enabled":true},)"
        R"("4002":{"enabled":false}}})");
    EXPECT_TRUE(IsEnabledNow(kAmy));
    EXPECT_FALSE(IsEnabledNow(4002));
    EXPECT_TRUE(Get(4003).isNull());
}

TEST_F(Store, SettingsWithoutATypeAreLeftAsStored) {
    Put(R"({"user_settings":{"4001":{"enabled":true}}})");
    EXPECT_TRUE(IsEnabledNow(kAmy));
    EXPECT_EQ(TypeNow(), "admin");
}

TEST_F(Store, UsersAndGroupsHaveSettingsOfTheirOwn) {
    Put(R"({"user_enabled_type":"custom","user_settings":{"100":{"enabled":true}},)"
        R"("group_settings":{"200":{"enabled":true}}})");
    Json::Value out;
    EXPECT_TRUE(VFSGroup().Get(200UL, out));
    EXPECT_TRUE(out["enabled"].asBool());
    EXPECT_TRUE(VFSGroup().Get(100U, out));
    EXPECT_TRUE(out.isNull());
    EXPECT_TRUE(VFSUser().Get(100UL, out));
    EXPECT_TRUE(out["enabled"].asBool());
}

TEST_F(Store, LargestIdsHaveEntriesToo) {
    Put(R"({"user_enabled_type":"custom","user_settings":{"4294967295":{"enabled":true},)"
        R"("18446744073709551615":{"enabled":true}}})");
    EXPECT_TRUE(IsEnabledNow(4294967295U));
    Json::Value out;
    EXPECT_TRUE(VFSUser().Get(18446744073709551615UL, out));
    EXPECT_TRUE(out["enabled"].asBool());
}

TEST_F(Store, FileThatCannotBeReadLeavesTheObjectUsable) {
    for (const char* text : {"", "{\"user_enabled_type\":\"al", "[]", "7", "\"all\"",
                             "{\"user_enabled_type\":\"all\"} more", "\xff\xfe"}) {
        Put(text);
        ResetError();
        seams::Reset();
        const VFSUser cfg;
        EXPECT_EQ(GetError(), VFS_ERR_CONFIG_READ) << text;
        EXPECT_STREQ(GetErrorFile(), "user.cpp");
        EXPECT_TRUE(seams::Logged("JsonFromFile failed: /usr/zyro/etc/zyrovfs/user.conf"))
            << seams::LogDump();
        std::string type;
        EXPECT_TRUE(cfg.GetUserEnabledType(type));
        EXPECT_EQ(type, "admin");
    }
}

TEST_F(Store, FolderOrLinkInPlaceOfTheFileIsNoPolicy) {
    ASSERT_EQ(mkdir(paths::kPolicyFile, 0755), 0);
    EXPECT_FALSE(IsEnabledNow(kAmy));
    EXPECT_EQ(GetError(), VFS_ERR_CONFIG_READ);
    ASSERT_EQ(rmdir(paths::kPolicyFile), 0);
    std::ofstream("/tmp/elsewhere") << R"({"user_enabled_type":"all"})";
    ASSERT_EQ(symlink("/tmp/elsewhere", paths::kPolicyFile), 0);
    ResetError();
    EXPECT_FALSE(IsEnabledNow(kAmy));
    EXPECT_EQ(GetError(), VFS_ERR_CONFIG_READ);
}

TEST_F(Store, FileThatTheCallerMayNotReadIsNoPolicy) {
    Put(R"({"user_enabled_type":"all"})");
    chmod(paths::kPolicyFile, 0600);
    const policy::EffectiveUser user(kAmy);
    seams::FailIdentity("setresuid(-1, 0, -1)", EPERM);
    EXPECT_FALSE(IsEnabledNow(kAmy));
    EXPECT_EQ(GetError(), VFS_ERR_CONFIG_READ);
    EXPECT_TRUE(seams::Logged("ERROR: setresuid(-1, 0, -1) [Operation not permitted]"))
        << seams::LogDump();
}

TEST_F(Store, MembersOfOtherTypesAreNoSettings) {
    for (const char* text :
         {R"({"user_enabled_type":["all"],"user_settings":7})",
          R"({"user_enabled_type":{"a":1},"user_settings":{"4001":true}})",
          R"({"user_enabled_type":"custom","user_settings":[1,2]})",
          R"({"user_enabled_type":"custom","user_settings":{"4001":"enabled"}})",
          R"({"user_enabled_type":"custom","user_settings":{"4001":{"enabled":"yes"}}})",
          R"({"user_enabled_type":"custom","user_settings":{"4001":{"enabled":{}}}})",
          R"({"user_enabled_type":null,"user_settings":{"4001":null}})",
          R"({"user_enabled_type":12,"user_settings":{"4001":{"enabled":[]}}})"}) {
        Put(text);
        EXPECT_FALSE(IsEnabledNow(kAmy)) << text;
        EXPECT_NO_THROW(TypeNow()) << text;
    }
    Put(R"({"user_enabled_type":{"a":1}})");
    EXPECT_EQ(TypeNow(), "admin");
}

TEST_F(Store, TypeAllHoldsAlsoAboveDamagedSettings) {
    Put(R"({"user_enabled_type":"all","user_settings":{"4001":7}})");
    EXPECT_TRUE(IsEnabledNow(kAmy));
}

TEST_F(Store, ChangeLandsWhenTheObjectGoes) {
    {
        VFSUser cfg;
        Json::Value conf = Type("all");
        ASSERT_TRUE(cfg.Set(conf));
        EXPECT_FALSE(std::filesystem::exists(paths::kPolicyFile));
    }
    EXPECT_EQ(Stored(), Type("all"));
}

TEST_F(Store, FileHasMode744WhateverTheMaskIs) {
    const mode_t mask = umask(0077);
    ASSERT_TRUE(Set(Type("all")));
    umask(mask);
    struct stat info {};
    ASSERT_EQ(stat(paths::kPolicyFile, &info), 0);
    EXPECT_EQ(info.st_mode & 07777, 0744U);
}

TEST_F(Store, ObjectThatWasOnlyReadDoesNotWrite) {
    Put(R"({"user_enabled_type":"all"}   )");
    Get(kAmy);
    EXPECT_EQ(policy::Text(), R"({"user_enabled_type":"all"}   )");
}

TEST_F(Store, LastOfTwoObjectsWins) {
    {
        VFSUser first;
        VFSGroup second;
        Json::Value conf = Type("all");
        ASSERT_TRUE(first.Set(conf));
        conf = Type("admin");
        ASSERT_TRUE(second.Set(conf));
        std::string type;
        first.GetUserEnabledType(type);
        EXPECT_EQ(type, "all");
    }
    EXPECT_EQ(TypeNow(), "all");
}

TEST_F(Store, FullDiskKeepsTheOldFile) {
    ASSERT_EQ(mount("tmpfs", paths::kConfigRoot, "tmpfs", 0, "size=16k"), 0);
    Put(R"({"user_enabled_type":"admin"})");
    std::ofstream(std::string(paths::kConfigRoot) + "/fill") << std::string(64 * 1024, 'x');
    {
        VFSUser cfg;
        Json::Value conf = Type("all");
        ASSERT_TRUE(cfg.Set(conf));
        ResetError();
    }
    EXPECT_EQ(GetError(), VFS_ERR_CONFIG_WRITE);
    EXPECT_TRUE(seams::Logged("JsonToFile failed: /usr/zyro/etc/zyrovfs/user.conf"))
        << seams::LogDump();
    EXPECT_EQ(policy::Text(), R"({"user_enabled_type":"admin"})");
    EXPECT_EQ(umount2(paths::kConfigRoot, MNT_DETACH), 0);
}

TEST_F(Store, ChangeOfACallerWithRootSavedLandsWithoutAFailure) {
    ResetError();
    {
        VFSUser cfg;
        Json::Value conf = Type("all");
        ASSERT_TRUE(cfg.Set(conf));
        ASSERT_EQ(seteuid(kAmy), 0);
    }
    EXPECT_EQ(geteuid(), kAmy);
    ASSERT_EQ(seteuid(0), 0);
    EXPECT_FALSE(seams::LoggedPart("Failed to chmod")) << seams::LogDump();
    EXPECT_EQ(GetError(), VFS_ERR_NONE);
    EXPECT_EQ(TypeNow(), "all");
    struct stat info {};
    ASSERT_EQ(stat(paths::kPolicyFile, &info), 0);
    EXPECT_EQ(info.st_mode & 07777, 0744U);
}

TEST_F(Store, ReadingIsDoneAsRootAndTheCallersIdentityComesBack) {
    Put(R"({"user_enabled_type":"all"})");
    chmod(paths::kPolicyFile, 0600);
    const policy::EffectiveUser user(kAmy);
    seams::Reset();
    EXPECT_TRUE(IsEnabledNow(kAmy));
    EXPECT_EQ(geteuid(), kAmy);
    EXPECT_THAT(seams::IdentityCalls(),
                testing::ElementsAre("setresuid(-1, 0, -1)", "setresuid(-1, 4001, -1)"));
    EXPECT_TRUE(seams::Logged("WARNING: setresuid(-1, 0, -1)")) << seams::LogDump();
}

TEST_F(Store, RootSwitchesNothing) {
    Put(R"({"user_enabled_type":"all"})");
    EXPECT_TRUE(IsEnabledNow(kAmy));
    EXPECT_TRUE(seams::IdentityCalls().empty());
}

TEST_F(Store, FailedReadLeavesTheProcessAtRoot) {
    Put("cut");
    const policy::EffectiveUser user(kAmy);
    const VFSUser cfg;
    EXPECT_EQ(geteuid(), 0U);
}

TEST_F(Store, FailedWriteLeavesTheProcessAtRoot) {
    const policy::EffectiveUser user(kAmy);
    Document document;
    EXPECT_FALSE(document.JsonToFile("/no/such/folder/file"));
    EXPECT_EQ(geteuid(), 0U);
}

TEST_F(Store, FailedSwitchBackIsAFailedRead) {
    Put(R"({"user_enabled_type":"all"})");
    const policy::EffectiveUser user(kAmy);
    seams::FailIdentity("setresuid(-1, 4001, -1)", EPERM);
    EXPECT_FALSE(IsEnabledNow(kAmy));
    EXPECT_TRUE(seams::Logged("Failed to restore euid[4001], Operation not permitted"))
        << seams::LogDump();
    EXPECT_EQ(GetError(), VFS_ERR_CONFIG_READ);
}

TEST_F(Store, FailedSwitchBackIsAFailedWrite) {
    Document document;
    document.value_["user_enabled_type"] = "all";
    const policy::EffectiveUser user(kAmy);
    seams::FailIdentity("setresuid(-1, 4001, -1)", EPERM);
    EXPECT_FALSE(document.JsonToFile(paths::kPolicyFile));
    EXPECT_TRUE(seams::Logged("Failed to restore euid[4001], Operation not permitted"));
    EXPECT_EQ(Stored(), Type("all")) << "written all the same";
}

TEST_F(Store, DocumentsWithoutAPathFail) {
    Document document;
    Json::Value value;
    EXPECT_FALSE(document.JsonFromFile(value, nullptr));
    EXPECT_FALSE(document.JsonToFile(nullptr));
    EXPECT_FALSE(document.JsonFromFile(value, "/no/such/file"));
}

TEST_F(Store, SettingsRecordsAreTheTwoKnownOnes) {
    EXPECT_STREQ(VFSEntityCfg::USER.key, "user_settings");
    EXPECT_STREQ(VFSEntityCfg::USER.ldapListFile, "/usr/zyro/etc/private/ldap_user");
    EXPECT_STREQ(VFSEntityCfg::USER.domainPid, "/tmp/domain_user.pid");
    EXPECT_STREQ(VFSEntityCfg::USER.lockFile, "/tmp/userlock");
    EXPECT_STREQ(VFSEntityCfg::GROUP.key, "group_settings");
    EXPECT_STREQ(VFSEntityCfg::GROUP.ldapListFile, "/usr/zyro/etc/private/ldap_group");
    EXPECT_STREQ(VFSEntityCfg::GROUP.domainPid, "/tmp/domain_group.pid");
    EXPECT_STREQ(VFSEntityCfg::GROUP.lockFile, "/tmp/grouplock");
}

TEST_F(Store, KindIsMadeByItsKey) {
    EXPECT_NE(dynamic_cast<VFSUser*>(MakeCfgBySettings("user_settings").get()), nullptr);
    EXPECT_NE(dynamic_cast<VFSGroup*>(MakeCfgBySettings("group_settings").get()), nullptr);
    EXPECT_EQ(MakeCfgBySettings("settings"), nullptr);
    EXPECT_EQ(MakeCfgBySettings(std::string()), nullptr);
    EXPECT_EQ(MakeCfgBySettings(static_cast<const char*>(nullptr)), nullptr);
}

TEST_F(Store, KindIsMadeByTheFirstMember) {
    EXPECT_NE(
        dynamic_cast<VFSUser*>(MakeCfgBySettings(policy::Parsed(R"({"user_settings":[]})")).get()),
        nullptr);
    EXPECT_NE(
        dynamic_cast<VFSGroup*>(
            MakeCfgBySettings(policy::Parsed(R"({"group_settings":[],"user_settings":[]})")).get()),
        nullptr);
    for (const char* text : {"null", "{}", "[]", "[\"user_settings\"]", "\"user_settings\"", "1",
                             R"({"user_enabled_type":"all","user_settings":[]})"}) {
        EXPECT_EQ(MakeCfgBySettings(policy::Parsed(text)), nullptr) << text;
    }
}

class AuthType : public Store {
  protected:
    AuthType() { Clear(); }
    ~AuthType() override { Clear(); }

    static void Clear() {
        for (const char* file : {"/tmp/domain_user.pid", "/tmp/domain_group.pid",
                                 "/tmp/domain_updating", paths::kLdapUserList}) {
            std::filesystem::remove(file);
        }
    }
    static bool Convert(const char* text) { return VFSUser().ConvertStrToAuthType(type_, text); }

    static inline AUTH_TYPE type_{};
};

TEST_F(AuthType, WordsHaveTheirNumbers) {
    constexpr struct {
        const char* text;
        unsigned number;
    } kRows[] = {{"local", 1}, {"domain", 2}, {"ldap", 8}, {"all", 11}};
    for (const auto& row : kRows) {
        EXPECT_TRUE(Convert(row.text));
        EXPECT_EQ(type_, row.number);
    }
}

TEST_F(AuthType, OtherWordsAreRefused) {
    for (const char* text : {"", "Local", "nis", "all "}) {
        ResetError();
        EXPECT_FALSE(Convert(text));
        EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM);
        EXPECT_TRUE(seams::Logged(std::string("Unsupported auth type: ") + text));
    }
}

TEST_F(AuthType, DomainIsBusyWhileItsUpdateRuns) {
    std::ofstream("/tmp/domain_user.pid") << getpid() << '\n';
    EXPECT_FALSE(Convert("domain"));
    EXPECT_EQ(GetError(), VFS_ERR_BUSY);
    EXPECT_TRUE(seams::Logged("Domain user updating"));
    AUTH_TYPE type{};
    EXPECT_TRUE(VFSGroup().ConvertStrToAuthType(type, "domain")) << "that is the users' update";
    EXPECT_TRUE(Convert("local"));
    EXPECT_TRUE(Convert("all"));
}

TEST_F(AuthType, PidOfADeadUpdateIsNoUpdate) {
    pid_t gone = 0;
    {
        support::OtherProcess other([] { return true; });
        gone = other.pid();
    }
    std::ofstream("/tmp/domain_user.pid") << gone << '\n';
    EXPECT_TRUE(Convert("domain"));
    std::ofstream("/tmp/domain_user.pid") << "no number\n";
    EXPECT_TRUE(Convert("domain"));
}

TEST_F(AuthType, DomainIsBusyWhileTheMarkOfAnUpdateStands) {
    std::ofstream("/tmp/domain_updating") << "";
    EXPECT_FALSE(Convert("domain"));
    EXPECT_EQ(GetError(), VFS_ERR_BUSY);
    EXPECT_TRUE(Convert("all"));
}

TEST_F(AuthType, LdapIsBusyUntilItsListIsThere) {
    bound = 1;
    const ScopeExit unbind([] { bound = 0; });
    EXPECT_FALSE(Convert("ldap"));
    EXPECT_EQ(GetError(), VFS_ERR_BUSY);
    EXPECT_TRUE(seams::Logged("ldap user updating"));
    EXPECT_TRUE(Convert("all"));
    std::filesystem::create_directories("/usr/zyro/etc/private");
    std::ofstream(paths::kLdapUserList) << "";
    EXPECT_TRUE(Convert("ldap"));
}

TEST_F(AuthType, LdapWithoutABindingIsNeverBusy) {
    EXPECT_TRUE(Convert("ldap"));
    EXPECT_EQ(type_, AUTH_TYPE_LDAP);
}

}  // namespace
