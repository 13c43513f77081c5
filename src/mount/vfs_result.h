/**
 * How GIO's outcome of a mount or unmount becomes a failure code. These callbacks run in the forked
 * child and end its main loop. `data` is a VFSMountOperaion; without one they set VFS_ERR_BAD_PARAM
 * and do nothing else.
 */
#ifndef ZYROVFS_MOUNT_VFS_RESULT_H
#define ZYROVFS_MOUNT_VFS_RESULT_H

#include <gio/gio.h>

namespace ZYROVFS {

/** Sets VFS_ERR_NONE for a location that is mounted, by this call or before, else a code. */
void MountFinished(GObject* file, GAsyncResult* result, gpointer data) noexcept;

/**
 * Sets VFS_ERR_NONE for a location that is unmounted, not mounted, or whose user was asked. Any
 * other failure is only logged and leaves the cell alone: an unmount that the server refused does
 * not keep a connection from being forgotten.
 */
void UnmountFinished(GObject* mount, GAsyncResult* result, gpointer data) noexcept;

}  // namespace ZYROVFS

#endif
