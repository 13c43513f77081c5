// Sessions of fragments: a file of 40 MiB, in a fragment of 32 and one of 8.
#include "cloud/transfer.h"
#include "unit/cloud/onedrive/onedrive_fixture.h"

namespace ZYROCloud {
namespace {

constexpr long long kTotal = 40 * kMiB;
constexpr long long kFirst = 32 * kMiB;

std::string Has(long long bytes, int status = 200) {
    return Answer(status, "", "BITS-Received-Content-Range: " + std::to_string(bytes) + "\r\n");
}

class OneDriveBits : public OneDriveTest {
  protected:
    static void SetUpTestSuite() { file = PatternFile(kTotal, &content); }
    static void TearDownTestSuite() {
        file = UniqueFd();
        content.clear();
    }
    void SetUp() override {
        OneDriveTest::SetUp();
        lseek(file.Get(), 0, SEEK_SET);
    }

    bool Upload(long long size = kTotal, const std::string& path = "/docs/a b.bin") {
        return Cloud::UploadFile(drive.get(), kServerId + path, file.Get(), size, nullptr, nullptr,
                                 nullptr);
    }
    /** A session of one fragment of ten bytes. */
    bool UploadTen() {
        lseek(file.Get(), 0, SEEK_SET);
        XferContext context;
        context.fd = file.Get();
        XferData xfer{FileReadCallback, 1, &context};
        Json::Value meta;
        meta["url"] = Api("/storage");
        meta["total_bytes"] = "10";
        return drive->ChunkedUpload(&xfer, meta);
    }
    std::string Part(long long from, long long size) const {
        return content.substr(static_cast<size_t>(from), static_cast<size_t>(size));
    }
    std::vector<std::string> Packets() const { return Headers("BITS-Packet-Type"); }
    /** The ranges of all fragments. */
    std::vector<std::string> Ranges() const {
        std::vector<std::string> ranges = Headers("Content-Range");
        ranges.erase(std::remove(ranges.begin(), ranges.end(), "-"), ranges.end());
        return ranges;
    }
    bool IsPart(size_t request, long long from, long long size) const {
        return BodyOf(Request(request)) == Part(from, size);
    }

