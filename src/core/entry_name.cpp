#include "core/entry_name.h"

#include <sys/random.h>

#include <cinttypes>
#include <cstdint>
#include <cstdio>

namespace ZYROVFS {

bool IsEntryName(const std::string& name) {
    return !name.empty() && name != "." && name != ".." && name.find('/') == std::string::npos &&
           name.find('\0') == std::string::npos;
}

EntryPath SplitPath(const std::string& path) {
    const size_t slash = path.find_last_of('/');
    if (slash == std::string::npos) {
        return {".", path};
    }
    return {slash == 0 ? "/" : path.substr(0, slash), path.substr(slash + 1)};
}

std::string RandomName(const std::string& name) {
    uint64_t number = 0;
    if (getrandom(&number, sizeof number, 0) != sizeof number) {
        return {};
    }
    char end[24];
    snprintf(end, sizeof end, ".%016" PRIx64, number);
    return name + end;
}

}  // namespace ZYROVFS
