#include "host_folder.h"

#include <dirent.h>
#include <fcntl.h>
#include <linux/openat2.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <charconv>

namespace tool {
namespace {

int OpenBelow(int above, const std::string& path, uint64_t resolve) {
    open_how how{};
    how.flags = O_RDONLY | O_DIRECTORY | O_CLOEXEC;
    how.resolve = RESOLVE_NO_SYMLINKS | RESOLVE_BENEATH | resolve;
    return static_cast<int>(syscall(SYS_openat2, above, path.c_str(), &how, sizeof how));
}

bool IsOwnedBy(int fd, uid_t user) {
    struct stat info {};
    return fstat(fd, &info) == 0 && (info.st_uid == 0 || info.st_uid == user);
}

}  // namespace

Folder::~Folder() {
    if (fd_ >= 0) {
        close(fd_);
    }
}

Folder Folder::Shared(const char* machine, const std::string& below) {
    const Folder base(open(machine, O_PATH | O_DIRECTORY | O_CLOEXEC));
    // A box may have a partition of its own for what it keeps; root alone can mount there.
    Folder folder(base ? OpenBelow(base.Get(), below, 0) : -1);
    return folder && IsOwnedBy(folder.Get(), 0) ? std::move(folder) : Folder(-1);
}

Folder Folder::Below(const std::string& path, uid_t user) const {
    Folder folder(fd_ >= 0 ? OpenBelow(fd_, path, RESOLVE_NO_XDEV) : -1);
    return folder && IsOwnedBy(folder.Get(), user) ? std::move(folder) : Folder(-1);
}

std::vector<std::string> Folder::Names() const {
    std::vector<std::string> names;
    const int fd = fd_ < 0 ? -1 : openat(fd_, ".", O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    DIR* dir = fd < 0 ? nullptr : fdopendir(fd);
    if (dir == nullptr) {
        if (fd >= 0) {
            close(fd);
        }
        return names;
    }
    while (const dirent* entry = readdir(dir)) {
        names.emplace_back(entry->d_name);
    }
    closedir(dir);
    return names;
}

bool ToUid(const std::string& text, uid_t& uid) {
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), uid);
    return error == std::errc() && end == text.data() + text.size() && text == std::to_string(uid);
}

}  // namespace tool
