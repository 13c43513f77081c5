#include "support/cloudsim/onedrive.h"

#include <json/writer.h>

#include <algorithm>
#include <cstdio>
#include <map>

#include "support/cloudsim/onedrive_json.h"
#include "support/cloudsim/onedrive_upload.h"
#include "support/cloudsim/route.h"

namespace cloudsim {
namespace {

constexpr const char* kApi = "api";
constexpr const char* kLogin = "login";
constexpr const char* kStorage = "storage";
constexpr const char* kContent = "content";
constexpr const char* kTokenPath = "/oauth20_token.srf";
constexpr const char* kVersion = "v5.0";

const char* RoleOfPath(const std::string& path) {
    return path == kTokenPath            ? kLogin
           : BeginsWith(path, "/users/") ? kStorage
           : BeginsWith(path, "/s1p/")   ? kContent
                                         : kApi;
}

TreeRules Rules() {
    TreeRules rules("");
    rules.make_id = onedrive::MakeId;
    return rules;
}

Reply NoSuchPath(const Request& request) {
    return onedrive::Error(
        404, "request_url_invalid",
        "The URL contains the path '" + request.path + "', which isn't supported.");
}

Reply WrongMethod() {
    return onedrive::Error(405, "request_method_invalid", "The method isn't supported here.");
}

Reply BadJson() {
    return onedrive::Error(400, "request_body_invalid",
                           "The request entity body isn't a valid JSON object.");
}

/** Errors come with 200 where a request can't bear another status. */
class Hushed : public Handler {
  public:
    explicit Hushed(std::unique_ptr<Handler> handler) : handler_(std::move(handler)) {}
    void Data(const char* data, size_t size) override { handler_->Data(data, size); }
    Reply Finish() override {
        Reply reply = handler_->Finish();
        reply.status = reply.status >= 400 ? 200 : reply.status;
        return reply;
    }

