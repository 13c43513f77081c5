/** Dropbox in the file tree: its items as records. */
#ifndef ZYROVFS_BRIDGE_GVFS_DROPBOX_ITEM_H
#define ZYROVFS_BRIDGE_GVFS_DROPBOX_ITEM_H

#include <json/value.h>

#include "bridge/gvfs_flow_item.h"

namespace ZYROCloud::gvfs {

/** False for what the tree leaves out: null, and hidden names. */
bool DropboxRecord(const Json::Value& item, ItemRecord& record);

}  // namespace ZYROCloud::gvfs

#endif
