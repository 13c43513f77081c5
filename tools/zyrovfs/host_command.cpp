#include <memory>

#include "command.h"
#include "host_layer.h"
#include "host_sweep.h"
#include "host_users.h"
#include "report.h"
#include "text.h"

namespace tool {
namespace {

/** The outcome: sentences about what is wrong or missing, or `done` when there are none. */
int Report(const std::vector<std::string>& problems, const std::string& done, bool json) {
    if (json) {
        Json::Value document;
        document["ok"] = problems.empty();
        document["problems"] = Json::arrayValue;
        for (const std::string& problem : problems) {
            document["problems"].append(problem);
        }
        PrintJson(document);
    } else if (problems.empty()) {
        Say(done);
    } else {
        for (const std::string& problem : problems) {
            ReportProblem(problem, false);
        }
    }
    return problems.empty() ? kSuccess : kFailure;
}

int Install(const std::string& build, bool json) {
    std::vector<std::string> problems;
    InstallHost(HostSources::Of(build), problems);
    return Report(problems, "The host layer is in place; `zyrovfs host check` looks at the rest.",
                  json);
}

int Remove(bool json) {
    std::vector<std::string> problems;
    RemoveHost(problems);
    return Report(problems, "The host layer is gone; folders that hold something were kept.", json);
}

int Check(const std::string& build, bool json) {
    const int status = Report(CheckHost(HostSources::Of(build)), "This host is ready.", json);
    if (status != kSuccess && !json) {
        Say("`zyrovfs host install` sets right what does not come with a package.");
    }
    return status;
}

int Disconnect(bool json) {
    std::vector<std::string> problems;
    DisconnectUsers(problems);
    return Report(problems, "Nobody has anything mounted; profiles and records were kept.", json);
}

int Sweep(bool json) {
    const std::vector<std::string> removed = SweepHost();
    if (json) {
        Json::Value document;
        document["removed"] = Json::arrayValue;
        for (const std::string& path : removed) {
            document["removed"].append(path);
        }
        PrintJson(document);
    } else {
        for (const std::string& path : removed) {
            Say("Removed " + Printable(path));
        }
    }
    return kSuccess;
}

}  // namespace

void AddHostCommands(CLI::App& app, Session& session) {
    const auto build = std::make_shared<std::string>();
    const std::string build_help = "Take the files from a build tree instead of the installed ones";
    CLI::App* host = AddGroup(app, "host", "Make this machine ready for the library");
    AddCommand(*host, session, "install", "Put the host layer in place",
               [=, &session] { return Install(*build, session.json); })
        ->add_option("--build", *build, build_help)
        ->type_name("DIR");
    AddCommand(*host, session, "remove", "Take the host layer away again",
               [&session] { return Remove(session.json); });
    AddCommand(*host, session, "check", "Say what is missing on this machine",
               [=, &session] { return Check(*build, session.json); })
        ->add_option("--build", *build, build_help)
        ->type_name("DIR");
    AddCommand(
        *host, session, "disconnect", "End the mounts and daemons of all users",
        OfRoot(session, "disconnect users", [&session] { return Disconnect(session.json); }));
    AddCommand(*host, session, "sweep", "Remove files that killed writers left",
               OfRoot(session, "sweep", [&session] { return Sweep(session.json); }));
}

}  // namespace tool
