/** A connection of the logged-in user: its files in the user's tree, and its driver. */
#ifndef ZYROVFS_WEB_CONNECTION_H
#define ZYROVFS_WEB_CONNECTION_H

#include <json/value.h>
#include <sys/types.h>
#include <zyrovfs/cloud.h>

#include <memory>
#include <string>

#include "identity.h"

namespace web {

/** Owns one descriptor. */
class Descriptor {
  public:
    explicit Descriptor(int fd) : fd_(fd) {}
    Descriptor(const Descriptor&) = delete;
    Descriptor& operator=(const Descriptor&) = delete;
    ~Descriptor();

    int Get() const { return fd_; }
    int Release();

  private:
    int fd_;
};

class Connection {
  public:
    /** Only this user's own connections are known. Failure with status 404. */
    Connection(const User& user, const std::string& id);

    /** Where a path is for the library. */
    std::string Uri(const std::string& path) const;
    /** Moves contents. Failure when there is none for this kind of connection. */
    std::unique_ptr<ZYROCloud::Cloud> Driver() const;

    /**
     * Opens an item below the connection's folder in the user's tree. Links of a server lead
     * nowhere else: what would leave the folder is refused. Failure by errno.
     */
    int Open(const std::string& path, int flags) const;

  private:
    const User& user_;
    const std::string id_;
    std::string folder_;
};

}  // namespace web

#endif
