#include "location.h"

#include <sys/fsuid.h>
#include <unistd.h>
#include <zyrovfs/cloud_utils.h>
#include <zyrovfs/server.h>

namespace tool {
namespace {

using namespace ZYROVFS;

/** Group of all users of the box. */
constexpr gid_t kUsers = 100;

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
    for (const Server::VFS_CONFIG_MODE mode :
         {Server::VFS_CONFIG_CONNECT, Server::VFS_CONFIG_SERVER}) {
        Json::Value record;
        if (Server::CfgGetByID(uid, mode, id.c_str(), record)) {
            std::unique_ptr<ZYROCloud::Cloud> cloud(
                ZYROCloud::Utils::CreateCloudByURI(uid, uri, mode));
            problem = cloud ? "" : "There is no driver for " + id + "; the system log tells why.";
            return cloud;
        }
    }
    problem = "The user has neither a connection nor a profile " + id + ".";
    return nullptr;
}

AsUser::AsUser(unsigned int uid)
    : uid_(static_cast<uid_t>(setfsuid(uid))), gid_(static_cast<gid_t>(setfsgid(kUsers))) {}

AsUser::~AsUser() {
    setfsgid(gid_);
    setfsuid(uid_);
}

}  // namespace tool
