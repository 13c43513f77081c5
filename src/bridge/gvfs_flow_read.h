/** Reading an open file of any service, piece by piece. */
#ifndef ZYROVFS_BRIDGE_GVFS_FLOW_READ_H
#define ZYROVFS_BRIDGE_GVFS_FLOW_READ_H

#include <functional>
#include <string>

#include "core/source_line.h"
#include "zyrovfs/cloud.h"
#include "zyrovfs/zyrocloud.h"

namespace ZYROCloud::gvfs {

/** What the entry points for downloads take. */
struct ReadCall {
    ZYROCloud_Handle* handle;
    const void* p2;
    const void* p3;
    char** dest;
    long long size;
    int* err;
};

/** Where the contents of the handle's file are; false, logged, when that is not known. Asked once
 * for each handle. */
using UrlOf = std::function<bool(const ZYROCloud_Handle& handle, std::string& url)>;

/**
 * The download flow: up to `size` bytes and one more, as services are asked for, from where the
 * last read ended. The handle's driver has to be one of `type`. Bytes read, 0 at the end, -1 for a
 * failure. Reads of several threads wait for each other, since a process does one transfer at a
 * time. Log lines are those of the caller.
 */
long long ReadInto(const ReadCall& call, _tag_cloud_type type, const UrlOf& url_of,
                   ZYROVFS::SourceLine at = ZYROVFS::SourceLine::Here());

}  // namespace ZYROCloud::gvfs

#endif
