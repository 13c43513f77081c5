/** Starts a program and keeps what it says. */
#ifndef ZYROVFS_TOOLS_RUN_H
#define ZYROVFS_TOOLS_RUN_H

#include <string>
#include <vector>

namespace tool {

struct RunResult {
    int status = -1;     ///< exit status; -1 when it did not start or was killed
    std::string output;  ///< standard output and error together
};

/** Runs the program at the absolute path `command[0]` with a plain environment, and waits. */
RunResult Run(const std::vector<std::string>& command);

}  // namespace tool

#endif
