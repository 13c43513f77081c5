#include "support/cloudsim/gdrive.h"

#include <json/value.h>

#include "support/cloudsim/gdrive_upload.h"
#include "support/cloudsim/route.h"

namespace cloudsim {
namespace {

constexpr const char* kApi = "api";
constexpr const char* kUpload = "upload";
constexpr const char* kDownload = "download";
constexpr const char* kAccount = "account";

bool IsTokenPath(const std::string& path) {
    return path == "/o/oauth2/token" || path == "/token" || path == "/oauth2/v3/token" ||
           path == "/oauth2/v4/token";
}

bool IsContentPath(const std::string& path) {
    return BeginsWith(path, "/docs/") || BeginsWith(path, "/feeds/") || path == "/uc";
}

TreeRules Rules() {
    TreeRules rules("0A-Root_");
    rules.id_prefix = "0B-";
    rules.graph = true;
    return rules;
}

}  // namespace

// What could be taken for an id stands before what has one there.
const GDrive::Route GDrive::kRoutes[] = {
    {"GET", "drive/v2/about", &GDrive::About},
    {"GET", "drive/v2/files", &GDrive::ListFiles},
    {"POST", "drive/v2/files", &GDrive::Insert},
    {"DELETE", "drive/v2/files/trash", &GDrive::EmptyTrash},
    {"GET", "drive/v2/files/*", &GDrive::GetFile},
    {"PUT", "drive/v2/files/*", &GDrive::Update},
    {"PATCH", "drive/v2/files/*", &GDrive::Update},
    {"DELETE", "drive/v2/files/*", &GDrive::Delete},
    {"POST", "drive/v2/files/*/copy", &GDrive::Copy},
    {"POST", "drive/v2/files/*/trash", &GDrive::Trash},
    {"POST", "drive/v2/files/*/untrash", &GDrive::Untrash},
    {"POST", "drive/v2/files/*/touch", &GDrive::TouchFile},
    {"GET", "drive/v2/files/*/export", &GDrive::Export},
};

GDrive::GDrive(const GDriveOptions& options) : Service(options, Rules()), drive_options_(options) {
    SetRotation(false);
    Start();
}

std::string GDrive::Role(const Request& request) const {
    const std::string& path = request.path;
    const bool bare = IsBareAddress(request.host);
    // At a bare address only the path tells.
    const std::string host = bare ? "" : request.host;
    if (host == drive_options_.accounts_name || BeginsWith(host, "accounts.") ||
        BeginsWith(path, "/oauth2/") || (bare && IsTokenPath(path))) {
        return kAccount;
    }
    if (host == drive_options_.content_name || BeginsWith(host, "doc") ||
        (bare && IsContentPath(path))) {
        return kDownload;
    }
    return BeginsWith(path, "/upload/") ? kUpload : kApi;
}

std::unique_ptr<Handler> GDrive::Begin(Request& request) {
    if (request.path == "/o/oauth2/v2/auth") {
        return Consent(request);
    }
    const std::string role = Role(request);
    const std::vector<std::string> path = request.Segments();
    if (role == kAccount) {
        return !IsTokenPath(request.path) ? Ready(Reply(404))
               : request.method == "POST"
                   ? Collect([this](const std::string& form) { return Token(form); })
                   : Ready(Reply(405).With("Allow", "POST"));
    }
    if (role == kDownload) {
        Authorize(request);
        return request.method == "GET" || request.method == "HEAD"
                   ? Ready(Content(request))
                   : Ready(Reply(405).With("Allow", "GET, HEAD"));
    }
    return role == kUpload ? BeginUpload(request, path) : BeginCall(request, path);
}

Account* GDrive::Authorize(Request& request) {
    const std::string header = request.BearerToken();
    Account* account = tokens_.Owner(header.empty() ? request.Query("access_token") : header);
    request.account = account == nullptr ? "" : account->Email();
    return account;
}

Reply GDrive::Refused(const Request& request) {
    const bool none = request.BearerToken().empty() && !request.HasQuery("access_token");
    return gdrive::Error(401, none ? "required" : "authError",
                         none ? "Login Required" : "Invalid Credentials")
        .With("WWW-Authenticate", std::string("Bearer realm=\"https://accounts.google.com/\"") +
                                      (none ? "" : ", error=invalid_token"));
}

std::unique_ptr<Handler> GDrive::BeginCall(Request& request, const std::vector<std::string>& path) {
    std::string id;
    for (const Route& route : kRoutes) {
        if (request.method != route.method || !MatchesPath(route.path, path, id)) {
            continue;
        }
        Account* account = Authorize(request);
        if (account == nullptr) {
            return Ready(Refused(request));
        }
        return Collect(
            [this, &request, account, id, operation = route.operation](const std::string& body) {
                return Call(request, *account, id, body,
                            [&](const GDriveCall& call) { return (this->*operation)(call); });
            });
    }
    return Ready(Reply(404, "Not Found", "text/html; charset=UTF-8"));
}

Reply GDrive::Call(const Request& request, Account& account, const std::string& id,
                   const std::string& body,
                   const std::function<Reply(const GDriveCall&)>& operation) {
    const GDriveCall call = {request, account, id, ParseObject(body)};
    if (call.body.isNull() && !body.empty()) {
        return gdrive::Error(400, "parseError", "Parse Error");
    }
    const std::lock_guard<std::mutex> lock(mutex_);
    try {
        return operation(call);
    } catch (const gdrive::Failure& failure) {
        return failure.reply;
    } catch (const Json::Exception&) {
        return gdrive::Error(400, "badRequest", "Bad Request");
    }
}

std::unique_ptr<Handler> GDrive::BeginUpload(Request& request,
                                             const std::vector<std::string>& path) {
    std::string id;
    const bool first = MatchesPath("upload/drive/v2/files", path, id);
    if (!first && !MatchesPath("upload/drive/v2/files/*", path, id)) {
        return Ready(Reply(404, "Not Found", "text/html; charset=UTF-8"));
    }
    Account* account = Authorize(request);
    const bool anonymous = request.BearerToken().empty() && !request.HasQuery("access_token");
    if (request.HasQuery("upload_id") && (account != nullptr || anonymous)) {
        return std::make_unique<GDriveResume>(*this, request);
    }
    if (account == nullptr) {
        return Ready(Refused(request));
    }
    const bool fits =
        first ? request.method == "POST" : request.method == "PUT" || request.method == "PATCH";
    const std::string type = request.Query("uploadType");
    if (fits && type == "resumable") {
        return Collect([this, &request, account, id](const std::string& body) {
            return Call(request, *account, id, body,
                        [this](const GDriveCall& call) { return OpenSession(call); });
        });
    }
    if (fits && (type == "media" || type == "multipart")) {
        return std::make_unique<GDriveUpload>(*this, request, *account, id);
    }
    return Ready(fits ? gdrive::Error(400, "badRequest", "Bad Request", "uploadType")
                      : Reply(404, "Not Found", "text/html; charset=UTF-8"));
}

Node& GDrive::Find(const GDriveCall& call, const std::string& id) {
    Node* node = tree_.Find(call.account, id == "root" ? tree_.RootId(call.account) : id);
    if (node == nullptr) {
        throw gdrive::NotFound(id);
    }
    return *node;
}

Node& GDrive::Folder(const GDriveCall& call, const std::string& id) {
    Node& node = Find(call, id);
    if (!node.folder) {
        throw gdrive::Failure{
            gdrive::Error(403, "parentNotAFolder", "The specified parent is not a folder.")};
    }
    return node;
}

Node& GDrive::Own(const GDriveCall& call) {
    Node& node = Find(call, call.id);
    if (&node == &tree_.Root(call.account) || !node.sharer.empty()) {
        throw gdrive::NoPermission(node);
    }
    return node;
}

void GDrive::CheckSize(const Account& account, uint64_t size, uint64_t replaced) const {
    if (size > account.MaxUpload()) {
        throw gdrive::Failure{gdrive::Error(413, "uploadTooLarge", "Upload is too large.")};
    }
    if (size > replaced && tree_.Used(account) - replaced + size > account.Quota()) {
        const std::string& reason = drive_options_.quota_reason;
        throw gdrive::Failure{{403, ErrorText(403, reason), "application/json; charset=UTF-8"}};
    }
}

std::string GDrive::ErrorText(int status, const std::string& reason) {
    static const std::map<std::string, std::string> messages = {
        {"authError", "Invalid Credentials"},
        {"backendError", "Backend Error"},
        {"dailyLimitExceeded", "Daily Limit Exceeded"},
        {"internalError", "Internal Error"},
        {"notFound", "File not found: "},
        {"quotaExceeded", "The user has exceeded their Drive storage quota"},
        {"rateLimitExceeded", "Rate Limit Exceeded"},
        {"storageQuotaExceeded", "The user's Drive storage quota has been exceeded."},
        {"userRateLimitExceeded", "User Rate Limit Exceeded"},
    };
    const auto known = messages.find(reason);
    return gdrive::ErrorText(status, reason, known == messages.end() ? reason : known->second);
}

}  // namespace cloudsim
