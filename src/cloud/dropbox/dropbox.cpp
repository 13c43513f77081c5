#include "cloud/dropbox/dropbox.h"

#include <strings.h>

#include <algorithm>
#include <cstring>
#include <iterator>

#include "cloud/dropbox/dropbox_api.h"
#include "cloud/guard.h"
#include "cloud/pager.h"
#include "cloud/request.h"
#include "cloud/size_limit.h"
#include "core/log.h"
#include "http/api_handler.h"

namespace ZYROCloud {

using namespace ZYROVFS;
using namespace dropbox;

namespace {

constexpr const char* kEntries = "entries";

/** Names that the service's own programs leave in the folders they look after. */
constexpr const char* kSkipped[] = {".dropbox", ".dropbox.attr", ".dropbox.cache"};

/** The address of a transfer, told for whoever asks; the transfers themselves go by path. */
constexpr struct {
    const char* action;
    const char* what;
} kActions[] = {{"Download", "download"}, {"Upload", "upload_session/finish"}};

std::string UrlFor(const std::string& action) {
    for (const auto& row : kActions) {
        if (action == row.action) {
            return Content(row.what);
        }
    }
    return "";
}

bool KeepAll(const Json::Value& /*item*/) {
    return true;
}

}  // namespace

bool Dropbox::SetRefreshTokenParam(APIHandler* /*handler*/) {
    return false;
}

bool Dropbox::GetMetaDataByURI(const std::string& uri, Json::Value& meta,
                               const std::string& action) {
    return Guard(*this, [&] {
        const std::string path = GetServerPathBySharePath(uri);
        if (path.empty()) {
            LOG_ERROR("Failed to get server path from dropbox, %s", uri.c_str());
            return false;
        }
        meta["server_path"] = path;
        meta["url"] = UrlFor(action);
        return true;
    });
}

bool Dropbox::IsSkipMVCPFile(const std::string& path) {
    const char* name = basename(path.c_str());
    return PublicCloud::IsSkipMVCPFile(path) ||
           std::any_of(std::begin(kSkipped), std::end(kSkipped),
                       [name](const char* skipped) { return strcasecmp(name, skipped) == 0; });
}

bool Dropbox::CanFileUpload(unsigned long long size) {
    return FitsLimit(*this, size, kLargestFile);
}

// The calls about the account take no arguments, and say so by a body of "null".

bool Dropbox::GetAccountInfo(const Json::Value& /*params*/, Json::Value& out) {
    const std::string url = Api("users/get_current_account");
    return Request(*this, kFrame).Post(url).RawBody(Json::Value()).Send(out);
}

bool Dropbox::GetSpaceUsage(Json::Value& out) {
    const std::string url = Api("users/get_space_usage");
    return Request(*this, kFrame).Post(url).RawBody(Json::Value()).Send(out);
}

bool Dropbox::GetFileInfo(const std::string& path, const Json::Value& params, Json::Value& out) {
    return Guard(*this, [&] {
        Json::Value query = params;
        query["list"] = false;
        query["include_deleted"] = false;
        const std::string item = path.empty() ? "" : "/" + path;
        if (!Request(*this, kFrame).Get(Api("files/get_metadata" + item)).Query(query).Send(out)) {
            return false;
        }
        if (out.get("is_deleted", false).asBool()) {
            SetError(VFS_ERR_NOT_FOUND, "");
            LOG_ERROR("This file(%s) is the trash", path.c_str());
            return false;
        }
        return true;
    });
}

bool Dropbox::ListFolder(const std::string& path, const Json::Value& params, Json::Value& out) {
    return Guard(*this, [&] {
        Json::Value body = params;
        body["path"] = path == "/" ? "" : path;
        Json::Value page;
        if (!Request(*this, kFrame).Post(Api("files/list_folder")).RawBody(body).Send(page)) {
            return false;
        }
        out = Json::Value(Json::arrayValue);
        MoveItems(page, kEntries, out, KeepAll);
        return !page.get("has_more", false).asBool() ||
               ListMoreFolder(out, page.get("cursor", "").asString());
    });
}

bool Dropbox::ListMoreFolder(Json::Value& entries, const std::string& cursor) {
    std::string next = cursor;
    CursorGuard guard;
    const auto fetch = [&](Json::Value& page) {
        Json::Value body;
        body["cursor"] = next;
        if (!guard.Accept(*this, next) || !Request(*this, kFrame)
                                               .Post(Api("files/list_folder/continue"))
                                               .RawBody(body)
                                               .Send(page)) {
            return false;
        }
        if (page.isMember(kEntries) && !page[kEntries].isArray()) {
            page.removeMember(kEntries);  // a page without items, not the end of the listing
        }
        return true;
    };
    const auto more = [&next](const Json::Value& page) {
        next = page.get("cursor", "").asString();
        return page.get("has_more", false).asBool();
    };
    return Guard(*this, [&] { return ForEachPage(kEntries, entries, fetch, KeepAll, more); });
}

bool Dropbox::IsDir(const Json::Value& item) {
    return item.get("is_dir", false).asBool();
}

std::string Dropbox::GetFileID(const Json::Value& item) {
    return item.get("path", "").asString();
}

}  // namespace ZYROCloud
