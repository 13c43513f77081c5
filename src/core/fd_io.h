/** Whole texts through descriptors, past interruptions and pieces. */
#ifndef ZYROVFS_CORE_FD_IO_H
#define ZYROVFS_CORE_FD_IO_H

#include <string>

namespace ZYROVFS {

/** Writes all of `text`. False leaves errno telling the cause; a part may have been written. */
bool WriteAll(int fd, const std::string& text);

/** Appends all that is left to read. False leaves errno telling the cause, and what was read. */
bool ReadAll(int fd, std::string& text);

/** The same for at most `limit` bytes: EFBIG when there are more, whatever the file's size says. */
bool ReadUpTo(int fd, size_t limit, std::string& text);

}  // namespace ZYROVFS

#endif
