#include "cloud/attempt.h"
#include "cloud/box/box.h"
#include "cloud/box/box_api.h"
#include "cloud/fuse_attr.h"
#include "cloud/guard.h"
#include "cloud/item_download.h"
#include "cloud/request.h"
#include "cloud/upload_body.h"
#include "core/handle.h"
#include "core/json.h"
#include "http/api_handler.h"
#include "zyrovfs/cloud_utils.h"

namespace ZYROCloud {

using namespace ZYROVFS;
using namespace box;

namespace {

Json::Value Attributes(const std::string& name, const std::string& parent_id, uint64_t size) {
    Json::Value attributes;
    attributes["name"] = Utils::EscapeDoubleQuote(name);
    attributes["parent"]["id"] = parent_id;
    if (size != kSizeNotKnown) {
        attributes["size"] = static_cast<Json::UInt64>(size);
    }
    return attributes;
}

}  // namespace

bool Box::PreflightCheck(const std::string& id, const std::string& name,
                         const std::string& parent_id, const std::string& path,
                         unsigned long long size) {
    return Request(*this, kFrame)
        .To("OPTIONS", Api(kFiles + (id.empty() ? "" : id + "/") + "content"))
        .Header("Expect", "")
        .RawBody(Attributes(name, parent_id, size))
        .Unless(VFS_ERR_CONFLICT, [&] { return ClearTheWay(path); })
        .Send();
}

bool Box::ClearTheWay(const std::string& path) {
    const std::string text = api->GetResponse();
    Json::Value answer;
    if (!json::fromString(answer, text)) {
        LOG_ERROR("Failed to decode to json format, %s", text.c_str());
        return false;
    }
    const Json::Value rival =
        answer.get("context_info", Json::Value()).get("conflicts", Json::Value());
    const std::string kind = rival.get("type", "").asString();
    const std::string id = rival.get("id", "").asString();
    // Without an id the address would be that of all files.
    if (id.empty() || (kind != "file" && kind != "folder")) {
        return false;
    }
    if (!Delete((kind == "file" ? kFiles : kFolders) + id)) {
        return false;
    }
    fuse_attr::CleanCache(path);
    return true;
}

bool Box::UploadProcess(XferData* xfer, const Json::Value& meta) {
    return Guard(*this, [&] {
        return PreflightCheck(meta.get("id", "").asString(), meta.get("name", "").asString(),
                              meta.get("parent_id", "").asString(),
                              meta.get("full_path", "").asString(), UploadSize(meta).total) &&
               DirectUpload(xfer, meta);
    });
}

bool Box::DirectUpload(XferData* xfer, const Json::Value& meta) {
    return Guard(*this, [&] {
        const std::string url = meta.get("url", "").asString();
        if (url.empty() || xfer == nullptr || xfer->context == nullptr) {
            SetError(VFS_ERR_CLOUD_FAILED, "");
            return false;
        }
        Request request(*this, kFrame);
        return request.Post(url).Header("Expect", "").Prepare() && SendForm(xfer, meta);
    });
}

bool Box::SendForm(XferData* xfer, const Json::Value& meta) {
    if (!meta.isMember("name") || !meta.isMember("parent_id") || !meta.isMember("total_bytes")) {
        return false;
    }
    const UploadSize size(meta);
    const uint64_t total = size.known ? size.total : kSizeNotKnown;
    FormUploadData form{xfer, "file", total, Json::Value()};
    form.params["attributes"] =
        json::toString(Attributes(meta["name"].asString(), meta["parent_id"].asString(), total));
    api->SetFormUploadData(&form);
    const ScopeExit forget([this] { api->SetFormUploadData(nullptr); });

    const std::string url = meta["url"].asString();
    AttemptPlan plan = WholeUploadPlan(*this, *xfer, url);
    plan.judge = [&](__tag_vfs_err_ code) {
        if (code == VFS_ERR_UNAUTHORIZED) {
            // The new token is for the caller's next upload: this request has the old one.
            RefreshToken(true);
            return NextStep::End();
        }
        return JudgeUpload(*this, *xfer->context);
    };
    plan.refused = "Failed to process  %s, err: %s";
    return RunAttempts(*this, plan);
}

bool Box::DownloadProcess(XferData* xfer, const Json::Value& meta) {
    return DownloadByUrl(*this, xfer, meta, {kFrame, true});
}

}  // namespace ZYROCloud
