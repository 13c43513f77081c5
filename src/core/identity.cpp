#include "core/identity.h"

#include <unistd.h>

#include <cerrno>
#include <cstring>

#include "core/log.h"

namespace {

constexpr uid_t kUnchanged = static_cast<uid_t>(-1);

/** A set...id call of form 2, which reports each switch to root and each failure. */
bool SetReported(const char* name, int (*set)(uid_t, uid_t, uid_t), uid_t id,
                 ZYROVFS::SourceLine at) {
    if (set(kUnchanged, id, kUnchanged) == 0) {
        if (id == 0) {
            LOG_AUTH_INFO(at, "WARNING: set%s(%d, %d, %d)", name, -1, static_cast<int>(id), -1);
        }
        return true;
    }
    char buffer[1024];
    const char* reason = strerror_r(errno, buffer, sizeof buffer);
    LOG_AUTH_ERROR(at, "ERROR: set%s(%d, %d, %d) [%s]", name, -1, static_cast<int>(id), -1, reason);
    return false;
}

bool SetUid(uid_t uid, ZYROVFS::SourceLine at) {
    return SetReported("resuid", setresuid, uid, at);
}
bool SetGid(gid_t gid, ZYROVFS::SourceLine at) {
    return SetReported("resgid", setresgid, gid, at);
}

}  // namespace

namespace _________ {
namespace {

/** Entering and leaving take the same road: root first if needed, then the group, then the user. */
bool SwitchTo(uid_t uid, gid_t gid, uid_t effective_uid, gid_t effective_gid) {
    if (effective_uid != 0 && effective_uid != uid) {
        if (setresuid(kUnchanged, 0, kUnchanged) < 0) {
            return false;
        }
        effective_uid = 0;
    }
    if (effective_gid != gid && gid != kUnchanged && setresgid(kUnchanged, gid, kUnchanged) != 0) {
        return false;
    }
    return uid == effective_uid || uid == kUnchanged || setresuid(kUnchanged, uid, kUnchanged) == 0;
}

}  // namespace

__::__(uid_t uid, gid_t gid, ZYROVFS::SourceLine at, const char* tag)
    : saved_uid_(geteuid()), saved_gid_(getegid()), at_(at), tag_(tag), switched_(true) {
    if (saved_gid_ == gid && saved_uid_ == uid) {
        return;
    }
    if (!SwitchTo(uid, gid, saved_uid_, saved_gid_)) {
        switched_ = false;
        LOG_AUTH_ERROR(at_, "ERROR: %s(%d, %d)", tag_, static_cast<int>(uid),
                       static_cast<int>(gid));
    }
}

__::~__() {
    const uid_t uid = geteuid();
    const gid_t gid = getegid();
    if (uid == saved_uid_ && gid == saved_gid_) {
        return;
    }
    if (!SwitchTo(saved_uid_, saved_gid_, uid, gid)) {
        LOG_AUTH_CRIT(at_, "ERROR: ~%s(%d, %d)", tag_, static_cast<int>(saved_uid_),
                      static_cast<int>(saved_gid_));
    }
}

}  // namespace _________

namespace ZYROVFS {

CriticalSection::CriticalSection(SourceLine at)
    : saved_uid_(geteuid()), saved_gid_(getegid()), at_(at) {
    if ((saved_gid_ == 0 || SetGid(0, at_)) && (saved_uid_ == 0 || SetUid(0, at_))) {
        errno = 0;
        return;
    }
    errno = 1;
    LOG_AUTH_ERROR(at_, "ERROR: ENTERCriticalSection");
}

CriticalSection::~CriticalSection() {
    uid_t uid = geteuid();
    const gid_t gid = getegid();
    bool restored = true;
    if (uid != saved_uid_) {
        restored = SetUid(0, at_);
        uid = 0;
    }
    if (restored && gid != saved_gid_) {
        restored = SetGid(saved_gid_, at_);
    }
    if (restored && uid != saved_uid_) {
        restored = SetUid(saved_uid_, at_);
    }
    if (restored) {
        errno = 0;
        return;
    }
    errno = 1;
    LOG_AUTH_ERROR(at_, "ERROR: LEAVECriticalSection");
}

EffectiveUid::EffectiveUid(uid_t uid) : saved_(geteuid()), switched_(seteuid(uid) == 0) {}

EffectiveUid::~EffectiveUid() {
    if (seteuid(saved_) != 0) {
        switched_ = false;  // no one is left to tell; the next privileged step fails by itself
    }
}

RootUid::RootUid(SourceLine at) : saved_(geteuid()), at_(at) {
    if (saved_ != 0 && seteuid(0) != 0) {
        LOG_ERROR_AT(at_, "Fail to seteuid(0).");
    }
}

RootUid::~RootUid() {
    if (saved_ != 0 && seteuid(saved_) != 0) {
        LOG_ERROR_AT(at_, "Fail to seteuid(%u).", saved_);
    }
}

RootUntilRestored::RootUntilRestored(SourceLine at) : saved_(geteuid()) {
    if (saved_ != 0) {
        SetUid(0, at);
    }
}

bool RootUntilRestored::Restore() const {
    return geteuid() == saved_ || setresuid(kUnchanged, saved_, kUnchanged) == 0;
}

UserWithRootGroup::UserWithRootGroup(uid_t uid, SourceLine at)
    : saved_uid_(geteuid()), saved_gid_(0), at_(at) {
    if (saved_uid_ != uid && seteuid(uid) != 0) {
        LOG_ERROR_AT(at_, "Failed to set uid %u, %m", uid);
    }
    saved_gid_ = getegid();
    if (setegid(0) != 0) {
        LOG_ERROR_AT(at_, "Failed to set gid 0, %m");
    }
}

UserWithRootGroup::~UserWithRootGroup() {
    if (saved_gid_ != kUnchanged) {
        // The group goes back even without root, which is possible while it is the real one.
        const bool root = seteuid(0) == 0;
        if (setegid(saved_gid_) != 0 || !root) {
            LOG_ERROR_AT(at_, "Faile to setegid, %m");
        }
    }
    if (saved_uid_ != kUnchanged && seteuid(saved_uid_) != 0) {
        LOG_ERROR_AT(at_, "Faile to seteuid, %m");
    }
}

}  // namespace ZYROVFS
