#include "support/cloudsim/mounted_account.h"

namespace cloudsim {
namespace {

bool IsSame(const Item& a, const Item& b) {
    return a.id == b.id && a.folder == b.folder && a.size == b.size && a.version == b.version;
}

}  // namespace

void MountedAccount::Collect(const std::string& path, const std::string& id, Items& items) const {
    for (const Item& item : account_.List(id)) {
        const std::string here = path + "/" + item.name;
        items[here] = item;
        if (item.folder) {
            Collect(here, item.id, items);
        }
    }
}

void MountedAccount::Forget() {
    const std::vector<XattrTree::Written> writes = tree_.Writes();
    for (; writes_seen_ < writes.size(); ++writes_seen_) {
        const auto item = shown_.find(writes[writes_seen_].path);
        if (item != shown_.end()) {
            item->second.id.clear();
        }
    }
}

void MountedAccount::Show(const std::string& path, const Item& item) {
    item.folder ? tree_.AddFolder(path) : tree_.Add(path, static_cast<long long>(item.size));
    for (const auto& [name, value] : service_.Attributes(account_, item)) {
        tree_.Set(path, name, value);
    }
}

void MountedAccount::Refresh() {
    Items items;
    if (!top_.empty()) {
        items[top_] = account_.Get(account_.Root());
    }
    Collect(top_, account_.Root(), items);
    Forget();
    for (const auto& [path, item] : shown_) {
        if (items.count(path) == 0) {
            tree_.Remove(path);
        }
    }
    for (const auto& [path, item] : items) {
        const auto before = shown_.find(path);
        if (before == shown_.end() || !IsSame(before->second, item)) {
            Show(path, item);
        }
    }
    shown_ = std::move(items);
}

}  // namespace cloudsim
