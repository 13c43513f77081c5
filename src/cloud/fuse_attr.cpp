#include "cloud/fuse_attr.h"

#include <sys/xattr.h>

#include <cstring>

#include "core/log.h"

namespace ZYROCloud::fuse_attr {

bool Read(const std::string& full_path, const char* name, size_t most, std::string& out) {
    std::string buffer(most, '\0');
    const ssize_t length = getxattr(full_path.c_str(), name, buffer.data(), most);
    if (length < 0) {
        return false;
    }
    out.assign(buffer, 0, strnlen(buffer.data(), static_cast<size_t>(length)));
    return true;
}

bool FindFullPath(Cloud& cloud, const std::string& server_path, std::string& full_path,
                  ZYROVFS::SourceLine at) {
    if (cloud.GetFullPathByServerPath(server_path, full_path)) {
        return true;
    }
    LOG_ERROR_AT(at, "Failed to get full path by [%s]", server_path.c_str());
    return false;
}

std::string ReadFileId(Cloud& cloud, const std::string& server_path, bool log_missing,
                       ZYROVFS::SourceLine at) {
    std::string full_path;
    std::string id;
    if (server_path.empty() || !FindFullPath(cloud, server_path, full_path, at)) {
        return "";
    }
    if (!Read(full_path, kFileId, kMostIdBytes, id) && log_missing) {
        LOG_ERROR_AT(at, "Failed to get file id from fuse cache, %s, %m", full_path.c_str());
    }
    return id;
}

bool CleanCache(const std::string& full_path) {
    return setxattr(full_path.c_str(), kCacheClean, "", 0, 0) == 0;
}

}  // namespace ZYROCloud::fuse_attr
