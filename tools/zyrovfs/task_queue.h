/** What stands in a user's queues, for people to see. */
#ifndef ZYROVFS_TOOLS_TASK_QUEUE_H
#define ZYROVFS_TOOLS_TASK_QUEUE_H

#include <string>
#include <vector>

namespace tool {

struct TaskEntry {
    std::string id;
    int pid;
    bool alive;
    int place;  ///< from 1, as the library counts it for this job; 0 for a process that has ended
};

/** Types of which the acting user has queues, sorted. */
std::vector<std::string> TaskNames();

/** All entries of a queue, none for a queue that is not there. False when it cannot be read. */
bool ReadTasks(const std::string& name, std::vector<TaskEntry>& entries);

/**
 * Takes one entry out at once: the library's clean-up keeps the whole queue waiting for seconds,
 * which is for those who died in it. False when the queue cannot be read or written.
 */
bool RemoveTask(const std::string& name, const std::string& id, int pid);

}  // namespace tool

#endif
