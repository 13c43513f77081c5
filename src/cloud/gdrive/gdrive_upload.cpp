#include "cloud/attempt.h"
#include "cloud/gdrive/gdrive.h"
#include "cloud/gdrive/gdrive_api.h"
#include "cloud/gdrive/gdrive_body.h"
#include "cloud/guard.h"
#include "cloud/request.h"
#include "cloud/upload_body.h"
#include "core/handle.h"
#include "http/api_handler.h"

namespace ZYROCloud {

using namespace ZYROVFS;
using namespace gdrive;

bool GDrive::UploadProcess(XferData* xfer, const Json::Value& meta) {
    return Guard(*this, [&] {
        const bool at_once = UploadSize(meta).total <= kLargestDirect && SourceSize(meta) != -1;
        return at_once ? DirectUpload(xfer, meta) : ResumableUpload(xfer, meta);
    });
}

bool GDrive::DirectUpload(XferData* xfer, const Json::Value& meta) {
    return Guard(*this, [&] {
        const std::string url = meta.get("url", "").asString();
        if (url.empty() || xfer == nullptr || xfer->context == nullptr) {
            SetError(VFS_ERR_CLOUD_FAILED, "");
            return false;
        }
        Json::Value query;
        query["uploadType"] = "multipart";
        Request request(*this, kFrame);
        request.To(meta.get("method", "POST").asString(), url)
            .Unescaped()
            .Header("Expect", "")
            .Query(query);
        return request.Prepare() && SendForm(*xfer, meta, url);
    });
}

bool GDrive::SendForm(XferData& xfer, const Json::Value& meta, const std::string& url) {
    FormUploadData form{&xfer, "file", UploadSize(meta).total, Json::Value()};
    // The service tells the two parts apart by their order.
    form.params["Metadata"] = json::toString(Uploaded(meta));
    api->SetFormUploadData(&form);
    const ScopeExit forget([this] { api->SetFormUploadData(nullptr); });
    AttemptPlan plan = WholeUploadPlan(*this, xfer, url);
    plan.judge = [&](__tag_vfs_err_ code) {
        // A new token is for the caller's next upload: this request keeps the old one.
        return JudgeRenewing(*this, *xfer.context, code);
    };
    plan.refused = kRequestFailed;
    return RunAttempts(*this, plan);
}

}  // namespace ZYROCloud
