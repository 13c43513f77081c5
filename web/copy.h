/** Files and folders from one connection to another. */
#ifndef ZYROVFS_WEB_COPY_H
#define ZYROVFS_WEB_COPY_H

#include <string>
#include <vector>

#include "connection.h"
#include "job.h"

namespace web {

struct CopyPlan {
    Connection from;
    std::vector<std::string> paths;
    Connection to;
    std::string folder;
};

/**
 * Moves all of it, and tells of it in the job's record. A file that fails is left out, and so is
 * what is in a folder that cannot be made; the first failure is what the job ends with. What
 * concerns the whole account, such as its quota, and a stop end it at once.
 */
void RunCopy(const CopyPlan& plan, Job& job);

}  // namespace web

#endif
