/**
 * What plain Debian lacks for the library, and how it gets it: folders, a launcher for gvfsd-fuse,
 * catalogue files, a place for dbus-daemon and one line in fuse.conf. Files of packages are
 * diverted through dpkg and come back on removal. What was done is kept in dpkg's list of
 * diversions and nowhere else, so an installation that broke off can be repeated or removed.
 */
#ifndef ZYROVFS_TOOLS_HOST_LAYER_H
#define ZYROVFS_TOOLS_HOST_LAYER_H

#include <string>
#include <vector>

namespace tool {

/** Where the files that are put in place come from. */
struct HostSources {
    std::string launcher;
    std::string mounts;  ///< folder of catalogue files
    std::string helper;  ///< the library's, which stays where it is

    /** Those of a build tree, or the installed ones for an empty `build`. */
    static HostSources Of(const std::string& build);
};

/** A file or link of ours that stands where a package has, or might get, one of its own. */
struct HostFile {
    std::string path;
    std::string source;  ///< file whose content it has; empty for a link
    std::string target;  ///< of a link
    unsigned mode = 0644;
};

/** A folder that the library expects. */
struct HostFolder {
    const char* path;
    unsigned gid;
    unsigned mode;
};

/** In the order in which they are made. */
const std::vector<HostFolder>& HostFolders();
bool IsFolderReady(const HostFolder& folder);

/** Files of ours; empty with a sentence in `problem` when the sources are not there. */
std::vector<HostFile> HostFiles(const HostSources& sources, std::string& problem);

/** True when the file or link stands as it should. */
bool IsInPlace(const HostFile& file);

/** Catalogue files without a protocol: the library would list them as nameless entries. */
std::vector<std::string> NamelessMounts();

/** Each answers true when it is done; what went wrong is said in `problems`, one sentence each. */
bool InstallHost(const HostSources& sources, std::vector<std::string>& problems);
bool RemoveHost(std::vector<std::string>& problems);

/** What is missing, one sentence each; empty when the machine is ready. */
std::vector<std::string> CheckHost(const HostSources& sources);

}  // namespace tool

#endif
