/** The command groups. Each adds its commands; parsing chooses one, and main runs it. */
#ifndef ZYROVFS_TOOLS_COMMAND_H
#define ZYROVFS_TOOLS_COMMAND_H

#include <CLI/CLI.hpp>
#include <functional>
#include <optional>
#include <string>

namespace tool {

/** What the command line chose. */
struct Session {
    std::optional<unsigned int> uid;  ///< --uid
    std::string user;                 ///< --user
    bool json = false;
    std::function<int()> action;  ///< the chosen command; answers an exit status
};

/** A group that needs one of its commands. */
CLI::App* AddGroup(CLI::App& parent, const std::string& name, const std::string& description);

/** A command that runs `action`, with --json. */
CLI::App* AddCommand(CLI::App& group, Session& session, const std::string& name,
                     const std::string& description, std::function<int()> action);

/** A command of root that acts for the user of --uid or --user; `action` is given the uid. */
CLI::App* AddUserCommand(CLI::App& group, Session& session, const std::string& name,
                         const std::string& description, std::function<int(unsigned int)> action);

/** --uid and --user. */
void AddUserOptions(CLI::App& command, Session& session);

/** Options that do not fit together are bad usage, with `hint`. */
void CheckUse(CLI::App& command, const std::string& hint, std::function<bool()> fits);

/** The uid of --uid or --user; false, with the failure reported, when there is no such user. */
bool ResolveUser(const Session& session, unsigned int& uid);

/** False, with "Only root can WHAT." reported, for anyone but root. */
bool NeedRoot(const Session& session, const std::string& what = "act for a user");

/** `action`, for root alone. */
std::function<int()> OfRoot(const Session& session, std::string what, std::function<int()> action);

void AddProtocolCommands(CLI::App& app, Session& session);
void AddProfileCommands(CLI::App& app, Session& session);
void AddConnectionCommands(CLI::App& app, Session& session);
void AddPathCommand(CLI::App& app, Session& session);
void AddUserCommands(CLI::App& app, Session& session);
void AddTransferCommands(CLI::App& app, Session& session);
void AddAccountCommand(CLI::App& app, Session& session);
void AddCloudCommands(CLI::App& app, Session& session);
void AddLoginCommand(CLI::App& app, Session& session);
void AddTaskCommands(CLI::App& app, Session& session);
void AddPolicyCommands(CLI::App& app, Session& session);
void AddHostCommands(CLI::App& app, Session& session);

}  // namespace tool

#endif
