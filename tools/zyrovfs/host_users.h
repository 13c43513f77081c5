/** The users of this machine who have something mounted. */
#ifndef ZYROVFS_TOOLS_HOST_USERS_H
#define ZYROVFS_TOOLS_HOST_USERS_H

#include <string>
#include <vector>

namespace tool {

/**
 * Ends what every user has mounted, and the user's daemons: first as the user's own command would,
 * so that servers are told, then the bus, on which everything else hangs, and the tree. Profiles,
 * records of connections and all that is remote stay. What would not end is said in `problems`.
 */
bool DisconnectUsers(std::vector<std::string>& problems);

}  // namespace tool

#endif
