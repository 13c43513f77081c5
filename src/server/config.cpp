#include <sys/stat.h>

#include "core/error_cell.h"
#include "core/json.h"
#include "core/log.h"
#include "core/no_throw.h"
#include "core/owned_folder.h"
#include "core/paths.h"
#include "mount/fork_as_user.h"
#include "mount/mkdir.h"
#include "server/config_document.h"
#include "zyrovfs/server.h"

namespace ZYROVFS::Server {
namespace {

constexpr const char* kServers = "servers";
constexpr Json::ArrayIndex kMostPerProtocol = 100;

struct Place {
    std::string directory;
    const char* file;

    std::string Path() const { return directory + "/" + file; }
};

/** Nowhere for a mode that does not exist: the step that needs the directory then fails. */
Place PlaceOf(unsigned int uid, VFS_CONFIG_MODE mode) {
    switch (mode) {
        case VFS_CONFIG_SERVER:
            return {paths::UserConfigDir(uid), paths::kServersFile};
        case VFS_CONFIG_CONNECT:
            return {paths::UserConnectDir(uid), paths::kConnectFile};
    }
    return {"", ""};
}

/** Every local user may enter it, and nobody but the user and root change what is the user's. */
OwnedFolder OpenFolder(unsigned int uid, const Place& place, SourceLine at = SourceLine::Here()) {
    OwnedFolder folder = Utils::CreateOwnedFolder(place.directory, uid);
    if (!folder) {
        LOG_ERROR_AT(at, "Error VFS server config directory, uid: %u", uid);
        SetErr(VFS_ERR_FAILED, at);
    }
    return folder;
}

bool ReadDocument(const OwnedFolder& folder, const Place& place, Json::Value& doc) {
    struct stat info {};
    folder.Stat(place.file, info);  // a stranger's is moved aside, and so counts as missing
    if (fstatat(folder.Get(), place.file, &info, 0) != 0 || info.st_size == 0) {
        if (!doc.isObject()) {
            doc = Json::Value();
        }
        doc[kServers] = Json::Value(Json::objectValue);
        return true;
    }
    if (!json::fromFile(doc, folder, place.file)) {
        LOG_ERROR("Json::Value::fromFile failed: %s", place.Path().c_str());
        return false;
    }
    return true;
}

bool WriteDocument(const OwnedFolder& folder, const Place& place, unsigned int uid,
                   const Json::Value& doc) {
    if (!json::toFile(doc, folder, place.file, 0600, {uid, kUsersGid})) {
        LOG_ERROR("Json::Value::toFile failed: %s", place.Path().c_str());
        return false;
    }
    return true;
}

bool Read(unsigned int uid, VFS_CONFIG_MODE mode, Json::Value& doc,
          SourceLine at = SourceLine::Here()) {
    return CfgAccess(uid, mode, VFS_CONFIG_READ, doc) || Fail(VFS_ERR_CONFIG_READ, at);
}

bool Write(unsigned int uid, VFS_CONFIG_MODE mode, Json::Value& doc, __tag_vfs_err_ code,
           SourceLine at = SourceLine::Here()) {
    return CfgAccess(uid, mode, VFS_CONFIG_WRITE, doc) || Fail(code, at);
}

bool AppendEntry(unsigned int uid, VFS_CONFIG_MODE mode, const std::string& id,
                 Json::Value profile) {
    Json::Value doc;
    if (!Read(uid, mode, doc)) {
        return false;
    }
    if (doc[kServers].isMember(id)) {
        return Fail(mode == VFS_CONFIG_CONNECT ? VFS_ERR_CONNECT_EXISTS : VFS_ERR_SERVER_EXISTS);
    }
    doc[kServers][id] = std::move(profile);
    // Callers know the failed write of an append or a delete by this code.
    return Write(uid, mode, doc, VFS_ERR_CONFIG_READ);
}

bool RemoveEntry(unsigned int uid, VFS_CONFIG_MODE mode, const std::string& id) {
    Json::Value doc;
    if (!Read(uid, mode, doc)) {
        return false;
    }
    doc[kServers].removeMember(id);
    return Write(uid, mode, doc, VFS_ERR_CONFIG_READ);
}

bool ReplaceEntry(unsigned int uid, VFS_CONFIG_MODE mode, const std::string& id,
                  const Json::Value& profile) {
    Json::Value doc;
    if (!Read(uid, mode, doc)) {
        return false;
    }
    doc[kServers][id] = profile;
    return Write(uid, mode, doc, VFS_ERR_CONFIG_WRITE);
}

/** Two writes without a way back: what fails in the second leaves the profile gone. */
bool MoveEntry(unsigned int uid, VFS_CONFIG_MODE mode, const std::string& from,
               const std::string& to, const Json::Value& profile) {
    if (!CfgDeleteByID(uid, mode, from.c_str())) {
        LOG_ERROR("CfgDeleteByID failed, uid=%u, mode=%u, serverID=%s, code=%u", uid, mode,
                  from.c_str(), GetError());
        return false;
    }
    if (!CfgAppend(uid, mode, to.c_str(), profile)) {
        LOG_ERROR("CfgAppend failed, uid=%u, mode=%u, serverID=%s, code=%u", uid, mode, to.c_str(),
                  GetError());
        return false;
    }
    return true;
}

}  // namespace

std::string DocumentPath(unsigned int uid, VFS_CONFIG_MODE mode) {
    return PlaceOf(uid, mode).Path();
}

bool CfgCheckPath(unsigned int uid, VFS_CONFIG_MODE mode) {
    return NoThrow(VFS_ERR_FAILED,
                   [&] { return static_cast<bool>(OpenFolder(uid, PlaceOf(uid, mode))); });
}

bool CfgGetPath(unsigned int uid, VFS_CONFIG_MODE mode, std::string& path) {
    return NoThrow(VFS_ERR_FAILED, [&] {
        if (!CfgCheckPath(uid, mode)) {
            return false;
        }
        path = DocumentPath(uid, mode);
        return true;
    });
}

bool CfgAccess(unsigned int uid, VFS_CONFIG_MODE mode, VFS_CONFIG_ACTION action, Json::Value& doc) {
    return NoThrow(VFS_ERR_FAILED, [&] {
        const Place place = PlaceOf(uid, mode);
        const OwnedFolder folder = OpenFolder(uid, place);
        if (!folder) {
            return false;
        }
        switch (action) {
            case VFS_CONFIG_READ:
                return ReadDocument(folder, place, doc);
            case VFS_CONFIG_WRITE:
                return WriteDocument(folder, place, uid, doc);
        }
        return true;
    });
}

bool CfgAppend(unsigned int uid, VFS_CONFIG_MODE mode, const char* serverID, Json::Value profile) {
    if (serverID == nullptr) {
        return Fail(VFS_ERR_BAD_PARAM);
    }
    return NoThrow(VFS_ERR_CONFIG_READ,
                   [&] { return AppendEntry(uid, mode, serverID, std::move(profile)); });
}

bool CfgGetByKey(unsigned int uid, VFS_CONFIG_MODE mode, const char* key, const char* value,
                 Json::Value& out) {
    if (key == nullptr || value == nullptr) {
        return Fail(VFS_ERR_BAD_PARAM);
    }
    return NoThrow(VFS_ERR_CONFIG_READ, [&] {
        out = Json::Value(Json::objectValue);
        Json::Value doc;
        if (!Read(uid, mode, doc)) {
            return false;
        }
        const Json::Value& servers = ServersOf(doc);
        for (auto it = servers.begin(); it != servers.end(); ++it) {
            if (HasText(*it, key, value)) {
                out[it.name()] = *it;
            }
        }
        return true;
    });
}

bool CfgIsFull(unsigned int uid, VFS_CONFIG_MODE mode, const char* protocol) {
    Json::Value same;
    return !CfgGetByKey(uid, mode, "protocol", protocol, same) || same.size() >= kMostPerProtocol;
}

bool CfgGetByID(unsigned int uid, VFS_CONFIG_MODE mode, const char* serverID,
                Json::Value& profile) {
    if (serverID == nullptr) {
        return Fail(VFS_ERR_BAD_PARAM);
    }
    return NoThrow(VFS_ERR_CONFIG_READ, [&] {
        Json::Value doc;
        if (!Read(uid, mode, doc)) {
            return false;
        }
        const Json::Value& servers = ServersOf(doc);
        if (!servers.isMember(serverID)) {
            return Fail(VFS_ERR_CONFIG_NOT_FOUND);
        }
        profile = servers[serverID];
        return true;
    });
}

bool CfgDeleteByID(unsigned int uid, VFS_CONFIG_MODE mode, const char* serverID) {
    if (serverID == nullptr) {
        return Fail(VFS_ERR_BAD_PARAM);
    }
    return NoThrow(VFS_ERR_CONFIG_READ, [&] { return RemoveEntry(uid, mode, serverID); });
}

bool CfgSetByID(unsigned int uid, VFS_CONFIG_MODE mode, std::string serverID,
                std::string& newServerID, const Json::Value& profile) {
    return NoThrow(VFS_ERR_CONFIG_READ, [&] {
        Json::Value doc;
        return serverID == newServerID
                   ? ReplaceEntry(uid, mode, newServerID, profile)
                   : Read(uid, mode, doc) && MoveEntry(uid, mode, serverID, newServerID, profile);
    });
}

}  // namespace ZYROVFS::Server
