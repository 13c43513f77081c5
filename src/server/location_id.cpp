#include "server/location_id.h"

#include <cstring>

#include "core/error_cell.h"
#include "zyrovfs/global.h"

namespace ZYROVFS::Server {
namespace {

bool IsWithin(const std::string& uri, const std::string& id) {
    return uri.compare(0, id.size(), id) == 0 && (uri.size() == id.size() || uri[id.size()] == '/');
}

/** The longest id with which `uri` begins, "" for none. */
std::string LongestId(unsigned int uid, VFS_CONFIG_MODE mode, const std::string& uri) {
    const ErrorCellKept kept;
    Json::Value document;
    std::string found;
    if (!CfgAccess(uid, mode, VFS_CONFIG_READ, document) || !document.isObject() ||
        !document["servers"].isObject()) {
        return found;
    }
    for (const std::string& id : document["servers"].getMemberNames()) {
        if (id.size() > found.size() && IsWithin(uri, id)) {
            found = id;
        }
    }
    return found;
}

}  // namespace

std::string IdOfLocation(unsigned int uid, VFS_CONFIG_MODE mode, const std::string& uri) {
    const size_t scheme = uri.find("://");
    const size_t path =
        scheme == std::string::npos ? scheme : uri.find('/', scheme + strlen("://"));
    // Behind an account there is an '@'.
    const bool is_clear = path == std::string::npos || uri.find('@', path) == std::string::npos;
    const std::string known = is_clear ? "" : LongestId(uid, mode, uri);
    return known.empty() ? uri.substr(0, path) : known;
}

bool FindConnection(const std::string& uri, std::string& id, std::string& rest,
                    Json::Value& connection) {
    const unsigned int uid = GetActorUID();
    ErrorCellKept kept;
    if (CfgGetByID(uid, VFS_CONFIG_CONNECT, id.c_str(), connection)) {
        return true;
    }
    const std::string known = LongestId(uid, VFS_CONFIG_CONNECT, uri);
    if (known.empty() || !CfgGetByID(uid, VFS_CONFIG_CONNECT, known.c_str(), connection)) {
        kept.Dismiss();
        return false;
    }
    id = known;
    rest = uri.substr(known.size());
    return true;
}

}  // namespace ZYROVFS::Server
