/** What a copy or move does about an item that has the name it wants. */
#ifndef ZYROVFS_CLOUD_CONFLICT_H
#define ZYROVFS_CLOUD_CONFLICT_H

#include <json/value.h>

#include "zyrovfs/cloud.h"

namespace ZYROCloud {

/**
 * A file gives way, a folder never does: with all that is in it, it would be lost to a copy.
 * `find(item)` describes what is in the way, `is_folder(item)` tells its kind, `remove(item)`
 * deletes it, `again()` makes the second try, which must not come back here. False leaves
 * VFS_ERR_IS_DIRECTORY or the error of the step that failed.
 */
template <typename Find, typename IsFolder, typename Remove, typename Again>
bool ReplaceFile(Cloud& cloud, Find find, IsFolder is_folder, Remove remove, Again again) {
    Json::Value item;
    if (!find(item)) {
        return false;
    }
    if (is_folder(item)) {
        cloud.SetError(ZYROVFS::VFS_ERR_IS_DIRECTORY, "");
        return false;
    }
    return remove(item) && again();
}

}  // namespace ZYROCloud

#endif
