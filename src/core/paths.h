/** Every fixed path of the system, once. */
#ifndef ZYROVFS_CORE_PATHS_H
#define ZYROVFS_CORE_PATHS_H

#include <string>

namespace ZYROVFS::paths {

/** Saved profiles and what a user has learnt to trust; survives a reboot. */
inline constexpr const char* kConfigRoot = "/usr/zyro/etc/zyrovfs";
/** Live connections. */
inline constexpr const char* kConnectRoot = "/var/tmp/zyrovfs";
inline constexpr const char* kServersFile = "servers.conf";
/** Addresses and OAuth clients of the clouds. */
inline constexpr const char* kServiceConfig = "/usr/zyro/etc/zyrovfs/cloud.conf";
inline constexpr const char* kConnectFile = "connect.conf";

/** Who may use remote connections. */
inline constexpr const char* kPolicyFile = "/usr/zyro/etc/zyrovfs/user.conf";
/** What the platform's update of domain and LDAP entries leaves while it runs and when it is done.
 */
inline constexpr const char* kDomainUpdating = "/tmp/domain_updating";
inline constexpr const char* kDomainUserPid = "/tmp/domain_user.pid";
inline constexpr const char* kDomainGroupPid = "/tmp/domain_group.pid";
inline constexpr const char* kLdapUserList = "/usr/zyro/etc/private/ldap_user";
inline constexpr const char* kLdapGroupList = "/usr/zyro/etc/private/ldap_group";
inline constexpr const char* kUserListLock = "/tmp/userlock";
inline constexpr const char* kGroupListLock = "/tmp/grouplock";

inline constexpr const char* kCatalogueDir = "/usr/share/gvfs/mounts";
inline constexpr const char* kCaBundle = "/etc/ssl/certs/ca-certificates.crt";

inline constexpr const char* kDbusDaemon = "/sbin/dbus-daemon";
inline constexpr const char* kGvfsd = "/usr/lib/gvfs/gvfsd";
inline constexpr const char* kGvfsdFuse = "/usr/lib/gvfs/gvfsd-fuse";
inline constexpr const char* kUmount = "/bin/umount";
inline constexpr const char* kRm = "/bin/rm";
inline constexpr const char* kSshKeygen = "/usr/bin/ssh-keygen";

inline std::string UserConfigDir(unsigned int uid) {
    return std::string(kConfigRoot) + "/" + std::to_string(uid);
}
inline std::string UserConnectDir(unsigned int uid) {
    return std::string(kConnectRoot) + "/" + std::to_string(uid);
}
inline std::string KnownHosts(unsigned int uid) {
    return UserConfigDir(uid) + "/sftp/known_hosts";
}
inline std::string SslDir(unsigned int uid) {
    return UserConfigDir(uid) + "/ssl";
}

/** Everything of a user that is volatile: bus, fuse tree, tasks. */
inline std::string RuntimeDir(unsigned int uid) {
    return "/var/tmp/user/" + std::to_string(uid);
}
inline std::string DbusPid(unsigned int uid) {
    return RuntimeDir(uid) + "/dbus/dbus.pid";
}
inline std::string DbusAddress(unsigned int uid) {
    return RuntimeDir(uid) + "/dbus/dbus.path";
}
inline std::string GvfsdPid(unsigned int uid) {
    return RuntimeDir(uid) + "/zyrovfs/gvfsd.pid";
}
inline std::string GvfsdFusePid(unsigned int uid) {
    return RuntimeDir(uid) + "/zyrovfs/gvfsd-fuse.pid";
}
inline std::string FuseTree(unsigned int uid) {
    return RuntimeDir(uid) + "/gvfs";
}
/** Queues of background jobs, a folder for each type of job. */
inline std::string TaskRoot(unsigned int uid) {
    return RuntimeDir(uid) + "/zyrovfs/task";
}

inline std::string MountLock(unsigned int uid) {
    return "/tmp/zyrovfs/lock/user/" + std::to_string(uid) + "/mnt.lock";
}

/** Each holds a folder per user, named by the user id. */
inline constexpr const char* kFoldersOfUsers[] = {kConfigRoot, kConnectRoot, "/var/tmp/user",
                                                  "/tmp/zyrovfs/lock/user"};
/** The machine's own folders, which root lays out as root likes, with links too. Below them nothing
 * of ours is a link. */
inline constexpr const char* kMachineFolders[] = {"/usr", "/var/tmp", "/tmp", "/etc/ssl/certs"};
/** Shared by all users and not for them to change. */
inline constexpr const char* kSharedConfigFolders[] = {"/usr/zyro", "/usr/zyro/etc", kConfigRoot};
/** Shared by all users, who may each put a folder of their own there. */
inline constexpr const char* kSharedVolatileFolders[] = {
    kConnectRoot, "/var/tmp/user", "/tmp/zyrovfs", "/tmp/zyrovfs/lock", "/tmp/zyrovfs/lock/user"};

}  // namespace ZYROVFS::paths

#endif
