#include "unit/cloud/onedrive/onedrive_fixture.h"

namespace ZYROCloud {
namespace {

class OneDriveUpload : public OneDriveTest {
  protected:
    void SetUp() override {
        OneDriveTest::SetUp();
        Show("/docs", "folder.d");
    }
    bool Upload(long long size, const std::string& path = "/docs/a b.txt") {
        const UniqueFd file = PatternFile(size, &content);
        return Cloud::UploadFile(drive.get(), kServerId + path, file.Get(), size, nullptr, nullptr,
                                 nullptr);
    }
    /** A stream of five bytes. */
    static size_t Five(char* data, size_t size, size_t count, void*) {
        if (left == 0 || size * count < 5) {
            return 0;
        }
        left = 0;
        memcpy(data, "01234", 5);
        return 5;
    }
    bool Stream(const std::string& path = "/docs/a") {
        left = 5;
        Json::Value meta;
        meta["server_path"] = path;
        meta["total_bytes"] = 5;
        return drive->UploadProcess(&stream, meta);
    }

    static inline int left = 0;
    XferContext context;
    XferData stream{Five, 1, &context};
    std::string content;
};

constexpr const char* kPut =
    "PUT /v5.0/folder.d/files/a%20b.txt?downsize_photo_uploads=false&"
    "pretty=false";

TEST_F(OneDriveUpload, OfASmallFileIsOneRequestIntoItsFolder) {
    for (const long long size : {0, 1, 22, 23, 24, 100000}) {
        Give({Answer(201, "{}")});
        EXPECT_TRUE(Upload(size)) << seams::LogDump();
        EXPECT_THAT(Requests(), ElementsAre(kPut)) << size;
        EXPECT_TRUE(BodyOf(Request(0)) == content) << size;
        EXPECT_EQ(HeaderOf(Request(0), "Content-Length"), std::to_string(size));
        EXPECT_EQ(HeaderOf(Request(0), "Transfer-Encoding"), "-");
        EXPECT_EQ(HeaderOf(Request(0), "Authorization"), "Bearer token-canary");
    }
}

TEST_F(OneDriveUpload, OfExactlyThirtyTwoMiBGoesDirectlyAndOneByteMoreInTwoFragments) {
    Give({Answer(201, "{}")});
    EXPECT_TRUE(Upload(33554432)) << seams::LogDump();
    EXPECT_THAT(Requests(), ElementsAre(kPut));
    EXPECT_TRUE(BodyOf(Request(0)) == content);

    Give({Answer(200, "", "BITS-Session-Id: s\r\n"),
          Answer(200, "", "BITS-Received-Content-Range: 33554432\r\n"),
          Answer(200, "", "BITS-Received-Content-Range: 33554433\r\n"), Answer(200)});
    EXPECT_TRUE(Upload(33554433)) << seams::LogDump();
    EXPECT_THAT(Headers("BITS-Packet-Type"),
                ElementsAre("Create-Session", "Fragment", "Fragment", "Close-Session"));
    EXPECT_EQ(HeaderOf(Request(2), "Content-Range"), "bytes 33554432-33554432/33554433");
    EXPECT_TRUE(BodyOf(Request(1)) + BodyOf(Request(2)) == content);
}

TEST_F(OneDriveUpload, IntoTheRootAsksForItsId) {
    Give({Answer(200, R"({"id":"folder.r"})"), Answer(201, "{}")});
    EXPECT_TRUE(Upload(1, "/new")) << seams::LogDump();
    EXPECT_EQ(Requests().back(),
              "PUT /v5.0/folder.r/files/new?downsize_photo_uploads=false&pretty=false");
}

TEST_F(OneDriveUpload, OfSlashASlashATakesTheFirstAsTheNamesPlaceAndGoesToTheRoot) {
    Show("/a", "folder.a");
    Give({Answer(200, R"({"id":"folder.r"})"), Answer(201, "{}")});
    EXPECT_TRUE(Upload(1, "/a/a")) << seams::LogDump();
    EXPECT_THAT(
        Requests(),
        ElementsAre("GET /v5.0/me/skydrive?pretty=false",
                    "PUT /v5.0/folder.r/files/a?downsize_photo_uploads=false&pretty=false"));
}

TEST_F(OneDriveUpload, TakesAFolderByTheFirstPlaceOfTheNameWithinAName) {
    Show("/xa", "folder.x");
    Give({Answer(200, R"({"id":"folder.r"})"), Answer(201, "{}")});
    EXPECT_TRUE(Upload(1, "/xa/a")) << seams::LogDump();
    EXPECT_THAT(Requests(), SizeIs(2));
}

TEST_F(OneDriveUpload, WithoutAPathANameOrAParentIsNotFound) {
    Give({});
    for (const char* path : {"", "/docs/", "/gone/a"}) {
        drive->SetError(VFS_ERR_NONE, "");
        EXPECT_FALSE(Stream(path));
        EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_NOT_FOUND) << path;
    }
    EXPECT_THAT(Requests(), IsEmpty());
}

TEST_F(OneDriveUpload, WithoutASourceOrWithAWrongDescriptionFails) {
    Give({});
    XferData nothing{nullptr, 1, nullptr};
    for (XferData* xfer : {static_cast<XferData*>(nullptr), &nothing}) {
        drive->SetError(VFS_ERR_NONE, "");
        EXPECT_FALSE(drive->UploadProcess(xfer, Object(R"({"server_path":"/docs/a"})")));
        EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CLOUD_FAILED);
    }
    for (const char* meta : {"[1]", "7", R"({"server_path":{}})"}) {
        drive->SetError(VFS_ERR_NONE, "");
        EXPECT_FALSE(drive->UploadProcess(&stream, Object(meta))) << meta;
        EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CLOUD_FAILED) << meta;
    }
    EXPECT_THAT(Requests(), IsEmpty());
}

