/**
 * The end of a browser's request, held back until it is known where in it the file ends: what
 * closes the part, and other fields behind it, must not reach the cloud.
 */
#ifndef ZYROVFS_CLOUD_RELAY_TAIL_H
#define ZYROVFS_CLOUD_RELAY_TAIL_H

#include <sys/types.h>

#include <cstddef>
#include <functional>
#include <string>

#include "core/handle.h"

namespace ZYROCloud {

class RelayTail {
  public:
    static constexpr size_t kSize = 131072;
    /** read(2) of the request. */
    using Reader = std::function<ssize_t(char* data, size_t size)>;

    /** Reads `size` bytes, at most kSize. False, with a log line or that of `read`, when memory or
     * the request ends before that. */
    bool Load(size_t size, const Reader& read);
    /** Ends the file at the first place of `boundary`. False, logged, when there is none. */
    bool CutAt(const std::string& boundary);
    /** Moves up to `want` bytes of the file to `data`; 0 at its end. */
    size_t Take(char* data, size_t want);

    bool IsLoaded() const { return loaded_; }
    /** Bytes of the file that wait here. */
    size_t Left() const { return length_ - offset_; }
    /** Bytes behind the file. */
    size_t Behind() const { return read_ - length_; }

  private:
    ZYROVFS::UniqueCString buffer_;
    size_t read_ = 0;
    size_t length_ = kSize;  ///< of the file in it
    size_t offset_ = 0;
    bool loaded_ = false;
};

}  // namespace ZYROCloud

#endif
