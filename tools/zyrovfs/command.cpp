#include "command.h"

#include <utility>

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

}  // namespace tool
