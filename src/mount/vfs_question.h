/**
 * Answers to what GIO and the backends ask during a mount or unmount: handlers of the signals of a
 * GMountOperation. They run in the forked child. Backends also use the password question as a
 * channel of their own, with a keyword as message and the answer in the fields of the reply.
 */
#ifndef ZYROVFS_MOUNT_VFS_QUESTION_H
#define ZYROVFS_MOUNT_VFS_QUESTION_H

#include <gio/gio.h>

namespace ZYROVFS {

/**
 * Handler of "ask-password". `data` is a VFSMountOperaion. Replies handled or aborted; an abort
 * leaves VFS_ERR_BAD_PARAM, VFS_ERR_PROXY_AUTH, VFS_ERR_WRONG_USERNAME or VFS_ERR_WRONG_PASSWORD.
 * A "mount_path" report without a path ends the process.
 */
void AskPassword(GMountOperation* operation, const char* message, const char* default_user,
                 const char* default_domain, GAskPasswordFlags flags, gpointer data) noexcept;

/**
 * Handler of "ask-question". `data` is a VFSMountOperaion. An abort leaves
 * VFS_ERR_IDENTITY_QUESTION, with the identity text kept, or VFS_ERR_UNKNOWN.
 */
void AskQuestion(GMountOperation* operation, const char* message, const char* const* choices,
                 gpointer data) noexcept;

}  // namespace ZYROVFS

#endif
