#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>

#include "core/error_cell.h"
#include "core/handle.h"
#include "core/log.h"
#include "core/paths.h"
#include "mount/mkdir.h"
#include "zyrovfs/global.h"
#include "zyrovfs/utils.h"

namespace ZYROVFS::Utils {
namespace {

constexpr int kAttempts = 2201;
constexpr useconds_t kPause = 50000;  // 2200 pauses between 2201 attempts make 110 seconds

constexpr int kShared = LOCK_SH | LOCK_NB;
constexpr int kExclusive = LOCK_EX | LOCK_NB;

constexpr unsigned kMntMask = 0x10;

struct LockSlot {
    FILE* stream;  ///< null while the lock is not held
    unsigned mask;
    int count;
    int operation;  ///< the flock operation by which it is held
};

/** The locks of this process, whoever it acts for; a mask of 0 ends the table. */
LockSlot rgslckList[] = {
    {nullptr, kMntMask, 0, 0},
    {nullptr, 0, 0, 0},
};

LockSlot* FindSlot(unsigned mask) {
    for (LockSlot* slot = rgslckList; slot->mask != 0; ++slot) {
        if (slot->mask == mask) {
            return slot;
        }
    }
    return nullptr;
}

int Release(LockSlot& slot) {
    if (slot.stream == nullptr) {
        return 0;
    }
    if (slot.count >= 2) {
        --slot.count;
        return 0;
    }
    const bool unlocked = flock(fileno(slot.stream), LOCK_UN) == 0;
    if (!unlocked) {
        SetPlatformErr(ZOS_ERR_UNLOCK_FAILED);
    }
    fclose(slot.stream);
    slot.stream = nullptr;
    slot.count = 0;
    return unlocked ? 0 : -1;
}

enum class Attempt { kTaken, kBusy, kRefused };

Attempt TakeFree(LockSlot& slot, const char* path, int operation) {
    // A child that only forks shares the lock; a program that it executes must not keep it.
    slot.stream = fopen(path, "re");
    if (slot.stream == nullptr) {
        return Attempt::kBusy;
    }
    slot.count = 1;
    if (flock(fileno(slot.stream), operation) != 0) {
        const int saved = errno;
        Release(slot);
        errno = saved;
        return Attempt::kBusy;
    }
    slot.operation = operation;
    return Attempt::kTaken;
}

Attempt Take(LockSlot& slot, const char* path, int operation) {
    if (slot.stream == nullptr) {
        return TakeFree(slot, path, operation);
    }
    ++slot.count;
    if (slot.operation == kShared && operation == kExclusive) {
        // Two holders that both waited for the other's shared lock would wait for ever.
        Release(slot);
        errno = EDEADLK;
        return Attempt::kRefused;
    }
    return Attempt::kTaken;
}

/** Anybody may write to the folder of the lock: nothing found there is followed or waited for. */
bool MakeLockFile(const char* path) {
    struct stat info {};
    if (stat(path, &info) == 0 && S_ISREG(info.st_mode)) {
        return true;
    }
    const UniqueFd fd(
        open(path, O_WRONLY | O_CREAT | O_TRUNC | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC, 0666));
    if (!fd) {
        SetPlatformErr(ZOS_ERR_OPEN_FAILED);
    }
    return static_cast<bool>(fd);
}

bool TakeWithin110Seconds(LockSlot& slot, const char* path, int operation) {
    for (int attempt = 1;; ++attempt) {
        const Attempt result = Take(slot, path, operation);
        if (result == Attempt::kTaken) {
            return true;
        }
        if (result == Attempt::kRefused || attempt == kAttempts) {
            SetPlatformErr(ZOS_ERR_TRY_AGAIN);
            return false;
        }
        usleep(kPause);
    }
}

}  // namespace

bool LockMnt(bool exclusive) {
    const std::string path = paths::MountLock(GetActorUID());
    if (!CreateParentFolder(path)) {
        LOG_ERROR("Failed to lock init");
        return false;
    }
    LockSlot* slot = FindSlot(kMntMask);
    if (!MakeLockFile(path.c_str()) ||
        !TakeWithin110Seconds(*slot, path.c_str(), exclusive ? kExclusive : kShared)) {
        LOG_ERROR("Failed to lock %s, %m", path.c_str());
        return false;
    }
    return true;
}

int UnLockMnt() {
    return Release(*FindSlot(kMntMask));
}

int ForceUnLockMnt() {
    // The same release on purpose: clean-up gives back its own level and nobody else's.
    return UnLockMnt();
}

}  // namespace ZYROVFS::Utils
