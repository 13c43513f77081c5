/** State of a mount session, and what its callbacks in the forked child work on. */
#ifndef ZYROVFS_MOUNT_VFS_PRIVATE_H
#define ZYROVFS_MOUNT_VFS_PRIVATE_H

#include <gio/gio.h>
#include <json/value.h>

#include <string>

#include "core/source_line.h"
#include "zyrovfs/vfs.h"

namespace ZYROVFS {

struct VFSPrivate {
    explicit VFSPrivate(VFS* session) : owner(session) {}

    VFS* owner;
    std::string user;
    std::string password;
    std::string uri;
    std::string path;  ///< inside the location, without a leading slash, in the code page
    std::string code_page;
    std::string full_path;  ///< local path of a location that is mounted
    Json::Value data;
    bool force = false;
};

/** User data of the callbacks of one mount or unmount. Owns the file and the loop. */
struct VFSMountOperaion {
    VFSMountOperaion() = default;
    VFSMountOperaion(const VFSMountOperaion&) = delete;
    VFSMountOperaion& operator=(const VFSMountOperaion&) = delete;
    ~VFSMountOperaion();

    GFile* file = nullptr;
    VFS* session = nullptr;
    GMainLoop* loop = nullptr;
    unsigned int asked = 0;        ///< questions for credentials of the server
    unsigned int proxy_asked = 0;  ///< questions for credentials of the proxy
    bool finished = false;         ///< nothing sets it
};

/**
 * What the remote side told of its identity, "host<TAB>fingerprint". Process-wide: the callbacks of
 * a mount child fill it, and the child's report carries it to the parent.
 */
std::string& IdentityText();

/**
 * Keeps the text behind the first ':' of an "identity" message as identity text and sets
 * VFS_ERR_IDENTITY_QUESTION; a message without one is logged and sets VFS_ERR_UNKNOWN.
 */
void KeepIdentity(const char* message, SourceLine at = SourceLine::Here());

}  // namespace ZYROVFS

#endif
