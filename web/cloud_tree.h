/** The files of a cloud account, as its service tells of them. */
#ifndef ZYROVFS_WEB_CLOUD_TREE_H
#define ZYROVFS_WEB_CLOUD_TREE_H

#include <zyrovfs/zyrocloud.h>

#include <string>

#include "tree.h"

namespace web {

struct CloudItem {
    Entry entry;
    std::string id;  ///< the service's own; the path where the service goes by paths
};

class CloudTree : public Tree {
  public:
    /** `account_id` is the account's own id at the service, which Box's listings need;
     * `folder` is where the account is mounted. */
    CloudTree(std::string server_id, std::string account_id, std::string folder);
    ~CloudTree() override;
    bool IsThere() override;

    void List(const std::string& path, const std::function<void(Entry)>& tell) override;
    Entry Look(const std::string& path) override;
    void MakeFolder(const std::string& path) override;
    void Move(const std::string& path, const std::string& folder, const std::string& name) override;
    void Delete(const std::string& path, bool recursive) override;

  private:
    enum Service { kBox, kDropbox, kGoogle, kOneDrive };

    void ListItems(const std::string& path, const std::function<void(CloudItem)>& tell);
    CloudItem Find(const std::string& path);
    /** Failure with status 409 when there is such an item. */
    void RefuseRival(const std::string& path);
    void MoveItem(const CloudItem& item, const std::string& from, const std::string& to,
                  const std::string& name);
    void RenameItem(const CloudItem& item, const std::string& name);

    std::string server_id_;
    std::string account_id_;
    std::string folder_;
    Service service_;
    ZYROCloud_Cache* cache_ = nullptr;
};

}  // namespace web

#endif
