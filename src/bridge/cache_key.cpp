#include "bridge/cache_key.h"

#include <glib.h>
#include <zosplatform/text.h>

#include <atomic>
#include <functional>
#include <memory>

#include "core/handle.h"

namespace ZYROCloud {

namespace {

using UniqueGText = std::unique_ptr<char, ZYROVFS::FreeWith<g_free>>;

std::atomic<bool> caseless_keys{false};

/** A call per letter of a path would cost more than the look into the map. */
constexpr char ToLower(char c) {
    return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c;
}

std::string Fold(const std::string& text) {
    std::string folded(text);
    unsigned char all = 0;
    for (char& c : folded) {
        all |= static_cast<unsigned char>(c);
        c = ToLower(c);
    }
    if (all < 0x80) {
        return folded;
    }
    const UniqueGText valid(g_utf8_make_valid(text.c_str(), -1));
    return UniqueGText(g_utf8_casefold(valid.get(), -1)).get();
}

}  // namespace

bool IsCaseless() {
    return caseless_keys;
}

void SetCaseless(bool caseless) {
    caseless_keys = caseless;
}

size_t KeyHash::operator()(const ZYROCloud_CacheKey& key) const {
    return std::hash<std::string>()(caseless ? Fold(key.text) : key.text);
}

bool KeyEqual::operator()(const ZYROCloud_CacheKey& a, const ZYROCloud_CacheKey& b) const {
    return a.text == b.text ||
           (caseless && YLIBCUnicodeUTF8StrCaseCmp(a.text.c_str(), b.text.c_str()) == 0);
}

}  // namespace ZYROCloud

bool operator<(const ZYROCloud_CacheKey& a, const ZYROCloud_CacheKey& b) {
    return ZYROCloud::IsCaseless() ? YLIBCUnicodeUTF8StrCaseCmp(a.text.c_str(), b.text.c_str()) < 0
                                   : a.text < b.text;
}
