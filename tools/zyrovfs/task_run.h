/** A command that takes its turn in a queue. */
#ifndef ZYROVFS_TOOLS_TASK_RUN_H
#define ZYROVFS_TOOLS_TASK_RUN_H

#include <string>
#include <vector>

namespace tool {

struct TaskRun {
    std::string name;
    std::string id;  ///< empty: one of our own making
    unsigned int limit = 3;
    std::vector<std::string> command;
};

/**
 * Queues the command for the acting user, tells its place on standard error while it waits, runs it
 * as that user, and takes its entry out. Answers the command's exit status, 128 and the number of
 * the signal that ended it or the wait, 126 or 127 for a command that cannot be run, or kFailure.
 */
int RunTask(unsigned int uid, const TaskRun& run, bool json);

}  // namespace tool

#endif
