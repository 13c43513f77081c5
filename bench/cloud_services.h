/** The services that benchmarks of clouds go through, one row each, and their simulations. */
#ifndef ZYROVFS_BENCH_CLOUD_SERVICES_H
#define ZYROVFS_BENCH_CLOUD_SERVICES_H

#include <json/value.h>

#include <map>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "support/cloudsim/main_service.h"
#include "zyrovfs/cloud.h"

namespace bench {

struct Service {
    const char* name;    ///< also the protocol of its profiles
    const char* option;  ///< that the simulator knows it by
    ZYROCloud::_tag_cloud_type type;
    const char* root;  ///< id of the folder that holds all
    Json::Value listing;
    /** Entries of the service configuration, and which of the simulator's hosts stands there. */
    std::vector<std::pair<const char*, const char*>> hosts;
};

const std::vector<Service>& Services();
/** Ends the program for a name that is none. */
const Service& FindService(const std::string& name);

/** Addresses by the simulator's word for what they are for. */
using Hosts = std::map<std::string, std::string>;

/** What a client has to know of an account. */
struct Access {
    Hosts hosts;
    std::string token;
    std::string account;  ///< its id
};

/** A service that keeps nothing of uploads and of requests. */
struct Simulated {
    explicit Simulated(const Service& service, bool keep_journal = false);
    Access Grant() const;

    cloudsim::Running running;
    cloudsim::Account* amy;
};

/** A driver, as the factory gives it to callers; it and all others of the machine ask there. */
std::unique_ptr<ZYROCloud::Cloud> MakeDriver(const Service& service, const Access& access);
/** The profile for the making of one. */
Json::Value Profile(const Service& service, const Access& access);
void SetHosts(const Service& service, const Hosts& hosts);

/** Peak of this process's resident memory since the last ResetPeak, in KiB. */
long PeakMemory();
void ResetPeak();

}  // namespace bench

#endif
