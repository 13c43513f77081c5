/** The system's groups. Administrators are the members of group "administrators", or of "sudo"
 * on a machine that has no such group; the primary group counts as membership. */
#ifndef ZOSPLATFORM_GROUP_H
#define ZOSPLATFORM_GROUP_H

#include <sys/types.h>

#include "zosplatform/text.h"

#ifdef __cplusplus
extern "C" {
#endif

/** An entry of an enumeration. A record without an id has (gid_t)-1: ask for it by name. */
typedef struct _tag_YLIBGROUPINFO_ {
    const char* name;
    gid_t gid;
} YLIBGROUPINFO;

typedef int (*YLIBGROUPINFOFUNC)(const YLIBGROUPINFO* entry, void* context);

/** As the enumerations of users in user.h. */
int YLIBGroupInfoEnumByPrefix(unsigned int type, const char* prefix, const char* domain, int start,
                              int limit, YLIBGROUPINFOFUNC callback, void* context);
int YLIBGroupInfoEnumBySubstr(unsigned int type, const char* substr, const char* domain, int start,
                              int limit, YLIBGROUPINFOFUNC callback, void* context);

/**
 * The groups that a user belongs to, each as decimal text of its gid, the primary group first; to
 * be released with YLIBCSzListFree. `flags` is 0. Null on failure.
 */
PYLIBCSZLIST YLIBGroupInfoListGet(const char* user, int flags);

/** 1 for an administrator, 0 for somebody else and for a uid that nobody has. -1 when it cannot be
 * told, since a directory service does not answer: then nobody may be taken for either. `flags` is
 * 1. */
int YLIBGroupIsAdminGroupMemByUid(uid_t uid, int flags);

/** 0 with the gid, or -1 (platform error 0x1e00: no such group). */
int ZYROGroupGetGID(const char* name, gid_t* gid);

/** 1 for the name of the administrators' group, in any case of letters; else 0. */
int ZYROGroupIsAdminGroup(const char* name);

#ifdef __cplusplus
}
#endif

#endif
