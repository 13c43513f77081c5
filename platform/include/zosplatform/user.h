/** The system's user directory. */
#ifndef ZOSPLATFORM_USER_H
#define ZOSPLATFORM_USER_H

#include <sys/types.h>

#include "zosplatform/text.h"

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

/** Where users and groups come from: one of these bits, or several. */
enum {
    ZOS_AUTH_LOCAL = 1,   ///< this machine's own
    ZOS_AUTH_DOMAIN = 2,  ///< a Windows domain's, called DOMAIN\name
    ZOS_AUTH_LDAP = 8,    ///< a directory server's
};

/** An entry of an enumeration. A record without an id has (uid_t)-1: ask for it by name. */
typedef struct _tag_YLIBUSERINFO_ {
    const char* name;
    uid_t uid;
} YLIBUSERINFO;

/** Called for each entry of the page in order; a negative answer ends the enumeration, which then
 * fails. The entry is valid during the call. */
typedef int (*YLIBUSERINFOFUNC)(const YLIBUSERINFO* entry, void* context);

/**
 * The users of the kinds `type`, by name without regard to case: of all that match, those from
 * `start` on, at most `limit` (-1: all). `domain`, when not empty, keeps of a domain's users those
 * of that domain. The filter forms take names that begin with or contain a text, without regard to
 * case, in UTF-8; an empty text takes all. Kinds that this machine is not bound to have no entries.
 *
 * Number of matching users whatever the page, or negative.
 */
int YLIBUserInfoEnum(unsigned int type, const char* domain, int start, int limit,
                     YLIBUSERINFOFUNC callback, void* context);
int YLIBUserInfoEnumByPrefix(unsigned int type, const char* prefix, const char* domain, int start,
                             int limit, YLIBUSERINFOFUNC callback, void* context);
int YLIBUserInfoEnumBySubstr(unsigned int type, const char* substr, const char* domain, int start,
                             int limit, YLIBUSERINFOFUNC callback, void* context);

/** Appends the names of the administrators among the users of the kinds `type`. Number of names,
 * -1 on failure. */
int YLIBUserAdminListGet(unsigned int type, PYLIBCSZLIST* list);

/**
 * 1 when this machine is bound to a directory server whose users and groups it fetches into lists
 * of its own, for which callers wait, else 0. Where they come from the name service, as on plain
 * Linux, there is nothing to wait for, and the answer is 0.
 */
int ZYROLDAPIsBinded(void);

#ifdef __cplusplus
}
#endif

#endif
