/** Moving an item over another one, for services that refuse it. */
#ifndef ZYROVFS_BRIDGE_GVFS_FLOW_MOVE_H
#define ZYROVFS_BRIDGE_GVFS_FLOW_MOVE_H

#include <json/value.h>

#include <string>

#include "bridge/gvfs_utils.h"
#include "cloud/conflict.h"
#include "core/log.h"
#include "core/source_line.h"

namespace ZYROCloud::gvfs {

/** What the entry points for moves take; none is null but `err`. */
struct MoveCall {
    const char* from;     ///< id of the item
    const char* to;       ///< id of the folder
    const char* to_path;  ///< where the item will be
    int* err;
};

/** Makes way for `call.from`, and moves it again. A file that has its place gives way, a folder
 * does not, nor an item of another name. */
template <typename Driver, typename Find>
bool ReplaceAtTarget(Driver& driver, const MoveCall& call, Find find, ZYROVFS::SourceLine at) {
    const auto find_logged = [&](Json::Value& item) {
        if (!find(item)) {
            LOG_ERROR_AT(at, "Failed to find the path, %s", call.to_path);
            return false;
        }
        return true;
    };
    const auto remove = [&](const Json::Value& item) {
        if (!IsInTheWay(driver, item, call.from, NameAtEnd(call.to_path)) ||
            !driver.Delete(driver.GetFileID(item))) {
            LOG_ERROR_AT(at, "Failed to delete path %s", call.to_path);
            return false;
        }
        return true;
    };
    const auto again = [&] {
        if (!driver.Move("", call.from, call.to)) {
            LOG_ERROR_AT(at, "Failed to move a file form %s to %s, err: %s", call.from, call.to,
                         ErrorText(driver).c_str());
            return false;
        }
        return true;
    };
    return ReplaceFile(
        driver, find_logged, [&](const Json::Value& item) { return driver.IsDir(item); }, remove,
        again);
}

/**
 * Moves an item into a folder; `find(item)` describes what is at the place that it will have. A
 * file there is overwritten; a folder gives G_IO_ERROR_IS_DIRECTORY, and nothing is deleted. Log
 * lines are those of the caller.
 */
template <typename Driver, typename Find>
bool MoveOver(Driver& driver, const MoveCall& call, Find find,
              ZYROVFS::SourceLine at = ZYROVFS::SourceLine::Here()) {
    if (driver.Move("", call.from, call.to)) {
        return true;
    }
    const bool conflict = driver.GetErrorCode() == ZYROVFS::VFS_ERR_CONFLICT;
    if (conflict && ReplaceAtTarget(driver, call, find, at)) {
        return true;
    }
    if (!conflict) {
        LOG_ERROR_AT(at, "Failed to move a file form %s to %s, err: %s", call.from, call.to,
                     ErrorText(driver).c_str());
    }
    StoreError(driver, call.err);
    return false;
}

}  // namespace ZYROCloud::gvfs

#endif
