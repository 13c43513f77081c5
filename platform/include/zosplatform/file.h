/** Files and folders, and locks on files with a limit on the wait. Failures set the platform error.
 */
#ifndef ZOSPLATFORM_FILE_H
#define ZOSPLATFORM_FILE_H

#include <sys/types.h>

#include "zosplatform/text.h"

#ifdef __cplusplus
extern "C" {
#endif

/** 1 when `path` is a folder, 0 otherwise. */
int YLIBCFileCheckDir(const char* path);

/** 1 when something stands at `path`, links followed; 0 otherwise. */
int YLIBCFileExist(const char* path);

/** For YLIBCFileEnumDir: only names that end with the suffix. */
#define YLIBC_ENUM_SUFFIX 0x80

/**
 * Appends the names in `dir` to `list`, sorted by byte, without "." and "..". `flags` 0 takes all
 * names, YLIBC_ENUM_SUFFIX those ending in `suffix`. Number of names appended, -1 on failure.
 */
int YLIBCFileEnumDir(const char* dir, unsigned int flags, const char* suffix, PYLIBCSZLIST* list);

/**
 * Reads "key=value" lines of the section "[section]" into `hash`, emptied first; blanks around keys
 * and values, comments (#, ;) and what stands outside the section are dropped. Number of keys (0
 * also for a file without the section), -1 when the file cannot be read.
 */
int YLIBCFileGetSection(const char* path, const char* section, PYLIBCSZHASH* hash);

/** Makes `path` if it is missing and sets its times to now. 0, or -1. */
int YLIBCFileTouch(const char* path);

/**
 * Locks the file (made if missing), exclusive or shared, waiting at most `seconds`. Non-zero on
 * success with the open file in `*fd`; 0 on failure (platform error 0x400 when the time ran out).
 */
int YLIBCFileLockTimeByFile(const char* path, int exclusive, int seconds, int* fd);

/** Unlocks and closes. Non-zero on success. */
int YLIBCFileUnlockByFile(int fd);

/** Pid in the first line of a file, when a process of that pid lives; else 0. */
int YLIBCReadPidFile(const char* path);

/** Writes all of a buffer. Bytes written, fewer only when errno tells why; -1 if none were. */
ssize_t ZYROWriteFileFd(int fd, const void* data, size_t size);

#ifdef __cplusplus
}
#endif

#endif
