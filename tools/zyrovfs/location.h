/** Where a transfer begins or ends: a file of this machine, or a place at a server or cloud. */
#ifndef ZYROVFS_TOOLS_LOCATION_H
#define ZYROVFS_TOOLS_LOCATION_H

#include <sys/types.h>
#include <zyrovfs/cloud.h>

#include <memory>
#include <string>
#include <vector>

namespace tool {

/** Anything else is the name of a local file. */
bool IsUri(const std::string& text);

/** Scheme and authority of a URI. */
std::string ServerIdOf(const std::string& uri);

/** What follows the last slash. */
std::string NameOf(const std::string& path);

/**
 * The driver of a connection of the user or, when there is none, of a saved profile. Null with a
 * sentence.
 */
std::unique_ptr<ZYROCloud::Cloud> OpenLocation(unsigned int uid, const std::string& uri,
                                               std::string& problem);

/**
 * While it lives, files are opened, made and renamed with the rights of the user for whom the
 * command acts, so that root's command neither reads what the user may not read nor leaves files
 * behind that the user cannot touch.
 */
class AsUser {
  public:
    explicit AsUser(unsigned int uid);
    AsUser(const AsUser&) = delete;
    AsUser& operator=(const AsUser&) = delete;
    ~AsUser();

  private:
    std::vector<gid_t> groups_;  ///< the process's own
    uid_t uid_;
    gid_t gid_;
};

}  // namespace tool

#endif
