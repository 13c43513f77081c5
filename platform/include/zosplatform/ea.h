/** Extended attributes that the box keeps as files of its own. */
#ifndef ZOSPLATFORM_EA_H
#define ZOSPLATFORM_EA_H

#ifdef __cplusplus
extern "C" {
#endif

/**
 * 1 when a file of this name belongs to the box and not to a user, else 0 (null too). Beside a
 * user's files the box keeps folders named "@ZyroEA" with what it keeps about them; in them, and
 * where a file's streams travel as files, stand "NAME@ZyroResource" (a resource fork) and
 * "NAME@ZyroEAStream" (its other attributes). `name` is one component of a path; case counts.
 */
int ZYROEAIsHiddenFile(const char* name);

#ifdef __cplusplus
}
#endif

#endif
