/**
 * Starting another program: what it begins with is what stands here, whatever the caller is like.
 * No signal is blocked, ignored or handled; descriptors and environment are the ones named.
 */
#ifndef ZYROVFS_MOUNT_PROGRAM_H
#define ZYROVFS_MOUNT_PROGRAM_H

#include <sys/types.h>

#include <string>
#include <vector>

#include "core/source_line.h"

namespace ZYROVFS {

struct Program {
    std::vector<std::string> command;      ///< path, then the arguments
    std::vector<std::string> environment;  ///< "NAME=value"
    std::vector<int> descriptors;          ///< become 0, 1, 2 and so on; -1 is /dev/null
};

/**
 * Starts a child of this process, which has root's identity in full if this one can have it, and
 * its own otherwise. Its pid, or -1 with errno; then there is nothing to collect.
 */
pid_t StartChild(const Program& program);

/**
 * Starts a daemon: in a session of its own, out of reach of the signals of the caller's terminal,
 * at "/", and no child of this process. It is the user for good: with only its effective id
 * changed it could become root again, and the loader and GLib would take it for a set-uid program
 * and ignore the address of the bus. A uid of -1 leaves it the identity of this process. An
 * identity that cannot be had is logged in the name of `at`. The pid, or -1 with errno.
 */
pid_t StartDaemon(const Program& program, uid_t uid, SourceLine at = SourceLine::Here());

}  // namespace ZYROVFS

#endif
