/** The policy file, and people with something to lose. */
#ifndef ZYROVFS_TESTS_POLICY_H
#define ZYROVFS_TESTS_POLICY_H

#include <unistd.h>

#include <filesystem>
#include <fstream>
#include <string>

#include "core/json.h"
#include "core/paths.h"
#include "support/accounts.h"
#include "support/seams.h"
#include "zyrovfs/cfg.h"
#include "zyrovfs/error.h"

namespace policy {

using namespace ZYROVFS;

inline constexpr unsigned kAmy = 4001;   ///< a member of painters
inline constexpr unsigned kBen = 4002;   ///< a member of painters and rowers
inline constexpr unsigned kCleo = 4003;  ///< in no group but that of all
inline constexpr unsigned kRoot = 4004;  ///< an administrator
inline constexpr unsigned kPainters = 1601;
inline constexpr unsigned kRowers = 1602;
inline constexpr unsigned kPeople[] = {kAmy, kBen, kCleo, kRoot};

inline Json::Value Parsed(const std::string& text) {
    Json::Value value;
    EXPECT_TRUE(json::fromString(value, text)) << text;
    return value;
}

inline std::string Text() {
    return accounts::Whole(paths::kPolicyFile);
}

inline Json::Value Stored() {
    return Parsed(Text());
}

inline void Put(const std::string& text) {
    std::ofstream(paths::kPolicyFile, std::ios::binary) << text;
}

/** {"KEY":[{"uid":...,"enabled":...}]} */
inline Json::Value UserSetting(const Json::Value& uid, bool enabled) {
    Json::Value conf;
    conf["user_settings"][0]["uid"] = uid;
    conf["user_settings"][0]["enabled"] = enabled;
    return conf;
}

inline Json::Value Type(const char* type) {
    Json::Value conf;
    conf["user_enabled_type"] = type;
    return conf;
}

/** Changes the policy and lets the change land. */
template <typename Cfg = Cfg::VFSUser>
bool Set(Json::Value conf) {
    Cfg cfg;
    return cfg.Set(conf);
}

inline Json::Value Get(unsigned uid) {
    Json::Value out;
    EXPECT_TRUE(Cfg::VFSUser().Get(uid, out));
    return out;
}

/** A saved profile and the record of a connection. */
inline void GiveFiles(unsigned uid) {
    for (const std::string& folder : {paths::UserConfigDir(uid), paths::UserConnectDir(uid)}) {
        std::filesystem::create_directories(folder);
    }
    std::ofstream(paths::UserConfigDir(uid) + "/servers.conf") << "{\"servers\":{}}";
    std::ofstream(paths::UserConnectDir(uid) + "/connect.conf") << "{\"servers\":{}}";
}

inline bool HasProfiles(unsigned uid) {
    return std::filesystem::exists(paths::UserConfigDir(uid) + "/servers.conf");
}

inline bool HasConnections(unsigned uid) {
    return std::filesystem::exists(paths::UserConnectDir(uid) + "/connect.conf");
}

class PolicyTest : public accounts::AccountsTest {
  protected:
    PolicyTest() {
        accounts::AddUser("amy", kAmy);
        accounts::AddUser("ben", kBen);
        accounts::AddUser("cleo", kCleo);
        accounts::AddUser("chief", kRoot);
        accounts::AddGroup("painters", kPainters, "amy,ben");
        accounts::AddGroup("rowers", kRowers, "ben");
        accounts::AddGroup("administrators", 1600, "chief");
        for (const char* tree :
             {paths::kConfigRoot, paths::kConnectRoot, "/var/tmp/user", "/tmp/zyrovfs"}) {
            std::filesystem::remove_all(tree);
        }
        std::filesystem::create_directories(paths::kConfigRoot);
        std::filesystem::create_directories(paths::kConnectRoot);
        ResetError();
    }
};

/** The rest of a scope with another effective uid and root saved, as a web program has it. */
class EffectiveUser {
  public:
    explicit EffectiveUser(uid_t uid) { EXPECT_EQ(seteuid(uid), 0); }
    EffectiveUser(const EffectiveUser&) = delete;
    EffectiveUser& operator=(const EffectiveUser&) = delete;
    ~EffectiveUser() { EXPECT_EQ(seteuid(0), 0); }
};

}  // namespace policy

#endif
