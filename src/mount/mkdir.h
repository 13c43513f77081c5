/** Folders for files that are about to be read or written. */
#ifndef ZYROVFS_MOUNT_MKDIR_H
#define ZYROVFS_MOUNT_MKDIR_H

#include <string>

#include "core/owned_folder.h"
#include "core/source_line.h"

namespace ZYROVFS::Utils {

/**
 * Opens a folder for `user`, making as root and open to all (mode 0777, and sticky) what of it is
 * missing, and in place of whatever is no folder. A failure leaves errno.
 */
OwnedFolder CreateOwnedFolder(const std::string& path, uid_t user);

/** The same for the folder that the file `path` stands in. A failure is logged in the name of `at`.
 */
OwnedFolder CreateParentFolder(const std::string& path, uid_t user,
                               SourceLine at = SourceLine::Here());

}  // namespace ZYROVFS::Utils

#endif
