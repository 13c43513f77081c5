#include <zyrovfs/protocol.h>

#include <iostream>

#include "command.h"
#include "report.h"
#include "text.h"

namespace tool {
namespace {

void PrintTable(const Json::Value& protocols, bool for_user) {
    Table table({"PROTOCOL", "NAME", "PORT", "CURL", "ACTIONS", for_user ? "SAVED" : ""});
    for (const Json::Value& protocol : protocols) {
        table.Add({protocol["protocol"].asString(), protocol["name"].asString(),
                   protocol["default_port"].asString(), protocol["enable_curl"].asString(),
                   protocol["api"].asString(),
                   !for_user                         ? ""
                   : protocol["has_server"].asBool() ? "yes"
                                                     : "no"});
    }
    std::cout << table.Format();
}

int List(const Session& session) {
    const bool for_user = session.uid || !session.user.empty();
    unsigned int uid = 0;
    if (for_user && (!NeedRoot(session) || !ResolveUser(session, uid))) {
        return kFailure;
    }
    Json::Value protocols;
    if (for_user ? !ZYROVFS::Protocol::ListProtocolByUID(uid, protocols)
                 : !ZYROVFS::Protocol::ListProtocol(protocols)) {
        return ReportFailure("protocol list", session.json);
    }
    if (session.json) {
        PrintJson(protocols);
    } else if (protocols.empty()) {
        Say("The catalogue is empty; `zyrovfs host check` says why.");
    } else {
        PrintTable(protocols, for_user);
    }
    return kSuccess;
}

}  // namespace

void AddProtocolCommands(CLI::App& app, Session& session) {
    CLI::App* group = AddGroup(app, "protocol", "Protocols that this machine offers");
    CLI::App* list = AddCommand(*group, session, "list",
                                "List the protocols, and for a user which of them are in use",
                                [&session] { return List(session); });
    AddUserOptions(*list, session);
}

}  // namespace tool
