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

/** All entries of a queue, none for a queue that is not there. False when it cannot be read. */
bool ReadTasks(const std::string& name, std::vector<TaskEntry>& entries);

}  // namespace tool

#endif
