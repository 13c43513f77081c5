#include "bridge/gvfs_onedrive_item.h"
#include "core/json_member.h"

namespace ZYROCloud::gvfs {

using ZYROVFS::json::TextOf;

namespace {

bool IsRoot(const Json::Value& item) {
    return item.isObject() && item.isMember("parent_id") && item["parent_id"].isNull();
}

}  // namespace

bool OneDriveRecord(const Json::Value& item, ItemRecord& record) {
    const std::string type = TextOf(item, "type");
    if (item.isNull() || type == "notebook") {
        return false;
    }
    record.is_dir = type == "folder" || type == "album";
    record.id = TextOf(item, "id");
    if (!IsRoot(item)) {
        record.name = record.display_name = TextOf(item, "name");
    }
    record.size = record.is_dir ? 0 : SizeOf(item, "size");
    record.modified = record.access = TimeOf(item, "updated_time");
    record.created = TimeOf(item, "created_time");
    record.description = TextOfMembers(item, {"link"});
    return true;
}

}  // namespace ZYROCloud::gvfs
