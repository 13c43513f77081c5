#include "cloud/box/box.h"

#include <algorithm>
#include <ctime>
#include <limits>

#include "cloud/box/box_api.h"
#include "cloud/guard.h"
#include "cloud/pager.h"
#include "cloud/request.h"
#include "cloud/secret.h"
#include "cloud/size_limit.h"
#include "core/log.h"
#include "http/api_handler.h"

namespace ZYROCloud {

using namespace ZYROVFS;
using namespace box;

namespace {

Json::Value WithFields(const Json::Value& params, const char* fields) {
    Json::Value query = params;
    if (!query.isMember("fields")) {
        query["fields"] = fields;
    }
    return query;
}

std::string ItemsOf(const std::string& id) {
    if (id.empty()) {
        return Api(std::string(kRoot) + "/items");
    }
    return Api((id.find("folders") == std::string::npos ? kFolders + id : id) + "/items");
}

}  // namespace

bool Box::SetRefreshTokenParam(APIHandler* handler) {
    return handler != nullptr &&
           AddRefreshGrant(*handler, "box", client_id_, token_.refresh_token) &&
           handler->SetURL(BoxApiHost() + "/oauth2/token", true);
}

bool Box::UpdateAccountInfo() {
    Json::Value params;
    params["fields"] = kAccountFields;
    return UpdateAccountInfoWith(params);
}

bool Box::GetAccountInfo(const Json::Value& params, Json::Value& out) {
    return Guard(*this, [&] {
        return Request(*this, kFrame)
            .Get(Api("users/me"))
            .Query(WithFields(params, kAccountFields))
            .Send(out);
    });
}

bool Box::GetFileInfo(const std::string& id, const Json::Value& params, Json::Value& out) {
    return Guard(*this, [&] {
        return Request(*this, kFrame).Get(Api(id)).Query(WithFields(params, kItemFields)).Send(out);
    });
}

bool Box::ListFolder(const std::string& id, const Json::Value& params, Json::Value& out,
                     unsigned int* offset) {
    return Guard(*this, [&] {
        Json::Value query = WithFields(params, kItemFields);
        query["offset"] = *offset;
        query["limit"] = kPageSize;
        if (!Request(*this, kFrame).Get(ItemsOf(id)).Query(query).Send(out)) {
            return false;
        }
        // No folder comes near the limit, but an answer may claim it: no page is asked twice.
        const unsigned int room = std::numeric_limits<unsigned int>::max() - *offset;
        *offset += std::min(kPageSize, room);
        return true;
    });
}

bool Box::ListFolder(const std::string& id, const Json::Value& params, Json::Value& out) {
    unsigned int offset = 0;
    const auto fetch = [&](Json::Value& page) { return ListFolder(id, params, page, &offset); };
    const auto keep = [](const Json::Value& item) { return IsShown(item, "name"); };
    const auto more = [&](const Json::Value& page) {
        return page.isMember("total_count") && offset < page["total_count"].asUInt();
    };
    return Guard(*this, [&] { return ForEachPage("entries", out, fetch, keep, more); });
}

bool Box::SearchFile(const std::string& name, Json::Value& out) {
    return Guard(*this, [&] {
        Json::Value query;
        query["query"] = name;
        query["content_types"] = "name";
        query["fields"] = kItemFields;
        Json::Value answer;
        if (!Request(*this, kFrame).Get(Api("search")).Query(query).Send(answer)) {
            return false;
        }
        if (!answer.isMember("entries")) {
            SetError(VFS_ERR_CLOUD_FAILED, "");
            LOG_ERROR("Response has no data member");
            return false;
        }
        out.swap(answer["entries"]);
        return true;
    });
}

bool Box::IsDir(const Json::Value& item) {
    return item.get("type", "").asString() == "folder";
}

std::string Box::GetFileID(const Json::Value& item) {
    return (IsDir(item) ? kFolders : kFiles) + item.get("id", "").asString();
}

bool Box::CanFileUpload(unsigned long long size) {
    if (size == kSizeNotKnown) {
        return true;
    }
    return FitsLimit(*this, size, kLargestFile) &&
           (size <= kAskedFrom || PreflightCheck("", std::to_string(time(nullptr)), "0", "", size));
}

}  // namespace ZYROCloud
