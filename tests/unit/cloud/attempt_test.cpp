// Every kind of transfer that goes through the loop: outcomes in; events, waits and lines out.
#include "cloud/attempt.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <sys/mman.h>

#include <deque>
#include <functional>

#include "core/handle.h"
#include "support/scripted_cloud.h"
#include "support/seams.h"

namespace ZYROCloud {
namespace {

using namespace ZYROVFS;
using testing::ElementsAre;
using testing::ElementsAreArray;
using testing::IsEmpty;

using Texts = std::vector<std::string>;
using Seconds = std::vector<unsigned>;

/** One transfer under way: a plan as a driver makes it, and what came of it. */
struct Run {
    explicit Run(std::deque<Outcome> script) : cloud(std::move(script)) {
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
    bool Go() { return RunAttempts(cloud, plan); }

    ScriptedCloud cloud;
    XferContext context;
    std::string url = "http://x/y";
    AttemptPlan plan;
    Texts events;
    bool renews = true, can_seek = true;
};

void BoxUpload(Run& run) {
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

void DropboxDirect(Run& run) {
    run.SendBy(&ScriptedCloud::Process);
    run.plan.judge = [&run](__tag_vfs_err_) { return JudgeUpload(run.cloud, run.context); };
    run.plan.refused = "Directly upload failed and do not retry";
    run.Rewind();
}

/** Google and OneDrive: a refused token is renewed, and the transfer goes on. */
NextStep RenewAndGoOn(Run& run, __tag_vfs_err_ code, bool cured = false) {
    const bool refused = code == VFS_ERR_UNAUTHORIZED;
    if (refused && !run.Renew()) {
        return NextStep::End();
    }
    return JudgeUpload(run.cloud, run.context, refused || cured);
}

void GoogleDirect(Run& run) {
    run.SendBy(&ScriptedCloud::Process);
    run.plan.judge = [&run](__tag_vfs_err_ code) { return RenewAndGoOn(run, code); };
    run.plan.refused = nullptr;
    run.Rewind();
}

void GoogleResumable(Run& run) {
    run.SendBy(&ScriptedCloud::Request);
    run.plan.prepare = [&run] { return run.Note("ask offset, seek"); };
    run.plan.judge = [&run](__tag_vfs_err_ code) { return RenewAndGoOn(run, code); };
    run.plan.copy = CopyError::kAtEnd;
    run.plan.refused = nullptr;
}

void DropboxChunk(Run& run) {
    run.SendBy(&ScriptedCloud::Request);
    run.plan.judge = [&run](__tag_vfs_err_ code) {
        return JudgeUpload(run.cloud, run.context, code == VFS_ERR_RANGE_FAILED);
    };
    run.plan.copy = CopyError::kAtEnd;
    run.Rewind();
}

void OneDriveFragment(Run& run) {
    run.SendBy(&ScriptedCloud::Request);
    run.plan.judge = [&run](__tag_vfs_err_ code) {
        return RenewAndGoOn(run, code, code == VFS_ERR_RANGE_FAILED);
    };
    run.plan.copy = CopyError::kAtEnd;
    run.Rewind();
}

void BoxDownload(Run& run) {
    run.SendBy(&ScriptedCloud::Request);
    run.plan.judge = [&run](__tag_vfs_err_) { return JudgeDownload(run.cloud, run.context); };
    run.plan.copy = CopyError::kAfterCancelTest;
}

void GoogleDownload(Run& run) {
    BoxDownload(run);
    run.plan.judge = [&run](__tag_vfs_err_ code) {
        const NextStep next = JudgeDownload(run.cloud, run.context);
        if (next.kind == NextStep::kRetry && code == VFS_ERR_FORBIDDEN) {
            run.Note("clean cache");
            run.url = "http://x/fresh";
        }
        return next;
    };
}

void DropboxDownload(Run& run) {
    run.SendBy(&ScriptedCloud::Process);
    run.plan.prepare = [&run] { return run.Note("whole request"); };
    run.plan.copy = CopyError::kAfterCancelTest;
    run.plan.first_number = 1;
    run.plan.judge = [&run](__tag_vfs_err_ code) {
        if (code == VFS_ERR_NOT_FOUND) {
            return run.Note("look") ? NextStep::RetryAfter(10) : NextStep::End();
        }
        return JudgeDownload(run.cloud, run.context);
    };
}

void OneDriveSize(Run& run) {
    run.SendBy(&ScriptedCloud::Request);
    run.plan.cancel_test_after = false;
    run.plan.judge = [&run](__tag_vfs_err_) { return NextStep::RetryIf(run.cloud.IsNeedRetry()); };
}

void GenericDownload(Run& run) {
    run.SendBy(&ScriptedCloud::Process);
    run.plan.copy = CopyError::kAtEnd;
    run.plan.judge = [&run](__tag_vfs_err_) { return JudgeDownload(run.cloud, run.context); };
}

/** What is special about the transfer in this row. */
enum Case { kFile, kStream, kBytesWritten, kTokenLost, kNoSeek };

struct Row {
    std::string name;
    void (*transfer)(Run&);
    Case special;
    std::deque<Outcome> script;
    bool ok;
    __tag_vfs_err_ code;
    Texts events;
    Seconds sleeps;
    size_t lines;
};

constexpr Outcome kDone{VFS_ERR_NONE, false, 0};
constexpr Outcome kBusy{VFS_ERR_SERVER_ERROR, true, 5};
constexpr Outcome kLost{VFS_ERR_TIMEOUT, true, 3};
constexpr Outcome kFull{VFS_ERR_QUOTA_EXCEEDED, false, 3};
constexpr Outcome kToken{VFS_ERR_UNAUTHORIZED, false, 3};
constexpr Outcome kStopped{VFS_ERR_CANCELLED, false, 3};
constexpr Outcome kGone{VFS_ERR_NOT_FOUND, false, 3};
constexpr Outcome kWrongPlace{VFS_ERR_RANGE_FAILED, false, 3};
constexpr Outcome kForbidden{VFS_ERR_FORBIDDEN, true, 5};

const std::vector<Row>& Rows() {
    static const std::vector<Row> rows = {
        // Lines: one for each retry, one for giving up or running out.
        {"Box upload, at once", BoxUpload, kFile, {kDone}, true, VFS_ERR_NONE, {"send"}, {}, 0},
        {"Box upload, third time",
         BoxUpload,
         kFile,
         {kBusy, kLost, kDone},
         true,
         VFS_ERR_TIMEOUT,
         {"send", "rewind", "send", "rewind", "send"},
         {5, 3},
         2},
        {"Box upload, refused",
         BoxUpload,
         kFile,
         {kFull},
         false,
         VFS_ERR_QUOTA_EXCEEDED,
         {"send"},
         {},
         1},
        {"Box upload, stream",
         BoxUpload,
         kStream,
         {kBusy},
         false,
         VFS_ERR_SERVER_ERROR,
         {"send"},
         {},
         1},
        {"Box upload, token",
         BoxUpload,
         kFile,
         {kToken, kDone},
         false,
         VFS_ERR_UNAUTHORIZED,
         {"send", "renew"},
         {},
         0},
        {"Box upload, cancel",
         BoxUpload,
         kFile,
         {kStopped},
         false,
         VFS_ERR_CANCELLED,
         {"send"},
         {},
         0},
        {"Box upload, no seek",
         BoxUpload,
         kNoSeek,
         {kBusy},
         false,
         VFS_ERR_SERVER_ERROR,
         {"send", "rewind"},
         {},
         0},
        {"Box upload, never",
         BoxUpload,
         kFile,
         {kBusy, kBusy, kBusy, kBusy, kBusy, kBusy, kDone},
         false,
         VFS_ERR_SERVER_ERROR,
         {"send", "rewind", "send", "rewind", "send", "rewind", "send", "rewind", "send", "rewind",
          "send", "rewind"},
         {5, 5, 5, 5, 5, 5},
         7},

        {"Dropbox direct, token",
         DropboxDirect,
         kFile,
         {kToken, kDone},
         false,
         VFS_ERR_UNAUTHORIZED,
         {"send"},
         {},
         1},
        {"Dropbox direct, again",
         DropboxDirect,
         kFile,
         {kBusy, kDone},
         true,
         VFS_ERR_SERVER_ERROR,
         {"send", "rewind", "send"},
         {5},
         1},

        {"Google direct, token",
         GoogleDirect,
         kFile,
         {kToken, kToken, kDone},
         true,
         VFS_ERR_UNAUTHORIZED,
         {"send", "renew", "rewind", "send", "renew", "rewind", "send"},
         {3, 3},
         2},
        {"Google direct, token lost",
         GoogleDirect,
         kTokenLost,
         {kToken, kDone},
         false,
         VFS_ERR_UNAUTHORIZED,
         {"send", "renew"},
         {},
         0},
        {"Google direct, stream and token",
         GoogleDirect,
         kStream,
         {kToken, kDone},
         false,
         VFS_ERR_UNAUTHORIZED,
         {"send", "renew"},
         {},
         0},
        {"Google direct, refused",
         GoogleDirect,
         kFile,
         {kFull},
         false,
         VFS_ERR_QUOTA_EXCEEDED,
         {"send"},
         {},
         0},

        {"Google resumable, asks each time",
         GoogleResumable,
         kFile,
         {kBusy, kToken, kDone},
         true,
         VFS_ERR_UNAUTHORIZED,
         {"ask offset, seek", "send", "ask offset, seek", "send", "renew", "ask offset, seek",
          "send"},
         {5, 3},
         2},
        {"Google resumable, stream",
         GoogleResumable,
         kStream,
         {kBusy},
         false,
         VFS_ERR_SERVER_ERROR,
         {"ask offset, seek", "send"},
         {},
         0},

        {"Dropbox chunk, wrong place",
         DropboxChunk,
         kFile,
         {kWrongPlace, kDone},
         true,
         VFS_ERR_RANGE_FAILED,
         {"send", "rewind", "send"},
         {3},
         1},
        {"Dropbox chunk, wrong place of a stream",
         DropboxChunk,
         kStream,
         {kWrongPlace},
         false,
         VFS_ERR_RANGE_FAILED,
         {"send"},
         {},
         1},
        {"Dropbox chunk, token",
         DropboxChunk,
         kFile,
         {kToken},
         false,
         VFS_ERR_UNAUTHORIZED,
         {"send"},
         {},
         1},
        {"OneDrive fragment, token and place",
         OneDriveFragment,
         kFile,
         {kToken, kWrongPlace, kDone},
         true,
         VFS_ERR_RANGE_FAILED,
         {"send", "renew", "rewind", "send", "rewind", "send"},
         {3, 3},
         2},

        {"Box download, again",
         BoxDownload,
         kFile,
         {kBusy, kLost, kDone},
         true,
         VFS_ERR_TIMEOUT,
         {"send", "send", "send"},
         {5, 3},
         2},
        {"Box download, bytes written",
         BoxDownload,
         kBytesWritten,
         {kBusy, kDone},
         false,
         VFS_ERR_SERVER_ERROR,
         {"send"},
         {},
         1},
        {"Box download, cancel",
         BoxDownload,
         kFile,
         {kStopped, kDone},
         false,
         VFS_ERR_CANCELLED,
         {"send"},
         {},
         0},
        {"Box download, never",
         BoxDownload,
         kStream,
         {kBusy, kBusy, kBusy, kBusy, kBusy, kBusy, kDone},
         false,
         VFS_ERR_SERVER_ERROR,
         {"send", "send", "send", "send", "send", "send"},
         {5, 5, 5, 5, 5, 5},
         7},
        {"Google download, fresh link",
         GoogleDownload,
         kFile,
         {kForbidden, kDone},
         true,
         VFS_ERR_FORBIDDEN,
         {"send", "clean cache", "send"},
         {5},
         1},
        {"Google download, bytes written",
         GoogleDownload,
         kBytesWritten,
         {kForbidden},
         false,
         VFS_ERR_FORBIDDEN,
         {"send"},
         {},
         1},
        {"Dropbox download, not there yet",
         DropboxDownload,
         kFile,
         {kGone, kGone, kDone},
         true,
         VFS_ERR_NOT_FOUND,
         {"whole request", "send", "look", "whole request", "send", "look", "whole request",
          "send"},
         {10, 10},
         2},
        {"OneDrive size, refused",
         OneDriveSize,
         kFile,
         {kFull},
         false,
         VFS_ERR_QUOTA_EXCEEDED,
         {"send"},
         {},
         1},
        {"OneDrive size, a cancel ends it at the next look",
         OneDriveSize,
         kFile,
         {{VFS_ERR_CANCELLED, true, 3}, kDone},
         false,
         VFS_ERR_CANCELLED,
         {"send"},
         {3},
         1},
        {"Generic download, again",
         GenericDownload,
         kFile,
         {kLost, kDone},
         true,
         VFS_ERR_NONE,
         {"send", "send"},
         {3},
         1},
        {"Generic download, refused",
         GenericDownload,
         kFile,
         {kLost, kFull},
         false,
         VFS_ERR_QUOTA_EXCEEDED,
         {"send", "send"},
         {3},
         2},
        {"Generic download, never",
         GenericDownload,
         kFile,
         {kLost, kLost, kLost, kLost, kLost, kLost, kDone},
         false,
         VFS_ERR_TIMEOUT,
         {"send", "send", "send", "send", "send", "send"},
         {3, 3, 3, 3, 3, 3},
         7},
    };
    return rows;
}

class Attempts : public testing::Test {
  protected:
    void SetUp() override { seams::Reset(); }
};

TEST_F(Attempts, EveryRowOfTheTable) {
    for (const Row& row : Rows()) {
        SCOPED_TRACE(row.name);
        seams::Reset();
        Run run(row.script);
        run.context.fd = row.special == kStream ? -1 : 7;
        run.context.can_retry = row.special != kBytesWritten;
        run.renews = row.special != kTokenLost;
        run.can_seek = row.special != kNoSeek;
        row.transfer(run);
        EXPECT_EQ(run.Go(), row.ok);
        EXPECT_EQ(run.cloud.GetErrorCode(), row.code);
        EXPECT_THAT(run.events, ElementsAreArray(row.events));
        EXPECT_THAT(seams::Sleeps(), ElementsAreArray(row.sleeps));
        EXPECT_EQ(seams::LogLines().size(), row.lines) << seams::LogDump();
    }
}

TEST_F(Attempts, EveryTransferIsCancelledBeforeItsFirstRequest) {
    for (const Row& row : Rows()) {
        SCOPED_TRACE(row.name);
        Run run(row.script);
        row.transfer(run);
        run.cloud.SetError(VFS_ERR_CANCELLED, "");
        EXPECT_FALSE(run.Go());
        EXPECT_THAT(run.events, IsEmpty());
        EXPECT_EQ(run.cloud.GetErrorCode(), VFS_ERR_CANCELLED);
    }
}

TEST_F(Attempts, TheErrorIsCopiedBeforeOrBehindTheTestForACancel) {
    // The handler alone knows of the cancel: it shows only where its record is copied first.
    Run before({kStopped, kDone});
    BoxUpload(before);
    before.plan.judge = [&](__tag_vfs_err_) { return NextStep::Retry(); };
    EXPECT_FALSE(before.Go());
    EXPECT_THAT(before.events, ElementsAre("send"));

    Run behind({kStopped, kDone});
    BoxUpload(behind);
    behind.plan.copy = CopyError::kAfterCancelTest;
    __tag_vfs_err_ judged = VFS_ERR_NONE;
    behind.plan.judge = [&](__tag_vfs_err_ code) {
        judged = code;
        return NextStep::GiveUp();
    };
    EXPECT_FALSE(behind.Go());
    EXPECT_EQ(judged, VFS_ERR_CANCELLED);
    EXPECT_EQ(seams::LogLines().size(), 1U);

    Run at_end({kBusy, kFull});
    GenericDownload(at_end);
    at_end.plan.judge = [&](__tag_vfs_err_ code) {
        EXPECT_EQ(code, VFS_ERR_NONE);
        return JudgeDownload(at_end.cloud, at_end.context);
    };
    EXPECT_FALSE(at_end.Go());
    EXPECT_EQ(at_end.cloud.GetErrorCode(), VFS_ERR_QUOTA_EXCEEDED);

    Run never({kFull});
    GenericDownload(never);
    never.plan.copy = CopyError::kNever;
    EXPECT_FALSE(never.Go());
    EXPECT_EQ(never.cloud.GetErrorCode(), VFS_ERR_NONE);
}

TEST_F(Attempts, LinesNameTheCallersUnitTheAttemptAndTheLimit) {
    Run run({kBusy, kFull});
    BoxUpload(run);
    run.context.fd = 7;
    run.plan.retry = "Retry directly upload";
    run.plan.refused = "Failed to process  %s, err: %s";
    EXPECT_FALSE(run.Go());
    const auto lines = seams::LogLines();
    ASSERT_EQ(lines.size(), 2U);
    EXPECT_THAT(lines[0].text,
                testing::MatchesRegex("attempt_test.cpp:[0-9]+ Retry directly upload: 0/6"));
    EXPECT_THAT(lines[1].text, testing::HasSubstr(" Failed to process  http://x/y, err: {"));
    EXPECT_THAT(lines[1].text, testing::HasSubstr(R"("code":34)"));
    EXPECT_EQ(lines[1].priority & 7, 3);
}

TEST_F(Attempts, AServiceMayCountItsAttemptsFromOne) {
    Run run({kLost, kDone});
    DropboxDownload(run);
    run.plan.retry = "Retry Download";
    EXPECT_TRUE(run.Go());
    EXPECT_TRUE(seams::Logged("Retry Download: 1/6")) << seams::LogDump();
}

TEST_F(Attempts, TheLineNamesTheAddressOfThatMoment) {
    Run run({kForbidden, kFull});
    GoogleDownload(run);
    EXPECT_FALSE(run.Go());
    EXPECT_TRUE(seams::LoggedPart("Failed to process curl http://x/fresh, err:"))
        << seams::LogDump();
}

TEST_F(Attempts, WhatCannotBePreparedIsNotSent) {
    Run run({kDone});
    GoogleResumable(run);
    run.plan.prepare = [&] { return run.Note("ask", false); };
    EXPECT_FALSE(run.Go());
    EXPECT_THAT(run.events, ElementsAre("ask"));
    EXPECT_THAT(seams::LogLines(), IsEmpty());
}

TEST_F(Attempts, ASourceThatCannotSeekIsLogged) {
    int ends[2];
    ASSERT_EQ(pipe(ends), 0);
    const UniqueFd in(ends[0]);
    const UniqueFd out(ends[1]);
    EXPECT_FALSE(SeekSource(in.Get(), 0, "Failed to seek file to back to zero position, %m"));
    EXPECT_TRUE(seams::Logged("Failed to seek file to back to zero position, Illegal seek"))
        << seams::LogDump();
}

TEST_F(Attempts, ASourceIsSoughtBeyondFourGiB) {
    const UniqueFd file(memfd_create("source", 0));
    EXPECT_TRUE(SeekSource(file.Get(), 5368709121, "%m"));
    EXPECT_EQ(lseek64(file.Get(), 0, SEEK_CUR), 5368709121);
}

TEST_F(Attempts, PiecesOfAnUploadEndWithTheRest) {
    struct {
        unsigned long long total;
        std::vector<unsigned long long> pieces;
    } rows[] = {{0, {}}, {1, {1}}, {10, {10}}, {11, {10, 1}}, {30, {10, 10, 10}}};
    for (const auto& row : rows) {
        std::vector<unsigned long long> pieces;
        bool finished = false;
        EXPECT_TRUE(ForEachChunk(
            row.total, 10,
            [&](unsigned long long length) {
                pieces.push_back(length);
                return true;
            },
            [&] { return finished = true; }));
        EXPECT_THAT(pieces, ElementsAreArray(row.pieces)) << row.total;
        EXPECT_TRUE(finished);
    }
    int sent = 0;
    EXPECT_FALSE(ForEachChunk(
        30, 10, [&](unsigned long long) { return ++sent < 2; },
        []() -> bool {
            ADD_FAILURE();
            return true;
        }));
    EXPECT_EQ(sent, 2);
}

}  // namespace
}  // namespace ZYROCloud
