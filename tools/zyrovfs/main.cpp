#include "command.h"
#include "report.h"

int main(int argc, char** argv) {
    using namespace tool;
    CLI::App app("Remote storage of one user: profiles, connections, and the host they live on.",
                 "zyrovfs");
    app.require_subcommand(1);
    app.set_version_flag("--version", "zyrovfs " ZYROVFS_VERSION);
    Session session;
    AddProtocolCommands(app, session);
    AddProfileCommands(app, session);
    AddConnectionCommands(app, session);
    AddPathCommand(app, session);
    AddUserCommands(app, session);
    AddHostCommands(app, session);
    try {
        app.parse(argc, argv);
    } catch (const CLI::ParseError& error) {
        return app.exit(error) == 0 ? kSuccess : kBadUsage;
    }
    try {
        return session.action();
    } catch (const std::exception& error) {
        return ReportProblem(error.what(), session.json);
    }
}
