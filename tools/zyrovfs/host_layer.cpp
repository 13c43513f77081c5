#include "host_layer.h"

#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <climits>
#include <cstring>
#include <sstream>

#include "diversion.h"
#include "file.h"
#include "fuse_conf.h"

namespace tool {
namespace {

constexpr const char* kCatalogue = "/usr/share/gvfs/mounts";
constexpr const char* kSuffix = ".mount";
constexpr const char* kLauncherPlace = "/usr/lib/gvfs/gvfsd-fuse";
constexpr const char* kDbusPlace = "/sbin/dbus-daemon";
constexpr const char* kDbusDaemon = "/usr/bin/dbus-daemon";

std::string Failed(const std::string& what) {
    return what + " failed: " + std::strerror(errno);
}

void Note(bool done, const std::string& problem, std::vector<std::string>& problems) {
    if (!done) {
        problems.push_back(problem);
    }
}

bool MakeFolder(const HostFolder& folder, std::string& problem) {
    if (mkdir(folder.path, 0700) < 0 && errno != EEXIST) {
        problem = Failed(std::string("Making ") + folder.path);
        return false;
    }
    struct stat info {};
    if (lstat(folder.path, &info) < 0 || !S_ISDIR(info.st_mode)) {
        problem = std::string(folder.path) + " is not a folder.";
        return false;
    }
    if (!IsFolderReady(folder) &&
        (chown(folder.path, 0, folder.gid) < 0 || chmod(folder.path, folder.mode) < 0)) {
        problem = Failed(std::string("Setting owner and mode of ") + folder.path);
        return false;
    }
    return true;
}

/** A folder that holds something, as profiles, stays. */
bool RemoveFolder(const HostFolder& folder, std::string& problem) {
    if (rmdir(folder.path) == 0 || errno == ENOENT || errno == ENOTEMPTY || errno == EEXIST ||
        errno == ENOTDIR) {
        return true;
    }
    problem = Failed(std::string("Removing ") + folder.path);
    return false;
}

bool Place(const HostFile& file, std::string& problem) {
    std::string content;
    const bool done = file.source.empty() ? ReplaceLink(file.path, file.target)
                                          : ReadFile(file.source, content) &&
                                                ReplaceFile(file.path, content, file.mode);
    if (!done) {
        problem = Failed("Writing " + file.path);
    }
    return done;
}

/** Diverts first, so that at no moment a package's file is overwritten. */
bool InstallFile(const HostFile& file, const std::vector<std::string>& diverted,
                 std::string& problem) {
    if (std::find(diverted.begin(), diverted.end(), file.path) == diverted.end() &&
        !Divert(file.path, problem)) {
        return false;
    }
    return IsInPlace(file) || Place(file, problem);
}

bool NamesProtocol(const std::string& path) {
    std::string content;
    if (!ReadFile(path, content)) {
        return false;
    }
    std::istringstream lines(content);
    for (std::string line; std::getline(lines, line);) {
        if (line.compare(0, 9, "Protocol=") == 0 && line.size() > 9) {
            return true;
        }
    }
    return false;
}

std::string ProgramFolder() {
    char path[PATH_MAX];
    const ssize_t length = readlink("/proc/self/exe", path, sizeof path);
    const std::string text(path, length > 0 ? static_cast<size_t>(length) : 0);
    return text.substr(0, text.find_last_of('/'));
}

bool IsRoot(std::vector<std::string>& problems) {
    Note(geteuid() == 0, "Only root can change the host.", problems);
    return problems.empty();
}

}  // namespace

HostSources HostSources::Of(const std::string& build) {
    if (build.empty()) {
        const std::string here = ProgramFolder();
        return {here + "/" ZYROVFS_LAUNCHER, here + "/" ZYROVFS_MOUNTS, here + "/" ZYROVFS_HELPER};
    }
    return {build + "/platform/host/gvfsd-fuse-launcher", build + "/platform/host/mounts",
            build + "/libexec/zyrovfs/zyrovfs-helper"};
}

const std::vector<HostFolder>& HostFolders() {
    static const std::vector<HostFolder> folders = {
        {"/usr/zyro", 0, 0755},
        {"/usr/zyro/etc", 0, 0755},
        {"/usr/zyro/etc/zyrovfs", 0, 0755},
        // Backends run as the user with group 100 and read keys.
        {"/usr/zyro/etc/private", 100, 0750},
    };
    return folders;
}

bool IsFolderReady(const HostFolder& folder) {
    struct stat info {};
    return lstat(folder.path, &info) == 0 && S_ISDIR(info.st_mode) && info.st_uid == 0 &&
           info.st_gid == folder.gid && (info.st_mode & 07777) == folder.mode;
}

std::vector<HostFile> HostFiles(const HostSources& sources, std::string& problem) {
    const std::vector<std::string> mounts = ListFolder(sources.mounts, kSuffix);
    if (mounts.empty() || access(sources.launcher.c_str(), X_OK) < 0) {
        problem = "The files of the host layer are not at " + sources.launcher + " and " +
                  sources.mounts + "; install them, or name a build tree with --build.";
        return {};
    }
    std::vector<HostFile> files = {{kLauncherPlace, sources.launcher, "", 0755}};
    for (const std::string& name : mounts) {
        files.push_back({std::string(kCatalogue) + "/" + name, sources.mounts + "/" + name, ""});
    }
    if (access(kDbusPlace, X_OK) < 0) {
        files.push_back({kDbusPlace, "", kDbusDaemon});
    }
    return files;
}

bool IsInPlace(const HostFile& file) {
    struct stat info {};
    if (lstat(file.path.c_str(), &info) < 0) {
        return false;
    }
    if (file.source.empty()) {
        char target[4096];
        const ssize_t length = readlink(file.path.c_str(), target, sizeof target);
        return length >= 0 &&
               file.target.compare(0, std::string::npos, target, static_cast<size_t>(length)) == 0;
    }
    std::string ours;
    std::string theirs;
    return S_ISREG(info.st_mode) && (info.st_mode & 07777) == file.mode &&
           ReadFile(file.source, ours) && ReadFile(file.path, theirs) && ours == theirs;
}

std::vector<std::string> NamelessMounts() {
    std::vector<std::string> paths;
    for (const std::string& name : ListFolder(kCatalogue, kSuffix)) {
        const std::string path = std::string(kCatalogue) + "/" + name;
        if (!NamesProtocol(path)) {
            paths.push_back(path);
        }
    }
    return paths;
}

bool InstallHost(const HostSources& sources, std::vector<std::string>& problems) {
    std::string problem;
    const std::vector<HostFile> files = HostFiles(sources, problem);
    std::vector<std::string> diverted;
    if (!IsRoot(problems) || files.empty() || !ListDiversions(diverted, problem)) {
        Note(problem.empty(), problem, problems);
        return false;
    }
    for (const HostFolder& folder : HostFolders()) {
        Note(MakeFolder(folder, problem), problem, problems);
    }
    for (const HostFile& file : files) {
        Note(InstallFile(file, diverted, problem), problem, problems);
    }
    for (const std::string& path : NamelessMounts()) {
        Note(Divert(path, problem), problem, problems);
    }
    Note(AllowOther(problem), problem, problems);
    return problems.empty();
}

bool RemoveHost(std::vector<std::string>& problems) {
    std::string problem;
    std::vector<std::string> diverted;
    if (!IsRoot(problems) || !ListDiversions(diverted, problem)) {
        Note(problem.empty(), problem, problems);
        return false;
    }
    for (const std::string& path : diverted) {
        Note(Undivert(path, problem), problem, problems);
    }
    Note(DisallowOther(problem), problem, problems);
    std::vector<HostFolder> folders = HostFolders();
    std::reverse(folders.begin(), folders.end());
    for (const HostFolder& folder : folders) {
        Note(RemoveFolder(folder, problem), problem, problems);
    }
    return problems.empty();
}

}  // namespace tool
