#include "server/helper_program.h"

#include <cstring>

namespace ZYROVFS {

void RunHelper(const char* job) {
    for (const HelperJob* row : {&kMountJob, &kUnmountJob, &kAskGioJob, &kLookUpJob,
                                 &kLaunchFuseJob, &kRepairMountPointJob}) {
        if (strcmp(row->name, job) == 0) {
            RunHelperJob(*row);
        }
    }
}

}  // namespace ZYROVFS
