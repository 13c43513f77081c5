#include "mount/run_as_user.h"

#include <fcntl.h>
#include <sys/socket.h>
#include <unistd.h>

#include <cerrno>
#include <utility>

#include "core/error_cell.h"
#include "core/handle.h"
#include "core/json.h"
#include "core/log.h"
#include "mount/helper_path.h"
#include "mount/lock.h"
#include "mount/program.h"
#include "mount/user_environment.h"

namespace ZYROVFS {
namespace {

/** The helper reads up to the NUL: an end of file could be long in coming, when another thread's
 * child has the socket open too. */
void Send(int socket, const std::string& request) {
    size_t sent = 0;
    while (sent <= request.size()) {
        const ssize_t n =
            send(socket, request.c_str() + sent, request.size() + 1 - sent, MSG_NOSIGNAL);
        if (n >= 0) {
            sent += static_cast<size_t>(n);
        } else if (errno != EINTR) {
            return;  // a helper that has ended is told by how it ended
        }
    }
}

/** A caller that ignores its children, or collects them all, has taken the status from here; what
 * the helper said last is still in the socket. */
ChildEnd Collect(pid_t pid, int socket) {
    const ChildEnd end = WaitForChild(pid);
    if (end.how != ChildEnd::kNotFound) {
        return end;
    }
    unsigned char status = 0;
    if (recv(socket, &status, sizeof status, MSG_DONTWAIT) == sizeof status) {
        return {ChildEnd::kExited, status};
    }
    return {ChildEnd::kSignalled, -1};
}

/** What every job is told, beside its own. */
void AddContext(Json::Value& request, uid_t uid, const HeldLock& lock) {
    request["uid"] = uid;
    request["caller"] = getpid();
    request["log_as"] = program_invocation_short_name;
    request["code"] = GetError();
    if (lock.fd >= 0) {
        request["lock_count"] = lock.count;
        request["lock_operation"] = lock.operation;
    }
}

/** Both ends of what a helper talks through. */
struct Ends {
    UniqueFd ours;
    UniqueFd helpers;

    bool OpenSocket() {
        int ends[2];
        return socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends) == 0 && Take(ends);
    }
    bool OpenPipe() {
        int ends[2];
        return pipe2(ends, O_CLOEXEC) == 0 && Take(ends);
    }

  private:
    bool Take(const int (&ends)[2]) {
        ours.Reset(ends[0]);
        helpers.Reset(ends[1]);
        return true;
    }
};

pid_t StartHelper(const char* job, uid_t uid, const Ends& talk, const Ends& report,
                  const HeldLock& lock, SourceLine at) {
    const std::string path = HelperPath();
    if (path.empty()) {
        LOG_ERROR_AT(at, "Failed to find the helper program, %m");
        SetErr(VFS_ERR_FAILED, at);
        return -1;
    }
    Program helper{
        {path, job}, UserEnvironment(uid), {talk.helpers.Get(), report.helpers.Get(), -1}};
    if (lock.fd >= 0) {
        helper.descriptors.push_back(lock.fd);
    }
    const pid_t pid = StartChild(helper);
    if (pid < 0) {
        LOG_ERROR_AT(at, "Failed to run %s, %m", path.c_str());
    }
    return pid;
}

}  // namespace

HelperRun RunAsUser(const char* job, uid_t uid, Json::Value request, std::string (*read)(int pipe),
                    SourceLine at) {
    Ends talk;
    Ends report;
    if ((read != nullptr && !report.OpenPipe()) || !talk.OpenSocket()) {
        LOG_ERROR_AT(at, "Failed to create pipe");
        return {};
    }
    const HeldLock lock = HeldMountLock();
    const pid_t pid = StartHelper(job, uid, talk, report, lock, at);
    talk.helpers.Reset();
    report.helpers.Reset();
    if (pid < 0) {
        return {HelperRun::kNotStarted, {}, {}};
    }
    AddContext(request, uid, lock);
    Send(talk.ours.Get(), json::toString(request));
    HelperRun run{HelperRun::kEnded, {}, {}};
    if (read != nullptr) {
        run.report = read(report.ours.Get());
        report.ours.Reset();
    }
    run.end = Collect(pid, talk.ours.Get());
    return run;
}

}  // namespace ZYROVFS
