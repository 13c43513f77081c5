#include "cloud/account.h"

#include <memory>

#include "cloud/guard.h"
#include "cloud/public_cloud.h"
#include "zyrovfs/cloud_utils.h"

namespace ZYROCloud {

bool AskAccount(_tag_cloud_type type, unsigned int uid, Json::Value& profile,
                const Json::Value& params, Json::Value& out, Json::Value& error) {
    error = Json::Value();
    const std::unique_ptr<Cloud> cloud(Utils::CreateCloudByConfig(type, uid, profile));
    if (cloud == nullptr) {
        return false;
    }
    auto* const account = dynamic_cast<PublicCloud*>(cloud.get());
    if (account != nullptr) {
        account->TokenIsGiven();
    }
    const bool answered = Guard(*cloud, [&] { return cloud->GetAccountInfo(params, out); });
    error = cloud->GetError();
    if (account != nullptr && profile["access_token"] != account->Token().access_token) {
        profile["access_token"] = account->Token().access_token;
        profile["refresh_token"] = account->Token().refresh_token;
        profile["expire_time"] = account->Token().expire_time;
        profile.removeMember("expires_in");  // was the life of the token before
    }
    return answered;
}

}  // namespace ZYROCloud
