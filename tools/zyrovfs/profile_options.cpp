#include "profile_options.h"

#include <json/reader.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <memory>

#include "file.h"

namespace tool {
namespace {

struct Row {
    const char* option;
    const char* key;
    const char* type;
    const char* help;
    const char* fallback = "";  ///< what a new profile gets without the option
};

constexpr Row kTexts[] = {
    {"--protocol", "protocol", "NAME", "Protocol; `zyrovfs protocol list` shows them"},
    {"--hostname", "hostname", "HOST", "Host name or address"},
    {"--alias", "alias", "TEXT", "Name for people", "; the host name if left out"},
    {"--account", "account", "NAME", "Account on the server", "; anonymous if left out"},
    {"--codepage", "codepage", "NAME", "Character set of remote names", "; UTF-8 if left out"},
    {"--email", "email", "ADDRESS", "Account of a shared link"},
};
constexpr Row kPath = {"--path", "uri_path", "PATH", "Remote folder to connect, such as a share"};
constexpr Row kNumbers[] = {
    {"--port", "port", "NUMBER", "Port, 0 for the protocol's own", "; 0 if left out"},
    {"--max-connection", "max_connection", "NUMBER", "Most parallel connections, 0 for any number"},
};

template <typename Value>
void AddKey(CLI::App& command, ProfileOptions& options, const Row& row, bool is_new) {
    const std::string key = row.key;
    command
        .add_option_function<Value>(
            row.option, [&options, key](const Value& value) { options.given[key] = value; },
            std::string(row.help) + (is_new ? row.fallback : ""))
        ->type_name(row.type);
}

bool ReadDocument(const std::string& from, Json::Value& profile, std::string& problem) {
    std::string text;
    const std::string path = from == "-" ? "/dev/stdin" : from;
    if (!ReadFile(path, text)) {
        problem = "Reading " + path + " failed: " + std::strerror(errno);
        return false;
    }
    Json::CharReaderBuilder builder;
    Json::CharReaderBuilder::strictMode(&builder.settings_);
    const std::unique_ptr<Json::CharReader> reader(builder.newCharReader());
    std::string errors;
    if (!reader->parse(text.data(), text.data() + text.size(), &profile, &errors) ||
        !profile.isObject()) {
        problem = path + " does not hold a JSON object.";
        return false;
    }
    return true;
}

void Default(Json::Value& profile, const char* key, const Json::Value& value) {
    if (!profile.isMember(key)) {
        profile[key] = value;
    }
}

/** Keys that the library wants to see, also where a person has nothing to say. */
void FillIn(Json::Value& profile) {
    if (profile["protocol"] == "sharing") {
        Default(profile, "alias", "");
        return;
    }
    Default(profile, "alias", profile["hostname"]);
    Default(profile, "port", 0);
    Default(profile, "account", "");
    Default(profile, "password", "");
    Default(profile, "codepage", "UTF-8");
}

bool ShallAsk(const ProfileOptions& options, const Json::Value& profile) {
    const bool has_account = profile.isMember("account") && profile["account"] != "";
    return has_account && !options.password.Given() && !profile.isMember("password") &&
           isatty(STDIN_FILENO) == 1;
}

}  // namespace

void AddProfileOptions(CLI::App& command, ProfileOptions& options, bool for_connection,
                       bool is_new) {
    for (const Row& row : kTexts) {
        AddKey<std::string>(command, options, row, is_new);
    }
    for (const Row& row : kNumbers) {
        AddKey<unsigned int>(command, options, row, is_new);
    }
    if (for_connection) {
        AddKey<std::string>(command, options, kPath, is_new);
    }
    command.add_option("--from", options.from, "Read keys from a JSON file, - for standard input")
        ->type_name("FILE");
    AddPasswordOptions(command, options.password);
}

bool ReadChanges(const ProfileOptions& options, Json::Value& changes, std::string& problem) {
    changes = Json::objectValue;
    if (!options.from.empty() && !ReadDocument(options.from, changes, problem)) {
        return false;
    }
    for (const std::string& key : options.given.getMemberNames()) {
        changes[key] = options.given[key];
    }
    if (!options.password.Given()) {
        return true;
    }
    std::string password;
    if (!ReadPassword(options.password, password, problem)) {
        return false;
    }
    changes["password"] = password;
    return true;
}

bool ReadProfile(const ProfileOptions& options, Json::Value& profile, std::string& problem) {
    if (!ReadChanges(options, profile, problem)) {
        return false;
    }
    if (ShallAsk(options, profile)) {
        PasswordOptions ask;
        ask.ask = true;
        std::string password;
        if (!ReadPassword(ask, password, problem)) {
            return false;
        }
        profile["password"] = password;
    }
    FillIn(profile);
    return true;
}

void DropCredentials(Json::Value& profile) {
    for (const char* key : {"password", "access_token", "refresh_token"}) {
        profile.removeMember(key);
    }
}

}  // namespace tool
