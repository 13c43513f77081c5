#include "unit/cloud/gdrive/gdrive_upload_fixture.h"

namespace ZYROCloud {
namespace {

using testing::SizeIs;

// --- failures of the sending ---------------------------------------------------------------------

TEST_F(GDriveResumable, ThatFailsFirstAsksTheServiceForItsOffset) {
    service.AddFault(OnPut(1).ShortUpload(2 * kUnit + 5));
    EXPECT_TRUE(Upload()) << seams::LogDump();
    EXPECT_TRUE(Stored() == content);
    ASSERT_EQ(Puts(), 4U);
    EXPECT_EQ(Put(2).Header("Content-Range"), "bytes */*");
    const std::string rest = content.substr(2 * kUnit);
    EXPECT_EQ(Put(3).Header("Content-Range"), "bytes 524288-999999/1000000");
    EXPECT_EQ(Put(3).Header("Content-Length"), std::to_string(rest.size()));
    EXPECT_EQ(Put(3).body_sha1, Sha1(rest));
    EXPECT_TRUE(seams::Logged("The service has not got all of the file, status 308"))
        << seams::LogDump();
    EXPECT_TRUE(seams::Logged("Retry upload: 0/6"));
    EXPECT_THAT(seams::Sleeps(), ElementsAre(3));
}

TEST_F(GDriveResumable, RefusedForAWhileGoesOnFromWhatArrived) {
    for (const int status : {403, 500, 503}) {
        seams::Reset();
        service.Journal().Clear();
        service.AddFault(OnPut(1).Answer(status));
        const std::string path = "/" + std::to_string(status);
        EXPECT_TRUE(Upload(path)) << seams::LogDump();
        EXPECT_TRUE(Stored(path) == content);
        EXPECT_THAT(Requests(), ElementsAre(kOpen, kPiece, kPiece, kPiece, kPiece));
        EXPECT_THAT(seams::Sleeps(), ElementsAre(5, 5));
        EXPECT_TRUE(seams::LoggedPart("Failed to process curl " + Host() + kUploadPath));
        // Whoever has the session's address can write into the file.
        EXPECT_FALSE(seams::LoggedPart("upload_id")) << seams::LogDump();
    }
}

TEST_F(GDriveResumable, RefusedForGoodEndsThere) {
    const struct {
        int status;
        __tag_vfs_err_ code;
    } rows[] = {{400, VFS_ERR_TOKEN_REVOKED},
                {404, VFS_ERR_NOT_FOUND},
                {410, VFS_ERR_UNKNOWN},
                {413, VFS_ERR_UNKNOWN}};
    for (const auto& row : rows) {
        service.Journal().Clear();
        service.AddFault(OnPut(1).Answer(row.status));
        EXPECT_FALSE(Upload()) << row.status;
        EXPECT_EQ(drive->GetErrorCode(), row.code) << row.status;
        EXPECT_EQ(Puts(), 2U);
    }
    EXPECT_THAT(seams::Sleeps(), IsEmpty());
    EXPECT_FALSE(amy.Exists("/a.bin"));
}

TEST_F(GDriveResumable, IsTriedSixTimesInAll) {
    for (int attempt = 0; attempt < 6; ++attempt) {
        service.AddFault(OnPut(2 * attempt + 1).Answer(503));
    }
    EXPECT_FALSE(Upload());
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_SERVER_ERROR);
    EXPECT_EQ(Puts(), 12U);
    EXPECT_TRUE(seams::Logged("Retry upload: 5/6")) << seams::LogDump();
    EXPECT_TRUE(
        seams::LoggedPart("Retry times reach max times, " + Host() + kUploadPath + ", err: {"))
        << seams::LogDump();
}

TEST_F(GDriveResumable, StoredShortTimeAndAgainIsNoSuccess) {
    service.AddFault(Fault::On("PUT", kUploadPath).Times(12).Answer(308));
    EXPECT_FALSE(Upload());
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_RANGE_FAILED);
    EXPECT_EQ(Puts(), 12U);
    EXPECT_FALSE(amy.Exists("/a.bin"));
}

TEST_F(GDriveResumable, WhoseSessionIsGoneFails) {
    service.AddFault(OnPut(1).Answer(503));
    seams::OnSleep([this] { service.DropUploadSessions(); });
    EXPECT_FALSE(Upload());
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_NOT_FOUND);
    EXPECT_EQ(Puts(), 3U);
    EXPECT_TRUE(seams::Logged("Failed to get start bytes")) << seams::LogDump();
}

