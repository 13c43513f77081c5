// What a change of the policy does to live mounts of a real server: each change of the type, and
// changes of settings, with users whom it hits and users whom it spares.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <map>
#include <set>

#include "support/machine.h"
#include "zyrovfs/zyrovfs_netdrive.h"

namespace {

using namespace ZYROVFS;
using machine::Eventually;
using machine::Must;
using machine::RunAs;

struct Person {
    const char* name;
    unsigned uid;
};

// In painters; in painters and rowers; in no group but that of all; an administrator.
constexpr Person kPeople[] = {{"amy", 4001}, {"ben", 4002}, {"cleo", 4003}, {"chief", 4004}};
constexpr const char* kPolicy = "/usr/zyro/etc/zyrovfs/user.conf";
constexpr const char* kId = "ftp://remo@127.0.0.1:2121";

using Names = std::set<std::string>;

/** Saves and connects, as a web program would: in a process of its own. */
int SaveAndConnect(unsigned uid) {
    Json::Value profile;
    profile["protocol"] = "ftp";
    profile["hostname"] = "127.0.0.1";
    profile["port"] = 2121;
    profile["alias"] = "Remote";
    profile["account"] = "remo";
    profile["password"] = "secret";
    profile["codepage"] = "UTF-8";
    std::string id;
    Json::Value out;
    // What an earlier test left standing is as good.
    const bool saved = Server::Add(uid, Server::VFS_CONFIG_SERVER, id, profile, false, out) ||
                       GetError() == VFS_ERR_SERVER_EXISTS;
    const bool connected = Server::Add(uid, Server::VFS_CONFIG_CONNECT, id, profile, false, out);
    if (!saved || !connected) {
        fprintf(stderr, "user %u: %s\n", uid, GetErrorName(GetError()));
    }
    return saved && connected ? 0 : 1;
}

std::string Tree(const Person& person) {
    return "/var/tmp/user/" + std::to_string(person.uid) + "/gvfs";
}

bool IsMounted(const Person& person) {
    return RunAs(person.name, "cat " + Tree(person) + "/ftp*/hello.txt").output ==
           "hello from the remote side\n";
}

bool ShowsNothing(const Person& person) {
    return RunAs(person.name, "ls " + Tree(person)).output.find("ftp:") == std::string::npos;
}

bool Exists(const std::string& path) {
    return access(path.c_str(), F_OK) == 0;
}

bool HasProfile(const Person& person) {
    return Exists("/usr/zyro/etc/zyrovfs/" + std::to_string(person.uid) + "/servers.conf");
}

bool HasRecord(const Person& person) {
    return Exists("/var/tmp/zyrovfs/" + std::to_string(person.uid) + "/connect.conf");
}

Json::Value Setting(const char* id, unsigned number, bool enabled) {
    Json::Value setting;
    setting[id] = number;
    setting["enabled"] = enabled;
    return setting;
}

class Policy : public testing::Test {
  protected:
    static void SetUpTestSuite() {
        for (const Person& person : kPeople) {
            machine::AddUser(person.name, person.uid);
        }
        Must(
            "groupadd --gid 1601 painters && groupadd --gid 1602 rowers && "
            "groupadd --gid 1600 administrators && usermod -aG painters amy && "
            "usermod -aG painters,rowers ben && usermod -aG administrators chief");
        machine::Remote("start secret");
    }

    /** Everyone has a saved profile and a live mount. */
    void SetUp() override {
        unlink(kPolicy);
        std::vector<pid_t> children;
        for (const Person& person : kPeople) {
            fflush(nullptr);
            const pid_t pid = fork();
            if (pid == 0) {
                _exit(SaveAndConnect(person.uid));
            }
            children.push_back(pid);
        }
        for (const pid_t pid : children) {
            int status = 0;
            waitpid(pid, &status, 0);
            ASSERT_EQ(status, 0);
        }
        for (const Person& person : kPeople) {
            ASSERT_TRUE(Eventually([&] { return IsMounted(person); })) << person.name;
        }
    }

    static void Begin(const std::string& policy) { std::ofstream(kPolicy) << policy; }

    /** In a process of its own, since the change sets the environment to other users. */
    template <typename Kind>
    static void Change(Json::Value conf) {
        ASSERT_EQ(machine::InProcess([&] {
                      Kind cfg;
                      return cfg.Set(conf) ? 0 : 1;
                  }),
                  0);
    }
    static void ChangeTo(const char* type, Json::Value conf = Json::Value()) {
        conf["user_enabled_type"] = type;
        Change<Cfg::VFSUser>(conf);
    }

