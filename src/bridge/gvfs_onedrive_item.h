/** OneDrive in the file tree: its items as records. */
#ifndef ZYROVFS_BRIDGE_GVFS_ONEDRIVE_ITEM_H
#define ZYROVFS_BRIDGE_GVFS_ONEDRIVE_ITEM_H

#include <json/value.h>

#include "bridge/gvfs_flow_item.h"

namespace ZYROCloud::gvfs {

/** The root has no name. False for what the tree leaves out: null, and notebooks. */
bool OneDriveRecord(const Json::Value& item, ItemRecord& record);

}  // namespace ZYROCloud::gvfs

#endif
