#include "transfer_task.h"

#include <json/value.h>
#include <unistd.h>
#include <zosplatform/user.h>

#include <cerrno>

namespace tool {

TransferTask::TransferTask(unsigned int uid, const std::vector<std::string>& uris) {
    PZYROUSER user = nullptr;
    if (uris.empty() || ZYROUserGetByUID(uid, &user) < 0) {
        return;
    }
    Json::Value properties;
    properties["pid"] = getpid();
    properties["proc_name"] = program_invocation_short_name;
    properties["data"]["is_vfs"] = true;
    for (const std::string& uri : uris) {
        properties["data"]["vfs_uri"][uri] = true;
    }
    task_ = ZOS::TaskMgr(user->name).createTask(properties);
    ZYROUserFree(user);
}

TransferTask::~TransferTask() {
    if (task_) {
        task_->remove();
    }
}

}  // namespace tool
