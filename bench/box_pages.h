/**
 * A big Box folder for benchmarks: its pages are recorded once from the simulated service, and
 * served again from memory, so that what is measured is the client and not the service.
 */
#ifndef ZYROVFS_BENCH_BOX_PAGES_H
#define ZYROVFS_BENCH_BOX_PAGES_H

#include <curl/curl.h>

#include <map>
#include <memory>
#include <string>
#include <thread>

#include "zyrovfs/cloud.h"

namespace bench {

/** Bodies by their "offset". */
using Pages = std::map<unsigned, std::string>;

constexpr unsigned kPageSize = 1000;

/** The pages of a folder of so many items. */
Pages RecordPages(unsigned items);

/** Serves pages on loopback, one connection after the other, and is the service that drivers of
 * this process ask. */
class PageServer {
  public:
    explicit PageServer(Pages pages);
    PageServer(const PageServer&) = delete;
    PageServer& operator=(const PageServer&) = delete;
    ~PageServer();

    std::string Url(unsigned offset) const;

  private:
    void Serve();
    void Converse(int fd) const;

    const Pages pages_;
    int listener_;
    int port_ = 0;
    std::thread thread_;
};

/** One request on this handle; the body goes into `out`. */
bool Fetch(CURL* curl, const std::string& url, std::string& out);

/** A driver, as the factory gives it to callers. */
std::unique_ptr<ZYROCloud::Cloud> MakeBox();

}  // namespace bench

#endif
