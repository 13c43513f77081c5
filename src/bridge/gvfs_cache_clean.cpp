#include <cstdlib>
#include <ctime>

#include "bridge/gvfs_cache.h"

namespace ZYROCloud {

namespace {

/**
 * One limit, eight hours if it were seconds. Each map measures with it in units of its own, which
 * are told at each; so a sweep is a flush of nearly everything, and backends use it as that.
 */
constexpr int64_t kLimit = 28800;

/** The stamp of the last name in the order of keys; the newest of equal ones. */
uint64_t LastStamp(const CacheStamps& names, uint64_t now) {
    auto last = names.begin();
    for (auto name = names.begin(); name != names.end(); ++name) {
        const bool newer = CacheAge(now, name->second) < CacheAge(now, last->second);
        if (last->first < name->first || (newer && !(name->first < last->first))) {
            last = name;
        }
    }
    return last->second;
}

}  // namespace

}  // namespace ZYROCloud

using namespace ZYROCloud;

int ZYROCloud_Cache_Entry_Clean(ZYROCloud_Cache* cache) {
    return WithCache(cache, true, [&] {
        const uint64_t now = CacheClock();
        const auto seconds = static_cast<uint64_t>(time(nullptr));
        // Microseconds against seconds.
        EraseIf(cache->entries, [&](const _ZYROCloud_CacheEntry& entry) {
            return entry.stamp == 0 || std::abs(static_cast<int64_t>(now) - entry.stamp) > kLimit;
        });
        // Microseconds, all of them: 28.8 ms.
        EraseIf(cache->absent, [&](uint64_t stamp) { return CacheAge(now, stamp) > kLimit; });
        EraseIf(cache->lists, [&](const CacheStamps& names) {
            return CacheAge(now, LastStamp(names, now)) > kLimit;
        });
        // Seconds against microseconds.
        EraseIf(cache->ori_lists, [&](const CacheStamps& names) {
            return seconds - LastStamp(names, now) > static_cast<uint64_t>(kLimit);
        });
        return true;
    });
}
