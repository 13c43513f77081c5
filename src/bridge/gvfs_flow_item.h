/** Items of the services as the file tree shows them. */
#ifndef ZYROVFS_BRIDGE_GVFS_FLOW_ITEM_H
#define ZYROVFS_BRIDGE_GVFS_FLOW_ITEM_H

#include <json/value.h>
#include <sys/time.h>

#include <initializer_list>
#include <string>

#include "bridge/file_info.h"
#include "core/source_line.h"

namespace ZYROCloud::gvfs {

/** What a service's conversion makes of an item. */
struct ItemRecord {
    std::string id;
    bool is_dir = false;
    std::string display_name;  ///< the service's name for it
    std::string name;          ///< the tree's, where two items may not share one
    long long size = 0;
    timeval modified{}, access{}, created{};
    std::string description;  ///< JSON text that drivers read from the tree; "" for none
    /** The name differs from the display name, or that of a later item may have to: listings keep
     * the display name as taken. */
    bool keeps_display_name = false;
};

// --- members of an item, which a service may leave out or send in any type -----------------------

/** Time of an RFC 3339 text; 0 for none. */
timeval TimeOf(const Json::Value& item, const char* key);
/** A size in bytes, as a number or its text; 0 for none and for a negative one. */
long long SizeOf(const Json::Value& item, const char* key);
/** JSON text of these members of an item, as far as it has them. */
std::string TextOfMembers(const Json::Value& item, std::initializer_list<const char*> keys);

// --- what the tree can show
// ------------------------------------------------------------------------

/**
 * Whether an item can be told to the programs around the tree: it has an id, by which drivers name
 * it, and its texts are UTF-8, as the messages between these programs have to be. Logged if not.
 */
bool HasFitTexts(const ItemRecord& record, ZYROVFS::SourceLine at = ZYROVFS::SourceLine::Here());

/**
 * Whether the name can stand below `path`. One that is empty, "." or "..", or has a slash in it,
 * would be another place of the tree, perhaps above the folder; a longer name or path is one that
 * programs cannot open. Logged if not.
 */
bool HasFitName(const ItemRecord& record, const char* path,
                ZYROVFS::SourceLine at = ZYROVFS::SourceLine::Here());

/** The record as caches and callbacks get it. */
UniqueFileInfo ToFileInfo(const ItemRecord& record);

}  // namespace ZYROCloud::gvfs

#endif
