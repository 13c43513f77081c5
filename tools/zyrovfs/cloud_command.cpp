#include <zyrovfs/cloud_utils.h>

#include <iostream>
#include <memory>

#include "command.h"
#include "password.h"
#include "report.h"
#include "text.h"

namespace tool {
namespace {

using namespace ZYROCloud;

struct ClientOptions {
    std::string service;
    std::string id;
    PasswordOptions secret;
};

int AddClient(const ClientOptions& options, bool json) {
    std::string secret;
    std::string problem;
    if (!ReadPassword(options.secret, secret, problem)) {
        return ReportProblem(problem, json);
    }
    if (!Utils::AddClient(options.service, options.id, secret)) {
        return ReportFailure("cloud client add", json);
    }
    json ? PrintJson(Json::objectValue)
         : Say("Saved the client " + Printable(options.id) + " of " + options.service + ".");
    return kSuccess;
}

int RemoveClient(const ClientOptions& options, bool json) {
    if (!Utils::RemoveClient(options.service, options.id)) {
        return ReportFailure("cloud client remove", json);
    }
    json ? PrintJson(Json::objectValue)
         : Say("Removed the client " + Printable(options.id) + " of " + options.service + ".");
    return kSuccess;
}

int ListClients(bool json) {
    Json::Value clients;
    if (!Utils::ListClients(clients)) {
        return ReportFailure("cloud client list", json);
    }
    if (json) {
        PrintJson(clients);
        return kSuccess;
    }
    Table table({"SERVICE", "CLIENT ID"});
    for (const std::string& service : clients.getMemberNames()) {
        for (const Json::Value& id : clients[service]) {
            table.Add({service, id.asString()});
        }
    }
    table.Rows() > 0 ? void(std::cout << table.Format()) : Say("There are no clients to show.");
    return kSuccess;
}

/** A command of root for the whole machine. */
CLI::App* AddRootCommand(CLI::App& group, Session& session, const std::string& name,
                         const std::string& description, std::function<int()> action) {
    return AddCommand(group, session, name, description,
                      OfRoot(session, "change the services", std::move(action)));
}

void AddClientOptions(CLI::App& command, ClientOptions& options) {
    command.add_option("SERVICE", options.service, "box, dropbox, google or onedrive")
        ->required()
        ->check(CLI::IsMember({"box", "dropbox", "google", "onedrive"}));
    command.add_option("CLIENT", options.id, "Client id of this installation at the service")
        ->required();
}

}  // namespace

void AddCloudCommands(CLI::App& app, Session& session) {
    CLI::App* group = AddGroup(app, "cloud", "Services of public clouds, for all users");
    CLI::App* client =
        AddGroup(*group, "client", "OAuth clients with which tokens are made and renewed");
    const auto options = std::make_shared<ClientOptions>();
    CLI::App* add = AddRootCommand(*client, session, "add", "Save a client and its secret",
                                   [=, &session] { return AddClient(*options, session.json); });
    AddClientOptions(*add, *options);
    AddPasswordOptions(*add, options->secret);
    CheckUse(*add,
             "say where the secret comes from: --password-file, --password-stdin or "
             "--ask-password",
             [options] { return options->secret.Given(); });
    CLI::App* remove =
        AddRootCommand(*client, session, "remove", "Forget a client and its secret",
                       [=, &session] { return RemoveClient(*options, session.json); });
    AddClientOptions(*remove, *options);
    AddRootCommand(*client, session, "list", "List the clients, without their secrets",
                   [&session] { return ListClients(session.json); });
}

}  // namespace tool
