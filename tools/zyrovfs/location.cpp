#include "location.h"

#include <grp.h>
#include <sys/fsuid.h>
#include <unistd.h>
#include <zosplatform/user.h>
#include <zyrovfs/cloud_utils.h>
#include <zyrovfs/server.h>

#include <algorithm>
#include <cstdlib>
#include <stdexcept>

namespace tool {
namespace {

using namespace ZYROVFS;

/** Group of all users of the box. */
constexpr gid_t kUsers = 100;

std::vector<gid_t> OwnGroups() {
    std::vector<gid_t> groups(static_cast<size_t>(std::max(getgroups(0, nullptr), 0)));
    groups.resize(static_cast<size_t>(
        std::max(getgroups(static_cast<int>(groups.size()), groups.data()), 0)));
    return groups;
}

/** Groups of a user; of one who is not in the password file, only that of all users. */
std::vector<gid_t> GroupsOf(unsigned int uid) {
    PZYROUSER user = nullptr;
    if (ZYROUserGetByUID(uid, &user) < 0) {
        return {kUsers};
    }
    int count = 0;
    getgrouplist(user->name, kUsers, nullptr, &count);
    std::vector<gid_t> groups(static_cast<size_t>(std::max(count, 1)), kUsers);
    count = static_cast<int>(groups.size());
    getgrouplist(user->name, kUsers, groups.data(), &count);
    ZYROUserFree(user);
    return groups;
}

}  // namespace

bool IsUri(const std::string& text) {
    const size_t colon = text.find("://");
    return colon != std::string::npos && colon > 0 &&
           text.find_first_not_of(
               "abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ"
               "0123456789+-.") == colon;
}

std::string ServerIdOf(const std::string& uri) {
    return uri.substr(0, uri.find('/', uri.find("://") + 3));
}

std::string NameOf(const std::string& path) {
    return path.substr(path.rfind('/') + 1);
}

std::unique_ptr<ZYROCloud::Cloud> OpenLocation(unsigned int uid, const std::string& uri,
                                               std::string& problem) {
    const std::string id = ServerIdOf(uri);
    // An account with a '/' in its name makes the id longer; the library finds its end.
    const bool may_be_longer = uri.find('@', id.size()) != std::string::npos;
    for (const Server::VFS_CONFIG_MODE mode :
         {Server::VFS_CONFIG_CONNECT, Server::VFS_CONFIG_SERVER}) {
        Json::Value record;
        const bool known = Server::CfgGetByID(uid, mode, id.c_str(), record);
        if (!known && !may_be_longer) {
            continue;
        }
        std::unique_ptr<ZYROCloud::Cloud> cloud(ZYROCloud::Utils::CreateCloudByURI(uid, uri, mode));
        if (known || cloud != nullptr) {
            problem = cloud ? "" : "There is no driver for " + id + "; the system log tells why.";
            return cloud;
        }
    }
    problem = "The user has neither a connection nor a profile " + id + ".";
    return nullptr;
}

AsUser::AsUser(unsigned int uid) : groups_(OwnGroups()) {
    const std::vector<gid_t> groups = GroupsOf(uid);
    if (setgroups(groups.size(), groups.data()) != 0) {
        throw std::runtime_error("The groups of the user cannot be taken.");
    }
    gid_ = static_cast<gid_t>(setfsgid(kUsers));
    uid_ = static_cast<uid_t>(setfsuid(uid));
}

AsUser::~AsUser() {
    setfsuid(uid_);
    setfsgid(gid_);
    if (setgroups(groups_.size(), groups_.data()) != 0) {
        std::abort();  // must not go on with somebody else's groups
    }
}

}  // namespace tool
