/**
 * A conversation with a service, recorded once on its way and served again from memory, so that
 * what is measured is the client and not the service.
 */
#ifndef ZYROVFS_BENCH_CLOUD_REPLAY_H
#define ZYROVFS_BENCH_CLOUD_REPLAY_H

#include <curl/curl.h>

#include <deque>
#include <string>
#include <thread>
#include <unordered_map>

#include "cloud_services.h"

namespace bench {

struct Exchange {
    std::string method, target, body;
    std::string answer;
};

/** Serves on loopback, in one thread of its own. */
class Replay {
  public:
    /** Asks `upstream` for what it does not know yet. */
    Replay(std::string upstream, const std::string& token);
    Replay(const Replay&) = delete;
    Replay& operator=(const Replay&) = delete;
    ~Replay();

    std::string Url() const { return "http://127.0.0.1:" + std::to_string(port_); }
    /** In the order in which they came first. Not while a client is being served. */
    const std::deque<Exchange>& Exchanges() const { return exchanges_; }

  private:
    struct Connection {
        int fd;
        std::string request;  ///< as far as it has come
    };
    void Serve();
    /** Reads what has come and answers a whole request; false when the connection has ended. */
    bool Converse(Connection& connection);
    const std::string& Answer(const std::string& request_line, const std::string& body);

    const std::string upstream_;
    curl_slist* authorization_;
    std::deque<Exchange> exchanges_;
    std::unordered_map<std::string, const Exchange*> known_;
    int listener_, port_ = 0;
    std::thread thread_;
};

/** One request on this handle; the body of the answer goes into `out`. */
bool Ask(CURL* curl, const std::string& host, const Exchange& what, std::string& out);

/** Asks for all that was recorded, parses each answer and holds it until the last one has come, as
 * the items of a listing are held. Whether all could be had. */
bool TransferAndParse(const Replay& replay);

/** A folder of so many items, listed once already. */
class RecordedListing {
  public:
    RecordedListing(const Service& service, unsigned items);

    std::unique_ptr<ZYROCloud::Cloud> MakeDriver() const;
    /** Whether a listing by this driver has all items. */
    bool List(ZYROCloud::Cloud& driver, Json::Value& out) const;
    const Replay& Pages() const { return *replay_; }

  private:
    const Service& service_;
    const unsigned items_;
    std::unique_ptr<Replay> replay_;
};

}  // namespace bench

#endif
