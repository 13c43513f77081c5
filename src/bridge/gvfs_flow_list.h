/** Listing a folder of any service into a backend's cache. */
#ifndef ZYROVFS_BRIDGE_GVFS_FLOW_LIST_H
#define ZYROVFS_BRIDGE_GVFS_FLOW_LIST_H

#include <json/value.h>

#include <functional>
#include <optional>
#include <string>

#include "bridge/gvfs_flow_item.h"
#include "core/source_line.h"
#include "zyrovfs/cloud.h"
#include "zyrovfs/zyrocloud.h"

namespace ZYROCloud::gvfs {

/** What the entry points for listings take. `cache` and `path` are not null. */
struct ListCall {
    ZYROCloud_Cache* cache;
    const char* path;
    ZYROCloud_ListCallback callback;
    void* user_data;
    int* err;
};

/** How a service lists. */
struct ListRules {
    /** The driver's name for the folder. None: what the cache knows, or else what `find` does. */
    std::optional<std::string> id;
    /** Asks the service for the folder's id. False leaves the cause in the driver's record. */
    std::function<bool(std::string& id)> find;
    /** An id that the service does not know may have been of a folder that is gone: `find` is
     * asked for that of the one which now has the path. */
    bool finds_again = false;
    Json::Value query{Json::objectValue};
    /** What the tree is to show of an item. False leaves it out. */
    std::function<bool(const Json::Value& item, ItemRecord& record)> convert;
};

/** False when the cache knows the path as something else than a directory: logged, and
 * G_IO_ERROR_NOT_DIRECTORY. `id` is that of the directory, "" when the cache knows none. */
bool FindInCache(const ListCall& call, std::string& id,
                 ZYROVFS::SourceLine at = ZYROVFS::SourceLine::Here());

/**
 * The listing flow. All of the folder has come before the cache is touched; it is replaced in one
 * hold, so that of two threads the later one's listing stands, and nobody sees half of one. False
 * leaves the cache as it was. Log lines are those of the caller.
 */
bool ListInto(const ListCall& call, Cloud& cloud, const ListRules& rules,
              ZYROVFS::SourceLine at = ZYROVFS::SourceLine::Here());

}  // namespace ZYROCloud::gvfs

#endif
