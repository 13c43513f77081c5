#include "cloud/public_cloud.h"

#include <cerrno>

#include "cloud/guard.h"
#include "cloud/profile_member.h"
#include "core/json.h"
#include "http/api_handler.h"

namespace ZYROCloud {

using namespace ZYROVFS;

namespace {

/** The account document that a profile holds as text; null when it is none. */
Json::Value AccountOf(const Json::Value& profile) {
    if (!profile.isObject() || !profile.isMember("account_info")) {
        return Json::Value(Json::objectValue);
    }
    const Json::Value& text = profile["account_info"];
    Json::Value account;
    if (text.isString() && json::fromString(account, text.asString()) && account.isObject()) {
        return account;
    }
    errno = EINVAL;
    LOG_ERROR("Failed to decode to json format, %m");
    return Json::Value();
}

}  // namespace

PublicCloud::PublicCloud(unsigned int owner, const Json::Value& profile)
    : Cloud(owner, ProfileMember(profile, "server_id")),
      token_{ProfileMember(profile, "access_token"), ProfileMember(profile, "refresh_token"),
             ProfileMember(profile, "expire_time")},
      client_id_(ProfileMember(profile, "client_id")),
      account_info_(AccountOf(profile)) {}

bool PublicCloud::UpdateProfileConfig(Server::VFS_CONFIG_MODE mode, const Json::Value& fields) {
    // Set gives back the id; that of a driver does not change.
    std::string id = server_id;
    return Server::Set(uid, mode, id, fields, false);
}

bool PublicCloud::UpdateAccountInfo() {
    return UpdateAccountInfoWith(Json::Value());
}

bool PublicCloud::UpdateAccountInfoWith(const Json::Value& params, SourceLine at) {
    return Guard(
        *this,
        [&] {
            Json::Value account, fields;
            if (!GetAccountInfo(params, account)) {
                return false;
            }
            fields["account_info"] = json::toString(account);
            if (!UpdateProfileConfig(Server::VFS_CONFIG_CONNECT, fields)) {
                SetError(VFS_ERR_PROFILE_UPDATE, "");
                LOG_ERROR_AT(at, "Failed to update connection config");
                return false;
            }
            UpdateProfileConfig(Server::VFS_CONFIG_SERVER, fields);
            return true;
        },
        at);
}

bool PublicCloud::DoAPIRequest(int retries) {
    return Guard(*this, [&] {
        if (api == nullptr) {
            SetError(VFS_ERR_CLOUD_FAILED, "");
            return false;
        }
        if (api->Process(retries)) {
            return true;
        }
        SetError(api->GetError());
        if (GetErrorCode() != VFS_ERR_UNAUTHORIZED || !RefreshToken(true)) {
            return false;
        }
        api->AddHeader("Authorization", Bearer());
        return api->Process(retries);
    });
}

}  // namespace ZYROCloud
