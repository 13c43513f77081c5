/** Small whole files. */
#ifndef ZYROVFS_TOOLS_FILE_H
#define ZYROVFS_TOOLS_FILE_H

#include <sys/types.h>

#include <string>
#include <vector>

namespace tool {

/** False with errno telling why. */
bool ReadFile(const std::string& path, std::string& content);

/** Writes a new file beside the old one and renames it over; false with errno telling why. */
bool ReplaceFile(const std::string& path, const std::string& content, mode_t mode);

/** The same for a symbolic link. */
bool ReplaceLink(const std::string& path, const std::string& target);

/** Removes what a ReplaceFile or ReplaceLink that was killed left beside `path`. */
void RemoveLeftover(const std::string& path);

/** Names in a folder that end in `suffix`, sorted; none when it cannot be read. */
std::vector<std::string> ListFolder(const std::string& path, const std::string& suffix);

}  // namespace tool

#endif
