#include "zyrovfs/server.h"

#include "core/error_cell.h"
#include "core/log.h"
#include "core/no_throw.h"
#include "server/server_mgr.h"
#include "server/server_remount.h"
#include "zyrovfs/protocol.h"

namespace ZYROVFS::Server {
namespace {

std::string ProtocolOf(const Json::Value& conf) {
    const Json::Value protocol = conf.get("protocol", "");
    return protocol.isString() ? protocol.asString() : "";
}

/** The profile as Add stores it; a connection is mounted on the way. */
bool MakeProfile(ServerMgr& mgr, unsigned int uid, VFS_CONFIG_MODE mode, const Json::Value& conf,
                 bool force, Json::Value& profile) {
    MountOutcome outcome = MountOutcome::kDescribeFailed;
    if (mode == VFS_CONFIG_CONNECT) {
        outcome = MountAndDescribe(mgr, uid, conf, force, profile);
    } else if (mgr.CreateJsonObj(uid, mode, profile, true)) {
        outcome = MountOutcome::kDone;
    }
    if (outcome == MountOutcome::kDone) {
        return true;
    }
    if (outcome == MountOutcome::kMountFailed) {
        LOG_ERROR("Mount failed, uid=%u, mode=%u, code=%u", uid, mode, GetError());
    } else if (mode == VFS_CONFIG_CONNECT) {
        LOG_ERROR("CreateJsonObj failed, uid=%u, mode=%u, code=%u", uid, mode, GetError());
    } else {
        LOG_ERROR("createJsonObj failed, uid=%u, mode=%u, code=%u", uid, mode, GetError());
    }
    return false;
}

bool DoAdd(unsigned int uid, VFS_CONFIG_MODE mode, std::string& serverID, Json::Value conf,
           bool force, Json::Value& out) {
    // An id alone connects a saved profile, whose credentials are enciphered.
    const bool fromSaved = !serverID.empty() && conf.isNull();
    if (fromSaved && !CfgGetByID(uid, VFS_CONFIG_SERVER, serverID.c_str(), conf)) {
        LOG_ERROR("CfgGetByID failed, uid=%u, mode=%u, serverID=%s, code=%u", uid, mode,
                  serverID.c_str(), GetError());
        return Fail(VFS_ERR_FAILED);
    }
    if (CfgIsFull(uid, mode, ProtocolOf(conf).c_str())) {
        return Fail(VFS_ERR_CONFIG_FULL);
    }
    ServerMgr mgr;
    if (!mgr.Load(uid, mode, conf, fromSaved, true)) {
        LOG_ERROR("serverMgr load failed, code=%u", GetError());
        return false;
    }
    if (!mgr.GetServerID(serverID)) {
        LOG_ERROR("Failed to get server ID, uid=%u, mode=%u, code=%u", uid, mode, GetError());
        return false;
    }
    Json::Value profile;
    if (!MakeProfile(mgr, uid, mode, conf, force, profile)) {
        return false;
    }
    // The mount stands, so a connection that is recorded already counts as added.
    if (!CfgAppend(uid, mode, serverID.c_str(), profile) && mode != VFS_CONFIG_CONNECT) {
        LOG_ERROR("CfgAppend failed, uid=%u, mode=%u, code=%u", uid, mode, GetError());
        return false;
    }
    out = profile;
    return true;
}

bool AddCatalogueWords(Json::Value& out) {
    const std::string protocol = out["protocol"].asString();
    Json::Value info;
    if (!Protocol::GetProtocol(protocol.c_str(), info)) {
        LOG_ERROR("Failed to get protocol %s", protocol.c_str());
        return Fail(VFS_ERR_FAILED);
    }
    out["api"] = info["api"];
    out["protocol_name"] = info["name"];
    return true;
}

bool DoGet(unsigned int uid, VFS_CONFIG_MODE mode, const char* serverID, bool withCredentials,
           bool online, Json::Value& out) {
    Json::Value conf;
    if (!CfgGetByID(uid, mode, serverID, conf)) {
        // The blank before the comma is part of the text that log watchers know.
        LOG_ERROR("CfgGetByID failed, uid=%u, mode=%u , serverID=%s, code=%u", uid, mode,
                  serverID == nullptr ? "" : serverID, GetError());
        return false;
    }
    ServerMgr mgr;
    if (!mgr.Load(uid, mode, conf, true, online)) {
        LOG_ERROR("serverMgr load failed, uid=%u, mode=%u, serverID=%s, code=%u", uid, mode,
                  serverID, GetError());
        return Fail(VFS_ERR_UNKNOWN);
    }
    if (!mgr.CreateJsonObj(uid, mode, out, false)) {
        LOG_ERROR("serverMgr create json obj failed, uid=%u, mode=%u, serverID=%s, code=%u", uid,
                  mode, serverID, GetError());
        return Fail(VFS_ERR_UNKNOWN);
    }
    if (!withCredentials) {
        mgr.RemoveCredentials(uid, mode, out);
    }
    return AddCatalogueWords(out);
}

bool DoDelete(unsigned int uid, VFS_CONFIG_MODE mode, const char* serverID) {
    Json::Value conf;
    if (!CfgGetByID(uid, mode, serverID, conf)) {
        return GetError() == VFS_ERR_CONFIG_NOT_FOUND;  // nothing there is what was wanted
    }
    // The record goes first: a remote side that hangs must not keep a deleted profile alive.
    if (!CfgDeleteByID(uid, mode, serverID)) {
        LOG_ERROR("CfgDeleteByID failed, uid=%u, mode=%u, serverID=%s, code=%u", uid, mode,
                  serverID, GetError());
        return false;
    }
    ServerMgr mgr;
    if (!mgr.Load(uid, mode, conf, true, false)) {
        LOG_ERROR("serverMgr load failed, uid=%u, mode=%u, serverID=%s, code=%u", uid, mode,
                  serverID, GetError());
        return Fail(VFS_ERR_BAD_PARAM);
    }
    mgr.Unmount(uid, mode);
    if (!mgr.DeletePostProcess(uid, mode)) {
        LOG_ERROR("Server mgr delete failed, uid=%u, mode=%u, serverID=%s, code=%u", uid, mode,
                  serverID, GetError());
    }
    return true;
}

/** What Connect and Disconnect begin with. */
bool LoadConnection(ServerMgr& mgr, unsigned int uid, const char* serverID, Json::Value& conf) {
    if (!CfgGetByID(uid, VFS_CONFIG_CONNECT, serverID, conf)) {
        return Fail(VFS_ERR_CONFIG_NOT_FOUND);
    }
    if (!mgr.Load(uid, VFS_CONFIG_CONNECT, conf, true, false)) {
        LOG_ERROR("serverMgr load failed, uid=%u, serverID=%s, code=%u", uid, serverID, GetError());
        return Fail(VFS_ERR_BAD_PARAM);
    }
    return true;
}

bool DoConnect(unsigned int uid, const char* serverID, bool force) {
    ServerMgr mgr;
    Json::Value conf;
    if (!LoadConnection(mgr, uid, serverID, conf)) {
        return false;
    }
    if (!mgr.Mount(uid, VFS_CONFIG_CONNECT, conf, force)) {
        LOG_ERROR("Mount failed, uid=%u, code=%u", uid, GetError());
        return false;
    }
    return true;
}

bool DoDisconnect(unsigned int uid, const char* serverID) {
    ServerMgr mgr;
    Json::Value conf;
    if (!LoadConnection(mgr, uid, serverID, conf)) {
        return false;
    }
    if (!mgr.Unmount(uid, VFS_CONFIG_CONNECT)) {
        LOG_ERROR("Mount failed, uid=%u, code=%u", uid, GetError());  // the text of Connect, kept
        return false;
    }
    return true;
}

}  // namespace

bool Add(unsigned int uid, VFS_CONFIG_MODE mode, std::string& serverID, Json::Value conf,
         bool force, Json::Value& out) {
    return NoThrow(VFS_ERR_BAD_PARAM,
                   [&] { return DoAdd(uid, mode, serverID, std::move(conf), force, out); });
}

bool Get(unsigned int uid, VFS_CONFIG_MODE mode, const char* serverID, bool withCredentials,
         bool online, Json::Value& out) {
    return NoThrow(VFS_ERR_UNKNOWN,
                   [&] { return DoGet(uid, mode, serverID, withCredentials, online, out); });
}

bool Delete(unsigned int uid, VFS_CONFIG_MODE mode, const char* serverID) {
    if (serverID == nullptr) {
        return Fail(VFS_ERR_BAD_PARAM);
    }
    return NoThrow(VFS_ERR_BAD_PARAM, [&] { return DoDelete(uid, mode, serverID); });
}

bool Connect(unsigned int uid, const char* serverID, bool force) {
    return NoThrow(VFS_ERR_BAD_PARAM, [&] { return DoConnect(uid, serverID, force); });
}

bool Disconnect(unsigned int uid, const char* serverID) {
    return NoThrow(VFS_ERR_BAD_PARAM, [&] { return DoDisconnect(uid, serverID); });
}

}  // namespace ZYROVFS::Server
