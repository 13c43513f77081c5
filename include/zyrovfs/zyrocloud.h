/**
 * The library as gvfs backends of the clouds use it: flat functions, for C11 and C++17.
 *
 * Conventions of this face:
 *
 * 1. Results. Unless told otherwise a function answers 1 for success or "yes" and 0 for failure or
 *    "no"; bytes are counted in `long long`. A line in the system log tells of each operation on a
 *    service that failed.
 * 2. `err`. An operation that failed at the service stores a value of GIOErrorEnum in `*err`. It is
 *    left alone by success, and by failures that no service was asked about: a wrong argument, no
 *    profile, no driver, an answer that makes no sense. So a caller stores what it wants to see
 *    then, such as G_IO_ERROR_FAILED, beforehand. `err` itself may be null.
 * 3. Null. Every argument may be null. What a function cannot do without is named in its
 *    description ("required"); without it the result is 0, null or -1, and nothing else happens.
 * 4. Texts are UTF-8 and end with a NUL; they are read before the function returns and never kept.
 *    Paths in the cache begin with a slash and have none at the end.
 * 5. Ownership. Records that are handed in stay the caller's: the library keeps copies. What it
 *    hands out stays its own unless told otherwise, above all the record of Entry_Get.
 * 6. Threads. A cache may be used by several threads, and from within a callback. A handle has
 *    one reader; another thread may refill its buffer. All other operations make a driver of their
 *    own for each call and may run side by side, but that the downloads of a process take place one
 *    after another.
 * 7. Identity. Connections are those of the effective user, or of `ZYROVFS_UID` for root.
 * 8. ZYROCloud_Cloud_InitCurlGlobal comes before the first thread of the process that uses this,
 *    ZYROCloud_Cloud_CleanupCurlGlobal after the last.
 */
#ifndef ZYROVFS_ZYROCLOUD_H
#define ZYROVFS_ZYROCLOUD_H

#include <gio/gio.h>
// C has no other names for these.
#include <stdbool.h>  // NOLINT(modernize-deprecated-headers)
#include <time.h>     // NOLINT(modernize-deprecated-headers)

#include "zyrovfs/export.h"

