/** File systems that a user mounts, and answers for. */
#ifndef ZYROVFS_CORE_USER_MOUNT_H
#define ZYROVFS_CORE_USER_MOUNT_H

namespace ZYROVFS {

/**
 * Whether a fuse file system is mounted at an entry of a folder, or at the folder itself for an
 * empty name. Its user's program tells of any owner it likes, and may never answer. The program is
 * not asked.
 */
bool IsUsersMount(int folder, const char* name);

}  // namespace ZYROVFS

#endif
