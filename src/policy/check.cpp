#include <unistd.h>
#include <zosplatform/group.h>
#include <zosplatform/user.h>

#include <cstdlib>
#include <cstring>

#include "core/error_cell.h"
#include "core/identity.h"
#include "core/no_throw.h"
#include "policy/belonging.h"
#include "policy/user_settings.h"
#include "zyrovfs/cfg.h"

namespace ZYROVFS::Cfg {
namespace {

/** The one user who never gets in unless as an administrator, not even to shared links. */
constexpr unsigned int kRefusedUid = 1025;
constexpr char kSharing[] = "sharing";

bool IsConsulted(_VFS_USER_CONFIG_ config) {
    return (config.flags & VFS_USER_CONFIG_CONSULT) != 0;
}

PermissionDecision Yes(PERMISSION_RULE rule, unsigned int gid = 0) {
    return {true, rule, gid};
}

PermissionDecision No(PERMISSION_RULE rule) {
    return {false, rule, 0};
}

/** What decides before any policy; false when nothing does. */
bool DecideByStanding(unsigned int uid, PermissionDecision& decision) {
    // Below 0 it cannot be told: that lets nobody in who would otherwise be refused.
    if (YLIBGroupIsAdminGroupMemByUid(uid, 1) > 0) {
        decision = Yes(PERMISSION_ADMINISTRATOR);
        return true;
    }
    if (uid == kRefusedUid) {
        decision = No(PERMISSION_REFUSED_UID);
        return true;
    }
    return false;
}

PermissionDecision DecideByListedGroups(const PYLIBCSZLIST groups) {
    const VFSGroup policy;
    const char* text = nullptr;
    for (int i = 0; (text = YLIBCSzListGet(groups, i)) != nullptr; ++i) {
        const unsigned long gid = strtoul(text, nullptr, 10);
        Json::Value entry;
        if (policy.Get(gid, entry) && IsEnabled(entry)) {
            return Yes(PERMISSION_GROUP_ENABLED, static_cast<unsigned int>(gid));
        }
    }
    return No(PERMISSION_NOT_ENABLED);
}

/** For a user whose standing decides nothing. */
PermissionDecision DecideByMembership(unsigned int uid, _VFS_USER_CONFIG_ config) {
    PZYROUSER found = nullptr;
    if (ZYROUserGetByUID(uid, &found) < 0) {
        LOG_ERROR("Failed to get user (%d), " ZYROERR_FORMAT, static_cast<int>(uid), ZYROERR_ARGS);
        return No(PERMISSION_NO_SUCH_USER);
    }
    const UniqueUser user(found);
    const UniqueList groups(YLIBGroupInfoListGet(user->name, 0));
    if (!groups) {
        return No(PERMISSION_NO_GROUPS);
    }
    const PermissionDecision decision =
        IsConsulted(config) ? DecideByListedGroups(groups.get()) : No(PERMISSION_NOT_ENABLED);
    // Of a directory that does not answer the list has no groups, and there is no other sign of it.
    return decision.allowed || YLIBGroupIsAdminGroupMemByUid(uid, 1) >= 0
               ? decision
               : No(PERMISSION_NO_GROUPS);
}

PermissionDecision DecideByGroups(unsigned int uid, _VFS_USER_CONFIG_ config) {
    PermissionDecision decision{};
    return DecideByStanding(uid, decision) ? decision : DecideByMembership(uid, config);
}

PermissionDecision Decide(unsigned int uid, _VFS_USER_CONFIG_ config, const char* protocol) {
    PermissionDecision decision{};
    if (DecideByStanding(uid, decision)) {
        return decision;
    }
    if (protocol != nullptr && strncmp(protocol, kSharing, strlen(kSharing)) == 0) {
        return Yes(PERMISSION_SHARING);
    }
    if (!IsConsulted(config)) {
        return Yes(PERMISSION_NOT_CONSULTED);
    }
    Json::Value entry;
    if (!VFSUser().Get(uid, entry)) {
        LOG_ERROR("Failed to get user vfs config, uid=%u", uid);
        return No(PERMISSION_NOT_ENABLED);
    }
    if (IsEnabled(entry)) {
        return Yes(PERMISSION_USER_ENABLED);
    }
    return DecideByMembership(uid, config);
}

/** Memory that runs out is a no as well. */
template <typename Question>
PermissionDecision Ask(Question question) {
    const ErrorCellKept kept;  // whatever the policy file is like
    // A policy that cannot be read leaves its reader at root; a question changes nobody's identity.
    const EffectiveUid caller(geteuid());
    PermissionDecision decision = No(PERMISSION_NOT_ENABLED);
    NoThrow(VFS_ERR_FAILED, [&] {
        decision = question();
        return true;
    });
    return decision;
}

}  // namespace

bool CheckPermissionByUserName(const char* name, _VFS_USER_CONFIG_ config, const char* protocol) {
    PZYROUSER found = nullptr;
    if (ZYROUserGet(name, &found) < 0) {
        LOG_ERROR("Failed to get user (%s), " ZYROERR_FORMAT, name == nullptr ? "" : name,
                  ZYROERR_ARGS);
        return false;
    }
    const UniqueUser user(found);
    return CheckPermissionByUID(user->uid, config, protocol);
}

bool CheckPermissionByUID(unsigned int uid, _VFS_USER_CONFIG_ config, const char* protocol) {
    return ExplainPermission(uid, config, protocol).allowed;
}

bool CheckPermissionByBelongingGID(unsigned int uid, _VFS_USER_CONFIG_ config, const char*) {
    return Ask([&] { return DecideByGroups(uid, config); }).allowed;
}

PermissionDecision ExplainPermission(unsigned int uid, _VFS_USER_CONFIG_ config,
                                     const char* protocol) {
    return Ask([&] { return Decide(uid, config, protocol); });
}

}  // namespace ZYROVFS::Cfg
