#include "http/handle_pool.h"

#include <gmock/gmock.h>

#include <functional>
#include <set>
#include <thread>

#include "support/scratch.h"
#include "unit/http/curl_seam.h"

namespace ZYROCloud {
namespace {

using std::chrono::seconds;

HandlePool::Time now;

HandlePool::Time Now() {
    return now;
}

HandleKey Key(unsigned int user = 1) {
    return {user, "roots", "", ""};
}

class Pool : public testing::Test {
  protected:
    void SetUp() override {
        curl_seam::Now() = {};
        now = HandlePool::Time(seconds(1000));
    }
    void TearDown() override { curl_seam::Now() = {}; }

    /** Borrows and gives back; the handle, to be compared only. */
    CURL* Pass(const HandleKey& key) {
        HandleLoan loan = pool_.Borrow(key);
        CURL* const curl = loan.curl;
        pool_.GiveBack(std::move(loan));
        return curl;
    }

    HandlePool pool_{Now};
};

TEST_F(Pool, AHandleIsLentAgainForTheSameKeyAndForNoOther) {
    CURL* const first = Pass(Key());
    const HandleKey others[] = {{2, "roots", "", ""},
                                {1, "pin /ssl/nas\ntext", "", ""},
                                {1, "roots", "amy", ""},
                                {1, "roots", "", "http_proxy=http://proxy\n"}};
    for (const HandleKey& key : others) {
        HandleLoan loan = pool_.Borrow(key);
        EXPECT_NE(loan.curl, first);
        EXPECT_TRUE(loan.key == key);
        loan.keep = false;
        pool_.GiveBack(std::move(loan));
        EXPECT_EQ(pool_.Idle(), 1U);
    }
    EXPECT_EQ(Pass(Key()), first);
}

TEST_F(Pool, AHandleIsLentToOneAtATimeAndTheLastOneBackIsTheFirstOut) {
    HandleLoan one = pool_.Borrow(Key());
    HandleLoan two = pool_.Borrow(Key());
    CURL* const last = two.curl;
    EXPECT_NE(one.curl, last);
    pool_.GiveBack(std::move(one));
    pool_.GiveBack(std::move(two));
    EXPECT_EQ(pool_.Idle(), 2U);
    EXPECT_EQ(Pass(Key()), last);
}

TEST_F(Pool, AHandleThatWasUsedForTwoKeysIsClosed) {
    HandleLoan loan = pool_.Borrow(Key());
    loan.mixed = true;
    pool_.GiveBack(std::move(loan));
    EXPECT_EQ(pool_.Idle(), 0U);
}

TEST_F(Pool, AHandleComesBackUnderTheKeyThatItWasUsedFor) {
    HandleLoan loan = pool_.Borrow(Key(1));
    CURL* const curl = loan.curl;
    loan.key = Key(2);
    pool_.GiveBack(std::move(loan));
    HandleLoan other = pool_.Borrow(Key(1));
    EXPECT_NE(other.curl, curl);
    pool_.GiveBack(std::move(other));
    EXPECT_EQ(Pass(Key(2)), curl);
}

TEST_F(Pool, HandlesThatWaitTooLongAreClosedAtTheNextUse) {
    Pass(Key(1));
    now += HandlePool::kLongestIdle - seconds(1);
    Pass(Key(2));
    EXPECT_EQ(pool_.Idle(), 2U);
    now += seconds(1);
    Pass(Key(2));
    EXPECT_EQ(pool_.Idle(), 1U);
}

TEST_F(Pool, OfMoreHandlesThanItsBoundTheLongestWaitingIsClosed) {
    for (unsigned int user = 0; user <= HandlePool::kMostIdle; ++user) {
        Pass(Key(user));
        now += seconds(1);
    }
    EXPECT_EQ(pool_.Idle(), HandlePool::kMostIdle);
    Pass(Key(1));
    EXPECT_EQ(pool_.Idle(), HandlePool::kMostIdle) << "the second is still there";
    Pass(Key(0));
    HandleLoan second = pool_.Borrow(Key(2));
    EXPECT_EQ(pool_.Idle(), HandlePool::kMostIdle) << "a new one for the first pushed it out";
    pool_.GiveBack(std::move(second));
}

TEST_F(Pool, EmptyClosesWhatWaitsAndWhatIsLentWhenItComesBack) {
    HandleLoan lent = pool_.Borrow(Key());
    Pass(Key());
    pool_.Empty();
    EXPECT_EQ(pool_.Idle(), 0U);
    pool_.GiveBack(std::move(lent));
    EXPECT_EQ(pool_.Idle(), 0U);
    Pass(Key());
    EXPECT_EQ(pool_.Idle(), 1U) << "and begins anew";
}

TEST_F(Pool, WithoutAHandleOfLibcurlTheLoanIsEmptyAndNothingIsKept) {
    curl_seam::Now().no_handle = true;
    HandleLoan loan = pool_.Borrow(Key());
    EXPECT_EQ(loan.curl, nullptr);
    pool_.GiveBack(std::move(loan));
    EXPECT_EQ(pool_.Idle(), 0U);
}

TEST_F(Pool, AHandleThatCannotBeCleanedIsClosed) {
    for (const int option : {CURLOPT_SHARE, CURLOPT_COOKIEFILE, CURLOPT_HSTS_CTRL, CURLOPT_RESOLVE,
                             CURLOPT_URL, CURLOPT_NOSIGNAL}) {
        curl_seam::Now().refused = {{option, CURLE_OUT_OF_MEMORY}};
        Pass(Key());
        EXPECT_EQ(pool_.Idle(), 0U) << option;
    }
    curl_seam::Now().refused.clear();
    curl_seam::Now().results = {CURLE_OUT_OF_MEMORY};
    Pass(Key());
    EXPECT_EQ(pool_.Idle(), 0U);
}

TEST_F(Pool, SeveralThreadsBorrowAtOnceAndNoneGetsAHandleOfAnother) {
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
                HandleLoan loan = pool_.Borrow(Key(static_cast<unsigned int>(i + pass) % 3));
                mark(loan.curl, true);
                curl_easy_escape(loan.curl, "a b", 0);
                mark(loan.curl, false);
                pool_.GiveBack(std::move(loan));
            }
        });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    EXPECT_EQ(twice, 0);
    EXPECT_LE(pool_.Idle(), HandlePool::kMostIdle);
    EXPECT_GE(pool_.Idle(), 3U);
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

TEST_F(Forked, AChildMayForkWhileOtherThreadsBorrow) {
    std::atomic<bool> stop{false};
    std::thread busy([&] {
        while (!stop) {
            pool_.GiveBack(pool_.Borrow(Key()));
        }
    });
    int failed = 0;
    for (int i = 0; i < 20; ++i) {
        failed += scratch::InChild([&] {
            pool_.GiveBack(pool_.Borrow(Key()));
            return pool_.Idle() == 1 ? 0 : 1;
        });
    }
    stop = true;
    busy.join();
    EXPECT_EQ(failed, 0);
}

}  // namespace
}  // namespace ZYROCloud
