/** What the box's backend would show of an account: a tree of names with attributes of the items.
 */
#ifndef ZYROVFS_TESTS_CLOUDSIM_MOUNTED_ACCOUNT_H
#define ZYROVFS_TESTS_CLOUDSIM_MOUNTED_ACCOUNT_H

#include <map>
#include <string>

#include "support/cloudsim/service.h"
#include "support/xattrtree/xattrtree.h"

namespace cloudsim {

/**
 * Plain Debian has no backend for clouds. Drivers only need the attributes of the tree that one
 * would mount, so the program shows those; contents are not there.
 */
class MountedAccount {
  public:
    /** `top` is the folder that stands for the account's root: "" is the tree's own. */
    MountedAccount(Service& service, const Account& account, const std::string& folder,
                   const std::string& top = "")
        : service_(service), account_(account), tree_(folder), top_(top) {}

    /** Shows what has changed since, and again what a client asked to be forgotten. */
    void Refresh();

  private:
    using Items = std::map<std::string, Item>;
    void Collect(const std::string& path, const std::string& id, Items& items) const;
    void Forget();
    void Show(const std::string& path, const Item& item);

    Service& service_;
    const Account& account_;
    XattrTree tree_;
    const std::string top_;
    Items shown_;
    size_t writes_seen_ = 0;
};

}  // namespace cloudsim

#endif
