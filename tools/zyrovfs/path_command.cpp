#include <unistd.h>
#include <zyrovfs/error.h>
#include <zyrovfs/global.h>
#include <zyrovfs/utils.h>

#include <memory>

#include "command.h"
#include "location.h"
#include "report.h"
#include "text.h"

namespace tool {
namespace {

using namespace ZYROVFS;

int ShowPath(unsigned int uid, const std::string& uri, bool json) {
    ResetError();
    std::string remote;
    std::string local;
    // The lookup asks the user's bus, so it runs in a child that is the user.
    if (!InitGlobal(uid, false) ||
        !Utils::GetFullPath(uid, uri.c_str(), nullptr, nullptr, remote, local)) {
        return ReportFailure("path " + uri, json);
    }
    if (local.empty()) {
        return ReportProblem("There is no local path for " + uri + ".", json);
    }
    if (json) {
        Json::Value document;
        document["uri"] = uri;
        document["path"] = local;
        PrintJson(document);
    } else {
        // A script gets the very bytes.
        Say(isatty(STDOUT_FILENO) == 1 ? Printable(local) : local);
    }
    return kSuccess;
}

}  // namespace

void AddPathCommand(CLI::App& app, Session& session) {
    const auto uri = std::make_shared<std::string>();
    CLI::App* command = AddUserCommand(
        app, session, "path", "Print the local path of a remote location, connected if need be",
        [=, &session](unsigned int uid) { return ShowPath(uid, *uri, session.json); });
    CheckUse(*command, "a URI has the form protocol://account@host:port/path",
             [uri] { return IsUri(*uri); });
    command->add_option("URI", *uri, "Id of a connection, and a path behind it")->required();
}

}  // namespace tool
