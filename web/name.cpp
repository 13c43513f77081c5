#include "name.h"

#include "failure.h"

namespace web {
namespace {

constexpr size_t kLongestName = 255;
constexpr size_t kLongestPath = 4096;

/** Bytes of the character at `at`, 0 when there is no valid one. */
size_t CharacterSize(const std::string& text, size_t at) {
    const auto byte = [&](size_t i) {
        return i < text.size() ? static_cast<unsigned char>(text[i]) : 0U;
    };
    const unsigned first = byte(at);
    const size_t size = first < 0x80                     ? 1
                        : first >= 0xc2 && first <= 0xdf ? 2
                        : first >= 0xe0 && first <= 0xef ? 3
                        : first >= 0xf0 && first <= 0xf4 ? 4
                                                         : 0;
    for (size_t i = 1; i < size; ++i) {
        if ((byte(at + i) & 0xc0) != 0x80) {
            return 0;
        }
    }
    const unsigned second = byte(at + 1);
    const bool overlong = (first == 0xe0 && second < 0xa0) || (first == 0xf0 && second < 0x90);
    const bool surrogate = first == 0xed && second > 0x9f;
    const bool beyond = first == 0xf4 && second > 0x8f;
    return overlong || surrogate || beyond ? 0 : size;
}

bool IsPlain(unsigned char c) {
    return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9') || c == '-' ||
           c == '.' || c == '_';
}

}  // namespace

bool IsUtf8(const std::string& text) {
    for (size_t at = 0; at < text.size();) {
        const size_t size = CharacterSize(text, at);
        if (size == 0) {
            return false;
        }
        at += size;
    }
    return true;
}

namespace {

/** What is wrong with a name; null for a name that is fine. */
const char* Fault(const std::string& name) {
    if (name.empty() || name == "." || name == "..") {
        return "That is no name for a file or a folder.";
    }
    if (name.size() > kLongestName) {
        return "The name is too long.";
    }
    if (name.find('/') != std::string::npos || name.find('\0') != std::string::npos ||
        !IsUtf8(name)) {
        return "The name has a character that names cannot have.";
    }
    return nullptr;
}

}  // namespace

bool IsName(const std::string& name) {
    return Fault(name) == nullptr;
}

const std::string& CheckName(const std::string& name) {
    if (const char* fault = Fault(name)) {
        throw Failure(422, fault).Advise("Choose another name.");
    }
    return name;
}

const std::string& CheckPath(const std::string& path) {
    if (path.size() > kLongestPath) {
        throw Failure(422, "The path is too long.");
    }
    if (path.empty() || path[0] != '/') {
        throw Failure(422, "That is no path.");
    }
    for (size_t at = 1; at < path.size();) {
        const size_t slash = path.find('/', at);
        CheckName(path.substr(at, slash - at));
        if (slash == std::string::npos) {
            break;
        }
        at = slash + 1;
        if (at == path.size()) {
            throw Failure(422, "That is no path.");
        }
    }
    return path;
}

Split SplitPath(const std::string& path) {
    const size_t slash = CheckPath(path).rfind('/');
    return {slash == 0 ? "/" : path.substr(0, slash), CheckName(path.substr(slash + 1))};
}

std::string Join(const std::string& folder, const std::string& name) {
    return CheckPath(folder) + (folder == "/" ? "" : "/") + CheckName(name);
}

bool IsWithin(const std::string& path, const std::string& folder) {
    return path == folder || folder == "/" || path.compare(0, folder.size() + 1, folder + "/") == 0;
}

namespace {

std::string FileName(const std::string& name) {
    static const char kDigits[] = "0123456789ABCDEF";
    std::string escaped;
    for (const char c : name) {
        const auto byte = static_cast<unsigned char>(c);
        if (IsPlain(byte)) {
            escaped += c;
        } else {
            escaped += {'%', kDigits[byte >> 4], kDigits[byte & 15]};
        }
    }
    return "; filename*=UTF-8''" + escaped;
}

}  // namespace

std::string Attachment(const std::string& name) {
    return "attachment" + FileName(name);
}

std::string Inline(const std::string& name) {
    return "inline" + FileName(name);
}

}  // namespace web
