#include "entry_command.h"
#include "report.h"

namespace tool {
namespace {

int Add(unsigned int uid, const EntryOptions& options, bool json) {
    Json::Value profile;
    std::string problem;
    if (!ReadProfile(options.profile, profile, problem)) {
        return ReportProblem(problem, json);
    }
    return AddEntry(kProfile, uid, "", profile, false, json);
}

}  // namespace

void AddProfileCommands(CLI::App& app, Session& session) {
    CLI::App* group = AddGroup(app, "profile", "Saved profiles of a user");
    const auto options = std::make_shared<EntryOptions>();
    CLI::App* add = AddUserCommand(
        *group, session, "add", "Save a profile; nothing is connected",
        [=, &session](unsigned int uid) { return Add(uid, *options, session.json); });
    AddProfileOptions(*add, options->profile, false, true);
    CheckUse(*add, "give --protocol and --hostname, or --from",
             [options] { return options->profile.Describes(); });
    AddEntryCommands(*group, session, kProfile);
}

}  // namespace tool
