#include "support/cloudsim/box_json.h"

#include <ctime>
#include <map>
#include <sstream>

#include "support/cloudsim/account.h"

namespace cloudsim::box {
namespace {

constexpr int64_t kZone = -8 * 3600;

using Fields = std::vector<std::string>;

const Fields kMiniFile = {"type", "id", "file_version", "sequence_id", "etag", "sha1", "name"};
const Fields kMiniFolder = {"type", "id", "sequence_id", "etag", "name"};
const Fields kFullFile = {"type",
                          "id",
                          "file_version",
                          "sequence_id",
                          "etag",
                          "sha1",
                          "name",
                          "description",
                          "size",
                          "created_at",
                          "modified_at",
                          "trashed_at",
                          "purged_at",
                          "created_by",
                          "content_created_at",
                          "content_modified_at",
                          "modified_by",
                          "owned_by",
                          "path_collection",
                          "shared_link",
                          "parent",
                          "item_status"};
const Fields kFullFolder = {"type",
                            "id",
                            "sequence_id",
                            "etag",
                            "name",
                            "created_at",
                            "modified_at",
                            "description",
                            "size",
                            "created_by",
                            "path_collection",
                            "modified_by",
                            "trashed_at",
                            "purged_at",
                            "content_created_at",
                            "content_modified_at",
                            "owned_by",
                            "shared_link",
                            "folder_upload_email",
                            "parent",
                            "item_status",
                            "item_collection"};

bool IsRoot(const Node& node) {
    return node.parent == nullptr;
}

Json::Value Version(const Node& node) {
    return IsRoot(node) ? Json::Value() : Json::Value(std::to_string(node.version));
}

Json::Value DateOf(const Node& node, int64_t time) {
    return IsRoot(node) ? Json::Value() : Json::Value(Date(time));
}

Json::Value Nothing(const Node&) {
    return {};
}

Json::Value UserMini(const Account& account) {
    Json::Value user;
    user["type"] = "user";
    user["id"] = account.Id();
    user["name"] = account.Name();
    user["login"] = account.Email();
    return user;
}

Json::Value MakerOf(const Node& node) {
    if (!IsRoot(node)) {
        return UserMini(*node.owner);
    }
    Json::Value nobody;
    nobody["type"] = "user";
    nobody["id"] = nobody["name"] = nobody["login"] = "";
    return nobody;
}

Json::Value FileVersion(const Node& node) {
    if (node.folder) {
        return {};
    }
    Json::Value version;
    version["type"] = "file_version";
    version["id"] = node.version_id;
    version["sha1"] = node.content->Sha1();
    return version;
}

Json::Value PathOf(const Node& node) {
    Json::Value entries = Json::arrayValue;
    for (const Node* above = node.parent; above != nullptr; above = above->parent) {
        entries.insert(0, Mini(*above));
    }
    Json::Value path;
    path["total_count"] = entries.size();
    path["entries"] = std::move(entries);
    return path;
}

Json::Value FirstItems(const Node& node) {
    constexpr unsigned kLimit = 100;
    if (!node.folder) {
        return {};
    }
    Json::Value items;
    items["total_count"] = static_cast<Json::UInt>(node.children.size());
    items["entries"] = Json::arrayValue;
    for (const auto& [key, child] : node.children) {
        if (items["entries"].size() == kLimit) {
            break;
        }
        items["entries"].append(Mini(*child));
    }
    items["offset"] = 0;
    items["limit"] = kLimit;
    return items;
}

using Maker = Json::Value (*)(const Node&);

const std::map<std::string, Maker>& Makers() {
    static const std::map<std::string, Maker> makers = {
        {"type", [](const Node& n) { return Json::Value(n.folder ? "folder" : "file"); }},
        {"id", [](const Node& n) { return Json::Value(n.id); }},
        {"sequence_id", Version},
        {"etag", Version},
        {"name", [](const Node& n) { return Json::Value(n.name); }},
        {"description", [](const Node& n) { return Json::Value(n.description); }},
        {"size", [](const Node& n) { return Json::Value(Json::UInt64(n.Size())); }},
        {"sha1", [](const Node& n) { return n.folder ? Json::Value() : n.content->Sha1(); }},
        {"file_version", FileVersion},
        {"created_at", [](const Node& n) { return DateOf(n, n.created); }},
        {"modified_at", [](const Node& n) { return DateOf(n, n.modified); }},
        {"content_created_at", [](const Node& n) { return DateOf(n, n.content_created); }},
        {"content_modified_at", [](const Node& n) { return DateOf(n, n.content_modified); }},
        {"trashed_at", Nothing},
        {"purged_at", Nothing},
        {"shared_link", Nothing},
        {"folder_upload_email", Nothing},
        {"created_by", MakerOf},
        {"modified_by", MakerOf},
        {"owned_by", [](const Node& n) { return UserMini(*n.owner); }},
        {"path_collection", PathOf},
        {"parent", [](const Node& n) { return IsRoot(n) ? Json::Value() : Mini(*n.parent); }},
        {"item_status", [](const Node&) { return Json::Value("active"); }},
        {"item_collection", FirstItems},
    };
    return makers;
}

/** Only these are no members of a folder. */
bool IsFilesOnly(const std::string& field) {
    return field == "sha1" || field == "file_version";
}

void Put(Json::Value& item, const Node& node, const std::string& field) {
    const auto maker = Makers().find(field);
    const bool wrong_kind = node.folder ? IsFilesOnly(field) : field == "item_collection";
    if (maker != Makers().end() && !wrong_kind) {
        item[field] = maker->second(node);
    }
}

Json::Value Make(const Node& node, const Fields& fields) {
    Json::Value item;
    for (const std::string& field : fields) {
        Put(item, node, field);
    }
    return item;
}

}  // namespace

Json::Value Full(const Node& node) {
    return Make(node, node.folder ? kFullFolder : kFullFile);
}

Json::Value Mini(const Node& node) {
    return Make(node, node.folder ? kMiniFolder : kMiniFile);
}

Json::Value Selected(const Node& node, const std::string& fields) {
    Json::Value item = Make(node, {"type", "id", "etag"});
    std::istringstream names(fields);
    std::string name;
    while (std::getline(names, name, ',')) {
        Put(item, node, name);
    }
    return item;
}

Json::Value User(const Account& account) {
    Json::Value user = UserMini(account);
    user["created_at"] = user["modified_at"] = Date(1355309623);
    user["language"] = "en";
    user["timezone"] = "America/Los_Angeles";
    user["space_amount"] = Json::UInt64(account.Quota());
    user["max_upload_size"] = Json::UInt64(account.MaxUpload());
    user["status"] = "active";
    user["job_title"] = user["phone"] = user["address"] = "";
    user["avatar_url"] = "";
    user["notification_email"] = Json::nullValue;
    return user;
}

Reply Error(int status, const std::string& code, const std::string& message,
            const Json::Value& context) {
    Json::Value error;
    error["type"] = "error";
    error["status"] = status;
    error["code"] = code;
    if (!context.isNull()) {
        error["context_info"] = context;
    }
    error["help_url"] = "http://developers.box.com/docs/#errors";
    error["message"] = message;
    error["request_id"] = RandomText(16);
    return JsonReply(status, error);
}

std::string Date(int64_t time) {
    const time_t shown = time + kZone;
    struct tm parts {};
    gmtime_r(&shown, &parts);
    char text[64];
    strftime(text, sizeof text, "%Y-%m-%dT%H:%M:%S-08:00", &parts);
    return text;
}

}  // namespace cloudsim::box
