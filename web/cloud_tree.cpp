#include "cloud_tree.h"

#include <unistd.h>

#include <utility>

#include "cloud_item.h"
#include "failure.h"
#include "name.h"

namespace web {
namespace {

/** Google's account is shown as two folders. */
constexpr const char* kStarred = "/Starred";
constexpr const char* kIdAttribute = "id::file";
/** The common functions take a second argument that must not be null, and do nothing with it. */
constexpr const char* kUnused = "";
constexpr int kNoCause = -1;

using Tell = std::function<void(CloudItem)>;

/** Nothing may be thrown through a callback of the library. */
struct Listing {
    std::vector<CloudItem> items;
    bool complete = true;
};

void Keep(GFileInfo* info, void* opaque) {
    auto& listing = *static_cast<Listing*>(opaque);
    try {
        listing.items.push_back({EntryOf(info), AttributeOf(info, kIdAttribute)});
    } catch (const std::exception&) {
        listing.complete = false;
    }
}

Entry Folder(const std::string& name) {
    Entry entry = RootEntry();
    entry.name = name;
    return entry;
}

std::string Shown(const std::string& path) {
    return "\"" + path.substr(path.rfind('/') + 1) + "\"";
}

void Check(int done, const std::string& path, int error) {
    if (done == 0) {
        throw FailureOfGio(Shown(path), error);
    }
}

/** A document's extension is this system's own; the service knows its name without. */
std::string NameAtService(const CloudItem& item, const std::string& name) {
    const std::string& shown = item.entry.name;
    const size_t dot = shown.rfind('.');
    const std::string extension = dot == std::string::npos ? "" : shown.substr(dot);
    const bool has_it =
        name.size() > extension.size() &&
        name.compare(name.size() - extension.size(), extension.size(), extension) == 0;
    return !item.entry.exports.empty() && has_it ? name.substr(0, name.size() - extension.size())
                                                 : name;
}

}  // namespace

CloudTree::CloudTree(std::string server_id, std::string account_id, std::string folder)
    : server_id_(std::move(server_id)),
      account_id_(std::move(account_id)),
      folder_(std::move(folder)) {
    const std::string scheme = server_id_.substr(0, server_id_.find(':'));
    service_ = scheme == "box"       ? kBox
               : scheme == "dropbox" ? kDropbox
               : scheme == "google"  ? kGoogle
                                     : kOneDrive;
    if (ZYROCloud_Cache_Init(&cache_) == 0) {
        throw Failure(500, "Memory ran out.");
    }
}

CloudTree::~CloudTree() {
    ZYROCloud_Cache_Destroy(&cache_);
}

bool CloudTree::IsThere() {
    return access(folder_.c_str(), F_OK) == 0;
}

void CloudTree::ListItems(const std::string& path, const Tell& tell) {
    if (service_ == kGoogle && path == "/") {
        tell({Folder("My Drive"), "root"});
        tell({Folder("Starred"), ""});
        return;
    }
    Listing listing;
    int error = kNoCause;
    const char* id = server_id_.c_str();
    const char* at = path.c_str();
    const int listed =
        service_ == kBox ? ZYROCloud_Cloud_Box_List(account_id_.c_str(), id, cache_, at, nullptr,
                                                    Keep, &listing, &error)
        : service_ == kDropbox
            ? ZYROCloud_Cloud_Dropbox_List(id, cache_, at, Keep, &listing, &error)
        : service_ == kGoogle
            ? ZYROCloud_Cloud_Google_List(id, cache_, at, nullptr, Keep, &listing, &error)
            : ZYROCloud_Cloud_OneDrive_List(id, cache_, at, nullptr, Keep, &listing, &error);
    Check(listed != 0 && listing.complete ? 1 : 0, path, error);
    for (CloudItem& item : listing.items) {
        tell(std::move(item));
    }
}

CloudItem CloudTree::Find(const std::string& path) {
    if (CheckPath(path) == "/") {
        return {RootEntry(), service_ == kBox ? "folders/0" : ""};
    }
    const Split split = SplitPath(path);
    CloudItem found;
    bool known = false;
    ListItems(split.folder, [&](CloudItem item) {
        if (!known && item.entry.name == split.name) {
            known = true;
            found = std::move(item);
        }
    });
    if (!known) {
        throw FailureOf(Shown(path), ZYROVFS::VFS_ERR_NOT_FOUND);
    }
    if (service_ == kDropbox) {
        found.id = path;
    }
    return found;
}

void CloudTree::List(const std::string& path, const std::function<void(Entry)>& tell) {
    ListItems(CheckPath(path), [&](CloudItem item) { tell(std::move(item.entry)); });
}

Entry CloudTree::Look(const std::string& path) {
    return Find(path).entry;
}

void CloudTree::RefuseRival(const std::string& path) {
    try {
        Find(path);
    } catch (const Failure& failure) {
        if (failure.Code() == ZYROVFS::VFS_ERR_NOT_FOUND) {
            return;
        }
        throw;
    }
    throw FailureOf(Shown(path), ZYROVFS::VFS_ERR_CONFLICT);
}

void CloudTree::MakeFolder(const std::string& path) {
    const Split split = SplitPath(path);
    const CloudItem folder = Find(split.folder);
    RefuseRival(path);
    int error = kNoCause;
    // Below the root of a service that goes by paths there is nothing in front of the slash.
    const int made = ZYROCloud_Cloud_CreateFolder(server_id_.c_str(), kUnused, folder.id.c_str(),
                                                  split.name.c_str(), &error);
    Check(made, path, error);
}

void CloudTree::RenameItem(const CloudItem& item, const std::string& name) {
    int error = kNoCause;
    const int renamed =
        ZYROCloud_Cloud_Rename(server_id_.c_str(), kUnused, item.id.c_str(),
                               NameAtService(item, CheckName(name)).c_str(), &error);
    Check(renamed, item.entry.name, error);
}

void CloudTree::MoveItem(const CloudItem& item, const std::string& from, const std::string& to,
                         const std::string& name) {
    const std::string target = Find(to).id;
    const std::string place = Join(to, item.entry.name);
    const char* id = server_id_.c_str();
    int error = kNoCause;
    int moved = 0;
    switch (service_) {
        case kBox:
            moved = ZYROCloud_Cloud_Box_Move(id, cache_, item.id.c_str(), target.c_str(),
                                             place.c_str(), &error);
            break;
        case kOneDrive:
            moved = ZYROCloud_Cloud_OneDrive_Move(id, cache_, item.id.c_str(), target.c_str(),
                                                  place.c_str(), &error);
            break;
        case kGoogle:
            moved = ZYROCloud_Cloud_Google_Move(id, cache_, Find(from).id.c_str(), item.id.c_str(),
                                                target.c_str(), &error);
            break;
        case kDropbox:
            moved =
                ZYROCloud_Cloud_Move(id, kUnused, item.id.c_str(), Join(to, name).c_str(), &error);
            break;
    }
    Check(moved, item.entry.name, error);
}

void CloudTree::Move(const std::string& path, const std::string& folder, const std::string& name) {
    const Split split = SplitPath(path);
    const std::string place = Join(folder, name);
    if (place == path) {
        return;
    }
    const CloudItem item = Find(path);
    RefuseRival(place);
    if (folder == split.folder) {
        RenameItem(item, name);
        return;
    }
    const bool renamed = name != item.entry.name && service_ != kDropbox;
    if (renamed) {
        RefuseRival(Join(folder, item.entry.name));
    }
    MoveItem(item, split.folder, folder, name);
    if (renamed) {
        RenameItem(item, name);
    }
}

void CloudTree::Delete(const std::string& path, bool recursive) {
    const std::string parent = SplitPath(path).folder;
    const CloudItem item = Find(path);
    if (service_ == kGoogle && parent == "/") {
        throw Failure(403, Shown(path) + " is a part of every account.");
    }
    if (item.entry.folder && !recursive) {
        ListItems(path, [&](const CloudItem&) {
            throw FailureOf(Shown(path), ZYROVFS::VFS_ERR_CONFLICT)
                .Advise("Delete what is in the folder, too.");
        });
    }
    int error = kNoCause;
    // What is starred lies elsewhere, too; here only its star is taken.
    const int deleted =
        service_ == kGoogle && parent == kStarred
            ? ZYROCloud_Cloud_Google_DeleteStarred(server_id_.c_str(), cache_, item.id.c_str(),
                                                   &error)
            : ZYROCloud_Cloud_Delete(server_id_.c_str(), kUnused, item.id.c_str(), &error);
    Check(deleted, path, error);
}

}  // namespace web
