/** Listings that come in pages. */
#ifndef ZYROVFS_CLOUD_PAGER_H
#define ZYROVFS_CLOUD_PAGER_H

#include <json/value.h>

#include <algorithm>
#include <string>
#include <unordered_set>
#include <utility>

#include "core/json_member.h"
#include "core/log.h"
#include "core/source_line.h"
#include "zyrovfs/cloud.h"

namespace ZYROCloud {

/** Moves the items of `page[member]` that `keep` accepts to the end of the array `out`. A page
 * without the member has no items; throws Json::LogicError when it is no array. `keep` may be asked
 * twice about an item. */
template <typename Keep>
void MoveItems(Json::Value& page, const char* member, Json::Value& out, Keep keep) {
    Json::Value items;
    if (page.isMember(member)) {
        items.swap(page[member]);
    }
    if (!items.isNull() && !items.isArray()) {
        Json::throwLogicError("the items of a page are no array");
    }
    const auto is_kept = [&keep](const Json::Value& item) { return keep(item); };
    if (out.empty() && std::all_of(items.begin(), items.end(), is_kept)) {
        // Most folders are one page of visible items: nothing needs to be moved one by one.
        if (!items.empty()) {
            out.swap(items);
        }
        return;
    }
    for (Json::Value& item : items) {
        if (keep(static_cast<const Json::Value&>(item))) {
            out.append(std::move(item));
        }
    }
}

/**
 * Appends the items of all pages to `out`, which becomes an array if it is none. `fetch(page)` gets
 * the next page, `more(page)` says whether there is another one and remembers where it begins, be
 * it an offset, a token or a cursor; it sees the page without its items. Only one page is held at a
 * time. A page that cannot be had ends the listing with false; what came before it stays.
 */
template <typename Fetch, typename Keep, typename More>
bool ForEachPage(const char* member, Json::Value& out, Fetch fetch, Keep keep, More more) {
    if (!out.isArray()) {
        out = Json::Value(Json::arrayValue);
    }
    for (bool again = true; again;) {
        Json::Value page;
        if (!fetch(page)) {
            return false;
        }
        MoveItems(page, member, out, keep);
        again = more(static_cast<const Json::Value&>(page));
    }
    return true;
}

/** Whether the file tree shows an item with its name in `member`. One without a name, or that is no
 * item at all, does not end the listing of all others: whoever reads it has to look. */
inline bool IsShown(const Json::Value& item, const char* member) {
    return !Cloud::IsHiddenFilePath("", ZYROVFS::json::TextOf(item, member));
}

/** The places where pages of one listing began. */
class CursorGuard {
  public:
    /** To be asked before each page. False for a place that was there before: following it would
     * not end. Logged; the driver's record becomes VFS_ERR_CLOUD_FAILED, since what came so far is
     * not the whole folder. */
    bool Accept(Cloud& cloud, const std::string& cursor,
                ZYROVFS::SourceLine at = ZYROVFS::SourceLine::Here()) {
        if (seen_.insert(cursor).second) {
            return true;
        }
        LOG_ERROR_AT(at, "Listing goes in a circle, %s", cursor.c_str());
        cloud.SetError(ZYROVFS::VFS_ERR_CLOUD_FAILED, "");
        return false;
    }

  private:
    std::unordered_set<std::string> seen_;
};

}  // namespace ZYROCloud

#endif
