#include "zosplatform/user.h"

#include <pwd.h>

#include <cstdlib>
#include <cstring>
#include <vector>

#include "name_service.h"
#include "support.h"

namespace {

constexpr int kFailed = -1;

PZYROUSER Copy(const passwd& entry) {
    auto* user = static_cast<PZYROUSER>(calloc(1, sizeof(ZYROUSER)));
    if (user == nullptr) {
        return nullptr;
    }
    user->name = strdup(entry.pw_name);
    user->home = strdup(entry.pw_dir);
    user->uid = entry.pw_uid;
    user->gid = entry.pw_gid;
    if (user->name == nullptr || user->home == nullptr) {
        ZYROUserFree(user);
        return nullptr;
    }
    return user;
}

/** `call` is getpwnam_r or getpwuid_r with the key bound. */
template <typename Call>
int Get(Call call, PZYROUSER* user) {
    *user = nullptr;
    passwd entry{};
    std::vector<char> texts;
    switch (zos::LookUp(call, entry, texts)) {
        case zos::Lookup::kUnknown:
            SET_PLATFORM_ERROR(ZOS_ERR_NO_SUCH_USER);
            return kFailed;
        case zos::Lookup::kFailed:
            SET_SYSTEM_ERROR(ZOS_ERR_SYSTEM);
            return kFailed;
        case zos::Lookup::kFound:
            break;
    }
    *user = Copy(entry);
    if (*user == nullptr) {
        SET_PLATFORM_ERROR(ZOS_ERR_OUT_OF_MEMORY);
        return kFailed;
    }
    return 0;
}

}  // namespace

int ZYROUserGet(const char* name, PZYROUSER* user) {
    if (name == nullptr || user == nullptr) {
        SET_PLATFORM_ERROR(ZOS_ERR_BAD_PARAMETER);
        return kFailed;
    }
    return zos::OrOutOfMemory(kFailed, [&] {
        return Get([name](passwd* entry, char* texts, size_t size,
                          passwd** found) { return getpwnam_r(name, entry, texts, size, found); },
                   user);
    });
}

int ZYROUserGetByUID(uid_t uid, PZYROUSER* user) {
    if (user == nullptr) {
        SET_PLATFORM_ERROR(ZOS_ERR_BAD_PARAMETER);
        return kFailed;
    }
    return zos::OrOutOfMemory(kFailed, [&] {
        return Get([uid](passwd* entry, char* texts, size_t size,
                         passwd** found) { return getpwuid_r(uid, entry, texts, size, found); },
                   user);
    });
}

void ZYROUserFree(PZYROUSER user) {
    if (user != nullptr) {
        free(user->name);
        free(user->home);
        free(user);
    }
}
