/** The recursive lock of a backend's cache. */
#ifndef ZYROVFS_BRIDGE_CACHE_LOCK_H
#define ZYROVFS_BRIDGE_CACHE_LOCK_H

#include <glib.h>

#include <atomic>
#include <thread>

namespace ZYROCloud {

/**
 * A GRecMutex that knows its owner, because the cache unlocks it more often than it was locked:
 * adding an entry ends two holds, its own and one of its caller's, and the caller then unlocks what
 * is free by that time, or another thread's. Such an unlock is undefined behaviour for the mutex,
 * so it does not get there; a thread ends its own holds and no others.
 *
 * What a caller sees stays: from its first new entry on, other threads come in between.
 */
class CacheLock {
  public:
    CacheLock() { g_rec_mutex_init(&mutex_); }
    CacheLock(const CacheLock&) = delete;
    CacheLock& operator=(const CacheLock&) = delete;
    /** Not while another thread holds it. */
    ~CacheLock() {
        while (IsMine()) {
            unlock();
        }
        g_rec_mutex_clear(&mutex_);
    }

    // Named for std::lock_guard.

    void lock() {
        g_rec_mutex_lock(&mutex_);
        owner_.store(std::this_thread::get_id(), std::memory_order_relaxed);
        ++holds_;
    }

    /** Does nothing when the calling thread has no hold. */
    void unlock() {
        if (!IsMine()) {
            return;
        }
        if (--holds_ == 0) {
            owner_.store(std::thread::id(), std::memory_order_relaxed);
        }
        g_rec_mutex_unlock(&mutex_);
    }

  private:
    /** The answer cannot change behind the asking thread: only it puts itself in or out. */
    bool IsMine() const {
        return owner_.load(std::memory_order_relaxed) == std::this_thread::get_id();
    }

    GRecMutex mutex_;
    std::atomic<std::thread::id> owner_{};
    unsigned int holds_ = 0;  ///< the owner's; under the mutex
};

}  // namespace ZYROCloud

#endif
