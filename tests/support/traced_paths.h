/** What a command touches, as strace tells it. */
#ifndef ZYROVFS_TESTS_TRACED_PATHS_H
#define ZYROVFS_TESTS_TRACED_PATHS_H

#include <filesystem>
#include <regex>
#include <set>
#include <sstream>
#include <string>

#include "support/machine.h"

namespace traced_paths {

/** Runs in front of a command: the tracer is no ancestor of it, and ends with its last process. */
inline std::string Tracing(const std::string& output) {
    return "strace -D -f -y -qq -e trace=%file -o " + output + " ";
}

/** Absolute paths of the calls in a trace; with `-y` a descriptor has its path behind it. */
inline std::set<std::string> Read(const std::string& trace) {
    static const std::regex named(R"re((?:(?:AT_FDCWD|\d+)<([^>]*)>, )?"([^"]+)")re");
    std::set<std::string> paths;
    std::istringstream lines(machine::Read(trace));
    for (std::string line; std::getline(lines, line);) {
        if (line.find("execve(") != std::string::npos) {
            continue;  // its arguments are no paths
        }
        for (std::sregex_iterator at(line.begin(), line.end(), named), end; at != end; ++at) {
            const std::string text = (*at)[2];
            const std::filesystem::path path = text[0] == '/'
                                                   ? std::filesystem::path(text)
                                                   : std::filesystem::path((*at)[1].str()) / text;
            if (path.is_absolute()) {
                paths.insert(path.lexically_normal());
            }
        }
    }
    return paths;
}

/** Each path and each folder on the way to one. */
inline std::set<std::string> Components(const std::set<std::string>& paths) {
    std::set<std::string> all;
    for (std::filesystem::path path : paths) {
        for (; path.has_relative_path(); path = path.parent_path()) {
            if (path.has_filename()) {
                all.insert(path);
            }
        }
    }
    return all;
}

}  // namespace traced_paths

#endif
