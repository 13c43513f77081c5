#include "bridge/gvfs_cache.h"

#include <sys/time.h>

#include <ctime>
#include <new>
#include <string>
#include <utility>

namespace ZYROCloud {

namespace {

/** For how long a path that was found missing is not asked for again. */
constexpr uint32_t kAbsentMicros = 1000000;

int MakeCache(ZYROCloud_Cache** cache, bool caseless) {
    SetCaseless(caseless);
    if (cache == nullptr) {
        return 0;
    }
    *cache = nullptr;
    return ZYROVFS::NoThrow(ZYROVFS::VFS_ERR_FAILED,
                            [&] {
                                *cache = new (std::nothrow) ZYROCloud_Cache;
                                return *cache != nullptr;
                            })
               ? 1
               : 0;
}

std::string FullPath(const std::string& dir, const char* name) {
    return (dir == "/" ? dir : dir + "/") + name;
}

}  // namespace

bool AddEntry(ZYROCloud_Cache& cache, const char* dir, UniqueFileInfo info) {
    ZYROCloud_CacheKey path{FullPath(dir, InfoName(info.get()))};
    if (!cache.absent.empty()) {
        cache.absent.erase(path);
    }
    _ZYROCloud_CacheEntry* const entry = FindKey(cache.entries, path);
    const int64_t now = time(nullptr);
    if (entry == nullptr) {
        cache.entries.emplace(std::move(path), _ZYROCloud_CacheEntry{std::move(info), now});
        return true;
    }
    // The record stays the same, for those who have it from Entry_Get.
    g_file_info_copy_into(info.get(), entry->info.get());
    entry->stamp = now;
    return false;
}

uint64_t CacheClock() {
    timeval now{};
    gettimeofday(&now, nullptr);
    const uint32_t micros =
        static_cast<uint32_t>(now.tv_sec) * 1000000U + static_cast<uint32_t>(now.tv_usec);
    return static_cast<uint64_t>(static_cast<int64_t>(static_cast<int32_t>(micros)));
}

}  // namespace ZYROCloud

using namespace ZYROCloud;

int ZYROCloud_Cache_Init(ZYROCloud_Cache** cache) {
    return MakeCache(cache, false);
}

int ZYROCloud_Cache_CassLess_Init(ZYROCloud_Cache** cache) {
    return MakeCache(cache, true);
}

int ZYROCloud_Cache_Destroy(ZYROCloud_Cache** cache) {
    if (cache == nullptr || *cache == nullptr) {
        return 0;
    }
    delete *cache;
    return 1;
}

int ZYROCloud_Cache_Lock(ZYROCloud_Cache** cache) {
    if (cache == nullptr || *cache == nullptr) {
        return 0;
    }
    (*cache)->lock.lock();
    return 1;
}

int ZYROCloud_Cache_Unlock(ZYROCloud_Cache** cache) {
    if (cache == nullptr || *cache == nullptr) {
        return 0;
    }
    (*cache)->lock.unlock();
    return 1;
}

int ZYROCloud_Cache_Entry_Get(ZYROCloud_Cache* cache, const char* path, GFileInfo** out) {
    return WithCache(cache, path != nullptr && out != nullptr, [&] {
        const _ZYROCloud_CacheEntry* const entry = FindKey(cache->entries, {path});
        if (entry != nullptr) {
            *out = entry->info.get();
        }
        return entry != nullptr;
    });
}

int ZYROCloud_Cache_Entry_None_Get(ZYROCloud_Cache* cache, const char* path) {
    return WithCache(cache, path != nullptr, [&] {
        const auto mark = cache->absent.find({path});
        if (mark == cache->absent.end()) {
            return false;
        }
        if (CacheAge(CacheClock(), mark->second) <= kAbsentMicros) {
            return true;
        }
        cache->absent.erase(mark);
        return false;
    });
}

int ZYROCloud_Cache_Entry_SetMTime(ZYROCloud_Cache* cache, const char* path, long mtime) {
    return WithCache(cache, path != nullptr && mtime != 0, [&] {
        const _ZYROCloud_CacheEntry* const entry = FindKey(cache->entries, {path});
        if (entry != nullptr) {
            g_file_info_set_attribute_uint64(entry->info.get(), G_FILE_ATTRIBUTE_TIME_MODIFIED,
                                             static_cast<guint64>(mtime));
        }
        return entry != nullptr;
    });
}

int ZYROCloud_Cache_Entry_Add(ZYROCloud_Cache* cache, const char* dir, GFileInfo* info) {
    return WithCache(cache, dir != nullptr && InfoName(info) != nullptr, [&] {
        if (AddEntry(*cache, dir, UniqueFileInfo(g_file_info_dup(info)))) {
            // A new entry ends a hold of the caller, too. Last: others may come in from here on.
            cache->lock.unlock();
        }
        return true;
    });
}

int ZYROCloud_Cache_Entry_Remove(ZYROCloud_Cache* cache, const char* path, bool mark_absent) {
    return WithCache(cache, path != nullptr, [&] {
        const ZYROCloud_CacheKey key{path};
        cache->entries.erase(key);
        if (mark_absent) {
            FindOrAdd(cache->absent, key, uint64_t()) = CacheClock();
        } else {
            cache->absent.erase(key);
        }
        RemoveListing(*cache, key);
        return true;
    });
}
