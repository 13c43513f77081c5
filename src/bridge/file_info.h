/** Records of items as gvfs takes them. */
#ifndef ZYROVFS_BRIDGE_FILE_INFO_H
#define ZYROVFS_BRIDGE_FILE_INFO_H

#include <gio/gio.h>
#include <sys/time.h>

#include <memory>

#include "core/handle.h"

namespace ZYROCloud {

using UniqueFileInfo = std::unique_ptr<GFileInfo, ZYROVFS::FreeWith<g_object_unref>>;

/** Attributes through which drivers reach an item's record by way of the mounted tree. */
constexpr const char* kAttrFileId = "id::file";
constexpr const char* kAttrDescription = "standard::description";

/**
 * Fills the record `*info`, whose owner the caller stays. What is null of `id`, `display_name`,
 * `name` and `description` is left out. All that access rights can allow is allowed: the service
 * has the last word. A null record is left alone.
 */
void SetGFileInfo(GFileInfo** info, const char* id, bool is_dir, const char* display_name,
                  const char* name, long long size, const timeval& modified, const timeval& access,
                  const timeval& changed, const timeval& created, const char* description);

/** An empty record, as far as SetGFileInfo leaves nothing out: what it sets is there already, and a
 * copy of that is faster made than a record that grows. */
UniqueFileInfo NewGFileInfo();

/** Null when the record has none, or is null. GIO's own getters complain of that in the log. */
const char* InfoName(GFileInfo* info);
const char* InfoDisplayName(GFileInfo* info);

/** A text attribute of a record, "" when the record or the attribute is missing. */
const char* AttrText(GFileInfo* info, const char* attribute);

}  // namespace ZYROCloud

#endif
