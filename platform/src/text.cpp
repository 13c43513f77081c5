#include "zosplatform/text.h"

#include <glib.h>

#include <cstring>
#include <memory>

#include "fold.h"
#include "support.h"

namespace {

struct Free {
    void operator()(char* text) const { g_free(text); }
};

bool IsAscii(char c) {
    return static_cast<signed char>(c) >= 0;
}

}  // namespace

namespace zos {

std::string FoldCase(const char* text) {
    std::string key;
    for (; IsAscii(*text) && *text != '\0'; ++text) {
        key += g_ascii_tolower(*text);
    }
    while (*text != '\0') {
        const char* end = nullptr;
        g_utf8_validate(text, -1, &end);
        const std::unique_ptr<char, Free> folded(g_utf8_casefold(text, end - text));
        key += folded.get();
        if (*end != '\0') {
            key += *end++;
        }
        text = end;
    }
    return key;
}

}  // namespace zos

char* YLIBCStrTok(char* text, const char* delimiters, char** rest) {
    if (delimiters == nullptr || rest == nullptr || (text == nullptr && *rest == nullptr)) {
        return nullptr;
    }
    return strtok_r(text, delimiters, rest);
}

int YLIBCUnicodeUTF8StrCaseCmp(const char* a, const char* b) {
    if (a == nullptr || b == nullptr) {
        return (a != nullptr) - (b != nullptr);
    }
    // Most names are ASCII, or differ before the first letter that is not: no copy for those.
    for (; IsAscii(*a) && IsAscii(*b); ++a, ++b) {
        const int order = g_ascii_tolower(*a) - g_ascii_tolower(*b);
        if (order != 0 || *a == '\0') {
            return order;
        }
    }
    return zos::OrOutOfMemory(strcmp(a, b),
                              [&] { return zos::FoldCase(a).compare(zos::FoldCase(b)); });
}
