/** The files of a cloud account, as its service tells of them. */
#ifndef ZYROVFS_WEB_CLOUD_TREE_H
#define ZYROVFS_WEB_CLOUD_TREE_H

#include <zyrovfs/zyrocloud.h>

#include <string>

#include "tree.h"

namespace web {

/**
 * What a service calls an item: its id, or its path where the service goes by paths. An id that
 * begins with a letter of an item's name is no accident: nobody but the tree looks into it.
 */
struct CloudItem {
    Entry entry;
    std::string id;
};

class CloudTree : public Tree {
  public:
    /** `account_id` is the account's own id at the service, which Box's listings need. */
    CloudTree(std::string server_id, std::string account_id);
    ~CloudTree() override;

    void List(const std::string& path, const std::function<void(Entry)>& tell) override;
    Entry Look(const std::string& path) override;
    void MakeFolder(const std::string& path) override;
    void Move(const std::string& path, const std::string& folder,
              const std::string& name) override;
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
    Service service_;
    ZYROCloud_Cache* cache_ = nullptr;
};

}  // namespace web

#endif
