/** What a command touches, as strace tells it. */
#ifndef ZYROVFS_TESTS_TRACED_PATHS_H
#define ZYROVFS_TESTS_TRACED_PATHS_H

#include <filesystem>
#include <map>
#include <regex>
#include <sstream>
#include <string>

#include "support/machine.h"

namespace traced_paths {

/** Runs in front of a command: the tracer is no ancestor of it, and ends with its last process. */
inline std::string Tracing(const std::string& output) {
    return "strace -D -f -y -qq -e trace=%file -o " + output + " ";
}

/** Paths that were touched, and whether something was made, changed or removed there. */
using Touched = std::map<std::string, bool>;

/** The absolute paths of the calls in a trace, and each folder on the way to one. A folder is
 * changed by what is changed below it. */
inline Touched Read(const std::string& trace) {
    // With `-y` a descriptor has its path behind it.
    static const std::regex named(R"re((?:(?:AT_FDCWD|\d+)<([^>]*)>, )?"([^"]+)")re");
    static const std::regex changes(
        R"re(O_CREAT|\b(mkdir|rename|unlink|rmdir|symlink|link|mknod|chmod|chown)\w*\()re");
    Touched touched;
    std::istringstream lines(machine::Read(trace));
    for (std::string line; std::getline(lines, line);) {
        if (line.find("execve(") != std::string::npos) {
            continue;  // its arguments are no paths
        }
        const bool changed = std::regex_search(line, changes);
        for (std::sregex_iterator at(line.begin(), line.end(), named), end; at != end; ++at) {
            const std::string text = (*at)[2];
            std::filesystem::path path = text[0] == '/'
                                             ? std::filesystem::path(text)
                                             : std::filesystem::path((*at)[1].str()) / text;
            path = path.lexically_normal();
            path = path.has_filename() ? path : path.parent_path();
            for (; path.is_absolute() && path.has_relative_path(); path = path.parent_path()) {
                touched[path] |= changed;
            }
        }
    }
    return touched;
}

}  // namespace traced_paths

#endif
