#include "file.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>
#include <zosplatform/file.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstdlib>

namespace tool {
namespace {

/** Not a name that gvfs or the library reads. */
std::string NewName(const std::string& path) {
    return path + ".zyrovfs-new";
}

bool WriteAll(int fd, const std::string& content) {
    return ZYROWriteFileFd(fd, content.data(), content.size()) ==
           static_cast<ssize_t>(content.size());
}

bool Fail(const std::string& leftover) {
    const int error = errno;
    unlink(leftover.c_str());
    errno = error;
    return false;
}

}  // namespace

bool ReadFile(const std::string& path, std::string& content) {
    content.clear();
    const int fd = open(path.c_str(), O_RDONLY | O_CLOEXEC);
    if (fd < 0) {
        return false;
    }
    char buffer[16384];
    ssize_t count = 0;
    while ((count = read(fd, buffer, sizeof buffer)) > 0 || (count < 0 && errno == EINTR)) {
        content.append(buffer, count > 0 ? static_cast<size_t>(count) : 0);
    }
    const int error = errno;
    close(fd);
    errno = error;
    return count == 0;
}

bool ReplaceFile(const std::string& path, const std::string& content, mode_t mode) {
    const std::string fresh = NewName(path);
    unlink(fresh.c_str());
    const int fd = open(fresh.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, 0600);
    if (fd < 0) {
        return false;
    }
    const bool written = WriteAll(fd, content) && fchmod(fd, mode) == 0 && fsync(fd) == 0;
    if ((close(fd) == 0 && written) && rename(fresh.c_str(), path.c_str()) == 0) {
        return true;
    }
    return Fail(fresh);
}

bool ReplaceLink(const std::string& path, const std::string& target) {
    const std::string fresh = NewName(path);
    unlink(fresh.c_str());
    if (symlink(target.c_str(), fresh.c_str()) < 0) {
        return false;
    }
    return rename(fresh.c_str(), path.c_str()) == 0 || Fail(fresh);
}

void RemoveLeftover(const std::string& path) {
    unlink(NewName(path).c_str());
}

std::vector<std::string> ListFolder(const std::string& path, const std::string& suffix) {
    std::vector<std::string> names;
    DIR* folder = opendir(path.c_str());
    if (folder == nullptr) {
        return names;
    }
    while (const dirent* entry = readdir(folder)) {
        const std::string name = entry->d_name;
        if (name.size() > suffix.size() &&
            name.compare(name.size() - suffix.size(), suffix.size(), suffix) == 0) {
            names.push_back(name);
        }
    }
    closedir(folder);
    std::sort(names.begin(), names.end());
    return names;
}

}  // namespace tool
