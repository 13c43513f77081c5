#include "bridge/gvfs_flow_account.h"

#include <string>

#include "bridge/gvfs_utils.h"
#include "cloud/public_cloud.h"
#include "cloud/without_tokens.h"
#include "core/json.h"
#include "core/log.h"
#include "zyrovfs/cloud_utils.h"
#include "zyrovfs/global.h"
#include "zyrovfs/server.h"

namespace ZYROCloud::gvfs {

using namespace ZYROVFS;

bool FindConnection(const AccountCall& call, Json::Value& profile) {
    return Server::CfgGetByID(GetActorUID(), Server::VFS_CONFIG_CONNECT, call.server_id, profile) &&
           profile.isObject();
}

void LogCredentials(const AccountCall& call, SourceLine at) {
    LOG_ERROR_AT(at, "Failed to parse %s", WithoutTokens(call.json).c_str());
}

bool ParseCredentials(const AccountCall& call, Json::Value& out, SourceLine at) {
    if (json::fromString(out, call.json) && out.isObject()) {
        return true;
    }
    LogCredentials(call, at);
    return false;
}

void Merge(const AccountCall& call, const Json::Value& credentials, Json::Value& profile) {
    for (const std::string& member : credentials.getMemberNames()) {
        profile[member] = credentials[member];
    }
    profile["server_id"] = call.server_id;
}

bool UpdateAccount(const AccountCall& call, _tag_cloud_type type, const Json::Value& profile,
                   SourceLine at) {
    const UniqueCloud cloud(ZYROCloud::Utils::CreateCloudByConfig(type, GetActorUID(), profile));
    auto* const account = dynamic_cast<PublicCloud*>(cloud.get());
    if (account == nullptr) {
        LOG_ERROR_AT(at, "Failed to create cloud");
        return false;
    }
    if (account->UpdateAccountInfo()) {
        return true;
    }
    StoreError(*account, call.err);
    LOG_ERROR_AT(at, "Failed to get account from %s, err: %s", call.server_id,
                 ErrorText(*account).c_str());
    return false;
}

int CheckAccount(const AccountCall& call, _tag_cloud_type type, SourceLine at) {
    const auto check = [&] {
        Json::Value profile;
        Json::Value credentials;
        if (!AllGiven(at, call.server_id, call.json)) {
            return false;
        }
        if (!FindConnection(call, profile)) {
            return true;
        }
        if (!ParseCredentials(call, credentials, at)) {
            return false;
        }
        Merge(call, credentials, profile);
        return UpdateAccount(call, type, profile, at);
    };
    return NoThrow(VFS_ERR_FAILED, check, at) ? 1 : 0;
}

}  // namespace ZYROCloud::gvfs
