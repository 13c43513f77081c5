#include <zosplatform/error.h>
#include <zosplatform/user.h>

#include <gmock/gmock.h>

#include <memory>

#include "support/accounts.h"
#include "support/scratch.h"

namespace {

using accounts::AddGroup;
using accounts::AddUser;
using testing::ElementsAre;
using testing::IsEmpty;

using Names = std::vector<std::string>;

constexpr unsigned kAll = ZOS_AUTH_LOCAL | ZOS_AUTH_DOMAIN | ZOS_AUTH_LDAP;

struct Page {
    int total = 0;
    Names names;
    std::vector<uid_t> uids;
    int stop_after = -1;  ///< the callback fails after so many
};

int Take(const YLIBUSERINFO* entry, void* context) {
    Page& page = *static_cast<Page*>(context);
    if (page.stop_after == static_cast<int>(page.names.size())) {
        return -1;
    }
    page.names.emplace_back(entry->name);
    page.uids.push_back(entry->uid);
    return 0;
}

Page Enum(int start = 0, int limit = -1, unsigned type = ZOS_AUTH_LOCAL, const char* domain = "") {
    Page page;
    page.total = YLIBUserInfoEnum(type, domain, start, limit, Take, &page);
    return page;
}

Page ByPrefix(const char* prefix, int start = 0, int limit = -1) {
    Page page;
    page.total = YLIBUserInfoEnumByPrefix(ZOS_AUTH_LOCAL, prefix, "", start, limit, Take, &page);
    return page;
}

Page BySubstr(const char* substr, int start = 0, int limit = -1) {
    Page page;
    page.total = YLIBUserInfoEnumBySubstr(ZOS_AUTH_LOCAL, substr, "", start, limit, Take, &page);
    return page;
}

Names Administrators(unsigned type = ZOS_AUTH_LOCAL) {
    PYLIBCSZLIST list = YLIBCSzListAlloc(512);
    const int count = YLIBUserAdminListGet(type, &list);
    Names names;
    for (int i = 0; i < YLIBCSzListCount(list); ++i) {
        names.emplace_back(YLIBCSzListGet(list, i));
    }
    EXPECT_EQ(count, static_cast<int>(names.size()));
    YLIBCSzListFree(list);
    return names;
}

class UserList : public accounts::AccountsTest {
  protected:
    UserList() {
        AddUser("zoe", 1001);
        AddUser("Amy", 1002);
        AddUser("ben", 1003);
        AddUser("Äpfel", 1004);
        AddUser("amanda", 1005);
    }
};

TEST_F(UserList, LocalUsersComeByNameWithoutRegardToCase) {
    const Page page = Enum();
    EXPECT_THAT(page.names, ElementsAre("amanda", "Amy", "ben", "zoe", "Äpfel"));
    EXPECT_THAT(page.uids, ElementsAre(1005U, 1002U, 1003U, 1001U, 1004U));
    EXPECT_EQ(page.total, 5);
}

TEST_F(UserList, AccountsOfTheSystemAreLeftOut) {
    AddUser("service", 999);
    AddUser("last", 60000);
    AddUser("beyond", 60001);
    EXPECT_THAT(Enum().names, ElementsAre("amanda", "Amy", "ben", "last", "zoe", "Äpfel"));
}

TEST_F(UserList, RangeOfPeopleIsThatOfLoginDefs) {
    std::ofstream("/etc/login.defs") << "# UID_MIN 1\nUID_MIN 1003\nUID_MAX\t1004 # so few\n";
    EXPECT_THAT(Enum().names, ElementsAre("ben", "Äpfel"));
    std::ofstream("/etc/login.defs") << "UID_MIN many\n";
    EXPECT_EQ(Enum().total, 5);
    std::filesystem::remove("/etc/login.defs");
    EXPECT_EQ(Enum().total, 5);
}

TEST_F(UserList, PageIsCutAndTheTotalIsTrue) {
    EXPECT_THAT(Enum(1, 2).names, ElementsAre("Amy", "ben"));
    EXPECT_EQ(Enum(1, 2).total, 5);
    EXPECT_THAT(Enum(4, 10).names, ElementsAre("Äpfel"));
    EXPECT_THAT(Enum(0, 0).names, IsEmpty());
    EXPECT_EQ(Enum(0, 0).total, 5);
    EXPECT_THAT(Enum(5, 1).names, IsEmpty());
    EXPECT_EQ(Enum(2147483647, 2147483647).total, 5);
}

TEST_F(UserList, PagesPutTogetherAreTheWhole) {
    Names all;
    for (int start = 0; start < 5; ++start) {
        const Page page = Enum(start, 1);
        all.insert(all.end(), page.names.begin(), page.names.end());
    }
    EXPECT_EQ(all, Enum().names);
}

TEST_F(UserList, PrefixMatchesWithoutRegardToCaseInUtf8) {
    EXPECT_THAT(ByPrefix("AM").names, ElementsAre("amanda", "Amy"));
    EXPECT_THAT(ByPrefix("äp").names, ElementsAre("Äpfel"));
    EXPECT_THAT(ByPrefix("my").names, IsEmpty());
    EXPECT_EQ(ByPrefix("").total, 5);
    const Page page = ByPrefix("am", 1, 1);
    EXPECT_THAT(page.names, ElementsAre("Amy"));
    EXPECT_EQ(page.total, 2);
}

TEST_F(UserList, SubstringMatchesAnywhere) {
    EXPECT_THAT(BySubstr("MA").names, ElementsAre("amanda"));
    EXPECT_THAT(BySubstr("FEL").names, ElementsAre("Äpfel"));
    EXPECT_THAT(BySubstr("e", 1, 1).names, ElementsAre("zoe"));
    EXPECT_EQ(BySubstr("e", 1, 1).total, 3);
    EXPECT_EQ(BySubstr("").total, 5);
}

TEST_F(UserList, TextThatIsNoUtf8MatchesAsBytes) {
    AddUser("na\xefve", 1010);
    EXPECT_THAT(BySubstr("\xef").names, ElementsAre("na\xefve"));
    EXPECT_THAT(ByPrefix("NA\xef").names, ElementsAre("na\xefve"));
    EXPECT_THAT(BySubstr("\xff").names, IsEmpty());
}

TEST_F(UserList, CallbackThatFailsEndsTheEnumeration) {
    Page page;
    page.stop_after = 2;
    EXPECT_LT(YLIBUserInfoEnum(ZOS_AUTH_LOCAL, "", 0, -1, Take, &page), 0);
    EXPECT_EQ(page.names.size(), 2U);
}

TEST_F(UserList, BadArgumentsFail) {
    EXPECT_LT(Enum(-1, 1).total, 0);
    EXPECT_EQ(YLIBCErrGet(), ZOS_ERR_BAD_PARAMETER);
    EXPECT_LT(Enum(0, -2).total, 0);
    EXPECT_LT(YLIBUserInfoEnum(ZOS_AUTH_LOCAL, "", 0, -1, nullptr, nullptr), 0);
    Page page;
    EXPECT_EQ(YLIBUserInfoEnum(ZOS_AUTH_LOCAL, nullptr, 0, -1, Take, &page), 5);
    EXPECT_EQ(YLIBUserInfoEnumByPrefix(ZOS_AUTH_LOCAL, nullptr, nullptr, 0, -1, Take, &page), 5);
    EXPECT_EQ(Enum(0, -1, 0).total, 0);
}

TEST_F(UserList, MissingUserFileIsAFailure) {
    std::filesystem::rename("/etc/passwd", "/etc/passwd.away");
    EXPECT_LT(Enum().total, 0);
    EXPECT_EQ(YLIBCErrGet(), ZOS_ERR_NOT_FOUND);
    PYLIBCSZLIST list = YLIBCSzListAlloc(0);
    EXPECT_EQ(YLIBUserAdminListGet(ZOS_AUTH_LOCAL, &list), -1);
    YLIBCSzListFree(list);
    std::filesystem::rename("/etc/passwd.away", "/etc/passwd");
}

TEST_F(UserList, DamagedLinesArePassedOver) {
    accounts::Append("/etc/passwd", "");
    accounts::Append("/etc/passwd", "# a comment");
    accounts::Append("/etc/passwd", "short:x");
    accounts::Append("/etc/passwd", "text:x:many:100::/:/bin/sh");
    accounts::Append("/etc/passwd", accounts::UserLine(std::string(5000, 'l'), 1020));
    EXPECT_EQ(Enum().total, 6);
}

TEST_F(UserList, WithoutABindingThereAreNoOthers) {
    EXPECT_EQ(ZYROLDAPIsBinded(), 0);
    EXPECT_EQ(Enum(0, -1, ZOS_AUTH_LDAP).total, 0);
    EXPECT_EQ(Enum(0, -1, ZOS_AUTH_DOMAIN).total, 0);
    EXPECT_EQ(Enum(0, -1, kAll).total, 5);
}

TEST_F(UserList, UsersOfADirectoryServerAreNotWaitedFor) {
    for (const char* line : {"passwd: files ldap", "passwd:\tfiles sss [NOTFOUND=return]", ""}) {
        std::ofstream("/etc/nsswitch.conf") << line << '\n';
        EXPECT_EQ(ZYROLDAPIsBinded(), 0) << line;
    }
}

TEST_F(UserList, DirectoryServersAndDomainsAddTheirUsers) {
    std::ofstream("/etc/ldap.passwd") << accounts::UserLine("lena", 20001) << '\n'
                                      << accounts::UserLine("zoe", 20002) << '\n'
                                      << accounts::UserLine("service", 500) << '\n'
                                      << accounts::UserLine("passing", 61500) << '\n';
    std::ofstream("/etc/winbind.passwd") << accounts::UserLine("OFFICE\\dora", 30001) << '\n'
                                         << accounts::UserLine("LAB\\dirk", 30002) << '\n';
    accounts::BindToServices("ldap winbind");
    EXPECT_THAT(Enum(0, -1, ZOS_AUTH_LDAP).names, ElementsAre("lena"));
    EXPECT_THAT(Enum(0, -1, ZOS_AUTH_DOMAIN).names, ElementsAre("LAB\\dirk", "OFFICE\\dora"));
    EXPECT_THAT(Enum(0, -1, ZOS_AUTH_DOMAIN, "office").names, ElementsAre("OFFICE\\dora"));
    EXPECT_EQ(Enum(0, -1, ZOS_AUTH_LOCAL).total, 5);
    EXPECT_EQ(Enum(0, -1, kAll).total, 8);

    accounts::BindToServices("winbind");
    EXPECT_EQ(Enum(0, -1, ZOS_AUTH_LDAP).total, 0);
    EXPECT_EQ(Enum(0, -1, kAll).total, 7);
}

TEST_F(UserList, AdministratorsAreTheMembersOfTheirGroup) {
    AddGroup("administrators", 1500, "ben,Amy,gone");
    EXPECT_THAT(Administrators(), testing::UnorderedElementsAre("ben", "Amy"));
}

TEST_F(UserList, PrimaryGroupMakesAnAdministratorToo) {
    AddGroup("administrators", 1500, "ben");
    AddUser("prime", 1011, 1500);
    EXPECT_THAT(Administrators(), testing::UnorderedElementsAre("ben", "prime"));
}

TEST_F(UserList, SudoServesWhereThereAreNoAdministrators) {
    AddUser("prime", 1011, 27);
    EXPECT_THAT(Administrators(), ElementsAre("prime"));
    AddGroup("administrators", 1500, "ben");
    EXPECT_THAT(Administrators(), ElementsAre("ben"));
}

TEST_F(UserList, WithoutBothGroupsNobodyIsAnAdministrator) {
    std::ofstream("/etc/group") << "root:x:0:\nusers:x:100:\n";
    EXPECT_THAT(Administrators(), IsEmpty());
}

TEST_F(UserList, AdministratorsOfOtherKindsAreNotGiven) {
    AddGroup("administrators", 1500, "ben");
    EXPECT_THAT(Administrators(ZOS_AUTH_LDAP), IsEmpty());
    EXPECT_EQ(YLIBUserAdminListGet(ZOS_AUTH_LOCAL, nullptr), -1);
}

TEST_F(UserList, TenThousandUsersAreListedInAMoment) {
    std::string members;
    std::ofstream passwd("/etc/passwd", std::ios::app);
    for (int i = 0; i < 10000; ++i) {
        passwd << accounts::UserLine("Person" + std::to_string(i), 2000 + i) << '\n';
    }
    passwd.close();
    const clock_t begin = clock();
    const Page page = BySubstr("PERSON99", 2, 50);
    EXPECT_EQ(page.total, 111);
    EXPECT_EQ(page.names.front(), "Person9900") << "behind Person99 and Person990";
    EXPECT_EQ(Enum(9000, 50).names.size(), 50U);
    EXPECT_EQ(Enum().total, 10005);
    // Some hundredths of a second; anything quadratic takes minutes.
    EXPECT_LT(static_cast<double>(clock() - begin) / CLOCKS_PER_SEC, 3.0);
}

}  // namespace
