#include "support/cloudsim/main_mount.h"

namespace cloudsim {

void MountedAccount::Collect(const std::string& path, const std::string& id,
                             Entries& entries) const {
    for (const Item& item : account_.List(id)) {
        const std::string here = path + "/" + item.name;
        entries[here] = {(item.folder ? "folders/" : "files/") + item.id, item.folder, item.size};
        if (item.folder) {
            Collect(here, item.id, entries);
        }
    }
}

void MountedAccount::Refresh() {
    Entries entries;
    Collect("", account_.Root(), entries);
    for (const auto& [path, entry] : shown_) {
        if (entries.count(path) == 0) {
            tree_.Remove(path);
        }
    }
    for (const auto& [path, entry] : entries) {
        const auto before = shown_.find(path);
        if (before != shown_.end() && before->second == entry) {
            continue;
        }
        entry.folder ? tree_.AddFolder(path) : tree_.Add(path, static_cast<long long>(entry.size));
        tree_.Set(path, "id::file", entry.id);
    }
    shown_ = std::move(entries);
}

}  // namespace cloudsim
