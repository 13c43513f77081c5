/** Listings in pages, and what has changed since. */
#include <algorithm>
#include <map>
#include <numeric>

#include "support/cloudsim/dropbox.h"
#include "support/cloudsim/route.h"

namespace cloudsim {
namespace {

using dropbox::Entry;
using dropbox::Listing;

/** Of all listings that are kept; a cursor that was forgotten is as good as one that never was. */
constexpr size_t kMostEntries = 1000000;

Entry DeletedEntry(const std::string& path) {
    return {FoldCase(path), "deleted", OneLine(dropbox::Deleted(path))};
}

void ShowAll(Listing& listing) {
    listing.shown.resize(listing.seen.size());
    std::iota(listing.shown.begin(), listing.shown.end(), 0);
}

/** Below the folder, or right in it. */
bool IsBelow(const std::string& path, const std::string& folder, bool deep) {
    return BeginsWith(path, folder + "/") &&
           (deep || path.find('/', folder.size() + 1) == std::string::npos);
}

}  // namespace

void Dropbox::Gather(const Node& node, Listing& listing) {
    for (const auto& [key, child] : node.children) {
        const Json::Value item = Show(*child, true);
        listing.seen.push_back({item["path_lower"].asString(),
                                child->id + (child->folder ? "" : dropbox::Revision(*child)),
                                OneLine(item)});
        if (listing.recursive) {
            Gather(*child, listing);
        }
    }
}

void Dropbox::GatherDeleted(const Node& folder, Listing& listing) {
    const std::string path = FoldCase(dropbox::PathOf(folder));
    for (const auto& [key, name] : deleted_) {
        if (key.first == listing.account && IsBelow(key.second, path, listing.recursive) &&
            tree_.Walk(*listing.account, key.second) == nullptr) {
            listing.seen.push_back(DeletedEntry(name));
        }
    }
}

std::shared_ptr<Listing> Dropbox::Keep(std::shared_ptr<Listing> listing) {
    entries_kept_ += listing->seen.size() + 1;
    if (entries_kept_ > kMostEntries) {
        cursors_.clear();
        listings_.clear();
        entries_kept_ = listing->seen.size() + 1;
    }
    return listing;
}

std::shared_ptr<Listing> Dropbox::Listed(const DropboxCall& call) {
    const std::string path = call.args.Text("path");
    if (path == "/") {
        call.args.Refuse("path: Specify the root folder as an empty string rather than as \"/\".");
    }
    const uint64_t limit = call.args.NumberOr("limit", dropbox_options_.page_size);
    if (limit < 1 || limit > std::max<uint64_t>(2000, dropbox_options_.page_size)) {
        call.args.Refuse("limit: not within 1 and 2000");
    }
    const Node& folder = Find(call, path, "path");
    if (!folder.folder) {
        throw dropbox::Fail({"path", "not_folder"});
    }
    auto listing = std::make_shared<Listing>();
    listing->account = &call.account;
    listing->folder = folder.id;
    listing->recursive = call.args.Flag("recursive");
    listing->deleted = call.args.Flag("include_deleted");
    listing->limit = std::min(limit, dropbox_options_.page_size);
    if (listing->recursive && folder.parent != nullptr) {
        const Json::Value item = Show(folder, true);
        listing->seen.push_back({item["path_lower"].asString(), folder.id, OneLine(item)});
    }
    Gather(folder, *listing);
    if (listing->deleted) {
        GatherDeleted(folder, *listing);
    }
    ShowAll(*listing);
    return Keep(listing);
}

/** What is new, other or gone since the listing was made. */
std::shared_ptr<Listing> Dropbox::Changed(const Listing& listing) {
    const Node* folder = tree_.Find(*listing.account, listing.folder);
    if (folder == nullptr) {
        throw dropbox::Fail({"path", "not_found"});
    }
    auto now = std::make_shared<Listing>();
    now->account = listing.account;
    now->folder = listing.folder;
    now->recursive = listing.recursive;
    now->deleted = listing.deleted;
    now->limit = listing.limit;
    std::map<std::string, const Entry*> before;
    for (const Entry& entry : listing.seen) {
        before[entry.path] = &entry;
    }
    Gather(*folder, *now);
    for (size_t i = 0; i < now->seen.size(); i++) {
        const auto old = before.find(now->seen[i].path);
        if (old == before.end() || old->second->mark != now->seen[i].mark) {
            now->shown.push_back(i);
        }
        before.erase(now->seen[i].path);
    }
    before.erase(FoldCase(dropbox::PathOf(*folder)));
    for (const auto& [path, entry] : before) {
        if (entry->mark != "deleted") {
            now->removed.push_back(
                DeletedEntry(ParseObject(entry->text)["path_display"].asString()));
        }
    }
    return Keep(now);
}

std::string Dropbox::Cursor(const std::shared_ptr<Listing>& listing, size_t page) {
    std::string& name = listing->cursors[page];
    if (name.empty()) {
        name = "AAF" + RandomText(80);
    }
    cursors_[name] = {listing->account, listing, page};
    return name;
}

Reply Dropbox::Page(const std::shared_ptr<Listing>& listing, size_t page) {
    const auto known = listing->pages.find(page);
    if (known != listing->pages.end()) {
        return known->second;
    }
    const size_t start = page * listing->limit;
    const size_t end = std::min(start + listing->limit, listing->Count());
    std::string text = "{\"entries\":[";
    for (size_t i = start; i < end; i++) {
        text += (i == start ? "" : ",") + listing->At(i).text;
    }
    text += "],\"cursor\":\"" + Cursor(listing, page + 1) + "\",\"has_more\":";
    text += end < listing->Count() ? "true}" : "false}";
    return listing->pages[page] = Reply(200, std::move(text), "application/json");
}

Reply Dropbox::ListFolder(const DropboxCall& call) {
    if (listings_version_ != tree_.Version()) {
        listings_.clear();
        listings_version_ = tree_.Version();
    }
    const std::string key = call.account.Id() + call.args.Written();
    const auto known = listings_.find(key);
    if (known != listings_.end()) {
        return Page(known->second, 0);
    }
    const std::shared_ptr<Listing> listing = Listed(call);
    listings_[key] = listing;
    return Page(listing, 0);
}

Reply Dropbox::ListMore(const DropboxCall& call) {
    const auto found = cursors_.find(call.args.Text("cursor"));
    if (found == cursors_.end() || found->second.account != &call.account) {
        return dropbox::BadInput(call.args.Function(), "Invalid \"cursor\" parameter: u'" +
                                                           call.args.Text("cursor") + "'");
    }
    if (found->second.listing == nullptr) {
        throw dropbox::Fail({"reset"});
    }
    const auto [account, listing, page] = found->second;
    if (tree_.Find(*account, listing->folder) == nullptr) {
        throw dropbox::Fail({"path", "not_found"});
    }
    return page * listing->limit < listing->Count() ? Page(listing, page)
                                                    : Page(Changed(*listing), 0);
}

Reply Dropbox::LatestCursor(const DropboxCall& call) {
    const std::shared_ptr<Listing> listing = Listed(call);
    Json::Value answer;
    answer["cursor"] = Cursor(listing, listing->Count() / listing->limit + 1);
    return JsonReply(200, answer);
}

void Dropbox::ResetCursors() {
    const std::lock_guard<std::mutex> lock(mutex_);
    for (auto& [name, cursor] : cursors_) {
        cursor.listing = nullptr;
    }
    listings_.clear();
}

}  // namespace cloudsim
