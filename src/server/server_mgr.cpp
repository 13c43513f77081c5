#include "server/server_mgr.h"

#include <zosplatform/process.h>

#include "core/error_cell.h"
#include "core/identity.h"
#include "core/log.h"
#include "core/no_throw.h"
#include "server/server_factory.h"

namespace ZYROVFS::Server {
namespace {

/** The daemon that keeps watch over mounts; every attempt to mount wakes it. */
constexpr const char* kMountService = "pkg-FileHarbor-zyrovfsd";

/** An operation without an instance is a mistake of the caller's: told to the log, not the cell. */
bool Held(const std::unique_ptr<ServerBase>& server, const char* operation,
          SourceLine at = SourceLine::Here()) {
    if (server == nullptr) {
        LOG_ERROR_AT(at, "%s failed, No instance", operation);
        return false;
    }
    return true;
}

}  // namespace

bool ServerMgr::Load(unsigned int uid, VFS_CONFIG_MODE mode, Json::Value& conf, bool decrypt,
                     bool online) {
    return NoThrow(VFS_ERR_BAD_PARAM, [&] {
        if (!conf.isMember("protocol")) {
            LOG_ERROR("Load instance failed, no protocol");
            return Fail(VFS_ERR_BAD_PARAM);
        }
        if (!conf["protocol"].isString()) {
            LOG_ERROR("Load instance failed, protocol is not a text");
            return Fail(VFS_ERR_BAD_PARAM);
        }
        server_.reset();
        server_ = server_factory(conf["protocol"].asString());
        return server_ != nullptr && server_->Load(uid, mode, conf, decrypt, online);
    });
}

bool ServerMgr::GetServerID(std::string& id) {
    return Held(server_, "GetServerID") && server_->GetServerID(id);
}

bool ServerMgr::CreateJsonObj(unsigned int uid, VFS_CONFIG_MODE mode, Json::Value& out,
                              bool encrypt) {
    return Held(server_, "CreateJsonObj") && server_->CreateJsonObj(uid, mode, out, encrypt);
}

bool ServerMgr::DecryptCredentials(unsigned int uid, VFS_CONFIG_MODE mode, Json::Value& conf) {
    return Held(server_, "DecryptCredentials") && server_->DecryptCredentials(uid, mode, conf);
}

bool ServerMgr::RemoveCredentials(unsigned int uid, VFS_CONFIG_MODE mode, Json::Value& conf) {
    return Held(server_, "RemoveCredentials") && server_->RemoveCredentials(uid, mode, conf);
}

bool ServerMgr::DumpToStruct(unsigned int uid, VFS_CONFIG_MODE mode, _tag_VFS_CONFIG_INFO_& info) {
    return Held(server_, "DumpToStruct") && server_->DumpToStruct(uid, mode, info);
}

bool ServerMgr::IsUpdateNeedsRemount(unsigned int uid, VFS_CONFIG_MODE mode,
                                     const Json::Value& changes) {
    return Held(server_, "IsUpdateNeedsRemount") &&
           server_->IsUpdateNeedsRemount(uid, mode, changes);
}

bool ServerMgr::DeletePostProcess(unsigned int uid, VFS_CONFIG_MODE mode) {
    if (!Held(server_, "DeletePostProcess")) {
        return false;
    }
    bool done = false;
    ENTERCriticalSection;
    done = server_->DeletePostProcess(uid, mode);
    LEAVECriticalSection;
    return done;
}

bool ServerMgr::Mount(unsigned int uid, VFS_CONFIG_MODE mode, const Json::Value& conf, bool force) {
    if (!Held(server_, "Mount")) {
        return false;
    }
    bool mounted = false;
    ENTERCriticalSection;
    mounted = server_->Mount(uid, mode, conf, force);
    YLIBServicectlStart(kMountService, 0);
    LEAVECriticalSection;
    return mounted;
}

bool ServerMgr::Unmount(unsigned int uid, VFS_CONFIG_MODE mode) {
    if (!Held(server_, "Unmount")) {
        return false;
    }
    bool unmounted = false;
    ENTERCriticalSection;
    unmounted = server_->Unmount(uid, mode);
    LEAVECriticalSection;
    return unmounted;
}

}  // namespace ZYROVFS::Server
