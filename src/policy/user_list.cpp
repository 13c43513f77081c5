#include <fcntl.h>
#include <strings.h>

#include <zosplatform/file.h>
#include <zosplatform/group.h>
#include <zosplatform/user.h>

#include <algorithm>

#include "core/entry_name.h"
#include "core/identity.h"
#include "core/no_throw.h"
#include "core/owned_folder.h"
#include "policy/belonging.h"
#include "policy/user_settings.h"
#include "zyrovfs/cfg.h"

namespace ZYROVFS::Cfg {
namespace {

constexpr int kLockSeconds = 1;
constexpr int kListSize = 512;
constexpr const char* kEntries = "usergrp_settings";
/** Accounts of the system itself. */
constexpr const char* kFixedUsers[] = {"admin", "guest"};

/** What the callbacks of an enumeration work with. */
struct Context {
    bool no_id;
    PYLIBCSZLIST administrators;  ///< null for groups
    const Json::Value& settings;
    Json::Value& entries;
};

/** It stands below /tmp: a stranger who made it first could lock it for ever. What fails here is
 * told by the lock itself. */
void ClaimLockFile(const std::string& path) {
    const EntryPath place = SplitPath(path);
    const OwnedFolder folder = OwnedFolder::Open(place.folder, 0);
    if (folder.MoveStrangerAside(place.name)) {
        folder.OpenOrMake(place.name, O_RDWR, 0600);
    }
}

Json::Value StoredEntry(const Context& context, const char* name, const std::string& id,
                        const char* id_key) {
    Json::Value entry;
    entry["name"] = name;
    entry[id_key] = id;
    entry[kEnabled] = IsEnabled(Member(context.settings, id));
    entry["is_modifiable"] = true;
    return entry;
}

void MarkAdministrator(Json::Value& entry) {
    entry[kEnabled] = true;
    entry["is_modifiable"] = false;
}

/** The uid as text; empty when it is asked for by name and nobody has that name. */
std::string UidText(const YLIBUSERINFO& info) {
    if (info.uid != static_cast<uid_t>(-1)) {
        return std::to_string(info.uid);
    }
    PZYROUSER found = nullptr;
    if (ZYROUserGet(info.name, &found) < 0) {
        LOG_ERROR("ZYROUserGet: %s", info.name);
        return "";
    }
    return std::to_string(UniqueUser(found)->uid);
}

std::string GidText(const YLIBGROUPINFO& info) {
    gid_t gid = info.gid;
    if (gid == static_cast<gid_t>(-1) && ZYROGroupGetGID(info.name, &gid) < 0) {
        LOG_ERROR("ZYROGroupGetGID: %s", info.name);
        return "";
    }
    return std::to_string(gid);
}

/** Runs the body of a callback of the platform. */
template <typename Info, typename Body>
int Answer(const Info* info, Body body) {
    return info != nullptr && NoThrow(VFS_ERR_FAILED, body) ? 0 : -1;
}

int AddUser(const YLIBUSERINFO* info, void* pointer) {
    return Answer(info, [&] {
        const Context& context = *static_cast<const Context*>(pointer);
        Json::Value entry =
            StoredEntry(context, info->name, context.no_id ? "" : UidText(*info), "uid");
        if (YLIBCSzListCaseFind(context.administrators, info->name) >= 0) {
            MarkAdministrator(entry);
        } else if (std::any_of(
                       std::begin(kFixedUsers), std::end(kFixedUsers),
                       [info](const char* name) { return strcasecmp(name, info->name) == 0; })) {
            entry["is_modifiable"] = false;
        }
        context.entries.append(std::move(entry));
        return true;
    });
}

int AddGroup(const YLIBGROUPINFO* info, void* pointer) {
    return Answer(info, [&] {
        const Context& context = *static_cast<const Context*>(pointer);
        Json::Value entry =
            StoredEntry(context, info->name, context.no_id ? "" : GidText(*info), "gid");
        if (ZYROGroupIsAdminGroup(info->name) != 0) {
            MarkAdministrator(entry);
        }
        context.entries.append(std::move(entry));
        return true;
    });
}

/** What is enumerated, as the platform takes it. */
struct Wanted {
    int start;
    int limit;
    const char* substr;
    const char* domain;
    unsigned int type;
    bool prefix;
};

int EnumUsers(const Wanted& w, Context& context) {
    int total = 0;
    if (*w.substr == '\0') {
        total = YLIBUserInfoEnum(w.type, w.domain, w.start, w.limit, AddUser, &context);
        if (total < 0) {
            LOG_ERROR("YLIBUserInfoEnum failed, type=%u domain=%s", w.type, w.domain);
        }
    } else if (w.prefix) {
        total = YLIBUserInfoEnumByPrefix(w.type, w.substr, w.domain, w.start, w.limit, AddUser,
                                         &context);
        if (total < 0) {
            LOG_ERROR("YLIBUserInfoEnumByPrefix failed, type=%u, substr=%s, domain=%s", w.type,
                      w.substr, w.domain);
        }
    } else {
        total = YLIBUserInfoEnumBySubstr(w.type, w.substr, w.domain, w.start, w.limit, AddUser,
                                         &context);
        if (total < 0) {
            LOG_ERROR("YLIBUserInfoEnumBySubstr failed, type=%u, substr=%s, domain=%s", w.type,
                      w.substr, w.domain);
        }
    }
    return total;
}

int EnumGroups(const Wanted& w, Context& context) {
    const bool by_prefix = *w.substr == '\0' || w.prefix;
    const auto enumerate = by_prefix ? YLIBGroupInfoEnumByPrefix : YLIBGroupInfoEnumBySubstr;
    const int total = enumerate(w.type, w.substr, w.domain, w.start, w.limit, AddGroup, &context);
    if (total < 0) {
        LOG_ERROR("YLIBGroupInfoEnumByPrefix failed, type=%u, substr=%s, domain=%s", w.type,
                  w.substr, w.domain);
    }
    return total;
}

bool KeepTotal(int total, Json::Value& out) {
    if (total < 0) {
        return Fail(VFS_ERR_FAILED);
    }
    out["total"] = total;
    return true;
}

}  // namespace

bool VFSUser::SDKEnum(int start, int limit, Json::Value& out, const std::string& substr,
                      const std::string& domain, AUTH_TYPE type, bool prefix, bool noID) {
    return NoThrow(VFS_ERR_FAILED, [&] {
        UniqueList administrators(YLIBCSzListAlloc(kListSize));
        if (administrators == nullptr) {
            LOG_ERROR("YLIBCSzListAlloc failed " PLATFORM_ERROR_FORMAT, ZYROERR_ARGS);
            return Fail(VFS_ERR_FAILED);
        }
        // The platform may put a larger list in the place of the one it was given.
        PYLIBCSZLIST list = administrators.release();
        const int listed = YLIBUserAdminListGet(type, &list);
        administrators.reset(list);
        if (listed == -1) {
            LOG_ERROR("YLIBUserAdminListGet failed, type=%u " PLATFORM_ERROR_FORMAT, type,
                      ZYROERR_ARGS);
            return Fail(VFS_ERR_FAILED);
        }
        Context context{noID, administrators.get(), Member(value_, settings_.key), out[kEntries]};
        const Wanted wanted{start, limit, substr.c_str(), domain.c_str(), type, prefix};
        return KeepTotal(EnumUsers(wanted, context), out);
    });
}

bool VFSGroup::SDKEnum(int start, int limit, Json::Value& out, const std::string& substr,
                       const std::string& domain, AUTH_TYPE type, bool prefix, bool noID) {
    return NoThrow(VFS_ERR_FAILED, [&] {
        Context context{noID, nullptr, Member(value_, settings_.key), out[kEntries]};
        const Wanted wanted{start, limit, substr.c_str(), domain.c_str(), type, prefix};
        return KeepTotal(EnumGroups(wanted, context), out);
    });
}

bool VFSEntityCfg::List(int start, int limit, std::string authType, std::string substr,
                        std::string domain, bool prefix, bool noID, Json::Value& out) {
    bool done = false;
    ENTERCriticalSection;
    done = NoThrow(VFS_ERR_FAILED, [&] {
        if (start < 0 || limit < -1) {
            LOG_ERROR("Bad parameter, start=%d, limit=%d", start, limit);
            return Fail(VFS_ERR_BAD_PARAM);
        }
        AUTH_TYPE type{};
        if (!ConvertStrToAuthType(type, authType)) {
            return false;
        }
        ClaimLockFile(settings_.lockFile);
        int fd = -1;
        if (!YLIBCFileLockTimeByFile(settings_.lockFile, 1, kLockSeconds, &fd)) {
            LOG_ERROR("Failed to lock file: %s " PLATFORM_ERROR_FORMAT ", reason=%m",
                      settings_.lockFile, ZYROERR_ARGS);
            return Fail(VFS_ERR_BUSY);
        }
        const ScopeExit unlock([fd] { YLIBCFileUnlockByFile(fd); });
        out = Json::Value(Json::objectValue);
        out["offset"] = start;
        out[kEntries] = Json::Value(Json::arrayValue);
        return SDKEnum(start, limit, out, substr, domain, type, prefix, noID);
    });
    LEAVECriticalSection;
    return done;
}

}  // namespace ZYROVFS::Cfg
