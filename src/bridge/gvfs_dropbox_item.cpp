#include "bridge/gvfs_dropbox_item.h"

#include <string>

#include "core/json_member.h"
#include "zyrovfs/cloud.h"

namespace ZYROCloud::gvfs {

using ZYROVFS::json::TextOf;

bool DropboxRecord(const Json::Value& item, ItemRecord& record) {
    if (item.isNull()) {
        return false;
    }
    record.id = TextOf(item, "path_display");
    record.is_dir = TextOf(item, ".tag") == "folder";
    const std::string name = TextOf(item, "name");
    record.name = record.display_name = name.substr(name.rfind('/') + 1);
    if (Cloud::IsHiddenFilePath("", record.name)) {
        return false;
    }
    record.size = record.is_dir ? 0 : SizeOf(item, "size");
    record.modified = record.access = record.created = TimeOf(item, "server_modified");
    return true;
}

}  // namespace ZYROCloud::gvfs
