#include "support/cloudsim/fault_plan.h"

#include <algorithm>

namespace cloudsim {
namespace {

bool Fits(const Fault& fault, const std::string& method, const std::string& target,
          const std::string& host) {
    if ((fault.method != "*" && fault.method != method) ||
        (!fault.host.empty() && fault.host != host)) {
        return false;
    }
    if (fault.path[0] == '*') {
        return target.find(fault.path.substr(1)) != std::string::npos;
    }
    return target.compare(0, fault.path.size(), fault.path) == 0;
}

bool ChangesAnswer(const Fault& fault) {
    return fault.status != 0 || fault.body || fault.raw || !fault.headers.empty() ||
           !fault.header_lines.empty() || fault.close_after_answer;
}

int Effects(const Fault& fault) {
    using Use = FaultPlan::Use;
    return (ChangesAnswer(fault) && fault.close == Break::kNone ? Use::kAnswer : 0) |
           (fault.delay > 0 ? Use::kDelay : 0) | (fault.answer_rate != 0 ? Use::kRate : 0) |
           (fault.upload_rate != 0 ? Use::kUploadRate : 0) | (fault.cut_answer ? Use::kCut : 0) |
           (fault.cut_upload ? Use::kCutUpload : 0) |
           (fault.close != Break::kNone ? Use::kClose : 0) |
           (fault.range != RangeFault::kNone ? Use::kRange : 0) |
           (fault.pause_answer ? Use::kPause : 0) | (fault.pause_upload ? Use::kPauseUpload : 0) |
           (fault.short_upload ? Use::kShortUpload : 0) | (fault.expire_token ? Use::kToken : 0);
}

}  // namespace

FaultPlan::Use::Use(FaultPlan& plan, std::shared_ptr<Row> row)
    : plan_(plan), row_(std::move(row)), fault_(row_->fault), missing_(Effects(fault_)) {}

void FaultPlan::Use::Happens(Effect effect) {
    if ((missing_ & effect) == 0) {
        return;
    }
    missing_ &= ~effect;
    if (missing_ == 0) {
        const std::lock_guard<std::mutex> lock(plan_.mutex_);
        row_->done++;
    }
}

void FaultPlan::Add(const Fault& fault) {
    auto row = std::make_shared<Row>();
    row->fault = fault;
    const std::lock_guard<std::mutex> lock(mutex_);
    rows_.push_back(std::move(row));
}

void FaultPlan::Clear() {
    const std::lock_guard<std::mutex> lock(mutex_);
    rows_.clear();
}

std::vector<std::string> FaultPlan::Unused() const {
    std::vector<std::string> unused;
    const std::lock_guard<std::mutex> lock(mutex_);
    for (const auto& row : rows_) {
        const int wanted = row->fault.times == Fault::kForever ? 1 : row->fault.times;
        if (row->done < wanted) {
            unused.push_back(row->fault.Text() + ": " + std::to_string(row->done) + " of " +
                             std::to_string(wanted));
        }
    }
    return unused;
}

std::unique_ptr<FaultPlan::Use> FaultPlan::Take(const std::string& method,
                                                const std::string& target,
                                                const std::string& host) {
    const std::lock_guard<std::mutex> lock(mutex_);
    std::shared_ptr<Row> due;
    for (const auto& row : rows_) {
        if (!Fits(row->fault, method, target, host)) {
            continue;
        }
        row->seen++;
        if (due == nullptr && row->seen > row->fault.after && row->taken < row->fault.times) {
            due = row;
        }
    }
    if (due == nullptr) {
        return nullptr;
    }
    due->taken++;
    return std::make_unique<Use>(*this, due);
}

}  // namespace cloudsim
