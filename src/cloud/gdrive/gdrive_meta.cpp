#include <strings.h>

#include <cstring>

#include "cloud/gdrive/gdrive.h"
#include "cloud/gdrive/gdrive_api.h"
#include "cloud/gdrive/gdrive_types.h"
#include "cloud/guard.h"
#include "cloud/path_walk.h"
#include "core/log.h"

namespace ZYROCloud {

using namespace ZYROVFS;
using namespace gdrive;

namespace {

constexpr const char* kDownload = "Download";
constexpr const char* kUpload = "Upload";

bool IsDownload(const std::string& operation) {
    return strncasecmp(operation.c_str(), kDownload, strlen(kDownload)) == 0;
}

/** The type of the export that is wanted, as in "Download=text/plain". */
std::string ExportOf(const std::string& operation) {
    const size_t at = operation.find('=');
    return at == std::string::npos ? "" : operation.substr(at + 1);
}

}  // namespace

bool GDrive::GetMetaDataByURI(const std::string& uri, Json::Value& out,
                              const std::string& operation) {
    return Guard(*this, [&] {
        const std::string server_path = GetServerPathBySharePath(uri);
        const std::string id = GetFileIDByPath(server_path);
        std::string url = uri;
        if (IsDownload(operation)) {
            if (!DescribeDownload(uri, ExportOf(operation), out, url)) {
                return false;
            }
        } else if (operation == kUpload) {
            if (!DescribeUpload(server_path, id, out, url)) {
                return false;
            }
        }
        out["id"] = id;
        out["url"] = url;
        return true;
    });
}

bool GDrive::DescribeDownload(const std::string& uri, const std::string& link_attr,
                              Json::Value& meta, std::string& url) {
    if (!GetFileDownloadURL(uri, link_attr, url)) {
        LOG_ERROR("Failed to get download url by [%s]", uri.c_str());
        return false;
    }
    std::string full_path;
    GetFullPathByURI(uri, full_path);
    meta["uri"] = uri;
    meta["path"] = full_path;
    meta["linkAttr"] = link_attr;
    return true;
}

bool GDrive::DescribeUpload(const std::string& server_path, const std::string& id,
                            Json::Value& meta, std::string& url) {
    const bool is_new = id.empty() || id == kRoot;
    url = gdrive::Upload(is_new ? "" : "/" + id);
    meta["method"] = is_new ? "POST" : "PUT";
    std::string parent, title;
    if (!CutAtLastSlash(server_path, parent, title)) {
        LOG_ERROR("Failed to find / from %s", server_path.c_str());
        return false;
    }
    const std::string parent_id = GetFileIDByPath(parent);
    if (parent_id.empty()) {
        LOG_ERROR("Failed to get parent id by [%s]", parent.c_str());
        return false;
    }
    meta["parent_id"] = parent_id;
    meta["title"] = title;
    if (const char* type = FindUploadType(title)) {
        meta["mimeType"] = type;
    }
    return true;
}

}  // namespace ZYROCloud
