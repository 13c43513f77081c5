#include "profile_options.h"

#include <json/reader.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <ctime>
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
    {"--client-id", "client_id", "ID", "Cloud: OAuth client that the tokens were given to"},
    {"--expires-in", "expires_in", "SECONDS", "Cloud: life of the access token from now on"},
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
    if (profile.isMember("access_token")) {
        Default(profile, "alias", "");
        Default(profile, "refresh_token", "");
        return;
    }
    Default(profile, "alias", profile["hostname"]);
    Default(profile, "port", 0);
    Default(profile, "account", "");
    Default(profile, "password", "");
    Default(profile, "codepage", "UTF-8");
}

PasswordOptions TokenIn(const std::string& file) {
    PasswordOptions options;
    options.from_stdin = file == "-";
    options.file = options.from_stdin ? "" : file;
    options.word = "token";
    return options;
}

/** A secret that an option leads to; true when none was given. */
bool ReadSecret(const PasswordOptions& options, const char* key, Json::Value& changes,
                std::string& problem) {
    std::string secret;
    if (!options.Given()) {
        return true;
    }
    if (!ReadPassword(options, secret, problem)) {
        return false;
    }
    changes[key] = secret;
    return true;
}

bool ShallAsk(const ProfileOptions& options, const Json::Value& profile) {
    const Json::Value& account = profile["account"];
    return account.isString() && !account.asString().empty() && !options.password.Given() &&
           !profile.isMember("password") && isatty(STDIN_FILENO) == 1;
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
    command
        .add_option("--access-token-file", options.access_token_file,
                    "Cloud: read the access token from a file, - for standard input")
        ->type_name("FILE");
    command
        .add_option("--refresh-token-file", options.refresh_token_file,
                    "Cloud: read the refresh token from a file, - for standard input")
        ->type_name("FILE");
}

bool ReadChanges(const ProfileOptions& options, Json::Value& changes, std::string& problem) {
    changes = Json::objectValue;
    if (!options.from.empty() && !ReadDocument(options.from, changes, problem)) {
        return false;
    }
    for (const std::string& key : options.given.getMemberNames()) {
        changes[key] = options.given[key];
    }
    return ReadSecret(options.password, "password", changes, problem) &&
           ReadSecret(TokenIn(options.access_token_file), "access_token", changes, problem) &&
           ReadSecret(TokenIn(options.refresh_token_file), "refresh_token", changes, problem);
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

void TurnLifeIntoEnd(Json::Value& changes) {
    const Json::Value life = changes["expires_in"];
    changes.removeMember("expires_in");
    if (life.isString()) {
        changes["expire_time"] =
            std::to_string(time(nullptr) + std::strtoll(life.asCString(), nullptr, 10));
    } else if (!life.isNull()) {
        changes["expires_in"] = life;  // for the library to refuse
    }
}

void DropCredentials(Json::Value& profile) {
    for (const char* key : {"password", "access_token", "refresh_token"}) {
        profile.removeMember(key);
    }
}

}  // namespace tool
