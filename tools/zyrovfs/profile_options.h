/** Options that describe a profile, shared by the commands that make or change one. */
#ifndef ZYROVFS_TOOLS_PROFILE_OPTIONS_H
#define ZYROVFS_TOOLS_PROFILE_OPTIONS_H

#include <json/value.h>
#include <CLI/CLI.hpp>

#include <string>

#include "password.h"

namespace tool {

struct ProfileOptions {
    Json::Value given = Json::objectValue;  ///< what options named, by the profile's keys
    std::string from;                       ///< file with a profile as JSON
    PasswordOptions password;
    std::string access_token_file;  ///< tokens of a cloud account, as a service gave them
    std::string refresh_token_file;

    /** Enough for a new profile: a protocol and a place or a token, or a file. */
    bool Describes() const {
        return !from.empty() || (given.isMember("protocol") &&
                                 (given.isMember("hostname") || given.isMember("email") ||
                                  !access_token_file.empty()));
    }
    bool Empty() const {
        return given.empty() && from.empty() && !password.Given() && access_token_file.empty() &&
               refresh_token_file.empty();
    }
};

/**
 * The options of a profile's keys, --from and those of the password. Saved profiles take their
 * remote path from the live connection, so that option is for connections alone.
 */
void AddProfileOptions(CLI::App& command, ProfileOptions& options, bool for_connection,
                       bool is_new);

/** The changes that the options ask for. False with a sentence. */
bool ReadChanges(const ProfileOptions& options, Json::Value& changes, std::string& problem);

/**
 * A whole new profile: what the options say, the password asked for when there is an account and
 * someone at the terminal, and the plain values for what was left out. False with a sentence.
 */
bool ReadProfile(const ProfileOptions& options, Json::Value& profile, std::string& problem);

/** "expires_in" as "expire_time": in a stored profile most services believe its old end before the
 * life of a new token. */
void TurnLifeIntoEnd(Json::Value& changes);

/** Takes passwords and tokens out of a profile that is to be shown. */
void DropCredentials(Json::Value& profile);

}  // namespace tool

#endif
