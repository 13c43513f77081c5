#include "support/cloudsim/tree.h"

#include <algorithm>
#include <clocale>
#include <cwctype>

#include "support/cloudsim/account.h"

namespace cloudsim {
namespace {

size_t SequenceLength(unsigned char lead) {
    return lead < 0x80   ? 1
           : lead < 0xc0 ? 0
           : lead < 0xe0 ? 2
           : lead < 0xf0 ? 3
           : lead < 0xf8 ? 4
                         : 0;
}

void AppendUtf8(std::string& text, uint32_t c) {
    if (c < 0x80) {
        text += static_cast<char>(c);
    } else if (c < 0x800) {
        text += {static_cast<char>(0xc0 | c >> 6), static_cast<char>(0x80 | (c & 0x3f))};
    } else if (c < 0x10000) {
        text += {static_cast<char>(0xe0 | c >> 12), static_cast<char>(0x80 | (c >> 6 & 0x3f)),
                 static_cast<char>(0x80 | (c & 0x3f))};
    } else {
        text += {static_cast<char>(0xf0 | c >> 18), static_cast<char>(0x80 | (c >> 12 & 0x3f)),
                 static_cast<char>(0x80 | (c >> 6 & 0x3f)), static_cast<char>(0x80 | (c & 0x3f))};
    }
}

locale_t Utf8Locale() {
    static const locale_t locale = newlocale(LC_CTYPE_MASK, "C.UTF-8", nullptr);
    return locale;
}

uint32_t Lower(uint32_t c) {
    return Utf8Locale() == nullptr ? c : towlower_l(static_cast<wint_t>(c), Utf8Locale());
}

}  // namespace

std::string FoldCase(const std::string& text) {
    std::string folded;
    for (size_t i = 0; i < text.size();) {
        const auto lead = static_cast<unsigned char>(text[i]);
        const size_t length = SequenceLength(lead);
        if (length < 1 || i + length > text.size()) {
            folded += text[i++];
            continue;
        }
        uint32_t c = length == 1 ? lead : lead & (0x7fU >> length);
        for (size_t k = 1; k < length; k++) {
            c = c << 6 | (static_cast<unsigned char>(text[i + k]) & 0x3fU);
        }
        AppendUtf8(folded, Lower(c));
        i += length;
    }
    return folded;
}

uint64_t Node::Size() const {
    uint64_t size = content == nullptr ? 0 : content->Size();
    for (const auto& [key, child] : children) {
        size += child->Size();
    }
    return size;
}

bool Node::IsInside(const Node& folder_node) const {
    const std::vector<Node*> above = Parents();
    return this == &folder_node || std::any_of(above.begin(), above.end(), [&](const Node* node) {
               return node->IsInside(folder_node);
           });
}

std::vector<Node*> Node::Parents() const {
    std::vector<Node*> all = more_parents;
    if (parent != nullptr) {
        all.insert(all.begin(), parent);
    }
    return all;
}

bool Node::IsTrashed() const {
    const std::vector<Node*> above = Parents();
    return trashed || (!above.empty() && std::all_of(above.begin(), above.end(),
                                                     [](const Node* n) { return n->IsTrashed(); }));
}

Node& Tree::AddAccount(const Account& account) {
    auto root = std::make_unique<Node>();
    root->name = "All Files";
    root->owner = &account;
    root->folder = true;
    root->id = rules_.make_id ? rules_.make_id(*root, 0)
                              : rules_.root_id + (rules_.graph ? account.Id() : "");
    return *(roots_[&account] = std::move(root));
}

Node* Tree::Find(const Account& account, const std::string& id) {
    if (id == RootId(account)) {
        return &Root(account);
    }
    const auto found = nodes_.find(id);
    return found != nodes_.end() && found->second->owner == &account ? found->second.get()
                                                                     : nullptr;
}

bool Tree::WasRemoved(const Account& account, const std::string& id) const {
    const auto found = removed_.find(id);
    return found != removed_.end() && found->second == &account;
}

Node* Tree::Child(const Node& folder, const std::string& name) const {
    const std::string folded = FoldCase(name);
    for (const int rank : {0, 1}) {
        auto found = folder.children.lower_bound({rank, folded});
        if (!rules_.graph) {
            if (found != folder.children.end() && found->first == Node::Key(rank, folded)) {
                return found->second;
            }
            continue;
        }
        const Node::Key end = {rank, folded + '\1'};
        for (; found != folder.children.end() && found->first < end; ++found) {
            if (found->second->name == name && !found->second->trashed) {
                return found->second;
            }
        }
    }
    return nullptr;
}

Node* Tree::Walk(const Account& account, const std::string& path) {
    Node* node = &Root(account);
    size_t start = 0;
    while (node != nullptr && start < path.size()) {
        const size_t end = std::min(path.find('/', start), path.size());
        if (end > start) {
            node = Child(*node, path.substr(start, end - start));
        }
        start = end + 1;
    }
    return node;
}

Node::Key Tree::KeyOf(const Node& node) const {
    const std::string twin = rules_.graph ? '\0' + node.id : "";
    return {node.folder ? 0 : 1, FoldCase(node.name) + twin};
}

void Tree::Attach(Node& node) {
    for (Node* parent : node.Parents()) {
        parent->children[KeyOf(node)] = &node;
    }
}

void Tree::Detach(Node& node) {
    for (Node* parent : node.Parents()) {
        parent->children.erase(KeyOf(node));
    }
}

Node& Tree::Make(Node& parent, const std::string& name, bool folder) {
    auto node = std::make_unique<Node>();
    node->name = node->disk_name = name;
    node->owner = parent.owner;
    node->parent = &parent;
    node->folder = folder;
    last_id_ += 17;
    node->id = rules_.make_id ? rules_.make_id(*node, last_id_)
                              : rules_.id_prefix + std::to_string(last_id_);
    node->created = node->modified = node->content_created = node->content_modified = now_();
    Node& made = *node;
    Attach(made);
    nodes_[made.id] = std::move(node);
    version_++;
    return made;
}

void Tree::Touch(Node& node) {
    node.modified = now_();
    node.version++;
    version_++;
}

std::vector<const Node*> Tree::All(const Account& account) const {
    std::vector<const Node*> all;
    for (const auto& [id, node] : nodes_) {
        if (node->owner == &account) {
            all.push_back(node.get());
        }
    }
    std::sort(all.begin(), all.end(), [](const Node* a, const Node* b) { return a->id < b->id; });
    return all;
}

uint64_t Tree::Used(const Account& account) const {
    if (!rules_.graph) {
        return roots_.at(&account)->Size();
    }
    uint64_t used = 0;
    for (const auto& [id, node] : nodes_) {
        const bool counts = node->owner == &account && !node->folder && !node->weightless;
        used += counts ? node->content->Size() : 0;
    }
    return used;
}

/** What lies in another folder as well stays there. */
void Tree::Forget(Node& node) {
    while (!node.children.empty()) {
        Node& child = *node.children.begin()->second;
        node.children.erase(node.children.begin());
        std::vector<Node*> left = child.Parents();
        left.erase(std::remove(left.begin(), left.end(), &node), left.end());
        child.parent = left.empty() ? nullptr : left.front();
        child.more_parents.assign(left.begin() + (left.empty() ? 0 : 1), left.end());
        if (left.empty()) {
            Forget(child);
        }
    }
    removed_[node.id] = node.owner;
    nodes_.erase(node.id);
}

}  // namespace cloudsim
