#include <algorithm>

#include "directory.h"
#include "fold.h"

namespace zos {
namespace {

struct Match {
    std::string key;
    const DirectoryEntry* entry;
};

bool Matches(const std::string& key, const std::string& text, bool prefix) {
    return prefix ? key.compare(0, text.size(), text) == 0 : key.find(text) != std::string::npos;
}

/** Names that differ in case alone keep one order. */
bool IsBefore(const Match& a, const Match& b) {
    const int order = a.key.compare(b.key);
    return order != 0 ? order < 0 : a.entry->name < b.entry->name;
}

}  // namespace

int SelectPage(const Directory& directory, const PageRequest& request,
               std::vector<const DirectoryEntry*>& page) {
    const std::string text = FoldCase(request.text == nullptr ? "" : request.text);
    std::vector<Match> matches;
    for (const DirectoryEntry& entry : directory) {
        std::string key = FoldCase(entry.name.c_str());
        if (Matches(key, text, request.prefix)) {
            matches.push_back({std::move(key), &entry});
        }
    }
    const auto size = static_cast<std::ptrdiff_t>(matches.size());
    const auto start = std::min<std::ptrdiff_t>(request.start, size);
    const auto end = request.limit < 0 ? size : std::min(start + request.limit, size);
    // Only the page is put in order: what lies before it is set aside, what lies behind it stays.
    const auto begin = matches.begin();
    std::nth_element(begin, begin + start, matches.end(), IsBefore);
    std::partial_sort(begin + start, begin + end, matches.end(), IsBefore);
    std::transform(begin + start, begin + end, std::back_inserter(page),
                   [](const Match& match) { return match.entry; });
    return static_cast<int>(size);
}

}  // namespace zos
