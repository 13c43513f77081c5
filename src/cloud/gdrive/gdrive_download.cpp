#include <algorithm>
#include <utility>

#include "cloud/fuse_attr.h"
#include "cloud/gdrive/gdrive.h"
#include "cloud/gdrive/gdrive_api.h"
#include "cloud/guard.h"
#include "cloud/item_download.h"
#include "core/handle.h"
#include "core/json.h"
#include "core/log.h"
#include "http/api_handler.h"
#include "http/error_handler_table.h"

namespace ZYROCloud {

using namespace ZYROVFS;
using namespace gdrive;

namespace {

constexpr size_t kMostDescriptionBytes = 8192;
constexpr size_t kMostLinkText = 1023;

bool IsLink(const std::string& url) {
    return url.rfind(kLinkScheme, 0) == 0;
}

/** What stands in a document's place, or the part of it that `meta` asks for. */
std::string LinkText(const std::string& url, const Json::Value& meta) {
    Json::Value document;
    document["url"] = url.substr(std::string(kLinkScheme).size());
    std::string text = json::toString(document).substr(0, kMostLinkText);
    uint64_t from = 0;
    uint64_t length = 0;
    json::toUInt64(meta["from_bytes"], from);
    json::toUInt64(meta["len"], length);
    if (length != 0) {
        text = text.substr(std::min<uint64_t>(from, text.size()), length);
    }
    return text;
}

}  // namespace

bool GDrive::GetFileDownloadURL(const std::string& uri, const std::string& link_attr,
                                std::string& url) {
    return Guard(*this, [&] {
        std::string path;
        std::string text;
        Json::Value item;
        if (!GetFullPathByURI(uri, path)) {
            LOG_ERROR("Failed to get full path by uri:[%s]", uri.c_str());
            return false;
        }
        if (!fuse_attr::ReadDescription(path, kMostDescriptionBytes, text)) {
            LOG_ERROR("Failed to get download url by [%s], %m", path.c_str());
            return false;
        }
        if (!json::fromString(item, text)) {
            LOG_ERROR("Failed to parse to json format, %s", text.c_str());
            return false;
        }
        url = link_attr.empty() ? TextOf(item, "downloadUrl")
                                : TextOf(MemberOf(item, "exportLinks"), link_attr.c_str());
        if (url.empty()) {
            url = kLinkScheme + TextOf(item, "alternateLink");
        }
        return true;
    });
}

bool GDrive::DownloadProcess(XferData* xfer, const Json::Value& meta) {
    return Guard(*this, [&] {
        const std::string url = meta.get("url", "").asString();
        if (IsLink(url)) {
            return GiveLink(xfer, LinkText(url, meta));
        }
        const std::string path = meta.get("path", "").asString();
        const std::string uri = meta.get("uri", "").asString();
        const std::string link_attr = meta.get("linkAttr", "").asString();
        const auto renew = [&](std::string& old_url) {
            return GetErrorCode() != VFS_ERR_FORBIDDEN || RenewURL(path, uri, link_attr, old_url);
        };
        return DownloadByUrl(*this, xfer, meta, {kFrame, false, renew});
    });
}

/** What the tree knows of an item is thrown away, so that it asks for it anew. */
bool GDrive::RenewURL(const std::string& path, const std::string& uri, const std::string& link_attr,
                      std::string& url) {
    if (!fuse_attr::CleanCache(path)) {
        LOG_ERROR("Failed to clean fuse cache [%s], %m", path.c_str());
        return false;
    }
    if (!GetFileDownloadURL(uri, link_attr, url)) {
        LOG_ERROR("Failed to get download url from %s", uri.c_str());
        return false;
    }
    return true;
}

/** No request is made, so what the handler knows of its last answer must not be asked. */
bool GDrive::GiveLink(XferData* xfer, std::string text) {
    if (xfer == nullptr || xfer->callback == nullptr) {
        SetError(VFS_ERR_CLOUD_FAILED, "");
        return false;
    }
    void* curl = nullptr;
    if (xfer->context != nullptr) {
        std::swap(curl, xfer->context->curl);
    }
    const ScopeExit restore([&] {
        if (xfer->context != nullptr) {
            std::swap(curl, xfer->context->curl);
        }
    });
    if (text.empty() || xfer->callback(text.data(), 1, text.size(), xfer->context) == text.size()) {
        return true;
    }
    SetError(YLIBCErrGet() == kPlatformCancelled ? VFS_ERR_CANCELLED : VFS_ERR_TRANSFER_ABORTED,
             "");
    LOG_ERROR("Failed to write the link of a document");
    return false;
}

}  // namespace ZYROCloud
