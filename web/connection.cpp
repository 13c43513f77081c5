#include "connection.h"

#include <zyrovfs/cloud_utils.h>
#include <zyrovfs/server.h>

#include "body.h"
#include "cloud_tree.h"
#include "failure.h"
#include "mounted_tree.h"
#include "name.h"

namespace web {

using namespace ZYROVFS;

bool IsCloud(const std::string& protocol) {
    return protocol == "box" || protocol == "dropbox" || protocol == "google" ||
           protocol == "onedrive";
}

Connection::Connection(const User& user, const std::string& id) : user_(user), id_(id) {
    if (!Server::CfgGetByID(user.uid, Server::VFS_CONFIG_CONNECT, id.c_str(), record_) ||
        !record_.isObject()) {
        throw FailureOf("The connection cannot be used", GetError());
    }
}

std::string Connection::Member(const char* key) const {
    const Json::Value& value = record_[key];
    return value.isString() ? value.asString() : "";
}

std::string Connection::Title() const {
    return Member("alias").empty() ? id_ : Member("alias");
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

std::unique_ptr<Tree> Connection::Files() const {
    if (!IsCloud(Member("protocol"))) {
        return std::make_unique<MountedTree>(Member("path"));
    }
    const Json::Value account = ParseObject(Member("account_info"));
    const Json::Value& id = account["id"];
    return std::make_unique<CloudTree>(
        id_, id.isConvertibleTo(Json::stringValue) ? id.asString() : "", Member("path"));
}

std::unique_ptr<Tree> Connection::BeforeUpload() const {
    return Member("protocol") == "box" ? Files() : std::make_unique<MountedTree>(Member("path"));
}

void Connection::CheckUpload(ZYROCloud::Cloud& cloud, const std::string& path,
                             long long size) const {
    std::string why;
    if (ZYROCloud::Utils::IsTransferSafe(&cloud, Uri(path), true, size, why)) {
        return;
    }
    const ZYROVFS::__tag_vfs_err_ code = cloud.GetErrorCode();
    throw code == ZYROVFS::VFS_ERR_NONE ? Failure(422, why)
                                        : FailureOf("The file was not uploaded", code);
}

}  // namespace web
