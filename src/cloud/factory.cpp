#include <memory>
#include <new>

#include "cloud/box/box.h"
#include "cloud/vfs/vfs_cloud.h"
#include "core/log.h"
#include "core/no_throw.h"
#include "zyrovfs/cloud_utils.h"

namespace ZYROCloud::Utils {
namespace {

template <typename Driver>
Cloud* Make(unsigned int uid, const Json::Value& config) {
    return new (std::nothrow) Driver(uid, config);
}

Cloud* NotBuilt(unsigned int, const Json::Value&) {
    LOG_ERROR("This cloud is not part of this build");
    return nullptr;
}

/** The classifier knows these names, and no driver was ever made for them. */
Cloud* WithoutDriver(unsigned int, const Json::Value&) {
    return nullptr;
}

struct Row {
    _tag_cloud_type type;
    Cloud* (*make)(unsigned int uid, const Json::Value& config);
};

constexpr Row kDrivers[] = {
    {CLOUD_TYPE_VFS, Make<VFSCloud>},
    {CLOUD_TYPE_GOOGLE, NotBuilt},
    {CLOUD_TYPE_DROPBOX, NotBuilt},
    {CLOUD_TYPE_ONEDRIVE, NotBuilt},
    {CLOUD_TYPE_ONEDRIVE_SHORT, WithoutDriver},
    {CLOUD_TYPE_BOX, Make<Box>},
    {CLOUD_TYPE_HUBIC, WithoutDriver},
    {CLOUD_TYPE_AWSS3, WithoutDriver},
};

}  // namespace

Cloud* CreateCloudByConfig(_tag_cloud_type type, unsigned int uid, const Json::Value& config) {
    for (const Row& row : kDrivers) {
        if (row.type == type) {
            Cloud* cloud = nullptr;
            ZYROVFS::NoThrow(ZYROVFS::VFS_ERR_FAILED, [&] {
                cloud = row.make(uid, config);
                return true;
            });
            return cloud;
        }
    }
    LOG_ERROR("Unknown cloud type, uri: %d", type);
    return nullptr;
}

Cloud* CreateCloudByServerID(unsigned int uid, const std::string& server_id,
                             ZYROVFS::Server::VFS_CONFIG_MODE mode) {
    Json::Value profile;
    if (!ZYROVFS::Server::Get(uid, mode, server_id.c_str(), true, false, profile)) {
        LOG_ERROR("Failed to get config by serverID:%s, from mode:%d", server_id.c_str(), mode);
        return nullptr;
    }
    profile["server_id"] = server_id;
    return CreateCloudByConfig(GetCloudTypeFromURI(server_id), uid, profile);
}

Cloud* CreateCloudByURI(unsigned int uid, const std::string& uri,
                        ZYROVFS::Server::VFS_CONFIG_MODE mode) {
    const size_t scheme = uri.find("://");
    if (scheme == std::string::npos) {
        LOG_ERROR("Failed to get serverID from %s", uri.c_str());
        return nullptr;
    }
    return CreateCloudByServerID(uid, uri.substr(0, uri.find('/', scheme + 3)), mode);
}

}  // namespace ZYROCloud::Utils
