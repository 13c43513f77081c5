#include "cloud/onedrive/onedrive.h"

#include "cloud/onedrive/onedrive_api.h"
#include "cloud/secret.h"
#include "cloud/size_limit.h"
#include "core/json.h"
#include "core/log.h"
#include "http/api_handler.h"

namespace ZYROCloud {

using namespace ZYROVFS;
using namespace onedrive;

namespace {

constexpr const char* kService = "onedrive";

/** The items of a listing or a search. An answer without them is no empty folder. */
bool TakeItems(Cloud& cloud, Json::Value& answer, Json::Value& out,
               SourceLine at = SourceLine::Here()) {
    if (!MemberOf(answer, "data").isArray()) {
        cloud.SetError(VFS_ERR_CLOUD_FAILED, "");
        LOG_ERROR_AT(at, "Response has no data member, %s", json::toString(answer).c_str());
        return false;
    }
    out.swap(answer["data"]);
    return true;
}

}  // namespace

bool OneDrive::SetRefreshTokenParam(APIHandler* handler) {
    if (handler == nullptr) {
        return false;
    }
    // The service knows this application under one id; an old profile may have another.
    client_id_ = FixedClientId(kService);
    return AddRefreshGrant(*handler, kService, client_id_, token_.refresh_token) &&
           handler->AddGetParam("pretty", false) &&
           handler->SetURL(LiveLoginHost() + "/oauth20_token.srf", true);
}

bool OneDrive::UpdateAccountInfo() {
    return UpdateAccountInfoWith(Json::Value(Json::objectValue));
}

bool OneDrive::GetAccountInfo(const Json::Value& params, Json::Value& out) {
    return Request(*this, kFrame).Get(Api(kAccount)).Query(params).Send(out);
}

bool OneDrive::GetQuota(Json::Value& out) {
    return Request(*this, kFrame).Get(ItemUrl("") + "/quota").Send(out);
}

bool OneDrive::GetFileInfo(const std::string& id, const Json::Value& /*params*/, Json::Value& out) {
    return Request(*this, kFrame).Get(ItemUrl(id)).Send(out);
}

bool OneDrive::ListFolder(const std::string& id, const Json::Value& /*params*/, Json::Value& out) {
    Json::Value answer;
    return Request(*this, kFrame).Get(ItemUrl(id) + "/files").Send(answer) &&
           TakeItems(*this, answer, out);
}

bool OneDrive::SearchFile(const std::string& name, Json::Value& out) {
    Json::Value query;
    Json::Value answer;
    query["q"] = name;
    return Request(*this, kFrame).Get(ItemUrl("") + "/search").Query(query).Send(answer) &&
           TakeItems(*this, answer, out);
}

bool OneDrive::IsDir(const Json::Value& item) {
    const std::string type = Text(item, "type");
    return type == "folder" || type == "album";
}

std::string OneDrive::GetFileID(const Json::Value& item) {
    return Text(item, "id");
}

std::string OneDrive::GetRootFileID() {
    Json::Value root;
    return GetFileInfo("", Json::Value(Json::objectValue), root) ? GetFileID(root) : "";
}

bool OneDrive::CanFileUpload(unsigned long long size) {
    return FitsLimit(*this, size, kLargestFile);
}

}  // namespace ZYROCloud
