#include "mount/helper.h"

#include <sys/prctl.h>
#include <sys/socket.h>
#include <syslog.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>

#include "core/error_cell.h"
#include "core/json.h"
#include "mount/fork_as_user.h"
#include "mount/lock.h"

namespace ZYROVFS {
namespace {

constexpr int kSocket = STDIN_FILENO;
constexpr int kLockFile = STDERR_FILENO + 1;

/** Who started this helper. */
pid_t caller = 0;

/** The log's name for this process: the C library keeps the pointer. */
std::string log_name;

/** Up to the NUL behind it. */
bool ReceiveRequest(std::string& text) {
    char buffer[4096];
    for (;;) {
        const ssize_t n = read(kSocket, buffer, sizeof buffer);
        if (n > 0) {
            text.append(buffer, static_cast<size_t>(n));
            if (buffer[n - 1] == '\0') {
                text.pop_back();
                return true;
            }
        } else if (n == 0 || errno != EINTR) {
            return false;
        }
    }
}

/** A caller that is gone already leaves no signal behind. */
void EndWithCaller() {
    prctl(PR_SET_PDEATHSIG, SIGKILL);
    if (getppid() != caller) {
        _exit(VFS_ERR_FAILED);
    }
}

void TakeContext(const Json::Value& request) {
    caller = request["caller"].asInt();
    EndWithCaller();
    log_name = request["log_as"].asString();
    openlog(log_name.c_str(), 0, LOG_USER);
    SetErr(static_cast<__tag_vfs_err_>(request["code"].asInt()));
    if (request.isMember("lock_count")) {
        AdoptMountLock(
            {kLockFile, request["lock_count"].asInt(), request["lock_operation"].asInt()});
    }
}

}  // namespace

void RunHelperJob(const HelperJob& job) noexcept {
    signal(SIGPIPE, SIG_IGN);
    std::string text;
    Json::Value request;
    if (ReceiveRequest(text) && json::fromString(request, text) && request.isObject()) {
        TakeContext(request);
        job.run(request);
    }
    EndHelper(VFS_ERR_FAILED);
}

void EndHelper(int status) {
    const auto byte = static_cast<unsigned char>(status);
    // Whoever collects the status from the system has no need of this one.
    static_cast<void>(!send(kSocket, &byte, sizeof byte, MSG_NOSIGNAL | MSG_DONTWAIT));
    _exit(byte);
}

uid_t UserOf(const Json::Value& request) {
    return request["uid"].asUInt();
}

bool BecomeUserInHelper(uid_t uid, SourceLine at) {
    const bool become = BecomeUserForGood(uid, at);
    EndWithCaller();
    return become;
}

}  // namespace ZYROVFS