    /** These have lost their mounts, and where `profiles` says so their profiles; nobody else. */
    static void ExpectHit(const Names& hit, bool profiles) {
        for (const Person& person : kPeople) {
            const bool is_hit = hit.count(person.name) != 0;
            EXPECT_EQ(HasRecord(person), !is_hit) << person.name;
            EXPECT_EQ(HasProfile(person), !(is_hit && profiles)) << person.name;
            if (is_hit) {
                EXPECT_TRUE(Eventually([&] { return ShowsNothing(person); })) << person.name;
            } else {
                EXPECT_TRUE(IsMounted(person)) << person.name;
            }
        }
    }
};

TEST_F(Policy, FromAllToAdminTakesDownTheMountsOfNonAdminsAndKeepsTheirProfiles) {
    Begin(R"({"user_enabled_type":"all"})");
    ChangeTo("admin");
    ExpectHit({"amy", "ben", "cleo"}, false);
}

TEST_F(Policy, FromCustomToAdminHitsTheEnabledToo) {
    Begin(R"({"user_enabled_type":"custom","user_settings":{"4001":{"enabled":true}},)"
          R"("group_settings":{"1602":{"enabled":true},"100":{"enabled":true}}})");
    ChangeTo("admin");
    ExpectHit({"amy", "ben", "cleo"}, false);
}

TEST_F(Policy, FromAdminToCustomHitsNobody) {
    Begin(R"({"user_enabled_type":"admin"})");
    Json::Value conf;
    conf["user_settings"].append(Setting("uid", 4001, false));
    ChangeTo("custom", conf);
    ExpectHit({}, false);
    EXPECT_EQ(machine::Read(kPolicy),
              "{\"user_enabled_type\":\"custom\",\"user_settings\":"
              "{\"4001\":{\"enabled\":false}}}\n");
}

TEST_F(Policy, FromAllToCustomHitsThoseWhoAreNotEnabledWithTheirProfiles) {
    Begin(R"({"user_enabled_type":"all","group_settings":{"1602":{"enabled":true}}})");
    Json::Value conf;
    conf["user_settings"].append(Setting("uid", 4001, true));
    conf["user_settings"].append(Setting("uid", 4002, false));
    ChangeTo("custom", conf);
    // Amy is enabled in person, Ben by the second of his groups.
    ExpectHit({"cleo"}, true);
}

TEST_F(Policy, ToAllAndToTheSameTypeHitsNobody) {
    for (const auto& [from, to] :
         {std::pair{"admin", "all"}, std::pair{"custom", "all"}, std::pair{"all", "all"},
          std::pair{"admin", "admin"}, std::pair{"custom", "custom"}}) {
        Begin(std::string(R"({"user_enabled_type":")") + from + "\"}");
        Json::Value conf;
        conf["user_settings"].append(Setting("uid", 4001, false));
        ChangeTo(to, conf);
        EXPECT_EQ(machine::Read(kPolicy), std::string(R"({"user_enabled_type":")") + to + "\"}\n");
    }
    ExpectHit({}, false);
}

TEST_F(Policy, FirstTypeOfAMachineHitsNobody) {
    ChangeTo("admin");
    ExpectHit({}, false);
    unlink(kPolicy);
    ChangeTo("custom");
    ExpectHit({}, false);
}

TEST_F(Policy, DisablingAUserSparesHimWhileOneOfHisGroupsIsEnabled) {
    Begin(R"({"user_enabled_type":"custom","user_settings":{"4001":{"enabled":true},)"
          R"("4002":{"enabled":true},"4003":{"enabled":true}},)"
          R"("group_settings":{"1601":{"enabled":false},"1602":{"enabled":true}}})");
    Json::Value conf;
    conf["user_settings"].append(Setting("uid", 4001, false));
    conf["user_settings"].append(Setting("uid", 4002, false));
    Change<Cfg::VFSUser>(conf);
    ExpectHit({"amy"}, true);
}

TEST_F(Policy, DisablingAGroupHitsItsMembersUnlessAnotherGroupOrTheirOwnEntryLetsThemStay) {
    Begin(R"({"user_enabled_type":"custom","user_settings":{"4003":{"enabled":true}},)"
          R"("group_settings":{"1601":{"enabled":true},"1602":{"enabled":true}}})");
    Json::Value conf;
    conf["group_settings"].append(Setting("gid", 1601, false));
    Change<Cfg::VFSGroup>(conf);
    ExpectHit({"amy"}, true);
}

TEST_F(Policy, AdministratorOfSeveralGroupsIsSparedByAll) {
    Must("usermod -aG painters,rowers chief");
    Begin(R"({"user_enabled_type":"custom","user_settings":{"4004":{"enabled":false}},)"
          R"("group_settings":{"1601":{"enabled":false},"1602":{"enabled":false}}})");
    EXPECT_EQ(machine::InProcess([] { return Cfg::VFSUser().DisConnDisabledConf() ? 0 : 1; }), 0);
    ExpectHit({"amy", "ben", "cleo"}, true);
}

TEST_F(Policy, FilterHitsMembersOfEveryGroupButTheAdministrators) {
    EXPECT_EQ(machine::InProcess([] { return Cfg::VFSGroup().FilterNonAdminEntities() ? 0 : 1; }),
              0);
    ExpectHit({"amy", "ben", "cleo"}, false);
}

TEST_F(Policy, ChecksAnswerInStepWithWhatIsTakenDown) {
    Begin(R"({"user_enabled_type":"custom","group_settings":{"1602":{"enabled":true}}})");
    std::map<std::string, bool> may;
    for (const Person& person : kPeople) {
        may[person.name] = Cfg::CheckPermissionByUserName(person.name, {1}, "ftp");
    }
    EXPECT_EQ(may, (std::map<std::string, bool>{
                       {"amy", false}, {"ben", true}, {"chief", true}, {"cleo", false}}));
}

TEST_F(Policy, WebProgramOfAUserChangesThePolicyAndIsThatUserAgain) {
    Begin(R"({"user_enabled_type":"all"})");
    EXPECT_EQ(machine::InProcess([] {
                  if (seteuid(4004) != 0) {
                      return 1;
                  }
                  {
                      Cfg::VFSUser cfg;
                      Json::Value conf;
                      conf["user_enabled_type"] = "admin";
                      if (!cfg.Set(conf) || geteuid() != 4004) {
                          return 2;
                      }
                  }
                  return geteuid() == 4004 ? 0 : 3;
              }),
              0);
    ExpectHit({"amy", "ben", "cleo"}, false);
}

}  // namespace
