/** The language of the `q` parameter of files.list. */
#ifndef ZYROVFS_TESTS_CLOUDSIM_GDRIVE_QUERY_H
#define ZYROVFS_TESTS_CLOUDSIM_GDRIVE_QUERY_H

#include <memory>
#include <string>
#include <vector>

#include "support/cloudsim/tree.h"

namespace cloudsim::gdrive {

/** One condition, or several put together. */
class Query {
  public:
    virtual ~Query() = default;
    virtual bool Fits(const Node& node) const = 0;
    /** Ids that have to be among the parents of whatever fits, and so tell where to look. */
    virtual std::string OnlyIn() const { return ""; }
};
using QueryPtr = std::shared_ptr<const Query>;

/** For whom the query is. */
struct Asker {
    std::string email;
    std::string root;  ///< id that "root" stands for
};

/**
 * Throws a Failure (400) for what is no query. `folders` gets every id that stands before
 * "in parents". An empty text fits everything.
 */
QueryPtr ParseQuery(const std::string& text, const Asker& asker, std::vector<std::string>& folders);

}  // namespace cloudsim::gdrive

#endif
