/** All that is at and below some items of a connection. */
#ifndef ZYROVFS_WEB_WALK_H
#define ZYROVFS_WEB_WALK_H

#include <functional>
#include <string>
#include <vector>

#include "tree.h"

namespace web {

struct Item {
    std::string path;
    std::string below;  ///< the path from the folder of the item that was chosen, without a slash
    bool folder;
    long long size;  ///< -1 when it is not known
    long long modified;
};

constexpr size_t kMostItems = 100000;

/**
 * Folders come before what is in them. Left out is what is neither file nor folder, and what has a
 * name that cannot be. Failure with status 413 for more than `most` items or folders too deep in
 * each other, and when a folder cannot be listed. `tell` hears of each item as it is found, and
 * ends the walk by an exception of its own.
 */
std::vector<Item> Walk(Tree& tree, const std::vector<std::string>& paths, size_t most,
                       const std::function<void(const Item&)>& tell);

}  // namespace web

#endif
