/**
 * How an operation of a driver ends. Whether it worked and why it failed are two facts, the answer
 * and the driver's record; they are brought together here.
 */
#ifndef ZYROVFS_CLOUD_GUARD_H
#define ZYROVFS_CLOUD_GUARD_H

#include <json/value.h>

#include <exception>

#include "core/log.h"
#include "zyrovfs/cloud.h"

namespace ZYROCloud {

/**
 * The end of every operation, whose record was `before` at its begin. A failure has a code, though
 * some steps set none: VFS_ERR_CLOUD_FAILED then. A success leaves none of its own: what it
 * overcame on the way, such as a token that had ended or an answer of 503, is no failure.
 */
inline bool Conclude(Cloud& cloud, bool done, const Json::Value& before) {
    if (done) {
        cloud.SetError(before);
    } else if (cloud.GetErrorCode() == ZYROVFS::VFS_ERR_NONE) {
        cloud.SetError(ZYROVFS::VFS_ERR_CLOUD_FAILED, "");
    }
    return done;
}

/**
 * For a part of an operation that ends otherwise: runs `body`, which answers bool. What a service
 * answers, and what a caller hands in, may have any shape, and jsoncpp tells a value of the wrong
 * type by exception; that is logged and gives VFS_ERR_CLOUD_FAILED.
 */
template <typename Body>
bool Barrier(Cloud& cloud, Body body,
             ZYROVFS::SourceLine at = ZYROVFS::SourceLine::Here()) noexcept {
    try {
        return body();
    } catch (const std::exception& e) {
        LOG_ERROR_AT(at, "Wrong value in a request or its answer, %s", e.what());
        cloud.SetError(ZYROVFS::VFS_ERR_CLOUD_FAILED, "");
        return false;
    }
}

/** Runs `body`, which answers bool, behind the barrier, and concludes. */
template <typename Body>
bool Guard(Cloud& cloud, Body body, ZYROVFS::SourceLine at = ZYROVFS::SourceLine::Here()) noexcept {
    return Barrier(
        cloud,
        [&] {
            const Json::Value before = cloud.GetError();
            return Conclude(cloud, Barrier(cloud, body, at), before);
        },
        at);
}

}  // namespace ZYROCloud

#endif
