/** Work that goes on when its request has been answered. */
#ifndef ZYROVFS_WEB_WORKER_H
#define ZYROVFS_WEB_WORKER_H

#include <functional>

namespace web {

/**
 * Starts a process that no web server waits for or ends: a session of its own, nobody's child, and
 * nothing of this one but its memory and the descriptors that it has opened itself. `work` must not
 * throw; the process ends with it. Failure with status 500.
 */
void StartWorker(const std::function<void()>& work);

}  // namespace web

#endif
