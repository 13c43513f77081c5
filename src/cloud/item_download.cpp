#include "cloud/item_download.h"

#include "cloud/attempt.h"
#include "cloud/guard.h"
#include "http/api_handler.h"

namespace ZYROCloud {

using namespace ZYROVFS;

namespace {

bool Fail(Cloud& cloud) {
    cloud.SetError(VFS_ERR_CLOUD_FAILED, "");
    return false;
}

bool Receive(PublicCloud& cloud, XferData& xfer, std::string url, const ItemDownload& rules,
             SourceLine at) {
    AttemptPlan plan = DownloadPlan(cloud, xfer, url);
    plan.send = [&] {
        return cloud.GetAPIHandler()->SetURL(url, rules.escape) && cloud.DoAPIRequest(0);
    };
    plan.copy = CopyError::kAfterCancelTest;
    if (rules.renew) {
        plan.rewind = [&] { return rules.renew(url); };
    }
    return RunAttempts(cloud, plan, at);
}

}  // namespace

bool DownloadByUrl(PublicCloud& cloud, XferData* xfer, const Json::Value& meta,
                   const ItemDownload& rules, SourceLine at) {
    return Guard(
        cloud,
        [&] {
            const std::string url = meta.get("url", "").asString();
            if (url.empty()) {
                LOG_ERROR_AT(at, "Downlaod URL is empty");
                return Fail(cloud);
            }
            if (xfer == nullptr || xfer->context == nullptr) {
                return Fail(cloud);
            }
            Request request(cloud, rules.frame, at);
            // Later refusals on this driver have no body, either.
            if (!request.Get(url).FailOnError().Prepare(xfer)) {
                return false;
            }
            return SetRange(cloud, meta) ? Receive(cloud, *xfer, url, rules, at) : Fail(cloud);
        },
        at);
}

}  // namespace ZYROCloud
