/** What a test does with a Drive, past the interface. */
#include <algorithm>
#include <stdexcept>

#include "support/cloudsim/gdrive.h"

namespace cloudsim {

using Lock = std::lock_guard<std::mutex>;

Node& GDrive::At(const Account& account, const std::string& id) {
    Node* node = tree_.Find(account, id);
    if (node == nullptr) {
        throw std::invalid_argument("account " + account.Email() + " has no item " + id);
    }
    return *node;
}

std::string GDrive::AddDocument(Account& account, const std::string& parent,
                                const std::string& title, const std::string& kind,
                                std::string exported) {
    const Lock lock(mutex_);
    Node& root = tree_.Root(account);
    Node& node = tree_.AddFile(parent.empty() ? root : At(account, parent), title,
                               MakeBytes(std::move(exported)));
    node.mime_type = "application/vnd.google-apps." + kind;
    node.weightless = true;
    if (parent.empty()) {
        tree_.Place(node, {}, title);
    }
    return node.id;
}

std::string GDrive::Share(Node& node, const std::string& owner) {
    tree_.Place(node, {}, node.name);
    node.sharer = owner;
    node.shared = Now();
    node.weightless = true;
    return node.id;
}

std::string GDrive::AddShared(Account& account, const std::string& title, std::string bytes,
                              const std::string& owner) {
    const Lock lock(mutex_);
    return Share(tree_.AddFile(tree_.Root(account), title, MakeBytes(std::move(bytes))), owner);
}

std::string GDrive::AddSharedFolder(Account& account, const std::string& title,
                                    const std::string& owner) {
    const Lock lock(mutex_);
    return Share(tree_.AddFolder(tree_.Root(account), title), owner);
}

GDriveFacts GDrive::Facts(const Account& account, const std::string& id) {
    const Lock lock(mutex_);
    const Node& node = At(account, id);
    GDriveFacts facts;
    for (const Node* parent : node.Parents()) {
        facts.parents.push_back(parent->id);
    }
    facts.mime_type = gdrive::MimeType(node);
    facts.description = node.description;
    facts.trashed = node.IsTrashed();
    facts.explicitly_trashed = node.trashed;
    facts.starred = node.starred;
    facts.modified = {node.content_modified, node.modified_millis};
    return facts;
}

void GDrive::SetParents(const Account& account, const std::string& id,
                        const std::vector<std::string>& parents) {
    const Lock lock(mutex_);
    Node& node = At(account, id);
    std::vector<Node*> folders;
    for (const std::string& parent : parents) {
        folders.push_back(&At(account, parent));
        if (!folders.back()->folder || folders.back()->IsInside(node)) {
            throw std::invalid_argument("cannot be a parent: " + parent);
        }
    }
    tree_.Place(node, folders, node.name);
}

void GDrive::SetTrashed(const Account& account, const std::string& id, bool trashed) {
    const Lock lock(mutex_);
    tree_.SetTrashed(At(account, id), trashed);
}

void GDrive::SetStarred(const Account& account, const std::string& id, bool starred) {
    const Lock lock(mutex_);
    Node& node = At(account, id);
    node.starred = starred;
    tree_.Touch(node);
}

void GDrive::SetMimeType(const Account& account, const std::string& id, const std::string& type) {
    const Lock lock(mutex_);
    Node& node = At(account, id);
    node.mime_type = type;
    tree_.Touch(node);
}

void GDrive::ExpireDownloadUrls() {
    const Lock lock(mutex_);
    download_turn_++;
    pages_.clear();
}

void GDrive::DropUploadSessions() {
    const Lock lock(mutex_);
    sessions_.clear();
}

size_t GDrive::UploadSessions() {
    const Lock lock(mutex_);
    return static_cast<size_t>(std::count_if(sessions_.begin(), sessions_.end(),
                                             [](const auto& row) { return !row.second->done; }));
}

}  // namespace cloudsim
