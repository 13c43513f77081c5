#include <zyrovfs/server.h>

#include <memory>

#include "command.h"
#include "report.h"

namespace tool {
namespace {

struct CleanOptions {
    bool profiles = false;
    bool runtime = false;
};

int Clean(unsigned int uid, const CleanOptions& options, bool json) {
    Json::Value uids;
    uids.append(uid);
    if (!ZYROVFS::Server::DeleteUser(uids, options.profiles, options.runtime)) {
        return ReportFailure("user clean", json);
    }
    if (json) {
        Json::Value document;
        document["uid"] = uid;
        PrintJson(document);
    } else {
        Say("Cleaned up after user " + std::to_string(uid) +
            "; what could not be removed is in the system log.");
    }
    return kSuccess;
}

}  // namespace

void AddUserCommands(CLI::App& app, Session& session) {
    CLI::App* group = AddGroup(app, "user", "What users leave behind");
    const auto options = std::make_shared<CleanOptions>();
    CLI::App* clean = AddUserCommand(
        *group, session, "clean", "End a user's mounts and remove the connection records",
        [=, &session](unsigned int uid) { return Clean(uid, *options, session.json); });
    clean->add_flag("--profiles", options->profiles, "Remove the saved profiles too");
    clean->add_flag("--runtime", options->runtime,
                    "Remove the runtime folder too, if no daemon of the user lives");
}

}  // namespace tool
