/** A transfer of this program as a task of its user, so that an unmount ends it. */
#ifndef ZYROVFS_TOOLS_TRANSFER_TASK_H
#define ZYROVFS_TOOLS_TRANSFER_TASK_H

#include <zosplatform/task.h>

#include <memory>
#include <string>
#include <vector>

namespace tool {

class TransferTask {
  public:
    /** `uris` are the server ids that the transfer uses; without any there is no task. A task that
     * cannot be written keeps nobody from the work. */
    TransferTask(unsigned int uid, const std::vector<std::string>& uris);
    TransferTask(const TransferTask&) = delete;
    TransferTask& operator=(const TransferTask&) = delete;
    ~TransferTask();

  private:
    std::unique_ptr<ZOS::Task> task_;
};

}  // namespace tool

#endif
