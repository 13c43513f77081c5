#include "cloud/account.h"

#include <memory>

#include "cloud/guard.h"
#include "zyrovfs/cloud_utils.h"

namespace ZYROCloud {

bool AskAccount(_tag_cloud_type type, unsigned int uid, const Json::Value& profile,
                const Json::Value& params, Json::Value& out, Json::Value& error) {
    error = Json::Value();
    const std::unique_ptr<Cloud> cloud(Utils::CreateCloudByConfig(type, uid, profile));
    if (cloud == nullptr) {
        return false;
    }
    if (!Guard(*cloud, [&] { return cloud->GetAccountInfo(params, out); })) {
        error = cloud->GetError();
        return false;
    }
    return true;
}

}  // namespace ZYROCloud
