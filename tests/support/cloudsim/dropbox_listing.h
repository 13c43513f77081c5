/** What a listing of Dropbox saw, and how far its cursors are. */
#ifndef ZYROVFS_TESTS_CLOUDSIM_DROPBOX_LISTING_H
#define ZYROVFS_TESTS_CLOUDSIM_DROPBOX_LISTING_H

#include <map>
#include <memory>
#include <string>
#include <vector>

#include "support/cloudsim/http.h"

namespace cloudsim {

class Account;

namespace dropbox {

struct Entry {
    std::string path;  ///< in lower case
    std::string mark;  ///< changes with the item
    std::string text;  ///< one JSON object
};

struct Listing {
    Account* account = nullptr;
    std::string folder;  ///< id
    bool recursive = false, deleted = false;
    size_t limit = 1;
    std::vector<Entry> seen;     ///< all of it
    std::vector<size_t> shown;   ///< of `seen`, what the pages show
    std::vector<Entry> removed;  ///< shown behind them

    std::map<size_t, std::string> cursors;  ///< by page
    std::map<size_t, Reply> pages;          ///< a benchmark asks for the same ones again and again

    size_t Count() const { return shown.size() + removed.size(); }
    const Entry& At(size_t i) const {
        return i < shown.size() ? seen[shown[i]] : removed[i - shown.size()];
    }
};

/** Without a listing it was given up. */
struct Cursor {
    const Account* account = nullptr;
    std::shared_ptr<Listing> listing;
    size_t page = 0;  ///< the next one
};

}  // namespace dropbox
}  // namespace cloudsim

#endif
