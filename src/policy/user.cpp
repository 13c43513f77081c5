#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>

#include <zosplatform/file.h>
#include <zosplatform/user.h>

#include "core/entry_name.h"
#include "core/identity.h"
#include "core/json.h"
#include "core/no_throw.h"
#include "core/owned_folder.h"
#include "core/paths.h"
#include "policy/user_settings.h"
#include "zyrovfs/cfg.h"

namespace ZYROVFS::Cfg {
namespace {

constexpr mode_t kMode = 0744;

/** After a step that succeeded. One that failed leaves the process at root, which is what its
 * callers have always gone on with. */
bool Restore(const RootUntilRestored& root) {
    if (root.Restore()) {
        return true;
    }
    LOG_ERROR("Failed to restore euid[%d], %m", static_cast<int>(root.Saved()));
    return false;
}

/** Whoever may write the policy decides about everybody's connections. */
bool ReadOwnedByRoot(Json::Value& value, const std::string& path) {
    value = Json::Value();
    const EntryPath place = SplitPath(path);
    const OwnedFolder folder = OwnedFolder::Open(place.folder, 0);
    struct stat info {};
    if (!folder || !folder.Stat(place.name, info)) {
        return false;
    }
    if ((info.st_mode & (S_IWGRP | S_IWOTH)) != 0) {
        errno = EPERM;
        return false;
    }
    return json::fromFile(value, folder, place.name);
}

/** As root, like the write before it: the change has landed, and a caller with the identity of a
 * user must not be told that it has not. By descriptor. */
bool SetMode(mode_t mode) {
    const RootUntilRestored root;
    const EntryPath place = SplitPath(paths::kPolicyFile);
    const OwnedFolder folder = OwnedFolder::Open(place.folder, 0);
    const UniqueFd fd = folder.OpenFile(place.name, O_RDONLY);
    const bool set = fd && fchmod(fd.Get(), mode) == 0;
    return Restore(root) && set;
}

/** Below /tmp everybody can make such a file: only root's tells of an update. */
bool IsRoots(const char* path) {
    const EntryPath place = SplitPath(path);
    const OwnedFolder folder = OwnedFolder::Open(place.folder, 0);
    struct stat info {};
    return folder && folder.Stat(place.name, info);
}

}  // namespace

const _VFS_ENTITY_FILE_SETTINGS VFSEntityCfg::USER = {"user_settings", paths::kLdapUserList,
                                                      paths::kDomainUserPid, paths::kUserListLock};
const _VFS_ENTITY_FILE_SETTINGS VFSEntityCfg::GROUP = {
    "group_settings", paths::kLdapGroupList, paths::kDomainGroupPid, paths::kGroupListLock};

VFSEntityCfg::VFSEntityCfg(_VFS_ENTITY_FILE_SETTINGS settings)
    : settings_(settings), dirty_(false) {
    if (access(paths::kPolicyFile, F_OK) != 0) {
        return;
    }
    if (!JsonFromFile(value_, paths::kPolicyFile) || !(value_.isObject() || value_.isNull())) {
        LOG_ERROR("JsonFromFile failed: %s", paths::kPolicyFile);
        SetErr(VFS_ERR_CONFIG_READ);
        value_ = Json::Value();
    }
}

VFSEntityCfg::~VFSEntityCfg() {
    if (!dirty_) {
        return;
    }
    if (!JsonToFile(paths::kPolicyFile)) {
        LOG_ERROR("JsonToFile failed: %s", paths::kPolicyFile);
        SetErr(VFS_ERR_CONFIG_WRITE);
    } else if (!SetMode(kMode)) {
        LOG_ERROR("Failed to chmod 744 for %s", paths::kPolicyFile);
        SetErr(VFS_ERR_CONFIG_WRITE);
    }
}

bool VFSEntityCfg::JsonFromFile(Json::Value& value, const char* path) {
    const RootUntilRestored root;
    return path != nullptr && ReadOwnedByRoot(value, path) && Restore(root);
}

bool VFSEntityCfg::JsonToFile(const char* path) {
    const RootUntilRestored root;
    return path != nullptr && json::toFile(value_, path, kMode) && Restore(root);
}

bool VFSEntityCfg::GetUserEnabledType(std::string& type) const {
    NoThrow(VFS_ERR_CONFIG_READ, [&] {
        const Json::Value stored = value_.get(kType, kAdmin);
        // What is no text names no type: nobody but administrators, as without any.
        type = stored.isConvertibleTo(Json::stringValue) ? stored.asString() : kAdmin;
        return true;
    });
    return true;
}

template <typename T>
bool VFSEntityCfg::Get(T id, Json::Value& out) const {
    NoThrow(VFS_ERR_CONFIG_READ, [&] {
        const Json::Value& stored = Member(Member(value_, settings_.key), std::to_string(id));
        out = stored.isObject() ? stored : Json::Value();
        if (out.isMember(kEnabled) && !out[kEnabled].isConvertibleTo(Json::booleanValue)) {
            out[kEnabled] = false;
        }
        if (value_.isMember(kType)) {
            std::string type;
            GetUserEnabledType(type);
            if (type == kAll || type == kAdmin) {
                out[kEnabled] = type == kAll;
            }
        }
        return true;
    });
    return true;
}

template ZYROVFS_API bool VFSEntityCfg::Get(unsigned int id, Json::Value& out) const;
template ZYROVFS_API bool VFSEntityCfg::Get(unsigned long id, Json::Value& out) const;

bool VFSEntityCfg::ConvertStrToAuthType(AUTH_TYPE& type, const std::string& text) {
    if (text == "domain") {
        type = AUTH_TYPE_DOMAIN;
        if ((IsRoots(settings_.domainPid) && YLIBCReadPidFile(settings_.domainPid) > 0) ||
            IsRoots(paths::kDomainUpdating)) {
            LOG_ERROR("Domain user updating");
            return Fail(VFS_ERR_BUSY);
        }
    } else if (text == "ldap") {
        type = AUTH_TYPE_LDAP;
        if (ZYROLDAPIsBinded() != 0 && !YLIBCFileExist(settings_.ldapListFile)) {
            LOG_ERROR("ldap user updating");
            return Fail(VFS_ERR_BUSY);
        }
    } else if (text == "local") {
        type = AUTH_TYPE_LOCAL;
    } else if (text == "all") {
        type = AUTH_TYPE_ALL;
    } else {
        LOG_ERROR("Unsupported auth type: %s", text.c_str());
        return Fail(VFS_ERR_BAD_PARAM);
    }
    return true;
}

VFSUser::VFSUser() : VFSEntityCfg(USER) {}

VFSGroup::VFSGroup() : VFSEntityCfg(GROUP) {}

std::unique_ptr<VFSEntityCfg> MakeCfgBySettings(const std::string& key) {
    VFSEntityCfg* cfg = nullptr;
    if (key == VFSEntityCfg::USER.key) {
        cfg = new (std::nothrow) VFSUser;
    } else if (key == VFSEntityCfg::GROUP.key) {
        cfg = new (std::nothrow) VFSGroup;
    }
    return std::unique_ptr<VFSEntityCfg>(cfg);
}

std::unique_ptr<VFSEntityCfg> MakeCfgBySettings(const Json::Value& conf) {
    return conf.isObject() && !conf.empty() ? MakeCfgBySettings(conf.begin().name()) : nullptr;
}

}  // namespace ZYROVFS::Cfg
