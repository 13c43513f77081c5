/** A running transfer is a task of its user: who takes a connection down ends it. */
#ifndef ZYROVFS_WEB_TRANSFER_NOTE_H
#define ZYROVFS_WEB_TRANSFER_NOTE_H

#include <zyrovfs/transfer_task.h>

#include <string>
#include <vector>

#include "identity.h"

namespace web {

/** Tasks are kept by root. */
class TransferNote {
  public:
    TransferNote(const User& user, const std::vector<std::string>& connections) {
        const AsRoot root;
        task_ = std::make_unique<tool::TransferTask>(user.uid, connections);
    }
    TransferNote(const TransferNote&) = delete;
    TransferNote& operator=(const TransferNote&) = delete;
    ~TransferNote() {
        const AsRoot root;
        task_.reset();
    }

  private:
    std::unique_ptr<tool::TransferTask> task_;
};

}  // namespace web

#endif
