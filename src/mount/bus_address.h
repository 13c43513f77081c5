/** Where a user's session bus is found. */
#ifndef ZYROVFS_MOUNT_BUS_ADDRESS_H
#define ZYROVFS_MOUNT_BUS_ADDRESS_H

#include <sys/types.h>

#include <string>

namespace ZYROVFS {

/**
 * As the user's own file says, which whoever starts the bus writes; without one, what this process
 * was told (core/bus_address.h). What stands in the environment without that is never taken: who
 * listens there would be given the user's passwords. Empty when nobody knows.
 */
std::string BusAddressOf(uid_t uid);

}  // namespace ZYROVFS

#endif
