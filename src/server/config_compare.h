/** The order of a listing. */
#ifndef ZYROVFS_SERVER_CONFIG_COMPARE_H
#define ZYROVFS_SERVER_CONFIG_COMPARE_H

#include <string>

#include "server/config_info.h"

namespace ZYROVFS::Server {

/** Orders records by one key: "port" as numbers, texts without regard to case. A key that no text
 * field has means "protocol". */
class ConfigCompare {
  public:
    explicit ConfigCompare(const char* key);

    bool operator()(const _tag_VFS_CONFIG_INFO_& a, const _tag_VFS_CONFIG_INFO_& b) const;

  private:
    std::string _tag_VFS_CONFIG_INFO_::*field_;  ///< null for the port
};

}  // namespace ZYROVFS::Server

#endif
