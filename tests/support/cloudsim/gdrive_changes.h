/** What the body of a request wants of an item. */
#ifndef ZYROVFS_TESTS_CLOUDSIM_GDRIVE_CHANGES_H
#define ZYROVFS_TESTS_CLOUDSIM_GDRIVE_CHANGES_H

#include <json/value.h>

#include <optional>
#include <string>
#include <vector>

#include "support/cloudsim/date.h"

namespace cloudsim::gdrive {

struct Changes {
    std::optional<std::string> title, description, mime_type;
    std::optional<bool> starred, trashed;
    std::optional<std::vector<std::string>> parents;  ///< ids
    std::optional<Moment> modified;
};

/** Throws a Failure (400) for members of the wrong type; members that can't be changed are none. */
Changes ReadChanges(const Json::Value& body);
/** Parts of a comma-separated list. */
std::vector<std::string> SplitList(const std::string& list);

}  // namespace cloudsim::gdrive

#endif
