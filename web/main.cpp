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
    {"GET", "/connections", ListConnections},
    {"GET", "/profiles", ListProfiles},
    {"GET", "/protocols", ListProtocols},
    {"GET", "/list", ListFolder},
    {"GET", "/download", Download},
    {"HEAD", "/download", Download},
    {"GET", "/progress", ShowProgress},
    {"GET", "/tasks", ListTasks},
    {"GET", "/zip", SendArchive},
    {"HEAD", "/zip", SendArchive},
    {"POST", "/connect", Connect},
    {"POST", "/add", Add},
    {"POST", "/disconnect", Disconnect},
    {"POST", "/forget", Forget},
    {"POST", "/upload", Upload},
    {"POST", "/mkdir", MakeFolder},
    {"POST", "/rename", Rename},
    {"POST", "/move", Move},
    {"POST", "/delete", Delete},
    {"POST", "/cancel", CancelUpload},
    {"POST", "/copy", StartCopy},
    {"POST", "/tasks/cancel", CancelTask},
    {"POST", "/tasks/remove", RemoveTask},
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
