#include "support/cloudsim/box.h"

#include <json/value.h>

#include <algorithm>

#include "support/cloudsim/box_json.h"
#include "support/cloudsim/box_upload.h"
#include "support/cloudsim/route.h"

namespace cloudsim {
namespace {

constexpr const char* kApi = "api";
constexpr const char* kUpload = "upload";
constexpr const char* kDownload = "download";
constexpr const char* kAccount = "account";

const char* RoleOfPath(const std::string& path) {
    return BeginsWith(path, "/api/2.0/") ? kUpload
           : BeginsWith(path, "/api/")   ? kAccount
           : BeginsWith(path, "/d/")     ? kDownload
                                         : kApi;
}

}  // namespace

// What could be taken for an id stands before what has one there.
const BoxService::Route BoxService::kRoutes[] = {
    {kApi, "GET", "2.0/users/me", &BoxService::GetUser},
    {kApi, "GET", "2.0/search", &BoxService::Search},
    {kApi, "POST", "2.0/folders", &BoxService::CreateFolder},
    {kApi, "GET", "2.0/folders/*", &BoxService::GetFolder},
    {kApi, "PUT", "2.0/folders/*", &BoxService::UpdateFolder},
    {kApi, "DELETE", "2.0/folders/*", &BoxService::DeleteFolder},
    {kApi, "GET", "2.0/folders/*/items", &BoxService::ListFolder},
    {kApi, "POST", "2.0/folders/*/copy", &BoxService::CopyFolder},
    {kApi, "OPTIONS", "2.0/files/content", &BoxService::Preflight},
    {kApi, "GET", "2.0/files/*", &BoxService::GetFile},
    {kApi, "PUT", "2.0/files/*", &BoxService::UpdateFile},
    {kApi, "DELETE", "2.0/files/*", &BoxService::DeleteFile},
    {kApi, "POST", "2.0/files/*/copy", &BoxService::CopyFile},
    {kApi, "GET", "2.0/files/*/content", &BoxService::GetContent},
    {kApi, "OPTIONS", "2.0/files/*/content", &BoxService::PreflightVersion},
};

BoxService::BoxService(const BoxOptions& options) : Service(options, "0"), box_options_(options) {
    Start();
}

std::string BoxService::Role(const Request& request) const {
    const std::string& host = request.host;
    if (IsBareAddress(host)) {
        return RoleOfPath(request.path);
    }
    if (host == box_options_.upload_name || BeginsWith(host, "upload.")) {
        return kUpload;
    }
    if (host == box_options_.download_name || BeginsWith(host, "dl.")) {
        return kDownload;
    }
    return BeginsWith(host, "app.") ? kAccount : kApi;
}

std::unique_ptr<Handler> BoxService::Begin(Request& request) {
    if (request.path == "/api/oauth2/authorize") {
        return Consent(request);
    }
    const std::string role = Role(request);
    const std::vector<std::string> path = request.Segments();
    const bool token = (role == kApi && request.path == "/oauth2/token") ||
                       (role == kAccount && request.path == "/api/oauth2/token");
    if (token && request.method == "POST") {
        return Collect([this](const std::string& form) { return Token(form); });
    }
    if (role == kDownload && path.size() == 4 && path[0] == "d" && path[3] == "download") {
        return request.method == "GET" || request.method == "HEAD"
                   ? Ready(Download(request))
                   : Ready(Reply(405).With("Allow", "GET, HEAD"));
    }
    if (role == kUpload) {
        return BeginUpload(request, path);
    }
    if (role == kApi && !token) {
        return BeginCall(request, path);
    }
    return Ready(token ? Reply(405).With("Allow", "POST") : Reply(404));
}

Account* BoxService::Authorize(Request& request) {
    Account* account = tokens_.Owner(request.BearerToken());
    request.account = account == nullptr ? "" : account->Email();
    return account;
}

std::unique_ptr<Handler> BoxService::BeginCall(Request& request,
                                               const std::vector<std::string>& path) {
    bool known = false;
    std::string id;
    for (const Route& route : kRoutes) {
        if (!MatchesPath(route.path, path, id)) {
            continue;
        }
        known = true;
        if (request.method != route.method) {
            continue;
        }
        Account* account = Authorize(request);
        if (account == nullptr) {
            return Ready(Refused(request));
        }
        return Collect(
            [this, &request, account, id, operation = route.operation](const std::string& body) {
                return Call(request, *account, id, operation, body);
            });
    }
    return Ready(known ? box::Error(405, "method_not_allowed", "Method Not Allowed")
                       : box::Error(404, "not_found", "Not Found"));
}

Reply BoxService::Call(const Request& request, Account& account, const std::string& id,
                       Operation operation, const std::string& body) {
    const BoxCall call = {request, account, id, ParseObject(body)};
    if (call.body.isNull() && !body.empty()) {
        return box::Error(400, "bad_request", "Could not parse JSON");
    }
    const std::lock_guard<std::mutex> lock(mutex_);
    try {
        return (this->*operation)(call);
    } catch (const box::Failure& failure) {
        return failure.reply;
    } catch (const Json::Exception&) {
        return box::Error(400, "bad_request", "Bad Request");
    }
}

std::unique_ptr<Handler> BoxService::BeginUpload(Request& request,
                                                 const std::vector<std::string>& path) {
    std::string id;
    const bool first = MatchesPath("api/2.0/files/content", path, id);
    if (!first && !MatchesPath("api/2.0/files/*/content", path, id)) {
        return Ready(box::Error(404, "not_found", "Not Found"));
    }
    if (request.method != "POST") {
        return Ready(box::Error(405, "method_not_allowed", "Method Not Allowed"));
    }
    Account* account = Authorize(request);
    if (account == nullptr) {
        return Ready(Refused(request));
    }
    return std::make_unique<BoxUpload>(*this, request, *account, first ? "" : id);
}

Node& BoxService::Find(const BoxCall& call, const std::string& id, bool folder) {
    Node* node = tree_.Find(call.account, id);
    if (node != nullptr && node->folder == folder) {
        return *node;
    }
    if (tree_.WasRemoved(call.account, id)) {
        throw box::Failure{box::Error(404, "trashed", "Item is trashed")};
    }
    Json::Value wrong;
    wrong["reason"] = "invalid_parameter";
    wrong["name"] = folder ? "folder" : "file";
    wrong["message"] = wrong["name"].asString() + " with value '" + id + "' not found";
    Json::Value context;
    context["errors"].append(std::move(wrong));
    throw box::Failure{box::Error(404, "not_found", "Not Found", context)};
}

Node& BoxService::ParentOf(const BoxCall& call, const Json::Value& body) {
    const Json::Value& id = body["parent"]["id"];
    if (!id.isString()) {
        throw box::Failure{box::Error(400, "bad_request", "Bad Request: parent.id is required")};
    }
    return Find(call, id.asString(), true);
}

/** Names of more than 255 characters, and those that could not be shown in a path. */
void BoxService::CheckName(const std::string& name) const {
    const auto letters =
        std::count_if(name.begin(), name.end(), [](char c) { return (c & 0xc0) != 0x80; });
    if (letters > 255) {
        throw box::Failure{box::Error(400, "item_name_too_long", "Item name too long")};
    }
    const bool odd = std::any_of(name.begin(), name.end(), [](char c) {
        return static_cast<unsigned char>(c) < 0x20 || c == 0x7f || c == '/' || c == '\\';
    });
    if (name.empty() || odd || name == "." || name == ".." || name.front() == ' ' ||
        name.back() == ' ') {
        throw box::Failure{box::Error(400, "item_name_invalid", "Item name invalid")};
    }
}

void BoxService::CheckFree(Node& parent, const std::string& name, const Node* except) const {
    const Node* taken = tree_.Child(parent, name);
    if (taken != nullptr && taken != except) {
        Json::Value context;
        context["conflicts"] = box::Mini(*taken);
        throw box::Failure{
            box::Error(409, "item_name_in_use", "Item with the same name already exists", context)};
    }
}

void BoxService::CheckSize(const Account& account, uint64_t size, uint64_t replaced) const {
    if (size > account.MaxUpload()) {
        throw box::Failure{box::Error(403, "file_size_limit_exceeded",
                                      "File size exceeds the folder owner's file size limit")};
    }
    if (tree_.Used(account) - replaced + size > account.Quota()) {
        throw box::Failure{
            box::Error(403, "storage_limit_exceeded", "Account storage limit reached")};
    }
}

Json::Value BoxService::Answer(const BoxCall& call, const Node& node) const {
    return call.request.HasQuery("fields") ? box::Selected(node, call.request.Query("fields"))
                                           : box::Full(node);
}

}  // namespace cloudsim
