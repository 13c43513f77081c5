/** Where a copy or a move goes. */
#ifndef ZYROVFS_CLOUD_TARGET_H
#define ZYROVFS_CLOUD_TARGET_H

#include <string>

#include "cloud/path_walk.h"
#include "core/log.h"
#include "zyrovfs/cloud.h"

namespace ZYROCloud {

/** The folder and the name of a server path. VFS_ERR_NOT_FOUND, logged, for one without a slash. */
inline bool CutTarget(Cloud& cloud, const std::string& path, std::string& parent, std::string& name,
                      ZYROVFS::SourceLine at = ZYROVFS::SourceLine::Here()) {
    if (CutAtLastSlash(path, parent, name)) {
        return true;
    }
    cloud.SetError(ZYROVFS::VFS_ERR_NOT_FOUND, "");
    LOG_ERROR_AT(at, "Failed to find / from [%s]", path.c_str());
    return false;
}

}  // namespace ZYROCloud

#endif
