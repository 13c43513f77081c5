#include "zosplatform/ea.h"

#include <cstring>
#include <iterator>

#include <algorithm>

namespace {

constexpr const char* kFolder = "@ZyroEA";
constexpr const char* kStreams[] = {"@ZyroResource", "@ZyroEAStream"};

bool EndsWith(const char* text, const char* end) {
    const size_t length = strlen(text), tail = strlen(end);
    return length >= tail && strcmp(text + length - tail, end) == 0;
}

}  // namespace

int ZYROEAIsHiddenFile(const char* name) {
    if (name == nullptr) {
        return 0;
    }
    const bool stream = std::any_of(std::begin(kStreams), std::end(kStreams),
                                    [name](const char* end) { return EndsWith(name, end); });
    return stream || strcmp(name, kFolder) == 0 ? 1 : 0;
}
