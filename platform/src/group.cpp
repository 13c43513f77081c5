#include "zosplatform/group.h"

#include <grp.h>

#include <algorithm>
#include <memory>

#include "directory.h"
#include "name_service.h"
#include "support.h"
#include "zosplatform/user.h"

namespace {

constexpr int kFailed = -1;

// The second serves machines without the first.
constexpr const char* kAdminGroups[] = {"administrators", "sudo"};

struct FreeUser {
    void operator()(PZYROUSER user) const { ZYROUserFree(user); }
};
using UniqueUser = std::unique_ptr<ZYROUSER, FreeUser>;

struct FreeList {
    void operator()(PYLIBCSZLIST list) const { YLIBCSzListFree(list); }
};

zos::Lookup FindGroup(const char* name, group& record, std::vector<char>& texts) {
    const auto call = [name](group* entry, char* buffer, size_t size, group** found) {
        return getgrnam_r(name, entry, buffer, size, found);
    };
    const zos::Lookup found = zos::LookUp(call, record, texts);
    if (found == zos::Lookup::kUnknown) {
        SET_PLATFORM_ERROR(ZOS_ERR_NO_SUCH_GROUP);
    } else if (found == zos::Lookup::kFailed) {
        SET_SYSTEM_ERROR(ZOS_ERR_SYSTEM);
    }
    return found;
}

/** The primary group first, each once. */
std::vector<gid_t> GroupsOf(const ZYROUSER& user) {
    std::vector<gid_t> groups(64);
    for (;;) {
        int count = static_cast<int>(groups.size());
        const bool fits = getgrouplist(user.name, user.gid, groups.data(), &count) >= 0;
        groups.resize(static_cast<size_t>(count));
        if (fits) {
            return groups;
        }
    }
}

/** The answer to what was not found: a no only when everybody who might know was asked. */
int NoOrUnknown(const char* user, gid_t group) {
    if (zos::HaveServicesAnswered(user, group)) {
        return 0;
    }
    SET_PLATFORM_ERROR(ZOS_ERR_SYSTEM);
    return kFailed;
}

int IsAdministrator(uid_t uid) {
    PZYROUSER found = nullptr;
    if (ZYROUserGetByUID(uid, &found) < 0) {
        return YLIBCErrGet() == ZOS_ERR_NO_SUCH_USER ? NoOrUnknown("root", 0) : kFailed;
    }
    const UniqueUser user(found);
    zos::AdminGroup administrators;
    if (!zos::FindAdminGroup(administrators)) {
        return YLIBCErrGet() == ZOS_ERR_NO_SUCH_GROUP ? NoOrUnknown(user->name, user->gid)
                                                      : kFailed;
    }
    const std::vector<gid_t> groups = GroupsOf(*user);
    return std::find(groups.begin(), groups.end(), administrators.gid) != groups.end()
               ? 1
               : NoOrUnknown(user->name, user->gid);
}

PYLIBCSZLIST ListGroups(const char* name) {
    PZYROUSER found = nullptr;
    if (ZYROUserGet(name, &found) < 0) {
        return nullptr;
    }
    const UniqueUser user(found);
    std::unique_ptr<_tag_YLIBCSZLIST_, FreeList> owner(YLIBCSzListAlloc(512));
    PYLIBCSZLIST list = owner.get();
    if (list == nullptr) {
        return nullptr;
    }
    for (const gid_t gid : GroupsOf(*user)) {
        if (YLIBCSzListPush(&list, std::to_string(gid).c_str()) != 0) {
            return nullptr;
        }
    }
    return owner.release();
}

}  // namespace

namespace zos {

bool FindAdminGroup(AdminGroup& administrators) {
    group record{};
    std::vector<char> texts;
    for (const char* name : kAdminGroups) {
        const Lookup found = FindGroup(name, record, texts);
        if (found == Lookup::kFailed) {
            return false;
        }
        if (found == Lookup::kFound) {
            administrators = {record.gr_name, record.gr_gid, {}};
            for (char** member = record.gr_mem; *member != nullptr; ++member) {
                administrators.members.emplace_back(*member);
            }
            return true;
        }
    }
    return false;
}

}  // namespace zos

PYLIBCSZLIST YLIBGroupInfoListGet(const char* user, int) {
    return zos::OrOutOfMemory(PYLIBCSZLIST(), [user] { return ListGroups(user); });
}

int YLIBGroupIsAdminGroupMemByUid(uid_t uid, int) {
    return zos::OrOutOfMemory(kFailed, [uid] { return IsAdministrator(uid); });
}

int ZYROGroupGetGID(const char* name, gid_t* gid) {
    if (name == nullptr || gid == nullptr) {
        SET_PLATFORM_ERROR(ZOS_ERR_BAD_PARAMETER);
        return kFailed;
    }
    return zos::OrOutOfMemory(kFailed, [&] {
        group record{};
        std::vector<char> texts;
        if (FindGroup(name, record, texts) != zos::Lookup::kFound) {
            return kFailed;
        }
        *gid = record.gr_gid;
        return 0;
    });
}

int ZYROGroupIsAdminGroup(const char* name) {
    if (name == nullptr) {
        SET_PLATFORM_ERROR(ZOS_ERR_BAD_PARAMETER);
        return 0;
    }
    // Asked for each group of a listing: most names need no look at the machine's groups.
    const bool possible =
        std::any_of(std::begin(kAdminGroups), std::end(kAdminGroups),
                    [name](const char* one) { return YLIBCUnicodeUTF8StrCaseCmp(name, one) == 0; });
    return !possible ? 0 : zos::OrOutOfMemory(0, [name] {
        zos::AdminGroup administrators;
        return zos::FindAdminGroup(administrators) &&
                       YLIBCUnicodeUTF8StrCaseCmp(name, administrators.name.c_str()) == 0
                   ? 1
                   : 0;
    });
}
