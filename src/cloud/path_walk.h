/** From a path to an item's id: cutting the path, and the walk down the remote tree by name. */
#ifndef ZYROVFS_CLOUD_PATH_WALK_H
#define ZYROVFS_CLOUD_PATH_WALK_H

#include <functional>
#include <string>
#include <vector>

#include "core/source_line.h"

namespace ZYROCloud {

/** "/docs/old/a.txt" to "/docs/old" and "a.txt"; "/a.txt" to "" and "a.txt". False when there is no
 * slash. */
bool CutAtLastSlash(const std::string& path, std::string& parent, std::string& name);

/** "/docs/old/a.txt" to "docs" and "/old/a.txt"; "/docs" to "docs" and "". */
void CutFirstComponent(const std::string& path, std::string& component, std::string& rest);

/** How a service's tree is walked. */
struct WalkRules {
    /** The ids of this name below `parent`, best first. False when it could not be found out. */
    std::function<bool(const std::string& parent, const std::string& name,
                       std::vector<std::string>& ids)>
        lookup;
    /** Chooses among the ids of the last component; empty takes the first. It is asked even when
     * there is none, and may answer true without an id. */
    std::function<bool(std::vector<std::string>& ids, std::string& id)> pick;
    /** What of a candidate names it as a parent; empty: all of it. */
    std::function<std::string(const std::string& id)> as_parent;
    /** A component that is not there makes the walk fail; otherwise it ends well, without an id. */
    bool missing_fails = true;
    /** Only the first candidate is followed, and what comes of it is the result. Otherwise all are,
     * depth first, and none of them leading there gives true without an id. */
    bool first_only = false;
    /** Format for a name whose lookup failed; null for no line. */
    const char* lookup_failed = nullptr;
};

/** The longest path that is walked: no longer one fits the interfaces of the mounted tree. */
constexpr size_t kLongestPath = 4096;

/**
 * Walks `path`, which begins with a slash, from `parent` down. `id` is set when the item is found;
 * true with an unchanged `id` is a walk that found nothing. False for an empty path.
 */
bool WalkPath(const std::string& parent, const std::string& path, const WalkRules& rules,
              std::string& id, ZYROVFS::SourceLine at = ZYROVFS::SourceLine::Here());

}  // namespace ZYROCloud

#endif
