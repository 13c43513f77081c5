#include "zosplatform/file.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>

#include <algorithm>
#include <charconv>
#include <cstring>
#include <memory>
#include <string_view>
#include <vector>

#include "safe_path.h"
#include "support.h"
#include "zosplatform/process.h"

namespace {

constexpr int kFailed = -1;

struct CloseDir {
    void operator()(DIR* dir) const { closedir(dir); }
};

bool IsWanted(std::string_view name, std::string_view suffix) {
    return name != "." && name != ".." && name.size() >= suffix.size() &&
           name.substr(name.size() - suffix.size()) == suffix;
}

/** Sorted; false when the folder cannot be read, with errno. */
bool ReadNames(const char* path, std::string_view suffix, std::vector<std::string>& names) {
    const std::unique_ptr<DIR, CloseDir> dir(opendir(path));
    if (!dir) {
        return false;
    }
    errno = 0;
    while (const dirent* entry = readdir(dir.get())) {
        if (IsWanted(entry->d_name, suffix)) {
            names.emplace_back(entry->d_name);
        }
        errno = 0;
    }
    if (errno != 0) {
        return false;
    }
    std::sort(names.begin(), names.end());
    return true;
}

int AppendNames(const char* path, std::string_view suffix, PYLIBCSZLIST* list) {
    std::vector<std::string> names;
    if (!ReadNames(path, suffix, names)) {
        SET_SYSTEM_ERROR(ZOS_ERR_OPEN_FAILED);
        return kFailed;
    }
    for (const std::string& name : names) {
        if (YLIBCSzListPush(list, name.c_str()) != 0) {
            return kFailed;
        }
    }
    return static_cast<int>(names.size());
}

/** Root touches files in users' folders: a link there is not followed, and nothing is waited for.
 */
bool Touch(const std::string& path) {
    std::string name;
    const zos::Fd dir = zos::OpenFolderOf(path, name);
    struct stat info {};
    if (dir && fstatat(dir.Get(), name.c_str(), &info, AT_SYMLINK_NOFOLLOW) == 0) {
        errno = S_ISLNK(info.st_mode) ? ELOOP : 0;
        return errno == 0 && utimensat(dir.Get(), name.c_str(), nullptr, AT_SYMLINK_NOFOLLOW) == 0;
    }
    const zos::Fd fd = dir && errno == ENOENT ? zos::OpenOrMake(path, O_WRONLY, 0666) : zos::Fd();
    // Times are set once more, for a file that somebody else made between the two calls.
    return fd && futimens(fd.Get(), nullptr) == 0;
}

}  // namespace

int YLIBCFileCheckDir(const char* path) {
    struct stat info {};
    return path != nullptr && stat(path, &info) == 0 && S_ISDIR(info.st_mode) ? 1 : 0;
}

int YLIBCFileExist(const char* path) {
    struct stat info {};
    return path != nullptr && stat(path, &info) == 0 ? 1 : 0;
}

int YLIBCFileEnumDir(const char* dir, unsigned int flags, const char* suffix, PYLIBCSZLIST* list) {
    const bool by_suffix = flags == YLIBC_ENUM_SUFFIX;
    if (dir == nullptr || list == nullptr || *list == nullptr || (flags != 0 && !by_suffix) ||
        (by_suffix && suffix == nullptr)) {
        SET_PLATFORM_ERROR(ZOS_ERR_BAD_PARAMETER);
        return kFailed;
    }
    return zos::OrOutOfMemory(kFailed,
                              [&] { return AppendNames(dir, by_suffix ? suffix : "", list); });
}

int YLIBCFileTouch(const char* path) {
    if (path == nullptr) {
        SET_PLATFORM_ERROR(ZOS_ERR_BAD_PARAMETER);
        return kFailed;
    }
    return zos::OrOutOfMemory(kFailed, [path] {
        if (Touch(path)) {
            return 0;
        }
        SET_SYSTEM_ERROR(ZOS_ERR_OPEN_FAILED);
        return kFailed;
    });
}

int YLIBCReadPidFile(const char* path) {
    if (path == nullptr) {
        SET_PLATFORM_ERROR(ZOS_ERR_BAD_PARAMETER);
        return 0;
    }
    return zos::OrOutOfMemory(0, [path] {
        const zos::Fd fd = zos::OpenRegular(AT_FDCWD, path, 0);
        char line[64];
        const ssize_t n = fd ? read(fd.Get(), line, sizeof line) : -1;
        if (n < 0) {
            SET_SYSTEM_ERROR(ZOS_ERR_OPEN_FAILED);
            return 0;
        }
        const char* end = std::find(line, line + n, '\n');
        const char* begin = std::find_if(line, line + n, [](char c) { return c != ' '; });
        int pid = 0;
        const auto [stop, error] = std::from_chars(begin, end, pid);
        if (error != std::errc() || (stop != end && *stop != ' ' && *stop != '\r')) {
            SET_PLATFORM_ERROR(ZOS_ERR_BAD_FORMAT);
            return 0;
        }
        return YLIBCProcAlive(pid) == 1 ? pid : 0;
    });
}

ssize_t ZYROWriteFileFd(int fd, const void* data, size_t size) {
    const char* bytes = static_cast<const char*>(data);
    size_t done = 0;
    while (done < size) {
        const ssize_t n = write(fd, bytes + done, size - done);
        if (n > 0) {
            done += static_cast<size_t>(n);
        } else if (n == 0) {
            errno = ENOSPC;
            break;
        } else if (errno != EINTR) {
            break;
        }
    }
    if (done < size) {
        SET_SYSTEM_ERROR(ZOS_ERR_WRITE_FAILED);
    }
    return done == 0 && size > 0 ? kFailed : static_cast<ssize_t>(done);
}