    const std::string opened = Answer(200, "", "BITS-Session-Id: {s-1}\r\n");
    const std::string ok = Answer(200);
    static inline UniqueFd file;
    static inline std::string content;
};

TEST_F(OneDriveBits, IsASessionWithTheStorageOfTheOwner) {
    Give({opened, Has(kFirst), Has(kTotal), ok});
    EXPECT_TRUE(Upload()) << seams::LogDump();
    EXPECT_THAT(Requests(),
                testing::Each(testing::Eq(
                    "BITS_POST /users/0xa1b2/LiveFolders/docs/a%20b.bin?pretty=false")));
    EXPECT_THAT(Packets(), ElementsAre("Create-Session", "Fragment", "Fragment", "Close-Session"));
    EXPECT_THAT(Headers("BITS-Session-Id"), ElementsAre("-", "{s-1}", "{s-1}", "{s-1}"));
    EXPECT_THAT(Headers("BITS-Supported-Protocols"),
                ElementsAre("7df0354d-249b-430f-820d-3d2a9bef4931", "-", "-", "-"));
    EXPECT_THAT(Headers("Content-Length"), ElementsAre("-", "33554432", "8388608", "0"));
    EXPECT_THAT(Headers("Transfer-Encoding"), testing::Each(testing::Eq("-")));
    EXPECT_THAT(Headers("Authorization"), testing::Each(testing::Eq("Bearer token-canary")));
    EXPECT_THAT(Headers("Host"), testing::Each(testing::StartsWith("cid-a1b2.localhost:")));
    EXPECT_TRUE(IsPart(1, 0, kFirst));
    EXPECT_TRUE(IsPart(2, kFirst, kTotal - kFirst));
}

TEST_F(OneDriveBits, TheRangeOfTheFirstFragmentOfFortyMiBEndsBeforeThirtyTwo) {
    Give({opened, Has(kFirst), Has(kTotal), ok});
    EXPECT_TRUE(Upload());
    EXPECT_THAT(Ranges(),
                ElementsAre("bytes 0-33554431/41943040", "bytes 33554432-41943039/41943040"));
}

TEST_F(OneDriveBits, AnExactMultipleEndsWithCloseSessionStraightAfterTheLastFragment) {
    const UniqueFd large = PatternFile(2 * kFirst);
    Give({opened, Has(kFirst), Has(2 * kFirst), ok});
    EXPECT_TRUE(Cloud::UploadFile(drive.get(), std::string(kServerId) + "/a", large.Get(),
                                  2 * kFirst, nullptr, nullptr, nullptr))
        << seams::LogDump();
    EXPECT_THAT(Packets(), ElementsAre("Create-Session", "Fragment", "Fragment", "Close-Session"));
    EXPECT_THAT(Ranges(),
                ElementsAre("bytes 0-33554431/67108864", "bytes 33554432-67108863/67108864"));
}

TEST_F(OneDriveBits, ASessionThatIsNotOpenedEndsThereWithTheServicesCode) {
    struct {
        int status;
        __tag_vfs_err_ code;
    } rows[] = {{400, VFS_ERR_TOKEN_REVOKED},  {403, VFS_ERR_FORBIDDEN},
                {404, VFS_ERR_NOT_FOUND},      {413, VFS_ERR_FILE_TOO_LARGE},
                {416, VFS_ERR_RANGE_FAILED},   {420, VFS_ERR_RATE_LIMITED},
                {500, VFS_ERR_SERVER_ERROR},   {503, VFS_ERR_SERVER_ERROR},
                {507, VFS_ERR_QUOTA_EXCEEDED}, {418, VFS_ERR_UNKNOWN}};
    for (const auto& row : rows) {
        seams::Reset();
        Give({Answer(row.status)});
        EXPECT_FALSE(Upload()) << row.status;
        EXPECT_EQ(drive->GetErrorCode(), row.code) << row.status;
        EXPECT_THAT(Requests(), SizeIs(1));
        EXPECT_TRUE(seams::LoggedPart("Failed to process curl http://cid-a1b2.")) << row.status;
    }
}

TEST_F(OneDriveBits, ASessionWithoutAnIdFailsAndSetsNothing) {
    for (const std::string& answer : {ok, Answer(200, "", "BITS-Session-Id: \r\n")}) {
        Give({answer});
        std::string session = "before";
        EXPECT_FALSE(drive->StartUploadSession(Api("/x"), session));
        EXPECT_EQ(session, "before");
        EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_NONE);
    }
    Give({Answer(200, "", "bits-session-id: s\r\n")});
    std::string session;
    EXPECT_TRUE(drive->StartUploadSession(Api("/x"), session));
    EXPECT_EQ(session, "s");
}

TEST_F(OneDriveBits, ARefusedTokenIsRenewedAtEachStep) {
    Serve({Answering({Answer(401), opened, Answer(401), Has(kFirst), Has(kTotal), Answer(401), ok}),
           Answering({TokenAnswer()}), Answering({TokenAnswer()}), Answering({TokenAnswer()})});
    EXPECT_TRUE(Upload()) << seams::LogDump();
    EXPECT_THAT(Ranges(), ElementsAre("bytes 0-33554431/41943040", "bytes 0-33554431/41943040",
                                      "bytes 33554432-41943039/41943040"));
    EXPECT_EQ(HeaderOf(server->Received().back(), "Authorization"), "Bearer fresh-canary");
    EXPECT_TRUE(seams::Logged("Retry chunk upload: 0/6")) << seams::LogDump();
}

TEST_F(OneDriveBits, ATokenThatCannotBeRenewedEndsAFragment) {
    Serve({Answering({opened, Answer(401)}),
           Answering({Answer(400, R"({"error":"invalid_grant"})")})});
    EXPECT_FALSE(Upload());
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_UNAUTHORIZED);
    EXPECT_FALSE(seams::LoggedPart("Retry chunk upload")) << seams::LogDump();
}

