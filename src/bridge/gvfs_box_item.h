/** Box in the file tree: its items as records. */
#ifndef ZYROVFS_BRIDGE_GVFS_BOX_ITEM_H
#define ZYROVFS_BRIDGE_GVFS_BOX_ITEM_H

#include <json/value.h>

#include <string>

#include "bridge/gvfs_flow_item.h"
#include "core/source_line.h"

namespace ZYROCloud::gvfs {

/** `account_id` is the user's: folders of others at the top of his account get their owner's name.
 * False for what the tree leaves out. */
bool BoxRecord(const Json::Value& item, const std::string& account_id, ItemRecord& record);

}  // namespace ZYROCloud::gvfs

#endif
