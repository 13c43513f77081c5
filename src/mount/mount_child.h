/**
 * What a mount and an unmount do in the helper, which becomes the user and runs GIO's main loop
 * there, and how a session gets to it.
 */
#ifndef ZYROVFS_MOUNT_MOUNT_CHILD_H
#define ZYROVFS_MOUNT_MOUNT_CHILD_H

#include <sys/types.h>

#include <memory>
#include <string>

#include "core/source_line.h"
#include "mount/glib_handle.h"
#include "mount/vfs_private.h"
#include "zyrovfs/error.h"

namespace ZYROVFS {

/** The session as a request of the helper, which has the password in it. */
Json::Value DescribeSession(const VFS& session);

/** The session of a request, its path byte by byte as it was. */
void RestoreSession(const Json::Value& request, VFS& session);

/**
 * What the callbacks will work on, in the locale of the environment; null, with the failure logged
 * in the name of `at` and a code set, when memory is short.
 */
std::unique_ptr<VFSMountOperaion> NewMountOperaion(VFS& session,
                                                   SourceLine at = SourceLine::Here());

/** The session's URI and path as a URI that reads as it is meant. */
std::string ReadableFullUri(const VFS& session);

/**
 * The location of `uri` with `user` (and `path`, unless empty) put in, as GIO takes it. Null after
 * setting `bad_uri` for a URI that cannot be parsed, or VFS_ERR_INVALID_SERVER.
 */
GFile* NewLocation(const std::string& uri, const std::string& user, const std::string& path,
                   __tag_vfs_err_ bad_uri, SourceLine at = SourceLine::Here());

/**
 * Readies `mount` for an asynchronous call on `file`, of which it becomes the owner: gives it a
 * loop and hands out the operation that asks the session for passwords.
 */
UniqueObject<GMountOperation> NewOperation(VFSMountOperaion& mount, GFile* file);

/** A step that failed without a word must not end as success. */
void FailIfNoneSet(SourceLine at = SourceLine::Here());

}  // namespace ZYROVFS

#endif
