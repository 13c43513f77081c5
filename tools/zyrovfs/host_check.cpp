#include <sys/stat.h>
#include <unistd.h>

#include "fuse_conf.h"
#include "host_layer.h"

namespace tool {
namespace {

/** Something that a package brings. */
struct Need {
    const char* path;
    int access;
    const char* package;
};

constexpr Need kNeeds[] = {
    {"/usr/bin/dbus-daemon", X_OK, "dbus-daemon"},
    {"/usr/share/dbus-1/session.conf", R_OK, "dbus-session-bus-common"},
    {"/usr/lib/gvfs/gvfsd", X_OK, "gvfs-daemons"},
    {"/usr/libexec/gvfsd-fuse", X_OK, "gvfs-fuse"},
    {"/usr/libexec/gvfsd-ftp", X_OK, "gvfs-backends"},
    {"/usr/libexec/gvfsd-sftp", X_OK, "gvfs-backends"},
    {"/usr/libexec/gvfsd-dav", X_OK, "gvfs-backends"},
    {"/usr/libexec/gvfsd-smb", X_OK, "gvfs-backends"},
    {"/usr/libexec/gvfsd-nfs", X_OK, "gvfs-backends"},
    {"/usr/bin/fusermount3", X_OK, "fuse3"},
    {"/bin/umount", X_OK, "mount"},
    {"/usr/bin/ssh", X_OK, "openssh-client"},
    {"/usr/bin/ssh-keygen", X_OK, "openssh-client"},
    {"/etc/ssl/certs/ca-certificates.crt", R_OK, "ca-certificates"},
};

void CheckPackages(std::vector<std::string>& missing) {
    for (const Need& need : kNeeds) {
        if (access(need.path, need.access) < 0) {
            missing.push_back(std::string(need.path) + " is missing; it comes with the package " +
                              need.package + ".");
        }
    }
    if (access("/dev/fuse", R_OK | W_OK) < 0) {
        missing.push_back("/dev/fuse is missing; load the kernel module fuse.");
    }
}

/** Without it the library mounts nothing; one that others may change it does not run. */
void CheckHelper(const std::string& helper, std::vector<std::string>& missing) {
    struct stat info {};
    if (stat(helper.c_str(), &info) != 0 || access(helper.c_str(), X_OK) != 0) {
        missing.push_back(helper + " is missing; it comes with the library.");
    } else if ((info.st_mode & (S_IWGRP | S_IWOTH)) != 0) {
        missing.push_back(helper + " may be changed by others than its owner.");
    }
}

std::string Join(const std::vector<std::string>& words) {
    std::string text;
    for (const std::string& word : words) {
        text += (text.empty() ? "" : " ") + word;
    }
    return text;
}

void CheckFiles(const HostSources& sources, std::vector<std::string>& missing) {
    std::string problem;
    std::vector<std::string> absent;
    for (const HostFile& file : HostFiles(sources, problem)) {
        if (!IsInPlace(file)) {
            absent.push_back(file.path);
        }
    }
    if (!problem.empty()) {
        missing.push_back(problem);
    }
    if (!absent.empty()) {
        missing.push_back("These are not the files of the host layer: " + Join(absent));
    }
    const std::vector<std::string> nameless = NamelessMounts();
    if (!nameless.empty()) {
        missing.push_back("These name no protocol and show as empty entries of the catalogue: " +
                          Join(nameless));
    }
}

}  // namespace

std::vector<std::string> CheckHost(const HostSources& sources) {
    std::vector<std::string> missing;
    CheckPackages(missing);
    CheckHelper(sources.helper, missing);
    for (const HostFolder& folder : HostFolders()) {
        if (!IsFolderReady(folder)) {
            missing.push_back(std::string(folder.path) +
                              " is missing, or its owner or mode is wrong.");
        }
    }
    CheckFiles(sources, missing);
    if (!FuseAllowsOther()) {
        missing.push_back("/etc/fuse.conf does not have user_allow_other.");
    }
    return missing;
}

}  // namespace tool
