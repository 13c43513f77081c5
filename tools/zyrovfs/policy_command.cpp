#include <grp.h>
#include <unistd.h>
#include <zosplatform/user.h>
#include <zyrovfs/cfg.h>
#include <zyrovfs/error.h>

#include <cstdlib>
#include <iostream>
#include <limits>
#include <memory>

#include "policy_set.h"
#include "report.h"
#include "text.h"

namespace tool {
namespace {

using namespace ZYROVFS;

constexpr const char* kPolicyFile = "/usr/zyro/etc/zyrovfs/user.conf";

struct PolicyListOptions {
    bool groups = false;
    std::string auth = "all";
    std::string prefix;
    std::string contains;
    std::string domain;
    int offset = 0;
    int limit = 0;
};

/** Empty for an id that nobody has. */
std::string UserName(unsigned int uid) {
    PZYROUSER user = nullptr;
    if (ZYROUserGetByUID(uid, &user) < 0) {
        return "";
    }
    std::string name = user->name;
    ZYROUserFree(user);
    return name;
}

std::string GroupName(unsigned int gid) {
    const group* found = getgrgid(gid);
    return found == nullptr ? "" : found->gr_name;
}

/** What differs between the settings of users and those of groups. */
struct SettingsKind {
    const char* key;
    const char* id;
    const char* word;
    std::string (*name)(unsigned int id);
};

constexpr SettingsKind kSettings[] = {{"user_settings", "uid", "user", UserName},
                                      {"group_settings", "gid", "group", GroupName}};

bool IsEnabled(const Json::Value& entry) {
    const Json::Value& enabled = entry.isObject() ? entry["enabled"] : Json::Value::nullSingleton();
    return enabled.isConvertibleTo(Json::booleanValue) && enabled.asBool();
}

/** The stored settings with the names that their ids have now. */
Json::Value Named(const Json::Value& policy, const SettingsKind& kind) {
    Json::Value entries(Json::arrayValue);
    const Json::Value& settings =
        policy.isObject() ? policy[kind.key] : Json::Value::nullSingleton();
    if (!settings.isObject()) {
        return entries;
    }
    for (const std::string& id : settings.getMemberNames()) {
        Json::Value entry;
        entry[kind.id] = id;
        entry["name"] = kind.name(static_cast<unsigned int>(std::strtoul(id.c_str(), nullptr, 10)));
        entry["enabled"] = IsEnabled(settings[id]);
        entries.append(entry);
    }
    return entries;
}

const char* MeaningOf(const std::string& type) {
    return type == "all"      ? "everybody may use remote connections"
           : type == "admin"  ? "only administrators may use remote connections"
           : type == "custom" ? "administrators and those enabled below may use remote connections"
                              : "a type that is not known, which only the settings below decide";
}

void PrintPolicy(const Json::Value& document) {
    const std::string type = document["user_enabled_type"].asString();
    Say("The policy is " + Printable(type) + ": " + MeaningOf(type) + ".");
    Table table({"KIND", "NAME", "ID", "ENABLED"});
    for (const SettingsKind& kind : kSettings) {
        for (const Json::Value& entry : document[kind.key]) {
            const std::string name = entry["name"].asString();
            table.Add({kind.word, name.empty() ? "(gone)" : name, entry[kind.id].asString(),
                       entry["enabled"].asBool() ? "yes" : "no"});
        }
    }
    if (table.Rows() > 0) {
        std::cout << table.Format();
    }
}

int Show(bool json) {
    Json::Value policy;
    if (!ReadPolicy("policy show", json, policy)) {
        return kFailure;
    }
    Json::Value document;
    document["user_enabled_type"] = TypeOf(policy);
    for (const SettingsKind& kind : kSettings) {
        document[kind.key] = Named(policy, kind);
    }
    json ? PrintJson(document) : PrintPolicy(document);
    return kSuccess;
}

void PrintEntries(const Json::Value& page, bool groups) {
    Table table({"NAME", groups ? "GID" : "UID", "ENABLED", "MODIFIABLE"});
    for (const Json::Value& entry : page["usergrp_settings"]) {
        table.Add({entry["name"].asString(), entry[groups ? "gid" : "uid"].asString(),
                   entry["enabled"].asBool() ? "yes" : "no",
                   entry["is_modifiable"].asBool() ? "yes" : "no"});
    }
    const int total = page["total"].asInt();
    const auto rows = static_cast<int>(table.Rows());
    if (rows > 0) {
        std::cout << table.Format();
    }
    if (rows < total) {
        Say(std::to_string(rows) + " of " + std::to_string(total) + " shown.");
    } else if (rows == 0) {
        Say(groups ? "There are no such groups." : "There are no such users.");
    }
}

int List(const PolicyListOptions& options, bool json) {
    const bool prefix = !options.prefix.empty();
    const std::unique_ptr<Cfg::VFSEntityCfg> cfg =
        Cfg::MakeCfgBySettings(options.groups ? "group_settings" : "user_settings");
    Json::Value page;
    if (!cfg->List(options.offset, options.limit == 0 ? -1 : options.limit, options.auth,
                   prefix ? options.prefix : options.contains, options.domain, prefix, false,
                   page)) {
        return ReportFailure("policy list", json);
    }
    json ? PrintJson(page) : PrintEntries(page, options.groups);
    return kSuccess;
}

/** Each rule's name for scripts and its reason for people, where the type does not tell more. */
struct Reason {
    Cfg::PERMISSION_RULE rule;
    const char* name;
    const char* text;
};

constexpr Reason kReasons[] = {
    {Cfg::PERMISSION_ADMINISTRATOR, "administrator", "administrators cannot be shut out"},
    {Cfg::PERMISSION_REFUSED_UID, "refused_uid", "this user id is always refused"},
    {Cfg::PERMISSION_SHARING, "sharing", "shared links are open to everybody"},
    {Cfg::PERMISSION_NOT_CONSULTED, "not_consulted", "the policy was not asked"},
    {Cfg::PERMISSION_USER_ENABLED, "user_enabled", "the user is enabled"},
    {Cfg::PERMISSION_NO_SUCH_USER, "no_such_user", "there is no such user"},
    {Cfg::PERMISSION_NO_GROUPS, "no_groups", "the user's groups cannot be found out"},
    {Cfg::PERMISSION_GROUP_ENABLED, "group_enabled", "a group of the user is enabled"},
    {Cfg::PERMISSION_NOT_ENABLED, "not_enabled",
     "neither the user nor one of the user's groups is enabled"},
};

/** What the type alone decides, else null. */
const char* ReasonOfType(Cfg::PERMISSION_RULE rule, const std::string& type) {
    if (type == "all" &&
        (rule == Cfg::PERMISSION_USER_ENABLED || rule == Cfg::PERMISSION_GROUP_ENABLED)) {
        return "the policy lets everybody in";
    }
    return type == "admin" && rule == Cfg::PERMISSION_NOT_ENABLED
               ? "the policy lets administrators in only"
               : nullptr;
}

std::string ReasonFor(const Cfg::PermissionDecision& decision, const std::string& type) {
    if (const char* by_type = ReasonOfType(decision.rule, type)) {
        return by_type;
    }
    if (decision.rule == Cfg::PERMISSION_GROUP_ENABLED) {
        return "the group " + GroupName(decision.gid) + " is enabled";
    }
    return kReasons[decision.rule].text;
}

int Check(unsigned int uid, const std::string& protocol, bool json) {
    std::string type;
    Cfg::VFSUser().GetUserEnabledType(type);
    const Cfg::PermissionDecision decision =
        Cfg::ExplainPermission(uid, {Cfg::VFS_USER_CONFIG_CONSULT}, protocol.c_str());
    const std::string reason = ReasonFor(decision, type);
    if (json) {
        Json::Value document;
        document["uid"] = uid;
        document["allowed"] = decision.allowed;
        document["rule"] = kReasons[decision.rule].name;
        document["reason"] = reason;
        document["user_enabled_type"] = type;
        if (decision.rule == Cfg::PERMISSION_GROUP_ENABLED) {
            document["gid"] = decision.gid;
        }
        PrintJson(document);
    } else {
        const std::string name = UserName(uid);
        Say("User " + (name.empty() ? std::to_string(uid) : Printable(name)) +
            (decision.allowed ? " may" : " may not") +
            " use remote connections: " + Printable(reason) + ".");
    }
    return decision.allowed ? kSuccess : kFailure;
}

void AddListCommand(CLI::App& group, Session& session) {
    const auto options = std::make_shared<PolicyListOptions>();
    CLI::App* command =
        AddCommand(group, session, "list", "List the machine's users or groups with their settings",
                   OfPolicyRoot(session, [=, &session] { return List(*options, session.json); }));
    command->add_flag("--groups", options->groups, "List groups, not users");
    command->add_option("--auth", options->auth, "Where they come from")
        ->type_name("KIND")
        ->check(CLI::IsMember({"local", "domain", "ldap", "all"}));
    CLI::Option* prefix =
        command->add_option("--prefix", options->prefix, "Only names that begin with this");
    prefix->type_name("TEXT");
    command->add_option("--contains", options->contains, "Only names that contain this")
        ->type_name("TEXT")
        ->excludes(prefix);
    command->add_option("--domain", options->domain, "Of a domain's, only those of this one")
        ->type_name("NAME");
    const CLI::Range numbers(0, std::numeric_limits<int>::max());
    command->add_option("--offset", options->offset, "Begin at this entry, counted from 0")
        ->type_name("NUMBER")
        ->check(numbers);
    command->add_option("--limit", options->limit, "Show at most this many, 0 for all")
        ->type_name("NUMBER")
        ->check(numbers);
}

}  // namespace

bool ReadPolicy(const std::string& what, bool json, Json::Value& policy) {
    policy = Json::Value();
    if (access(kPolicyFile, F_OK) != 0) {
        return true;
    }
    Cfg::VFSUser reader;
    if (reader.JsonFromFile(policy, kPolicyFile) && (policy.isObject() || policy.isNull())) {
        return true;
    }
    VFSSetErrEx(VFS_ERR_CONFIG_READ, "policy_command.cpp", __LINE__);
    ReportFailure(what, json);
    return false;
}

std::string TypeOf(const Json::Value& policy) {
    const Json::Value type = policy.get("user_enabled_type", "admin");
    return type.isConvertibleTo(Json::stringValue) ? type.asString() : "admin";
}

std::function<int()> OfPolicyRoot(const Session& session, std::function<int()> action) {
    return OfRoot(session, "look after the policy", std::move(action));
}

void AddPolicyCommands(CLI::App& app, Session& session) {
    CLI::App* group = AddGroup(app, "policy", "Who may use remote connections");
    AddCommand(*group, session, "show", "Show the policy",
               OfPolicyRoot(session, [&session] { return Show(session.json); }));
    AddPolicySetCommand(*group, session);
    AddListCommand(*group, session);
    const auto protocol = std::make_shared<std::string>();
    CLI::App* check = AddUserCommand(
        *group, session, "check", "Say whether a user may use remote connections, and why",
        [=, &session](unsigned int uid) { return Check(uid, *protocol, session.json); });
    check
        ->add_option("--protocol", *protocol,
                     "For this protocol; shared links have a rule of "
                     "their own")
        ->type_name("NAME");
}

}  // namespace tool
