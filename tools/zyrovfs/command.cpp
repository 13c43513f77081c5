#include "command.h"

#include <unistd.h>
#include <zosplatform/user.h>

#include <utility>

#include "report.h"

namespace tool {

CLI::App* AddGroup(CLI::App& parent, const std::string& name, const std::string& description) {
    CLI::App* group = parent.add_subcommand(name, description);
    group->require_subcommand(1);
    return group;
}

CLI::App* AddCommand(CLI::App& group, Session& session, const std::string& name,
                     const std::string& description, std::function<int()> action) {
    CLI::App* command = group.add_subcommand(name, description);
    command->add_flag("--json", session.json, "Print JSON");
    command->callback([&session, action = std::move(action)] { session.action = action; });
    return command;
}

CLI::App* AddUserCommand(CLI::App& group, Session& session, const std::string& name,
                         const std::string& description, std::function<int(unsigned int)> action) {
    CLI::App* command = AddCommand(group, session, name, description, nullptr);
    AddUserOptions(*command, session);
    command->callback([&session, action = std::move(action)] {
        if (!session.uid && session.user.empty()) {
            throw CLI::RequiredError("--uid or --user");
        }
        session.action = [&session, action] {
            unsigned int uid = 0;
            return NeedRoot(session) && ResolveUser(session, uid) ? action(uid) : kFailure;
        };
    });
    return command;
}

void AddUserOptions(CLI::App& command, Session& session) {
    CLI::Option* uid = command.add_option("--uid", session.uid, "Act for the user with this id");
    uid->type_name("UID");
    command.add_option("--user", session.user, "Act for the user of this name")
        ->type_name("NAME")
        ->excludes(uid);
}

void CheckUse(CLI::App& command, const std::string& hint, std::function<bool()> fits) {
    command.parse_complete_callback([&command, hint, fits = std::move(fits)] {
        if (!fits()) {
            throw CLI::ValidationError(command.get_name(), hint);
        }
    });
}

bool ResolveUser(const Session& session, unsigned int& uid) {
    if (session.uid) {
        uid = *session.uid;
        return true;
    }
    PZYROUSER user = nullptr;
    if (ZYROUserGet(session.user.c_str(), &user) < 0) {
        ReportProblem("There is no user " + session.user + ".", session.json);
        return false;
    }
    uid = user->uid;
    ZYROUserFree(user);
    return true;
}

bool NeedRoot(const Session& session, const std::string& what) {
    if (geteuid() == 0) {
        return true;
    }
    ReportProblem("Only root can " + what + ".", session.json);
    return false;
}

std::function<int()> OfRoot(const Session& session, std::string what, std::function<int()> action) {
    return [&session, what = std::move(what), action = std::move(action)] {
        return NeedRoot(session, what) ? action() : kFailure;
    };
}

}  // namespace tool
