// A name service of the test's own: built as libnss_ldap.so.2 and libnss_winbind.so.2, it knows the
// users and groups of /etc/SERVICE.passwd and /etc/SERVICE.group.
#include <grp.h>
#include <nss.h>
#include <pwd.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>

#define NAME_(service, call) _nss_##service##_##call
#define NAME(service, call) NAME_(service, call)
#define TEXT_(service) #service
#define TEXT(service) TEXT_(service)

namespace {

FILE* users = nullptr;
FILE* groups = nullptr;

nss_status Open(FILE*& file, const char* path) {
    if (file != nullptr) {
        fclose(file);
    }
    file = fopen(path, "re");
    return file == nullptr ? NSS_STATUS_UNAVAIL : NSS_STATUS_SUCCESS;
}

nss_status Close(FILE*& file) {
    if (file != nullptr) {
        fclose(file);
        file = nullptr;
    }
    return NSS_STATUS_SUCCESS;
}

nss_status Answer(int result, int* error) {
    *error = result;
    return result == 0        ? NSS_STATUS_SUCCESS
           : result == ERANGE ? NSS_STATUS_TRYAGAIN
                              : NSS_STATUS_NOTFOUND;
}

}  // namespace

extern "C" {

nss_status NAME(SERVICE, setpwent)(int) {
    return Open(users, "/etc/" TEXT(SERVICE) ".passwd");
}
nss_status NAME(SERVICE, endpwent)() {
    return Close(users);
}
nss_status NAME(SERVICE, getpwent_r)(passwd* entry, char* texts, size_t size, int* error) {
    passwd* found = nullptr;
    return users == nullptr && NAME(SERVICE, setpwent)(0) != NSS_STATUS_SUCCESS
               ? NSS_STATUS_UNAVAIL
               : Answer(fgetpwent_r(users, entry, texts, size, &found), error);
}

nss_status NAME(SERVICE, setgrent)(int) {
    return Open(groups, "/etc/" TEXT(SERVICE) ".group");
}
nss_status NAME(SERVICE, endgrent)() {
    return Close(groups);
}
nss_status NAME(SERVICE, getgrent_r)(group* entry, char* texts, size_t size, int* error) {
    group* found = nullptr;
    return groups == nullptr && NAME(SERVICE, setgrent)(0) != NSS_STATUS_SUCCESS
               ? NSS_STATUS_UNAVAIL
               : Answer(fgetgrent_r(groups, entry, texts, size, &found), error);
}

nss_status NAME(SERVICE, initgroups_dyn)(const char* user, gid_t, long* start, long* size,
                                         gid_t** gids, long, int*) {
    FILE* file = nullptr;
    if (Open(file, "/etc/" TEXT(SERVICE) ".group") != NSS_STATUS_SUCCESS) {
        return NSS_STATUS_UNAVAIL;
    }
    while (const group* entry = fgetgrent(file)) {
        for (char** member = entry->gr_mem; *member != nullptr; ++member) {
            if (strcmp(*member, user) != 0) {
                continue;
            }
            if (*start == *size) {
                *size *= 2;
                *gids = static_cast<gid_t*>(realloc(*gids, sizeof(gid_t) * *size));
            }
            (*gids)[(*start)++] = entry->gr_gid;
        }
    }
    return Close(file);
}

}  // extern "C"
