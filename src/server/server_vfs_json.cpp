#include "core/error_cell.h"
#include "core/log.h"
#include "core/no_throw.h"
#include "server/server_account.h"
#include "server/server_vfs.h"

namespace ZYROVFS::Server {
bool VFSServer::CreateJsonObj(unsigned int uid, VFS_CONFIG_MODE mode, Json::Value& out,
                              bool encrypt) {
    return NoThrow(VFS_ERR_BAD_PARAM, [&] {
        out = Json::Value(Json::objectValue);
        out["protocol"] = protocol_;
        out["hostname"] = hostname_;
        out["port"] = port_;
        out["alias"] = alias_;
        out["account"] = account_;
        out["codepage"] = codepage_;
        out["uri_path"] = uri_path_;
        out["path"] = "";
        out["max_connection"] = max_connection_;
        if (!WriteSecret("password", password_, encrypt, out)) {
            return false;
        }
        std::string id;
        if (!GetServerID(id)) {
            LOG_ERROR("Failed to get server ID");
            return Fail(VFS_ERR_INVALID_SERVER);
        }
        if (mode == VFS_CONFIG_CONNECT) {
            return WriteMountedPaths(uid, id, out);
        }
        WriteRemotePath(uid, id, out);
        return true;
    });
}

bool VFSServer::WriteMountedPaths(unsigned int uid, const std::string& id, Json::Value& out) {
    std::string remote;
    std::string local;
    if (!FindLocalPath(uid, id, uri_path_, codepage_, remote, local)) {
        return false;
    }
    out["uri_path"] = remote;
    out["path"] = local;
    return true;
}

void VFSServer::WriteRemotePath(unsigned int uid, const std::string& id, Json::Value& out) {
    Json::Value connection;
    if (!CfgGetByID(uid, VFS_CONFIG_CONNECT, id.c_str(), connection)) {
        LOG_ERROR("Wrong parameters, %s, %u", id.c_str(), uid);
    }
    // Only a mount knows the path that the server really has. What a caller gave for a server that
    // is not connected is dropped.
    uri_path_ = connection.get("uri_path", "").asString();
    out["uri_path"] = uri_path_;
}

bool VFSServer::DecryptCredentials(unsigned int, VFS_CONFIG_MODE, Json::Value& conf) {
    return NoThrow(VFS_ERR_FAILED,
                   [&] { return !conf.isMember("password") || DecipherSecret("password", conf); });
}

bool VFSServer::RemoveCredentials(unsigned int, VFS_CONFIG_MODE, Json::Value& conf) {
    if (conf.isObject()) {
        conf.removeMember("password");
    }
    return true;
}

}  // namespace ZYROVFS::Server