TEST_F(OneDriveBits, AFragmentThatTheServiceIsTooBusyForIsRepeatedFromWhereItSays) {
    Give({opened, Has(kFirst), Has(kFirst, 503),
          Answer(420, R"({"error":{"code":"request_throttled","message":"Wait 10 seconds"}})",
                 "BITS-Received-Content-Range: 33554432\r\n"),
          Has(kTotal), ok});
    EXPECT_TRUE(Upload()) << seams::LogDump();
    EXPECT_THAT(
        Ranges(),
        ElementsAre("bytes 0-33554431/41943040", "bytes 33554432-41943039/41943040",
                    "bytes 33554432-41943039/41943040", "bytes 33554432-41943039/41943040"));
    EXPECT_TRUE(IsPart(4, kFirst, kTotal - kFirst));
    EXPECT_THAT(seams::Sleeps(), ElementsAre(5, 5, 40, 40));
    EXPECT_TRUE(seams::Logged("Retry chunk upload: 1/6")) << seams::LogDump();
    EXPECT_TRUE(seams::LoggedPart("Failed to process curl http://cid-a1b2."));
    EXPECT_TRUE(seams::LoggedPart("\"BITS-Received-Content-Range\":\"33554432\""));
}

TEST_F(OneDriveBits, AFileThatDoesNotStandAtItsStartIsSentFromThereThroughAllRepeats) {
    Give({opened, Has(0, 503), Has(kFirst), Has(kFirst, 503), Has(kTotal - kMiB), ok});
    lseek(file.Get(), kMiB, SEEK_SET);
    EXPECT_TRUE(Upload(kTotal - kMiB)) << seams::LogDump();
    EXPECT_TRUE(IsPart(2, kMiB, kFirst) && IsPart(4, kMiB + kFirst, 7 * kMiB));
}

TEST_F(OneDriveBits, AWrongRangeIsCuredByGoingBackToWhereTheServiceIs) {
    Give({opened, Has(kFirst), Has(kFirst - kMiB, 416), Has(kTotal - kMiB), Has(kTotal), ok});
    EXPECT_TRUE(Upload()) << seams::LogDump();
    EXPECT_THAT(
        Ranges(),
        ElementsAre("bytes 0-33554431/41943040", "bytes 33554432-41943039/41943040",
                    "bytes 32505856-40894463/41943040", "bytes 40894464-41943039/41943040"));
    EXPECT_TRUE(IsPart(3, kFirst - kMiB, 8 * kMiB));
    EXPECT_TRUE(IsPart(4, kTotal - kMiB, kMiB));
}

TEST_F(OneDriveBits, AFragmentThatWasStoredInPartGoesOnThereAndEndsWithTheFile) {
    Give({opened, Has(kMiB, 500), Has(kFirst + kMiB), Has(kTotal), ok});
    EXPECT_TRUE(Upload()) << seams::LogDump();
    EXPECT_THAT(Ranges(),
                ElementsAre("bytes 0-33554431/41943040", "bytes 1048576-34603007/41943040",
                            "bytes 34603008-41943039/41943040"));
    EXPECT_TRUE(IsPart(2, kMiB, kFirst));
    EXPECT_TRUE(IsPart(3, kFirst + kMiB, kTotal - kFirst - kMiB));
}

TEST_F(OneDriveBits, AFileThatTheServiceHasInWholeIsClosedThoughItsLastAnswerFailed) {
    Give({opened, Has(kFirst), Has(kTotal, 503), ok});
    EXPECT_TRUE(Upload()) << seams::LogDump();
    EXPECT_THAT(Packets(), ElementsAre("Create-Session", "Fragment", "Fragment", "Close-Session"));
}

TEST_F(OneDriveBits, AFailureWithoutTheServicesWordIsSentAgainFromTheVeryStart) {
    Give({opened, Has(kFirst), Answer(500), Has(kTotal), ok});
    EXPECT_TRUE(Upload()) << seams::LogDump();
    EXPECT_THAT(Ranges(),
                ElementsAre("bytes 0-33554431/41943040", "bytes 33554432-41943039/41943040",
                            "bytes 0-8388607/41943040"));
    EXPECT_TRUE(IsPart(3, 0, 8 * kMiB));
    EXPECT_TRUE(seams::Logged("Wrong size, 41943040, 8388608")) << seams::LogDump();
}

