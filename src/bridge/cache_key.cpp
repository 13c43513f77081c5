#include "bridge/cache_key.h"

#include <glib.h>
#include <zosplatform/text.h>

#include <algorithm>
#include <atomic>
#include <functional>
#include <memory>

#include "core/handle.h"

namespace ZYROCloud {

namespace {

using UniqueGText = std::unique_ptr<char, ZYROVFS::FreeWith<g_free>>;

std::atomic<bool> caseless_keys{false};

bool IsAscii(const std::string& text) {
    return std::all_of(text.begin(), text.end(), [](char c) { return (c & 0x80) == 0; });
}

std::string Fold(const std::string& text) {
    if (IsAscii(text)) {
        std::string folded(text);
        std::transform(folded.begin(), folded.end(), folded.begin(), g_ascii_tolower);
        return folded;
    }
    const UniqueGText valid(g_utf8_make_valid(text.c_str(), -1));
    const UniqueGText folded(g_utf8_casefold(valid.get(), -1));
    return folded.get();
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
    return caseless ? YLIBCUnicodeUTF8StrCaseCmp(a.text.c_str(), b.text.c_str()) == 0
                    : a.text == b.text;
}

}  // namespace ZYROCloud

bool operator<(const ZYROCloud_CacheKey& a, const ZYROCloud_CacheKey& b) {
    return ZYROCloud::IsCaseless() ? YLIBCUnicodeUTF8StrCaseCmp(a.text.c_str(), b.text.c_str()) < 0
                                   : a.text < b.text;
}
