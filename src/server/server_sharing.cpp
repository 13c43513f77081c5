#include "server/server_sharing.h"

#include "core/error_cell.h"
#include "core/log.h"
#include "core/no_throw.h"
#include "server/profile_text.h"
#include "server/server_account.h"

namespace ZYROVFS::Server {
namespace {

bool AreTextsFine(const Json::Value& conf) {
    return IsProfileText("protocol", conf["protocol"], kNameRule) &&
           IsProfileText("alias", conf["alias"], kAnyLengthRule) &&
           IsProfileText("email", conf["email"], kNameRule) &&
           IsOptionalText("path", conf["path"], kRemoteNameRule);
}

}  // namespace

bool SharingServer::Load(unsigned int uid, VFS_CONFIG_MODE, Json::Value conf, bool, bool) {
    return NoThrow(VFS_ERR_BAD_PARAM, [&] {
        for (const char* key : {"protocol", "alias", "email"}) {
            if (!conf.isMember(key)) {
                LOG_ERROR("Profile without %s", key);
                return Fail(VFS_ERR_BAD_PARAM);
            }
        }
        if (!AreTextsFine(conf) || !IsConfigValid(conf)) {
            return Fail(VFS_ERR_BAD_PARAM);
        }
        protocol_ = conf["protocol"].asString();
        alias_ = conf["alias"].asString();
        email_ = conf["email"].asString();
        path_ = conf["path"].asString();
        connect_status_ = GetConnectStatus(uid);
        return true;
    });
}

bool SharingServer::GetServerID(std::string& id) {
    id = "sharing://" + email_;
    return true;
}

bool SharingServer::IsConfigValid(Json::Value&) {
    return true;
}

bool SharingServer::GetAccountName(std::string& name) {
    name = AccountNameOf(email_);
    return true;
}

bool SharingServer::GetURI(std::string& uri) {
    return GetServerID(uri);
}

bool SharingServer::Mount(unsigned int uid, VFS_CONFIG_MODE mode, const Json::Value& conf,
                          bool force) {
    std::string id;
    if (!GetServerID(id)) {
        LOG_ERROR("Failed to get server ID, uid=%u, mode=%u, code=%u", uid, mode, GetError());
        return Fail(VFS_ERR_INVALID_SERVER);
    }
    return MountAccount(uid, email_, "", id, conf, force);
}

bool SharingServer::Unmount(unsigned int uid, VFS_CONFIG_MODE) {
    std::string id;
    if (!GetServerID(id)) {
        LOG_ERROR("Failed to get server ID");
        return Fail(VFS_ERR_INVALID_SERVER);
    }
    return UnmountServer(uid, id, nullptr);
}

bool SharingServer::CreateJsonObj(unsigned int uid, VFS_CONFIG_MODE mode, Json::Value& out, bool) {
    out = Json::Value(Json::objectValue);
    out["protocol"] = protocol_;
    out["alias"] = alias_.empty() ? email_ : alias_;
    out["email"] = email_;
    out["path"] = "";
    std::string id;
    if (!GetServerID(id)) {
        LOG_ERROR("Failed to get server ID");
        return Fail(VFS_ERR_INVALID_SERVER);
    }
    return mode != VFS_CONFIG_CONNECT || WriteAccountPath(uid, id, path_, out);
}

bool SharingServer::DumpToStruct(unsigned int, VFS_CONFIG_MODE, _tag_VFS_CONFIG_INFO_& info) {
    std::string uri;
    GetURI(uri);
    DumpAccount(protocol_, uri, alias_, email_, connect_status_, info);
    return true;
}

bool SharingServer::DecryptCredentials(unsigned int, VFS_CONFIG_MODE, Json::Value&) {
    return true;
}

bool SharingServer::RemoveCredentials(unsigned int, VFS_CONFIG_MODE, Json::Value&) {
    return true;
}

bool SharingServer::DeletePostProcess(unsigned int, VFS_CONFIG_MODE) {
    return true;
}

bool SharingServer::IsUpdateNeedsRemount(unsigned int, VFS_CONFIG_MODE, const Json::Value&) {
    return false;
}

}  // namespace ZYROVFS::Server