TEST_F(OneDriveBits, ARepeatFromTheStartTellsWhereTheServiceIsAndTheRestFollows) {
    // The service has the first 32 MiB; of the second fragment it got nothing, or half, or all.
    Give({opened, Has(kFirst), Answer(500), Has(kFirst), Has(kTotal), ok});
    EXPECT_TRUE(Upload()) << seams::LogDump();
    EXPECT_THAT(Ranges(),
                ElementsAre("bytes 0-33554431/41943040", "bytes 33554432-41943039/41943040",
                            "bytes 0-8388607/41943040", "bytes 33554432-41943039/41943040"));
    EXPECT_TRUE(IsPart(4, kFirst, kTotal - kFirst));

    lseek(file.Get(), 0, SEEK_SET);
    Give({opened, Has(kFirst), Answer(500), Has(kFirst + kMiB, 416), Has(kTotal), ok});
    EXPECT_TRUE(Upload()) << seams::LogDump();
    EXPECT_EQ(Ranges().back(), "bytes 34603008-41943039/41943040");
    EXPECT_TRUE(IsPart(4, kFirst + kMiB, kTotal - kFirst - kMiB));

    lseek(file.Get(), 0, SEEK_SET);
    Give({opened, Has(kFirst), Answer(500), Has(kTotal), ok});
    EXPECT_TRUE(Upload()) << seams::LogDump();
    EXPECT_FALSE(seams::LoggedPart("The service has ")) << seams::LogDump();
}

TEST_F(OneDriveBits, AnAnswerThatIsLostIsAskedForAgain) {
    Serve({{wire::ReadRequest(), wire::Send(opened), wire::ReadRequest(), wire::Reset()},
           Answering({Has(kFirst), Has(kTotal), ok})});
    EXPECT_TRUE(Upload()) << seams::LogDump();
    EXPECT_THAT(Ranges(), ElementsAre("bytes 0-33554431/41943040", "bytes 0-33554431/41943040",
                                      "bytes 33554432-41943039/41943040"));
    EXPECT_THAT(seams::Sleeps(), Not(IsEmpty()));
}

TEST_F(OneDriveBits, AFragmentOnAConnectionThatDiesIsSentAgainWhole) {
    Serve({{wire::ReadRequest(), wire::Send(opened), wire::ReadHead(), wire::ReadBytes(100000),
            wire::Reset()},
           Answering({Has(kFirst), Has(kTotal), ok})});
    EXPECT_TRUE(Upload()) << seams::LogDump();
    EXPECT_TRUE(BodyOf(server->Received().at(3)) == Part(0, kFirst));
}

TEST_F(OneDriveBits, AFragmentStoredShortMovesTheOffsetBackAndTheRestFollowsBehindTheLastOne) {
    Give({opened, Has(kMiB), Has(9 * kMiB), Has(kTotal), ok});
    EXPECT_TRUE(Upload()) << seams::LogDump();
    EXPECT_THAT(Ranges(), ElementsAre("bytes 0-33554431/41943040", "bytes 1048576-9437183/41943040",
                                      "bytes 9437184-41943039/41943040"));
    EXPECT_TRUE(IsPart(3, 9 * kMiB, 31 * kMiB));
    lseek(file.Get(), 0, SEEK_SET);
    Give({opened, Has(kFirst), Has(kTotal - 5), Has(kTotal - 5), ok});
    EXPECT_FALSE(Upload()) << "no nearer to the end, a session is not closed";
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_TRANSFER_ABORTED);
    EXPECT_THAT(Packets(), ElementsAre("Create-Session", "Fragment", "Fragment", "Fragment"));
}

TEST_F(OneDriveBits, AServiceThatClaimsMoreThanItWasSentIsNotBelieved) {
    Give({opened, Has(kFirst + 1), Has(kTotal), ok});
    EXPECT_TRUE(Upload()) << seams::LogDump();
    EXPECT_TRUE(seams::Logged("Wrong size, 33554433, 33554432")) << seams::LogDump();
    EXPECT_THAT(Ranges(),
                ElementsAre("bytes 0-33554431/41943040", "bytes 33554432-41943039/41943040"));
}

