/** A hold on a backend's cache for the length of a scope. */
#ifndef ZYROVFS_BRIDGE_CACHE_HOLD_H
#define ZYROVFS_BRIDGE_CACHE_HOLD_H

#include "zyrovfs/zyrocloud.h"

namespace ZYROCloud {

/**
 * Locks the cache. Entry_Add of a new path ends the hold early, as it does for every caller of
 * ZYROCloud_Cache_Lock; the unlock at the end of the scope is then one too many, and harmless.
 */
class CacheHold {
  public:
    explicit CacheHold(ZYROCloud_Cache* cache) : cache_(cache) { ZYROCloud_Cache_Lock(&cache_); }
    CacheHold(const CacheHold&) = delete;
    CacheHold& operator=(const CacheHold&) = delete;
    ~CacheHold() { ZYROCloud_Cache_Unlock(&cache_); }

  private:
    ZYROCloud_Cache* cache_;
};

}  // namespace ZYROCloud

#endif
