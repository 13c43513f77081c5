#include "support/cloudsim/route.h"

#include "support/cloudsim/http.h"

namespace cloudsim {

bool BeginsWith(const std::string& text, const std::string& start) {
    return text.compare(0, start.size(), start) == 0;
}

bool IsBareAddress(const std::string& host) {
    return host.empty() || host[0] == '[' ||
           host.find_first_not_of("0123456789.") == std::string::npos;
}

bool MatchesPath(const std::string& pattern, const std::vector<std::string>& path,
                 std::string& id) {
    Request split;
    split.path = pattern;
    const std::vector<std::string> parts = split.Segments();
    if (parts.size() != path.size()) {
        return false;
    }
    for (size_t i = 0; i < parts.size(); i++) {
        if (parts[i] == "*") {
            id = path[i];
        } else if (parts[i] != path[i]) {
            return false;
        }
    }
    return true;
}

}  // namespace cloudsim
