/** The mount lock of this process, on its way to the helper that works under it. */
#ifndef ZYROVFS_MOUNT_LOCK_H
#define ZYROVFS_MOUNT_LOCK_H

namespace ZYROVFS {

/** How this process holds the lock; a file of -1 when it does not. */
struct HeldLock {
    int fd = -1;
    int count = 0;
    int operation = 0;
};

HeldLock HeldMountLock();

/**
 * Holds the lock as the process does that handed its open file over: a lock by flock belongs to
 * that file, so it is held until both have let go. Does nothing in a process that holds it already.
 */
void AdoptMountLock(const HeldLock& lock);

}  // namespace ZYROVFS

#endif
