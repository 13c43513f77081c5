#include "core/user_mount.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <cerrno>
#include <string>

#include "core/fd_io.h"
#include "core/handle.h"

namespace ZYROVFS {
namespace {

/** The type in a mount's line of mountinfo: what follows " - ". */
bool IsFuse(const std::string& line) {
    constexpr const char* kFuse = " - fuse";
    const size_t at = line.find(" - ");
    return at != std::string::npos &&
           line.compare(at, std::char_traits<char>::length(kFuse), kFuse) == 0;
}

/** Unknown counts as fuse: where the list cannot be read, nothing says that it is none. */
bool IsFuseMount(uint64_t id) {
    const UniqueFd fd(open("/proc/self/mountinfo", O_RDONLY | O_CLOEXEC));
    std::string text;
    if (!fd || !ReadAll(fd.Get(), text)) {
        return true;
    }
    text.insert(0, "\n");
    const size_t at = text.find("\n" + std::to_string(id) + " ");
    return at == std::string::npos || IsFuse(text.substr(at + 1, text.find('\n', at + 1) - at - 1));
}

}  // namespace

bool IsUsersMount(int folder, const char* name) {
    const int saved = errno;
    const int flags = AT_SYMLINK_NOFOLLOW | AT_STATX_DONT_SYNC | AT_NO_AUTOMOUNT |
                      (*name == '\0' ? AT_EMPTY_PATH : 0);
    struct statx info {};
    const bool mounted = statx(folder, name, flags, STATX_TYPE | STATX_MNT_ID, &info) == 0 &&
                         (info.stx_attributes & STATX_ATTR_MOUNT_ROOT) != 0 &&
                         IsFuseMount(info.stx_mnt_id);
    errno = saved;
    return mounted;
}

}  // namespace ZYROVFS
