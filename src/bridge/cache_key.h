/** Keys of the cache, and the maps that it is made of. */
#ifndef ZYROVFS_BRIDGE_CACHE_KEY_H
#define ZYROVFS_BRIDGE_CACHE_KEY_H

#include <iterator>
#include <string>
#include <unordered_map>
#include <utility>

/** A path, or a name in a directory. */
struct ZYROCloud_CacheKey {
    std::string text;
};

/** Byte by byte over the shorter length and then by length, or by YLIBCUnicodeUTF8StrCaseCmp. */
bool operator<(const ZYROCloud_CacheKey& a, const ZYROCloud_CacheKey& b);

namespace ZYROCloud {

/** How keys compare: one setting of the process, which the last Init of a cache decides. */
bool IsCaseless();
void SetCaseless(bool caseless);

/** Puts together what Unicode's case folding makes equal; KeyEqual then asks the platform. */
struct KeyHash {
    bool caseless;
    size_t operator()(const ZYROCloud_CacheKey& key) const;
};

/** Whether neither key is less. */
struct KeyEqual {
    bool caseless;
    bool operator()(const ZYROCloud_CacheKey& a, const ZYROCloud_CacheKey& b) const;
};

/**
 * By hash, since a tree of a million paths takes twenty reads of cold memory for one look. Keys are
 * ordered where the order counts, which is the last one of a directory. Several items may have one
 * key: where that is allowed, or because the setting has changed since they came.
 */
template <typename T>
using KeyMap = std::unordered_multimap<ZYROCloud_CacheKey, T, KeyHash, KeyEqual>;

template <typename T>
KeyMap<T> MakeKeyMap() {
    const bool caseless = IsCaseless();
    return KeyMap<T>(0, KeyHash{caseless}, KeyEqual{caseless});
}

/** Sorts a map anew when the setting has changed. Its items keep their places in memory. */
template <typename T>
void FollowSetting(KeyMap<T>& map) {
    if (map.hash_function().caseless == IsCaseless()) {
        return;
    }
    KeyMap<T> sorted = MakeKeyMap<T>();
    sorted.reserve(map.size());
    while (!map.empty()) {
        sorted.insert(map.extract(map.begin()));
    }
    map = std::move(sorted);
}

/** The one item of a key, or null. */
template <typename T>
T* FindKey(KeyMap<T>& map, const ZYROCloud_CacheKey& key) {
    const auto found = map.find(key);
    return found == map.end() ? nullptr : &found->second;
}

/** Erases the items for which `outdated` holds, and the room that they took. */
template <typename T, typename Outdated>
void EraseIf(KeyMap<T>& map, Outdated outdated) {
    for (auto item = map.begin(); item != map.end();) {
        item = outdated(item->second) ? map.erase(item) : std::next(item);
    }
    map.rehash(0);
}

/** The one item of a key, made when there is none. */
template <typename T>
T& FindOrAdd(KeyMap<T>& map, const ZYROCloud_CacheKey& key, T made) {
    T* const found = FindKey(map, key);
    return found != nullptr ? *found : map.emplace(key, std::move(made))->second;
}

}  // namespace ZYROCloud

#endif