TEST_F(OneDriveBits, AReceiptThatIsNoNumberCountsAsNothing) {
    for (const char* receipt : {"", "bytes=0-33554431", "many", "-5", "99999999999999999999"}) {
        Give({Answer(200, "", std::string("BITS-Received-Content-Range: ") + receipt + "\r\n")});
        lseek(file.Get(), 0, SEEK_SET);
        XferContext context;
        context.fd = file.Get();
        XferData xfer{FileReadCallback, 1, &context};
        long long offset = 3;
        EXPECT_TRUE(drive->StartUpload(&xfer, Api("/x"), "s", &offset, 5, 10)) << receipt;
        EXPECT_EQ(offset, 0) << receipt;
        EXPECT_THAT(Ranges(), ElementsAre("bytes 3-7/10"));
    }
}

TEST_F(OneDriveBits, AFragmentThatIsRefusedForGoodIsNotRetried) {
    struct {
        int status;
        __tag_vfs_err_ code;
    } rows[] = {{400, VFS_ERR_TOKEN_REVOKED},  {403, VFS_ERR_FORBIDDEN},
                {404, VFS_ERR_NOT_FOUND},  // the session is gone
                {413, VFS_ERR_FILE_TOO_LARGE}, {507, VFS_ERR_QUOTA_EXCEEDED},
                {418, VFS_ERR_UNKNOWN}};
    for (const auto& row : rows) {
        seams::Reset();
        Give({opened, Answer(row.status)});
        EXPECT_FALSE(UploadTen()) << row.status;
        EXPECT_EQ(drive->GetErrorCode(), row.code) << row.status;
        EXPECT_THAT(Packets(), ElementsAre("Create-Session", "Fragment"));
        EXPECT_TRUE(seams::Logged("Chunk upload failed and do not retry")) << seams::LogDump();
    }
}

TEST_F(OneDriveBits, TheSessionIsNoMatterOfTheLog) {
    Give({opened, Answer(403, "", "BITS-Session-Id: {s-1}\r\nX-Other: shown\r\n")});
    EXPECT_FALSE(UploadTen());
    EXPECT_TRUE(seams::LoggedPart("\"X-Other\":\"shown\"")) << seams::LogDump();
    EXPECT_FALSE(seams::LoggedPart("{s-1}")) << seams::LogDump();
}

TEST_F(OneDriveBits, AStatusBelowFourHundredThatStoresNothingIsNoSuccess) {
    for (const int status : {300, 304, 308}) {
        drive->SetError(VFS_ERR_NONE, "");
        Give({opened, Answer(status)});
        EXPECT_FALSE(UploadTen()) << status;
        EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_TRANSFER_ABORTED) << status;
        EXPECT_THAT(Packets(), ElementsAre("Create-Session", "Fragment"));
        drive->SetError(VFS_ERR_NONE, "");
        Give({opened, Has(10), Answer(status)});
        EXPECT_FALSE(UploadTen()) << status;
        EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_TRANSFER_ABORTED) << status;
    }
}

TEST_F(OneDriveBits, AFragmentIsTriedSixTimesInAll) {
    std::vector<std::string> answers(7, Has(0, 500));
    answers[0] = opened;
    Give(answers);
    EXPECT_FALSE(UploadTen());
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_SERVER_ERROR);
    EXPECT_THAT(Ranges(), SizeIs(6));
    EXPECT_TRUE(seams::LoggedPart("Retry times reach max times, " + Api("/storage") + ", err: {"))
        << seams::LogDump();
    EXPECT_TRUE(seams::Logged("Retry chunk upload: 5/6"));
}

TEST_F(OneDriveBits, TheCountOfTriesBeginsAnewForEachFragment) {
    std::vector<std::string> answers = {opened};
    answers.insert(answers.end(), 5, Has(0, 500));
    answers.push_back(Has(kFirst));
    answers.insert(answers.end(), 5, Has(kFirst, 500));
    answers.insert(answers.end(), {Has(kTotal), ok});
    Give(answers);
    EXPECT_TRUE(Upload()) << seams::LogDump();
    EXPECT_THAT(Ranges(), SizeIs(12));
}

