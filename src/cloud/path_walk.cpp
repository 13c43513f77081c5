#include "cloud/path_walk.h"

#include <algorithm>
#include <set>
#include <utility>

#include "core/log.h"

namespace ZYROCloud {
namespace {

class Walk {
  public:
    Walk(const WalkRules& rules, ZYROVFS::SourceLine at) : rules_(rules), at_(at) {}

    bool Down(const std::string& parent, const std::string& path, std::string& id) {
        if (path.empty()) {
            return false;
        }
        std::string name;
        std::string rest;
        std::vector<std::string> ids;
        CutFirstComponent(path, name, rest);
        if (!Lookup(parent, name, ids)) {
            return false;
        }
        if (ids.empty() && rules_.missing_fails) {
            return false;
        }
        return rest.empty() ? Pick(ids, id) : Follow(ids, rest, id);
    }

  private:
    bool Lookup(const std::string& parent, const std::string& name, std::vector<std::string>& ids) {
        if (rules_.lookup(parent, name, ids)) {
            return true;
        }
        if (rules_.lookup_failed != nullptr) {
            LOG_ERROR_AT(at_, rules_.lookup_failed, name.c_str());
        }
        return false;
    }

    bool Pick(std::vector<std::string>& ids, std::string& id) {
        if (rules_.pick) {
            return rules_.pick(ids, id);
        }
        if (!ids.empty()) {
            id = ids.front();
        }
        return true;
    }

    /** Several folders of one name may stand side by side: the item may be below any of them. */
    bool Follow(const std::vector<std::string>& ids, const std::string& rest, std::string& id) {
        for (const std::string& candidate : ids) {
            std::string found;
            // Folders that hold each other would be walked through once for each way there is.
            if (!rules_.first_only && !entered_.emplace(candidate, rest.size()).second) {
                continue;
            }
            const bool ok = Down(AsParent(candidate), rest, found);
            if (rules_.first_only || (ok && !found.empty())) {
                id = found;
                return ok;
            }
        }
        return true;
    }

    std::string AsParent(const std::string& id) const {
        return rules_.as_parent ? rules_.as_parent(id) : id;
    }

    const WalkRules& rules_;
    const ZYROVFS::SourceLine at_;
    std::set<std::pair<std::string, size_t>>
        entered_;  ///< an id, and how much of the path was left
};

}  // namespace

bool CutAtLastSlash(const std::string& path, std::string& parent, std::string& name) {
    const size_t slash = path.rfind('/');
    if (slash == std::string::npos) {
        return false;
    }
    name = path.substr(slash + 1);
    parent = path.substr(0, slash);
    return true;
}

void CutFirstComponent(const std::string& path, std::string& component, std::string& rest) {
    const size_t slash = path.find('/', 1);
    component = path.substr(std::min<size_t>(1, path.size()), slash - 1);
    rest = slash == std::string::npos ? "" : path.substr(slash);
}

bool WalkPath(const std::string& parent, const std::string& path, const WalkRules& rules,
              std::string& id, ZYROVFS::SourceLine at) {
    return path.size() <= kLongestPath && Walk(rules, at).Down(parent, path, id);
}

}  // namespace ZYROCloud
