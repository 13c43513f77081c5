#include "support/cloudsim/onedrive_json.h"

#include <cctype>
#include <ctime>
#include <map>

#include "support/cloudsim/account.h"

namespace cloudsim::onedrive {
namespace {

const std::map<std::string, const char*>& TypesByEnding() {
    static const std::map<std::string, const char*> types = {
        {"jpg", "photo"}, {"jpeg", "photo"}, {"png", "photo"}, {"gif", "photo"}, {"bmp", "photo"},
        {"tif", "photo"}, {"tiff", "photo"}, {"mp3", "audio"}, {"m4a", "audio"}, {"wma", "audio"},
        {"wav", "audio"}, {"aac", "audio"},  {"mp4", "video"}, {"mov", "video"}, {"avi", "video"},
        {"wmv", "video"}, {"3gp", "video"},  {"m4v", "video"}, {"mpg", "video"}};
    return types;
}

std::string Upper(std::string text) {
    for (char& c : text) {
        c = static_cast<char>(toupper(static_cast<unsigned char>(c)));
    }
    return text;
}

Json::Value From(const Node& node) {
    Json::Value from;
    from["name"] = node.parent == nullptr ? Json::Value() : Json::Value(node.owner->Name());
    from["id"] = node.parent == nullptr ? Json::Value() : Json::Value(node.owner->Id());
    return from;
}

std::string Link(const Node& node) {
    const std::string cid = node.owner->Id();
    return node.parent == nullptr
               ? "https://onedrive.live.com?cid=" + cid
               : "https://onedrive.live.com/redir.aspx?cid=" + cid +
                     "&page=view&resid=" + ResourceId(node) + "&parid=" + ResourceId(*node.parent);
}

void AddPhoto(Json::Value& item, const Places& places) {
    item["tags_count"] = 0;
    item["tags_enabled"] = true;
    item["picture"] = places.source + ":Thumbnail";
    item["images"] = Json::arrayValue;
    item["when_taken"] = Json::nullValue;
    item["height"] = item["width"] = 0;
}

void AddMusic(Json::Value& item) {
    for (const char* name : {"title", "artist", "album", "album_artist", "genre"}) {
        item[name] = Json::nullValue;
    }
    item["duration"] = 0;
    item["picture"] = Json::nullValue;
}

void AddFilm(Json::Value& item, const Places& places) {
    item["tags_count"] = 0;
    item["tags_enabled"] = true;
    item["picture"] = places.source + ":Thumbnail";
    item["height"] = item["width"] = item["duration"] = item["bitrate"] = 0;
}

void AddKind(Json::Value& item, const Node& node, const Places& places) {
    if (node.folder) {
        item["count"] = Json::UInt64(node.children.size());
        return;
    }
    item["source"] = places.source;
    if (places.type == "photo") {
        AddPhoto(item, places);
    } else if (places.type == "audio") {
        AddMusic(item);
    } else if (places.type == "video") {
        AddFilm(item, places);
    }
}

}  // namespace

Reply Error(int status, const std::string& code, const std::string& message) {
    Json::Value body;
    body["error"]["code"] = code;
    body["error"]["message"] = message;
    return JsonReply(status, body);
}

std::string MakeId(const Node& node, uint64_t number) {
    const std::string cid = node.owner->Id();
    if (number == 0) {
        return "folder." + cid;
    }
    // The tree counts in steps that leave room for its own use.
    constexpr uint64_t kFirst = 5000000000, kStep = 17;
    const std::string own = std::to_string(100 + (number - kFirst) / kStep);
    const std::string kind = node.folder ? "folder" : FileType(node.name);
    return kind + "." + cid + "." + Upper(cid) + "!" + own;
}

std::string ResourceId(const Node& node) {
    return node.parent == nullptr ? Upper(node.owner->Id()) + "!103"
                                  : node.id.substr(node.id.rfind('.') + 1);
}

std::string FileType(const std::string& name) {
    const size_t dot = name.rfind('.');
    const std::string ending = dot == std::string::npos ? "" : FoldCase(name.substr(dot + 1));
    const auto type = TypesByEnding().find(ending);
    return type == TypesByEnding().end() ? "file" : type->second;
}

Json::Value Item(const Node& node, const Places& places) {
    Json::Value item;
    item["id"] = node.id;
    item["from"] = From(node);
    item["name"] = node.name;
    item["description"] =
        node.description.empty() && !node.folder ? Json::Value() : Json::Value(node.description);
    item["parent_id"] = node.parent == nullptr ? Json::Value() : Json::Value(node.parent->id);
    item["size"] = Json::UInt64(node.folder ? 0 : node.content->Size());
    item["upload_location"] = places.api + "/" + node.id + (node.folder ? "/files/" : "/content/");
    item["comments_count"] = 0;
    item["comments_enabled"] = false;
    item["is_embeddable"] = node.parent != nullptr;
    AddKind(item, node, places);
    item["link"] = Link(node);
    item["type"] = places.type;
    item["shared_with"]["access"] = "Just me";
    item["created_time"] = node.parent == nullptr ? Json::Value() : Date(node.created);
    item["updated_time"] = item["client_updated_time"] = Date(node.modified);
    return item;
}

Json::Value User(const Account& account) {
    const std::string& name = account.Name();
    const size_t blank = name.find(' ');
    Json::Value user;
    user["id"] = account.Id();
    user["name"] = name;
    user["first_name"] = name.substr(0, blank);
    user["last_name"] = blank == std::string::npos ? "" : name.substr(blank + 1);
    user["link"] = "https://profile.live.com/cid-" + account.Id() + "/";
    user["gender"] = Json::nullValue;
    user["emails"]["preferred"] = user["emails"]["account"] = account.Email();
    user["emails"]["personal"] = user["emails"]["business"] = Json::nullValue;
    user["locale"] = "en_US";
    user["updated_time"] = Date(1355309623);
    return user;
}

Json::Value Date(int64_t time) {
    struct tm parts {};
    const time_t shown = time;
    gmtime_r(&shown, &parts);
    char text[64];
    strftime(text, sizeof text, "%Y-%m-%dT%H:%M:%S+0000", &parts);
    return time == 0 ? Json::Value() : Json::Value(text);
}

}  // namespace cloudsim::onedrive
