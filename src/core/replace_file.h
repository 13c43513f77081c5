/** Replacing a whole file so that a reader sees the old one or the new one, never a part. */
#ifndef ZYROVFS_CORE_REPLACE_FILE_H
#define ZYROVFS_CORE_REPLACE_FILE_H

#include <sys/types.h>

#include <string>

namespace ZYROVFS {

/**
 * New file beside the old one, written, flushed to disk, renamed over. A crash, a kill or a full
 * disk at any point leaves the old file; a symbolic link in its place is replaced, not followed.
 * False leaves errno telling the cause. Does not throw.
 */
bool ReplaceFile(const std::string& path, const std::string& text, mode_t mode) noexcept;

}  // namespace ZYROVFS

#endif
