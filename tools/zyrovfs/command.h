/** The command groups. Each adds its commands; parsing chooses one, and main runs it. */
#ifndef ZYROVFS_TOOLS_COMMAND_H
#define ZYROVFS_TOOLS_COMMAND_H

#include <CLI/CLI.hpp>
#include <functional>
#include <string>

namespace tool {

/** What the command line chose. */
struct Session {
    std::string uid;   ///< --uid
    std::string user;  ///< --user
    bool json = false;
    std::function<int()> action;  ///< the chosen command; answers an exit status
};

/** A group that needs one of its commands. */
CLI::App* AddGroup(CLI::App& parent, const std::string& name, const std::string& description);

/** A command that runs `action`, with --json. */
CLI::App* AddCommand(CLI::App& group, Session& session, const std::string& name,
                     const std::string& description, std::function<int()> action);

void AddHostCommands(CLI::App& app, Session& session);

}  // namespace tool

#endif
