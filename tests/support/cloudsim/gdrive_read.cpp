/** What only reads: the account, listings, files, and their contents. */
#include <json/value.h>
#include <openssl/evp.h>

#include <algorithm>
#include <vector>

#include "support/cloudsim/gdrive.h"
#include "support/cloudsim/gdrive_query.h"
#include "support/cloudsim/route.h"

namespace cloudsim {
namespace {

constexpr size_t kKeptPages = 512, kKeptCursors = 10000;
constexpr uint64_t kUsualPage = 100, kLargestPage = 1000;

std::string Md5Of(const class Content& content) {
    static const char kDigits[] = "0123456789abcdef";
    const std::unique_ptr<EVP_MD_CTX, void (*)(EVP_MD_CTX*)> sum(EVP_MD_CTX_new(), EVP_MD_CTX_free);
    EVP_DigestInit_ex(sum.get(), EVP_md5(), nullptr);
    std::vector<char> piece(256 * 1024);
    uint64_t offset = 0;
    int64_t got = 0;
    while ((got = content.Read(offset, piece.data(), piece.size())) > 0) {
        EVP_DigestUpdate(sum.get(), piece.data(), static_cast<size_t>(got));
        offset += static_cast<uint64_t>(got);
    }
    unsigned char bytes[EVP_MAX_MD_SIZE];
    unsigned size = 0;
    EVP_DigestFinal_ex(sum.get(), bytes, &size);
    std::string hex;
    for (unsigned i = 0; i < size; i++) {
        hex += {kDigits[bytes[i] >> 4], kDigits[bytes[i] & 15]};
    }
    return offset == content.Size() ? hex : "";
}

uint64_t PageSize(const Request& request) {
    const auto size = ParseNumber(request.Query("maxResults", std::to_string(kUsualPage)));
    if (!size) {
        throw gdrive::Failure{gdrive::Error(
            400, "invalidParameter",
            "Invalid integer value: '" + request.Query("maxResults") + "'.", "maxResults")};
    }
    return *size == 0 ? kUsualPage : std::min(*size, kLargestPage);
}

Json::Value MaxUploadSizes(uint64_t size) {
    Json::Value any;
    any["type"] = "*";
    any["size"] = std::to_string(size);
    Json::Value sizes;
    sizes.append(std::move(any));
    return sizes;
}

Reply Forbidden() {
    return {403, "<HTML><HEAD><TITLE>Forbidden</TITLE></HEAD></HTML>", "text/html; charset=UTF-8"};
}

}  // namespace

Reply GDrive::About(const GDriveCall& call) {
    const gdrive::Mask mask =
        gdrive::ParseFields(call.request.Query("fields"), gdrive::kAboutSchema);
    uint64_t in_trash = 0;
    for (const Node* node : tree_.All(call.account)) {
        const bool counts = node->IsTrashed() && !node->folder && !node->weightless;
        in_trash += counts ? node->content->Size() : 0;
    }
    const std::string used = std::to_string(tree_.Used(call.account));
    Json::Value about;
    about["kind"] = "drive#about";
    about["etag"] = "\"" + std::to_string(tree_.Version()) + "\"";
    about["selfLink"] = ApiHost() + "/drive/v2/about";
    about["name"] = call.account.Name();
    about["user"] = gdrive::User(call.account);
    about["quotaBytesTotal"] = std::to_string(call.account.Quota());
    about["quotaBytesUsed"] = about["quotaBytesUsedAggregate"] = used;
    about["quotaBytesUsedInTrash"] = std::to_string(in_trash);
    about["quotaType"] = "LIMITED";
    about["largestChangeId"] = std::to_string(tree_.Version() + 1);
    about["rootFolderId"] = tree_.RootId(call.account);
    about["domainSharingPolicy"] = "allowed";
    about["permissionId"] = about["user"]["permissionId"];
    about["isCurrentAppInstalled"] = false;
    about["languageCode"] = "en";
    about["maxUploadSizes"] = MaxUploadSizes(call.account.MaxUpload());
    return JsonReply(200, mask.Apply(about));
}

/**
 * A benchmark asks for the same pages of a long list again and again: made once, until a change.
 * The download URLs in them have to stay good, though.
 */
Reply GDrive::ListFiles(const GDriveCall& call) {
    const bool stale = Now() - pages_made_ > drive_options_.download_life / 2;
    if (pages_version_ != tree_.Version() || pages_.size() >= kKeptPages || stale) {
        pages_.clear();
        pages_version_ = tree_.Version();
        pages_made_ = Now();
    }
    const auto key = std::make_pair(call.account.Id(), call.request.target);
    const auto known = pages_.find(key);
    return known != pages_.end() ? known->second : pages_[key] = MakePage(call);
}

Reply GDrive::MakePage(const GDriveCall& call) {
    const gdrive::Mask mask =
        gdrive::ParseFields(call.request.Query("fields"), gdrive::kListSchema);
    const bool empty = drive_options_.empty_pages && !call.request.HasQuery("pageToken");
    const uint64_t size = empty ? 0 : PageSize(call.request);
    Cursor cursor = FindAll(call);
    const gdrive::View view = ViewOf(call.account);
    Json::Value items = Json::arrayValue;
    for (; cursor.next < cursor.ids->size() && items.size() < size; cursor.next++) {
        const Node* node = tree_.Find(call.account, (*cursor.ids)[cursor.next]);
        if (node != nullptr) {
            items.append(gdrive::File(view, *node, mask.Of("items")));
        }
    }
    Json::Value list;
    list["kind"] = "drive#fileList";
    list["etag"] = "\"" + std::to_string(tree_.Version()) + "\"";
    list["selfLink"] = ApiHost() + call.request.target;
    list["incompleteSearch"] = false;
    if (cursor.next < cursor.ids->size()) {
        const std::string token = Remember(std::move(cursor));
        list["nextPageToken"] = token;
        list["nextLink"] = ApiHost() + "/drive/v2/files?pageToken=" + token;
    }
    Json::Value page = Json::objectValue;
    for (const std::string& member : list.getMemberNames()) {
        if (mask.Wants(member)) {
            page[member] = list[member];
        }
    }
    if (mask.Wants("items")) {
        page["items"] = std::move(items);
    }
    return JsonReply(200, page);
}

/** A page token goes on with the list as it was when its first page was read. */
GDrive::Cursor GDrive::FindAll(const GDriveCall& call) {
    const std::string text = call.request.Query("q"), token = call.request.Query("pageToken");
    if (!token.empty()) {
        const auto cursor = cursors_.find(token);
        if (cursor == cursors_.end() || cursor->second.account != &call.account ||
            (call.request.HasQuery("q") && cursor->second.query != text)) {
            throw gdrive::Failure{gdrive::Error(400, "invalid", "Invalid Value", "pageToken")};
        }
        return cursor->second;
    }
    std::vector<std::string> folders;
    const gdrive::QueryPtr query =
        gdrive::ParseQuery(text, {call.account.Email(), tree_.RootId(call.account)}, folders);
    for (const std::string& id : folders) {
        if (tree_.Find(call.account, id) == nullptr) {
            throw gdrive::NotFound(".");
        }
    }
    auto ids = std::make_shared<std::vector<std::string>>();
    const auto take = [&](const Node& node) {
        if (query->Fits(node)) {
            ids->push_back(node.id);
        }
    };
    if (query->OnlyIn().empty()) {
        for (const Node* node : tree_.All(call.account)) {
            take(*node);
        }
    } else {
        for (const auto& [key, node] : Find(call, query->OnlyIn()).children) {
            take(*node);
        }
    }
    return {&call.account, text, std::move(ids), 0};
}

std::string GDrive::Remember(Cursor cursor) {
    std::string token = "~!!~" + RandomText(40);
    cursors_.emplace(token, std::move(cursor));
    cursor_order_.push_back(token);
    if (cursor_order_.size() > kKeptCursors) {
        cursors_.erase(cursor_order_.front());
        cursor_order_.pop_front();
    }
    return token;
}

Reply GDrive::GetFile(const GDriveCall& call) {
    const Node& node = Find(call, call.id);
    if (call.request.Query("alt") != "media") {
        return JsonReply(200, Show(call, node));
    }
    if (node.folder || gdrive::IsDocument(node)) {
        return gdrive::Error(403, "fileNotDownloadable",
                             "Only files with binary content can be downloaded.", "alt");
    }
    return ContentReply(call.request, node.content, gdrive::MimeType(node));
}

Reply GDrive::Export(const GDriveCall& call) {
    return Exported(call.request, Find(call, call.id), call.request.Query("mimeType"));
}

/** Made when it is asked for, so that there are no parts of it. */
Reply GDrive::Exported(const Request& request, const Node& node, const std::string& type) const {
    if (gdrive::ExportFormats(gdrive::MimeType(node)).count(type) == 0) {
        return gdrive::Error(400, "badRequest", "The requested conversion is not supported.",
                             "convertTo");
    }
    Request whole = request;
    whole.headers.clear();
    return ContentReply(whole, node.content, type);
}

Reply GDrive::Content(const Request& request) {
    const std::vector<std::string> path = request.Segments();
    const Account* account = tokens_.Owner(
        request.BearerToken().empty() ? request.Query("access_token") : request.BearerToken());
    if (account == nullptr) {
        return Reply(401).With("WWW-Authenticate", "Bearer realm=\"https://accounts.google.com/\"");
    }
    const std::lock_guard<std::mutex> lock(mutex_);
    if (path.size() == 6 && path[0] == "docs" && path[1] == "securesc") {
        return Download(request, *account, path);
    }
    const bool exports =
        path.size() == 4 && path[0] == "feeds" && path[1] == "download" && path[3] == "Export";
    const Node* node = tree_.Find(*account, request.Query("id"));
    if (node == nullptr || (!exports && request.path != "/uc")) {
        return Reply(404);
    }
    if (exports) {
        return Exported(request, *node, gdrive::ExportType(request.Query("exportFormat")));
    }
    return node->content == nullptr ? Reply(404)
                                    : ContentReply(request, node->content, gdrive::MimeType(*node));
}

/** docs/securesc/ACCOUNT/EXPIRES/TURN/ID: who has come too late asks for another URL. */
Reply GDrive::Download(const Request& request, const Account& account,
                       const std::vector<std::string>& path) {
    const auto expires = ParseNumber(path[3]), turn = ParseNumber(path[4]);
    const bool good = path[2] == account.Id() && turn == download_turn_ && expires &&
                      Now() < static_cast<int64_t>(*expires);
    if (!good) {
        return Forbidden();
    }
    const Node* node = tree_.Find(account, path[5]);
    return node == nullptr || node->folder || gdrive::IsDocument(*node)
               ? Reply(404)
               : ContentReply(request, node->content, gdrive::MimeType(*node));
}

gdrive::View GDrive::ViewOf(const Account& account) {
    const std::string until = std::to_string(Now() + drive_options_.download_life);
    const std::string start = ContentHost() + "/docs/securesc/" + account.Id() + "/" + until + "/" +
                              std::to_string(download_turn_) + "/";
    return {account,
            tree_.RootId(account),
            ApiHost(),
            ContentHost(),
            [start](const Node& node) { return start + node.id + "?e=download&gd=true"; },
            [this](const Node& node) { return Md5(node); }};
}

Json::Value GDrive::Show(const GDriveCall& call, const Node& node) {
    return gdrive::File(ViewOf(call.account), node,
                        gdrive::ParseFields(call.request.Query("fields"), gdrive::kFileSchema));
}

std::map<std::string, std::string> GDrive::Attributes(const Account& account, const Item& item) {
    const std::lock_guard<std::mutex> lock(mutex_);
    const gdrive::Mask whole = gdrive::ParseFields("", gdrive::kFileSchema);
    const Json::Value described = gdrive::File(ViewOf(account), At(account, item.id), whole);
    return {{"id::file", item.id}, {"standard::description", OneLine(described)}};
}

std::string GDrive::Md5(const Node& node) {
    const auto known = sums_.find(node.version_id);
    return known != sums_.end() ? known->second : sums_[node.version_id] = Md5Of(*node.content);
}

}  // namespace cloudsim
