/**
 * The three ways in which the library changes its effective identity for a block. Identity is a
 * property of the process: never use these while another thread does work of its own.
 */
#ifndef ZYROVFS_CORE_IDENTITY_H
#define ZYROVFS_CORE_IDENTITY_H

#include <sys/types.h>

#include "core/source_line.h"

namespace _________ {

/**
 * Form 1: become a given user for a block, through IF_RUN_AS. The guard is true when the switch
 * succeeded; it switches back when it goes.
 */
class __ {
  public:
    __(uid_t uid, gid_t gid, ZYROVFS::SourceLine at, const char* tag);
    __(const __&) = delete;
    __& operator=(const __&) = delete;
    ~__();

    explicit operator bool() const { return switched_; }

  private:
    uid_t saved_uid_;
    gid_t saved_gid_;
    ZYROVFS::SourceLine at_;
    const char* tag_;
    bool switched_;
};

}  // namespace _________

/** `IF_RUN_AS(uid, 0) { ... } else { the switch failed }`; an id of -1 is not set. */
#define IF_RUN_AS(uid, gid)                                                               \
    if (const ::_________::__ zyrovfs_run_as{(uid), (gid), ::ZYROVFS::SourceLine::Here(), \
                                             "IF_RUN_AS"};                                \
        zyrovfs_run_as)

namespace ZYROVFS {

/**
 * Form 2: become root for a block. A section that cannot become root is logged and its block runs
 * all the same, with the identity that it has: the operation inside then fails or succeeds on its
 * own. Leaving sets errno (0, or 1 when a switch back failed), whatever the block left there.
 */
class CriticalSection {
  public:
    explicit CriticalSection(SourceLine at = SourceLine::Here());
    CriticalSection(const CriticalSection&) = delete;
    CriticalSection& operator=(const CriticalSection&) = delete;
    ~CriticalSection();

  private:
    uid_t saved_uid_;
    gid_t saved_gid_;
    SourceLine at_;
};

#define ENTERCriticalSection \
    {                        \
        const ::ZYROVFS::CriticalSection zyrovfs_critical_section;
#define LEAVECriticalSection }

/** Form 3: a short switch of the effective uid alone. Nothing is logged; the result says if it
 * worked. */
class EffectiveUid {
  public:
    explicit EffectiveUid(uid_t uid);
    EffectiveUid(const EffectiveUid&) = delete;
    EffectiveUid& operator=(const EffectiveUid&) = delete;
    ~EffectiveUid();

    explicit operator bool() const { return switched_; }

  private:
    uid_t saved_;
    bool switched_;
};

/**
 * Form 3 as the task registry needs it: root's effective uid where it is not in force already. A
 * switch that fails is logged in the name of `at`, and the block runs all the same.
 */
class RootUid {
  public:
    explicit RootUid(SourceLine at = SourceLine::Here());
    RootUid(const RootUid&) = delete;
    RootUid& operator=(const RootUid&) = delete;
    ~RootUid();

  private:
    uid_t saved_;
    SourceLine at_;
};

/**
 * Effective uid root for one step, without a change of group. Nothing is given back until the owner
 * says so: a step that failed leaves its process at root. A switch to root that fails is logged,
 * and the step runs with the identity that there is.
 */
class RootUntilRestored {
  public:
    explicit RootUntilRestored(SourceLine at = SourceLine::Here());
    RootUntilRestored(const RootUntilRestored&) = delete;
    RootUntilRestored& operator=(const RootUntilRestored&) = delete;

    /** Back to the uid of before; false, with errno, when that fails. */
    bool Restore() const;
    uid_t Saved() const { return saved_; }

  private:
    uid_t saved_;
};

/**
 * Form 3 as the start of the daemons needs it: effective uid of the user, effective group root.
 * Failures while leaving are logged in the name of `at` and change nothing else.
 */
class UserWithRootGroup {
  public:
    explicit UserWithRootGroup(uid_t uid, SourceLine at = SourceLine::Here());
    UserWithRootGroup(const UserWithRootGroup&) = delete;
    UserWithRootGroup& operator=(const UserWithRootGroup&) = delete;
    ~UserWithRootGroup();

  private:
    uid_t saved_uid_;
    gid_t saved_gid_;
    SourceLine at_;
};

}  // namespace ZYROVFS

#endif
