/** A connection of the logged-in user: its files, and the driver of their contents. */
#ifndef ZYROVFS_WEB_CONNECTION_H
#define ZYROVFS_WEB_CONNECTION_H

#include <json/value.h>
#include <zyrovfs/cloud.h>

#include <memory>
#include <string>

#include "identity.h"
#include "tree.h"

namespace web {

class Connection {
  public:
    /** Only this user's own connections are known. Failure with status 404. */
    Connection(const User& user, const std::string& id);

    const std::string& Id() const { return id_; }
    /** What people call it. */
    std::string Title() const;
    /** Where a path is for the library. */
    std::string Uri(const std::string& path) const;
    /** Moves contents. Failure when there is none for this kind of connection. */
    std::unique_ptr<ZYROCloud::Cloud> Driver() const;
    /** The service's own for a cloud, the user's mounted tree for all else. */
    std::unique_ptr<Tree> Files() const;
    /** Who knows what an upload would replace: the mounted tree, which costs little; the service
     * itself where a file takes the place of a folder with all that is in it. */
    std::unique_ptr<Tree> BeforeUpload() const;
    /** Failure with status 422 for a file that the driver would put elsewhere or under another
     * name, or for which it would delete a folder. `size` is -1 when that is not known. */
    void CheckUpload(ZYROCloud::Cloud& cloud, const std::string& path, long long size) const;

  private:
    std::string Member(const char* key) const;

    const User& user_;
    const std::string id_;
    Json::Value record_;
};

/** Whether a protocol is a cloud account's. */
bool IsCloud(const std::string& protocol);

}  // namespace web

#endif
