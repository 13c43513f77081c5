/** Which operation of a service a request means. */
#ifndef ZYROVFS_TESTS_CLOUDSIM_ROUTE_H
#define ZYROVFS_TESTS_CLOUDSIM_ROUTE_H

#include <string>
#include <vector>

namespace cloudsim {

bool BeginsWith(const std::string& text, const std::string& start);
/** "127.0.0.1" or "[::1]", or none at all: a name that tells no part of a service. */
bool IsBareAddress(const std::string& host);
/** `pattern` is a path without its first slash; `id` gets what stands at the place of a '*'. */
bool MatchesPath(const std::string& pattern, const std::vector<std::string>& path, std::string& id);

}  // namespace cloudsim

#endif
