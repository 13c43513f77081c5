#include <cstdio>
#include <iostream>

#include "command.h"
#include "report.h"

namespace tool {
namespace {

int Main(int argc, char** argv) {
    CLI::App app("Remote storage of one user: profiles, connections, and the host they live on.",
                 "zyrovfs");
    app.require_subcommand(1);
    app.set_version_flag("--version", "zyrovfs " ZYROVFS_VERSION);
    Session session;
    AddProtocolCommands(app, session);
    AddProfileCommands(app, session);
    AddConnectionCommands(app, session);
    AddPathCommand(app, session);
    AddTransferCommands(app, session);
    AddAccountCommand(app, session);
    AddCloudCommands(app, session);
    AddLoginCommand(app, session);
    AddUserCommands(app, session);
    AddTaskCommands(app, session);
    AddPolicyCommands(app, session);
    AddHostCommands(app, session);
    try {
        app.parse(argc, argv);
    } catch (const CLI::ParseError& error) {
        return app.exit(error) == 0 ? kSuccess : kBadUsage;
    }
    try {
        const int status = session.action();
        // A script must not take a cut result, as on a full disk, for a whole one.
        return std::cout.flush() ? status : ReportProblem("Writing the result failed.", false);
    } catch (const std::exception& error) {
        // Such as JSON that is nested too deeply to be read.
        return ReportProblem(error.what(), session.json);
    }
}

}  // namespace
}  // namespace tool

int main(int argc, char** argv) {
    try {
        return tool::Main(argc, argv);
    } catch (const std::exception& error) {
        std::fprintf(stderr, "zyrovfs: %s\n", error.what());
        return tool::kFailure;
    }
}
