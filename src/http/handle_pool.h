/**
 * The libcurl handles that a process keeps between two users of them, with their connections, TLS
 * sessions and parsed roots: a driver lives for one call, and a handshake with certificates costs
 * a hundred times what a request does.
 *
 * A handle is lent to one APIHandler at a time, and only for the key that it was used for. Nothing
 * else of its last user is left in it. Handles that have waited too long are closed when the pool
 * is used the next time, the oldest ones also when there are too many. All functions may be called
 * by several threads at once. A forked child begins with an empty pool; what it has inherited it
 * neither uses nor closes, since the connections are the parent's.
 */
#ifndef ZYROVFS_HTTP_HANDLE_POOL_H
#define ZYROVFS_HTTP_HANDLE_POOL_H

#include <curl/curl.h>

#include <chrono>
#include <cstddef>
#include <mutex>
#include <vector>

#include "core/handle.h"
#include "http/handle_key.h"

namespace ZYROCloud {

/** A handle while it is lent. */
struct HandleLoan {
    CURL* curl = nullptr;       ///< null when libcurl has none to give
    HandleKey key;              ///< what it is for, or was used for last
    bool used = false;          ///< a transfer was made with it
    bool mixed = false;         ///< transfers were made for other keys, too; it is not kept
    bool keep = true;           ///< logins at file servers end with their user
    bool own_sessions = false;  ///< it has a store of its own, which libcurl would lose for a share
    /** Certificates that its connections check against, as long as they are open. */
    std::vector<ZYROVFS::UniqueCString> texts;

    unsigned long process = 0;  ///< the pool's own
    unsigned long epoch = 0;
};

class HandlePool {
  public:
    using Time = std::chrono::steady_clock::time_point;

    static constexpr size_t kMostIdle = 8;
    /** About as long as libcurl uses a connection again. */
    static constexpr std::chrono::seconds kLongestIdle{120};

    /** The one of this process. */
    static HandlePool& Instance();

    explicit HandlePool(Time (*now)() = std::chrono::steady_clock::now);
    HandlePool(const HandlePool&) = delete;
    HandlePool& operator=(const HandlePool&) = delete;
    ~HandlePool() { Empty(); }

    /** A kept handle for this key, the last one that came back, or a new one. */
    HandleLoan Borrow(HandleKey key);
    /** The handle is cleaned and kept, or closed. Nobody may use it any more. */
    void GiveBack(HandleLoan loan) noexcept;
    /** Whether it was lent to the process that this one was forked from. */
    bool IsInherited(const HandleLoan& loan) const;
    /** Closes all that wait, and those that are lent now as soon as they come back. */
    void Empty() noexcept;
    size_t Idle();

  private:
    struct Waiting {
        HandleLoan loan;
        Time since;
    };

    /** Holds the mutex. */
    class Access {
      public:
        explicit Access(HandlePool& pool);

      private:
        const std::lock_guard<std::mutex> lock_;
    };

    static HandlePool* MakeInstance();
    bool TakeKept(const HandleKey& key, HandleLoan& loan);
    bool TakeOld(HandleLoan& loan);
    bool TakeAny(HandleLoan& loan);
    void CloseOld() noexcept;
    void Keep(HandleLoan& loan, HandleLoan& surplus);
    void Abandon(HandleLoan loan) noexcept;

    Time (*now_)();
    mutable std::mutex mutex_;
    std::vector<Waiting> idle_;  ///< the longest waiting first
    std::vector<HandleLoan> inherited_;
    unsigned long process_ = 0;       ///< how many forks lie between the first process and this one
    unsigned long idle_process_ = 0;  ///< to which the idle ones belong
    unsigned long epoch_ = 0;         ///< how often it was emptied
};

}  // namespace ZYROCloud

#endif
