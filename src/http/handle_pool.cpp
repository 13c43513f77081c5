#include "http/handle_pool.h"

#include <pthread.h>

#include <algorithm>
#include <utility>

namespace ZYROCloud {

namespace {

/** Leaves nothing but connections, sessions, names and roots. False when that cannot be said. */
bool Clean(CURL* curl) {
    static char no_address[] = "x";
    static curl_slist wrong_names = {no_address, nullptr};
    // These outlive a reset, and the list of cookie files would be lost in one.
    bool clean = curl_easy_setopt(curl, CURLOPT_COOKIEFILE, nullptr) == CURLE_OK &&
                 curl_easy_setopt(curl, CURLOPT_HSTS_CTRL, 0L) == CURLE_OK;
    curl_easy_reset(curl);
    // Closing a connection must not touch the signals of a process with several threads.
    clean = clean && curl_easy_setopt(curl, CURLOPT_NOSIGNAL, 1L) == CURLE_OK;
    // The headers of the last answer are forgotten where the next transfer begins. This one ends
    // there, at names with addresses that are none; a real one, of an empty file, takes ten times
    // as long.
    clean = clean && curl_easy_setopt(curl, CURLOPT_URL, "x") == CURLE_OK &&
            curl_easy_setopt(curl, CURLOPT_RESOLVE, &wrong_names) == CURLE_OK &&
            curl_easy_perform(curl) == CURLE_SETOPT_OPTION_SYNTAX &&
            curl_easy_nextheader(curl, CURLH_HEADER, -1, nullptr) == nullptr;
    // The share goes behind that: without one, a transfer makes a store of sessions, which the next
    // share would push out.
    return curl_easy_setopt(curl, CURLOPT_RESOLVE, nullptr) == CURLE_OK &&
           curl_easy_setopt(curl, CURLOPT_URL, nullptr) == CURLE_OK &&
           curl_easy_setopt(curl, CURLOPT_SHARE, nullptr) == CURLE_OK && clean;
}

/** Connections say goodbye here, so the mutex is free. */
void Close(HandleLoan& loan) noexcept {
    curl_easy_cleanup(std::exchange(loan.curl, nullptr));
    loan.texts.clear();
}

}  // namespace

HandlePool& HandlePool::Instance() {
    // Never destroyed: at the end of a process OpenSSL may be gone before.
    static HandlePool* const pool = MakeInstance();
    return *pool;
}

HandlePool* HandlePool::MakeInstance() {
    static HandlePool* pool = new HandlePool;
    // A fork waits for the mutex, so that the child finds the list whole and the mutex its own.
    pthread_atfork([] { pool->mutex_.lock(); }, [] { pool->mutex_.unlock(); },
                   [] {
                       ++pool->process_;
                       pool->mutex_.unlock();
                   });
    return pool;
}

HandlePool::HandlePool(Time (*now)()) : now_(now) {
    idle_.reserve(kMostIdle);
}

/** The list, of which a child first sets aside what it has inherited. Not in the fork itself: no
 * memory can be had there when another thread was just asking for some. */
HandlePool::Access::Access(HandlePool& pool) : lock_(pool.mutex_) {
    if (pool.idle_process_ != pool.process_) {
        for (Waiting& each : pool.idle_) {
            pool.inherited_.push_back(std::move(each.loan));
        }
        pool.idle_.clear();
        pool.idle_process_ = pool.process_;
    }
}

HandleLoan HandlePool::Borrow(HandleKey key) {
    CloseOld();
    HandleLoan loan;
    if (!TakeKept(key, loan)) {
        loan.curl = curl_easy_init();
        loan.key = std::move(key);
    }
    return loan;
}

bool HandlePool::TakeKept(const HandleKey& key, HandleLoan& loan) {
    const Access access(*this);
    const auto last = std::find_if(idle_.rbegin(), idle_.rend(),
                                   [&key](const Waiting& each) { return each.loan.key == key; });
    const bool found = last != idle_.rend();
    if (found) {
        loan = std::move(last->loan);
        idle_.erase(std::next(last).base());
    }
    loan.process = process_;
    loan.epoch = epoch_;
    return found;
}

void HandlePool::GiveBack(HandleLoan loan) noexcept {
    if (loan.curl == nullptr) {
        return;
    }
    if (IsInherited(loan)) {
        Abandon(std::move(loan));
        return;
    }
    HandleLoan surplus;
    if (loan.mixed || !loan.keep || !Clean(loan.curl)) {
        surplus = std::move(loan);
    } else {
        Keep(loan, surplus);
    }
    Close(surplus);
    CloseOld();
}

/** `surplus` is what has no place: the handle itself, or the one that has waited longest. */
void HandlePool::Keep(HandleLoan& loan, HandleLoan& surplus) {
    const Access access(*this);
    if (loan.epoch != epoch_) {
        surplus = std::move(loan);
        return;
    }
    if (idle_.size() == kMostIdle) {
        surplus = std::move(idle_.front().loan);
        idle_.erase(idle_.begin());
    }
    idle_.push_back({std::move(loan), now_()});
}

bool HandlePool::IsInherited(const HandleLoan& loan) const {
    const std::lock_guard<std::mutex> lock(mutex_);
    return loan.process != process_;
}

void HandlePool::Abandon(HandleLoan loan) noexcept try {
    const Access access(*this);
    inherited_.push_back(std::move(loan));
} catch (const std::exception&) {
    loan.curl = nullptr;  // lost, not closed
}

void HandlePool::Empty() noexcept {
    HandleLoan loan;
    {
        const std::lock_guard<std::mutex> lock(mutex_);
        ++epoch_;
    }
    while (TakeAny(loan)) {
        Close(loan);
    }
}

bool HandlePool::TakeAny(HandleLoan& loan) {
    const Access access(*this);
    if (idle_.empty()) {
        return false;
    }
    loan = std::move(idle_.front().loan);
    idle_.erase(idle_.begin());
    return true;
}

void HandlePool::CloseOld() noexcept {
    HandleLoan loan;
    while (TakeOld(loan)) {
        Close(loan);
    }
}

bool HandlePool::TakeOld(HandleLoan& loan) {
    const Access access(*this);
    if (idle_.empty() || now_() - idle_.front().since < kLongestIdle) {
        return false;
    }
    loan = std::move(idle_.front().loan);
    idle_.erase(idle_.begin());
    return true;
}

size_t HandlePool::Idle() {
    const Access access(*this);
    return idle_.size();
}

}  // namespace ZYROCloud
