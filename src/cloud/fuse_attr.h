/**
 * Attributes of the mounted tree. The backend of a mounted cloud serves them from its cache, so a
 * driver learns an item's id without asking the service.
 */
#ifndef ZYROVFS_CLOUD_FUSE_ATTR_H
#define ZYROVFS_CLOUD_FUSE_ATTR_H

#include <cstddef>
#include <string>

#include "core/source_line.h"
#include "zyrovfs/cloud.h"

namespace ZYROCloud::fuse_attr {

constexpr const char* kFileId = "id::file";
constexpr const char* kDescription = "standard::description";
constexpr const char* kCacheClean = "zyro::cacheclean";

/**
 * An attribute of a full path as text, up to its first NUL. False, with errno, when there is none
 * or it is longer than `most` bytes.
 */
bool Read(const std::string& full_path, const char* name, size_t most, std::string& out);

/** "standard::description" of a full path. */
inline bool ReadDescription(const std::string& full_path, size_t most, std::string& out) {
    return Read(full_path, kDescription, most, out);
}

/** The longest id of an item. */
constexpr size_t kMostIdBytes = 128;

/** Full path of a server path. A failure is logged. */
bool FindFullPath(Cloud& cloud, const std::string& server_path, std::string& full_path,
                  ZYROVFS::SourceLine at = ZYROVFS::SourceLine::Here());

/**
 * Id of the item at a server path, from the mounted tree; "" for an empty path and when there is
 * none. `log_missing` says whether a failed read of the attribute gets a log line, too.
 */
std::string ReadFileId(Cloud& cloud, const std::string& server_path, bool log_missing = false,
                       ZYROVFS::SourceLine at = ZYROVFS::SourceLine::Here());

/** Makes the backend forget what it knows of a full path. False leaves errno. */
bool CleanCache(const std::string& full_path);

}  // namespace ZYROCloud::fuse_attr

#endif
