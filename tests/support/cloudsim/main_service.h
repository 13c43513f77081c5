/** The services that the program can be, and what their options have in common. */
#ifndef ZYROVFS_TESTS_CLOUDSIM_MAIN_SERVICE_H
#define ZYROVFS_TESTS_CLOUDSIM_MAIN_SERVICE_H

#include <array>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "support/cloudsim/service.h"

namespace cloudsim {

struct ServiceOptions : ServerOptions {
    /** Names of its hosts in place of the usual ones, in the order of the kind's `hosts`. */
    std::optional<std::array<std::string, 3>> names;
    uint64_t max_offset = 10000;  ///< of Box's listings
};

/** A service that runs, and where. */
struct Running {
    std::unique_ptr<Service> service;
    std::vector<std::pair<std::string, std::string>> hosts;  ///< what for, and the address
};

struct ServiceKind {
    const char* option;
    Running (*start)(const ServiceOptions& options);
};

/** Null for an option that names no service. */
const ServiceKind* FindServiceKind(const std::string& option);

}  // namespace cloudsim

#endif
