/** Hands declared faults to requests and counts which of them really took place. */
#ifndef ZYROVFS_TESTS_CLOUDSIM_FAULT_PLAN_H
#define ZYROVFS_TESTS_CLOUDSIM_FAULT_PLAN_H

#include <list>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

#include "support/cloudsim/fault.h"

namespace cloudsim {

class FaultPlan {
    struct Row {
        Fault fault;
        int seen = 0;   ///< requests that fit
        int taken = 0;  ///< requests that got it
        int done = 0;   ///< requests at which all of it took place
    };

  public:
    /** A fault bound to one request. */
    class Use {
      public:
        Use(FaultPlan& plan, std::shared_ptr<Row> row);
        const Fault& operator*() const { return fault_; }
        const Fault* operator->() const { return &fault_; }

        enum Effect {
            kAnswer = 1,
            kDelay = 2,
            kRate = 4,
            kUploadRate = 8,
            kCut = 16,
            kCutUpload = 32,
            kClose = 64,
            kRange = 128,
            kToken = 256,
            kPause = 512,
            kPauseUpload = 1024,
            kShortUpload = 2048
        };
        /** This part of the fault takes place now; when it is the last one, the fault is used. */
        void Happens(Effect effect);

      private:
        FaultPlan& plan_;
        std::shared_ptr<Row> row_;
        const Fault fault_;
        int missing_;
    };

    void Add(const Fault& fault);
    void Clear();
    std::vector<std::string> Unused() const;
    /** The fault of this request, or null. The first declared of those that are due. */
    std::unique_ptr<Use> Take(const std::string& method, const std::string& target,
                              const std::string& host);

  private:
    mutable std::mutex mutex_;
    std::list<std::shared_ptr<Row>> rows_;
};

}  // namespace cloudsim

#endif
