/**
 * What writers leave when they are killed. A document is written beside the old one under a random
 * name before it takes its place; nobody else knows that name, so it would lie there for ever.
 */
#ifndef ZYROVFS_TOOLS_HOST_SWEEP_H
#define ZYROVFS_TOOLS_HOST_SWEEP_H

#include <string>
#include <vector>

namespace tool {

/** Removes such files when they are older than a day, and names them. */
std::vector<std::string> SweepHost();

}  // namespace tool

#endif
