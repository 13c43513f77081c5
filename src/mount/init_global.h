/** Readiness of this process for whoever is about to mount. */
#ifndef ZYROVFS_MOUNT_INIT_GLOBAL_H
#define ZYROVFS_MOUNT_INIT_GLOBAL_H

namespace ZYROVFS {

/**
 * InitGlobal(uid, false) that does not rest on a chain which has died since: a process that has
 * been ready for long, or has ended the user's bus itself to recover, gets what is dead started
 * again.
 */
bool InitForMount(unsigned int uid);

/** Whether one of the acting user's three daemons is known to be gone. */
bool IsAnyDaemonDead();

}  // namespace ZYROVFS

#endif
