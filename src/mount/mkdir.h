/** Folders for files that are about to be written. */
#ifndef ZYROVFS_MOUNT_MKDIR_H
#define ZYROVFS_MOUNT_MKDIR_H

#include <string>

#include "core/source_line.h"

namespace ZYROVFS::Utils {

/**
 * Makes the folder that `path` stands in, as root and open to all (mode 0777): what of it is
 * missing, and in place of whatever is no folder. A failure is logged in the name of `at`, and
 * errno tells why.
 */
bool CreateParentFolder(const std::string& path, SourceLine at = SourceLine::Here());

}  // namespace ZYROVFS::Utils

#endif
