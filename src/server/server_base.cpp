#include "server/server_base.h"

#include <unistd.h>

#include <cstring>

namespace ZYROVFS::Server {
namespace {

constexpr size_t kLongestAlias = 255;

}  // namespace

bool ServerBase::IsAliasValid(const char* alias) {
    return std::strlen(alias) <= kLongestAlias;
}

int ServerBase::GetConnectStatus(unsigned int uid) {
    std::string id;
    Json::Value connection;
    if (!GetServerID(id) || !CfgGetByID(uid, VFS_CONFIG_CONNECT, id.c_str(), connection) ||
        !connection.isObject() || !connection["path"].isString()) {
        return 0;
    }
    return access(connection["path"].asCString(), F_OK) == 0 ? 1 : 0;
}

}  // namespace ZYROVFS::Server