TEST_F(OneDriveBits, TheResultIsThatOfCloseSession) {
    struct {
        int status;
        __tag_vfs_err_ code;
    } rows[] = {{400, VFS_ERR_TOKEN_REVOKED},
                {404, VFS_ERR_NOT_FOUND},
                {420, VFS_ERR_RATE_LIMITED},
                {500, VFS_ERR_SERVER_ERROR},
                {507, VFS_ERR_QUOTA_EXCEEDED}};
    for (const auto& row : rows) {
        Give({opened, Has(10), Answer(row.status)});
        EXPECT_FALSE(UploadTen()) << row.status;
        EXPECT_EQ(drive->GetErrorCode(), row.code) << row.status;
        EXPECT_THAT(Packets(), ElementsAre("Create-Session", "Fragment", "Close-Session"));
    }
}

// --- streams -------------------------------------------------------------------------------------

class OneDriveBitsStream : public OneDriveBits {
  protected:
    OneDriveBitsStream() { bytes.context.fd = -1; }

    bool Stream() {
        Json::Value meta;
        EXPECT_TRUE(drive->GetMetaDataByURI(std::string(kServerId) + "/a", meta, "Upload"));
        meta["total_bytes"] = static_cast<Json::Int64>(kTotal);
        return drive->UploadProcess(&bytes.xfer, meta);
    }

    Bytes bytes{1, content};
};

TEST_F(OneDriveBitsStream, GoesInFragmentsToo) {
    Give({opened, Has(kFirst), Has(kTotal), ok});
    EXPECT_TRUE(Stream()) << seams::LogDump();
    EXPECT_TRUE(bytes.context.limited);
    EXPECT_EQ(bytes.context.chunk_size, 8 * kMiB);
    EXPECT_TRUE(IsPart(2, kFirst, kTotal - kFirst));
}

TEST_F(OneDriveBitsStream, ThatCannotSeekFailsAtTheFirstFailedAttempt) {
    Give({opened, Has(0, 503)});
    EXPECT_FALSE(Stream());
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_SERVER_ERROR);
    EXPECT_THAT(Packets(), ElementsAre("Create-Session", "Fragment"));
    EXPECT_TRUE(seams::Logged("Chunk upload failed and do not retry")) << seams::LogDump();
}

TEST_F(OneDriveBitsStream, ThatWasStoredShortEndsBeforeOtherBytesTakeThePlaceOfTheLost) {
    Give({opened, Has(kMiB)});
    EXPECT_FALSE(Stream());
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_RANGE_FAILED);
    EXPECT_THAT(Packets(), ElementsAre("Create-Session", "Fragment"));
    EXPECT_TRUE(seams::Logged("Chunk upload failed and do not retry")) << seams::LogDump();
}

TEST_F(OneDriveBitsStream, OfWhatCannotSeekBackEndsWithALine) {
    int ends[2];
    ASSERT_EQ(pipe(ends), 0);
    const UniqueFd in(ends[0]);
    const UniqueFd out(ends[1]);
    bytes.context.fd = in.Get();
    Give({opened, Has(0, 503)});
    EXPECT_FALSE(Stream());
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_SERVER_ERROR);
    EXPECT_TRUE(seams::Logged("Failed to seek file to back to last position, Illegal seek"))
        << seams::LogDump();
}

TEST_F(OneDriveBitsStream, CancelledBeforeAFragmentIsNotSent) {
    Give({opened});
    drive->SetError(VFS_ERR_CANCELLED, "");
    EXPECT_FALSE(Stream());
    EXPECT_THAT(Packets(), ElementsAre("Create-Session"));
}

int stops_at = 0;

int StopSoon() {
    return --stops_at < 0 ? 1 : 0;
}

