/** Replacing a whole file so that a reader sees the old one or the new one, never a part. */
#ifndef ZYROVFS_CORE_REPLACE_FILE_H
#define ZYROVFS_CORE_REPLACE_FILE_H

#include <sys/types.h>

#include <string>

namespace ZYROVFS {

/** Whom a written file belongs to; an id of -1 stays as it is. */
struct FileOwner {
    uid_t uid = static_cast<uid_t>(-1);
    gid_t gid = static_cast<gid_t>(-1);
};

/**
 * New file beside the old one, written, flushed to disk, renamed over. A crash, a kill or a full
 * disk at any point leaves the old file; a symbolic link in its place is replaced, not followed.
 * With an owner the new file is given to it before it takes its place; a caller that may not
 * give files away keeps them. False leaves errno telling the cause. Does not throw.
 */
bool ReplaceFile(const std::string& path, const std::string& text, mode_t mode,
                 FileOwner owner = {}) noexcept;

}  // namespace ZYROVFS

#endif
