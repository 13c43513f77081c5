/** How large a file a service takes. */
#ifndef ZYROVFS_CLOUD_SIZE_LIMIT_H
#define ZYROVFS_CLOUD_SIZE_LIMIT_H

#include "core/error_cell.h"
#include "zyrovfs/cloud.h"

namespace ZYROCloud {

inline constexpr unsigned long long kSizeNotKnown = ~0ULL;

/** False, with a platform error and VFS_ERR_FILE_TOO_LARGE, above `most`; a size that is not known
 * passes. */
inline bool FitsLimit(Cloud& cloud, unsigned long long size, unsigned long long most,
                      ZYROVFS::SourceLine at = ZYROVFS::SourceLine::Here()) {
    if (size == kSizeNotKnown || size <= most) {
        return true;
    }
    ZYROVFS::SetPlatformErr(0xa400, at);
    cloud.SetError(ZYROVFS::VFS_ERR_FILE_TOO_LARGE, "");
    return false;
}

}  // namespace ZYROCloud

#endif
