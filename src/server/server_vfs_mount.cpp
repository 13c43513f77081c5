#include <zosplatform/process.h>

#include <cerrno>

#include "core/error_cell.h"
#include "core/handle.h"
#include "core/identity.h"
#include "core/log.h"
#include "core/owned_folder.h"
#include "core/paths.h"
#include "mount/init_global.h"
#include "mount/known_hosts.h"
#include "mount/server_trust.h"
#include "mount/server_uri.h"
#include "server/server_account.h"
#include "server/server_vfs.h"
#include "zyrovfs/utils.h"

namespace ZYROVFS::Server {
namespace {

constexpr const char* kAnonymous = "anonymous";

/** The file belongs to the user, so the user's identity rewrites it. */
void ForgetHostKey(unsigned int uid, const std::string& id) {
    const std::string known_hosts = paths::KnownHosts(uid);
    IF_RUN_AS(uid, 0) {
        std::string host;
        if (HasKnownHosts(uid) && GetSFTPHost(id.c_str(), host) &&
            YLIBCExec(paths::kSshKeygen, "-R", host.c_str(), "-f", known_hosts.c_str(),
                      static_cast<char*>(nullptr)) < 0) {
            LOG_ERROR("Failed to remove ssh key %s, errno=%X, %m", host.c_str(), errno);
        }
    }
    else {
        LOG_ERROR("Failed to change uid to %u", uid);
    }
}

void ForgetCertificate(unsigned int uid, const std::string& id) {
    std::string name;
    if (!ServerFileName(ReadableUri(id), name)) {
        LOG_ERROR("Failed to unlink the certificate of %s", id.c_str());
        return;
    }
    const OwnedFolder folder = OwnedFolder::Open(paths::SslDir(uid), uid);
    if (folder && !RemoveSaved(folder, name)) {
        LOG_ERROR("Failed to unlink %s/%s, %m", paths::SslDir(uid).c_str(), name.c_str());
    }
}

}  // namespace

bool VFSServer::MountAs(const char* account, const std::string& id, const Json::Value& conf,
                        bool force, VFS& session) {
    return session.Init(account, password_.c_str(), id.c_str(), uri_path_.c_str(),
                        codepage_.c_str(), conf, force) &&
           session.Mount();
}

bool VFSServer::Mount(unsigned int uid, VFS_CONFIG_MODE mode, const Json::Value& conf, bool force) {
    std::string id;
    if (!GetServerID(id)) {
        LOG_ERROR("Failed to get server ID, uid=%u, mode=%u, code=%u", uid, mode, GetError());
        SetErr(VFS_ERR_INVALID_SERVER);
        // True on purpose: the caller meets the same failure when it describes the mount, and
        // reports it there.
        return true;
    }
    InitForMount(uid);
    VFS session;
    if (!MountAs(account_.c_str(), id, conf, force, session)) {
        return false;
    }
    if (account_.empty() && !MountAnonymously(conf, force, session)) {
        return false;
    }
    uri_path_ = session.GetPath();
    return true;
}

bool VFSServer::MountAnonymously(const Json::Value& conf, bool force, VFS& session) {
    std::string id;
    if (!GetServerID(id)) {
        SetErr(VFS_ERR_INVALID_SERVER);
        LOG_ERROR("GetServerID failed, code=%u", GetError());
        return false;
    }
    if (!MountAs(kAnonymous, id, conf, force, session)) {
        LOG_ERROR("Failed to mount %s/%s", id.c_str(), uri_path_.c_str());
        return false;
    }
    account_ = kAnonymous;
    return true;
}

bool VFSServer::Unmount(unsigned int uid, VFS_CONFIG_MODE) {
    std::string id;
    if (!GetServerID(id)) {
        LOG_ERROR("Failed to get server ID");
        return Fail(VFS_ERR_INVALID_SERVER);
    }
    if (!UnmountServer(uid, id, uri_path_.c_str())) {
        LOG_ERROR("Unmount failed, id: %s", id.c_str());
        return false;
    }
    return true;
}

bool VFSServer::DeletePostProcess(unsigned int uid, VFS_CONFIG_MODE mode) {
    // Also where no lock was taken: a release that finds nothing held does nothing.
    const ScopeExit unlock([] { Utils::UnLockMnt(); });
    std::string id;
    if (!GetServerID(id)) {
        LOG_ERROR("Failed to get server ID");
        return Fail(VFS_ERR_INVALID_SERVER);
    }
    if (mode != VFS_CONFIG_CONNECT) {
        return true;
    }
    if (!Utils::LockMnt(true)) {
        LOG_ERROR("Fail to lock mnt");
        return false;
    }
    ForgetHostKey(uid, id);
    ForgetCertificate(uid, id);
    return true;
}

}  // namespace ZYROVFS::Server
