#include "cloud/answer_header.h"
#include "cloud/attempt.h"
#include "cloud/item_download.h"
#include "cloud/onedrive/onedrive.h"
#include "cloud/onedrive/onedrive_api.h"
#include "cloud/request.h"
#include "core/json.h"
#include "core/log.h"
#include "http/api_handler.h"

namespace ZYROCloud {

using namespace ZYROVFS;
using namespace onedrive;

bool OneDrive::DownloadProcess(XferData* xfer, const Json::Value& meta) {
    return DownloadByUrl(*this, xfer, meta, {kFrame, true});
}

bool OneDrive::GetFileSize(const std::string& uri, long long* size) {
    Json::Value meta;
    if (size == nullptr) {
        return false;
    }
    if (!GetMetaDataByURI(uri, meta, "Download")) {
        LOG_ERROR("Failed to get meta by uri");
        return false;
    }
    const std::string url = meta["url"].asString();
    Request request(*this, kFrame);
    // The handler stays set to fail on errors, as behind a download.
    if (!request.Get(url).FailOnError().Prepare()) {
        return false;
    }
    if (!api->SetNoBody(true)) {
        SetError(VFS_ERR_CLOUD_FAILED, "");
        return false;
    }
    AttemptPlan plan;
    plan.send = [this] { return DoAPIRequest(0); };
    plan.judge = [this](__tag_vfs_err_) { return NextStep::RetryIf(IsNeedRetry()); };
    plan.cancel_test_after = false;
    plan.retry = "Retry Download";
    plan.refused = kRequestFailed;
    plan.exhausted = kRequestFailed;
    plan.what = &url;
    if (!RunAttempts(*this, plan)) {
        return false;
    }
    uint64_t length = 0;
    json::toUInt64(AnswerHeader(*api, "Content-Length"), length);
    *size = static_cast<long long>(length);
    return true;
}

}  // namespace ZYROCloud
