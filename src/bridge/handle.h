/** One open file of a backend. */
#ifndef ZYROVFS_BRIDGE_HANDLE_H
#define ZYROVFS_BRIDGE_HANDLE_H

#include <atomic>
#include <mutex>
#include <string>

#include "bridge/file_info.h"
#include "bridge/gvfs_utils.h"
#include "core/handle.h"
#include "zyrovfs/zyrocloud.h"

struct ZYROCloud_Handle {
    /** 16 MiB: what a backend downloads at once, unless it says otherwise. */
    static constexpr long long kBufferBytes = 0x1000000;
    /** What the buffer holds, whatever anybody says: services are asked for one byte more than is
     * wanted, and that byte is part of what came. */
    static constexpr long long kBufferRoom = kBufferBytes + 1;

    ZYROCloud::UniqueCloud cloud;  ///< null for a connection that cannot be used
    std::string path;              ///< or the item's id
    std::string url;               ///< of the contents; empty until the first download
    ZYROCloud::UniqueFileInfo info;
    long long position = 0;  ///< in the remote file, of the next download

    ZYROVFS::UniqueCString buffer;  ///< of kBufferRoom bytes, or none
    long long buffer_position = 0;
    long long buffer_filled = 0;
    std::atomic<long long> buffer_size{kBufferBytes};  ///< what a backend downloads at once
    std::mutex mutex;                                  ///< guards the buffer but for `buffer_size`

    int descriptor = -1;  ///< spare
};

#endif
