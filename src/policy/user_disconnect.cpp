#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>

#include <zosplatform/group.h>
#include <zosplatform/user.h>

#include <charconv>
#include <memory>
#include <vector>

#include "core/no_throw.h"
#include "core/owned_folder.h"
#include "core/paths.h"
#include "policy/belonging.h"
#include "policy/user_settings.h"
#include "zyrovfs/cfg.h"
#include "zyrovfs/server.h"

namespace ZYROVFS::Cfg {
namespace {

/** Only the very text of a number: a folder of another name belongs to nobody. */
bool ToUid(const std::string& text, unsigned int& uid) {
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), uid);
    return error == std::errc() && end == text.data() + text.size() && text == std::to_string(uid);
}

bool IsDirectory(int parent, const dirent& entry) {
    struct stat info {};
    return fstatat(parent, entry.d_name, &info, AT_SYMLINK_NOFOLLOW) == 0 && S_ISDIR(info.st_mode);
}

/** Whom the directory cannot tell about may be an administrator: profiles that are removed do not
 * come back. */
bool IsSurelyNoAdmin(unsigned int uid) {
    const int admin = YLIBGroupIsAdminGroupMemByUid(uid, 1);
    if (admin < 0) {
        LOG_ERROR("Failed to find out whether user (%d) is an administrator, " ZYROERR_FORMAT,
                  static_cast<int>(uid), ZYROERR_ARGS);
    }
    return admin == 0;
}

/** Everyone who has had a connection and is no administrator. */
std::vector<unsigned int> NonAdminUids() {
    std::vector<unsigned int> uids;
    UniqueFd fd = OwnedFolder::Open(paths::kConnectRoot, 0).OpenForReading();
    const UniqueDir dir(fd ? fdopendir(fd.Get()) : nullptr);
    if (!dir) {
        LOG_ERROR("Failed to opendir, path=%s", paths::kConnectRoot);
        return uids;
    }
    fd.Release();
    while (const dirent* entry = readdir(dir.get())) {
        unsigned int uid = 0;
        if (ToUid(entry->d_name, uid) && IsDirectory(dirfd(dir.get()), *entry) &&
            IsSurelyNoAdmin(uid)) {
            uids.push_back(uid);
        }
    }
    return uids;
}

/** Whether the user's own entry lets the user stay: it does unless it clearly says no. */
bool StaysByOwnEntry(const Json::Value& entry) {
    const Json::Value& enabled = Member(entry, kEnabled);
    const bool tells = !enabled.isNull() && enabled.isConvertibleTo(Json::booleanValue);
    return !entry.isNull() && (!tells || enabled.asBool());
}

/** Whom the directory cannot tell about stays: profiles that are removed do not come back. */
bool StaysByGroups(unsigned int uid, const Json::Value& settings) {
    PZYROUSER found = nullptr;
    if (ZYROUserGetByUID(uid, &found) < 0) {
        LOG_ERROR("Failed to get user (%d), " ZYROERR_FORMAT, static_cast<int>(uid), ZYROERR_ARGS);
        return true;
    }
    const UniqueUser user(found);
    const UniqueList groups(YLIBGroupInfoListGet(user->name, 0));
    if (!groups) {
        LOG_ERROR("Failed to list belonging groups for user [%s]", user->name);
        return true;
    }
    const char* gid = nullptr;
    for (int i = 0; (gid = YLIBCSzListGet(groups.get(), i)) != nullptr; ++i) {
        if (IsEnabled(Member(settings, gid))) {
            return true;
        }
    }
    return false;
}

}  // namespace

bool VFSEntityCfg::DisableConnByMap(const std::map<std::string, bool>& ids) {
    NoThrow(VFS_ERR_FAILED, [&] {
        for (const auto& [id, disable] : ids) {
            if (!disable) {
                continue;
            }
            unsigned int uid = 0;
            Json::Value one(Json::arrayValue);
            one.append(ToUid(id, uid) ? Json::Value(uid) : Json::Value(id));
            // Whoever watches the log takes this line for the sign that the user is out.
            if (Server::DeleteUser(one, false, false)) {
                LOG_ERROR("DeleteUser %s failed", id.c_str());
            }
        }
        return true;
    });
    return true;
}

bool VFSEntityCfg::FilterNonAdminEntities() {
    return NoThrow(VFS_ERR_FAILED, [&] {
        std::map<std::string, bool> ids;
        for (const unsigned int uid : NonAdminUids()) {
            ids[std::to_string(uid)] = true;
        }
        return DisableConnByMap(ids);
    });
}

bool VFSEntityCfg::DisConnDisabledConf() {
    return NoThrow(VFS_ERR_FAILED, [&] {
        Json::Value shut_out(Json::arrayValue);
        const Json::Value& users = Member(value_, USER.key);
        for (const unsigned int uid : NonAdminUids()) {
            if (!StaysByOwnEntry(Member(users, std::to_string(uid))) &&
                !StaysByGroups(uid, Member(value_, GROUP.key))) {
                shut_out.append(uid);
            }
        }
        if (!Server::DeleteUser(shut_out, true, true)) {
            LOG_ERROR("Delete user connections failed");
            return false;
        }
        return true;
    });
}

}  // namespace ZYROVFS::Cfg
