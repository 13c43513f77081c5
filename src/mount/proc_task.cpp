#include <unistd.h>
#include <zosplatform/process.h>
#include <zosplatform/task.h>
#include <zosplatform/user.h>

#include <cerrno>
#include <climits>
#include <csignal>
#include <cstring>
#include <memory>
#include <vector>

#include "core/handle.h"
#include "core/json.h"
#include "core/log.h"
#include "core/no_throw.h"
#include "mount/proc.h"
#include "zyrovfs/utils.h"

namespace ZYROVFS::Utils {
namespace {

bool MovesFilesOf(const ZOS::Task& task, const char* uri) {
    const Json::Value data = task.getProperty("data");
    if (!data.isObject()) {
        return false;
    }
    const Json::Value& is_vfs = data["is_vfs"];
    const Json::Value& uris = data["vfs_uri"];
    return is_vfs.isBool() && is_vfs.asBool() && uris.isObject() && uris.isMember(uri);
}

/** 0 when the task tells no process that lives. */
pid_t LivingPid(const ZOS::Task& task) {
    int64_t pid = 0;
    if (!json::toInt64(task.getProperty("pid"), pid) || pid < 1 || pid > INT_MAX) {
        return 0;
    }
    return YLIBCProcAlive(static_cast<pid_t>(pid)) == 1 ? static_cast<pid_t>(pid) : 0;
}

/** Whether the pid still belongs to the program of the task, as far as that can be told. */
bool IsProcOfTask(pid_t pid, const ZOS::Task& task) {
    const std::unique_ptr<_tag_YLIBCPROC_, FreeWith<YLIBCProcFree>> proc(YLIBCProcGetByPid(pid));
    if (proc == nullptr) {
        LOG_ERROR("YLIBCProcGetByPid failed, pid=%d, " ZYROERR_FORMAT, pid, ZYROERR_ARGS);
        return true;
    }
    const Json::Value expected = task.getProperty("proc_name");
    if (expected.isNull()) {
        return true;
    }
    // The kernel cuts names short and a program may carry its version behind a dot.
    const std::string name(proc->name, strcspn(proc->name, "."));
    return expected.isString() && strncmp(name.c_str(), expected.asCString(), name.size()) == 0;
}

std::vector<pid_t> KillTasks(const ZOS::TaskMgr& tasks, const char* uri) {
    std::vector<pid_t> killed;
    for (const std::string& id : tasks.getAllTaskId()) {
        const std::unique_ptr<ZOS::Task> task = tasks.getTask(id);
        if (task == nullptr || !MovesFilesOf(*task, uri)) {
            continue;
        }
        const pid_t pid = LivingPid(*task);
        if (pid == 0 || !IsProcOfTask(pid, *task)) {
            continue;
        }
        if (kill(pid, SIGTERM) == 0) {
            killed.push_back(pid);
        } else {
            LOG_ERROR("Failed to kill process(%d), error=%s(%d)", pid, strerror(errno), errno);
        }
    }
    return killed;
}

}  // namespace

bool KillProcByUsername(const char* uri, const char* user) {
    constexpr int kPolls = 6;
    if (uri == nullptr || user == nullptr) {
        return Fail(VFS_ERR_BAD_PARAM);
    }
    return NoThrow(VFS_ERR_FAILED, [uri, user] {
        const std::unique_ptr<ZOS::TaskMgr> tasks(new (std::nothrow) ZOS::TaskMgr(user));
        if (tasks == nullptr) {
            return Fail(VFS_ERR_FAILED);
        }
        for (const pid_t pid : KillTasks(*tasks, uri)) {
            WaitForEnd(pid, kPolls);
        }
        return true;
    });
}

bool KillProcByUID(const char* uri, unsigned int uid) {
    PZYROUSER found = nullptr;
    if (ZYROUserGetByUID(uid, &found) != 0) {
        LOG_ERROR("ZYROUserGetByUID failed, uid=%u, " ZYROERR_FORMAT, uid, ZYROERR_ARGS);
        return false;
    }
    const std::unique_ptr<_tag_ZYROUSER_, FreeWith<ZYROUserFree>> user(found);
    if (!KillProcByUsername(uri, user->name)) {
        LOG_ERROR("KIllVFSProcByUsername failed, username=%s", user->name);
        return false;
    }
    return true;
}

}  // namespace ZYROVFS::Utils
