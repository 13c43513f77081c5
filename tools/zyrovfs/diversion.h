/** Files of packages moved aside, so that they come back: dpkg's diversions. */
#ifndef ZYROVFS_TOOLS_DIVERSION_H
#define ZYROVFS_TOOLS_DIVERSION_H

#include <string>
#include <vector>

namespace tool {

/** Where a diverted file lies; the name also tells our diversions from those of others. It must
 * not end as catalogue files do, so that neither gvfs nor the library reads it. */
std::string DivertedPath(const std::string& path);

/** Paths of our diversions, as dpkg knows them; false when dpkg's list cannot be had. */
bool ListDiversions(std::vector<std::string>& paths, std::string& problem);

/** Moves what stands at `path`, now or later from a package, aside. */
bool Divert(const std::string& path, std::string& problem);

/** Takes what stands at `path` away and brings the diverted file back. */
bool Undivert(const std::string& path, std::string& problem);

}  // namespace tool

#endif
