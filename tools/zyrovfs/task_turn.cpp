#include "task_turn.h"

#include <unistd.h>
#include <zyrovfs/task.h>

#include <climits>

namespace tool {

Turn WaitForTurn(const std::string& name, const std::string& id, unsigned int limit,
                 const std::function<void(int64_t place)>& tell,
                 const std::function<bool()>& pause) {
    constexpr int kMostFailures = 5;
    ZYROVFS::TaskMgr tasks(limit);
    ZYROVFS::TaskMgr without_limit(UINT_MAX);  // tells a place to one who has to wait, too
    int failures = 0;
    while (tasks.IsRunnable(name.c_str(), id.c_str(), getpid(), nullptr, nullptr) <= 0) {
        const int64_t place =
            without_limit.IsRunnable(name.c_str(), id.c_str(), getpid(), nullptr, nullptr);
        // Without a place the entry was lost and has been queued again, or the registry fails.
        failures = place > 0 ? 0 : failures + 1;
        if (failures == kMostFailures) {
            return Turn::kQueueFailed;
        }
        if (place > 0) {
            tell(place);
        }
        if (pause()) {
            return Turn::kStopped;
        }
    }
    return Turn::kCame;
}

}  // namespace tool
