#include "mount/proc.h"

#include <unistd.h>
#include <zosplatform/process.h>

#include <cerrno>
#include <csignal>
#include <cstring>
#include <memory>

#include "core/handle.h"
#include "core/log.h"
#include "zyrovfs/utils.h"

namespace ZYROVFS {

void WaitForEnd(pid_t pid, int polls) {
    for (int poll = 0; poll < polls && YLIBCProcAlive(pid) != 0; ++poll) {
        usleep(500000);
    }
}

namespace Utils {

bool IsProcAlive(int pid, const char* name, unsigned int uid) {
    if (pid == 0 || YLIBCProcAlive(pid) == 0 || name == nullptr) {
        return false;
    }
    const std::unique_ptr<_tag_YLIBCPROC_, FreeWith<YLIBCProcFree>> proc(YLIBCProcGetByPid(pid));
    return proc != nullptr && strcmp(proc->name, name) == 0 && proc->uid == uid;
}

bool KillProc(int pid, const char* name, unsigned int uid, bool wait) {
    constexpr int kPolls = 60;
    if (!IsProcAlive(pid, name, uid)) {
        return true;
    }
    if (pid < 1) {
        LOG_ERROR("invalid process id");
        return false;
    }
    if (kill(pid, SIGTERM) != 0) {
        if (errno != ESRCH) {
            LOG_ERROR("%s (%d) Failed to kill %d, reason=%s(%d)", name, static_cast<int>(uid), pid,
                      strerror(errno), errno);
        }
        return false;
    }
    if (wait) {
        WaitForEnd(pid, kPolls);
    }
    return true;
}

}  // namespace Utils
}  // namespace ZYROVFS