TEST_F(GDriveResumable, OnAKeptConnectionThatDiesInTheMiddleIsSentAgainOnANewOne) {
    service.AddFault(OnPut(1).CutUpload(300000).Reset());
    EXPECT_TRUE(Upload()) << seams::LogDump();
    EXPECT_TRUE(Stored() == content);
}

TEST_F(GDriveResumable, GoingOnOnAConnectionThatDiesSendsTheRestAgain) {
    service.AddFault(OnPut(1).ShortUpload(kUnit));
    service.AddFault(OnPut(3).CutUpload(300000).Reset());
    EXPECT_TRUE(Upload()) << seams::LogDump();
    EXPECT_TRUE(Stored() == content);
}

// --- answers that were lost ----------------------------------------------------------------------

TEST_F(GDriveResumable, WhoseLastAnswerWasLostIsDoneWhenTheServiceSaysSo) {
    service.AddFault(OnPut(1).Status(503));
    EXPECT_TRUE(Upload()) << seams::LogDump();
    EXPECT_TRUE(Stored() == content);
    // Nothing is sent a second time.
    EXPECT_THAT(Requests(), ElementsAre(kOpen, kPiece, kPiece, kPiece));
    EXPECT_THAT(amy.List(root), SizeIs(1));
}

TEST_F(GDriveResumable, WhoseLastAnswerDidNotComeLeavesOneWholeFile) {
    service.AddFault(OnPut(1).LoseAnswer());
    EXPECT_TRUE(Upload()) << seams::LogDump();
    EXPECT_TRUE(Stored() == content);
    EXPECT_THAT(amy.List(root), SizeIs(1));
}

TEST_F(GDriveResumable, IsNotBelievedToBeDoneBeforeAnythingWasSent) {
    service.AddFault(OnPut(0).Answer(200, R"({"id":"x","fileSize":"1000000"})"));
    EXPECT_TRUE(Upload()) << seams::LogDump();
    EXPECT_TRUE(Stored() == content);
}

TEST_F(GDriveResumable, IsSentAgainWhereTheServiceDoesNotSayThatThisFileIsDone) {
    for (const char* answer :
         {"", "{}", "[]", R"({"id":""})", R"({"id":7})", R"({"id":"x","fileSize":"999999"})"}) {
        service.Journal().Clear();
        service.AddFault(OnPut(1).Answer(503));
        service.AddFault(OnPut(2).Answer(200, answer));
        const std::string path = "/" + std::to_string(amy.List(root).size());
        EXPECT_TRUE(Upload(path)) << answer << seams::LogDump();
        EXPECT_TRUE(Stored(path) == content);
        EXPECT_EQ(Puts(), 4U) << answer;
    }
}

// --- where the service wants to go on ------------------------------------------------------------

TEST_F(GDriveResumable, GoesOnBehindTheLastByteThatArrived) {
    const struct {
        const char* range;
        size_t start;
    } rows[] = {{"bytes=0-0", 1},       {"bytes=0-41", 42},         {"0-41", 42},
                {"BYTES=0-41", 42},     {"bytes=0-524287", 524288}, {"bytes=0-999998", 999999},
                {"bytes=0-0000041", 42}};
    for (const auto& row : rows) {
        service.Journal().Clear();
        service.AddFault(OnPut(1).Answer(503));
        service.AddFault(Arrived(2, row.range));
        service.AddFault(OnPut(3).Answer(200, "{}"));
        EXPECT_TRUE(Upload()) << row.range << seams::LogDump();
        EXPECT_EQ(Put(3).Header("Content-Range"),
                  "bytes " + std::to_string(row.start) + "-999999/1000000")
            << row.range;
        EXPECT_EQ(Put(3).body_sha1, Sha1(content.substr(row.start))) << row.range;
    }
}

TEST_F(GDriveResumable, WithoutARangeBeginsAnewWithTheWholeFile) {
    service.AddFault(OnPut(1).ShortUpload(2 * kUnit));
    service.AddFault(OnPut(2).Answer(308));
    EXPECT_TRUE(Upload()) << seams::LogDump();
    EXPECT_TRUE(Stored() == content);
    EXPECT_FALSE(Put(3).HasHeader("Content-Range"));
    EXPECT_EQ(Put(3).body_sha1, Sha1(content));
}

