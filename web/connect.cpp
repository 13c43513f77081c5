// Connections made, mounted, taken down and forgotten.
#include <unistd.h>
#include <zyrovfs/server.h>

#include "action.h"
#include "body.h"
#include "connection.h"
#include "failure.h"
#include "profile.h"
#include "response.h"
#include "trust.h"

namespace web {

using namespace ZYROVFS;

namespace {

constexpr const char* kNotConnected = "The connection was not made";

void AnswerConnection(const std::string& id) {
    Json::Value answer;
    answer["connection"] = id;
    AnswerJson(200, answer);
}

/** Server and port of an id, as a person knows them. */
std::string HostOf(const std::string& id) {
    const size_t scheme = id.find("://");
    const std::string place = scheme == std::string::npos ? id : id.substr(scheme + 3);
    return place.substr(place.rfind('@') + 1);
}

/** The one connection that a request is about, if it is the user's. */
std::string OwnConnection(const User& user, const Body& body) {
    return Connection(user, body.Text("connection")).Id();
}

/** The mounted tree learns of mounts and unmounts a moment later; what is then shown as connected
 * can be opened, and what is not is gone. */
void WaitUntil(const User& user, const std::string& id, bool there) {
    constexpr int kTries = 100;
    constexpr useconds_t kPause = 50000;
    const std::unique_ptr<Tree> files = Connection(user, id).Files();
    for (int i = 0; i < kTries && files->IsThere() != there; ++i) {
        usleep(kPause);
    }
}

}  // namespace

void Connect(const User& user, const Request& request) {
    const Body body(request);
    std::string id = OwnConnection(user, body);
    const std::string password = body.Text("password", "");
    WithTrust(kNotConnected, HostOf(id), body.Text("accept", ""), [&](bool force) {
        if (password.empty()) {
            return Server::Connect(user.uid, id.c_str(), force);
        }
        Json::Value change;
        change["password"] = password;
        return Server::Set(user.uid, Server::VFS_CONFIG_CONNECT, id, change, force);
    });
    WaitUntil(user, id, true);
    AnswerConnection(id);
}

void Add(const User& user, const Request& request) {
    const Body body(request);
    const std::string saved = body.Text("profile", "");
    const Json::Value profile = saved.empty() ? ReadProfile(body) : Json::Value();
    const std::string host = saved.empty() ? profile.get("hostname", "").asString() : HostOf(saved);
    std::string id;
    WithTrust(kNotConnected, host, body.Text("accept", ""), [&](bool force) {
        Json::Value stored;
        id = saved;
        return Server::Add(user.uid, Server::VFS_CONFIG_CONNECT, id, profile, force, stored);
    });
    AnswerConnection(id);
}

void Disconnect(const User& user, const Request& request) {
    const std::string id = OwnConnection(user, Body(request));
    if (!Server::Disconnect(user.uid, id.c_str())) {
        throw FailureOf("The connection was not taken down", GetError());
    }
    WaitUntil(user, id, false);
    AnswerDone();
}

void Forget(const User& user, const Request& request) {
    const std::string id = OwnConnection(user, Body(request));
    if (!Server::Delete(user.uid, Server::VFS_CONFIG_CONNECT, id.c_str())) {
        throw FailureOf("The connection was not forgotten", GetError());
    }
    AnswerDone();
}

}  // namespace web
