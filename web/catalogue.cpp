// What there is to choose from: connections, saved profiles, protocols.
#include <zyrovfs/protocol.h>
#include <zyrovfs/server.h>

#include <set>

#include "action.h"
#include "connection.h"
#include "failure.h"
#include "profile.h"
#include "response.h"

namespace web {

using namespace ZYROVFS;

namespace {

Json::Value ListOf(const User& user, Server::VFS_CONFIG_MODE mode, const char* key) {
    Json::Value list;
    if (!Server::List(user.uid, mode, nullptr, "alias", true, 0, 0, list)) {
        throw FailureOf("The connections cannot be listed", GetError());
    }
    return list[key];
}

/** Ids and records of the user's connections, as they are stored. */
Json::Value Recorded(const User& user) {
    Json::Value document;
    if (!Server::CfgAccess(user.uid, Server::VFS_CONFIG_CONNECT, Server::VFS_CONFIG_READ,
                           document) ||
        !document.isObject() || !document["servers"].isObject()) {
        return Json::Value(Json::objectValue);
    }
    return document["servers"];
}

std::string Text(const Json::Value& record, const char* key) {
    return record.isObject() && record[key].isString() ? record[key].asString() : "";
}

Json::Value Describe(const Json::Value& listed) {
    Json::Value shown;
    for (const char* key : {"id", "alias", "protocol", "protocol_name", "account", "uri"}) {
        shown[key] = listed[key];
    }
    shown["state"] = listed["connect_status"] == 1 ? "connected" : "disconnected";
    shown["cloud"] = IsCloud(Text(listed, "protocol"));
    return shown;
}

/** A connection that the listing leaves out: its service does not take its credentials. */
Json::Value DescribeLost(const std::string& id, const Json::Value& record) {
    const std::string protocol = Text(record, "protocol");
    Json::Value shown;
    shown["id"] = id;
    shown["alias"] = Text(record, "alias").empty() ? id : Text(record, "alias");
    shown["protocol"] = protocol;
    shown["protocol_name"] = protocol;
    shown["account"] = Text(record, IsCloud(protocol) ? "email" : "account");
    shown["uri"] = id;
    shown["state"] = "unavailable";
    shown["cloud"] = IsCloud(protocol);
    return shown;
}

}  // namespace

void ListConnections(const User& user, const Request&) {
    Json::Value answer;
    answer["user"] = user.name;
    answer["connections"] = Json::Value(Json::arrayValue);
    std::set<std::string> listed;
    for (const Json::Value& connection : ListOf(user, Server::VFS_CONFIG_CONNECT, "connections")) {
        listed.insert(connection["id"].asString());
        answer["connections"].append(Describe(connection));
    }
    const Json::Value recorded = Recorded(user);
    for (const std::string& id : recorded.getMemberNames()) {
        if (listed.count(id) == 0) {
            answer["connections"].append(DescribeLost(id, recorded[id]));
        }
    }
    AnswerJson(200, answer);
}

void ListProfiles(const User& user, const Request&) {
    const Json::Value connected = Recorded(user);
    Json::Value answer;
    answer["profiles"] = Json::Value(Json::arrayValue);
    for (const Json::Value& profile : ListOf(user, Server::VFS_CONFIG_SERVER, "profiles")) {
        if (connected.isMember(profile["id"].asString())) {
            continue;
        }
        Json::Value shown;
        shown["id"] = profile["id"];
        shown["service"] = profile["protocol"];
        shown["title"] = profile["protocol_name"];
        shown["account"] = profile["account"];
        shown["alias"] = profile["alias"];
        answer["profiles"].append(shown);
    }
    AnswerJson(200, answer);
}

void ListProtocols(const User&, const Request&) {
    Json::Value catalogue;
    if (!Protocol::ListProtocol(catalogue)) {
        throw FailureOf("The protocols cannot be listed", GetError());
    }
    Json::Value answer;
    answer["protocols"] = Json::Value(Json::arrayValue);
    for (const Json::Value& protocol : catalogue) {
        Json::Value shown;
        shown["protocol"] = protocol["protocol"];
        shown["title"] = protocol["name"];
        shown["port"] = protocol["default_port"];
        shown["cloud"] = IsCloud(Text(protocol, "protocol"));
        shown["fields"] = FieldsOf(protocol);
        answer["protocols"].append(shown);
    }
    AnswerJson(200, answer);
}

}  // namespace web
