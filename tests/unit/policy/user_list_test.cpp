#include <gmock/gmock.h>
#include <sys/file.h>

#include <fcntl.h>

#include <numeric>

#include "support/failing_alloc.h"
#include "support/failing_directory.h"
#include "support/other_process.h"
#include "support/policy.h"

namespace {

using namespace ZYROVFS;
using namespace ZYROVFS::Cfg;
using policy::Put;

struct Query {
    int start = 0;
    int limit = -1;
    const char* auth_type = "local";
    const char* substr = "";
    const char* domain = "";
    bool prefix = false;
    bool no_id = false;
};

class List : public policy::PolicyTest {
  protected:
    List() {
        failing_directory::no_administrators = false;
        failing_directory::no_users = false;
        failing_directory::no_groups = false;
        failing_directory::no_ids = false;
        failing_alloc::no_list = false;
        for (const char* file : {"/tmp/userlock", "/tmp/grouplock", "/tmp/domain_user.pid"}) {
            std::filesystem::remove_all(file);
        }
    }

    template <typename Kind = VFSUser>
    bool Ask(const Query& q) {
        out_ = "as it was";
        return Kind().List(q.start, q.limit, q.auth_type, q.substr, q.domain, q.prefix, q.no_id,
                           out_);
    }
    /** "name enabled modifiable" of each entry. */
    std::vector<std::string> States() const {
        std::vector<std::string> states;
        for (const Json::Value& entry : out_["usergrp_settings"]) {
            states.push_back(entry["name"].asString() +
                             (entry["enabled"].asBool() ? " on" : " off") +
                             (entry["is_modifiable"].asBool() ? "" : " fixed"));
        }
        return states;
    }
    const Json::Value& First() const { return out_["usergrp_settings"][0]; }

    Json::Value out_;
};

using testing::ElementsAre;

TEST_F(List, EntriesCarryNameIdAndState) {
    Put(R"({"user_enabled_type":"custom","user_settings":{"4001":{"enabled":true}}})");
    ASSERT_TRUE(Ask({}));
    EXPECT_EQ(out_["offset"].asInt(), 0);
    EXPECT_EQ(out_["total"].asInt(), 4);
    EXPECT_THAT(States(), ElementsAre("amy on", "ben off", "chief on fixed", "cleo off"));
    EXPECT_EQ(First(), policy::Parsed(R"({"name":"amy","uid":"4001","enabled":true,)"
                                      R"("is_modifiable":true})"));
}

TEST_F(List, StoredStateIsShownWhateverTheTypeIs) {
    Put(R"({"user_enabled_type":"all","user_settings":{"4001":{"enabled":false}}})");
    ASSERT_TRUE(Ask({}));
    EXPECT_THAT(States(), ElementsAre("amy off", "ben off", "chief on fixed", "cleo off"));
}

TEST_F(List, AdminAndGuestAreNeverModifiableInAnyCaseOfLetters) {
    for (const char* name : {"admin", "Guest", "ADMIN2", "GUEST"}) {
        static unsigned uid = 5000;
        accounts::AddUser(name, uid++);
    }
    Put(R"({"user_settings":{"5000":{"enabled":true}}})");
    Query query;
    query.substr = "admin";
    ASSERT_TRUE(Ask(query));
    EXPECT_THAT(States(), ElementsAre("admin on fixed", "ADMIN2 off"));
    query.substr = "gUeSt";
    ASSERT_TRUE(Ask(query));
    EXPECT_THAT(States(), ElementsAre("GUEST off fixed", "Guest off fixed"));
}

TEST_F(List, LimitOfMinusOneIsAcceptedAndMinusTwoIsNot) {
    EXPECT_TRUE(Ask({0, -1}));
    EXPECT_EQ(States().size(), 4U);
    EXPECT_FALSE(Ask({0, -2}));
    EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM);
    EXPECT_TRUE(seams::Logged("Bad parameter, start=0, limit=-2"));
    EXPECT_FALSE(Ask({-1, 5}));
    EXPECT_TRUE(seams::Logged("Bad parameter, start=-1, limit=5"));
    EXPECT_EQ(out_, Json::Value("as it was"));
}

TEST_F(List, PageIsCutAndTheTotalIsTrue) {
    ASSERT_TRUE(Ask({1, 2}));
    EXPECT_THAT(States(), ElementsAre("ben off", "chief on fixed"));
    EXPECT_EQ(out_["offset"].asInt(), 1);
    EXPECT_EQ(out_["total"].asInt(), 4);
    ASSERT_TRUE(Ask({0, 0}));
    EXPECT_TRUE(out_["usergrp_settings"].isArray());
    EXPECT_TRUE(States().empty());
    EXPECT_EQ(out_["total"].asInt(), 4);
}

