/**
 * What a service answers, and what a caller hands in, may have any shape. jsoncpp tells a value of
 * the wrong type by exception; the operation that reads it turns that into its own failure here.
 */
#ifndef ZYROVFS_CLOUD_GUARD_H
#define ZYROVFS_CLOUD_GUARD_H

#include <exception>

#include "core/log.h"
#include "zyrovfs/cloud.h"

namespace ZYROCloud {

/** Runs `body`, which answers bool. An exception is logged and gives VFS_ERR_CLOUD_FAILED. */
template <typename Body>
bool Guard(Cloud& cloud, Body body, ZYROVFS::SourceLine at = ZYROVFS::SourceLine::Here()) noexcept {
    try {
        return body();
    } catch (const std::exception& e) {
        LOG_ERROR_AT(at, "Wrong value in a request or its answer, %s", e.what());
        cloud.SetError(ZYROVFS::VFS_ERR_CLOUD_FAILED, "");
        return false;
    }
}

}  // namespace ZYROCloud

#endif
