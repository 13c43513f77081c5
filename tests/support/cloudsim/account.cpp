#include "support/cloudsim/account.h"

#include <cstdio>
#include <stdexcept>

#include "support/cloudsim/service.h"

namespace cloudsim {
namespace {

using Lock = std::lock_guard<std::mutex>;

Item ToItem(const Node& node) {
    Item item;
    item.id = node.id;
    item.parent = node.parent == nullptr ? "" : node.parent->id;
    item.name = node.name;
    item.folder = node.folder;
    item.size = node.Size();
    item.sha1 = node.folder ? "" : node.content->Sha1();
    item.created = node.created;
    item.modified = node.modified;
    item.version = node.version;
    return item;
}

}  // namespace

Account::Account(Service& service, std::string email, std::string name, std::string id)
    : service_(service), email_(std::move(email)), name_(std::move(name)), id_(std::move(id)) {}

std::string Account::Root() const {
    const Lock lock(service_.mutex_);
    return service_.tree_.RootId(*this);
}

Tokens Account::IssueTokens(int64_t life, const std::string& client) {
    return service_.tokens_.Issue(*this, client, life);
}

void Account::ExpireAccessTokens() {
    service_.tokens_.ExpireAll(*this);
}

void Account::RevokeRefreshTokens() {
    service_.tokens_.RevokeAll(*this);
}

Tokens Account::LastTokens() const {
    return service_.tokens_.Last(*this);
}

Node& Account::At(const std::string& id) const {
    Node* node = service_.tree_.Find(*this, id);
    if (node == nullptr) {
        throw std::invalid_argument("account " + email_ + " has no item " + id);
    }
    return *node;
}

Node& Account::FreePlace(const std::string& parent, const std::string& name) const {
    Node& folder = At(parent);
    const bool taken = !service_.tree_.IsGraph() && service_.tree_.Child(folder, name) != nullptr;
    if (!folder.folder || taken) {
        throw std::invalid_argument("account " + email_ + ": no place for " + name);
    }
    return folder;
}

std::string Account::AddFolder(const std::string& parent, const std::string& name) {
    const Lock lock(service_.mutex_);
    return service_.tree_.AddFolder(FreePlace(parent, name), name).id;
}

std::string Account::AddContent(const std::string& parent, const std::string& name,
                                ContentPtr content) {
    const Lock lock(service_.mutex_);
    return service_.tree_.AddFile(FreePlace(parent, name), name, std::move(content)).id;
}

std::string Account::AddFile(const std::string& parent, const std::string& name,
                             std::string bytes) {
    return AddContent(parent, name, MakeBytes(std::move(bytes)));
}

std::string Account::AddPattern(const std::string& parent, const std::string& name, uint64_t size,
                                unsigned seed) {
    return AddContent(parent, name, MakePattern(size, seed));
}

std::string Account::AddPath(const std::string& path, std::string bytes) {
    const size_t slash = path.rfind('/');
    std::string folder = Root();
    for (size_t start = 0; slash != std::string::npos && start < slash;) {
        const size_t end = std::min(path.find('/', start), slash);
        if (end > start) {
            const std::string known = Find(path.substr(0, end));
            folder = known.empty() ? AddFolder(folder, path.substr(start, end - start)) : known;
        }
        start = end + 1;
    }
    return AddFile(folder, path.substr(slash == std::string::npos ? 0 : slash + 1),
                   std::move(bytes));
}

void Account::AddMany(const std::string& parent, size_t count, uint64_t size) {
    const ContentPtr content = MakePattern(size);
    for (size_t i = 0; i < count; i++) {
        char name[32];
        snprintf(name, sizeof name, "item-%06zu.bin", i);
        AddContent(parent, name, content);
    }
}

void Account::Remove(const std::string& id) {
    const Lock lock(service_.mutex_);
    Node& node = At(id);
    if (&node == &service_.tree_.Root(*this)) {
        throw std::invalid_argument("the folder that holds all cannot be removed");
    }
    service_.tree_.Remove(node);
}

void Account::SetTimes(const std::string& id, int64_t created, int64_t modified) {
    const Lock lock(service_.mutex_);
    Node& node = At(id);
    node.created = node.content_created = created;
    node.modified = node.content_modified = modified;
    node.modified_millis = 0;
    service_.tree_.Touch(node);
    node.modified = modified;
}

std::string Account::Find(const std::string& path) const {
    const Lock lock(service_.mutex_);
    const Node* node = service_.tree_.Walk(*this, path);
    return node == nullptr ? "" : node->id;
}

Item Account::Get(const std::string& id) const {
    const Lock lock(service_.mutex_);
    return ToItem(At(id));
}

std::string Account::Bytes(const std::string& id) const {
    ContentPtr content;
    {
        const Lock lock(service_.mutex_);
        content = At(id).content;
    }
    return content == nullptr ? "" : content->Bytes();
}

std::vector<Item> Account::List(const std::string& folder) const {
    const Lock lock(service_.mutex_);
    std::vector<Item> items;
    for (const auto& [key, node] : At(folder).children) {
        if (!node->trashed) {
            items.push_back(ToItem(*node));
        }
    }
    return items;
}

uint64_t Account::Used() const {
    const Lock lock(service_.mutex_);
    return service_.tree_.Used(*this);
}

void Account::Serve(const std::string& folder) {
    const Lock lock(service_.mutex_);
    service_.tree_.Serve(*this, folder);
}

}  // namespace cloudsim
