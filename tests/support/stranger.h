/** A second user of the machine, who means harm to the first and to root. */
#ifndef ZYROVFS_TESTS_STRANGER_H
#define ZYROVFS_TESTS_STRANGER_H

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <filesystem>
#include <functional>
#include <string>

#include "support/scratch.h"

namespace stranger {

namespace fs = std::filesystem;

inline constexpr uid_t kAmy = 5001;      ///< for whom the library works
inline constexpr uid_t kMallory = 5002;  ///< who is at the place first

/** Does something as a user who logged in; false when it failed. */
inline bool As(uid_t uid, const std::function<bool()>& body) {
    return scratch::InChild([&] {
               umask(022);
               return scratch::BecomeUser(uid) && body() ? 0 : 1;
           }) == 0;
}

inline bool Link(const std::string& target, const std::string& path) {
    return As(kMallory, [&] { return symlink(target.c_str(), path.c_str()) == 0; });
}
inline bool Folder(const std::string& path) {
    return As(kMallory, [&] { return mkdir(path.c_str(), 0777) == 0; });
}
inline bool Fifo(const std::string& path) {
    return As(kMallory, [&] { return mkfifo(path.c_str(), 0666) == 0; });
}
inline bool File(const std::string& path, const std::string& text) {
    return As(kMallory, [&] {
        const int fd = open(path.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, 0666);
        return fd >= 0 && write(fd, text.data(), text.size()) == ssize_t(text.size());
    });
}
/** Of this apparent size, and of no block. */
inline bool Sparse(const std::string& path, off_t size) {
    return File(path, "") && As(kMallory, [&] { return truncate(path.c_str(), size) == 0; });
}

inline uid_t OwnerOf(const std::string& path) {
    struct stat info {};
    return lstat(path.c_str(), &info) == 0 ? info.st_uid : static_cast<uid_t>(-1);
}
inline mode_t ModeOf(const std::string& path) {
    struct stat info {};
    return lstat(path.c_str(), &info) == 0 ? info.st_mode & 07777 : 0;
}
inline bool IsRealFolder(const std::string& path) {
    return fs::symlink_status(path).type() == fs::file_type::directory;
}

/** Folders open to all, as an older version made them: nothing keeps a user from renaming there. */
inline void MakeOpenToAll(const std::string& path) {
    const mode_t saved = umask(0);
    fs::create_directories(path);
    umask(saved);
}

/** What root would be led to. */
inline const std::string kVictim = "/etc/victim";

inline void MakeVictim() {
    fs::remove_all(kVictim);
    fs::create_directories(kVictim);
}
inline bool IsVictimUntouched() {
    return fs::is_empty(kVictim) && OwnerOf(kVictim) == 0 && ModeOf(kVictim) == 0755;
}

/** Ends the test when something is waited for that a stranger decides about. */
class Patience {
  public:
    Patience() { alarm(30); }
    Patience(const Patience&) = delete;
    Patience& operator=(const Patience&) = delete;
    ~Patience() { alarm(0); }
};

}  // namespace stranger

#endif
