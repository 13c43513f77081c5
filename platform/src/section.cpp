#include <fcntl.h>

#include <string_view>

#include "containers.h"
#include "support.h"
#include "zosplatform/file.h"

namespace {

std::string_view Trim(std::string_view text) {
    constexpr std::string_view kBlanks = " \t\r\v\f";
    const size_t begin = text.find_first_not_of(kBlanks);
    if (begin == std::string_view::npos) {
        return {};
    }
    return text.substr(begin, text.find_last_not_of(kBlanks) - begin + 1);
}

/** Takes one line off the front of `rest`. Texts end at a NUL, as everything that C callers get. */
std::string_view NextLine(std::string_view& rest) {
    const size_t end = rest.find('\n');
    std::string_view line = rest.substr(0, end);
    rest.remove_prefix(end == std::string_view::npos ? rest.size() : end + 1);
    return Trim(line.substr(0, line.find('\0')));
}

void Parse(std::string_view rest, std::string_view section, zos::TextMap& values) {
    bool inside = false;
    while (!rest.empty()) {
        const std::string_view line = NextLine(rest);
        if (line.empty() || line.front() == '#' || line.front() == ';') {
            continue;
        }
        if (line.front() == '[' && line.back() == ']') {
            inside = line.substr(1, line.size() - 2) == section;
            continue;
        }
        const size_t equals = line.find('=');
        const std::string_view key = Trim(line.substr(0, equals));
        if (inside && equals != std::string_view::npos && !key.empty()) {
            values[std::string(key)] = Trim(line.substr(equals + 1));
        }
    }
}

}  // namespace

int YLIBCFileGetSection(const char* path, const char* section, PYLIBCSZHASH* hash) {
    constexpr int kFailed = -1;
    if (path == nullptr || section == nullptr || hash == nullptr || *hash == nullptr) {
        SET_PLATFORM_ERROR(ZOS_ERR_BAD_PARAMETER);
        return kFailed;
    }
    return zos::OrOutOfMemory(kFailed, [&] {
        zos::TextMap& values = (*hash)->values;
        values.clear();
        const zos::Fd fd = zos::OpenRegular(AT_FDCWD, path, 0);
        std::string text;
        if (!fd || !zos::ReadAll(fd.Get(), text)) {
            SET_SYSTEM_ERROR(ZOS_ERR_OPEN_FAILED);
            return kFailed;
        }
        Parse(text, section, values);
        return static_cast<int>(values.size());
    });
}
