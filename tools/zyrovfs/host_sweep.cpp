#include "host_sweep.h"

#include <fcntl.h>
#include <pwd.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <ctime>

#include "host_folder.h"

namespace tool {
namespace {

constexpr time_t kLongestWrite = 24 * 60 * 60;
constexpr size_t kDigits = 16;

/** How the writers of a folder call a document that is not whole yet. */
enum class Naming { kBesideOld, kNew };

bool EndsInDigits(const std::string& name, size_t begin) {
    return name.size() == begin + kDigits &&
           std::all_of(name.begin() + static_cast<std::ptrdiff_t>(begin), name.end(),
                       [](char c) { return (c >= '0' && c <= '9') || (c >= 'a' && c <= 'f'); });
}

/** What was a stranger's keeps its name behind ".foreign." and is nobody's to delete. */
bool IsUnfinished(const std::string& name, Naming naming) {
    if (naming == Naming::kNew) {
        return name.rfind(".new-", 0) == 0 && EndsInDigits(name, 5);
    }
    return name.size() > kDigits + 1 && name.rfind(".foreign.", 0) != 0 &&
           name[name.size() - kDigits - 1] == '.' && EndsInDigits(name, name.size() - kDigits);
}

/** A regular file of root's or the user's, without a further name, that nobody writes any more. */
bool IsLeft(const struct stat& info, uid_t user) {
    return S_ISREG(info.st_mode) && info.st_nlink == 1 &&
           (info.st_uid == 0 || info.st_uid == user) &&
           info.st_mtime < time(nullptr) - kLongestWrite;
}

std::string Join(std::string folder, const std::string& name) {
    return folder.append("/").append(name);
}

void Sweep(const Folder& folder, const std::string& path, uid_t user, Naming naming,
           std::vector<std::string>& removed) {
    for (const std::string& name : folder.Names()) {
        struct stat info {};
        if (IsUnfinished(name, naming) &&
            fstatat(folder.Get(), name.c_str(), &info, AT_SYMLINK_NOFOLLOW) == 0 &&
            IsLeft(info, user) && unlinkat(folder.Get(), name.c_str(), 0) == 0) {
            removed.push_back(Join(path, name));
        }
    }
}

/** A shared folder, and what the folder of each user in it has below. */
struct Place {
    const char* machine;
    const char* shared;
    std::vector<std::string> of_user;
};

void SweepUsers(const Place& place, std::vector<std::string>& removed) {
    const Folder shared = Folder::Shared(place.machine, place.shared);
    const std::string path = Join(place.machine, place.shared);
    Sweep(shared, path, 0, Naming::kBesideOld, removed);
    for (const std::string& name : shared.Names()) {
        uid_t user = 0;
        if (!ToUid(name, user)) {
            continue;
        }
        for (const std::string& below : place.of_user) {
            std::string inner = name;
            inner += below;
            Sweep(shared.Below(inner, user), Join(path, inner), user, Naming::kBesideOld, removed);
        }
    }
}

/** The platform's folders: the key's, and the tasks of users by name. */
void SweepPlatform(std::vector<std::string>& removed) {
    Sweep(Folder::Shared("/usr", "zyro/etc/private"), "/usr/zyro/etc/private", 0, Naming::kNew,
          removed);
    const Folder tasks = Folder::Shared("/var/tmp", "zos/task");
    for (const std::string& name : tasks.Names()) {
        const passwd* user = getpwnam(name.c_str());
        if (user != nullptr) {
            Sweep(tasks.Below(name, user->pw_uid), "/var/tmp/zos/task/" + name, user->pw_uid,
                  Naming::kNew, removed);
        }
    }
}

}  // namespace

std::vector<std::string> SweepHost() {
    std::vector<std::string> removed;
    const Place places[] = {{"/usr", "zyro/etc/zyrovfs", {"", "/ssl", "/sftp"}},
                            {"/var/tmp", "zyrovfs", {""}},
                            {"/var/tmp", "user", {"/dbus", "/zyrovfs"}}};
    for (const Place& place : places) {
        SweepUsers(place, removed);
    }
    SweepPlatform(removed);
    return removed;
}

}  // namespace tool