TEST_F(GDriveResumable, GoesBackWhenTheServiceHasLostSomething) {
    service.AddFault(OnPut(1).Answer(503));
    service.AddFault(Arrived(2, "bytes=0-599999"));
    service.AddFault(OnPut(3).Answer(503));
    service.AddFault(Arrived(4, "bytes=0-99"));
    service.AddFault(OnPut(5).Answer(200, "{}"));
    EXPECT_TRUE(Upload()) << seams::LogDump();
    EXPECT_EQ(Put(5).Header("Content-Range"), "bytes 100-999999/1000000");
    EXPECT_EQ(Put(5).body_sha1, Sha1(content.substr(100)));
}

TEST_F(GDriveResumable, WhoseBytesHaveAllArrivedIsFinishedWithoutABody) {
    service.AddFault(OnPut(1).Answer(503));
    service.AddFault(Arrived(2, "bytes=0-999999"));
    service.AddFault(OnPut(3).Answer(200, "{}"));
    EXPECT_TRUE(Upload()) << seams::LogDump();
    EXPECT_EQ(Put(3).Header("Content-Range"), "bytes */1000000");
    EXPECT_EQ(Put(3).Header("Content-Length"), "0");
    EXPECT_EQ(Put(3).body_size, 0U);
}

TEST_F(GDriveResumable, WithARangeThatCannotBeReadSendsNothingMoreAndFailsWithALine) {
    for (const char* range :
         {"bytes=41-0", "bytes=5-41", "bytes=-41", "bytes=0-", "bytes=0", "bytes=", "42", "0",
          "bytes=0-x", "bytes=0-41x", "bytes=0--1", "bytes=0-41,50-60", "bytes 0-41/1000000",
          "bytes=0-18446744073709551615", "bytes=0-99999999999999999999", "items=0-41", "0x0-0x29",
          "bytes=0- 41", "\xff\xfe"}) {
        seams::Reset();
        service.Journal().Clear();
        drive->SetError(VFS_ERR_NONE, "");
        service.AddFault(OnPut(1).Answer(503));
        service.AddFault(Arrived(2, range));
        EXPECT_FALSE(Upload()) << range;
        EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CLOUD_FAILED) << range;
        EXPECT_EQ(Puts(), 3U) << range;
        EXPECT_TRUE(seams::Logged(std::string("Unknown range of an upload, ") + range))
            << seams::LogDump();
        EXPECT_TRUE(seams::Logged("Failed to get start bytes"));
    }
    EXPECT_FALSE(amy.Exists("/a.bin"));
}

TEST_F(GDriveResumable, WithARangeBeyondTheFileSendsNothingMoreAndFailsWithALine) {
    service.AddFault(OnPut(1).Answer(503));
    service.AddFault(Arrived(2, "bytes=0-1000000"));
    EXPECT_FALSE(Upload());
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CLOUD_FAILED);
    EXPECT_EQ(Puts(), 3U);
    EXPECT_TRUE(seams::Logged("The service has 1000001 of 1000000 bytes")) << seams::LogDump();
}

TEST_F(GDriveResumable, OffsetIsZeroForAQuestionThatFailed) {
    unsigned long long start = 77;
    EXPECT_FALSE(drive->GetResumableStartByte(Host() + kUploadPath + "?upload_id=x", &start));
    EXPECT_EQ(start, 0U);
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_NOT_FOUND);
    EXPECT_FALSE(drive->GetResumableStartByte(Host() + kUploadPath, nullptr));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CLOUD_FAILED);
}

TEST_F(GDriveResumable, RestThatBeginsBehindItsEndIsNotSent) {
    Bytes bytes(1, content);
    EXPECT_FALSE(drive->StartUpload(Host() + kUploadPath, &bytes.xfer, 11, 10));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CLOUD_FAILED);
    EXPECT_FALSE(drive->StartUpload(Host() + kUploadPath, &bytes.xfer, 1, ~0ULL));
    EXPECT_FALSE(drive->StartUpload(Host() + kUploadPath, nullptr, 0, 10));
    EXPECT_THAT(Requests(), IsEmpty());
}

}  // namespace
}  // namespace ZYROCloud