TEST_F(OneDriveUpload, OfASourceWhoseSizeIsNotKnownGoesInChunks) {
    Give({Answer(201, "{}")});
    left = 5;
    EXPECT_TRUE(drive->UploadProcess(
        &stream, Object(R"({"server_path":"/docs/a","total_bytes":900,"filesize":-1})")))
        << seams::LogDump();
    EXPECT_EQ(HeaderOf(Request(0), "Transfer-Encoding"), "chunked");
    EXPECT_EQ(HeaderOf(Request(0), "Content-Length"), "-");
    EXPECT_THAT(BodyOf(Request(0)), HasSubstr("01234"));
}

TEST_F(OneDriveUpload, ThatFailsIsSentAgainFromWhereTheFileStood) {
    Give({Answer(503), Answer(201, "{}")});
    std::string whole;
    const UniqueFd file = PatternFile(1000, &whole);
    lseek(file.Get(), 77, SEEK_SET);
    EXPECT_TRUE(Cloud::UploadFile(drive.get(), std::string(kServerId) + "/docs/a", file.Get(), 923,
                                  nullptr, nullptr, nullptr))
        << seams::LogDump();
    EXPECT_EQ(BodyOf(Request(1)), whole.substr(77));
}

TEST_F(OneDriveUpload, ThatFailsIsSentAgainFromByteZero) {
    Give({Answer(503), Refusal(420, "request_throttled", "Wait 10 seconds"), Answer(201, "{}")});
    EXPECT_TRUE(Upload(1000)) << seams::LogDump();
    EXPECT_THAT(Requests(), SizeIs(3));
    EXPECT_TRUE(BodyOf(Request(2)) == content);
    EXPECT_THAT(seams::Sleeps(), ElementsAre(5, 5, 40, 40));
    EXPECT_TRUE(seams::Logged("Retry directly upload: 0/6")) << seams::LogDump();
    EXPECT_TRUE(seams::Logged("Retry directly upload: 1/6"));
    EXPECT_TRUE(seams::LoggedPart("onedrive_upload.cpp:"));
}

TEST_F(OneDriveUpload, IsTriedSixTimesInAll) {
    Give(std::vector<std::string>(7, Answer(500)));
    EXPECT_FALSE(Upload(1000));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_SERVER_ERROR);
    EXPECT_THAT(Requests(), SizeIs(6));
    EXPECT_TRUE(seams::LoggedPart("Retry times reach max times, " + Api("/folder.d/files/a b.txt") +
                                  ", err: {"))
        << seams::LogDump();
}

TEST_F(OneDriveUpload, ThatIsRefusedForGoodIsNotRetried) {
    struct {
        std::string answer;
        __tag_vfs_err_ code;
    } rows[] = {{Refusal(400, "resource_already_exists"), VFS_ERR_CONFLICT},
                {Refusal(403, ""), VFS_ERR_FORBIDDEN},
                {Refusal(404, ""), VFS_ERR_NOT_FOUND},
                {Refusal(413, ""), VFS_ERR_FILE_TOO_LARGE},
                {Refusal(416, ""), VFS_ERR_RANGE_FAILED},
                {Refusal(507, ""), VFS_ERR_QUOTA_EXCEEDED}};
    for (const auto& row : rows) {
        seams::Reset();
        Give({row.answer});
        EXPECT_FALSE(Upload(10));
        EXPECT_EQ(drive->GetErrorCode(), row.code);
        EXPECT_THAT(Requests(), SizeIs(1));
        EXPECT_TRUE(seams::Logged("Direct upload failed and do not retry")) << seams::LogDump();
    }
}

