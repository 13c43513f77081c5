#include "entry_command.h"

#include <zyrovfs/error.h>

#include <iostream>

#include "report.h"
#include "text.h"

namespace tool {

using namespace ZYROVFS;

const EntryKind kProfile = {Server::VFS_CONFIG_SERVER, "profile", "profiles"};
const EntryKind kConnection = {Server::VFS_CONFIG_CONNECT, "connection", "connections"};

namespace {

struct ListOptions {
    std::string protocol;
    std::string sort;
    bool descending = false;
    unsigned long offset = 0;
    unsigned long limit = 0;
};

struct ShowOptions {
    std::string id;
    bool credentials = false;
    bool online = false;
};

/** Text of any plain value; a list's items separated by commas. */
std::string TextOf(const Json::Value& value) {
    std::string text;
    if (value.isArray()) {
        for (const Json::Value& item : value) {
            text += (text.empty() ? "" : ",") + TextOf(item);
        }
        return text;
    }
    return value.isConvertibleTo(Json::stringValue) ? value.asString() : "";
}

void PrintList(const EntryKind& kind, const Json::Value& page) {
    const Json::Value& entries = page[kind.list_key];
    Table table({"ID", "PROTOCOL", "ALIAS", "ACCOUNT", "PATH", "CONNECTED"});
    for (const Json::Value& entry : entries) {
        table.Add({TextOf(entry["id"]), TextOf(entry["protocol_name"]), TextOf(entry["alias"]),
                   TextOf(entry["account"]), TextOf(entry["uri_path"]),
                   entry["connect_status"] == 1 ? "yes" : "no"});
    }
    if (table.Rows() > 0) {
        std::cout << table.Format();
    } else {
        Say(std::string("There are no ") + kind.list_key + " to show.");
    }
}

int List(const EntryKind& kind, unsigned int uid, const ListOptions& options, bool json) {
    Json::Value page;
    const char* sort = options.sort.empty() ? nullptr : options.sort.c_str();
    if (!Server::List(uid, kind.mode, options.protocol.c_str(), sort, !options.descending,
                      options.offset, options.limit, page)) {
        return ReportFailure(std::string(kind.word) + " list", json);
    }
    json ? PrintJson(page) : PrintList(kind, page);
    return kSuccess;
}

int Show(const EntryKind& kind, unsigned int uid, const ShowOptions& options, bool json) {
    Json::Value entry;
    if (!Server::Get(uid, kind.mode, options.id.c_str(), options.credentials, options.online,
                     entry)) {
        return ReportFailure(std::string(kind.word) + " show " + options.id, json);
    }
    if (json) {
        PrintJson(entry);
        return kSuccess;
    }
    Table table({"KEY", "VALUE"});
    for (const std::string& key : entry.getMemberNames()) {
        table.Add({key, TextOf(entry[key])});
    }
    std::cout << table.Format();
    return kSuccess;
}

int Set(const EntryKind& kind, unsigned int uid, const EntryOptions& options, bool json) {
    Json::Value changes;
    std::string problem;
    if (!ReadChanges(options.profile, changes, problem)) {
        return ReportProblem(problem, json);
    }
    TurnLifeIntoEnd(changes);
    std::string id = options.id;
    if (!Server::Set(uid, kind.mode, id, changes, options.accept)) {
        return ReportFailure(std::string(kind.word) + " set " + options.id, json);
    }
    const std::string now = id == options.id ? "" : " Its id is now " + Printable(id) + ".";
    return ReportEntry(id, "Changed " + Printable(options.id) + "." + now, json);
}

int Delete(const EntryKind& kind, unsigned int uid, const std::string& id, bool json) {
    // Deleting what is not there succeeds; a person wants to know all the same.
    Json::Value before;
    const bool existed = Server::CfgGetByID(uid, kind.mode, id.c_str(), before);
    if (!Server::Delete(uid, kind.mode, id.c_str())) {
        return ReportFailure(std::string(kind.word) + " delete " + id, json);
    }
    const std::string absent = std::string("There was no ") + kind.word + " ";
    return ReportEntry(id, (existed ? "Deleted " : absent) + Printable(id) + ".", json);
}

void AddListCommand(CLI::App& group, Session& session, const EntryKind& kind) {
    const auto options = std::make_shared<ListOptions>();
    CLI::App* command = AddUserCommand(
        group, session, "list", std::string("List the user's ") + kind.list_key,
        [=, &session, &kind](unsigned int uid) { return List(kind, uid, *options, session.json); });
    command->add_option("--protocol", options->protocol, "Only those of this protocol")
        ->type_name("NAME");
    command->add_option("--sort", options->sort, "Sort by this key")
        ->type_name("KEY")
        ->check(
            CLI::IsMember({"protocol", "port", "hostname", "alias", "account", "codepage", "uri"}));
    command->add_flag("--descending", options->descending, "Sort in the other direction");
    command->add_option("--offset", options->offset, "Begin at this entry, counted from 0")
        ->type_name("NUMBER");
    command->add_option("--limit", options->limit, "Show at most this many, 0 for all")
        ->type_name("NUMBER");
}

void AddShowCommand(CLI::App& group, Session& session, const EntryKind& kind) {
    const auto options = std::make_shared<ShowOptions>();
    CLI::App* command = AddUserCommand(
        group, session, "show", std::string("Show one ") + kind.word,
        [=, &session, &kind](unsigned int uid) { return Show(kind, uid, *options, session.json); });
    command->add_option("ID", options->id, "Id, as `list` shows it")->required();
    command->add_flag("--with-credentials", options->credentials,
                      "Show password and tokens in plain text");
    command->add_flag("--online", options->online, "Ask a cloud service for its account");
}

void AddSetCommand(CLI::App& group, Session& session, const EntryKind& kind) {
    const auto options = std::make_shared<EntryOptions>();
    CLI::App* command = AddUserCommand(
        group, session, "set", std::string("Change one ") + kind.word,
        [=, &session, &kind](unsigned int uid) { return Set(kind, uid, *options, session.json); });
    command->add_option("ID", options->id, "Id, as `list` shows it")->required();
    const bool for_connection = kind.mode == Server::VFS_CONFIG_CONNECT;
    AddProfileOptions(*command, options->profile, for_connection, false);
    CheckUse(*command, "say what to change", [options] { return !options->profile.Empty(); });
    if (for_connection) {
        AddAcceptOption(*command, options->accept);
    }
}

void AddDeleteCommand(CLI::App& group, Session& session, const EntryKind& kind) {
    const auto id = std::make_shared<std::string>();
    CLI::App* command = AddUserCommand(
        group, session, "delete",
        std::string("Delete one ") + kind.word + ", and end what it has mounted",
        [=, &session, &kind](unsigned int uid) { return Delete(kind, uid, *id, session.json); });
    command->add_option("ID", *id, "Id, as `list` shows it")->required();
}

}  // namespace

void AddEntryCommands(CLI::App& group, Session& session, const EntryKind& kind) {
    AddListCommand(group, session, kind);
    AddShowCommand(group, session, kind);
    AddSetCommand(group, session, kind);
    AddDeleteCommand(group, session, kind);
}

int AddEntry(const EntryKind& kind, unsigned int uid, std::string id, const Json::Value& profile,
             bool accept, bool json) {
    Json::Value stored;
    if (!Server::Add(uid, kind.mode, id, profile, accept, stored)) {
        return ReportFailure(std::string(kind.word) + " add", json);
    }
    if (json) {
        // Enciphered, but nobody's business all the same.
        DropCredentials(stored);
        Json::Value document;
        document["id"] = id;
        document[kind.word] = stored;
        PrintJson(document);
        return kSuccess;
    }
    const std::string place = TextOf(stored["path"]);
    Say(kind.mode == Server::VFS_CONFIG_SERVER
            ? "Saved " + Printable(id) + "."
            : "Connected " + Printable(id) + (place.empty() ? "" : " at " + Printable(place)) +
                  ".");
    return kSuccess;
}

void AddAcceptOption(CLI::App& command, bool& accept) {
    command.add_flag("--accept", accept,
                     "Trust the host key or certificate that the server shows, also a changed one");
}

int ReportEntry(const std::string& id, const std::string& sentence, bool json) {
    if (json) {
        Json::Value document;
        document["id"] = id;
        PrintJson(document);
    } else {
        Say(sentence);
    }
    return kSuccess;
}

}  // namespace tool
