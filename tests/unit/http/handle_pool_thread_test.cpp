// The pool among threads and forks.
#include <gtest/gtest.h>

#include <atomic>
#include <set>
#include <thread>

#include "http/handle_pool.h"
#include "support/scratch.h"

namespace ZYROCloud {
namespace {

HandleKey Key(unsigned int user = 1) {
    return {user, "roots", "", "", nullptr};
}

TEST(PoolThreads, SeveralThreadsBorrowAtOnceAndNoneGetsAHandleOfAnother) {
    HandlePool pool;
    constexpr int kThreads = 8;
    constexpr int kPasses = 200;
    std::mutex mutex;
    std::set<CURL*> lent;
    int twice = 0;
    const auto mark = [&](CURL* curl, bool out) {
        const std::lock_guard<std::mutex> lock(mutex);
        twice += out ? !lent.insert(curl).second : static_cast<int>(lent.erase(curl) != 1);
    };
    std::vector<std::thread> threads;
    for (int i = 0; i < kThreads; ++i) {
        threads.emplace_back([&, i] {
            for (int pass = 0; pass < kPasses; ++pass) {
                HandleLoan loan = pool.Borrow(Key(static_cast<unsigned int>(i + pass) % 3));
                mark(loan.curl, true);
                curl_free(curl_easy_escape(loan.curl, "a b", 0));
                mark(loan.curl, false);
                pool.GiveBack(std::move(loan));
            }
        });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    EXPECT_EQ(twice, 0);
    EXPECT_LE(pool.Idle(), HandlePool::kMostIdle);
    EXPECT_GE(pool.Idle(), 3U);
}

// Forks: only the pool of the process knows of them.

class Forked : public testing::Test {
  protected:
    void TearDown() override { HandlePool::Instance().Empty(); }
    HandlePool& pool_ = HandlePool::Instance();
};

TEST_F(Forked, AChildBeginsWithAnEmptyPoolAndTheParentKeepsItsOwn) {
    HandleLoan loan = pool_.Borrow(Key());
    CURL* const curl = loan.curl;
    pool_.GiveBack(std::move(loan));
    EXPECT_EQ(0, scratch::InChild([&] {
                  const bool empty = pool_.Idle() == 0;
                  HandleLoan own = pool_.Borrow(Key());
                  const bool fresh = own.curl != curl && !pool_.IsInherited(own);
                  pool_.GiveBack(std::move(own));
                  return empty && fresh && pool_.Idle() == 1 ? 0 : 1;
              }));
    EXPECT_EQ(pool_.Idle(), 1U);
}

TEST_F(Forked, ALoanOfTheParentIsNeitherKeptNorClosedByTheChild) {
    HandleLoan loan = pool_.Borrow(Key());
    EXPECT_EQ(0, scratch::InChild([&] {
                  const bool inherited = pool_.IsInherited(loan);
                  CURL* const curl = loan.curl;
                  pool_.GiveBack(std::move(loan));
                  // Closed, it would be no memory of a handle any more; the sanitizer looks.
                  const bool alive = curl_easy_setopt(curl, CURLOPT_NOBODY, 1L) == CURLE_OK;
                  return inherited && alive && pool_.Idle() == 0 ? 0 : 1;
              }));
    EXPECT_FALSE(pool_.IsInherited(loan));
    pool_.GiveBack(std::move(loan));
    EXPECT_EQ(pool_.Idle(), 1U);
}

// A child that has the mutex of a thread that it has not would wait for ever.
TEST_F(Forked, AForkWhileAnotherThreadBorrowsLeavesTheChildAFreePool) {
    std::atomic<bool> stop{false};
    std::thread busy([&] {
        while (!stop) {
            pool_.GiveBack(pool_.Borrow(Key()));
        }
    });
    int failed = 0;
    for (int i = 0; i < 20; ++i) {
        failed += scratch::InChild([&] { return pool_.Idle() == 0 ? 0 : 1; });
    }
    stop = true;
    busy.join();
    EXPECT_EQ(failed, 0);
}

}  // namespace
}  // namespace ZYROCloud
