/** A simulated service in a process of its own, so that its work is not counted as a client's. */
#ifndef ZYROVFS_BENCH_SERVICE_PROCESS_H
#define ZYROVFS_BENCH_SERVICE_PROCESS_H

#include <sys/types.h>

#include <cstdio>
#include <functional>
#include <string>

#include "cloud_services.h"

namespace bench {

/** Ends the program with a line that says what failed. */
[[noreturn]] void Fail(const std::string& what);

/** The service runs as long as this object lives. */
class ServiceProcess {
  public:
    /** `prepare` puts into the account what a benchmark is to find there. */
    explicit ServiceProcess(const Service& service,
                            const std::function<void(cloudsim::Account&)>& prepare = nullptr);
    ServiceProcess(const ServiceProcess&) = delete;
    ServiceProcess& operator=(const ServiceProcess&) = delete;
    ~ServiceProcess();

    Access access;

  private:
    void Take(std::FILE* from);

    pid_t child_;
};

}  // namespace bench

#endif
