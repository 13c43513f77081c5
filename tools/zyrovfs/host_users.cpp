#include "host_users.h"

#include <json/value.h>
#include <sys/mount.h>
#include <unistd.h>
#include <zyrovfs/global.h>
#include <zyrovfs/server.h>
#include <zyrovfs/vfs.h>

#include <cstdlib>

#include "host_folder.h"

namespace tool {
namespace {

using namespace ZYROVFS;

constexpr int kTries = 50;
constexpr useconds_t kBetween = 100 * 1000;

void DisconnectAll(uid_t uid) {
    Json::Value list;
    if (!Server::List(uid, Server::VFS_CONFIG_CONNECT, nullptr, nullptr, true, 0, 0, list)) {
        return;
    }
    for (const Json::Value& entry : list["connections"]) {
        if (entry["id"].isString()) {
            Server::Disconnect(uid, entry["id"].asCString());
        }
    }
}

/** By the folder that was looked at, since users can put links in the way. Without a tree there is
 * nothing to detach, and that is as good. */
void DetachTree(const Folder& runtime) {
    if (runtime && fchdir(runtime.Get()) == 0) {
        umount2("gvfs", MNT_DETACH | UMOUNT_NOFOLLOW);
        if (chdir("/") != 0) {
            std::abort();  // the root is always there
        }
    }
}

bool AreDaemonsDead() {
    return DBUS::CheckDaemonDied() && GVFSD::CheckDaemonDied() && GVFSD_FUSE::CheckDaemonDied();
}

bool AreDaemonsDeadSoon() {
    for (int i = 0; i < kTries && !AreDaemonsDead(); ++i) {
        usleep(kBetween);
    }
    return AreDaemonsDead();
}

bool Disconnect(uid_t uid, const Folder& runtime) {
    // Whoever was acted for before has another bus.
    unsetenv("DBUS_SESSION_BUS_ADDRESS");
    setenv("ZYROVFS_UID", std::to_string(uid).c_str(), 1);
    InitGlobal(uid, true);
    if (!DBUS::CheckDaemonDied() && !GVFSD::CheckDaemonDied()) {
        DisconnectAll(uid);
    }
    if (!DBUS::CheckDaemonDied()) {
        DBUS::DoKill();
    }
    DetachTree(runtime);
    return AreDaemonsDeadSoon();
}

std::string DaemonsLeft(const std::string& user) {
    std::string sentence = "Daemons of user ";
    sentence.append(user).append(" do not end; /var/tmp/user/").append(user);
    return sentence.append(" has their process ids.");
}

}  // namespace

bool DisconnectUsers(std::vector<std::string>& problems) {
    const Folder users = Folder::Shared("/var/tmp", "user");
    for (const std::string& name : users.Names()) {
        uid_t uid = 0;
        if (ToUid(name, uid) && !Disconnect(uid, users.Below(name, uid))) {
            problems.push_back(DaemonsLeft(name));
        }
    }
    return problems.empty();
}

}  // namespace tool
