#include "fuse_conf.h"

#include <sys/stat.h>

#include <cerrno>
#include <climits>
#include <cstdlib>
#include <cstring>
#include <sstream>

#include "file.h"

namespace tool {
namespace {

constexpr const char* kFile = "/etc/fuse.conf";
/** Begins with a newline of its own, so that it can follow a file whose last line has none and be
 * taken away again without a trace. */
constexpr const char* kBlock = "\n# Set by: zyrovfs host install\nuser_allow_other\n";

std::string Trim(const std::string& line) {
    const size_t first = line.find_first_not_of(" \t\r");
    return first == std::string::npos
               ? ""
               : line.substr(first, line.find_last_not_of(" \t\r") - first + 1);
}

/** Replaces what the file or the link in its place leads to, and keeps its mode. */
bool Replace(const std::string& content, std::string& problem) {
    char real[PATH_MAX];
    struct stat info {};
    if (realpath(kFile, real) == nullptr || stat(real, &info) < 0 ||
        !ReplaceFile(real, content, info.st_mode & 07777)) {
        problem = std::string("Writing ") + kFile + " failed: " + std::strerror(errno);
        return false;
    }
    return true;
}

}  // namespace

bool FuseAllowsOther() {
    std::string content;
    ReadFile(kFile, content);
    std::istringstream lines(content);
    for (std::string line; std::getline(lines, line);) {
        if (Trim(line) == "user_allow_other") {
            return true;
        }
    }
    return false;
}

bool AllowOther(std::string& problem) {
    if (FuseAllowsOther()) {
        return true;
    }
    std::string content;
    if (!ReadFile(kFile, content)) {
        problem = std::string("Reading ") + kFile + " failed: " + std::strerror(errno) +
                  "; it comes with the package fuse3";
        return false;
    }
    return Replace(content + kBlock, problem);
}

bool DisallowOther(std::string& problem) {
    std::string content;
    if (!ReadFile(kFile, content)) {
        return true;
    }
    const size_t at = content.find(kBlock);
    if (at == std::string::npos) {
        return true;
    }
    return Replace(content.erase(at, std::strlen(kBlock)), problem);
}

}  // namespace tool
