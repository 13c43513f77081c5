/**
 * Copies and moves of drivers that know items by id: from two server paths to the ids that the
 * service wants. A driver has GetFileIDByPath and, for the rest, the operations that are used here.
 */
#ifndef ZYROVFS_CLOUD_TARGET_H
#define ZYROVFS_CLOUD_TARGET_H

#include <json/value.h>

#include <string>

#include "cloud/conflict.h"
#include "cloud/path_walk.h"
#include "cloud/request.h"
#include "core/log.h"
#include "zyrovfs/cloud.h"

namespace ZYROCloud {

/** The folder and the name of a server path. VFS_ERR_NOT_FOUND, logged, for one without a slash. */
inline bool CutTarget(Cloud& cloud, const std::string& path, std::string& parent, std::string& name,
                      ZYROVFS::SourceLine at = ZYROVFS::SourceLine::Here()) {
    if (CutAtLastSlash(path, parent, name)) {
        return true;
    }
    cloud.SetError(ZYROVFS::VFS_ERR_NOT_FOUND, "");
    LOG_ERROR_AT(at, "Failed to find / from [%s]", path.c_str());
    return false;
}

/** The item at `from` and the folder that `to` is in. VFS_ERR_NOT_FOUND. */
template <typename Driver>
bool FindCopyIds(Driver& driver, const std::string& from, const std::string& to, std::string& id,
                 std::string& parent_id, ZYROVFS::SourceLine at = ZYROVFS::SourceLine::Here()) {
    std::string parent;
    std::string name;
    id = driver.GetFileIDByPath(from);
    if (!CutTarget(driver, to, parent, name, at)) {
        return false;
    }
    parent_id = driver.GetFileIDByPath(parent);
    if (id.empty() || parent_id.empty()) {
        driver.SetError(ZYROVFS::VFS_ERR_NOT_FOUND, "");
        return false;
    }
    return true;
}

/**
 * ReplaceFile by the driver's own operations. Only what is in the way of `id`, which a path shows
 * as `shown`, is deleted; for any other item the error of the conflict stays.
 */
template <typename Driver, typename Find, typename Again>
bool ReplaceItem(Driver& driver, const std::string& id, const std::string& shown, Find find,
                 Again again) {
    return ReplaceFile(
        driver, find, [&](const Json::Value& item) { return driver.IsDir(item); },
        [&](const Json::Value& item) {
            return IsInTheWay(driver, item, id, shown) && driver.Delete(driver.GetFileID(item));
        },
        again);
}

/**
 * Copies the item at `from` into the folder that `to` is in, under the name that it has; `describe`
 * makes the service's request from the ids of both. With `overwrite` a file in the way gives way
 * once, if it is the one at `to`, which `find` describes: the driver's DoCopy is then called
 * without it. VFS_ERR_NOT_FOUND, VFS_ERR_IS_DIRECTORY, VFS_ERR_CONFLICT.
 */
template <typename Driver, typename Describe, typename Find>
bool CopyByPath(Driver& driver, const std::string& from, const std::string& to, bool overwrite,
                Describe describe, Find find,
                ZYROVFS::SourceLine at = ZYROVFS::SourceLine::Here()) {
    std::string id;
    std::string parent_id;
    if (!FindCopyIds(driver, from, to, id, parent_id, at)) {
        return false;
    }
    Request request = describe(id, parent_id);
    const auto find_named = [&](Json::Value& item) {
        if (!find(item)) {
            return false;
        }
        // Of an answer without a name this much is known: it is what that path led to.
        if (item.isObject() && !item.isMember("name")) {
            item["name"] = NameAtEnd(to);
        }
        return true;
    };
    const auto again = [&] { return driver.DoCopy(from, to, false); };
    if (overwrite) {
        request.Unless(ZYROVFS::VFS_ERR_CONFLICT,
                       [&] { return ReplaceItem(driver, id, NameAtEnd(from), find_named, again); });
    }
    return request.Send();
}

/** Moves the item at `from` into the folder that `to` is in, by the driver's move of ids. Its name
 * stays. VFS_ERR_NOT_FOUND. */
template <typename Driver>
bool MoveByPath(Driver& driver, const std::string& from, const std::string& to,
                ZYROVFS::SourceLine at = ZYROVFS::SourceLine::Here()) {
    std::string old_parent;
    std::string new_parent;
    std::string name;
    const std::string id = driver.GetFileIDByPath(from);
    if (id.empty()) {
        driver.SetError(ZYROVFS::VFS_ERR_NOT_FOUND, "");
        return false;
    }
    if (!CutTarget(driver, from, old_parent, name, at) ||
        !CutTarget(driver, to, new_parent, name, at)) {
        return false;
    }
    const std::string old_id = driver.GetFileIDByPath(old_parent);
    return driver.Move(old_id, id, driver.GetFileIDByPath(new_parent));
}

/** The id that a walk of the remote tree finds. VFS_ERR_NOT_FOUND, whatever stood in the way. */
template <typename Walk>
bool FindOnServer(Cloud& cloud, Walk walk, std::string& out) {
    std::string id;
    if (!walk(id) || id.empty()) {
        cloud.SetError(ZYROVFS::VFS_ERR_NOT_FOUND, "");
        return false;
    }
    out = id;
    return true;
}

/** Describes the item whose id `find` learns from the server, which the log calls `service`. */
template <typename Driver, typename Find>
bool InfoOnServer(Driver& driver, const char* service, const std::string& path, Find find,
                  const Json::Value& params, Json::Value& out,
                  ZYROVFS::SourceLine at = ZYROVFS::SourceLine::Here()) {
    std::string id;
    if (!find(id)) {
        LOG_ERROR_AT(at, "Failed to get file id from %s-server, %s", service, path.c_str());
        return false;
    }
    return driver.GetFileInfo(id, params, out);
}

}  // namespace ZYROCloud

#endif
