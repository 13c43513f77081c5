/** The user's cancel, at every stage of a transfer. */
#include "support/driver_suite.h"
#include "support/seams.h"

namespace driver_suite {
namespace {

bool Always() {
    return true;
}

}  // namespace

TEST_P(DriverCancel, BeforeAnUpload) {
    User::wants_to_stop = Always;
    EXPECT_FALSE(Upload("hello", "/up.txt"));
    EXPECT_EQ(Code(), VFS_ERR_CANCELLED) << seams::LogDump();
    EXPECT_FALSE(amy.Exists("/up.txt"));
    EXPECT_EQ(User::asked, 1);
}

TEST_P(DriverCancel, StaysOnTheDriverAndKeepsTheNextUploadFromBeingSent) {
    cloud->SetError(VFS_ERR_CANCELLED, "");
    EXPECT_FALSE(Upload("hello", "/up.txt"));
    EXPECT_EQ(Code(), VFS_ERR_CANCELLED);
    EXPECT_EQ(Count(Op::kUpload), 0U);
    cloud->SetError(VFS_ERR_CANCELLED, "");
    EXPECT_FALSE(Download("/docs/a.txt", 10));
    EXPECT_EQ(Code(), VFS_ERR_CANCELLED);
    EXPECT_EQ(Count(Op::kDownload), 0U);
}

TEST_P(DriverCancel, AfterTheFirstPieceOfAnUpload) {
    User::wants_to_stop = [] { return User::asked > 1; };
    Source source(4 * kMiB);
    EXPECT_FALSE(Upload(source, "/up.bin"));
    EXPECT_EQ(Code(), VFS_ERR_CANCELLED) << seams::LogDump();
    EXPECT_GT(User::done, 0U);
    EXPECT_LT(User::done, 4U * kMiB);
    EXPECT_THAT(seams::Sleeps(), testing::IsEmpty());
    EXPECT_FALSE(amy.Exists("/up.bin"));
}

TEST_P(DriverCancel, BetweenTwoAttemptsOfAnUpload) {
    Add(On(Op::kUpload).Answer(503));
    bool waiting = false;
    seams::OnSleep([&] { waiting = true; });
    User::wants_to_stop = [&] { return waiting; };
    EXPECT_FALSE(Upload("hello", "/up.txt"));
    EXPECT_EQ(Code(), VFS_ERR_CANCELLED) << seams::LogDump();
    EXPECT_LE(Count(Op::kUpload), 2U);
    EXPECT_FALSE(amy.Exists("/up.txt"));
}

TEST_P(DriverCancel, BehindTheFirstChunkOfAnUpload) {
    if (can.largest_direct == 0) {
        GTEST_SKIP() << "no chunks";
    }
    // Far from the end: where no chunks are sent, pieces end where libcurl's buffer does.
    constexpr unsigned long long kSize = kChunk + 4 * kMiB;
    User::wants_to_stop = [] { return User::done >= static_cast<unsigned long long>(kChunk); };
    Source source(kSize);
    EXPECT_FALSE(Upload(source, "/up.bin"));
    EXPECT_EQ(Code(), VFS_ERR_CANCELLED) << seams::LogDump();
    EXPECT_GE(User::done, static_cast<unsigned long long>(kChunk));
    EXPECT_LT(User::done, kSize);
    EXPECT_FALSE(amy.Exists("/up.bin"));
}

TEST_P(DriverCancel, BeforeTheFirstByteOfADownload) {
    User::wants_to_stop = Always;
    EXPECT_FALSE(Download("/docs/a.txt", 10));
    EXPECT_EQ(Code(), VFS_ERR_CANCELLED) << seams::LogDump();
    EXPECT_EQ(received.Text(), "");
    EXPECT_EQ(Count(Op::kDownload), 1U);
}

TEST_P(DriverCancel, AfterTheFirstPieceOfADownload) {
    amy.AddPattern(amy.Find("/target"), "big", 4 * kMiB);
    Show("/target/big");
    User::wants_to_stop = [] { return User::asked > 1; };
    EXPECT_FALSE(Download("/target/big", 4 * kMiB));
    EXPECT_EQ(Code(), VFS_ERR_CANCELLED) << seams::LogDump();
    EXPECT_GT(User::done, 0U);
    EXPECT_LT(User::done, 4U * kMiB);
    EXPECT_THAT(seams::Sleeps(), testing::IsEmpty());
}

TEST_P(DriverCancel, BetweenTwoAttemptsOfADownload) {
    Add(On(Op::kDownload).Answer(503));
    bool waiting = false;
    seams::OnSleep([&] { waiting = true; });
    User::wants_to_stop = [&] { return waiting; };
    EXPECT_FALSE(Download("/docs/a.txt", 10));
    EXPECT_EQ(Code(), VFS_ERR_CANCELLED) << seams::LogDump();
    EXPECT_EQ(received.Text(), "");
    EXPECT_EQ(Count(Op::kDownload), 2U);
}

}  // namespace driver_suite
