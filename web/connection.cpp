#include "connection.h"

#include <fcntl.h>
#include <linux/openat2.h>
#include <sys/syscall.h>
#include <unistd.h>
#include <zyrovfs/cloud_utils.h>
#include <zyrovfs/server.h>

#include <utility>

#include "failure.h"
#include "name.h"

namespace web {

using namespace ZYROVFS;

Descriptor::~Descriptor() {
    if (fd_ >= 0) {
        close(fd_);
    }
}

int Descriptor::Release() {
    return std::exchange(fd_, -1);
}

Connection::Connection(const User& user, const std::string& id) : user_(user), id_(id) {
    Json::Value record;
    if (!Server::CfgGetByID(user.uid, Server::VFS_CONFIG_CONNECT, id.c_str(), record)) {
        throw FailureOf("The connection cannot be used", GetError());
    }
    const Json::Value path = record.isObject() ? record["path"] : Json::Value();
    folder_ = path.isString() ? path.asString() : "";
}

std::string Connection::Uri(const std::string& path) const {
    return id_ + CheckPath(path);
}

std::unique_ptr<ZYROCloud::Cloud> Connection::Driver() const {
    std::unique_ptr<ZYROCloud::Cloud> cloud(
        ZYROCloud::Utils::CreateCloudByServerID(user_.uid, id_, Server::VFS_CONFIG_CONNECT));
    if (cloud == nullptr) {
        throw Failure(502, "There is no way to move files to or from this connection.");
    }
    return cloud;
}

int Connection::Open(const std::string& path, int flags) const {
    const Descriptor folder(
        folder_.empty() ? -1 : open(folder_.c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC));
    if (folder.Get() < 0) {
        throw Failure(502, "The connection is not there at the moment. Connect it again.");
    }
    const std::string below = CheckPath(path) == "/" ? "." : path.substr(1);
    open_how how{};
    how.flags = static_cast<__u64>(flags | O_CLOEXEC);
    how.resolve = RESOLVE_BENEATH | RESOLVE_NO_MAGICLINKS;
    const auto fd =
        static_cast<int>(syscall(SYS_openat2, folder.Get(), below.c_str(), &how, sizeof how));
    if (fd < 0) {
        throw FailureOfErrno("\"" + path + "\"");
    }
    return fd;
}

}  // namespace web
