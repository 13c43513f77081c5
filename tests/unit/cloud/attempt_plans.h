/**
 * The plan of each kind of transfer that goes through the attempt loop, as drivers make it, with
 * every step noted.
 */
#ifndef ZYROVFS_TESTS_ATTEMPT_PLANS_H
#define ZYROVFS_TESTS_ATTEMPT_PLANS_H

#include <deque>
#include <string>
#include <vector>

#include "cloud/attempt.h"
#include "support/scripted_cloud.h"

namespace ZYROCloud {

using namespace ZYROVFS;  // NOLINT(google-build-using-namespace)
using Texts = std::vector<std::string>;

/** One transfer under way: a plan as a driver makes it, and what came of it. */
struct Transfer {
    explicit Transfer(std::deque<Outcome> script) : cloud(std::move(script)) {
        plan.judge = [](__tag_vfs_err_) { return NextStep::GiveUp(); };
        plan.retry = "Retry";
        plan.refused = kRequestFailed;
        plan.exhausted = kRequestFailed;
        plan.what = &url;
    }

    bool Note(const std::string& event, bool result = true) {
        events.push_back(event);
        return result;
    }
    void SendBy(bool (ScriptedCloud::*send)()) {
        plan.send = [this, send] { return Note("send") && (cloud.*send)(); };
    }
    void Rewind() {
        plan.rewind = [this] { return Note("rewind", can_seek); };
    }
    bool Renew() { return Note("renew", renews); }
    bool Go(SourceLine at = SourceLine::Here()) { return RunAttempts(cloud, plan, at); }

    ScriptedCloud cloud;
    XferContext context;
    std::string url = "http://x/y";
    AttemptPlan plan;
    Texts events;
    bool renews = true, can_seek = true;
};

inline void BoxUpload(Transfer& run) {
    run.SendBy(&ScriptedCloud::Process);
    run.plan.judge = [&run](__tag_vfs_err_ code) {
        if (code == VFS_ERR_UNAUTHORIZED) {
            run.Renew();
            return NextStep::End();
        }
        return JudgeUpload(run.cloud, run.context);
    };
    run.Rewind();
}

inline void DropboxDirect(Transfer& run) {
    run.SendBy(&ScriptedCloud::Process);
    run.plan.judge = [&run](__tag_vfs_err_) { return JudgeUpload(run.cloud, run.context); };
    run.plan.refused = "Directly upload failed and do not retry";
    run.Rewind();
}

/** Google and OneDrive: a refused token is renewed, and the transfer goes on. */
inline NextStep RenewAndGoOn(Transfer& run, __tag_vfs_err_ code, bool cured = false) {
    const bool refused = code == VFS_ERR_UNAUTHORIZED;
    if (refused && !run.Renew()) {
        return NextStep::End();
    }
    return JudgeUpload(run.cloud, run.context, refused || cured);
}

inline void GoogleDirect(Transfer& run) {
    run.SendBy(&ScriptedCloud::Process);
    run.plan.judge = [&run](__tag_vfs_err_ code) { return RenewAndGoOn(run, code); };
    run.plan.refused = nullptr;
    run.Rewind();
}

inline void GoogleResumable(Transfer& run) {
    run.SendBy(&ScriptedCloud::Request);
    run.plan.prepare = [&run] { return run.Note("ask"); };
    run.plan.judge = [&run](__tag_vfs_err_ code) { return RenewAndGoOn(run, code); };
    run.plan.copy = CopyError::kAtEnd;
    run.plan.refused = nullptr;
}

inline void DropboxChunk(Transfer& run) {
    run.SendBy(&ScriptedCloud::Request);
    run.plan.judge = [&run](__tag_vfs_err_ code) {
        return JudgeUpload(run.cloud, run.context, code == VFS_ERR_RANGE_FAILED);
    };
    run.plan.copy = CopyError::kAtEnd;
    run.Rewind();
}

inline void OneDriveFragment(Transfer& run) {
    run.SendBy(&ScriptedCloud::Request);
    run.plan.judge = [&run](__tag_vfs_err_ code) {
        return RenewAndGoOn(run, code, code == VFS_ERR_RANGE_FAILED);
    };
    run.plan.copy = CopyError::kAtEnd;
    run.Rewind();
}

inline void BoxDownload(Transfer& run) {
    run.SendBy(&ScriptedCloud::Request);
    run.plan.judge = [&run](__tag_vfs_err_) { return JudgeDownload(run.cloud, run.context); };
    run.plan.copy = CopyError::kAfterCancelTest;
}

inline void GoogleDownload(Transfer& run) {
    BoxDownload(run);
    run.plan.judge = [&run](__tag_vfs_err_ code) {
        const NextStep next = JudgeDownload(run.cloud, run.context);
        if (next.kind == NextStep::kRetry && code == VFS_ERR_FORBIDDEN) {
            run.Note("clean");
            run.url = "http://x/fresh";
        }
        return next;
    };
}

inline void DropboxDownload(Transfer& run) {
    run.SendBy(&ScriptedCloud::Process);
    run.plan.prepare = [&run] { return run.Note("build"); };
    run.plan.copy = CopyError::kAfterCancelTest;
    run.plan.first_number = 1;
    run.plan.judge = [&run](__tag_vfs_err_ code) {
        if (code == VFS_ERR_NOT_FOUND) {
            return run.Note("look") ? NextStep::RetryAfter(10) : NextStep::End();
        }
        return JudgeDownload(run.cloud, run.context);
    };
}

inline void OneDriveSize(Transfer& run) {
    run.SendBy(&ScriptedCloud::Request);
    run.plan.cancel_test_after = false;
    run.plan.judge = [&run](__tag_vfs_err_) { return NextStep::RetryIf(run.cloud.IsNeedRetry()); };
}

inline void GenericDownload(Transfer& run) {
    run.SendBy(&ScriptedCloud::Process);
    run.plan.copy = CopyError::kAtEnd;
    run.plan.judge = [&run](__tag_vfs_err_) { return JudgeDownload(run.cloud, run.context); };
}

inline constexpr Outcome kDone{VFS_ERR_NONE, false, 0};
inline constexpr Outcome kBusy{VFS_ERR_SERVER_ERROR, true, 5};
inline constexpr Outcome kLost{VFS_ERR_TIMEOUT, true, 3};
inline constexpr Outcome kFull{VFS_ERR_QUOTA_EXCEEDED, false, 3};
inline constexpr Outcome kToken{VFS_ERR_UNAUTHORIZED, false, 3};
inline constexpr Outcome kStopped{VFS_ERR_CANCELLED, false, 3};
inline constexpr Outcome kStoppedYetRetryable{VFS_ERR_CANCELLED, true, 3};
inline constexpr Outcome kGone{VFS_ERR_NOT_FOUND, false, 3};
inline constexpr Outcome kWrongPlace{VFS_ERR_RANGE_FAILED, false, 3};
inline constexpr Outcome kForbidden{VFS_ERR_FORBIDDEN, true, 5};

}  // namespace ZYROCloud

#endif