TEST_F(OneDriveUpload, AnsweredBelowFourHundredWithoutBeingStoredFails) {
    for (const int status : {300, 304, 308}) {
        drive->SetError(VFS_ERR_NONE, "");
        Give({Answer(status)});
        EXPECT_FALSE(Upload(10)) << status;
        EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_TRANSFER_ABORTED) << status;
        EXPECT_TRUE(seams::LoggedPart("The service has not taken the file, status " +
                                      std::to_string(status)))
            << seams::LogDump();
    }
}

TEST_F(OneDriveUpload, WithARefusedTokenRenewsItAndTriesWithTheOldOne) {
    // The request keeps the token that it was made with; the new one is for the next request.
    Serve({Answering({Answer(401), Answer(201, "{}"), Answer(201, "{}")}),
           Answering({TokenAnswer()})});
    EXPECT_TRUE(Upload(10)) << seams::LogDump();
    EXPECT_TRUE(Upload(10)) << seams::LogDump();
    EXPECT_THAT(Headers("Authorization"),
                ElementsAre("Bearer token-canary", "Bearer token-canary", "Bearer token-canary",
                            "Bearer fresh-canary"));
}

TEST_F(OneDriveUpload, WithATokenThatIsRefusedForGoodEndsWithTheRenewal) {
    Serve({Answering({Answer(401)}), Answering({Answer(400, R"({"error":"invalid_grant"})")})});
    EXPECT_FALSE(Upload(10));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_UNAUTHORIZED);
    EXPECT_THAT(Requests(), SizeIs(2));
    EXPECT_FALSE(seams::LoggedPart("Retry directly upload")) << seams::LogDump();
}

TEST_F(OneDriveUpload, OfAStreamThatCannotSeekFailsAtTheFirstFailedAttempt) {
    Give({Answer(503)});
    EXPECT_FALSE(Stream());
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_SERVER_ERROR);
    EXPECT_THAT(Requests(), SizeIs(1));
    EXPECT_TRUE(seams::Logged("Direct upload failed and do not retry")) << seams::LogDump();
}

TEST_F(OneDriveUpload, OfWhatCannotSeekBackEndsWithALine) {
    Give({Answer(503)});
    int ends[2];
    ASSERT_EQ(pipe(ends), 0);
    const UniqueFd in(ends[0]);
    const UniqueFd out(ends[1]);
    context.fd = in.Get();
    EXPECT_FALSE(Stream());
    EXPECT_TRUE(seams::Logged("Failed to seek file to zero position, Illegal seek"))
        << seams::LogDump();
}

int Stop() {
    return 1;
}

TEST_F(OneDriveUpload, CancelledEndsThere) {
    Give({Answer(201)});
    const UniqueFd file = PatternFile(1000);
    EXPECT_FALSE(Cloud::UploadFile(drive.get(), std::string(kServerId) + "/docs/a", file.Get(),
                                   1000, nullptr, Stop, nullptr));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CANCELLED);
    EXPECT_THAT(seams::Sleeps(), IsEmpty());
    Give({});
    EXPECT_FALSE(Stream());
    EXPECT_THAT(Requests(), IsEmpty());
}

TEST_F(OneDriveUpload, OfAFileThatHasGrownShorterFails) {
    Give({Answer(201)});
    const UniqueFd file = PatternFile(1000);
    EXPECT_FALSE(Cloud::UploadFile(drive.get(), std::string(kServerId) + "/docs/a", file.Get(),
                                   2000, nullptr, nullptr, nullptr));
    EXPECT_TRUE(seams::LoggedPart("The file ended 1000 bytes before its size")) << seams::LogDump();
}

TEST_F(OneDriveUpload, OnAKeptConnectionThatDiesInTheMiddleIsSentAgainOnANewOne) {
    Serve({{wire::ReadRequest(), wire::Send(Answer(201, "{}")), wire::ReadHead(),
            wire::ReadBytes(100000), wire::Reset()},
           Answering({Answer(201, "{}")})});
    EXPECT_TRUE(Upload(10));
    EXPECT_TRUE(Upload(8 * kMiB)) << seams::LogDump();
    EXPECT_TRUE(BodyOf(server->Received().back()) == content);
    EXPECT_FALSE(seams::LoggedPart("Retry directly upload")) << seams::LogDump();
}

}  // namespace
}  // namespace ZYROCloud
