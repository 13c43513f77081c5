#include "http/handle_pool.h"

#include <gmock/gmock.h>

#include "unit/http/curl_seam.h"

namespace ZYROCloud {
namespace {

using std::chrono::seconds;

HandlePool::Time now;

HandlePool::Time Now() {
    return now;
}

HandleKey Key(unsigned int user = 1) {
    return {user, "roots", "", "", nullptr};
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
    const HandleKey others[] = {{2, "roots", "", "", nullptr},
                                {1, "pin /ssl/nas\ntext", "", "", nullptr},
                                {1, "roots", "amy", "", nullptr},
                                {1, "roots", "", "http_proxy=http://proxy\n", nullptr},
                                {1, "roots", "", "", &pool_}};
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

TEST_F(Pool, AHandleThatIsNotToBeKeptOrWasUsedForTwoKeysIsClosed) {
    HandleLoan loan = pool_.Borrow(Key());
    loan.keep = false;
    pool_.GiveBack(std::move(loan));
    EXPECT_EQ(pool_.Idle(), 0U);
    loan = pool_.Borrow(Key());
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

}  // namespace
}  // namespace ZYROCloud
