#include "cloud/attempt.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <sys/mman.h>

#include "core/handle.h"
#include "support/bare_driver.h"
#include "support/seams.h"
#include "unit/cloud/attempt_plans.h"

namespace ZYROCloud {
namespace {

using testing::ElementsAre;
using testing::ElementsAreArray;
using testing::IsEmpty;

class Attempts : public testing::Test {
  protected:
    void SetUp() override { seams::Reset(); }
};

TEST_F(Attempts, TheErrorIsCopiedBeforeOrBehindTheTestForACancel) {
    // The handler alone knows of the cancel: it shows only where its record is copied first.
    Transfer before({kStopped, kDone});
    BoxUpload(before);
    before.plan.judge = [&](__tag_vfs_err_) { return NextStep::Retry(); };
    EXPECT_FALSE(before.Go());
    EXPECT_THAT(before.events, ElementsAre("send"));

    Transfer behind({kStopped, kDone});
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

    Transfer at_end({kBusy, kFull});
    GenericDownload(at_end);
    at_end.plan.judge = [&](__tag_vfs_err_ code) {
        EXPECT_EQ(code, VFS_ERR_NONE);
        return JudgeDownload(at_end.cloud, at_end.context);
    };
    EXPECT_FALSE(at_end.Go());
    EXPECT_EQ(at_end.cloud.GetErrorCode(), VFS_ERR_QUOTA_EXCEEDED);

    Transfer never({kFull});
    GenericDownload(never);
    never.plan.copy = CopyError::kNever;
    EXPECT_FALSE(never.Go());
    EXPECT_EQ(never.cloud.GetErrorCode(), VFS_ERR_CLOUD_FAILED) << "a failure has a code";
}

TEST_F(Attempts, ASuccessLeavesTheRecordAsItWasBefore) {
    Transfer again({kBusy, kDone});
    again.context.fd = 7;
    BoxUpload(again);
    again.cloud.SetError(VFS_ERR_NOT_FOUND, "before");
    EXPECT_TRUE(again.Go());
    EXPECT_EQ(again.cloud.GetErrorCode(), VFS_ERR_NOT_FOUND);
    EXPECT_EQ(again.cloud.GetError()["msg"], "before");
}

class TokenlessDriver : public bare::Driver<PublicCloud> {
  public:
    bool SetRefreshTokenParam(APIHandler*) override { return false; }
};

TEST_F(Attempts, ATokenThatCannotBeRenewedEndsThemAndAnotherFailureIsJudgedAsAlways) {
    TokenlessDriver drive;
    XferContext context;
    context.fd = 0;
    EXPECT_EQ(JudgeRenewing(drive, context, VFS_ERR_UNAUTHORIZED).kind, NextStep::kEnd);
    EXPECT_EQ(JudgeRenewing(drive, context, VFS_ERR_FORBIDDEN).kind, NextStep::kGiveUp);
    EXPECT_EQ(JudgeRenewing(drive, context, VFS_ERR_RANGE_FAILED, true).kind, NextStep::kRetry);
    context.fd = -1;
    EXPECT_EQ(JudgeRenewing(drive, context, VFS_ERR_RANGE_FAILED, true).kind, NextStep::kGiveUp);
}

TEST_F(Attempts, LinesNameTheCallersUnitTheAttemptAndTheLimit) {
    Transfer run({kBusy, kFull});
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
    Transfer run({kLost, kDone});
    DropboxDownload(run);
    run.plan.retry = "Retry Download";
    EXPECT_TRUE(run.Go());
    EXPECT_TRUE(seams::Logged("Retry Download: 1/6")) << seams::LogDump();
}

TEST_F(Attempts, TheLineNamesTheAddressOfThatMoment) {
    Transfer run({kForbidden, kFull});
    GoogleDownload(run);
    EXPECT_FALSE(run.Go());
    EXPECT_TRUE(seams::LoggedPart("Failed to process curl http://x/fresh, err:"))
        << seams::LogDump();
}

TEST_F(Attempts, WhatCannotBePreparedIsNotSent) {
    Transfer run({kDone});
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
    EXPECT_FALSE(SeekSource(in.Get(), 0, 0, "Failed to seek file to back to zero position, %m"));
    EXPECT_TRUE(seams::Logged("Failed to seek file to back to zero position, Illegal seek"))
        << seams::LogDump();
}

TEST_F(Attempts, ASourceIsSoughtBeyondFourGiB) {
    const UniqueFd file(memfd_create("source", 0));
    EXPECT_TRUE(SeekSource(file.Get(), 7, 5368709121, "%m"));
    EXPECT_EQ(lseek64(file.Get(), 0, SEEK_CUR), 5368709128);
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

TEST_F(Attempts, ARequestBetweenTheAttemptsDoesNotHideTheFailure) {
    // The handler's record is that of the look in the end, and the look went well.
    Transfer run({});
    DropboxDownload(run);
    run.plan.send = [&] { return run.Note("send") && run.cloud.Meet(kGone); };
    run.plan.judge = [&](__tag_vfs_err_) {
        return run.cloud.Meet(kDone) ? NextStep::RetryAfter(10) : NextStep::End();
    };
    EXPECT_FALSE(run.Go());
    EXPECT_EQ(run.cloud.GetErrorCode(), VFS_ERR_NOT_FOUND);
    EXPECT_EQ(seams::Sleeps().size(), 6U);
}

}  // namespace
}  // namespace ZYROCloud
