#include "bridge/cache_lock.h"

#include <gtest/gtest.h>

#include <future>
#include <mutex>
#include <thread>
#include <vector>

namespace ZYROCloud {
namespace {

TEST(CacheLock, KeepsThreadsApart) {
    CacheLock lock;
    int count = 0;
    std::vector<std::thread> threads;
    for (int number = 0; number < 4; ++number) {
        threads.emplace_back([&] {
            for (int i = 0; i < 1000; ++i) {
                const std::lock_guard<CacheLock> outer(lock);
                const std::lock_guard<CacheLock> inner(lock);
                ++count;
            }
        });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    EXPECT_EQ(count, 4000);
}

TEST(CacheLock, AnUnlockTooManyIsHarmless) {
    CacheLock lock;
    lock.unlock();
    lock.lock();
    lock.unlock();
    lock.unlock();
    std::thread([&] { const std::lock_guard<CacheLock> hold(lock); }).join();
    lock.lock();
    lock.unlock();
}

TEST(CacheLock, AnUnlockEndsNoHoldOfAnotherThread) {
    CacheLock lock;
    std::promise<void> held;
    std::promise<void> unlocked;
    int written = 0;
    std::thread holder([&] {
        const std::lock_guard<CacheLock> hold(lock);
        held.set_value();
        unlocked.get_future().wait();
        written = 1;
    });
    held.get_future().wait();
    lock.unlock();
    std::thread reader([&] {
        const std::lock_guard<CacheLock> hold(lock);
        EXPECT_EQ(written, 1);
    });
    unlocked.set_value();
    holder.join();
    reader.join();
}

TEST(CacheLock, MayEndWhileItsThreadHoldsIt) {
    CacheLock lock;
    lock.lock();
    lock.lock();
}

}  // namespace
}  // namespace ZYROCloud
