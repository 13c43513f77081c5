#include "support/cloudsim/dropbox_json.h"

#include <json/writer.h>

#include <algorithm>
#include <atomic>
#include <ctime>

#include "support/cloudsim/account.h"

namespace cloudsim::dropbox {
namespace {

/** Members of the unions, from the outermost to the innermost. */
std::string Summary(const Json::Value& error) {
    std::string summary;
    const Json::Value* place = &error;
    while (place->isObject() && place->isMember(".tag")) {
        const std::string tag = (*place)[".tag"].asString();
        summary += tag + "/";
        place = &(*place)[place->isMember("reason") ? "reason" : tag];
    }
    return summary;
}

/** Their number changes so that nobody compares whole summaries. */
std::string Dots() {
    static std::atomic<unsigned> turn{0};
    return std::string(1 + turn++ % 3, '.');
}

std::string Format(int64_t time, const char* format) {
    const time_t moment = time;
    struct tm parts {};
    gmtime_r(&moment, &parts);
    char text[64];
    strftime(text, sizeof text, format, &parts);
    return text;
}

std::string Formed(const std::string& name, bool folder, const std::string& addition) {
    const size_t dot = folder ? std::string::npos : name.rfind('.');
    const bool extension = dot != std::string::npos && dot > 0;
    return name.substr(0, extension ? dot : name.size()) + " (" + addition + ")" +
           (extension ? name.substr(dot) : "");
}

}  // namespace

Json::Value Tagged(const std::vector<std::string>& tags) {
    Json::Value error;
    for (auto tag = tags.rbegin(); tag != tags.rend(); ++tag) {
        Json::Value outer;
        outer[".tag"] = *tag;
        if (!error.isNull()) {
            outer[*tag] = std::move(error);
        }
        error = std::move(outer);
    }
    return error;
}

Reply ErrorWithStatus(int status, const Json::Value& error) {
    Json::Value body;
    body["error_summary"] = Summary(error) + Dots();
    body["error"] = error;
    return JsonReply(status, body);
}

Reply Error(const Json::Value& error) {
    return ErrorWithStatus(409, error);
}

Failure Fail(std::initializer_list<std::string> tags) {
    const Json::Value error = Tagged(tags);
    return {Error(error), error};
}

Reply BadInput(const std::string& function, const std::string& why) {
    return {400, "Error in call to API function \"" + function + "\": " + why,
            "text/plain; charset=utf-8"};
}

std::string PathOf(const Node& node) {
    return node.parent == nullptr ? "" : PathOf(*node.parent) + "/" + node.name;
}

std::string Revision(const Node& node) {
    constexpr const char* kHex = "0123456789abcdef";
    std::string text;
    for (uint64_t rest = static_cast<uint64_t>(node.version) + 1; text.size() < 9; rest >>= 4) {
        text.insert(text.begin(), kHex[rest & 15]);
    }
    return text + node.version_id;
}

std::string Date(int64_t time) {
    return Format(time, "%Y-%m-%dT%H:%M:%SZ");
}

std::string OldDate(int64_t time) {
    return Format(time, "%a, %d %b %Y %H:%M:%S +0000");
}

Json::Value Metadata(const Node& node, const std::string& hash, bool tag) {
    const std::string path = PathOf(node);
    Json::Value item;
    if (tag) {
        item[".tag"] = node.folder ? "folder" : "file";
    }
    item["name"] = node.name;
    item["path_lower"] = FoldCase(path);
    item["path_display"] = path;
    item["id"] = node.id;
    if (node.folder) {
        return item;
    }
    item["client_modified"] = Date(node.content_modified);
    item["server_modified"] = Date(node.modified);
    item["rev"] = Revision(node);
    item["size"] = Json::UInt64(node.Size());
    item["is_downloadable"] = true;
    if (!hash.empty()) {
        item["content_hash"] = hash;
    }
    return item;
}

Json::Value Deleted(const std::string& path) {
    Json::Value item;
    item[".tag"] = "deleted";
    item["name"] = path.substr(path.rfind('/') + 1);
    item["path_lower"] = FoldCase(path);
    item["path_display"] = path;
    return item;
}

void AddOldMembers(const Node& node, Json::Value& metadata) {
    metadata["path"] = node.parent == nullptr ? "/" : PathOf(node);
    metadata["is_dir"] = node.folder;
    metadata["is_deleted"] = false;
    metadata["bytes"] = Json::UInt64(node.folder ? 0 : node.Size());
    metadata["modified"] = OldDate(node.modified);
    metadata["root"] = "dropbox";
}

Json::Value User(const Account& account) {
    const std::string& name = account.Name();
    const size_t blank = name.find(' ');
    Json::Value user;
    user["account_id"] = "dbid:AAH4f99T0taONIb-OurWxbNQ6ywGRo" + account.Id().substr(4);
    user["name"]["given_name"] = user["name"]["familiar_name"] = name.substr(0, blank);
    user["name"]["surname"] = blank == std::string::npos ? "" : name.substr(blank + 1);
    user["name"]["display_name"] = name;
    user["name"]["abbreviated_name"] = name.substr(0, 1);
    user["email"] = account.Email();
    user["email_verified"] = true;
    user["disabled"] = false;
    user["locale"] = "en";
    user["country"] = "US";
    user["referral_link"] = "https://db.tt/" + account.Id();
    user["is_paired"] = false;
    user["account_type"] = Tagged({"basic"});
    user["root_info"][".tag"] = "user";
    user["root_info"]["root_namespace_id"] = account.Id();
    user["root_info"]["home_namespace_id"] = account.Id();
    return user;
}

std::string HeaderText(const Json::Value& document) {
    Json::StreamWriterBuilder builder;
    builder["indentation"] = "";
    std::string text = Json::writeString(builder, document);
    for (size_t at = 0; (at = text.find('\x7f', at)) != std::string::npos;) {
        text.replace(at, 1, "\\u007f");
    }
    return text;
}

bool IsName(const std::string& name) {
    const auto letters =
        std::count_if(name.begin(), name.end(), [](char c) { return (c & 0xc0) != 0x80; });
    const bool odd = std::any_of(name.begin(), name.end(), [](char c) {
        return static_cast<unsigned char>(c) < 0x20 || c == 0x7f || c == '/' || c == '\\';
    });
    return !name.empty() && letters <= 255 && !odd && name != "." && name != ".." &&
           name.back() != ' ';
}

std::string Numbered(const std::string& name, bool folder, int number) {
    return Formed(name, folder, std::to_string(number));
}

std::string Conflicted(const std::string& name, const std::string& whose, int number) {
    const std::string more = number < 2 ? "" : " " + std::to_string(number);
    return Formed(name, false, whose + "'s conflicted copy" + more);
}

}  // namespace cloudsim::dropbox
