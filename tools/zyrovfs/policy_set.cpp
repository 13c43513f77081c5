#include "policy_set.h"

#include <zosplatform/group.h>
#include <zosplatform/user.h>
#include <zyrovfs/cfg.h>
#include <zyrovfs/error.h>

#include <algorithm>
#include <memory>
#include <vector>

#include "report.h"
#include "text.h"

namespace tool {
namespace {

using namespace ZYROVFS;
using Names = std::vector<std::string>;

constexpr const char* kWhat = "policy set";

/** What is to happen to the settings of users, or of groups. */
struct Changes {
    Names enable;
    Names disable;
    Names forget;
};

struct SetOptions {
    std::string type;
    Changes users;
    Changes groups;
};

/** What differs between the two. */
struct Kind {
    const char* word;
    const char* id;
    const char* settings;
    bool (*find)(const std::string& name, unsigned int& id);
};

bool FindUser(const std::string& name, unsigned int& id) {
    PZYROUSER user = nullptr;
    if (ZYROUserGet(name.c_str(), &user) < 0) {
        return false;
    }
    id = user->uid;
    ZYROUserFree(user);
    return true;
}

bool FindGroup(const std::string& name, unsigned int& id) {
    gid_t gid = 0;
    if (ZYROGroupGetGID(name.c_str(), &gid) < 0) {
        return false;
    }
    id = gid;
    return true;
}

constexpr Kind kUsers = {"user", "uid", "user_settings", FindUser};
constexpr Kind kGroups = {"group", "gid", "group_settings", FindGroup};

bool IsNumber(const std::string& text) {
    return !text.empty() &&
           std::all_of(text.begin(), text.end(), [](char c) { return c >= '0' && c <= '9'; });
}

/** What the library is to be given: the settings, and the ids to forget. */
struct Plan {
    Json::Value settings{Json::arrayValue};
    Json::Value forget{Json::arrayValue};
    bool IsEmpty() const { return settings.empty() && forget.empty(); }
};

/** False with the name that nobody has. */
bool AddSettings(const Kind& kind, const Names& names, bool enabled, Plan& plan,
                 std::string& unknown) {
    for (const std::string& name : names) {
        unsigned int id = 0;
        if (!kind.find(name, id)) {
            unknown = name;
            return false;
        }
        Json::Value setting;
        setting[kind.id] = id;
        setting["enabled"] = enabled;
        plan.settings.append(setting);
    }
    return true;
}

/** Those who are gone have no name any more: they are forgotten by their number. */
bool AddForgotten(const Kind& kind, const Names& names, Plan& plan, std::string& unknown) {
    for (const std::string& name : names) {
        unsigned int id = 0;
        if (kind.find(name, id)) {
            plan.forget.append(id);
        } else if (IsNumber(name)) {
            plan.forget.append(name);
        } else {
            unknown = name;
            return false;
        }
    }
    return true;
}

bool MakePlan(const Kind& kind, const Changes& changes, bool json, Plan& plan) {
    std::string unknown;
    if (AddSettings(kind, changes.enable, true, plan, unknown) &&
        AddSettings(kind, changes.disable, false, plan, unknown) &&
        AddForgotten(kind, changes.forget, plan, unknown)) {
        return true;
    }
    ReportProblem(std::string("There is no ") + kind.word + " " + unknown + ".", json);
    return false;
}

Json::Value WithType(const std::string& type) {
    Json::Value conf;
    conf["user_enabled_type"] = type;
    return conf;
}

/** Destroying the object writes the file; only then it is known whether the change landed. */
bool Land(std::unique_ptr<Cfg::VFSEntityCfg> cfg) {
    ResetError();
    cfg.reset();
    return GetError() == VFS_ERR_NONE;
}

/**
 * Settings of groups are written first and without disconnecting anybody: that waits until those
 * of the users are known as well, or users would lose their profiles in between. A delete, be it
 * of nothing, is what makes the object write.
 */
bool StoreGroups(const Plan& plan) {
    auto groups = std::make_unique<Cfg::VFSGroup>();
    Json::Value conf;
    conf[kGroups.settings] = plan.settings;
    Json::Value forget = plan.forget;
    return groups->ApplyConf(conf) && groups->Delete(forget) && Land(std::move(groups));
}

/** The type, and the users' settings with it: what this shuts out goes down in here. */
bool StoreUsers(const std::string& old, const std::string& type, bool first, bool settings,
                const Plan& plan) {
    auto users = std::make_unique<Cfg::VFSUser>();
    Json::Value forget = plan.forget;
    if (!users->Delete(forget)) {
        return false;
    }
    // A machine without a type behaves as with "admin"; a change needs to start from something.
    Json::Value conf = WithType(old);
    if (first && !users->Set(conf)) {
        return false;
    }
    conf = type == old ? Json::Value() : WithType(type);
    conf[kUsers.settings] = plan.settings;
    const bool in_force = type == "custom" && settings;
    return (type == old && !in_force ? true : users->Set(conf)) && Land(std::move(users));
}

int Report(const std::string& old, const std::string& type, bool settings, bool json) {
    if (json) {
        PrintJson(WithType(type));
    } else if (old != type) {
        Say("The policy is now " + type + "; it was " + Printable(old) + ".");
    } else if (settings) {
        Say("Changed the settings; the policy is " + Printable(type) + ".");
    } else {
        Say("The policy is " + Printable(type) + " already.");
    }
    return kSuccess;
}

int Set(const SetOptions& options, bool json) {
    Json::Value policy;
    Plan users;
    Plan groups;
    if (!ReadPolicy(kWhat, json, policy) || !MakePlan(kUsers, options.users, json, users) ||
        !MakePlan(kGroups, options.groups, json, groups)) {
        return kFailure;
    }
    const std::string old = TypeOf(policy);
    const std::string type = options.type.empty() ? old : options.type;
    if (type != "custom" && !(users.settings.empty() && groups.settings.empty())) {
        return ReportProblem(
            "Settings of users and groups count under the type custom only; add --type custom.",
            json);
    }
    const bool settings = !users.IsEmpty() || !groups.IsEmpty();
    if (!groups.IsEmpty() && !StoreGroups(groups)) {
        return ReportFailure(kWhat, json);
    }
    if (!StoreUsers(old, type, !policy.isMember("user_enabled_type"), settings, users)) {
        return ReportFailure(kWhat, json);
    }
    return Report(old, type, settings, json);
}

void AddChanges(CLI::App& command, const std::string& suffix, const std::string& word,
                Changes& changes) {
    command.add_option("--enable" + suffix, changes.enable, "Let this " + word + " in")
        ->type_name("NAME");
    command.add_option("--disable" + suffix, changes.disable, "Do not let this " + word + " in")
        ->type_name("NAME");
    command
        .add_option("--forget" + suffix, changes.forget,
                    "Remove the settings of this " + word + ", also of one that is gone")
        ->type_name("NAME|ID");
}

}  // namespace

void AddPolicySetCommand(CLI::App& group, Session& session) {
    const auto options = std::make_shared<SetOptions>();
    CLI::App* command =
        AddCommand(group, session, "set", "Change who may use remote connections",
                   OfPolicyRoot(session, [=, &session] { return Set(*options, session.json); }));
    command->add_option("--type", options->type, "Everybody, administrators, or a chosen set")
        ->type_name("TYPE")
        ->check(CLI::IsMember({"all", "admin", "custom"}));
    AddChanges(*command, "", "user", options->users);
    AddChanges(*command, "-group", "group", options->groups);
    CheckUse(*command, "nothing to change is given", [options] {
        const auto none = [](const Changes& changes) {
            return changes.enable.empty() && changes.disable.empty() && changes.forget.empty();
        };
        return !options->type.empty() || !none(options->users) || !none(options->groups);
    });
}

}  // namespace tool
