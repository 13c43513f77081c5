#include <unistd.h>
#include <zosplatform/process.h>

#include <cerrno>
#include <cstring>
#include <string>

#include "core/error_cell.h"
#include "core/handle.h"
#include "core/identity.h"
#include "core/json.h"
#include "core/log.h"
#include "core/no_throw.h"
#include "core/paths.h"
#include "mount/helper.h"
#include "mount/known_hosts.h"
#include "mount/mount_child.h"
#include "mount/run_as_user.h"
#include "zyrovfs/global.h"
#include "zyrovfs/server.h"
#include "zyrovfs/utils.h"

namespace ZYROVFS {
namespace {

constexpr size_t kReportSize = 4095;

bool Contains(const std::string& text, const char* part) {
    return text.find(part) != std::string::npos;
}

void RemoveHostKey(const std::string& uri, uid_t actor) {
    const std::string known_hosts = paths::KnownHosts(actor);
    std::string host;
    if (!HasKnownHosts(actor) || !Server::GetSFTPHost(uri.c_str(), host)) {
        return;
    }
    if (YLIBCExec(paths::kSshKeygen, "-R", host.c_str(), "-f", known_hosts.c_str(),
                  static_cast<char*>(nullptr)) != 0) {
        LOG_ERROR("Failed to rmove ssh key %s, errno=%X, %m", host.c_str(), errno);
    }
}

/** Force means that the user accepts a server whose key has changed. The file is the user's. */
void ForgetHostKey(const std::string& uri) {
    const uid_t actor = GetActorUID();
    IF_RUN_AS(actor, 0) {
        RemoveHostKey(uri, actor);
    }
    else {
        LOG_ERROR("Failed to change to uid %u", actor);
    }
}

/** Read once: the child writes its whole report at once, or dies without one. */
std::string ReadReport(int pipe) {
    char buffer[kReportSize + 1];
    ssize_t length;
    do {
        length = read(pipe, buffer, kReportSize);
    } while (length < 0 && errno == EINTR);
    buffer[length < 0 ? 0 : length] = '\0';
    return buffer;
}

/** "host<TAB>fingerprint"; without a tab the one text stands for both. */
Json::Value IdentityDetail(std::string report) {
    Json::Value detail(Json::objectValue);
    char* rest = nullptr;
    if (const char* host = strtok_r(report.data(), "\t", &rest)) {
        detail["host"] = host;
        detail["fingerprint"] = host;
    }
    if (const char* fingerprint = strtok_r(nullptr, "\t", &rest)) {
        detail["fingerprint"] = fingerprint;
    }
    return detail;
}

/** The parent learns where in the location the backend has mounted. */
void TakePath(VFS& session, const std::string& report) {
    Json::Value value;
    if (!json::fromString(value, report) || !value.isObject()) {
        return;
    }
    const Json::Value path = value.get("uri_path", "");
    if (path.isString()) {
        session.SetPath(path.asCString(), nullptr);
    }
}

bool Judge(VFS& session, const HelperRun& run) {
    const int status = run.Result();
    if (status > 0) {
        SetErr(static_cast<__tag_vfs_err_>(status));
        if (status == VFS_ERR_IDENTITY_QUESTION && !run.report.empty()) {
            VFSSetJson(IdentityDetail(run.report));
        }
        return false;
    }
    TakePath(session, run.report);
    return status == 0;
}

bool MountLocked(VFS& session) {
    SigchldGuard collect;
    const HelperRun run =
        RunAsUser(kMountJob.name, GetActorUID(), DescribeSession(session), ReadReport);
    if (run.how == HelperRun::kNoPipe) {
        collect.Dismiss();
    }
    return run.how == HelperRun::kEnded && Judge(session, run);
}

bool MountSession(VFS& session) {
    const std::string uri = ReadableFullUri(session);
    if (Contains(uri, "davs://") &&
        !Utils::SSLVerifyPeer(session.GetUser().c_str(), session.GetPass().c_str(), uri.c_str(),
                              session.GetForce())) {
        LOG_ERROR("Failed to verify peer ssl CA");
        return false;
    }
    if (Contains(uri, "sftp://") && session.GetForce()) {
        ForgetHostKey(session.GetURI());
    }
    if (!Utils::LockMnt(true)) {
        LOG_ERROR("Fail to lock mnt");
        return false;
    }
    const ScopeExit unlock([] { Utils::UnLockMnt(); });
    return MountLocked(session);
}

}  // namespace

bool VFS::Mount() {
    return NoThrow(VFS_ERR_FAILED, [this] { return MountSession(*this); });
}

}  // namespace ZYROVFS
