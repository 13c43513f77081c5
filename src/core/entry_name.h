/** Names of entries in a folder. */
#ifndef ZYROVFS_CORE_ENTRY_NAME_H
#define ZYROVFS_CORE_ENTRY_NAME_H

#include <string>

namespace ZYROVFS {

/** True for what can name an entry of a folder and nothing outside of it. */
bool IsEntryName(const std::string& name);

/** A path cut behind its last slash: the folder ("." without one), and the name of the entry. */
struct EntryPath {
    std::string folder;
    std::string name;
};
EntryPath SplitPath(const std::string& path);

/** `name` with a random end that nobody can foretell; empty, with errno, when there is none. */
std::string RandomName(const std::string& name);

}  // namespace ZYROVFS

#endif
