/** The user's list of SSH host keys, which ssh-keygen is told to change by its path. */
#ifndef ZYROVFS_MOUNT_KNOWN_HOSTS_H
#define ZYROVFS_MOUNT_KNOWN_HOSTS_H

#include <sys/types.h>

namespace ZYROVFS {

/**
 * Whether the user has such a list: a regular file in a folder that nobody but the user and root
 * can change. ssh-keygen would wait for the writer of a FIFO in its place without end, with the
 * mount lock held.
 */
bool HasKnownHosts(uid_t uid);

}  // namespace ZYROVFS

#endif
