/**
 * Failure codes and the process-wide error cell.
 *
 * An operation of this library that fails answers false, a null pointer or -1 and leaves the cause
 * in the cell. Success leaves the cell as it was: read it only after a call has failed. The cell,
 * like the process environment and the effective identity that the library works with, belongs to
 * the process and is not guarded: one worker at a time may use the profile and mount operations.
 */
#ifndef ZYROVFS_ERROR_H
#define ZYROVFS_ERROR_H

#include <json/value.h>

#include "zyrovfs/export.h"

namespace ZYROVFS {

/**
 * One code per failure. 1 to 24 and 57 belong to profiles and mounts, 25 to 56 to the clouds.
 * The numbers travel as exit statuses and to callers, so they never change; the reserved ones
 * are no longer set by anything and keep the others in place.
 */
enum __tag_vfs_err_ : int {
    VFS_ERR_NONE = 0,
    VFS_ERR_UNKNOWN = 1,
    VFS_ERR_BAD_PARAM = 2,
    VFS_ERR_FAILED = 3,
    VFS_ERR_NO_PERMISSION = 4,
    VFS_ERR_INVALID_SERVER = 5,
    VFS_ERR_HOST_UNREACHABLE = 6,
    VFS_ERR_ACCESS_DENIED = 7,
    VFS_ERR_WRONG_USERNAME = 8,
    VFS_ERR_WRONG_PASSWORD = 9,
    VFS_ERR_RESERVED_10 = 10,
    VFS_ERR_DBUS_ADDRESS = 11,
    VFS_ERR_RESERVED_12 = 12,
    VFS_ERR_CONNECT_EXISTS = 13,
    VFS_ERR_SERVER_EXISTS = 14,
    VFS_ERR_CONFIG_READ = 15,
    VFS_ERR_CONFIG_WRITE = 16,
    VFS_ERR_CONFIG_NOT_FOUND = 17,
    VFS_ERR_OUT_OF_MEMORY = 18,
    VFS_ERR_BUSY = 19,
    VFS_ERR_IDENTITY_QUESTION = 20,
    VFS_ERR_IDENTITY_WRONG = 21,
    VFS_ERR_CONFIG_FULL = 22,
    VFS_ERR_PROXY_AUTH = 23,
    VFS_ERR_CERT_UNTRUSTED = 24,
    VFS_ERR_UNAUTHORIZED = 25,
    VFS_ERR_CLOUD_FAILED = 26,
    VFS_ERR_TOKEN_REVOKED = 27,
    VFS_ERR_FORBIDDEN = 28,
    VFS_ERR_CONNECT_FAILED = 29,
    VFS_ERR_TIMEOUT = 30,
    VFS_ERR_TRANSFER_ABORTED = 31,
    VFS_ERR_RESERVED_32 = 32,
    VFS_ERR_CANCELLED = 33,
    VFS_ERR_QUOTA_EXCEEDED = 34,
    VFS_ERR_FILE_TOO_LARGE = 35,
    VFS_ERR_IS_DIRECTORY = 36,
    VFS_ERR_NAME_TOO_LONG = 37,
    VFS_ERR_INVALID_NAME = 38,
    VFS_ERR_RECEIVE_FAILED = 39,
    VFS_ERR_SERVICE_UNAVAILABLE = 40,
    VFS_ERR_RESERVED_41 = 41,
    VFS_ERR_PROFILE_UPDATE = 42,
    VFS_ERR_RATE_LIMITED = 43,
    VFS_ERR_SERVER_ERROR = 44,
    VFS_ERR_TOO_MANY_FILES = 45,
    VFS_ERR_RANGE_FAILED = 46,
    VFS_ERR_CONFLICT = 47,
    VFS_ERR_PERMISSION_DENIED = 48,
    VFS_ERR_NOT_FOUND = 49,
    VFS_ERR_REQUEST_TIMEOUT = 50,
    VFS_ERR_NO_SPACE = 51,
    VFS_ERR_REMOTE_FAILED = 52,
    VFS_ERR_BAD_REQUEST = 53,
    VFS_ERR_NOT_SUPPORTED = 54,
    VFS_ERR_FILE_EXISTS = 55,
    VFS_ERR_COMMAND_REFUSED = 56,
    VFS_ERR_MOUNT_PENDING = 57,
};

/**
 * Overwrites the cell. `file` must outlive the process's use of the cell, as a literal does: the
 * pointer is kept, the text is not copied.
 */
ZYROVFS_API void VFSSetErrEx(__tag_vfs_err_ code, const char* file, int line);

/** Sets the cell to no error. The detail stays. */
ZYROVFS_API void ResetError();

/** Code of the last failure. */
ZYROVFS_API __tag_vfs_err_ GetError();

/** Source unit that set the cell, null when nothing has. */
ZYROVFS_API const char* GetErrorFile();

/** Line that set the cell. */
ZYROVFS_API int GetErrorLine();

/**
 * The error detail stands beside the cell and is independent of it. It holds what a user has to
 * decide about: "host" and "fingerprint" of an unknown host key with VFS_ERR_IDENTITY_QUESTION,
 * "subject", "issuer", "availDate" and "expDate" of a certificate with VFS_ERR_CERT_UNTRUSTED.
 */
ZYROVFS_API void VFSSetJson(Json::Value detail);
ZYROVFS_API void VFSGetJson(Json::Value& detail);

/** Name of a code, such as "VFS_ERR_BUSY"; "VFS_ERR_UNKNOWN" for a number that is no code. */
ZYROVFS_API const char* GetErrorName(__tag_vfs_err_ code);

/** What a code means, in one English sentence for people. Never null. */
ZYROVFS_API const char* GetErrorMeaning(__tag_vfs_err_ code);

}  // namespace ZYROVFS

#endif
