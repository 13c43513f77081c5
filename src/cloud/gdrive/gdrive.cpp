#include "cloud/gdrive/gdrive.h"

#include "cloud/gdrive/gdrive_api.h"
#include "cloud/guard.h"
#include "cloud/pager.h"
#include "cloud/secret.h"
#include "cloud/size_limit.h"
#include "core/log.h"
#include "http/api_handler.h"

namespace ZYROCloud {

using namespace ZYROVFS;
using namespace gdrive;

namespace {

/** The condition of a listing: what is in a folder, not in the trash, and what the caller wants. */
std::string ListingOf(const std::string& folder_id, const std::string& wanted) {
    std::string query = "trashed=false";
    if (!folder_id.empty()) {
        query += " and '" + folder_id + "' in parents";
    }
    if (!wanted.empty()) {
        query += " and (" + wanted + ")";
    }
    return query;
}

bool IsTrashed(const Json::Value& item) {
    return item.get("labels", Json::Value()).get("trashed", false).asBool();
}

}  // namespace

bool GDrive::SetRefreshTokenParam(APIHandler* handler) {
    return handler != nullptr &&
           AddRefreshGrant(*handler, "google", client_id_, token_.refresh_token) &&
           handler->SetURL(GoogleAccountsHost() + "/o/oauth2/token", true);
}

bool GDrive::UpdateAccountInfo() {
    Json::Value params;
    params["fields"] = "user";
    return UpdateAccountInfoWith(params);
}

bool GDrive::GetAccountInfo(const Json::Value& params, Json::Value& out) {
    return Request(*this, kFrame).Get(About()).Query(params).Send(out);
}

bool GDrive::GetFileInfo(const std::string& id, const Json::Value& params, Json::Value& out) {
    return Guard(*this, [&] {
        if (!Request(*this, kFrame).Get(Files("/" + id)).Query(NeedObject(params)).Send(out)) {
            return false;
        }
        if (IsTrashed(out)) {
            // The service still describes what is in the trash; nobody can reach it by a path.
            SetError(VFS_ERR_NOT_FOUND, "");
            LOG_ERROR("This file(%s) is in the trash", id.c_str());
            return false;
        }
        return true;
    });
}

bool GDrive::ListFolder(const std::string& folder_id, const Json::Value& params, Json::Value& out,
                        const std::string& page_token) {
    return Guard(*this, [&] {
        Json::Value query = params;
        query["q"] = ListingOf(folder_id, params.get("q", "").asString());
        if (!page_token.empty()) {
            query["pageToken"] = page_token;
        }
        return Request(*this, kFrame)
            .Get(Files())
            .Query(query)
            .BadAnswer("Failed to parse result, format error")
            .Send(out);
    });
}

bool GDrive::ListFolder(const std::string& folder_id, const Json::Value& params, Json::Value& out) {
    std::string token;
    CursorGuard pages;
    const auto fetch = [&](Json::Value& page) {
        return pages.Accept(*this, token) && ListFolder(folder_id, params, page, token);
    };
    const auto keep = [](const Json::Value& item) { return IsShown(item, "title"); };
    const auto more = [&token](const Json::Value& page) {
        token = page.get("nextPageToken", "").asString();
        return !token.empty();
    };
    return Guard(*this, [&] { return ForEachPage("items", out, fetch, keep, more); });
}

bool GDrive::CanFileUpload(unsigned long long size) {
    return FitsLimit(*this, size, kLargestFile);
}

}  // namespace ZYROCloud
