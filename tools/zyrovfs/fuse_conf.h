/** The line of /etc/fuse.conf without which a user's tree is the user's alone. */
#ifndef ZYROVFS_TOOLS_FUSE_CONF_H
#define ZYROVFS_TOOLS_FUSE_CONF_H

#include <string>

namespace tool {

/** True when users may give the mount option allow_other. */
bool FuseAllowsOther();

/** Adds the line if it is missing, marked as ours. */
bool AllowOther(std::string& problem);

/** Takes the line away if it is ours; the file is then, byte for byte, what it was. */
bool DisallowOther(std::string& problem);

}  // namespace tool

#endif
