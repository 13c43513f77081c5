#include "mount/vfs_private.h"

#include <cstring>

#include "core/error_cell.h"
#include "core/log.h"

namespace ZYROVFS {

VFSMountOperaion::~VFSMountOperaion() {
    g_clear_object(&file);
    g_clear_pointer(&loop, g_main_loop_unref);
}

std::string& IdentityText() {
    static std::string text;
    return text;
}

void KeepIdentity(const char* message, SourceLine at) {
    const char* colon = strchr(message, ':');
    if (colon == nullptr) {
        LOG_ERROR_AT(at, "no identity information, %s", message);
        SetErr(VFS_ERR_UNKNOWN, at);
        return;
    }
    IdentityText() = colon + 1;
    SetErr(VFS_ERR_IDENTITY_QUESTION, at);
}

}  // namespace ZYROVFS
