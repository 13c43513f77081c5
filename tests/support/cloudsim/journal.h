/** What arrived, request by request. */
#ifndef ZYROVFS_TESTS_CLOUDSIM_JOURNAL_H
#define ZYROVFS_TESTS_CLOUDSIM_JOURNAL_H

#include <condition_variable>
#include <cstdint>
#include <cstdio>
#include <functional>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

#include "support/cloudsim/fault.h"

namespace cloudsim {

struct JournalEntry {
    uint64_t number = 0;      ///< 1 for the first request of this server
    uint64_t connection = 0;  ///< 1 for the first connection of this server
    std::string method;
    std::string target;  ///< path and query as sent
    std::string version;
    Headers headers;   ///< as sent, in order
    std::string body;  ///< its beginning, up to ServerOptions::journal_body_limit
    uint64_t body_size = 0;
    std::string
        body_sha1;        ///< hex; of what came, also when it was cut. Empty when there was no body
    std::string account;  ///< e-mail of the token's owner; empty when there was none
    int status = 0;       ///< 0 while there is no answer, and for ever when none was given
    uint64_t answer_size = 0;  ///< bytes of the answer's body given to the connection
    bool finished = false;     ///< the server is done with it

    /** Path without query. */
    std::string Path() const;
    /** Decoded value of a query parameter; empty when it isn't there. */
    std::string Query(const std::string& name) const;
    /** Value of a header, its name without regard to case; empty when it isn't there. */
    std::string Header(const std::string& name) const;
    bool HasHeader(const std::string& name) const;
};

/** Any thread may ask at any time. An entry's status is there before the client sees the answer. */
class Journal {
  public:
    std::vector<JournalEntry> All() const;
    /** Those whose method is this ("*": any) and whose target begins with this. */
    std::vector<JournalEntry> Find(const std::string& method, const std::string& path) const;
    size_t Count(const std::string& method, const std::string& path) const;
    size_t Connections() const;
    /** False when it doesn't come true in time. */
    bool WaitFor(const std::function<bool(const std::vector<JournalEntry>&)>& reached,
                 double seconds = 10) const;
    /** One line each: for the message of a failed expectation. */
    std::string Text() const;
    void Clear();

    // What follows is the server's side.
    struct Options {
        size_t body_limit = 64 * 1024;
        bool keep = true;
        std::string file;
    };
    Journal() : Journal(Options()) {}
    explicit Journal(const Options& options);
    Journal(const Journal&) = delete;
    Journal& operator=(const Journal&) = delete;
    ~Journal();

    size_t BodyLimit() const { return options_.body_limit; }
    /** Gives the entry its number. */
    std::shared_ptr<JournalEntry> Begin(JournalEntry entry);
    /** Changes an entry so that no reader sees it half changed. */
    void Change(JournalEntry& entry, const std::function<void(JournalEntry&)>& change);
    void Finish(JournalEntry& entry);
    uint64_t AddConnection();

  private:
    const Options options_;
    std::FILE* file_ = nullptr;
    mutable std::mutex mutex_;
    mutable std::condition_variable changed_;
    std::vector<std::shared_ptr<JournalEntry>> entries_;
    uint64_t last_number_ = 0, connections_ = 0;
};

}  // namespace cloudsim

#endif