#ifdef __cplusplus
extern "C" {
#endif

/** Records by path, listings by directory, and marks of paths that are known to be missing. */
typedef struct ZYROCloud_Cache ZYROCloud_Cache;

/** One open file: its driver, where the next read begins, and a buffer. */
typedef struct ZYROCloud_Handle ZYROCloud_Handle;

/** When the root of a mount was last used. Its memory is the caller's. */
typedef struct ZYROCloud_RootAtime {
    time_t atime;
    GRecMutex mutex;
} ZYROCloud_RootAtime;

/**
 * Told of each item of a listing, in the service's order, on the thread that lists. `info` is a
 * copy of what the cache has, valid during the call; who keeps it takes a reference. The cache is
 * locked meanwhile: the callback may use it, and must not wait for another thread that does.
 */
typedef void (*ZYROCloud_ListCallback)(GFileInfo* info, void* user_data);

/* --- cache ---------------------------------------------------------------------------------------
 *
 * Functions take the cache, but Init, Destroy, Lock and Unlock its address. There is no limit on
 * the number of entries; a backend that wants one calls Entry_Clean.
 */

/**
 * Makes a cache whose paths are compared byte by byte, for the caller to destroy. How paths are
 * compared is one setting of the process, and the last call of either Init decides for all caches.
 * `cache` is required, though the setting has changed without it. 0 stores null.
 */
ZYROVFS_API int ZYROCloud_Cache_Init(ZYROCloud_Cache** cache);

/** The same with paths compared whatever their case. */
ZYROVFS_API int ZYROCloud_Cache_CassLess_Init(ZYROCloud_Cache** cache);

/** Frees the cache and its records; nobody may use it any more. The caller's pointer is not reset.
 */
ZYROVFS_API int ZYROCloud_Cache_Destroy(ZYROCloud_Cache** cache);

/**
 * Holds the cache for several steps of the calling thread; holds nest. The first Entry_Add of a
 * path that is not there ends one hold, after which other threads may come in between. An Unlock
 * too many is harmless.
 */
ZYROVFS_API int ZYROCloud_Cache_Lock(ZYROCloud_Cache** cache);
ZYROVFS_API int ZYROCloud_Cache_Unlock(ZYROCloud_Cache** cache);

/**
 * The record of a path, whatever its age. No reference is added: the record is good until anybody
 * removes the entry, so a backend with threads holds the cache until it has taken a reference.
 * All arguments are required. 0 when there is none, with `*out` as it was.
 */
ZYROVFS_API int ZYROCloud_Cache_Entry_Get(ZYROCloud_Cache* cache, const char* path,
                                          GFileInfo** out);

/** 1 for up to a second after the path was marked absent; after that the mark is removed. */
ZYROVFS_API int ZYROCloud_Cache_Entry_None_Get(ZYROCloud_Cache* cache, const char* path);

/** Sets "time::modified" of a path's record, in seconds. 0 for an unknown path or a zero time. */
ZYROVFS_API int ZYROCloud_Cache_Entry_SetMTime(ZYROCloud_Cache* cache, const char* path,
                                               long mtime);

/**
 * Stores a copy of `info` under `dir` and the record's name; a record that is already there is
 * overwritten in place. A mark of absence goes. All arguments are required, and so is a name.
 */
ZYROVFS_API int ZYROCloud_Cache_Entry_Add(ZYROCloud_Cache* cache, const char* dir, GFileInfo* info);

/**
 * Removes a path, its listing and all that its listing names, and marks it absent or takes such a
 * mark away. Its name stays in its parent's listing. 1 also for a path that was not there.
 */
ZYROVFS_API int ZYROCloud_Cache_Entry_Remove(ZYROCloud_Cache* cache, const char* path,
                                             bool mark_absent);

/** Empties the cache but for what was added or renewed in the last moments. */
ZYROVFS_API int ZYROCloud_Cache_Entry_Clean(ZYROCloud_Cache* cache);

/**
 * Names `info` in the listing of `dir`; with `ori`, its display name among those of the directory,
 * which may repeat. All pointers are required, and so are name and display name.
 */
ZYROVFS_API int ZYROCloud_Cache_List_Add(ZYROCloud_Cache* cache, const char* dir, bool ori,
                                         GFileInfo* info);

/** Removes the listing of `dir` and the entries below that it names. 1 also when there is none. */
ZYROVFS_API int ZYROCloud_Cache_List_Remove(ZYROCloud_Cache* cache, const char* dir);

/** Whether an item of that display name was added to the listing of `dir` with `ori`. */
ZYROVFS_API int ZYROCloud_Cache_List_Ori_Get(ZYROCloud_Cache* cache, const char* dir,
                                             const char* display_name);

/* --- open files ----------------------------------------------------------------------------------
 *
 * A backend downloads into the handle's buffer and fills its reads from there:
 *
 *     char* buffer = ZYROCloud_FileHandle_Buf_Get(handle);
 *     long long got = ZYROCloud_Cloud_Box_Download(handle, x, x, &buffer,
 *                                                  ZYROCloud_FileHandle_Buf_GetBufSize(handle),
 *                                                  &err);
 *     ZYROCloud_FileHandle_Buf_Reset(handle, got);
 *     ... ZYROCloud_FileHandle_Buf_Fill(handle, &dest, size) until it gives 0 ...
 */

/**
 * A handle on a file, for the caller to free. `path` is the item's path, or its id where the
 * service goes by ids; with one, a buffer of 16 MiB is made. `info` is copied. A connection that
 * cannot be used does not fail here; the Download functions do. Null when memory ran out.
 */
ZYROVFS_API ZYROCloud_Handle* ZYROCloud_Cloud_Handle_New(const char* server_id, const char* path,
                                                         GFileInfo* info);

/**
 * Frees a handle and, with a cache, removes its path from there, so that a closed file is looked up
 * afresh. No other thread may use the handle any more: a transfer into its buffer that still runs
 * is the caller's fault.
 */
ZYROVFS_API void ZYROCloud_Cloud_Handle_Free(ZYROCloud_Handle* handle, ZYROCloud_Cache* cache);

/** Makes the buffer if there is none, and sets it to empty and to its full size. */
ZYROVFS_API int ZYROCloud_FileHandle_Buf_Init(ZYROCloud_Handle* handle);

/** The buffer, which stays the handle's, or null. */
ZYROVFS_API char* ZYROCloud_FileHandle_Buf_Get(ZYROCloud_Handle* handle);

/**
 * Copies the next bytes of the buffer to `*dest`, which has room for `size`, and gives their
 * number: 0 at the end of what is filled. The position in the buffer then moves by `size`, also
 * when less was copied.
 */
ZYROVFS_API long long ZYROCloud_FileHandle_Buf_Fill(ZYROCloud_Handle* handle, char** dest,
                                                    long long size);

/** Tells that the buffer now holds `filled` bytes to be read from its beginning. */
ZYROVFS_API void ZYROCloud_FileHandle_Buf_Reset(ZYROCloud_Handle* handle, long long filled);

/**
 * How many bytes to download at once: 16 MiB at first, and for a null handle. Setting it changes
 * the number and not the memory, of which no more than 16 MiB is ever used.
 */
ZYROVFS_API long long ZYROCloud_FileHandle_Buf_GetBufSize(ZYROCloud_Handle* handle);
ZYROVFS_API void ZYROCloud_FileHandle_Buf_SetBufSize(ZYROCloud_Handle* handle, long long size);

/** Frees the buffer before its handle. */
ZYROVFS_API void ZYROCloud_FileHandle_Buf_Free(ZYROCloud_Handle* handle);

/* --- operations that all services have -----------------------------------------------------------
 *
 * Items are named as the service's driver names them. All pointers but `err` are required; nothing
 * is done with `p2`. `*err` is the driver's failure as a GIO error.
 */

/** Gives an item a new name in its folder. */
ZYROVFS_API int ZYROCloud_Cloud_Rename(const char* server_id, const void* p2, const char* from,
                                       const char* to, int* err);

/** Moves an item. G_IO_ERROR_WOULD_RECURSE when the service refuses it for its many files. */
ZYROVFS_API int ZYROCloud_Cloud_Move(const char* server_id, const void* p2, const char* from,
                                     const char* to, int* err);

/** Deletes an item. G_IO_ERROR_NOT_EMPTY when the service refuses it for its many files. */
ZYROVFS_API int ZYROCloud_Cloud_Delete(const char* server_id, const void* p2, const char* id,
                                       int* err);

/** Makes the folder `name` in the folder `parent`. */
ZYROVFS_API int ZYROCloud_Cloud_CreateFolder(const char* server_id, const void* p2,
                                             const char* parent, const char* name, int* err);

/** Whether the file tree leaves out the item `name` of `dir`. 0 for null. */
ZYROVFS_API int ZYROCloud_IsHiddenFolder(const char* dir, const char* name);

/** Sets libcurl up for the process. Repeated calls do nothing. */
ZYROVFS_API void ZYROCloud_Cloud_InitCurlGlobal(void);
/** Undoes it; no driver and no handle may be left. */
ZYROVFS_API void ZYROCloud_Cloud_CleanupCurlGlobal(void);

/* --- access time of a mount's root. Any thread, between Init and Destroy ---------------------- */

/** Makes the record ready and stamps it with now. */
ZYROVFS_API void InitRootAtime(ZYROCloud_RootAtime* rec);
/** Stamps it with now. */
ZYROVFS_API void UpdateRootAtime(ZYROCloud_RootAtime* rec);
/** The last stamp; 0 for null. */
ZYROVFS_API time_t GetRootAtime(ZYROCloud_RootAtime* rec);
/** Ends its use. The memory stays the caller's. */
ZYROVFS_API void DestroyRootAtime(ZYROCloud_RootAtime* rec);

/* --- what the services' functions have in common -------------------------------------------------
 *
 * List: asks the service for the folder at `path`, replaces the folder's listing and entries in
 * the cache by what came, and tells `callback` (may be null) of each item. A listing that fails
 * leaves the cache as it was. A path whose record in the cache is no directory gives
 * G_IO_ERROR_NOT_DIRECTORY; a path that is not in the cache is looked up at the service.
 * `folder_name` is the name to look for then, and may be null.
 *
 * CheckAccount: whether the service accepts the credentials in the JSON text `json`, laid over the
 * stored connection. For the service's account of a mount that is about to be made.
 *
 * Download: reads up to `size` bytes from where the last read of the handle ended into `*dest`, and
 * gives their number; 0 at the end of the file, -1 for a failure. Services are asked for one byte
 * more, and it may come: `*dest` has room for `size` + 1, and the result counts it. Into the
 * handle's own buffer never more is read than fits. `handle`, its record, `dest` with what it
 * points to, `p2` and `p3` are required; nothing is done with the latter two.
 */

/* --- Google Drive, shown as two folders "My Drive" and "Starred" ------------------------------ */

/**
 * What a path stands for, slashes at its beginning left out: 1 the root, 2 "My Drive", 3 "Starred",
 * 4 below "My Drive", 5 one level below "Starred", 6 deeper below "Starred", 0 anything else.
 */
ZYROVFS_API int ZYROCloud_Cloud_Google_Get_File_Type(const char* path);

/** Whether a path is one of the two folders, without a slash at its end. */
ZYROVFS_API int ZYROCloud_Cloud_Google_Is_First_Folder(const char* path);

/**
 * Lists a folder. `cache` and `path` are required. Documents get the extension of their kind; of
 * two items of one name the later gets its date of creation into its name. Names of more than 255
 * bytes and paths of more than 4095 are left out.
 */
ZYROVFS_API int ZYROCloud_Cloud_Google_List(const char* server_id, ZYROCloud_Cache* cache,
                                            const char* path, const char* folder_name,
                                            ZYROCloud_ListCallback callback, void* user_data,
                                            int* err);

/** 1 also for a connection that is not stored, since there is nothing to compare then. */
ZYROVFS_API int ZYROCloud_Cloud_Google_CheckAccount(const char* server_id, const char* json,
                                                    int* err);

/** Moves the item of id `to` out of the folder of id `from` into that of id `to_parent`. */
ZYROVFS_API int ZYROCloud_Cloud_Google_Move(const char* server_id, ZYROCloud_Cache* cache,
                                            const char* from, const char* to, const char* to_parent,
                                            int* err);

/** Takes the star off an item; the item stays. */
ZYROVFS_API int ZYROCloud_Cloud_Google_DeleteStarred(const char* server_id, ZYROCloud_Cache* cache,
                                                     const char* id, int* err);

/** Sets an item's date of modification, in seconds of the epoch. */
ZYROVFS_API int ZYROCloud_Cloud_Google_Chmod_MTime(const char* server_id, ZYROCloud_Cache* cache,
                                                   const char* id, long mtime, int* err);

/** Reads a file. A document without content of its own reads as a link to its page. */
ZYROVFS_API long long ZYROCloud_Cloud_Google_Download(ZYROCloud_Handle* handle, const void* p2,
                                                      const void* p3, char** dest, long long size,
                                                      int* err);

/* --- Box -------------------------------------------------------------------------------------- */

/**
 * Lists a folder. `server_id`, `cache` and `path` are required; without `account_id` nothing
 * appears in the listing. Folders at the top that others share have their owner in their name. Web
 * links are left out.
 */
ZYROVFS_API int ZYROCloud_Cloud_Box_List(const char* account_id, const char* server_id,
                                         ZYROCloud_Cache* cache, const char* path,
                                         const char* folder_name, ZYROCloud_ListCallback callback,
                                         void* user_data, int* err);

/** `*account_id` gets the account's id, for the caller to free(); it is left alone by failure. */
ZYROVFS_API int ZYROCloud_Cloud_Box_CheckAccount(const char* server_id, const char* json,
                                                 char** account_id, int* err);

/** Moves the item of id `from` into the folder of id `to`. A file in the way, at the server path
 * `to_path`, is overwritten; a folder there gives G_IO_ERROR_IS_DIRECTORY. */
ZYROVFS_API int ZYROCloud_Cloud_Box_Move(const char* server_id, ZYROCloud_Cache* cache,
                                         const char* from, const char* to, const char* to_path,
                                         int* err);

/** Reads a file. */
ZYROVFS_API long long ZYROCloud_Cloud_Box_Download(ZYROCloud_Handle* handle, const void* p2,
                                                   const void* p3, char** dest, long long size,
                                                   int* err);

/* --- Dropbox, where an item's path is its id -------------------------------------------------- */

/** Lists a folder. `cache` and `path` are required. Hidden names are left out. */
ZYROVFS_API int ZYROCloud_Cloud_Dropbox_List(const char* server_id, ZYROCloud_Cache* cache,
                                             const char* path, ZYROCloud_ListCallback callback,
                                             void* user_data, int* err);

/** Stores the record of the item at `path` in the cache, below `dir`. 1 also for a hidden item, of
 * which nothing is stored. */
ZYROVFS_API int ZYROCloud_Cloud_Dropbox_Get(const char* server_id, ZYROCloud_Cache* cache,
                                            const char* dir, const char* path, int* err);

/** 1 also for a connection that is not stored, since there is nothing to compare then. */
ZYROVFS_API int ZYROCloud_Cloud_Dropbox_CheckAccount(const char* server_id, const char* json,
                                                     int* err);

/** Reads a file. `prefix`, which is required, is put in front of its path to make the URL. */
ZYROVFS_API long long ZYROCloud_Cloud_Dropbox_Download(ZYROCloud_Handle* handle, const char* prefix,
                                                       const void* p3, char** dest, long long size,
                                                       int* err);

/* --- OneDrive --------------------------------------------------------------------------------- */

/** Stores the record of the account's root under "/" and tells `callback` of it. */
ZYROVFS_API int ZYROCloud_Cloud_OneDrive_GetRoot(const char* server_id, ZYROCloud_Cache* cache,
                                                 ZYROCloud_ListCallback callback, void* user_data,
                                                 int* err);

/** Lists a folder. `server_id`, `cache` and `path` are required. Notebooks are left out. */
ZYROVFS_API int ZYROCloud_Cloud_OneDrive_List(const char* server_id, ZYROCloud_Cache* cache,
                                              const char* path, const char* folder_name,
                                              ZYROCloud_ListCallback callback, void* user_data,
                                              int* err);

/** 1 also for a connection that is not stored, since there is nothing to compare then. */
ZYROVFS_API int ZYROCloud_Cloud_OneDrive_CheckAccount(const char* server_id, const char* json,
                                                      int* err);

/** As ZYROCloud_Cloud_Box_Move. */
ZYROVFS_API int ZYROCloud_Cloud_OneDrive_Move(const char* server_id, ZYROCloud_Cache* cache,
                                              const char* from, const char* to, const char* to_path,
                                              int* err);

/** Reads a file. */
ZYROVFS_API long long ZYROCloud_Cloud_OneDrive_Download(ZYROCloud_Handle* handle, const void* p2,
                                                        const void* p3, char** dest, long long size,
                                                        int* err);

#ifdef __cplusplus
}
#endif

#endif
