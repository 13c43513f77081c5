// `zyrovfs policy`: what it shows, what it changes, how it says no.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <json/reader.h>

#include <filesystem>
#include <memory>

#include "support/locations.h"
#include "support/machine.h"

namespace {

using machine::Must;
using machine::Outcome;
using testing::HasSubstr;
using testing::Not;

const std::string kTool = BuildDir() + "/tools/zyrovfs/zyrovfs";
const std::string kPolicy = "/usr/zyro/etc/zyrovfs/user.conf";

Outcome Policy(const std::string& arguments) {
    return machine::Run(kTool + " policy " + arguments);
}

Json::Value Parse(const std::string& text) {
    const std::unique_ptr<Json::CharReader> reader(Json::CharReaderBuilder().newCharReader());
    Json::Value value;
    std::string errors;
    EXPECT_TRUE(reader->parse(text.data(), text.data() + text.size(), &value, &errors))
        << errors << text;
    return value;
}

Json::Value AsJson(const std::string& arguments) {
    return Parse(machine::Run(kTool + " policy " + arguments + " --json 2>/dev/null").output);
}

bool HasProfiles(unsigned uid) {
    return std::filesystem::exists("/usr/zyro/etc/zyrovfs/" + std::to_string(uid) +
                                   "/servers.conf");
}

class PolicyTool : public testing::Test {
  protected:
    static void SetUpTestSuite() {
        for (const auto& [name, uid] :
             {std::pair{"amy", 4001U}, std::pair{"ben", 4002U}, std::pair{"chief", 4003U}}) {
            machine::AddUser(name, uid);
        }
        Must("groupadd --gid 1601 painters && usermod -aG painters ben && usermod -aG sudo chief");
    }
    void SetUp() override {
        std::filesystem::remove_all("/usr/zyro/etc/zyrovfs");
        std::filesystem::create_directories("/usr/zyro/etc/zyrovfs");
        for (const char* uid : {"4001", "4002", "4003"}) {
            for (const char* folder : {"/usr/zyro/etc/zyrovfs/", "/var/tmp/zyrovfs/"}) {
                std::filesystem::create_directories(std::string(folder) + uid);
            }
            std::ofstream(std::string("/usr/zyro/etc/zyrovfs/") + uid + "/servers.conf") << "{}";
        }
    }
    static Json::Value Stored() { return Parse(machine::Read(kPolicy)); }
};

TEST_F(PolicyTool, MachineWithoutAPolicyIsForAdministrators) {
    EXPECT_THAT(Policy("show").output, HasSubstr("The policy is admin: only administrators"));
    const Outcome amy = Policy("check --user amy");
    EXPECT_EQ(amy.status, 1);
    EXPECT_EQ(amy.output,
              "User amy may not use remote connections: the policy lets administrators in only.\n");
    const Outcome chief = Policy("check --uid 4003");
    EXPECT_EQ(chief.status, 0);
    EXPECT_THAT(chief.output, HasSubstr("administrators cannot be shut out"));
}

TEST_F(PolicyTool, TypeIsSetAndTold) {
    EXPECT_EQ(Policy("set --type all").output, "The policy is now all; it was admin.\n");
    EXPECT_EQ(Policy("set --type all").output, "The policy is all already.\n");
    EXPECT_EQ(Stored()["user_enabled_type"].asString(), "all");
    EXPECT_EQ(Policy("check --user amy").output,
              "User amy may use remote connections: the policy lets everybody in.\n");
    EXPECT_EQ(Policy("set --type everyone").status, 2);
    EXPECT_EQ(Policy("set").status, 2);
}

TEST_F(PolicyTool, CustomWithSettingsInOneStepFromAll) {
    Policy("set --type all");
    EXPECT_EQ(Policy("set --type custom --enable amy --enable-group painters").status, 0);
    EXPECT_TRUE(HasProfiles(4001)) << "enabled in person";
    EXPECT_TRUE(HasProfiles(4002)) << "enabled by the group, known before anyone is shut out";
    EXPECT_TRUE(HasProfiles(4003));
    EXPECT_EQ(Stored(), Parse(R"({"user_enabled_type":"custom",)"
                              R"("user_settings":{"4001":{"enabled":true}},)"
                              R"("group_settings":{"1601":{"enabled":true}}})"));
    EXPECT_EQ(AsJson("check --user ben")["rule"].asString(), "group_enabled");
    EXPECT_EQ(AsJson("check --user ben")["gid"].asUInt(), 1601U);
    EXPECT_EQ(AsJson("check --user amy")["rule"].asString(), "user_enabled");
}

TEST_F(PolicyTool, CustomWithSettingsInOneStepFromNothing) {
    EXPECT_EQ(Policy("set --type custom --enable amy").status, 0);
    EXPECT_EQ(Stored()["user_settings"], Parse(R"({"4001":{"enabled":true}})"));
    EXPECT_TRUE(HasProfiles(4002)) << "from administrators only, nobody is shut out";
}

TEST_F(PolicyTool, DisabledUserLosesTheProfilesUnlessAGroupIsEnabled) {
    Policy("set --type custom --enable amy ben");
    EXPECT_EQ(Policy("set --disable amy --disable ben --enable-group painters").status, 0);
    EXPECT_FALSE(HasProfiles(4001));
    EXPECT_TRUE(HasProfiles(4002));
    EXPECT_EQ(Policy("set --disable-group painters").status, 0);
    EXPECT_FALSE(HasProfiles(4002));
}

TEST_F(PolicyTool, ForgottenUserIsNotEnabledAnyMore) {
    Policy("set --type custom --enable amy ben");
    EXPECT_EQ(Policy("set --forget amy 99999").status, 0);
    EXPECT_EQ(Stored()["user_settings"], Parse(R"({"4002":{"enabled":true}})"));
    EXPECT_FALSE(HasProfiles(4001));
    EXPECT_TRUE(HasProfiles(4002));
}

TEST_F(PolicyTool, SettingsAreRefusedWhereTheyWouldNotCount) {
    for (const char* type : {"all", "admin"}) {
        Policy(std::string("set --type ") + type);
        const std::string before = machine::Read(kPolicy);
        const Outcome outcome = Policy("set --disable amy");
        EXPECT_EQ(outcome.status, 1);
        EXPECT_THAT(outcome.output, HasSubstr("add --type custom"));
        EXPECT_EQ(machine::Read(kPolicy), before);
        EXPECT_TRUE(HasProfiles(4001));
    }
}

TEST_F(PolicyTool, UnknownNamesChangeNothing) {
    for (const char* names : {"--enable nobodyatall", "--enable amy --disable-group nogroupatall",
                              "--forget nobodyatall", "--enable 4001"}) {
        const Outcome outcome = Policy(std::string("set --type custom ") + names);
        EXPECT_EQ(outcome.status, 1) << names;
        EXPECT_THAT(outcome.output, HasSubstr("There is no ")) << names;
        EXPECT_FALSE(std::filesystem::exists(kPolicy)) << names;
    }
}

TEST_F(PolicyTool, ThoseWhoAreGoneAreShownAndForgottenByNumber) {
    std::ofstream(kPolicy) << R"({"user_enabled_type":"custom","user_settings":{"4999":)"
                              R"({"enabled":true}},"group_settings":{"text":7}})";
    const std::string shown = Policy("show").output;
    EXPECT_THAT(shown, HasSubstr("user   (gone)"));
    EXPECT_EQ(AsJson("show")["user_settings"][0]["name"].asString(), "");
    EXPECT_EQ(Policy("set --forget 4999").status, 0);
    EXPECT_TRUE(Stored()["user_settings"].empty());
}

TEST_F(PolicyTool, ListIsPagedAndFiltered) {
    EXPECT_THAT(Policy("list --prefix AM").output, HasSubstr("amy   4001  no       yes"));
    EXPECT_THAT(Policy("list --contains hie").output, HasSubstr("chief  4003  yes      no"));
    const Json::Value page = AsJson("list --auth local --offset 1 --limit 1");
    EXPECT_EQ(page["usergrp_settings"].size(), 1U);
    EXPECT_EQ(page["usergrp_settings"][0]["name"].asString(), "ben");
    EXPECT_GE(page["total"].asInt(), 3);
    EXPECT_THAT(Policy("list --limit 1").output, HasSubstr("1 of "));
    EXPECT_THAT(Policy("list --groups --prefix paint").output, HasSubstr("painters  1601"));
    EXPECT_EQ(Policy("list --contains xyz").output, "There are no such users.\n");
    EXPECT_EQ(AsJson("list --auth ldap")["total"].asInt(), 0);
    EXPECT_EQ(Policy("list --prefix a --contains b").status, 2);
    EXPECT_EQ(Policy("list --limit -1").status, 2);
    EXPECT_EQ(Policy("list --auth nis").status, 2);
}

TEST_F(PolicyTool, BusyDomainIsTold) {
    std::ofstream("/tmp/domain_updating") << "";
    const Outcome outcome = Policy("list --auth domain");
    std::filesystem::remove("/tmp/domain_updating");
    EXPECT_EQ(outcome.status, 1);
    EXPECT_THAT(outcome.output, HasSubstr("VFS_ERR_BUSY"));
}

TEST_F(PolicyTool, SharingHasARuleOfItsOwn) {
    const Json::Value answer = AsJson("check --user amy --protocol sharing");
    EXPECT_TRUE(answer["allowed"].asBool());
    EXPECT_EQ(answer["rule"].asString(), "sharing");
    EXPECT_FALSE(AsJson("check --user amy --protocol ftp")["allowed"].asBool());
}

TEST_F(PolicyTool, UsersWhoAreNotThereMayNot) {
    EXPECT_EQ(AsJson("check --uid 4998")["rule"].asString(), "no_such_user");
    EXPECT_THAT(Policy("check --user nobodyatall").output, HasSubstr("There is no user"));
    EXPECT_EQ(Policy("check").status, 2);
}

TEST_F(PolicyTool, DamagedFileIsToldAndNotWrittenOver) {
    for (const char* text : {"{\"user_enabled_ty", "", "[]"}) {
        std::ofstream(kPolicy) << text;
        for (const char* command : {"show", "set --type all"}) {
            const Outcome outcome = Policy(command);
            EXPECT_EQ(outcome.status, 1) << command;
            EXPECT_THAT(outcome.output, HasSubstr("VFS_ERR_CONFIG_READ")) << command;
        }
        EXPECT_EQ(machine::Read(kPolicy), text);
        EXPECT_EQ(Policy("check --user amy").status, 1);
    }
}

TEST_F(PolicyTool, FailedWriteIsTold) {
    Must("mount -t tmpfs -o size=8k tmpfs /usr/zyro/etc/zyrovfs");
    machine::Run("head -c 65536 /dev/zero >/usr/zyro/etc/zyrovfs/fill");
    const Outcome outcome = Policy("set --type all");
    Must("umount /usr/zyro/etc/zyrovfs");
    EXPECT_EQ(outcome.status, 1);
    EXPECT_THAT(outcome.output, HasSubstr("VFS_ERR_CONFIG_WRITE"));
}

TEST_F(PolicyTool, IsForRootOnly) {
    for (const char* command : {"show", "list", "set --type all", "check --user amy"}) {
        const Outcome outcome = machine::RunAs("amy", kTool + " policy " + command);
        EXPECT_EQ(outcome.status, 1) << command;
        EXPECT_THAT(outcome.output, HasSubstr("Only root")) << command;
    }
    EXPECT_FALSE(std::filesystem::exists(kPolicy));
}

}  // namespace
