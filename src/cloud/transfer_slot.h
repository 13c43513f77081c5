/** The slot between the two threads of a copy, under its one mutex. */
#ifndef ZYROVFS_CLOUD_TRANSFER_SLOT_H
#define ZYROVFS_CLOUD_TRANSFER_SLOT_H

#include <pthread.h>

#include <ctime>

#include "cloud/transfer.h"

namespace ZYROCloud {

/** The synchronisation objects and the buffer of one copy. */
class SlotInUse {
  public:
    SlotInUse();
    SlotInUse(const SlotInUse&) = delete;
    SlotInUse& operator=(const SlotInUse&) = delete;
    ~SlotInUse();
};

/** When a wait that begins now has lasted too long, by the wall clock. */
time_t SlotDeadline();

/** Holds the mutex. */
class SlotLock {
  public:
    SlotLock() { pthread_mutex_lock(&transfer.transfer_mutex); }
    SlotLock(const SlotLock&) = delete;
    SlotLock& operator=(const SlotLock&) = delete;
    ~SlotLock() { pthread_mutex_unlock(&transfer.transfer_mutex); }

    /** Waits for the state to leave `state`, at most until `deadline`, without the mutex. False
     * when the time ran out. */
    bool WaitWhile(SlotState state, pthread_cond_t& changed, time_t deadline) const;
};

/** Waits without the mutex for the state to leave `state`, for as long as that is cheaper than to
 * sleep. True when it has. */
bool AwaitShortly(SlotState state);

}  // namespace ZYROCloud

#endif
