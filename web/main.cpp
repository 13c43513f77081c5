/** The web layer: a CGI program that serves one request of one user of the box. */
#include <zyrovfs/cloud.h>

#include <csignal>
#include <string>

#include "action.h"
#include "failure.h"
#include "identity.h"
#include "request.h"
#include "response.h"

namespace web {
namespace {

struct Route {
    const char* method;
    const char* path;
    void (*action)(const User& user, const Request& request);
};

/** What is posted changes something, and is taken from this page alone. */
constexpr Route kRoutes[] = {
    {"GET", "/api/connections", ListConnections},
    {"GET", "/api/profiles", ListProfiles},
    {"GET", "/api/protocols", ListProtocols},
    {"GET", "/api/list", ListFolder},
    {"GET", "/api/download", Download},
    {"HEAD", "/api/download", Download},
    {"GET", "/api/progress", ShowProgress},
    {"GET", "/api/tasks", ListTasks},
    {"GET", "/api/zip", SendArchive},
    {"HEAD", "/api/zip", SendArchive},
    {"POST", "/api/connect", Connect},
    {"POST", "/api/add", Add},
    {"POST", "/api/disconnect", Disconnect},
    {"POST", "/api/forget", Forget},
    {"POST", "/api/upload", Upload},
    {"POST", "/api/mkdir", MakeFolder},
    {"POST", "/api/rename", Rename},
    {"POST", "/api/move", Move},
    {"POST", "/api/delete", Delete},
    {"POST", "/api/cancel", CancelUpload},
    {"POST", "/api/copy", StartCopy},
    {"POST", "/api/tasks/cancel", CancelTask},
    {"POST", "/api/tasks/remove", RemoveTask},
};

const Route& FindRoute(const Request& request) {
    bool known = false;
    for (const Route& route : kRoutes) {
        if (request.path == route.path) {
            known = true;
            if (request.method == route.method) {
                return route;
            }
        }
    }
    throw known ? Failure(405, "That cannot be done this way.")
                : Failure(404, "There is nothing at this address.");
}

void Serve() {
    StartClean();
    const User user = BecomeUser();
    CheckPolicy(user);
    const Request request = ReadRequest();
    const Route& route = FindRoute(request);
    if (request.method == "POST") {
        CheckOrigin();
    }
    ZYROCloud::Cloud::InitCurlGlobal();
    route.action(user, request);
    ZYROCloud::Cloud::CleanupCurlGlobal();
}

void ShowFailure(const Failure& failure) {
    if (HasAnswered()) {
        return;
    }
    Json::Value answer;
    answer["error"] = failure.Describe();
    AnswerJson(failure.Status(), answer);
    DrainInput();
}

}  // namespace
}  // namespace web

int main() {
    signal(SIGPIPE, SIG_IGN);
    try {
        web::Serve();
    } catch (const web::Failure& failure) {
        web::ShowFailure(failure);
    } catch (const std::exception& error) {
        web::ShowFailure(web::Failure(500, "Something went wrong in the program."));
    }
    return 0;
}
