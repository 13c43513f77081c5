/** Folders and files of all accounts of one service. Guarded by the service's lock. */
#ifndef ZYROVFS_TESTS_CLOUDSIM_TREE_H
#define ZYROVFS_TESTS_CLOUDSIM_TREE_H

#include <cstdint>
#include <functional>
#include <map>
#include <memory>
#include <string>
#include <unordered_map>
#include <utility>
#include <vector>

#include "support/cloudsim/content.h"

namespace cloudsim {

class Account;

struct Node {
    /** Folders first, then by name without regard to case, as listings show them. */
    using Key = std::pair<int, std::string>;

    std::string id;
    std::string name;
    const Account* owner = nullptr;
    std::string disk_name;   ///< in an account served from a disk; there it is unique
    Node* parent = nullptr;  ///< null for the folder that holds all
    bool folder = false;
    ContentPtr content;
    int64_t created = 0, modified = 0;  ///< of the entry; seconds since 1970
    int64_t content_created = 0, content_modified = 0;
    int version = 0;         ///< counts changes
    std::string version_id;  ///< of the content
    std::string description;
    std::map<Key, Node*> children;

    // What only graphs have (see TreeRules).
    std::vector<Node*> more_parents;
    std::string mime_type;
    bool trashed = false;  ///< itself, not with a folder
    bool starred = false;
    bool weightless = false;  ///< takes nothing of the quota
    std::string sharer;       ///< e-mail of its owner, when that is somebody else
    int64_t shared = 0;       ///< when it was shared; seconds since 1970
    int modified_millis = 0;  ///< behind content_modified

    uint64_t Size() const;  ///< with all below
    bool IsInside(const Node& folder_node) const;
    std::vector<Node*> Parents() const;
    /** Itself, or with every folder that it lies in. */
    bool IsTrashed() const;
};

/** How a service's items lie. */
struct TreeRules {
    TreeRules(const char* id) : root_id(id) {}
    TreeRules(std::string id) : root_id(std::move(id)) {}

    /** Id of the topmost folder of every account; in a graph the account's own id follows it. */
    std::string root_id;
    std::string id_prefix;
    /** Where ids tell more: makes an item's id of a number that none else has, a root's of 0. */
    std::function<std::string(const Node&, uint64_t number)> make_id;
    /**
     * A folder may hold several items of one name, names are taken as they are, an item may lie in
     * several folders or in none, and what is trashed stays where it was.
     */
    bool graph = false;
};

/** Lower case of UTF-8 text, letter by letter. */
std::string FoldCase(const std::string& text);

class Tree {
  public:
    /** `now` is the service's clock. */
    Tree(std::function<int64_t()> now, TreeRules rules)
        : now_(std::move(now)), rules_(std::move(rules)) {}

    Node& AddAccount(const Account& account);
    Node& Root(const Account& account) { return *roots_.at(&account); }
    const std::string& RootId(const Account& account) const { return roots_.at(&account)->id; }
    bool IsGraph() const { return rules_.graph; }
    /** Null when this account has none of this id. */
    Node* Find(const Account& account, const std::string& id);
    /** True when there was one of this id, and it was removed. */
    bool WasRemoved(const Account& account, const std::string& id) const;
    /** Of several the oldest that isn't trashed. */
    Node* Child(const Node& folder, const std::string& name) const;
    Node* Walk(const Account& account, const std::string& path);

    // The caller has made sure that the name is free. Each changes the disk first where an account
    // is served from one, and throws std::runtime_error when that fails.
    Node& AddFolder(Node& parent, const std::string& name);
    Node& AddFile(Node& parent, const std::string& name, ContentPtr content);
    void SetContent(Node& file, ContentPtr content);
    void Move(Node& node, Node& parent, const std::string& name);
    Node& Copy(const Node& node, Node& parent, const std::string& name);
    void Remove(Node& node);
    void Touch(Node& node);

    // Only in a graph.
    /** Without a parent the item lies nowhere. The caller has made sure that there is no circle. */
    void Place(Node& node, const std::vector<Node*>& parents, const std::string& name);
    void SetTrashed(Node& node, bool trashed);
    /** Every item of the account, in the order in which they were made. */
    std::vector<const Node*> All(const Account& account) const;

    uint64_t Used(const Account& account) const;
    /** Changes with every change of anything. */
    uint64_t Version() const { return version_; }

    /** Takes in what the folder of the disk holds; later changes are made there as well. */
    void Serve(const Account& account, const std::string& folder);

  private:
    Node& Make(Node& parent, const std::string& name, bool folder);
    Node::Key KeyOf(const Node& node) const;
    void Attach(Node& node);
    void Detach(Node& node);
    void Forget(Node& node);
    void Import(Node& folder, const std::string& path);
    std::string DiskPath(const Node& node) const;
    std::string DiskPath(const Node& parent, const std::string& disk_name) const;
    std::string DiskName(const Node& parent, const std::string& name) const;
    void Put(Node& node, const std::vector<Node*>& parents, const std::string& name,
             const std::string& disk_name);
    void MoveOnDisk(Node& node, const std::string& from);
    void Restore(Node& node);
    ContentPtr ToDisk(const std::string& path, ContentPtr content) const;

    const std::function<int64_t()> now_;
    const TreeRules rules_;
    std::unordered_map<const Account*, std::unique_ptr<Node>> roots_;
    std::unordered_map<std::string, std::unique_ptr<Node>> nodes_;
    std::unordered_map<std::string, const Account*> removed_;
    std::unordered_map<const Account*, std::string> disks_;
    uint64_t last_id_ = 5000000000, version_ = 0;
};

}  // namespace cloudsim

#endif
