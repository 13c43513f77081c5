/** File systems that a user mounts, and answers for. */
#ifndef ZYROVFS_CORE_USER_MOUNT_H
#define ZYROVFS_CORE_USER_MOUNT_H

#include <string>

namespace ZYROVFS {

/**
 * Whether a fuse file system is mounted at an entry of a folder, or at the folder itself for an
 * empty name. Its user's program tells of any owner it likes, and may never answer. The program is
 * not asked.
 */
bool IsUsersMount(int folder, const char* name);

/** Takes such a mount away, also from a program that is alive or hangs; what it shows is not
 * touched. True when there is none. For root. */
bool DetachUsersMount(int folder, const char* name);

/** What is mounted at a folder or below it: users' file systems alone, or others too. Where that
 * cannot be found out, others are. */
enum class MountsBelow { kNone, kOfUsers, kOfTheSystem };
MountsBelow FindMountsBelow(const std::string& folder);

}  // namespace ZYROVFS

#endif
