/**
 * The helper's side of RunAsUser: a process that was made for one job, shares nothing with the
 * caller's memory, and ends with its caller.
 */
#ifndef ZYROVFS_MOUNT_HELPER_H
#define ZYROVFS_MOUNT_HELPER_H

#include <json/value.h>
#include <sys/types.h>

#include "core/source_line.h"

namespace ZYROVFS {

/**
 * A job begins as root, where the caller can be root, and ends by EndHelper. An exception that it
 * lets out ends the helper by a signal, which the caller takes for what it is.
 */
struct HelperJob {
    const char* name;
    void (*run)(const Json::Value& request);
};

extern const HelperJob kMountJob;
extern const HelperJob kUnmountJob;
extern const HelperJob kLaunchFuseJob;
extern const HelperJob kRepairMountPointJob;

/** Reads the request from standard input and runs the job, in the name and state of the caller. */
[[noreturn]] void RunHelperJob(const HelperJob& job) noexcept;

/** Ends the helper. The status goes by the socket as well as to the system. */
[[noreturn]] void EndHelper(int status);

/** The user that the job is for, as the request has it. */
uid_t UserOf(const Json::Value& request);

/** BecomeUserForGood, and ends with the caller still: the kernel forgets that with the identity. */
bool BecomeUserInHelper(uid_t uid, SourceLine at = SourceLine::Here());

}  // namespace ZYROVFS

#endif
