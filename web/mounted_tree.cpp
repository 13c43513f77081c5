#include "mounted_tree.h"

#include <dirent.h>
#include <fcntl.h>
#include <linux/openat2.h>
#include <sys/stat.h>
#include <sys/syscall.h>

#include <cerrno>
#include <cstdio>
#include <memory>

#include "failure.h"
#include "name.h"

namespace web {
namespace {

/** Of folders in each other, for what deletes them. */
constexpr int kDeepest = 100;

struct CloseFolder {
    void operator()(DIR* folder) const { closedir(folder); }
};
using Folder = std::unique_ptr<DIR, CloseFolder>;

Folder Read(Descriptor fd) {
    Folder folder(fd.Get() < 0 ? nullptr : fdopendir(fd.Get()));
    if (folder != nullptr) {
        fd.Release();
    }
    return folder;
}

/** The next name that is not the folder itself or the one above; null at the end. */
const char* NextName(DIR* folder) {
    while (const dirent* item = readdir(folder)) {
        const std::string name = item->d_name;
        if (name != "." && name != "..") {
            return item->d_name;
        }
    }
    return nullptr;
}

/** What cannot be looked at, such as a link of the server, is told with its name alone. */
Entry Describe(const std::string& name, const struct stat* item) {
    Entry entry;
    entry.name = name;
    if (item != nullptr) {
        entry.folder = S_ISDIR(item->st_mode);
        entry.file = S_ISREG(item->st_mode);
        entry.size = entry.folder ? 0 : item->st_size;
        entry.modified = item->st_mtim.tv_sec;
    }
    return entry;
}

/** The library's own trees take no flags with a rename. */
bool RenameTo(int from_folder, const std::string& from, int to_folder, const std::string& to) {
    if (renameat2(from_folder, from.c_str(), to_folder, to.c_str(), RENAME_NOREPLACE) == 0) {
        return true;
    }
    if (errno != EINVAL && errno != ENOSYS && errno != EOPNOTSUPP) {
        return false;
    }
    struct stat there {};
    if (fstatat(to_folder, to.c_str(), &there, AT_SYMLINK_NOFOLLOW) == 0) {
        errno = EEXIST;
        return false;
    }
    return renameat(from_folder, from.c_str(), to_folder, to.c_str()) == 0;
}

/** Removes an item with what is in it, without following links. False with errno. */
bool RemoveAll(int parent, const char* name, int depth) {
    if (unlinkat(parent, name, 0) == 0) {
        return true;
    }
    if (errno != EISDIR && errno != EPERM) {
        return false;
    }
    if (depth == kDeepest) {
        errno = ELOOP;
        return false;
    }
    const Folder folder =
        Read(Descriptor(openat(parent, name, O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC)));
    if (folder == nullptr) {
        return false;
    }
    while (const char* below = NextName(folder.get())) {
        if (!RemoveAll(dirfd(folder.get()), below, depth + 1)) {
            return false;
        }
    }
    return unlinkat(parent, name, AT_REMOVEDIR) == 0;
}

bool RemoveOne(int parent, const char* name) {
    if (unlinkat(parent, name, 0) == 0) {
        return true;
    }
    return (errno == EISDIR || errno == EPERM) && unlinkat(parent, name, AT_REMOVEDIR) == 0;
}

std::string Shown(const std::string& path) {
    return "\"" + path.substr(path.rfind('/') + 1) + "\"";
}

void Check(bool done, const std::string& path) {
    if (!done) {
        throw FailureOfErrno(Shown(path));
    }
}

}  // namespace

Entry RootEntry() {
    Entry entry;
    entry.folder = true;
    entry.size = 0;
    return entry;
}

Descriptor MountedTree::Open(const std::string& path, int flags) const {
    const Descriptor folder(
        folder_.empty() ? -1 : open(folder_.c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC));
    if (folder.Get() < 0) {
        throw Failure(502, "The connection is not there at the moment.")
            .Advise("Connect it again.");
    }
    const std::string below = CheckPath(path) == "/" ? "." : path.substr(1);
    open_how how{};
    how.flags = static_cast<__u64>(flags | O_CLOEXEC);
    how.resolve = RESOLVE_BENEATH | RESOLVE_NO_MAGICLINKS;
    Descriptor fd(
        static_cast<int>(syscall(SYS_openat2, folder.Get(), below.c_str(), &how, sizeof how)));
    if (fd.Get() < 0) {
        throw FailureOfErrno("\"" + path + "\"");
    }
    return fd;
}

bool MountedTree::IsThere() {
    return access(folder_.c_str(), F_OK) == 0;
}

void MountedTree::List(const std::string& path, const std::function<void(Entry)>& tell) {
    const Folder folder = Read(Open(path, O_RDONLY | O_DIRECTORY));
    Check(folder != nullptr, path);
    while (const char* name = NextName(folder.get())) {
        struct stat item {};
        const bool known = fstatat(dirfd(folder.get()), name, &item, AT_SYMLINK_NOFOLLOW) == 0;
        tell(Describe(name, known ? &item : nullptr));
    }
}

Entry MountedTree::Look(const std::string& path) {
    if (path == "/") {
        return RootEntry();
    }
    const Split split = SplitPath(path);
    const Descriptor folder = Open(split.folder, O_PATH | O_DIRECTORY);
    struct stat item {};
    Check(fstatat(folder.Get(), split.name.c_str(), &item, AT_SYMLINK_NOFOLLOW) == 0, path);
    return Describe(split.name, &item);
}

void MountedTree::MakeFolder(const std::string& path) {
    const Split split = SplitPath(path);
    const Descriptor folder = Open(split.folder, O_RDONLY | O_DIRECTORY);
    Check(mkdirat(folder.Get(), split.name.c_str(), 0777) == 0, path);
}

void MountedTree::Move(const std::string& path, const std::string& folder,
                       const std::string& name) {
    const Split split = SplitPath(path);
    const Descriptor from = Open(split.folder, O_RDONLY | O_DIRECTORY);
    const Descriptor to = Open(folder, O_RDONLY | O_DIRECTORY);
    Check(RenameTo(from.Get(), split.name, to.Get(), CheckName(name)), path);
}

void MountedTree::Delete(const std::string& path, bool recursive) {
    const Split split = SplitPath(path);
    const Descriptor folder = Open(split.folder, O_RDONLY | O_DIRECTORY);
    const char* name = split.name.c_str();
    Check(recursive ? RemoveAll(folder.Get(), name, 0) : RemoveOne(folder.Get(), name), path);
}

}  // namespace web
