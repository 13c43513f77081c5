/** The helper program that belongs to this library. */
#ifndef ZYROVFS_MOUNT_HELPER_PATH_H
#define ZYROVFS_MOUNT_HELPER_PATH_H

#include <string>

namespace ZYROVFS {

/**
 * Where the helper stands: relative to this library, or where it was configured to be installed.
 * A process that is root, or can be, takes only one that nobody but root and the owner of this
 * library can have put there. Empty, with errno, when there is none.
 */
std::string HelperPath();

}  // namespace ZYROVFS

#endif
