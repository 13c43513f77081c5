/** `zyrovfs policy set`, and what it shares with the rest of the group. */
#ifndef ZYROVFS_TOOLS_POLICY_SET_H
#define ZYROVFS_TOOLS_POLICY_SET_H

#include <json/value.h>

#include <string>

#include "command.h"

namespace tool {

/** The policy as it is stored, null when there is none. False, with the failure reported as that of
 * `what`, when the file cannot be read. */
bool ReadPolicy(const std::string& what, bool json, Json::Value& policy);

/** The type that is in force. */
std::string TypeOf(const Json::Value& policy);

/** An action of root; anyone else is told so. */
std::function<int()> OfPolicyRoot(const Session& session, std::function<int()> action);

void AddPolicySetCommand(CLI::App& group, Session& session);

}  // namespace tool

#endif
