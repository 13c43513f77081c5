#include "task_queue.h"

#include <zosplatform/process.h>
#include <zyrovfs/task.h>

#include <algorithm>

namespace tool {
namespace {

/** Entries of one process take no place before each other. */
void CountPlaces(std::vector<TaskEntry>& entries) {
    for (auto entry = entries.begin(); entry != entries.end(); ++entry) {
        entry->alive = YLIBCProcAlive(entry->pid) != 0;
        const auto before = std::count_if(entries.begin(), entry, [&](const TaskEntry& other) {
            return other.alive && other.pid != entry->pid;
        });
        entry->place = entry->alive ? static_cast<int>(before) + 1 : 0;
    }
}

}  // namespace

bool ReadTasks(const std::string& name, std::vector<TaskEntry>& entries) {
    entries.clear();
    std::vector<ZYROVFS::TaskQueueEntry> lines;
    if (!ZYROVFS::ReadTaskQueue(name.c_str(), lines)) {
        return false;
    }
    for (const ZYROVFS::TaskQueueEntry& line : lines) {
        entries.push_back({line.id, line.pid, false, 0});
    }
    CountPlaces(entries);
    return true;
}

}  // namespace tool
