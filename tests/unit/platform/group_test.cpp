#include <zosplatform/error.h>
#include <zosplatform/group.h>

#include <gmock/gmock.h>

#include "support/accounts.h"

namespace {

using accounts::AddGroup;
using accounts::AddUser;
using testing::ElementsAre;
using testing::IsEmpty;

using Texts = std::vector<std::string>;

class Group : public accounts::AccountsTest {
  protected:
    Group() {
        AddUser("amy", 1001);
        AddUser("ben", 1002, 1602);
        AddGroup("painters", 1601, "amy,ben");
        AddGroup("Singers", 1602);
        AddGroup("ärzte", 1603, "amy");
    }

    /** Null as a list of one text that says so. */
    static Texts GroupsOf(const char* user) {
        PYLIBCSZLIST list = YLIBGroupInfoListGet(user, 0);
        if (list == nullptr) {
            return {"null"};
        }
        Texts texts;
        for (int i = 0; i < YLIBCSzListCount(list); ++i) {
            texts.emplace_back(YLIBCSzListGet(list, i));
        }
        YLIBCSzListFree(list);
        return texts;
    }
};

struct Page {
    int total = 0;
    Texts names;
};

int Take(const YLIBGROUPINFO* entry, void* context) {
    static_cast<Page*>(context)->names.emplace_back(entry->name);
    return 0;
}

Page ByPrefix(const char* prefix, int start = 0, int limit = -1, unsigned type = 1) {
    Page page;
    page.total = YLIBGroupInfoEnumByPrefix(type, prefix, "", start, limit, Take, &page);
    return page;
}

Page BySubstr(const char* substr) {
    Page page;
    page.total = YLIBGroupInfoEnumBySubstr(1, substr, "", 0, -1, Take, &page);
    return page;
}

TEST_F(Group, ListHoldsThePeoplesGroupsAndTheAdministrators) {
    const Page page = ByPrefix("");
    EXPECT_THAT(page.names, ElementsAre("painters", "Singers", "sudo", "users", "ärzte"));
    EXPECT_EQ(page.total, 5);
    AddGroup("administrators", 50);
    EXPECT_THAT(ByPrefix("").names,
                ElementsAre("administrators", "painters", "Singers", "users", "ärzte"));
}

TEST_F(Group, PrefixAndSubstringMatchWithoutRegardToCaseInUtf8) {
    EXPECT_THAT(ByPrefix("SIN").names, ElementsAre("Singers"));
    EXPECT_THAT(ByPrefix("Ä").names, ElementsAre("ärzte"));
    EXPECT_THAT(BySubstr("ERS").names, ElementsAre("painters", "Singers", "users"));
    EXPECT_THAT(BySubstr("ÄRZ").names, ElementsAre("ärzte"));
    EXPECT_THAT(BySubstr("nobody").names, IsEmpty());
}

TEST_F(Group, PageIsCutAndTheTotalIsTrue) {
    const Page page = ByPrefix("", 1, 2);
    EXPECT_THAT(page.names, ElementsAre("Singers", "sudo"));
    EXPECT_EQ(page.total, 5);
    EXPECT_LT(ByPrefix("", -1, 2).total, 0);
    EXPECT_LT(YLIBGroupInfoEnumByPrefix(1, "", "", 0, -1, nullptr, nullptr), 0);
}

TEST_F(Group, DirectoryServerAddsItsGroups) {
    std::ofstream("/etc/ldap.group") << "rowers:x:20001:amy\n";
    EXPECT_EQ(ByPrefix("", 0, -1, 8).total, 0);
    accounts::BindToServices("ldap");
    EXPECT_THAT(ByPrefix("", 0, -1, 8).names, ElementsAre("rowers"));
    EXPECT_EQ(ByPrefix("", 0, -1, 9).total, 6);
}

TEST_F(Group, BelongingGroupsAreNumbersThePrimaryFirst) {
    EXPECT_THAT(GroupsOf("amy"), ElementsAre("100", "1601", "1603"));
    EXPECT_THAT(GroupsOf("ben"), ElementsAre("1602", "1601"));
}

TEST_F(Group, UserMayBelongToHundredsOfGroups) {
    for (int i = 0; i < 300; ++i) {
        AddGroup("g" + std::to_string(i), 3000 + i, "amy");
    }
    EXPECT_EQ(GroupsOf("amy").size(), 303U);
}

TEST_F(Group, GroupsOfNobodyAreNull) {
    EXPECT_THAT(GroupsOf("gone"), ElementsAre("null"));
    EXPECT_EQ(YLIBCErrGet(), ZOS_ERR_NO_SUCH_USER);
    EXPECT_THAT(GroupsOf(nullptr), ElementsAre("null"));
    EXPECT_EQ(YLIBCErrGet(), ZOS_ERR_BAD_PARAMETER);
}

TEST_F(Group, AdministratorIsAMemberAlsoByThePrimaryGroup) {
    AddGroup("administrators", 1700, "amy");
    AddUser("prime", 1003, 1700);
    EXPECT_EQ(YLIBGroupIsAdminGroupMemByUid(1001, 1), 1);
    EXPECT_EQ(YLIBGroupIsAdminGroupMemByUid(1002, 1), 0);
    EXPECT_EQ(YLIBGroupIsAdminGroupMemByUid(1003, 1), 1);
}

TEST_F(Group, SudoServesOnlyWhereThereAreNoAdministrators) {
    AddUser("prime", 1003, 27);
    EXPECT_EQ(YLIBGroupIsAdminGroupMemByUid(1003, 1), 1);
    EXPECT_EQ(ZYROGroupIsAdminGroup("sudo"), 1);
    AddGroup("administrators", 1700);
    EXPECT_EQ(YLIBGroupIsAdminGroupMemByUid(1003, 1), 0);
    EXPECT_EQ(ZYROGroupIsAdminGroup("sudo"), 0);
    EXPECT_EQ(ZYROGroupIsAdminGroup("Administrators"), 1);
}

TEST_F(Group, WhoIsNotKnownIsNoAdministrator) {
    AddGroup("administrators", 1700, "gone");
    EXPECT_EQ(YLIBGroupIsAdminGroupMemByUid(4242, 1), 0);
    EXPECT_EQ(YLIBGroupIsAdminGroupMemByUid(static_cast<uid_t>(-1), 1), 0);
    std::ofstream("/etc/group") << "root:x:0:\n";
    EXPECT_EQ(YLIBGroupIsAdminGroupMemByUid(1001, 1), 0);
}

TEST_F(Group, NobodyIsToldToBeNoAdministratorWhileADirectoryServiceDoesNotAnswer) {
    AddGroup("administrators", 1700, "amy");
    accounts::BindToServices("ldap");
    std::filesystem::remove("/etc/ldap.group");
    EXPECT_EQ(YLIBGroupIsAdminGroupMemByUid(1001, 1), 1) << "this machine knows";
    EXPECT_EQ(YLIBGroupIsAdminGroupMemByUid(1002, 1), -1);
    EXPECT_EQ(YLIBCErrGet(), ZOS_ERR_SYSTEM);
    EXPECT_EQ(YLIBGroupIsAdminGroupMemByUid(4242, 1), -1);
    std::ofstream("/etc/ldap.group") << "administrators:x:1700:ben\n";
    EXPECT_EQ(YLIBGroupIsAdminGroupMemByUid(1002, 1), 1);
    EXPECT_EQ(YLIBGroupIsAdminGroupMemByUid(4242, 1), 0);
    std::ofstream("/etc/ldap.group") << "";
    EXPECT_EQ(YLIBGroupIsAdminGroupMemByUid(1002, 1), 0);
    accounts::BindToServices("sss");
    EXPECT_EQ(YLIBGroupIsAdminGroupMemByUid(1002, 1), 0) << "a service that is not installed";
}

TEST_F(Group, AdministratorsGroupIsKnownByName) {
    EXPECT_EQ(ZYROGroupIsAdminGroup("SUDO"), 1);
    EXPECT_EQ(ZYROGroupIsAdminGroup("users"), 0);
    EXPECT_EQ(ZYROGroupIsAdminGroup("administrators"), 0) << "there is no such group";
    EXPECT_EQ(ZYROGroupIsAdminGroup(""), 0);
    EXPECT_EQ(ZYROGroupIsAdminGroup(nullptr), 0);
}

TEST_F(Group, NumberIsFoundByName) {
    gid_t gid = 7;
    EXPECT_EQ(ZYROGroupGetGID("Singers", &gid), 0);
    EXPECT_EQ(gid, 1602U);
    EXPECT_EQ(ZYROGroupGetGID("gone", &gid), -1);
    EXPECT_EQ(YLIBCErrGet(), ZOS_ERR_NO_SUCH_GROUP);
    EXPECT_STREQ(YLIBCErrorGetFile(), "group.cpp");
    EXPECT_EQ(gid, 1602U);
    EXPECT_EQ(ZYROGroupGetGID(nullptr, &gid), -1);
    EXPECT_EQ(ZYROGroupGetGID("users", nullptr), -1);
    EXPECT_EQ(YLIBCErrGet(), ZOS_ERR_BAD_PARAMETER);
}

}  // namespace
