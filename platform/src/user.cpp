#include "zosplatform/user.h"

#include <pwd.h>

#include <cstdlib>
#include <cstring>
#include <vector>

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

/** `look_up` is getpwnam_r or getpwuid_r with the key bound. */
template <typename LookUp>
int Get(LookUp look_up, PZYROUSER* user) {
    *user = nullptr;
    passwd entry{};
    passwd* found = nullptr;
    std::vector<char> texts(1024);
    int error = 0;
    while ((error = look_up(&entry, texts, &found)) == ERANGE) {
        texts.resize(texts.size() * 2);
    }
    if (found == nullptr) {
        // The directory services of a host report an unknown name in several ways.
        const bool unknown = error == 0 || error == ENOENT || error == ESRCH || error == EPERM;
        SET_PLATFORM_ERROR(
            zos::CodeOfErrno(unknown ? 0 : error, unknown ? ZOS_ERR_NO_SUCH_USER : ZOS_ERR_SYSTEM));
        return kFailed;
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
        return Get(
            [name](passwd* entry, std::vector<char>& texts, passwd** found) {
                return getpwnam_r(name, entry, texts.data(), texts.size(), found);
            },
            user);
    });
}

int ZYROUserGetByUID(uid_t uid, PZYROUSER* user) {
    if (user == nullptr) {
        SET_PLATFORM_ERROR(ZOS_ERR_BAD_PARAMETER);
        return kFailed;
    }
    return zos::OrOutOfMemory(kFailed, [&] {
        return Get(
            [uid](passwd* entry, std::vector<char>& texts, passwd** found) {
                return getpwuid_r(uid, entry, texts.data(), texts.size(), found);
            },
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
