#include "core/file_memo.h"

#include <sys/stat.h>

namespace ZYROVFS {
namespace {

bool AreEqual(const timespec& a, const timespec& b) {
    return a.tv_sec == b.tv_sec && a.tv_nsec == b.tv_nsec;
}

}  // namespace

bool FileIdentity::operator==(const FileIdentity& other) const {
    return device == other.device && inode == other.inode && size == other.size &&
           AreEqual(modified, other.modified) && AreEqual(changed, other.changed);
}

/** Times of files are those of a clock that stands still for some milliseconds, and the number of a
 * file that has gone may be given to the next one. */
bool FileIdentity::IsSettled() const {
    timespec now{};
    return clock_gettime(CLOCK_REALTIME_COARSE, &now) == 0 &&
           std::tie(now.tv_sec, now.tv_nsec) > std::tie(changed.tv_sec, changed.tv_nsec);
}

bool Identify(const std::string& path, FileIdentity& identity) {
    struct stat info {};
    if (stat(path.c_str(), &info) != 0) {
        return false;
    }
    identity = {info.st_dev, info.st_ino, info.st_size, info.st_mtim, info.st_ctim};
    return true;
}

}  // namespace ZYROVFS
