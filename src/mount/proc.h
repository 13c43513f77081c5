/** Waiting for processes that were told to end. */
#ifndef ZYROVFS_MOUNT_PROC_H
#define ZYROVFS_MOUNT_PROC_H

#include <sys/types.h>

namespace ZYROVFS {

/** Looks up to `polls` times, half a second apart, whether the process is gone. */
void WaitForEnd(pid_t pid, int polls);

}  // namespace ZYROVFS

#endif
