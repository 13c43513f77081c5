#include "entry_command.h"
#include "report.h"
#include "text.h"

namespace tool {
namespace {

using namespace ZYROVFS;

int Add(unsigned int uid, const EntryOptions& options, bool json) {
    if (!options.id.empty()) {
        return AddEntry(kConnection, uid, options.id, Json::nullValue, options.accept, json);
    }
    Json::Value profile;
    std::string problem;
    if (!ReadProfile(options.profile, profile, problem)) {
        return ReportProblem(problem, json);
    }
    return AddEntry(kConnection, uid, "", profile, options.accept, json);
}

int Connect(unsigned int uid, const EntryOptions& options, bool json) {
    if (!Server::Connect(uid, options.id.c_str(), options.accept)) {
        return ReportFailure("connection connect " + options.id, json);
    }
    return ReportEntry(options.id, "Connected " + Printable(options.id) + ".", json);
}

int Disconnect(unsigned int uid, const std::string& id, bool json) {
    if (!Server::Disconnect(uid, id.c_str())) {
        return ReportFailure("connection disconnect " + id, json);
    }
    return ReportEntry(id, "Disconnected " + Printable(id) + ".", json);
}

void AddAddCommand(CLI::App& group, Session& session) {
    const auto options = std::make_shared<EntryOptions>();
    CLI::App* add = AddUserCommand(
        group, session, "add", "Connect a saved profile by its id, or a server described here",
        [=, &session](unsigned int uid) { return Add(uid, *options, session.json); });
    add->add_option("ID", options->id, "Id of a saved profile");
    AddProfileOptions(*add, options->profile, true, true);
    AddAcceptOption(*add, options->accept);
    CheckUse(
        *add, "give the id of a saved profile, or --protocol and --hostname, or --from", [options] {
            return options->id.empty() ? options->profile.Describes() : options->profile.Empty();
        });
}

void AddConnectCommands(CLI::App& group, Session& session) {
    const auto options = std::make_shared<EntryOptions>();
    CLI::App* connect = AddUserCommand(
        group, session, "connect", "Mount a recorded connection again",
        [=, &session](unsigned int uid) { return Connect(uid, *options, session.json); });
    connect->add_option("ID", options->id, "Id, as `list` shows it")->required();
    AddAcceptOption(*connect, options->accept);
    CLI::App* disconnect = AddUserCommand(
        group, session, "disconnect", "Take a connection's mount down, and keep its record",
        [=, &session](unsigned int uid) { return Disconnect(uid, options->id, session.json); });
    disconnect->add_option("ID", options->id, "Id, as `list` shows it")->required();
}

}  // namespace

void AddConnectionCommands(CLI::App& app, Session& session) {
    CLI::App* group = AddGroup(app, "connection", "Live connections of a user");
    AddAddCommand(*group, session);
    AddConnectCommands(*group, session);
    AddEntryCommands(*group, session, kConnection);
}

}  // namespace tool
