#include <fcntl.h>
#include <sys/file.h>

#include "safe_path.h"
#include "support.h"
#include "zosplatform/file.h"

namespace {

constexpr useconds_t kPause = 50000;
constexpr long kTriesPerSecond = 1000000 / kPause;

/** Tries are counted rather than timed, so that a clock that is set cannot stretch the wait. */
bool Lock(int fd, int operation, long tries) {
    for (;;) {
        if (flock(fd, operation | LOCK_NB) == 0) {
            return true;
        }
        if ((errno != EWOULDBLOCK && errno != EINTR) || --tries <= 0) {
            return false;
        }
        usleep(kPause);
    }
}

}  // namespace

int YLIBCFileLockTimeByFile(const char* path, int exclusive, int seconds, int* fd) {
    if (path == nullptr || fd == nullptr) {
        SET_PLATFORM_ERROR(ZOS_ERR_BAD_PARAMETER);
        return 0;
    }
    *fd = -1;
    zos::Fd file =
        zos::OrOutOfMemory(zos::Fd(), [path] { return zos::OpenOrMake(path, O_RDWR, 0600); });
    if (!file) {
        SET_SYSTEM_ERROR(ZOS_ERR_OPEN_FAILED);
        return 0;
    }
    const long tries = seconds > 0 ? seconds * kTriesPerSecond + 1 : 1;
    if (!Lock(file.Get(), exclusive != 0 ? LOCK_EX : LOCK_SH, tries)) {
        SET_SYSTEM_ERROR(ZOS_ERR_SYSTEM);
        return 0;
    }
    *fd = file.Release();
    return 1;
}

int YLIBCFileUnlockByFile(int fd) {
    const zos::Fd file(fd);
    if (!file || flock(fd, LOCK_UN) != 0) {
        SET_PLATFORM_ERROR(ZOS_ERR_UNLOCK_FAILED);
        return 0;
    }
    return 1;
}
