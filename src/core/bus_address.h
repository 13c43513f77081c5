/** What this process has been told of users' session buses. */
#ifndef ZYROVFS_CORE_BUS_ADDRESS_H
#define ZYROVFS_CORE_BUS_ADDRESS_H

#include <sys/types.h>

#include <string>

namespace ZYROVFS {

/** Makes `address` that of `uid` for this process: kept, and in DBUS_SESSION_BUS_ADDRESS. */
bool SetBusAddress(uid_t uid, const std::string& address);

/** What SetBusAddress was told last, if that was for this user and is in force; empty otherwise. An
 * address that merely stands in the environment may be anybody's. */
std::string ToldBusAddress(uid_t uid);

}  // namespace ZYROVFS

#endif
