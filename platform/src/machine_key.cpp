#include "machine_key.h"

#include <fcntl.h>
#include <openssl/crypto.h>
#include <openssl/rand.h>
#include <sys/stat.h>

#include <cstdlib>

#include "safe_path.h"
#include "support.h"

namespace zos {
namespace {

constexpr const char* kKeyDir = "private";  // below /usr/zyro/etc
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

/** The folders above the key. Where others could write to one, they could put another key's folder
 * in the place of this: root closes it. */
Fd OpenParent(bool make) {
    Fd dir(open("/usr", O_PATH | O_DIRECTORY | O_CLOEXEC));
    for (const char* name : {"zyro", "etc"}) {
        if (dir) {
            dir = EnterRootsFolder(dir.Get(), name, make, kParentMode);
        }
    }
    return dir;
}

/** The mode is set behind the umask's back: under 077 no backend could reach the key. */
bool MakeKeyDir() {
    const Fd parent = OpenParent(true);
    if (!parent || mkdirat(parent.Get(), kKeyDir, 0700) != 0) {
        return parent && errno == EEXIST;
    }
    const Fd dir(openat(parent.Get(), kKeyDir, O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC));
    return dir && fchown(dir.Get(), 0, kUsersGroup) == 0 && fchmod(dir.Get(), kKeyDirMode) == 0;
}

Fd OpenKeyDir() {
    const Fd parent = OpenParent(false);
    Fd dir(parent ? openat(parent.Get(), kKeyDir, O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC)
                  : -1);
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
