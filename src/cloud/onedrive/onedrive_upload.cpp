#include "cloud/answer_header.h"
#include "cloud/attempt.h"
#include "cloud/guard.h"
#include "cloud/onedrive/onedrive.h"
#include "cloud/onedrive/onedrive_api.h"
#include "cloud/request.h"
#include "cloud/upload_body.h"
#include "core/json.h"
#include "core/log.h"
#include "http/api_handler.h"

namespace ZYROCloud {

using namespace ZYROVFS;
using namespace onedrive;

namespace {

/** Name and folder of a path. The folder ends where the name stands for the first time, be it that
 * of a folder on the way: what the system has uploaded so far lies where that leads. */
void CutAtFirstName(const std::string& path, std::string& parent, std::string& name) {
    name = path.substr(path.rfind('/') + 1);
    const size_t at = path.find(name);
    parent = path.substr(0, at == 0 ? 0 : at - 1);
}

}  // namespace

bool OneDrive::UploadProcess(XferData* xfer, const Json::Value& meta) {
    return Guard(*this, [&] {
        int64_t total = 0;
        json::toInt64(meta.get("total_bytes", 0), total);
        return total <= kMostAtOnce ? DirectUpload(xfer, meta) : ChunkedUpload(xfer, meta);
    });
}

bool OneDrive::DirectUpload(XferData* xfer, const Json::Value& meta) {
    return Guard(*this, [&] {
        std::string parent;
        std::string name;
        CutAtFirstName(meta.get("server_path", "").asString(), parent, name);
        const std::string parent_id = name.empty() ? "" : GetFileIDByPath(parent);
        if (parent_id.empty()) {
            SetError(VFS_ERR_NOT_FOUND, "");
            return false;
        }
        if (xfer == nullptr || xfer->context == nullptr) {
            SetError(VFS_ERR_CLOUD_FAILED, "");
            return false;
        }
        return SendWhole(*xfer, meta, Api(parent_id + "/files/" + name));
    });
}

bool OneDrive::SendWhole(XferData& xfer, const Json::Value& meta, const std::string& url) {
    Json::Value query;
    query["downsize_photo_uploads"] = false;
    Request request(*this, kFrame);
    if (!request.Put(url).Query(query).Prepare(&xfer)) {
        return false;
    }
    const UploadSize size(meta);
    const bool announced = size.known && meta.isMember("total_bytes");
    if (!api->SetUploadOpt(false) ||
        (announced && !api->SetUploadSize(static_cast<long long>(size.total)))) {
        SetError(VFS_ERR_CLOUD_FAILED, "");
        return false;
    }
    AttemptPlan plan = WholeUploadPlan(*this, xfer, url);
    // A new token is for the caller's next upload: this request has the old one.
    plan.judge = [&](__tag_vfs_err_ code) { return JudgeRenewing(*this, *xfer.context, code); };
    plan.rewind = [&, begin = SourceBegin(*xfer.context)] {
        return SeekSource(xfer.context->fd, begin, 0, "Failed to seek file to zero position, %m");
    };
    plan.refused = "Direct upload failed and do not retry";
    return RunAttempts(*this, plan) && HasTaken();
}

bool OneDrive::HasTaken() {
    if (IsStored(*api)) {
        return true;
    }
    SetError(VFS_ERR_TRANSFER_ABORTED, "");
    LOG_ERROR("The service has not taken the file, status %d", AnswerStatus(*api));
    return false;
}

}  // namespace ZYROCloud
