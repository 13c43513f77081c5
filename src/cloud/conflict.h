/** What a copy or move does about an item that has the name it wants. */
#ifndef ZYROVFS_CLOUD_CONFLICT_H
#define ZYROVFS_CLOUD_CONFLICT_H

#include <json/value.h>

#include <string>

#include "core/json_member.h"
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

/** "/docs/a.txt" to "a.txt". */
std::string NameAtEnd(const std::string& path);

/** Whether an item has this name to the service: without regard to case, and with a backslash in
 * front of the quotes, as uploads write them. */
bool IsNamed(const Json::Value& item, const std::string& name);

/**
 * Whether `item` has the name that the item `source`, which a path shows as `shown`, takes along to
 * another folder. Among namesakes a path has the owner behind the name, so that what looks so may
 * have a shorter name; then the service is asked. False, too, when it does not tell.
 */
bool HasNameOf(Cloud& cloud, const Json::Value& item, const std::string& source,
               const std::string& shown);

/**
 * Whether `item`, which stands where a copy or move was asked to lead, is what the service found in
 * the way of `source`. That keeps its name, so that it may have met another item; and nothing is
 * deleted to be replaced by itself.
 */
template <typename Driver>
bool IsInTheWay(Driver& driver, const Json::Value& item, const std::string& source,
                const std::string& shown) {
    const std::string rival = driver.GetFileID(item);
    return !ZYROVFS::json::TextOf(item, "id").empty() && rival != source &&
           HasNameOf(driver, item, source, shown);
}

}  // namespace ZYROCloud

#endif
