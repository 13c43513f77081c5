#include "machine_key.h"

#include <fcntl.h>
#include <openssl/crypto.h>
#include <openssl/rand.h>
#include <sys/stat.h>

#include <cstdlib>
#include <string_view>

#include "support.h"

namespace zos {
namespace {

constexpr std::string_view kKeyDir = "/usr/zyro/etc/private";
constexpr const char* kKeyName = "zyrovfs.key";
/** Backends read the key as the user they work for, and every user has this group. */
constexpr gid_t kUsersGroup = 100;
constexpr mode_t kKeyMode = 0640;
constexpr mode_t kKeyDirMode = 0750;
constexpr mode_t kParentMode = 0755;

/**
 * Root for the moment of a step. The web layer has the user's identity and root's saved, and its
 * first credential may be the machine's first. A process without root's identity stays as it is.
 */
class AsRoot {
  public:
    AsRoot() : saved_(geteuid()) {
        uid_t real = saved_, effective = saved_, kept = saved_;
        getresuid(&real, &effective, &kept);
        switched_ = saved_ != 0 && (real == 0 || kept == 0) && seteuid(0) == 0;
    }
    AsRoot(const AsRoot&) = delete;
    AsRoot& operator=(const AsRoot&) = delete;
    ~AsRoot() {
        const int saved_errno = errno;
        if (switched_ && seteuid(saved_) != 0) {
            abort();  // a request of a user must not go on as root
        }
        errno = saved_errno;
    }

    bool IsRoot() const { return geteuid() == 0; }

  private:
    uid_t saved_;
    bool switched_ = false;
};

bool IsRootsAlone(const struct stat& info, mode_t forbidden) {
    if (info.st_uid == 0 && (info.st_mode & forbidden) == 0) {
        return true;
    }
    errno = EPERM;
    return false;
}

/** The mode is set behind the umask's back: under 077 no backend could reach the key. */
bool MakeDir(const std::string& path, mode_t mode, gid_t group) {
    if (mkdir(path.c_str(), 0700) != 0) {
        return errno == EEXIST;
    }
    return chown(path.c_str(), 0, group) == 0 && chmod(path.c_str(), mode) == 0;
}

bool MakeKeyDir() {
    for (size_t slash = kKeyDir.find('/', 1); slash != std::string_view::npos;
         slash = kKeyDir.find('/', slash + 1)) {
        if (!MakeDir(std::string(kKeyDir.substr(0, slash)), kParentMode, 0)) {
            return false;
        }
    }
    return MakeDir(std::string(kKeyDir), kKeyDirMode, kUsersGroup);
}

Fd OpenKeyDir() {
    Fd dir(open(kKeyDir.data(), O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC));
    struct stat info {};
    if (!dir || fstat(dir.Get(), &info) != 0 || !IsRootsAlone(info, S_IWGRP | S_IWOTH)) {
        return Fd();
    }
    return dir;
}

}  // namespace

MachineKey::~MachineKey() {
    OPENSSL_cleanse(bytes_.data(), bytes_.size());
}

bool MachineKey::Read(int dir) {
    const Fd fd = OpenRegular(dir, kKeyName, O_NOFOLLOW);
    struct stat info {};
    if (!fd || fstat(fd.Get(), &info) != 0 || !IsRootsAlone(info, S_IWGRP | S_IRWXO)) {
        return false;
    }
    if (info.st_size == kSize && read(fd.Get(), bytes_.data(), kSize) == kSize) {
        return true;
    }
    errno = EINVAL;
    return false;
}

bool MachineKey::Make(int dir) {
    std::string fresh(kSize, '\0');
    FreshFile file(dir);
    const bool made = RAND_priv_bytes(reinterpret_cast<unsigned char*>(fresh.data()), kSize) == 1 &&
                      file.Write(fresh, kKeyMode, 0, kUsersGroup) &&
                      (file.Publish(kKeyName) || errno == EEXIST);
    OPENSSL_cleanse(fresh.data(), fresh.size());
    return made && Read(dir);  // of two first users, the second takes the key of the first
}

bool MachineKey::Load(bool make) {
    Fd dir = OpenKeyDir();
    if (dir && Read(dir.Get())) {
        return true;
    }
    if (errno != ENOENT && errno != EACCES) {
        return false;
    }
    const AsRoot root;
    if (!root.IsRoot() || (make && !MakeKeyDir())) {
        return false;
    }
    dir = OpenKeyDir();
    if (!dir) {
        return false;
    }
    return Read(dir.Get()) || (make && errno == ENOENT && Make(dir.Get()));
}

}  // namespace zos
