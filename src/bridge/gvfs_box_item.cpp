#include "bridge/gvfs_box_item.h"

#include <cstring>

#include "cloud/box/box_api.h"
#include "core/json_member.h"
#include "core/log.h"

namespace ZYROCloud::gvfs {

using ZYROVFS::json::MemberOf;
using ZYROVFS::json::TextOf;

namespace {

constexpr const char* kOwnerMark = " - ";

/** What the account holds at its top has a parent, and it is null. */
bool IsAtTop(const Json::Value& item) {
    return item.isObject() && item.isMember("parent") && item["parent"].isNull();
}

/** What stands behind the last mark of a name; "" without one. */
std::string OwnerIn(const std::string& name) {
    const size_t mark = name.rfind(kOwnerMark);
    return mark == std::string::npos ? "" : name.substr(mark + strlen(kOwnerMark));
}

/** A folder that somebody else shares may have the name of one of the user's own. False, logged,
 * when nobody owns it. */
bool NameOwner(const Json::Value& item, const std::string& account_id, ItemRecord& record) {
    const Json::Value& owner = MemberOf(item, "owned_by");
    const std::string owner_id = TextOf(owner, "id");
    if (owner_id.empty()) {
        LOG_ERROR("No owned_by");
        return false;
    }
    const std::string owner_name = TextOf(owner, "name");
    if (owner_id != account_id && OwnerIn(record.name) != owner_name) {
        record.name += kOwnerMark + owner_name;
        record.keeps_display_name = true;
    }
    return true;
}

}  // namespace

bool BoxRecord(const Json::Value& item, const std::string& account_id, ItemRecord& record) {
    const std::string type = TextOf(item, "type");
    if (item.isNull() || type == "web_link") {
        return false;
    }
    record.is_dir = type == "folder";
    record.id = TextOf(item, "id");
    if (!record.id.empty()) {
        record.id.insert(0, record.is_dir ? box::kFolders : box::kFiles);
    }
    record.name = record.display_name = TextOf(item, "name");
    record.size = record.is_dir ? 0 : SizeOf(item, "size");
    record.modified = record.access = TimeOf(item, "modified_at");
    record.created = TimeOf(item, "created_at");
    return !record.is_dir || !IsAtTop(item) || NameOwner(item, account_id, record);
}

}  // namespace ZYROCloud::gvfs
