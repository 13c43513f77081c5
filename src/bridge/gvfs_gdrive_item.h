/** Google Drive in the file tree: what its paths stand for, and its items as records. */
#ifndef ZYROVFS_BRIDGE_GVFS_GDRIVE_ITEM_H
#define ZYROVFS_BRIDGE_GVFS_GDRIVE_ITEM_H

#include <json/value.h>

#include <functional>
#include <string>

#include "bridge/gvfs_flow_item.h"

namespace ZYROCloud::gvfs {

/** Results of ZYROCloud_Cloud_Google_Get_File_Type. */
enum GooglePath {
    kGoogleOther = 0,
    kGoogleTop = 1,
    kGoogleMyDrive = 2,
    kGoogleStarred = 3,
    kGoogleInMyDrive = 4,
    kGoogleInStarred = 5,
    kGoogleDeepInStarred = 6,
};

/** `path` may be null. */
GooglePath GooglePathOf(const char* path);

/** A path below "My Drive" as one of the account, "/a/b"; "" for any other. */
std::string PathInMyDrive(const char* path);

/** Whether an earlier item of the listing has this display name. */
using IsTaken = std::function<bool(const std::string& display_name)>;

/** False for a null item. */
bool GoogleRecord(const Json::Value& item, const IsTaken& is_taken, ItemRecord& record);

}  // namespace ZYROCloud::gvfs

#endif
