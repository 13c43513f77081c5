/**
 * A FUSE tree that stands in for a mounted cloud: it answers the attributes that drivers read
 * ("id::file", "standard::description") and records those that they write ("zyro::cacheclean").
 * The stock fuse daemon answers every attribute request with "Operation not supported".
 */
#ifndef ZYROVFS_TESTS_XATTRTREE_H
#define ZYROVFS_TESTS_XATTRTREE_H

#include <memory>
#include <string>
#include <vector>

class XattrTree {
  public:
    struct Written {
        std::string path;  ///< inside the tree
        std::string name;
        std::string value;
    };

    /** Mounts on `folder`, which is made. Throws when that is not possible. */
    explicit XattrTree(std::string folder);
    /** Unmounts and leaves the empty folder behind. */
    ~XattrTree();
    XattrTree(const XattrTree&) = delete;
    XattrTree& operator=(const XattrTree&) = delete;

    const std::string& Folder() const { return folder_; }

    /** Makes `path` ("/" is there from the start) and the folders above it; a path becomes a folder
     * when something is put below it. */
    void Add(const std::string& path, long long size = 0);
    void AddFolder(const std::string& path);
    void Remove(const std::string& path);
    /** Gives `path`, which is made if it is missing, an attribute. */
    void Set(const std::string& path, const std::string& name, const std::string& value);
    void Unset(const std::string& path, const std::string& name);
    /** Reading and writing this attribute fails with `error` from now on; 0 ends that. */
    void Fail(const std::string& name, int error);

    /** What was written from outside since the start, in order. It changes no attribute. */
    std::vector<Written> Writes() const;

    struct State;

  private:
    std::string folder_;
    std::unique_ptr<State> state_;
};

#endif