TEST_F(OneDriveBits, CancelledInTheMiddleOfAFragmentEndsThere) {
    Serve({{wire::ReadRequest(), wire::Send(opened), wire::ReadAll()}});
    stops_at = 20;
    EXPECT_FALSE(Cloud::UploadFile(drive.get(), std::string(kServerId) + "/a", file.Get(), kTotal,
                                   nullptr, StopSoon, nullptr));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CANCELLED);
    EXPECT_THAT(seams::Sleeps(), IsEmpty());
}

TEST_F(OneDriveBits, WithoutAUrlOrASourceFails) {
    Give({});
    XferContext context;
    XferData xfer{nullptr, 1, &context};
    XferData nothing{nullptr, 1, nullptr};
    const Json::Value meta = Object(R"({"url":"http://127.0.0.1:9/","total_bytes":1})");
    EXPECT_FALSE(drive->ChunkedUpload(&xfer, Object(R"({"total_bytes":1})")));
    EXPECT_FALSE(drive->ChunkedUpload(nullptr, meta));
    EXPECT_FALSE(drive->ChunkedUpload(&nothing, meta));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CLOUD_FAILED);
    EXPECT_FALSE(drive->ChunkedUpload(&xfer, Object("[1]")));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CLOUD_FAILED);
}

TEST_F(OneDriveBits, OfNothingOpensAndClosesAndOfLessFails) {
    XferContext context;
    XferData xfer{nullptr, 1, &context};
    Give({opened, ok, opened});
    Json::Value meta;
    meta["url"] = Api("/x");
    meta["total_bytes"] = 0;
    EXPECT_TRUE(drive->ChunkedUpload(&xfer, meta)) << seams::LogDump();
    EXPECT_THAT(Packets(), ElementsAre("Create-Session", "Close-Session"));
    meta["total_bytes"] = -1;
    EXPECT_FALSE(drive->ChunkedUpload(&xfer, meta));
    EXPECT_TRUE(seams::Logged("Wrong size when uploading")) << seams::LogDump();
}

TEST_F(OneDriveBits, AFragmentWithoutASourceFailsAndTheOffsetIsTheServicesWord) {
    Give({});
    long long offset = 7;
    EXPECT_FALSE(drive->StartUpload(nullptr, Api("/x"), "s", &offset, 5, 100));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CLOUD_FAILED);
    EXPECT_EQ(offset, 0);
    EXPECT_THAT(Requests(), IsEmpty());
}

TEST_F(OneDriveBits, OfAnUnknownSizeTakesTheLikelyOneAndClosesOnlyWhenItWasRight) {
    const struct {
        long long likely;
        bool right;
        std::vector<std::string> packets;
        __tag_vfs_err_ code;
    } rows[] = {
        {10, true, {"Create-Session", "Fragment", "Close-Session"}, VFS_ERR_NONE},
        {9, false, {"Create-Session", "Fragment"}, VFS_ERR_NOT_SUPPORTED},
        {11, false, {"Create-Session"}, VFS_ERR_TRANSFER_ABORTED},
    };
    for (const auto& row : rows) {
        Give({opened, Has(row.likely), ok});
        lseek(file.Get(), kTotal - 10, SEEK_SET);
        BeginTransfer(10, {});
        XferContext context;
        XferData xfer{[](char* to, size_t size, size_t count, void*) {
                          return static_cast<size_t>(read(file.Get(), to, size * count));
                      },
                      1, &context};
        Json::Value meta = Object(R"({"total_bytes":90000000,"filesize":-1})");
        meta["url"] = Api("/storage");
        meta["likely_bytes"] = static_cast<Json::Int64>(row.likely);
        drive->SetError(VFS_ERR_NONE, "");
        EXPECT_EQ(drive->ChunkedUpload(&xfer, meta), row.right) << row.likely << seams::LogDump();
        EXPECT_EQ(drive->GetErrorCode(), row.code) << row.likely;
        const std::vector<std::string> packets = Packets();
        EXPECT_TRUE(std::equal(row.packets.begin(), row.packets.end(), packets.begin()));
        EXPECT_EQ(std::count(packets.begin(), packets.end(), "Close-Session"), row.right ? 1 : 0);
    }
}

}  // namespace
}  // namespace ZYROCloud
