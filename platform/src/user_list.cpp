#include <algorithm>

#include "directory.h"
#include "support.h"
#include "zosplatform/user.h"

namespace {

constexpr int kFailed = -1;

int Enumerate(unsigned int type, const char* domain, const zos::PageRequest& request,
              YLIBUSERINFOFUNC callback, void* context) {
    if (callback == nullptr || request.start < 0 || request.limit < -1) {
        SET_PLATFORM_ERROR(ZOS_ERR_BAD_PARAMETER);
        return kFailed;
    }
    return zos::OrOutOfMemory(kFailed, [&] {
        zos::Directory users;
        return zos::ReadUsers(type, domain, users)
                   ? zos::Enumerate<YLIBUSERINFO>(users, request, callback, context)
                   : kFailed;
    });
}

int ListAdministrators(unsigned int type, PYLIBCSZLIST* list) {
    zos::AdminGroup group;
    zos::Directory users;
    const bool found = zos::FindAdminGroup(group);
    if (!found && YLIBCErrGet() == ZOS_ERR_NO_SUCH_GROUP) {
        return 0;
    }
    if (!found || !zos::ReadUsers(type, nullptr, users)) {
        return kFailed;
    }
    std::sort(group.members.begin(), group.members.end());
    int count = 0;
    for (const zos::DirectoryEntry& user : users) {
        if (user.group != group.gid &&
            !std::binary_search(group.members.begin(), group.members.end(), user.name)) {
            continue;
        }
        if (YLIBCSzListPush(list, user.name.c_str()) != 0) {
            return kFailed;
        }
        ++count;
    }
    return count;
}

}  // namespace

int YLIBUserInfoEnum(unsigned int type, const char* domain, int start, int limit,
                     YLIBUSERINFOFUNC callback, void* context) {
    return Enumerate(type, domain, {nullptr, true, start, limit}, callback, context);
}

int YLIBUserInfoEnumByPrefix(unsigned int type, const char* prefix, const char* domain, int start,
                             int limit, YLIBUSERINFOFUNC callback, void* context) {
    return Enumerate(type, domain, {prefix, true, start, limit}, callback, context);
}

int YLIBUserInfoEnumBySubstr(unsigned int type, const char* substr, const char* domain, int start,
                             int limit, YLIBUSERINFOFUNC callback, void* context) {
    return Enumerate(type, domain, {substr, false, start, limit}, callback, context);
}

int YLIBUserAdminListGet(unsigned int type, PYLIBCSZLIST* list) {
    if (list == nullptr || *list == nullptr) {
        SET_PLATFORM_ERROR(ZOS_ERR_BAD_PARAMETER);
        return kFailed;
    }
    return zos::OrOutOfMemory(kFailed, [&] { return ListAdministrators(type, list); });
}

/** Whoever binds this machine, its users are asked of the name service, one call at a time. A yes
 * would make callers wait for a list that nobody fetches. */
int ZYROLDAPIsBinded(void) {
    return 0;
}