TEST_F(List, FilterIsAPrefixOrAPart) {
    Query query;
    query.substr = "C";
    query.prefix = true;
    ASSERT_TRUE(Ask(query));
    EXPECT_THAT(States(), ElementsAre("chief on fixed", "cleo off"));
    query.substr = "E";
    query.prefix = false;
    ASSERT_TRUE(Ask(query));
    EXPECT_THAT(States(), ElementsAre("ben off", "chief on fixed", "cleo off"));
}

TEST_F(List, WithoutIdsTheStateIsNotFoundEither) {
    Put(R"({"user_settings":{"4001":{"enabled":true}}})");
    Query query;
    query.no_id = true;
    ASSERT_TRUE(Ask(query));
    EXPECT_EQ(First()["uid"].asString(), "");
    EXPECT_FALSE(First()["enabled"].asBool());
}

TEST_F(List, IdsThatTheEnumerationLacksAreLookedUpByName) {
    Put(R"({"user_settings":{"4001":{"enabled":true}},)"
        R"("group_settings":{"1601":{"enabled":true}}})");
    failing_directory::no_ids = true;
    ASSERT_TRUE(Ask({}));
    EXPECT_EQ(First()["uid"].asString(), "4001");
    EXPECT_TRUE(First()["enabled"].asBool());
    ASSERT_TRUE(Ask<VFSGroup>({}));
    EXPECT_THAT(States(),
                ElementsAre("administrators on fixed", "painters on", "rowers off", "users off"));
}

TEST_F(List, OfLdapNeedsNoListOfItsOwnAndNamesThatCannotBeLookedUpHaveNoId) {
    std::ofstream("/etc/ldap.passwd") << accounts::UserLine("lena", 20001) << '\n';
    std::ofstream("/etc/ldap.group") << accounts::GroupLine("choir", 20002) << '\n';
    accounts::BindToServices("ldap");
    failing_directory::no_ids = true;
    Query query;
    query.auth_type = "ldap";
    ASSERT_TRUE(Ask(query));
    EXPECT_EQ(First()["name"].asString(), "lena");
    EXPECT_EQ(First()["uid"].asString(), "");
    ASSERT_TRUE(Ask<VFSGroup>(query));
    EXPECT_EQ(First()["name"].asString(), "choir");
    EXPECT_EQ(First()["gid"].asString(), "");
    EXPECT_TRUE(seams::Logged("ZYROGroupGetGID: choir")) << seams::LogDump();
}

TEST_F(List, GroupsHaveGidsAndTheAdministratorsAreFixed) {
    Put(R"({"group_settings":{"1602":{"enabled":true}}})");
    ASSERT_TRUE(Ask<VFSGroup>({}));
    EXPECT_THAT(States(),
                ElementsAre("administrators on fixed", "painters off", "rowers on", "users off"));
    EXPECT_EQ(First()["gid"].asString(), "1600");
    EXPECT_FALSE(First().isMember("uid"));
    Query query;
    query.substr = "ERS";
    ASSERT_TRUE(Ask<VFSGroup>(query));
    EXPECT_THAT(States(), ElementsAre("painters off", "rowers on", "users off"));
    query.prefix = true;
    ASSERT_TRUE(Ask<VFSGroup>(query));
    EXPECT_TRUE(States().empty());
}

TEST_F(List, GroupOfTheNameGuestMayBeChanged) {
    accounts::AddGroup("guest", 1700);
    Query query;
    query.substr = "guest";
    ASSERT_TRUE(Ask<VFSGroup>(query));
    EXPECT_THAT(States(), ElementsAre("guest off"));
}

TEST_F(List, DamagedSettingsShowAsNotEnabled) {
    for (const char* text :
         {R"({"user_settings":7})", R"({"user_settings":{"4001":"x","4002":{"enabled":{}}}})",
          R"({"user_settings":[{"enabled":true}],"user_enabled_type":{}})"}) {
        Put(text);
        EXPECT_NO_THROW(ASSERT_TRUE(Ask({})));
        EXPECT_THAT(States(), ElementsAre("amy off", "ben off", "chief on fixed", "cleo off"));
    }
}

TEST_F(List, DomainIsBusyDuringItsUpdate) {
    std::ofstream("/tmp/domain_user.pid") << getpid() << '\n';
    Query query;
    query.auth_type = "domain";
    EXPECT_FALSE(Ask(query));
    EXPECT_EQ(GetError(), VFS_ERR_BUSY);
    EXPECT_EQ(out_, Json::Value("as it was"));
    query.auth_type = "local";
    EXPECT_TRUE(Ask(query));
    query.auth_type = "all";
    EXPECT_TRUE(Ask(query));
}

TEST_F(List, UnknownAuthTypeIsRefused) {
    Query query;
    query.auth_type = "everything";
    EXPECT_FALSE(Ask(query));
    EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM);
}

