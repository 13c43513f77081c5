/** The files of a connection in the user's mounted tree. */
#ifndef ZYROVFS_WEB_MOUNTED_TREE_H
#define ZYROVFS_WEB_MOUNTED_TREE_H

#include <string>

#include "descriptor.h"
#include "tree.h"

namespace web {

class MountedTree : public Tree {
  public:
    /** `folder` is where the connection is mounted; "" or a folder that is gone makes every
     * operation a Failure that says to connect again. */
    explicit MountedTree(std::string folder) : folder_(std::move(folder)) {}

    bool IsThere() override;
    void List(const std::string& path, const std::function<void(Entry)>& tell) override;
    Entry Look(const std::string& path) override;
    void MakeFolder(const std::string& path) override;
    void Move(const std::string& path, const std::string& folder, const std::string& name) override;
    void Delete(const std::string& path, bool recursive) override;

  private:
    /**
     * Opens an item below the connection's folder. Links of a server lead nowhere else: what would
     * leave the folder is refused. Failure by errno.
     */
    Descriptor Open(const std::string& path, int flags) const;

    std::string folder_;
};

}  // namespace web

#endif
