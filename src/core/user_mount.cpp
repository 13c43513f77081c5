#include "core/user_mount.h"

#include <fcntl.h>
#include <sys/mount.h>
#include <sys/stat.h>

#include <cerrno>
#include <sstream>
#include <string>

#include "core/fd_io.h"
#include "core/handle.h"

namespace ZYROVFS {
namespace {

/** One line for each mount; false where the list cannot be read. */
bool ReadMounts(std::string& text) {
    const UniqueFd fd(open("/proc/self/mountinfo", O_RDONLY | O_CLOEXEC));
    return fd && ReadAll(fd.Get(), text);
}

/** The type in a mount's line of mountinfo: what follows " - ". */
bool IsFuse(const std::string& line) {
    constexpr const char* kFuse = " - fuse";
    const size_t at = line.find(" - ");
    return at != std::string::npos &&
           line.compare(at, std::char_traits<char>::length(kFuse), kFuse) == 0;
}

/** Unknown counts as fuse: where the list cannot be read, nothing says that it is none. */
bool IsFuseMount(uint64_t id) {
    std::string text;
    if (!ReadMounts(text)) {
        return true;
    }
    text.insert(0, "\n");
    const size_t at = text.find("\n" + std::to_string(id) + " ");
    return at == std::string::npos || IsFuse(text.substr(at + 1, text.find('\n', at + 1) - at - 1));
}

/** Whether a mount's line is of one at `folder` or below: its fifth word is the mount point. */
bool IsBelow(const std::string& line, const std::string& folder) {
    std::istringstream words(line);
    std::string point;
    for (int i = 0; i < 5; ++i) {
        words >> point;
    }
    return point == folder || point.compare(0, folder.size() + 1, folder + "/") == 0;
}

}  // namespace

MountsBelow FindMountsBelow(const std::string& folder) {
    std::string text;
    if (!ReadMounts(text)) {
        return MountsBelow::kOfTheSystem;
    }
    MountsBelow found = MountsBelow::kNone;
    std::istringstream lines(text);
    for (std::string line; std::getline(lines, line);) {
        if (IsBelow(line, folder)) {
            if (!IsFuse(line)) {
                return MountsBelow::kOfTheSystem;
            }
            found = MountsBelow::kOfUsers;
        }
    }
    return found;
}

bool DetachUsersMount(int folder, const char* name) {
    if (!IsUsersMount(folder, name)) {
        return true;
    }
    // By the open folder: no link above the mount point leads root to another file system.
    const std::string point = "/proc/self/fd/" + std::to_string(folder) + "/" + name;
    return umount2(point.c_str(), MNT_DETACH | UMOUNT_NOFOLLOW) == 0;
}

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