  private:
    const std::unique_ptr<Handler> handler_;
};

/** Folders of the top folder that have a name of their own in URLs. */
const std::map<std::string, std::string>& FriendlyNames() {
    static const std::map<std::string, std::string> names = {{"my_documents", "Documents"},
                                                             {"my_photos", "Pictures"},
                                                             {"public_documents", "Public"},
                                                             {"camera_roll", "Camera roll"}};
    return names;
}

}  // namespace

const OneDrive::Route OneDrive::kRoutes[] = {
    {"GET", 1, "", &OneDrive::GetItem},
    {"GET", 2, "files", &OneDrive::List},
    {"GET", 2, "search", &OneDrive::Search},
    {"GET", 2, "quota", &OneDrive::GetQuota},
    {"GET", 2, "albums", &OneDrive::ListAlbums},
    {"POST", 2, "albums", &OneDrive::CreateAlbum},
    {"GET", 2, "content", &OneDrive::GetContent},
    {"HEAD", 2, "content", &OneDrive::GetContent},
    {"POST", 1, "", &OneDrive::CreateFolder},
    {"PUT", 1, "", &OneDrive::Update},
    {"DELETE", 1, "", &OneDrive::Delete},
    {"MOVE", 1, "", &OneDrive::Move},
    {"COPY", 1, "", &OneDrive::Copy},
};

OneDrive::OneDrive(const OneDriveOptions& options)
    : Service(options, Rules()), drive_options_(options) {
    Start();
}

std::string OneDrive::StorageDomain() const {
    return Address(drive_options_.storage_domain).substr(Secure() ? 8 : 7);
}

std::string OneDrive::StorageHost(const Account& account) const {
    return Address("cid-" + account.Id() + drive_options_.storage_domain);
}

void OneDrive::SetType(const std::string& id, const std::string& type) {
    const std::lock_guard<std::mutex> lock(mutex_);
    types_[id] = type;
    pages_.clear();
}

void OneDrive::LimitRate(unsigned requests, int64_t seconds) {
    const std::lock_guard<std::mutex> lock(mutex_);
    rate_requests_ = requests;
    rate_seconds_ = seconds;
    windows_.clear();
}

std::string OneDrive::AccountId(size_t index) const {
    char id[17];
    snprintf(id, sizeof id, "%016zx", static_cast<size_t>(0x8c8ce076ca278000) + index);
    return id;
}

std::string OneDrive::Role(const Request& request) const {
    const std::string& host = request.host;
    if (IsBareAddress(host)) {
        return RoleOfPath(request.path);
    }
    if (host == drive_options_.login_name || BeginsWith(host, "login.")) {
        return kLogin;
    }
    if (host == drive_options_.content_name || BeginsWith(host, "public.")) {
        return kContent;
    }
    return BeginsWith(host, "cid-") || BeginsWith(host, "storage.") ? kStorage : kApi;
}

std::unique_ptr<Handler> OneDrive::Begin(Request& request) {
    if (request.path == "/oauth20_authorize.srf") {
        return Consent(request);
    }
    const std::string role = Role(request);
    if (role == kLogin) {
        return BeginLogin(request);
    }
    if (role == kContent) {
        const bool reads = request.method == "GET" || request.method == "HEAD";
        return Ready(reads ? Download(request) : Reply(405).With("Allow", "GET, HEAD"));
    }
    if (role == kStorage) {
        return BeginStorage(request);
    }
    return BeginCall(request);
}

std::unique_ptr<Handler> OneDrive::BeginLogin(const Request& request) {
    if (request.path == kTokenPath && request.method == "POST") {
        return Collect([this](const std::string& form) { return Token(form); });
    }
    return Ready(request.path == kTokenPath ? Reply(405).With("Allow", "POST") : Reply(404));
}

/** The token may stand in the query as well. */
Account* OneDrive::Authorize(Request& request) {
    const std::string bearer = request.BearerToken();
    Account* account = tokens_.Owner(bearer.empty() ? request.Query("access_token") : bearer);
    request.account = account == nullptr ? "" : account->Email();
    return account;
}

int64_t OneDrive::TooSoon(const Account& account) {
    const std::lock_guard<std::mutex> lock(mutex_);
    if (rate_requests_ == 0) {
        return 0;
    }
    Window& window = windows_[&account];
    if (Now() >= window.began + rate_seconds_) {
        window = {Now(), 0};
    }
    return ++window.requests > rate_requests_ ? window.began + rate_seconds_ - Now() : 0;
}

/** A GET may ask for another method, and for errors without their status. */
std::unique_ptr<Handler> OneDrive::BeginCall(Request& request) {
    const bool get = request.method == "GET";
    const bool hushed = get && request.Query("suppress_response_codes") == "true";
    request.method = get ? request.Query("method", "GET") : request.method;
    std::unique_ptr<Handler> handler = Admit(request);
    if (hushed) {
        handler = std::make_unique<Hushed>(std::move(handler));
    }
    return handler;
}

std::unique_ptr<Handler> OneDrive::Admit(Request& request) {
    std::vector<std::string> path = request.Segments();
    if (path.size() < 2 || path[0] != kVersion) {
        return Ready(onedrive::Error(
            404, "request_url_invalid",
            "The URL contains the path '" + request.path + "', which isn't supported."));
    }
    Account* account = Authorize(request);
    if (account == nullptr) {
        return Ready(Refused(request));
    }
    const int64_t wait = TooSoon(*account);
    if (wait > 0) {
        return Ready(onedrive::Error(420, "request_throttled",
                                     "This type of request came too often. Wait " +
                                         std::to_string(wait) + " seconds and try again.")
                         .With("Retry-After", std::to_string(wait)));
    }
    path.erase(path.begin());
    return Answered(request, *account, std::move(path));
}

/** "me/skydrive/..." is what lies in the top folder, "me/albums" those that lie there. */
std::unique_ptr<Handler> OneDrive::Answered(Request& request, Account& account,
                                            std::vector<std::string> path) {
    const bool own = path[0] == "me" || path[0] == account.Id();
    if (own && path.size() == 1) {
        return Ready(request.method == "GET" ? GetUser({request, account, "", Json::nullValue})
                                             : WrongMethod());
    }
    if (own && path[1] == "skydrive") {
        path.erase(path.begin());
    } else if (own && path[1] != "albums") {
        return Ready(NoSuchPath(request));
    }
    path[0] = own ? account.Root() : path[0];
    if (own && path.size() > 1 && FriendlyNames().count(path[1]) > 0) {
        const std::string id = account.Find("/" + FriendlyNames().at(path[1]));
        path.erase(path.begin());
        path[0] = id.empty() ? path[0] : id;
    }
    const std::string verb = path.size() > 1 ? path[1] : "";
    const bool into = path.size() == 3 && verb == "files";
    if (request.method == "PUT" && (into || (path.size() == 2 && verb == "content"))) {
        return std::make_unique<OneDriveUpload>(*this, request, account, path[0],
                                                into ? path[2] : "");
    }
    if (request.method == "POST" && path.size() == 2 && verb == "files") {
        return std::make_unique<OneDriveUpload>(*this, request, account, path[0], "");
    }
    return into ? Ready(WrongMethod()) : Routed(request, account, path);
}

std::unique_ptr<Handler> OneDrive::Routed(Request& request, Account& account,
                                          const std::vector<std::string>& path) {
    bool known = false;
    for (const Route& route : kRoutes) {
        if (path.size() != route.parts || (path.size() > 1 && path[1] != route.verb)) {
            continue;
        }
        known = true;
        if (request.method == route.method) {
            const OneDriveCall call = {request, account, path[0], Json::nullValue};
            return Collect([this, call, operation = route.operation](const std::string& body) {
                return Call(call, operation, body);
            });
        }
    }
    return Ready(known ? WrongMethod() : NoSuchPath(request));
}

Reply OneDrive::Call(OneDriveCall call, Operation operation, const std::string& body) {
    call.body = ParseObject(body);
    if (call.body.isNull() && !body.empty()) {
        return BadJson();
    }
    const std::lock_guard<std::mutex> lock(mutex_);
    try {
        return (this->*operation)(call);
    } catch (const onedrive::Failure& failure) {
        return failure.reply;
    } catch (const Json::Exception&) {
        return BadJson();
    }
}

Node& OneDrive::Find(const Account& account, const std::string& id) {
    Node* node = tree_.Find(account, id);
    if (node == nullptr) {
        throw onedrive::Failure{
            onedrive::Error(404, "resource_not_found", "The resource '" + id + "' doesn't exist.")};
    }
    return *node;
}

Node& OneDrive::Folder(const Account& account, const std::string& id) {
    Node& node = Find(account, id);
    if (!node.folder) {
        throw onedrive::Failure{onedrive::Error(400, "request_url_invalid",
                                                "The resource '" + id + "' isn't a folder.")};
    }
    return node;
}

/** What Windows doesn't take for a name isn't taken here either. */
void OneDrive::CheckName(const std::string& name) const {
    const auto letters =
        std::count_if(name.begin(), name.end(), [](char c) { return (c & 0xc0) != 0x80; });
    const bool odd = std::any_of(name.begin(), name.end(), [](char c) {
        return static_cast<unsigned char>(c) < 0x20 ||
               std::string("\\/:*?\"<>|").find(c) != std::string::npos;
    });
    if (name.empty() || letters > 255 || odd || name.front() == ' ' || name.back() == ' ' ||
        name.back() == '.') {
        throw onedrive::Failure{
            onedrive::Error(400, "resource_name_invalid",
                            "The resource name is too long or contains characters that aren't "
                            "allowed.")};
    }
}

void OneDrive::CheckFree(const Node& parent, const std::string& name, const Node* except) const {
    const Node* taken = tree_.Child(parent, name);
    if (taken != nullptr && taken != except) {
        throw onedrive::Failure{
            onedrive::Error(drive_options_.conflict_status, "resource_already_exists",
                            "The resource couldn't be created because a resource with the name '" +
                                name + "' already exists.")};
    }
}

void OneDrive::CheckSpace(const Account& account, uint64_t size, uint64_t replaced) const {
    if (tree_.Used(account) - replaced + size > account.Quota()) {
        throw onedrive::Failure{onedrive::Error(507, "resource_quota_exceeded",
                                                "The user doesn't have enough available storage.")};
    }
}

std::string OneDrive::TypeOf(const Node& node) const {
    const auto told = types_.find(node.id);
    return told != types_.end() ? told->second
           : node.folder        ? "folder"
                                : onedrive::FileType(node.name);
}

Json::Value OneDrive::Show(const Node& node) const {
    return onedrive::Item(node, {TypeOf(node), ApiHost() + "/" + kVersion,
                                 node.folder ? "" : ContentUrl(node) + ":Binary"});
}

/** Documents are broken into lines unless "pretty" is false. */
Reply OneDrive::Answer(const Request& request, int status, const Json::Value& document) const {
    Reply reply = JsonReply(status, document);
    if (request.Query("pretty") != "false") {
        Json::StreamWriterBuilder builder;
        builder["indentation"] = "   ";
        builder["emitUTF8"] = true;
        reply.SetBody(Json::writeString(builder, document));
    }
    return reply;
}

}  // namespace cloudsim
