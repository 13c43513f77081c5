/**
 * Files of paths that lead through folders to which all users may write. No link is followed that
 * somebody else than root could have put there, at any component.
 */
#ifndef ZOSPLATFORM_SRC_SAFE_PATH_H
#define ZOSPLATFORM_SRC_SAFE_PATH_H

#include <sys/stat.h>

#include <string>

#include "support.h"

namespace zos {

/** The folder that `path` stands in, and in `name` what it is called there. */
Fd OpenFolderOf(const std::string& path, std::string& name);

/** One folder down, no link followed: opened for reading, made by root with `mode` if it is missing
 * and `make` is set. What another user has in its place becomes root's when root comes by. */
Fd EnterRootsFolder(int parent, const char* name, bool make, mode_t mode);

/**
 * Opens a regular file, made with `mode` if it is missing; no FIFO is waited for. In two steps,
 * since the kernel may refuse to open by O_CREAT what another owner has in a sticky folder.
 */
Fd OpenOrMake(const std::string& path, int flags, mode_t mode);

}  // namespace zos

#endif
