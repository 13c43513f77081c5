#include "support/cloudsim/dropbox.h"

#include <algorithm>

#include "support/cloudsim/dropbox_upload.h"
#include "support/cloudsim/route.h"

namespace cloudsim {
namespace {

constexpr const char* kApi = "api";
constexpr const char* kContent = "content";
constexpr const char* kAny = "";
constexpr const char* kOldMetadata = "files/get_metadata";

TreeRules Rules() {
    TreeRules rules("root");
    rules.id_prefix = "id:a4ayc_80_OEAAAAA";
    return rules;
}

bool IsTokenPath(const std::string& path) {
    return path == "/oauth2/token" || path == "/1/oauth2/token";
}

/** Functions of the contents' host get their arguments in a header, or in the address. */
std::string HeaderArguments(const Request& request, const std::string& function) {
    const std::string header = request.Header("Dropbox-API-Arg");
    if (header.empty() && !request.HasQuery("arg")) {
        if (function == "files/upload_session/start") {
            return "{}";  // nothing of what it takes has to be given
        }
        throw dropbox::Failure{
            dropbox::BadInput(function,
                              "Must provide HTTP header \"Dropbox-API-Arg\" or URL parameter "
                              "\"arg\"."),
            {}};
    }
    return header.empty() ? request.Query("arg") : header;
}

}  // namespace

namespace dropbox {

Arguments ReadHeader(const Request& request, const std::string& function) {
    const std::string text = HeaderArguments(request, function);
    // Letters beyond ASCII should be escaped, but are read as UTF-8 when they aren't.
    return {function, "HTTP header \"Dropbox-API-Arg\"",
            text.find('\x7f') == std::string::npos && IsUtf8(text) ? text : ""};
}

void CheckType(const Request& request, const std::string& function, bool may_be_none,
               std::initializer_list<const char*> types) {
    const std::string given = request.Header("Content-Type");
    const bool good =
        given.empty() ? may_be_none : std::any_of(types.begin(), types.end(), [&](const char* t) {
            return SameText(given.substr(0, given.find(';')), t);
        });
    if (!good) {
        std::string known;
        for (const char* type : types) {
            known += (known.empty() ? "\"" : ", \"") + std::string(type) + "\"";
        }
        throw Failure{BadInput(function, "Bad HTTP \"Content-Type\" header: \"" + given +
                                             "\".  Expecting one of " + known + "."),
                      {}};
    }
}

}  // namespace dropbox

const Dropbox::Function Dropbox::kFunctions[] = {
    {kApi, "users/get_current_account", &Dropbox::GetAccount, true},
    {kApi, "users/get_space_usage", &Dropbox::GetSpace, true},
    {kApi, "files/get_metadata", &Dropbox::GetMetadata, false},
    {kApi, "files/list_folder", &Dropbox::ListFolder, false},
    {kApi, "files/list_folder/continue", &Dropbox::ListMore, false},
    {kApi, "files/list_folder/get_latest_cursor", &Dropbox::LatestCursor, false},
    {kApi, "files/create_folder", &Dropbox::CreateFolder, false},
    {kApi, "files/create_folder_v2", &Dropbox::CreateFolder2, false},
    {kApi, "files/delete", &Dropbox::Delete, false},
    {kApi, "files/delete_v2", &Dropbox::Delete2, false},
    {kApi, "files/copy", &Dropbox::Copy, false},
    {kApi, "files/copy_v2", &Dropbox::Copy2, false},
    {kApi, "files/move", &Dropbox::Move, false},
    {kApi, "files/move_v2", &Dropbox::Move2, false},
    {kApi, "files/copy_reference/get", &Dropbox::GetReference, false},
    {kApi, "files/copy_reference/save", &Dropbox::SaveReference, false},
    {kApi, "files/upload_session/start_batch", &Dropbox::StartBatch, false},
    {kApi, "files/upload_session/finish_batch", &Dropbox::FinishBatch, false},
    {kApi, "files/upload_session/finish_batch_v2", &Dropbox::FinishBatch2, false},
    {kApi, "files/upload_session/finish_batch/check", &Dropbox::CheckBatch, false},
    {kContent, "files/download", &Dropbox::Download, false},
};

Dropbox::Dropbox(const DropboxOptions& options)
    : Service(options, Rules()), dropbox_options_(options) {
    SetRotation(false);
    SetTokenLife(4 * 3600);
    Start();
}

std::string Dropbox::Role(const Request& request) const {
    const std::string& host = request.host;
    return IsBareAddress(host)                                                     ? kAny
           : host == dropbox_options_.content_name || BeginsWith(host, "content.") ? kContent
                                                                                   : kApi;
}

std::unique_ptr<Handler> Dropbox::Begin(Request& request) {
    if (request.path == "/oauth2/authorize") {
        return Consent(request);
    }
    const std::string role = Role(request);
    if (role != kContent && IsTokenPath(request.path)) {
        return request.method != "POST" ? Ready(Reply(405).With("Allow", "POST"))
                                        : Collect([this, &request](const std::string& form) {
                                              return Token(request, form);
                                          });
    }
    return BeginsWith(request.path, "/2/") ? BeginFunction(request, role, request.path.substr(3))
                                           : Ready(Reply(404, "Not Found", "text/html"));
}

std::unique_ptr<Handler> Dropbox::BeginFunction(Request& request, const std::string& role,
                                                const std::string& name) {
    const bool old = request.method == "GET" && role != kContent && BeginsWith(name, kOldMetadata);
    const auto found =
        std::find_if(std::begin(kFunctions), std::end(kFunctions), [&](const Function& function) {
            return name == function.name && (role == kAny || role == function.role);
        });
    const DropboxUpload::Kind* upload = role == kApi ? nullptr : DropboxUpload::Find(name);
    if (found == std::end(kFunctions) && upload == nullptr && !old) {
        return Ready(Reply(400, "Unknown API function: \"" + name + "\"", "text/plain"));
    }
    const bool read = upload == nullptr && !old && found->role == std::string(kContent);
    if (request.method != "POST" && !old && !(read && request.method == "GET")) {
        return Ready(Reply(405).With("Allow", "POST"));
    }
    Account* account = Authorize(request);
    if (account == nullptr || IsThrottled()) {
        return Ready(account == nullptr ? Refused(request, name) : TooMany());
    }
    if (old) {
        return Ready(Answer([&] { return GetOldMetadata(request, *account); }));
    }
    if (upload != nullptr) {
        return std::make_unique<DropboxUpload>(*this, request, *account, *upload);
    }
    return read ? BeginRead(request, *account, *found)
                : Collect([this, &request, account, found](const std::string& body) {
                      return Call(request, *account, *found, body);
                  });
}

std::unique_ptr<Handler> Dropbox::BeginRead(Request& request, Account& account,
                                            const Function& function) {
    return Ready(Answer([&] {
        dropbox::CheckType(request, function.name, true,
                           {"application/octet-stream", "text/plain"});
        const DropboxCall call = {request, account, dropbox::ReadHeader(request, function.name)};
        return (this->*function.operation)(call);
    }));
}

Reply Dropbox::Call(const Request& request, Account& account, const Function& function,
                    const std::string& body) {
    return Answer([&] {
        const bool bare = function.takes_null && body.empty();
        dropbox::CheckType(request, function.name, bare, {"application/json", "text/plain"});
        const bool typed = !request.Header("Content-Type").empty();
        if (function.takes_null && (typed || !body.empty()) && body != "null") {
            const bool parsed = !ParseObject(body).isNull();
            return dropbox::BadInput(function.name,
                                     parsed ? "request body: expected null, got value"
                                            : "request body: could not decode input as JSON");
        }
        const DropboxCall call = {
            request, account, {function.name, "request body", function.takes_null ? "{}" : body}};
        return (this->*function.operation)(call);
    });
}

Reply Dropbox::Answer(const std::function<Reply()>& operation) {
    const std::lock_guard<std::mutex> lock(mutex_);
    try {
        return operation();
    } catch (const dropbox::Failure& failure) {
        return failure.reply;
    }
}

Reply Dropbox::TooMany() const {
    const int64_t left = std::max<int64_t>(throttled_until_ - Now(), 1);
    Json::Value error;
    error["reason"] = dropbox::Tagged({"too_many_requests"});
    error["retry_after"] = Json::Int64(left);
    Json::Value body;
    body["error_summary"] = "too_many_requests/..";
    body["error"] = error;
    return JsonReply(429, body).With("Retry-After", std::to_string(left));
}

}  // namespace cloudsim
