/** What the box's backend would show of an account: a tree of names with the ids of items. */
#ifndef ZYROVFS_TESTS_CLOUDSIM_MAIN_MOUNT_H
#define ZYROVFS_TESTS_CLOUDSIM_MAIN_MOUNT_H

#include <cstdint>
#include <map>
#include <string>

#include "support/cloudsim/account.h"
#include "support/xattrtree/xattrtree.h"

namespace cloudsim {

/**
 * Plain Debian has no backend for clouds. Drivers only need the attributes of the tree that one
 * would mount, so the program shows those; contents are not there.
 */
class MountedAccount {
  public:
    MountedAccount(const Account& account, const std::string& folder)
        : account_(account), tree_(folder) {}

    /** Shows what has changed since. */
    void Refresh();

  private:
    struct Entry {
        std::string id;  ///< with the prefix that tells files and folders apart
        bool folder;
        uint64_t size;
        bool operator==(const Entry& other) const {
            return id == other.id && folder == other.folder && size == other.size;
        }
    };
    using Entries = std::map<std::string, Entry>;
    void Collect(const std::string& path, const std::string& id, Entries& entries) const;

    const Account& account_;
    XattrTree tree_;
    Entries shown_;
};

}  // namespace cloudsim

#endif