TEST_F(List, LockHeldByAnotherProcessIsBusyAfterOneSecond) {
    const support::OtherProcess other([] {
        const int fd = open("/tmp/userlock", O_RDWR | O_CREAT, 0600);
        return fd >= 0 && flock(fd, LOCK_EX | LOCK_NB) == 0;
    });
    ASSERT_TRUE(other.ok());
    EXPECT_FALSE(Ask({}));
    EXPECT_EQ(GetError(), VFS_ERR_BUSY);
    const auto waits = seams::MicroSleeps();
    EXPECT_EQ(std::accumulate(waits.begin(), waits.end(), 0U), 1000000U);
    EXPECT_TRUE(seams::LoggedPart("Failed to lock file: /tmp/userlock [0x0400 file_lock.cpp:"))
        << seams::LogDump();
    EXPECT_TRUE(seams::LoggedPart(", reason=")) << seams::LogDump();
    EXPECT_TRUE(Ask<VFSGroup>({})) << "groups have a lock of their own";
}

TEST_F(List, LockIsFreeAfterSuccessAndFailure) {
    EXPECT_TRUE(Ask({}));
    EXPECT_TRUE(support::OthersCanLock("/tmp/userlock", LOCK_EX | LOCK_NB));
    failing_directory::no_users = true;
    EXPECT_FALSE(Ask({}));
    EXPECT_TRUE(support::OthersCanLock("/tmp/userlock", LOCK_EX | LOCK_NB));
}

TEST_F(List, FolderInPlaceOfTheLockIsBusy) {
    std::filesystem::create_directories("/tmp/userlock");
    EXPECT_FALSE(Ask({}));
    EXPECT_EQ(GetError(), VFS_ERR_BUSY);
}

TEST_F(List, MemoryThatRanOutIsToldAsAFailure) {
    failing_alloc::no_list = true;
    EXPECT_FALSE(Ask({}));
    EXPECT_EQ(GetError(), VFS_ERR_FAILED);
    EXPECT_TRUE(seams::Logged("YLIBCSzListAlloc failed [0x0200 heap.cpp:12]")) << seams::LogDump();
}

TEST_F(List, AdministratorsThatCannotBeListedAreAFailure) {
    failing_directory::no_administrators = true;
    EXPECT_FALSE(Ask({}));
    EXPECT_EQ(GetError(), VFS_ERR_FAILED);
    EXPECT_TRUE(seams::Logged("YLIBUserAdminListGet failed, type=1 [0x3C00 directory.cpp:12]"))
        << seams::LogDump();
    EXPECT_TRUE(Ask<VFSGroup>({})) << "groups do not ask for them";
}

TEST_F(List, EnumerationThatFailsLogsItsOwnText) {
    failing_directory::no_users = true;
    failing_directory::no_groups = true;
    Query query;
    query.domain = "OFFICE";
    EXPECT_FALSE(Ask(query));
    EXPECT_EQ(GetError(), VFS_ERR_FAILED);
    EXPECT_TRUE(seams::Logged("YLIBUserInfoEnum failed, type=1 domain=OFFICE"));
    query.substr = "a";
    EXPECT_FALSE(Ask(query));
    EXPECT_TRUE(seams::Logged("YLIBUserInfoEnumBySubstr failed, type=1, substr=a, domain=OFFICE"));
    EXPECT_FALSE(Ask<VFSGroup>(query));
    EXPECT_TRUE(seams::Logged("YLIBGroupInfoEnumByPrefix failed, type=1, substr=a, domain=OFFICE"));
    query.prefix = true;
    EXPECT_FALSE(Ask(query));
    EXPECT_TRUE(seams::Logged("YLIBUserInfoEnumByPrefix failed, type=1, substr=a, domain=OFFICE"))
        << seams::LogDump();
    EXPECT_EQ(out_["usergrp_settings"].size(), 0U);
    EXPECT_FALSE(out_.isMember("total"));
}

TEST_F(List, EnumerationIntoWhatIsNoObjectFails) {
    Json::Value out = "text";
    EXPECT_NO_THROW(
        EXPECT_FALSE(VFSUser().SDKEnum(0, -1, out, "", "", AUTH_TYPE_LOCAL, false, false)));
    EXPECT_EQ(GetError(), VFS_ERR_FAILED);
}

TEST_F(List, RunsAsRootAndGivesTheIdentityBack) {
    const policy::EffectiveUser user(policy::kAmy);
    EXPECT_TRUE(Ask({}));
    EXPECT_EQ(geteuid(), policy::kAmy);
    EXPECT_TRUE(seams::Logged("WARNING: setresuid(-1, 0, -1)"));
}

TEST_F(List, SectionThatCannotBecomeRootStillAnswers) {
    const policy::EffectiveUser user(policy::kAmy);
    std::filesystem::remove("/tmp/userlock");
    seams::FailIdentity("setresuid(-1, 0, -1)", EPERM);
    EXPECT_TRUE(Ask({})) << seams::LogDump();
    EXPECT_TRUE(seams::Logged("ERROR: ENTERCriticalSection"));
}

}  // namespace
