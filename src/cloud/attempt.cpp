#include "cloud/attempt.h"

#include <unistd.h>

#include "cloud/guard.h"
#include "core/json.h"
#include "core/log.h"
#include "core/loggable_url.h"
#include "http/api_handler.h"

namespace ZYROCloud {

using namespace ZYROVFS;

namespace {

class Attempts {
  public:
    Attempts(Cloud& cloud, const AttemptPlan& plan, SourceLine at)
        : cloud_(cloud), plan_(plan), at_(at) {}

    bool Run() {
        for (int number = 0; number < kMostAttempts; ++number) {
            if (IsCancelled() || (plan_.prepare && !plan_.prepare())) {
                return false;
            }
            if (plan_.send()) {
                return true;
            }
            if (!IsRetried(number)) {
                return false;
            }
        }
        // Copied before, it stays: requests between the attempts have made a record of their own.
        Copy(plan_.copy == CopyError::kAtEnd);
        Log(plan_.exhausted);
        return false;
    }

  private:
    bool IsCancelled() const { return cloud_.GetErrorCode() == VFS_ERR_CANCELLED; }

    bool IsRetried(int number) {
        Copy(plan_.copy == CopyError::kBeforeCancelTest);
        if (plan_.cancel_test_after && IsCancelled()) {
            return false;
        }
        Copy(plan_.copy == CopyError::kAfterCancelTest);
        const NextStep next = plan_.judge(cloud_.GetErrorCode());
        if (next.kind != NextStep::kRetry) {
            if (next.kind == NextStep::kGiveUp) {
                Copy(plan_.copy == CopyError::kAtEnd);
                Log(plan_.refused);
            }
            return false;
        }
        if (plan_.rewind && !plan_.rewind()) {
            return false;
        }
        LOG_ERROR_AT(at_, "%s: %d/%d", plan_.retry, plan_.first_number + number, kMostAttempts);
        sleep(next.seconds < 0 ? cloud_.GetRetrySleepTime() : static_cast<unsigned>(next.seconds));
        return true;
    }

    void Copy(bool wanted) {
        APIHandler* api = cloud_.GetAPIHandler();
        if (wanted && api != nullptr) {
            cloud_.SetError(api->GetError());
        }
    }

    void Log(const char* format) const {
        if (format != nullptr) {
            LOG_ERROR_AT(at_, format, plan_.what != nullptr ? LoggableUrl(*plan_.what).c_str() : "",
                         json::toString(cloud_.GetError()).c_str());
        }
    }

    Cloud& cloud_;
    const AttemptPlan& plan_;
    const SourceLine at_;
};

}  // namespace

bool RunAttempts(Cloud& cloud, const AttemptPlan& plan, SourceLine at) {
    const Json::Value before = cloud.GetError();
    const bool done = Attempts(cloud, plan, at).Run();
    if (!done && cloud.GetErrorCode() == VFS_ERR_NONE) {
        cloud.SetError(plan.unexplained, "");
    }
    return Conclude(cloud, done, before);
}

NextStep JudgeUpload(Cloud& cloud, const XferContext& context, bool cured) {
    return NextStep::RetryIf(context.fd != -1 && (cured || cloud.IsNeedRetry()));
}

NextStep JudgeRenewing(PublicCloud& cloud, const XferContext& context, __tag_vfs_err_ code,
                       bool cured) {
    const bool refused = code == VFS_ERR_UNAUTHORIZED;
    if (refused && !cloud.RefreshToken(true)) {
        return NextStep::End();
    }
    return JudgeUpload(cloud, context, cured || refused);
}

NextStep JudgeDownload(Cloud& cloud, const XferContext& context) {
    return NextStep::RetryIf(context.can_retry && cloud.IsNeedRetry());
}

AttemptPlan DownloadPlan(Cloud& cloud, const XferData& xfer, const std::string& url) {
    AttemptPlan plan;
    plan.judge = [&cloud, &xfer](__tag_vfs_err_) {
        return xfer.context == nullptr ? NextStep::GiveUp() : JudgeDownload(cloud, *xfer.context);
    };
    plan.retry = "Retry Download";
    plan.refused = kRequestFailed;
    plan.exhausted = kRequestFailed;
    plan.what = &url;
    return plan;
}

off64_t SourceBegin(const XferContext& context, unsigned long long sent) {
    const off64_t position = context.fd == -1 ? -1 : lseek64(context.fd, 0, SEEK_CUR);
    return std::max<off64_t>(0, position - static_cast<off64_t>(sent));
}

bool SeekSource(int fd, off64_t begin, off64_t offset, const char* text, SourceLine at) {
    if (lseek64(fd, begin + offset, SEEK_SET) >= 0) {
        return true;
    }
    LOG_ERROR_AT(at, text, static_cast<unsigned long long>(offset));
    return false;
}

bool SetRange(Cloud& cloud, const Json::Value& meta) {
    uint64_t from = 0;
    uint64_t length = 0;
    json::toUInt64(meta["from_bytes"], from);
    json::toUInt64(meta["len"], length);
    if (length == 0) {
        return true;
    }
    APIHandler* api = cloud.GetAPIHandler();
    return api != nullptr &&
           api->SetRange(std::to_string(from) + "-" + std::to_string(from + length));
}

}  // namespace ZYROCloud
