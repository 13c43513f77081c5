#include <cstring>
#include <new>

#include "cloud/box/box.h"
#include "cloud/dropbox/dropbox.h"
#include "cloud/gdrive/gdrive.h"
#include "cloud/onedrive/onedrive.h"
#include "cloud/stored_profile.h"
#include "cloud/vfs/vfs_cloud.h"
#include "core/log.h"
#include "server/location_id.h"
#include "zyrovfs/cloud_utils.h"

namespace ZYROCloud::Utils {

using namespace ZYROVFS;

namespace {

using Make = Cloud* (*)(unsigned int uid, const Json::Value& config);

template <typename Driver>
Cloud* New(unsigned int uid, const Json::Value& config) {
    return new (std::nothrow) Driver(uid, config);
}

/** Kinds that are known and that no connection has. */
Cloud* Nothing(unsigned int, const Json::Value&) {
    return nullptr;
}

/** A new driver needs its row here, and nothing else here. */
constexpr struct {
    _tag_cloud_type type;
    Make make;
} kDrivers[] = {
    {CLOUD_TYPE_VFS, New<VFSCloud>},    {CLOUD_TYPE_GOOGLE, New<GDrive>},
    {CLOUD_TYPE_DROPBOX, New<Dropbox>}, {CLOUD_TYPE_ONEDRIVE, New<OneDrive>},
    {CLOUD_TYPE_BOX, New<Box>},         {CLOUD_TYPE_ONEDRIVE_SHORT, Nothing},
    {CLOUD_TYPE_HUBIC, Nothing},        {CLOUD_TYPE_AWSS3, Nothing},
};

}  // namespace

Cloud* CreateCloudByConfig(_tag_cloud_type type, unsigned int uid, const Json::Value& config) try {
    for (const auto& driver : kDrivers) {
        if (driver.type == type) {
            return driver.make(uid, config);
        }
    }
    LOG_ERROR("Unknown cloud type, uri: %d", static_cast<int>(type));
    return nullptr;
} catch (const std::exception& e) {
    LOG_ERROR("Failed to make a driver, %s", e.what());
    return nullptr;
}

Cloud* CreateCloudByServerID(unsigned int uid, const std::string& server_id,
                             Server::VFS_CONFIG_MODE mode) {
    const _tag_cloud_type type = GetCloudTypeFromURI(server_id);
    const Json::Value* profile = StoredProfile(uid, server_id, mode);
    if (profile == nullptr) {
        LOG_ERROR("Failed to get config by serverID:%s, from mode:%d", server_id.c_str(),
                  static_cast<int>(mode));
        return nullptr;
    }
    return CreateCloudByConfig(type, uid, *profile);
}

Cloud* CreateCloudByURI(unsigned int uid, const std::string& uri, Server::VFS_CONFIG_MODE mode) {
    const size_t scheme = uri.find("://");
    if (scheme == std::string::npos) {
        LOG_ERROR("Failed to get serverID from %s", uri.c_str());
        return nullptr;
    }
    return CreateCloudByServerID(uid, Server::IdOfLocation(uid, mode, uri), mode);
}

}  // namespace ZYROCloud::Utils
