/** The program that does what only the user may: a job of src/mount/helper.h, or a lookup. */
#ifndef ZYROVFS_SERVER_HELPER_PROGRAM_H
#define ZYROVFS_SERVER_HELPER_PROGRAM_H

#include "mount/helper.h"

namespace ZYROVFS {

/** GIO's path of a URI; and the whole lookup, which may connect on demand. */
extern const HelperJob kAskGioJob;
extern const HelperJob kLookUpJob;

/** Runs the job of this name, as RunAsUser has asked for it. Returns only for an unknown name. */
void RunHelper(const char* job);

}  // namespace ZYROVFS

#endif
