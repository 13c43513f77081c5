#include "cloud/guard.h"
#include "cloud/relay.h"
#include "cloud/transfer.h"
#include "core/log.h"

namespace ZYROCloud {

using namespace ZYROVFS;

RelayDownload relay_download;

bool Cloud::RelayDownloadInit(Cloud* cloud, const char* path, SpeedCallback speed,
                              const std::string& mime) {
    relay_download = RelayDownload();
    if (cloud == nullptr || path == nullptr) {
        return false;
    }
    relay_download.cloud = cloud;
    relay_download.path = path;
    relay_download.mime = mime;
    relay_download.speed_cb = speed;
    const std::string action = mime.empty() ? "Download" : "Download=" + mime;
    return Guard(*cloud, [&] {
        // What the metadata lacks shows when it is used.
        cloud->GetMetaDataByURI(relay_download.path, relay_download.meta, action);
        return true;
    });
}

bool Cloud::RelayDownloadGetFileSizeAndMimeType(long long* size, std::string& mime) {
    Cloud* const cloud = relay_download.cloud;
    if (cloud == nullptr || size == nullptr) {
        return false;
    }
    if (!relay_download.mime.empty()) {
        *size = 0;
    } else if (!Guard(*cloud, [&] { return cloud->GetFileSize(relay_download.path, size); })) {
        return false;
    }
    mime = relay_download.mime;
    return true;
}

bool Cloud::RelayDownloadFile(int fd, long long from, long long to) {
    Cloud* const cloud = relay_download.cloud;
    if (cloud == nullptr) {
        return false;
    }
    if (from < 0 || to < from) {
        LOG_ERROR("Wrong range, %lld, %lld", from, to);
        cloud->SetError(VFS_ERR_RANGE_FAILED, "");
        return false;
    }
    return Guard(*cloud, [&] {
        XferContext context;
        context.fd = fd;
        XferData xfer{FileWriteCallback, 0, &context};
        BeginTransfer(static_cast<unsigned long long>(to - from),
                      {nullptr, nullptr, relay_download.speed_cb});
        relay_download.meta["from_bytes"] = static_cast<Json::Int64>(from);
        relay_download.meta["len"] = static_cast<Json::Int64>(to - from);
        return cloud->Download(&xfer, relay_download.meta);
    });
}

}  // namespace ZYROCloud
