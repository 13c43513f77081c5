#include "core/error_cell.h"
#include "core/log.h"
#include "core/no_throw.h"
#include "server/server_mgr.h"
#include "server/server_remount.h"
#include "zyrovfs/server.h"

namespace ZYROVFS::Server {
namespace {

/** One change of one profile on its way through the steps. */
struct Change {
    unsigned int uid;
    VFS_CONFIG_MODE mode;
    std::string& server_id;  ///< the caller's
    const Json::Value& changes;
    bool force;
    Json::Value stored;
    Json::Value merged;
    std::string new_id;
};

/** Logs a failed step; its cause stays in the cell. */
bool LogStep(const Change& change, const char* what, SourceLine at = SourceLine::Here()) {
    LOG_ERROR_AT(at, "%s failed, uid=%u, mode=%u, serverID=%s, code=%u", what, change.uid,
                 change.mode, change.server_id.c_str(), GetError());
    return false;
}

/** Logs a failed step with the cause that it left, then sets the code that Set answers with. */
bool FailStep(const Change& change, const char* what, __tag_vfs_err_ code,
              SourceLine at = SourceLine::Here()) {
    LogStep(change, what, at);
    return Fail(code, at);
}

/** Reads the profile, credentials in plain text, and lays the changes over it. */
bool Merge(Change& change, ServerMgr& mgr) {
    if (!CfgGetByID(change.uid, change.mode, change.server_id.c_str(), change.stored)) {
        return Fail(VFS_ERR_CONFIG_NOT_FOUND);
    }
    if (!mgr.Load(change.uid, change.mode, change.stored, true, false)) {
        return FailStep(change, "serverMgr load", VFS_ERR_BAD_PARAM);
    }
    if (!mgr.DecryptCredentials(change.uid, change.mode, change.stored)) {
        return LogStep(change, "DecryptCredential");
    }
    change.merged = change.stored;
    for (const std::string& key : change.changes.getMemberNames()) {
        if (!change.changes[key].isNull()) {
            change.merged[key] = change.changes[key];
        }
    }
    return true;
}

bool LoadMerged(Change& change, ServerMgr& mgr) {
    if (!mgr.Load(change.uid, change.mode, change.merged, false, false)) {
        return FailStep(change, "serverMgr load", VFS_ERR_BAD_PARAM);
    }
    if (!mgr.GetServerID(change.new_id)) {
        LOG_ERROR("Failed to get server ID, uid=%u, mode=%u, code=%u", change.uid, change.mode,
                  GetError());
        return Fail(VFS_ERR_FAILED);
    }
    return true;
}

/** The mount gets the changes as they were given, not the merged profile. */
bool Remount(Change& change, ServerMgr& mgr) {
    mgr.Unmount(change.uid, VFS_CONFIG_CONNECT);
    if (!LoadMerged(change, mgr)) {
        return false;
    }
    switch (MountAndDescribe(mgr, change.uid, change.changes, change.force, change.merged)) {
        case MountOutcome::kDone:
            return true;
        case MountOutcome::kMountFailed:
            // The question that a refused mount leaves behind is about the new location.
            change.server_id = change.new_id;
            return LogStep(change, "Mount");
        case MountOutcome::kDescribeFailed:
            break;
    }
    return FailStep(change, "CreateJsonObj", VFS_ERR_BAD_PARAM);
}

bool Rewrite(Change& change, ServerMgr& mgr) {
    if (!LoadMerged(change, mgr)) {
        return false;
    }
    if (!mgr.CreateJsonObj(change.uid, change.mode, change.merged, true)) {
        return FailStep(change, "CreateJsonObj", VFS_ERR_BAD_PARAM);
    }
    return true;
}

bool Store(Change& change) {
    if (!CfgSetByID(change.uid, change.mode, change.server_id, change.new_id, change.merged)) {
        LOG_ERROR("CfgSetByID failed, uid=%u, mode=%u, serverID=%s, newServerID=%s, code=%u",
                  change.uid, change.mode, change.server_id.c_str(), change.new_id.c_str(),
                  GetError());
        return Fail(VFS_ERR_FAILED);
    }
    change.server_id = change.new_id;
    return true;
}

}  // namespace

bool Set(unsigned int uid, VFS_CONFIG_MODE mode, std::string& serverID, const Json::Value& conf,
         bool force) {
    return NoThrow(VFS_ERR_BAD_PARAM, [&] {
        Change change{uid, mode, serverID, conf, force, {}, {}, {}};
        ServerMgr mgr;
        if (!Merge(change, mgr)) {
            return false;
        }
        const bool remount =
            mode == VFS_CONFIG_CONNECT && mgr.IsUpdateNeedsRemount(uid, VFS_CONFIG_CONNECT, conf);
        return (remount ? Remount(change, mgr) : Rewrite(change, mgr)) && Store(change);
    });
}

}  // namespace ZYROVFS::Server
