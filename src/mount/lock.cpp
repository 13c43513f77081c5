#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <ctime>

#include "core/entry_name.h"
#include "core/error_cell.h"
#include "core/handle.h"
#include "core/identity.h"
#include "core/log.h"
#include "core/paths.h"
#include "mount/lock.h"
#include "mount/mkdir.h"
#include "zyrovfs/global.h"
#include "zyrovfs/utils.h"

namespace ZYROVFS::Utils {
namespace {

constexpr useconds_t kPause = 50000;
constexpr time_t kPatience = 110;  // seconds; on a machine at rest 2200 pauses

constexpr int kShared = LOCK_SH | LOCK_NB;
constexpr int kExclusive = LOCK_EX | LOCK_NB;

constexpr unsigned kMntMask = 0x10;

struct LockSlot {
    UniqueFd file;  ///< none while the lock is not held
    unsigned mask;
    int count;
    int operation;  ///< the flock operation by which it is held
};

/** The locks of this process, whoever it acts for; a mask of 0 ends the table. */
LockSlot rgslckList[] = {
    {UniqueFd(), kMntMask, 0, 0},
    {UniqueFd(), 0, 0, 0},
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
    if (!slot.file) {
        return 0;
    }
    if (slot.count >= 2) {
        --slot.count;
        return 0;
    }
    const bool unlocked = flock(slot.file.Get(), LOCK_UN) == 0;
    if (!unlocked) {
        SetPlatformErr(ZOS_ERR_UNLOCK_FAILED);
    }
    slot.file.Reset();
    slot.count = 0;
    return unlocked ? 0 : -1;
}

enum class Attempt { kTaken, kBusy, kRefused, kFailed };

/** Readable for the user's own processes whatever the umask of the one that made it. */
bool OpenToReaders(int fd) {
    constexpr mode_t kMode = 0644;
    struct stat info {};
    return fstat(fd, &info) == 0 &&
           ((info.st_mode & kMode) == kMode || fchmod(fd, info.st_mode | kMode) == 0);
}

/** As root where the process can be: an older version's file may be closed to the user. */
UniqueFd OpenLockFile(const std::string& path, uid_t actor) {
    const EffectiveUid as_root(0);
    const EntryPath place = SplitPath(path);
    const OwnedFolder folder = OwnedFolder::Open(place.folder, actor);
    UniqueFd fd = folder ? folder.OpenOrMake(place.name, O_RDONLY, 0644) : UniqueFd();
    if (fd && !OpenToReaders(fd.Get())) {
        errno = 0;  // nobody else's to change, and open it is
    }
    return fd;
}

/** Opened anew by each attempt: whoever cleans up below /tmp may have removed what others hold. */
Attempt TakeFree(LockSlot& slot, const std::string& path, uid_t actor, int operation) {
    slot.file = OpenLockFile(path, actor);
    if (!slot.file) {
        return Attempt::kFailed;
    }
    slot.count = 1;
    if (flock(slot.file.Get(), operation) != 0) {
        const int saved = errno;
        Release(slot);
        errno = saved;
        return Attempt::kBusy;
    }
    slot.operation = operation;
    return Attempt::kTaken;
}

Attempt Take(LockSlot& slot, const std::string& path, uid_t actor, int operation) {
    if (!slot.file) {
        return TakeFree(slot, path, actor, operation);
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

/** Of a clock that nobody sets; the pauses are longer than it is coarse. */
timespec Now() {
    timespec now{};
    clock_gettime(CLOCK_MONOTONIC_COARSE, &now);
    return now;
}

bool IsPast(const timespec& end) {
    const timespec now = Now();
    return now.tv_sec > end.tv_sec || (now.tv_sec == end.tv_sec && now.tv_nsec >= end.tv_nsec);
}

/** By the clock: a busy machine makes each pause longer, and must not make the whole wait so. */
bool TakeWithin110Seconds(LockSlot& slot, const std::string& path, uid_t actor, int operation) {
    timespec end = Now();
    end.tv_sec += kPatience;
    for (;;) {
        const Attempt result = Take(slot, path, actor, operation);
        if (result == Attempt::kTaken) {
            return true;
        }
        if (result == Attempt::kFailed) {
            SetPlatformErr(ZOS_ERR_OPEN_FAILED);
            return false;
        }
        if (result == Attempt::kRefused || IsPast(end)) {
            SetPlatformErr(ZOS_ERR_TRY_AGAIN);
            return false;
        }
        usleep(kPause);
    }
}

}  // namespace

bool LockMnt(bool exclusive) {
    const uid_t actor = GetActorUID();
    const std::string path = paths::MountLock(actor);
    if (!CreateParentFolder(path, actor)) {
        LOG_ERROR("Failed to lock init");
        return false;
    }
    if (!TakeWithin110Seconds(*FindSlot(kMntMask), path, actor, exclusive ? kExclusive : kShared)) {
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

namespace ZYROVFS {

HeldLock HeldMountLock() {
    const Utils::LockSlot& slot = *Utils::FindSlot(Utils::kMntMask);
    return {slot.file.Get(), slot.count, slot.operation};
}

void AdoptMountLock(const HeldLock& lock) {
    Utils::LockSlot& slot = *Utils::FindSlot(Utils::kMntMask);
    if (!slot.file && lock.fd >= 0) {
        slot.file.Reset(lock.fd);
        slot.count = lock.count;
        slot.operation = lock.operation;
    }
}

}  // namespace ZYROVFS
