/** The front of every simulated service: HTTP or HTTPS on loopback, one thread a connection. */
#ifndef ZYROVFS_TESTS_CLOUDSIM_SERVER_H
#define ZYROVFS_TESTS_CLOUDSIM_SERVER_H

#include <chrono>
#include <condition_variable>
#include <functional>
#include <memory>
#include <mutex>
#include <string>

#include "support/cloudsim/fault_plan.h"
#include "support/cloudsim/http.h"
#include "support/cloudsim/journal.h"

struct MHD_Daemon;

namespace cloudsim {

struct ServerOptions {
    /** PEM texts of a server; empty: plain HTTP. tls::Make(tls::CertSpec{...}) makes them. */
    std::string certificate, key;
    int port = 0;  ///< 0: any that is free
    size_t journal_body_limit = 64 * 1024;
    bool journal_hashes = true;  ///< SHA-1 of request bodies; a benchmark may do without
    bool keep_journal = true;
    std::string journal_file;  ///< one JSON document a line, written when a request is finished
    Storage storage;
    bool hash_uploads = true;  ///< without: the SHA-1 of uploaded files is computed when asked for
};

/** What a service tells its front. Called on the threads of connections. */
struct ServerHooks {
    /** Looks at the headers, sets the account, and gives what takes the body and answers. */
    std::function<std::unique_ptr<Handler>(Request&)> begin;
    /** Part of the service that this host name stands for: "api", "upload", "download". */
    std::function<std::string(const Request&)> role;
    /** The token of this request expires. */
    std::function<void(const Request&)> expire_token;
};

class Server {
  public:
    /** Throws std::runtime_error when the port or the certificate is no good. */
    Server(const ServerOptions& options, class Journal& journal, FaultPlan& faults,
           ServerHooks hooks);
    Server(const Server&) = delete;
    Server& operator=(const Server&) = delete;
    ~Server();

    int Port() const { return port_; }

    using Time = std::chrono::steady_clock::time_point;
    /** Ends early when the server does. */
    void SleepUntil(Time time);

    const ServerOptions options;
    class Journal& journal;
    FaultPlan& faults;
    const ServerHooks hooks;

  private:
    std::mutex mutex_;
    std::condition_variable stopped_;
    bool stopping_ = false;
    int port_ = 0;
    MHD_Daemon* daemon_ = nullptr;
};

}  // namespace cloudsim

#endif
