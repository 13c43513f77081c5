#include <zyrovfs/cloud_utils.h>

#include <memory>

#include "command.h"
#include "location.h"
#include "report.h"
#include "text.h"
#include "transfer_progress.h"

namespace tool {
namespace {

using namespace ZYROCloud;

std::string Space(const Utils::AccountSummary& account) {
    const auto human = [](long long bytes) { return HumanBytes(static_cast<double>(bytes)); };
    if (account.used < 0) {
        return account.total < 0 ? "not told by the service" : human(account.total);
    }
    return human(account.used) + (account.total < 0 ? "" : " of " + human(account.total)) + " used";
}

void Print(const Utils::AccountSummary& account) {
    Say("Name:   " + Printable(account.name));
    Say("E-mail: " + Printable(account.email));
    Say("Space:  " + Space(account));
}

Json::Value Document(const Utils::AccountSummary& account) {
    const auto number = [](long long bytes) {
        return bytes < 0 ? Json::Value() : Json::Value(static_cast<Json::Int64>(bytes));
    };
    Json::Value document;
    document["name"] = account.name;
    document["email"] = account.email;
    document["used"] = number(account.used);
    document["total"] = number(account.total);
    return document;
}

int ShowAccount(unsigned int uid, const std::string& id, bool json) {
    std::string problem;
    const std::unique_ptr<Cloud> cloud = OpenLocation(uid, id, problem);
    if (!cloud) {
        return ReportProblem(problem, json);
    }
    Utils::AccountSummary account;
    if (!Utils::GetAccountSummary(cloud.get(), account)) {
        return ReportCode("account " + id, cloud->GetErrorCode(), kFailure, json);
    }
    json ? PrintJson(Document(account)) : Print(account);
    return kSuccess;
}

}  // namespace

void AddAccountCommand(CLI::App& app, Session& session) {
    const auto id = std::make_shared<std::string>();
    CLI::App* command = AddUserCommand(app, session, "account",
                                       "Ask a cloud whose account it is, and how much space it has",
                                       [=, &session](unsigned int uid) {
                                           Cloud::InitCurlGlobal();
                                           const int status = ShowAccount(uid, *id, session.json);
                                           Cloud::CleanupCurlGlobal();
                                           return status;
                                       });
    CheckUse(*command, "an id has the form protocol://account", [id] { return IsUri(*id); });
    command->add_option("ID", *id, "Id of a profile or connection, as `list` shows it")->required();
}

}  // namespace tool
