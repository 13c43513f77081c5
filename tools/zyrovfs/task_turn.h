/** Waiting for one's turn in a queue of the library's registry. */
#ifndef ZYROVFS_TOOLS_TASK_TURN_H
#define ZYROVFS_TOOLS_TASK_TURN_H

#include <cstdint>
#include <functional>
#include <string>

namespace tool {

enum class Turn { kCame, kStopped, kQueueFailed };

/**
 * Waits until this process's job `id` in the queue `name` is one of the first `limit` that live.
 * `tell` hears the job's place each time that it is looked up; `pause` lets some time pass and
 * answers true to give the wait up.
 */
Turn WaitForTurn(const std::string& name, const std::string& id, unsigned int limit,
                 const std::function<void(int64_t place)>& tell,
                 const std::function<bool()>& pause);

}  // namespace tool

#endif
