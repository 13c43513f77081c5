#include "copy.h"

#include <zyrovfs/error.h>

#include <optional>

#include "failure.h"
#include "name.h"
#include "stop.h"
#include "walk.h"

namespace web {

using namespace ZYROVFS;
using ZYROCloud::Cloud;

namespace {

/** The engine tells of its progress to plain functions; one copy in a process. */
JobRecord* shown = nullptr;
unsigned long long moved_before = 0;

int ShowMoved(unsigned long long, unsigned long long done) {
    __atomic_store_n(&shown->moved, moved_before + done, __ATOMIC_RELAXED);
    return 0;
}

/** Another file would only meet these again. */
bool ConcernsAll(__tag_vfs_err_ code) {
    return code == VFS_ERR_CANCELLED || code == VFS_ERR_QUOTA_EXCEEDED ||
           code == VFS_ERR_NO_SPACE || code == VFS_ERR_UNAUTHORIZED ||
           code == VFS_ERR_TOKEN_REVOKED;
}

void StopIfAsked() {
    if (StopWatch::IsAsked() != 0) {
        throw FailureOf("The copy was stopped", VFS_ERR_CANCELLED);
    }
}

class Copy {
  public:
    Copy(const CopyPlan& plan, JobRecord& record)
        : plan_(plan),
          record_(record),
          target_(plan.to.Files()),
          from_(plan.from.Driver()),
          to_(plan.to.Driver()) {}

    void Run() {
        for (const Item& item : Count()) {
            StopIfAsked();
            if (!IsBelowFailed(item)) {
                Try(item);
            }
        }
        if (first_) {
            throw *first_;
        }
    }

  private:
    std::vector<Item> Count() {
        record_.counting = 1;
        std::vector<Item> items =
            Walk(*plan_.from.Files(), plan_.paths, kMostItems, [this](const Item& item) {
                StopIfAsked();
                if (!item.folder) {
                    record_.items += 1;
                    record_.bytes += item.size < 0 ? 0 : static_cast<uint64_t>(item.size);
                }
            });
        record_.counting = 0;
        return items;
    }

    void Try(const Item& item) {
        try {
            item.folder ? MakeFolder(item) : Move(item);
        } catch (const Failure& failure) {
            if (ConcernsAll(failure.Code())) {
                throw;
            }
            if (!first_) {
                first_ = failure;
            }
            if (item.folder) {
                failed_ = item.below + "/";
            }
        }
    }

    /** Folders come before what is in them, and all that follows a folder until then is in it. */
    bool IsBelowFailed(const Item& item) const {
        return !failed_.empty() && item.below.compare(0, failed_.size(), failed_) == 0;
    }

    std::string Target(const Item& item) const {
        return item.below.empty() ? plan_.folder
                                  : (plan_.folder == "/" ? "" : plan_.folder) + "/" + item.below;
    }

    /** A folder that is there already takes in what comes. */
    void MakeFolder(const Item& item) {
        if (item.below.empty()) {
            return;
        }
        try {
            target_->MakeFolder(Target(item));
        } catch (const Failure& failure) {
            if (failure.Status() != 409 || !target_->Look(Target(item)).folder) {
                throw;
            }
        }
    }

    void Move(const Item& item) {
        moved_before = record_.moved;
        from_->SetError(VFS_ERR_NONE, "");
        to_->SetError(VFS_ERR_NONE, "");
        const std::string source = plan_.from.Uri(item.path);
        long long size = item.size;
        const bool fits = (size >= 0 || from_->GetFileSize(source, &size)) &&
                          to_->CanFileUpload(static_cast<unsigned long long>(size));
        if (fits) {
            plan_.to.CheckUpload(*to_, Target(item), size);
        }
        if (!fits || !Cloud::CopyFile(from_.get(), to_.get(), source, plan_.to.Uri(Target(item)),
                                      size, ShowMoved, StopWatch::IsAsked, nullptr)) {
            const bool at_source = from_->GetErrorCode() != VFS_ERR_NONE;
            StopIfAsked();
            throw FailureOf("\"" + item.below + "\" was not copied",
                            (at_source ? from_ : to_)->GetErrorCode());
        }
        record_.moved = moved_before + static_cast<uint64_t>(size);
        record_.files += 1;
    }

    const CopyPlan& plan_;
    JobRecord& record_;
    std::unique_ptr<Tree> target_;
    std::unique_ptr<Cloud> from_;
    std::unique_ptr<Cloud> to_;
    std::string failed_;
    std::optional<Failure> first_;
};

}  // namespace

void RunCopy(const CopyPlan& plan, Job& job) {
    shown = &job.Record();
    Copy(plan, job.Record()).Run();
}

}  // namespace web
