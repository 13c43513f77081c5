#include <utility>
#include <vector>

#include "bridge/gvfs_cache.h"

namespace ZYROCloud {

namespace {

using Listings = KeyMap<CacheStamps>;

/** The names of a directory, made when there are none. */
CacheStamps& NamesOf(Listings& listings, const ZYROCloud_CacheKey& dir) {
    CacheStamps& names = FindOrAdd(listings, dir, MakeKeyMap<uint64_t>());
    FollowSetting(names);
    return names;
}

/**
 * Removes one listing and the entries that it names; those that have listings themselves go to
 * `pending`. At the root no entry is found and none goes: their paths have one slash, not two.
 */
void RemoveNamed(ZYROCloud_Cache& cache, const CacheStamps& names, const std::string& parent,
                 std::vector<ZYROCloud_CacheKey>& pending) {
    for (const auto& item : names) {
        ZYROCloud_CacheKey child{parent + "/" + item.first.text};
        if (cache.entries.erase(child) == 0) {
            continue;
        }
        cache.absent.erase(child);
        if (cache.lists.count(child) != 0 || cache.ori_lists.count(child) != 0) {
            pending.push_back(std::move(child));
        }
    }
}

}  // namespace

void RemoveListing(ZYROCloud_Cache& cache, ZYROCloud_CacheKey dir) {
    // A list rather than recursion: remote folders nest as deep as others please.
    std::vector<ZYROCloud_CacheKey> pending{std::move(dir)};
    while (!pending.empty()) {
        const ZYROCloud_CacheKey next = std::move(pending.back());
        pending.pop_back();
        cache.ori_lists.erase(next);
        for (auto found = cache.lists.find(next); found != cache.lists.end();
             found = cache.lists.find(next)) {
            const auto listing = cache.lists.extract(found);
            RemoveNamed(cache, listing.mapped(), next.text, pending);
        }
    }
}

}  // namespace ZYROCloud

using namespace ZYROCloud;

int ZYROCloud_Cache_List_Add(ZYROCloud_Cache* cache, const char* dir, bool ori, GFileInfo* info) {
    const char* const name = InfoName(info);
    const char* const display_name = InfoDisplayName(info);
    return WithCache(cache, dir != nullptr && name != nullptr && display_name != nullptr, [&] {
        const ZYROCloud_CacheKey key{dir};
        const uint64_t now = CacheClock();
        FindOrAdd(NamesOf(cache->lists, key), {name}, now) = now;
        if (ori) {
            NamesOf(cache->ori_lists, key).emplace(ZYROCloud_CacheKey{display_name}, now);
        }
        return true;
    });
}

int ZYROCloud_Cache_List_Remove(ZYROCloud_Cache* cache, const char* dir) {
    return WithCache(cache, dir != nullptr, [&] {
        RemoveListing(*cache, {dir});
        return true;
    });
}

int ZYROCloud_Cache_List_Ori_Get(ZYROCloud_Cache* cache, const char* dir,
                                 const char* display_name) {
    return WithCache(cache, dir != nullptr && display_name != nullptr, [&] {
        CacheStamps* const names = FindKey(cache->ori_lists, {dir});
        if (names == nullptr) {
            return false;
        }
        FollowSetting(*names);
        return names->count({display_name}) != 0;
    });
}
