#include "bridge/gvfs_utils.h"

#include <mutex>

#include "core/json.h"
#include "core/log.h"
#include "zyrovfs/cloud_utils.h"
#include "zyrovfs/global.h"
#include "zyrovfs/zyrocloud.h"

namespace ZYROCloud {

using namespace ZYROVFS;

UniqueCloud CreateCloud(const char* server_id) {
    // Reading profiles is no work for several threads at once, and costs little beside a request.
    static std::mutex profiles;
    const std::lock_guard<std::mutex> lock(profiles);
    UniqueCloud cloud(server_id == nullptr
                          ? nullptr
                          : ZYROCloud::Utils::CreateCloudByServerID(GetActorUID(), server_id,
                                                                    Server::VFS_CONFIG_CONNECT));
    if (cloud == nullptr) {
        LOG_ERROR("Can't get server conf, %s", TextOrEmpty(server_id));
    }
    return cloud;
}

void StoreError(const Cloud& cloud, int* err, int too_many_links) {
    const int code = cloud.GetGIOError();
    StoreError(code == G_IO_ERROR_TOO_MANY_LINKS ? too_many_links : code, err);
}

std::string ErrorText(const Cloud& cloud) {
    return json::toString(cloud.GetError());
}

}  // namespace ZYROCloud

using namespace ZYROCloud;
using ZYROVFS::SourceLine;

int ZYROCloud_Cloud_Rename(const char* server_id, const void* p2, const char* from, const char* to,
                           int* err) {
    if (!AllGiven(SourceLine::Here(), server_id, p2, from, to)) {
        return 0;
    }
    return WithDriver(server_id, [&](Cloud& cloud) {
        if (cloud.Rename(from, to)) {
            return true;
        }
        StoreError(cloud, err);
        LOG_ERROR("Failed to rename %s to %s, err: %s, code: %d", from, to,
                  ErrorText(cloud).c_str(), cloud.GetErrorCode());
        return false;
    });
}

int ZYROCloud_Cloud_Move(const char* server_id, const void* p2, const char* from, const char* to,
                         int* err) {
    if (!AllGiven(SourceLine::Here(), server_id, p2, from, to)) {
        return 0;
    }
    return WithDriver(server_id, [&](Cloud& cloud) {
        if (cloud.Move(from, to)) {
            return true;
        }
        StoreError(cloud, err, G_IO_ERROR_WOULD_RECURSE);
        LOG_ERROR("Failed to rename %s to %s, err: %s, code: %d", from, to,
                  ErrorText(cloud).c_str(), cloud.GetErrorCode());
        return false;
    });
}

int ZYROCloud_Cloud_Delete(const char* server_id, const void* p2, const char* id, int* err) {
    if (!AllGiven(SourceLine::Here(), server_id, p2, id)) {
        return 0;
    }
    return WithDriver(server_id, [&](Cloud& cloud) {
        if (cloud.Delete(id)) {
            return true;
        }
        StoreError(cloud, err, G_IO_ERROR_NOT_EMPTY);
        LOG_ERROR("Failed to delete %s,err: %s, code: %d", id, ErrorText(cloud).c_str(),
                  cloud.GetErrorCode());
        return false;
    });
}

int ZYROCloud_Cloud_CreateFolder(const char* server_id, const void* p2, const char* parent,
                                 const char* name, int* err) {
    if (!AllGiven(SourceLine::Here(), server_id, p2, parent, name)) {
        return 0;
    }
    return WithDriver(server_id, [&](Cloud& cloud) {
        if (cloud.CreateFolder(parent, name, Json::Value())) {
            return true;
        }
        StoreError(cloud, err);
        LOG_ERROR("Failed to create folder %s/%s, err: %s, code: %d", parent, name,
                  ErrorText(cloud).c_str(), cloud.GetErrorCode());
        return false;
    });
}

int ZYROCloud_IsHiddenFolder(const char* dir, const char* name) {
    return dir != nullptr && name != nullptr &&
                   ZYROVFS::NoThrow(ZYROVFS::VFS_ERR_FAILED,
                                    [&] { return Cloud::IsHiddenFilePath(dir, name); })
               ? 1
               : 0;
}

void ZYROCloud_Cloud_InitCurlGlobal(void) {
    Cloud::InitCurlGlobal();
}

void ZYROCloud_Cloud_CleanupCurlGlobal(void) {
    Cloud::CleanupCurlGlobal();
}
