/** Users or groups as a list, and pages of such a list. */
#ifndef ZOSPLATFORM_SRC_DIRECTORY_H
#define ZOSPLATFORM_SRC_DIRECTORY_H

#include <string>
#include <vector>

namespace zos {

struct DirectoryEntry {
    std::string name;
    unsigned int id;
    unsigned int group;  ///< of a user: the primary one
};

using Directory = std::vector<DirectoryEntry>;

/** Adds the users, or the groups, of the kinds `type`. False with the platform error set. */
bool ReadUsers(unsigned int type, const char* domain, Directory& users);
bool ReadGroups(unsigned int type, const char* domain, Directory& groups);

struct PageRequest {
    const char* text;  ///< null or empty: no filter
    bool prefix;       ///< else a part
    int start;
    int limit;  ///< -1: no limit
};

/** The entries of the page, sorted by name; answers the number of all that match. */
int SelectPage(const Directory& directory, const PageRequest& request,
               std::vector<const DirectoryEntry*>& page);

/** Enumerates a page: `Info` is what the callback is given. Number of matches, or -1. */
template <typename Info, typename Callback>
int Enumerate(const Directory& directory, const PageRequest& request, Callback callback,
              void* context) {
    std::vector<const DirectoryEntry*> page;
    const int total = SelectPage(directory, request, page);
    for (const DirectoryEntry* entry : page) {
        const Info info{entry->name.c_str(), entry->id};
        if (callback(&info, context) < 0) {
            return -1;
        }
    }
    return total;
}

/** The administrators' group. False, with the platform error set, when there is none or it cannot
 * be found out. */
struct AdminGroup {
    std::string name;
    unsigned int gid;
    std::vector<std::string> members;
};
bool FindAdminGroup(AdminGroup& group);

}  // namespace zos

#endif
