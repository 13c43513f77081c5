#include <algorithm>
#include <iterator>

#include "cloud/dropbox/dropbox.h"
#include "cloud/guard.h"
#include "cloud/onedrive/onedrive.h"
#include "core/json.h"
#include "zyrovfs/cloud_utils.h"

namespace ZYROCloud::Utils {

using namespace ZYROVFS;

namespace {

using AskSpace = bool (*)(Cloud& cloud, Json::Value& space);

bool AskDropbox(Cloud& cloud, Json::Value& space) {
    return static_cast<Dropbox&>(cloud).GetSpaceUsage(space);
}

bool AskOneDrive(Cloud& cloud, Json::Value& space) {
    return static_cast<OneDrive&>(cloud).GetQuota(space);
}

/** Where a service's answers tell what. */
struct Service {
    _tag_cloud_type type;
    const char* name;
    const char* email;
    AskSpace ask_space;  ///< null where the account's own answer tells the space, too
    const char* used;    ///< null where only the rest is told
    const char* total;
    const char* available;
};

constexpr Service kServices[] = {
    {CLOUD_TYPE_BOX, ".name", ".login", nullptr, ".space_used", ".space_amount", nullptr},
    {CLOUD_TYPE_GOOGLE, ".user.displayName", ".user.emailAddress", nullptr, ".quotaBytesUsed",
     ".quotaBytesTotal", nullptr},
    {CLOUD_TYPE_DROPBOX, ".name.display_name", ".email", AskDropbox, ".used",
     ".allocation.allocated", nullptr},
    {CLOUD_TYPE_ONEDRIVE, ".name", ".emails.account", AskOneDrive, nullptr, ".quota", ".available"},
};

std::string Text(const Json::Value& answer, const char* path) {
    const Json::Value value = Json::Path(path).resolve(answer, Json::Value());
    return value.isString() ? value.asString() : "";
}

/** Services write sizes as numbers or as their decimal text. */
long long Bytes(const Json::Value& answer, const char* path) {
    int64_t bytes = -1;
    json::toInt64(Json::Path(path).resolve(answer, Json::Value()), bytes);
    return std::max<int64_t>(bytes, -1);
}

long long Used(const Service& service, const Json::Value& space, long long total) {
    if (service.used != nullptr) {
        return Bytes(space, service.used);
    }
    const long long available = Bytes(space, service.available);
    return total < 0 || available < 0 ? -1 : std::max(total - available, 0LL);
}

bool Summarize(const Service& service, Cloud& cloud, AccountSummary& out) {
    Json::Value account;
    Json::Value space;
    if (!cloud.GetAccountInfo(Json::Value(Json::objectValue), account) ||
        (service.ask_space != nullptr && !service.ask_space(cloud, space))) {
        return false;
    }
    const Json::Value& told = service.ask_space == nullptr ? account : space;
    out.name = Text(account, service.name);
    out.email = Text(account, service.email);
    out.total = Bytes(told, service.total);
    out.used = Used(service, told, out.total);
    return true;
}

}  // namespace

bool GetAccountSummary(Cloud* cloud, AccountSummary& out) {
    if (cloud == nullptr) {
        return false;
    }
    return Guard(*cloud, [&] {
        const auto* service = std::find_if(
            std::begin(kServices), std::end(kServices),
            [type = cloud->GetCloudType()](const Service& s) { return s.type == type; });
        if (service == std::end(kServices)) {
            cloud->SetError(VFS_ERR_NOT_SUPPORTED, "");
            return false;
        }
        return Summarize(*service, *cloud, out);
    });
}

}  // namespace ZYROCloud::Utils
