#include <unistd.h>
#include <zyrovfs/cloud_utils.h>

#include <iostream>
#include <memory>

#include "command.h"
#include "entry_command.h"
#include "login_listener.h"
#include "report.h"
#include "text.h"

namespace tool {
namespace {

using namespace ZYROVFS;
using namespace ZYROCloud;

/** Registered at the services as http://localhost:48790/. */
constexpr unsigned int kPort = 48790;
constexpr unsigned int kPatience = 600;

struct LoginOptions {
    std::string service;
    std::string client;
    std::string alias;
    std::string again;
    unsigned int port = kPort;
    unsigned int timeout = kPatience;
    bool paste = false;
};

/** A failure of BeginLogin, which a person can mend. */
int ReportNoClient(const LoginOptions& options, bool json) {
    if (GetError() != VFS_ERR_BAD_PARAM) {
        return ReportFailure("login " + options.service, json);
    }
    return ReportProblem(
        options.client.empty()
            ? "There is no OAuth client of " + options.service +
                  " to log in with, or more than one: `zyrovfs cloud client list` shows them, "
                  "`zyrovfs cloud client add` saves one, --client names one."
            : "Client " + options.client + " of " + options.service +
                  " is not known, or not the one that is used: `zyrovfs cloud client list` shows "
                  "which are.",
        json);
}

int ReportRefusal(const LoginOptions& options, const Utils::LoginRefusal& refusal, bool json) {
    if (GetError() == VFS_ERR_ACCESS_DENIED) {
        return ReportProblem(
            "The request was refused on the page of the service. Nothing was saved.", json);
    }
    if (refusal.error.empty()) {
        return ReportFailure("login " + options.service, json);
    }
    const std::string hint = refusal.error == "invalid_client"
                                 ? " Save the right secret with `zyrovfs cloud client add`."
                                 : "";
    return ReportProblem("The service refused the login: " + refusal.error +
                             (refusal.description.empty() ? "" : ", " + refusal.description) + "." +
                             hint,
                         json);
}

/** The way to the page. Not on standard output where that is a document. */
void ShowAddress(const Utils::Login& login, bool listens, bool asks, bool json) {
    std::ostream& out = json ? std::cerr : std::cout;
    out << "Open this address in a browser" << (listens ? " on this machine" : "") << ":\n\n  "
        << login.address << "\n\n";
    if (asks) {
        out << (listens ? "Or open it on another machine: the" : "The")
            << " browser ends at an address that begins with " << login.redirect_uri
            << ".\nPaste all of that address here, even if the browser shows no page there.\n";
    }
    out.flush();
}

/** Whose account it is, so that no profile gets another person's tokens. */
bool AskAccount(unsigned int uid, Json::Value& profile, Utils::AccountSummary& account,
                std::string& problem) {
    const std::unique_ptr<Cloud> cloud(Utils::CreateCloudByConfig(
        Utils::GetCloudTypeFromURI(profile["protocol"].asString() + "://"), uid, profile));
    if (cloud && Utils::GetAccountSummary(cloud.get(), account) && !account.email.empty()) {
        return true;
    }
    problem = "The service gave tokens, but does not say whose account it is.";
    return false;
}

/** New tokens for a saved profile of the same account. */
int Renew(const LoginOptions& options, unsigned int uid, const std::string& email,
          Json::Value& profile, bool json) {
    Json::Value stored;
    if (!Server::CfgGetByID(uid, Server::VFS_CONFIG_SERVER, options.again.c_str(), stored)) {
        return ReportProblem("The user has no profile " + options.again + ".", json);
    }
    if (stored.get("email", "").asString() != email) {
        return ReportProblem("That was the account " + email + ", and not the one of " +
                                 options.again + ". Nothing was changed.",
                             json);
    }
    profile.removeMember("alias");
    profile.removeMember("protocol");
    TurnLifeIntoEnd(profile);
    for (const EntryKind* kind : {&kConnection, &kProfile}) {
        std::string id = options.again;
        Json::Value record;
        // A live connection has a copy of its own.
        if (Server::CfgGetByID(uid, kind->mode, id.c_str(), record) &&
            !Server::Set(uid, kind->mode, id, profile, false)) {
            return ReportFailure("login " + options.service, json);
        }
    }
    return ReportEntry(options.again, "Renewed " + Printable(options.again) + ".", json);
}

int Save(const LoginOptions& options, unsigned int uid, Json::Value profile, bool json) {
    Utils::AccountSummary account;
    std::string problem;
    profile["alias"] = options.alias;
    if (!AskAccount(uid, profile, account, problem)) {
        return ReportProblem(problem, json);
    }
    if (!json) {
        Say("Signed in as " + Printable(account.name) + " <" + Printable(account.email) + ">.");
    }
    const int status = options.again.empty() ? AddEntry(kProfile, uid, "", profile, false, json)
                                             : Renew(options, uid, account.email, profile, json);
    if (status == kSuccess && !json) {
        Say("Next: zyrovfs account " + Printable(options.service + "://" + account.email) +
            " --uid " + std::to_string(uid));
    } else if (GetError() == VFS_ERR_SERVER_EXISTS && !json) {
        std::cerr << "Give a profile that is there new tokens with --again ID.\n";
    }
    return status;
}

int LogIn(const LoginOptions& options, unsigned int uid, bool json) {
    LoginListener listener;
    Utils::Login login;
    std::string problem;
    std::string answer;
    if (!options.paste && !listener.Open(options.port, problem)) {
        return ReportProblem(problem, json);
    }
    const unsigned int port = options.paste ? options.port : listener.Port();
    if (!Utils::BeginLogin(options.service, options.client,
                           "http://localhost:" + std::to_string(port) + "/", login)) {
        return ReportNoClient(options, json);
    }
    const bool asks = options.paste || isatty(STDIN_FILENO) == 1;
    ShowAddress(login, !options.paste, asks, json);
    if (!listener.Wait(login.state, asks, options.timeout, answer, problem)) {
        return ReportProblem(problem, json);
    }
    Json::Value profile;
    Utils::LoginRefusal refusal;
    return Utils::FinishLogin(login, answer, profile, refusal)
               ? Save(options, uid, profile, json)
               : ReportRefusal(options, refusal, json);
}

}  // namespace

void AddLoginCommand(CLI::App& app, Session& session) {
    const auto options = std::make_shared<LoginOptions>();
    CLI::App* command = AddUserCommand(app, session, "login",
                                       "Sign in at a cloud with a browser, and save the account",
                                       [=, &session](unsigned int uid) {
                                           Cloud::InitCurlGlobal();
                                           const int status = LogIn(*options, uid, session.json);
                                           Cloud::CleanupCurlGlobal();
                                           return status;
                                       });
    command->add_option("SERVICE", options->service, "box, dropbox, google or onedrive")
        ->required()
        ->check(CLI::IsMember({"box", "dropbox", "google", "onedrive"}));
    command->add_option("--client", options->client, "OAuth client; the only one if left out")
        ->type_name("ID");
    command->add_option("--alias", options->alias, "Name for people; the account if left out")
        ->type_name("TEXT");
    command
        ->add_option("--again", options->again,
                     "Give this profile new tokens, such as after the service took back the old")
        ->type_name("ID");
    command
        ->add_option("--port", options->port,
                     "Port of this machine to which the service sends the browser back, 0 for any")
        ->type_name("NUMBER")
        ->check(CLI::Range(0, 65535))
        ->capture_default_str();
    command->add_flag("--paste", options->paste,
                      "Listen nowhere: the address that the browser ends at is pasted");
    command->add_option("--timeout", options->timeout, "Give up after so long")
        ->type_name("SECONDS")
        ->check(CLI::Range(1, 86400))
        ->capture_default_str();
    CheckUse(*command, "neither --alias beside --again nor --port 0 beside --paste makes sense",
             [options] {
                 return (options->alias.empty() || options->again.empty()) &&
                        (!options->paste || options->port != 0);
             });
}

}  // namespace tool
