/** The system's user directory. */
#ifndef ZOSPLATFORM_USER_H
#define ZOSPLATFORM_USER_H

#include <sys/types.h>

#ifdef __cplusplus
extern "C" {
#endif

typedef struct _tag_ZYROUSER_ {
    char* name;
    uid_t uid;
    gid_t gid;
    char* home;
} ZYROUSER, *PZYROUSER;

/** 0 with a record to be released with ZYROUserFree, or -1 (platform error 0x1d00: no such user).
 */
int ZYROUserGet(const char* name, PZYROUSER* user);
int ZYROUserGetByUID(uid_t uid, PZYROUSER* user);
void ZYROUserFree(PZYROUSER user);

#ifdef __cplusplus
}
#endif

#endif
