#include "http/handle_pool.h"

#include <pthread.h>

#include <algorithm>
#include <utility>

namespace ZYROCloud {

namespace {

using Lock = std::lock_guard<std::mutex>;

/** Leaves nothing but connections, sessions, names and roots. False when that cannot be said. */
bool Clean(CURL* curl) {
    curl_easy_reset(curl);
    // All of this outlives a reset. The cookie engine must go before its cookies can come back.
    const bool cleared = curl_easy_setopt(curl, CURLOPT_SHARE, nullptr) == CURLE_OK &&
                         curl_easy_setopt(curl, CURLOPT_COOKIEFILE, nullptr) == CURLE_OK &&
                         curl_easy_setopt(curl, CURLOPT_HSTS_CTRL, 0L) == CURLE_OK &&
                         curl_easy_setopt(curl, CURLOPT_RESOLVE, nullptr) == CURLE_OK;
    // So do the headers of the last answer, until a transfer begins. This one goes nowhere.
    const bool begun = curl_easy_setopt(curl, CURLOPT_NOSIGNAL, 1L) == CURLE_OK &&
                       curl_easy_setopt(curl, CURLOPT_URL, ":") == CURLE_OK &&
                       curl_easy_perform(curl) == CURLE_URL_MALFORMAT;
    curl_easy_reset(curl);
    // Closing a connection must not touch the signals of a process with several threads.
    return curl_easy_setopt(curl, CURLOPT_NOSIGNAL, 1L) == CURLE_OK && cleared && begun;
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
                       pool->EnterChild();
                       pool->mutex_.unlock();
                   });
    return pool;
}

HandlePool::HandlePool(Time (*now)()) : now_(now) {
    idle_.reserve(kMostIdle);
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
    const Lock lock(mutex_);
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
    const Lock lock(mutex_);
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
    const Lock lock(mutex_);
    return loan.process != process_;
}

void HandlePool::Abandon(HandleLoan loan) noexcept try {
    const Lock lock(mutex_);
    inherited_.push_back(std::move(loan));
} catch (const std::exception&) {
    loan.curl = nullptr;  // lost, not closed
}

void HandlePool::Empty() noexcept {
    HandleLoan loan;
    {
        const Lock lock(mutex_);
        ++epoch_;
    }
    while (TakeAny(loan)) {
        Close(loan);
    }
}

bool HandlePool::TakeAny(HandleLoan& loan) {
    const Lock lock(mutex_);
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
    const Lock lock(mutex_);
    if (idle_.empty() || now_() - idle_.front().since < kLongestIdle) {
        return false;
    }
    loan = std::move(idle_.front().loan);
    idle_.erase(idle_.begin());
    return true;
}

size_t HandlePool::Idle() const {
    const Lock lock(mutex_);
    return idle_.size();
}

/** With the mutex held. */
void HandlePool::EnterChild() noexcept {
    ++process_;
    try {
        for (Waiting& each : idle_) {
            inherited_.push_back(std::move(each.loan));
        }
    } catch (const std::exception&) {
        // Lost, not closed.
    }
    idle_.clear();
}

}  // namespace ZYROCloud
