/** What saved profiles and live connections have in common: list, show, set and delete. */
#ifndef ZYROVFS_TOOLS_ENTRY_COMMAND_H
#define ZYROVFS_TOOLS_ENTRY_COMMAND_H

#include <json/value.h>
#include <zyrovfs/server.h>

#include <memory>
#include <string>

#include "command.h"
#include "profile_options.h"

namespace tool {

/** The words of one of the two. */
struct EntryKind {
    ZYROVFS::Server::VFS_CONFIG_MODE mode;
    const char* word;      ///< name of the group, and in sentences
    const char* list_key;  ///< array in a listing
};

extern const EntryKind kProfile;
extern const EntryKind kConnection;

/** What a command that makes or changes an entry was given. */
struct EntryOptions {
    std::string id;
    ProfileOptions profile;
    bool accept = false;
};

void AddEntryCommands(CLI::App& group, Session& session, const EntryKind& kind);

/** Server::Add, and what came of it. */
int AddEntry(const EntryKind& kind, unsigned int uid, std::string id, const Json::Value& profile,
             bool accept, bool json);

/** --accept: trust what the server shows. */
void AddAcceptOption(CLI::App& command, bool& accept);

/** The outcome of a command on one entry: `{"id": ...}` or a sentence. */
int ReportEntry(const std::string& id, const std::string& sentence, bool json);

}  // namespace tool

#endif
