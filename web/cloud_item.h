/** What a listing of a service says of an item. */
#ifndef ZYROVFS_WEB_CLOUD_ITEM_H
#define ZYROVFS_WEB_CLOUD_ITEM_H

#include <gio/gio.h>

#include <string>

#include "tree.h"

namespace web {

/** The entry that a record of the library's listings stands for. */
Entry EntryOf(GFileInfo* info);

/** A text attribute of a record, "" when it has none. */
std::string AttributeOf(GFileInfo* info, const char* name);

/** The formats that a document's description offers, in its order. */
std::vector<Export> ExportsOf(const std::string& description);

}  // namespace web

#endif
