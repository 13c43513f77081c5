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

#include "support/cloudsim/content.h"

namespace cloudsim {

class Account;

struct Node {
    /** Folders first, then by name without regard to case, as listings show them. */
    using Key = std::pair<int, std::string>;

    std::string id;
    std::string name;
    const Account* owner = nullptr;
    Node* parent = nullptr;  ///< null for the folder that holds all
    bool folder = false;
    ContentPtr content;
    int64_t created = 0, modified = 0;  ///< of the entry; seconds since 1970
    int64_t content_created = 0, content_modified = 0;
    int version = 0;         ///< counts changes
    std::string version_id;  ///< of the content
    std::string description;
    std::map<Key, Node*> children;

    uint64_t Size() const;  ///< with all below
    bool IsInside(const Node& folder_node) const;
};

/** Lower case of UTF-8 text, letter by letter. */
std::string FoldCase(const std::string& text);

class Tree {
  public:
    /** `now` is the service's clock; `root_id` names every account's topmost folder. */
    Tree(std::function<int64_t()> now, std::string root_id)
        : now_(std::move(now)), root_id_(std::move(root_id)) {}

    Node& AddAccount(const Account& account);
    Node& Root(const Account& account) { return *roots_.at(&account); }
    const std::string& RootId() const { return root_id_; }
    /** Null when this account has none of this id. */
    Node* Find(const Account& account, const std::string& id);
    /** True when there was one of this id, and it was removed. */
    bool WasRemoved(const Account& account, const std::string& id) const;
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

    uint64_t Used(const Account& account) const;
    /** Changes with every change of anything. */
    uint64_t Version() const { return version_; }

    /** Takes in what the folder of the disk holds; later changes are made there as well. */
    void Serve(const Account& account, const std::string& folder);

  private:
    Node& Make(Node& parent, const std::string& name, bool folder);
    Node::Key KeyOf(const Node& node) const;
    void Forget(Node& node);
    void Import(Node& folder, const std::string& path);
    std::string DiskPath(const Node& parent, const std::string& name) const;
    ContentPtr ToDisk(const std::string& path, ContentPtr content) const;

    const std::function<int64_t()> now_;
    const std::string root_id_;
    std::unordered_map<const Account*, std::unique_ptr<Node>> roots_;
    std::unordered_map<std::string, std::unique_ptr<Node>> nodes_;
    std::unordered_map<std::string, const Account*> removed_;
    std::unordered_map<const Account*, std::string> disks_;
    uint64_t last_id_ = 5000000000, version_ = 0;
};

}  // namespace cloudsim

#endif
