#include "diversion.h"

#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <sstream>

#include "file.h"
#include "run.h"

namespace tool {
namespace {

constexpr const char* kProgram = "/usr/bin/dpkg-divert";
constexpr const char* kSuffix = ".zyrovfs-stock";

bool Succeeded(const RunResult& result, const std::string& what, std::string& problem) {
    if (result.status == 0) {
        return true;
    }
    problem = what + " failed: " + result.output;
    while (!problem.empty() && problem.back() == '\n') {
        problem.pop_back();
    }
    return false;
}

}  // namespace

std::string DivertedPath(const std::string& path) {
    return path + kSuffix;
}

bool ListDiversions(std::vector<std::string>& paths, std::string& problem) {
    const RunResult result = Run({kProgram, "--list", std::string("*") + kSuffix});
    if (!Succeeded(result, "Listing dpkg's diversions", problem)) {
        return false;
    }
    // "local diversion of PATH to PATH.zyrovfs-stock", one a line.
    const std::string start = "local diversion of ";
    std::istringstream lines(result.output);
    for (std::string line; std::getline(lines, line);) {
        const size_t to = line.find(" to /");
        if (line.compare(0, start.size(), start) == 0 && to != std::string::npos) {
            paths.push_back(line.substr(start.size(), to - start.size()));
        }
    }
    return true;
}

bool Divert(const std::string& path, std::string& problem) {
    return Succeeded(Run({kProgram, "--local", "--quiet", "--rename", "--divert",
                          DivertedPath(path), "--add", path}),
                     "Diverting " + path, problem);
}

bool Undivert(const std::string& path, std::string& problem) {
    RemoveLeftover(path);
    if (unlink(path.c_str()) < 0 && errno != ENOENT) {
        problem = "Removing " + path + " failed: " + std::strerror(errno);
        return false;
    }
    return Succeeded(Run({kProgram, "--local", "--quiet", "--rename", "--divert",
                          DivertedPath(path), "--remove", path}),
                     "Bringing back " + path, problem);
}

}  // namespace tool
