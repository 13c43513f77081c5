/** What a backend's cache consists of. Its functions are those of zyrocloud.h. */
#ifndef ZYROVFS_BRIDGE_GVFS_CACHE_H
#define ZYROVFS_BRIDGE_GVFS_CACHE_H

#include <cstdint>
#include <mutex>

#include "bridge/cache_key.h"
#include "bridge/cache_lock.h"
#include "bridge/file_info.h"
#include "core/no_throw.h"
#include "zyrovfs/zyrocloud.h"

struct _ZYROCloud_CacheEntry {
    ZYROCloud::UniqueFileInfo info;
    int64_t stamp;  ///< seconds
};

namespace ZYROCloud {

/** Names of one directory, or paths, with the time at which each was stored; see CacheClock. */
using CacheStamps = KeyMap<uint64_t>;

}  // namespace ZYROCloud

struct ZYROCloud_Cache {
    /** By full path. */
    ZYROCloud::KeyMap<_ZYROCloud_CacheEntry> entries =
        ZYROCloud::MakeKeyMap<_ZYROCloud_CacheEntry>();
    /** The names in each directory. */
    ZYROCloud::KeyMap<ZYROCloud::CacheStamps> lists =
        ZYROCloud::MakeKeyMap<ZYROCloud::CacheStamps>();
    /** The display names in each directory, any number of times each. */
    ZYROCloud::KeyMap<ZYROCloud::CacheStamps> ori_lists =
        ZYROCloud::MakeKeyMap<ZYROCloud::CacheStamps>();
    /** Full paths that were found missing. */
    ZYROCloud::CacheStamps absent = ZYROCloud::MakeKeyMap<uint64_t>();
    /** Guards all four. */
    ZYROCloud::CacheLock lock;
};

namespace ZYROCloud {

/** Now in microseconds, of which the low 32 bits count, sign-extended. It wraps every 71 minutes.
 */
uint64_t CacheClock();

/** Microseconds from `stamp` to `now`, as far as 32 bits tell. */
inline uint32_t CacheAge(uint64_t now, uint64_t stamp) {
    return static_cast<uint32_t>(now) - static_cast<uint32_t>(stamp);
}

/**
 * Stores a record that has a name, and takes a mark of absence away; true for a new entry. Under
 * the lock. Entry_Add without its copy and its unlock: who fills a listing keeps others out until
 * it is whole.
 */
bool AddEntry(ZYROCloud_Cache& cache, const char* dir, UniqueFileInfo info);

/** Removes the listing of a directory and all below it that listings name. Under the lock. */
void RemoveListing(ZYROCloud_Cache& cache, ZYROCloud_CacheKey dir);

/** Runs `body`, which answers bool, under the lock, when all that it needs is `given`. 1 or 0. */
template <typename Body>
int WithCache(ZYROCloud_Cache* cache, bool given, Body body,
              ZYROVFS::SourceLine at = ZYROVFS::SourceLine::Here()) {
    if (cache == nullptr || !given) {
        return 0;
    }
    return ZYROVFS::NoThrow(
               ZYROVFS::VFS_ERR_FAILED,
               [&] {
                   const std::lock_guard<CacheLock> hold(cache->lock);
                   FollowSetting(cache->entries);
                   FollowSetting(cache->lists);
                   FollowSetting(cache->ori_lists);
                   FollowSetting(cache->absent);
                   return body();
               },
               at)
               ? 1
               : 0;
}

}  // namespace ZYROCloud

#endif
