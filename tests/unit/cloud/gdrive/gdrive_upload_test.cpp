#include "unit/cloud/gdrive/gdrive_upload_fixture.h"

namespace ZYROCloud {
namespace {

using testing::SizeIs;

class GDriveDirect : public GDriveUploadTest {
  protected:
    bool Upload(const std::string& content, const std::string& path = "/a.bin") {
        Bytes bytes(1, content);
        return drive->UploadProcess(&bytes.xfer, Meta(path, content.size()));
    }
    static Fault OnPost() { return Fault::On("POST", kUploadPath); }
};

const std::string kPost = std::string("POST ") + kUploadPath;

TEST_F(GDriveDirect, IsOneRequestForAFileOfNoMoreThan32MiB) {
    for (const size_t size : {size_t{0}, size_t{1}, size_t{22}, size_t{23}, size_t{24}, kDirect}) {
        const std::string path = "/" + std::to_string(size);
        const std::string content = Content(size);
        service.Journal().Clear();
        EXPECT_TRUE(Upload(content, path)) << seams::LogDump();
        EXPECT_TRUE(Stored(path) == content) << size;
        EXPECT_THAT(Requests(), ElementsAre(kPost)) << size;
        EXPECT_EQ(Last().Query("uploadType"), "multipart");
    }
}

TEST_F(GDriveDirect, GivesWayToASessionForOneByteMore) {
    const std::string content = Content(kDirect + 1);
    EXPECT_TRUE(Upload(content)) << seams::LogDump();
    EXPECT_TRUE(Stored() == content);
    EXPECT_THAT(Requests(), ElementsAre(kPost, std::string("PUT ") + kUploadPath,
                                        std::string("PUT ") + kUploadPath));
    EXPECT_EQ(service.Journal().All()[0].Query("uploadType"), "resumable");
}

TEST_F(GDriveDirect, GivesWayToASessionForASourceOfUnknownSize) {
    Bytes bytes(1, "hello");
    Json::Value meta = Meta("/a.bin", 5);
    for (const bool absent : {false, true}) {
        meta["filesize"] = -1;
        if (absent) {
            meta.removeMember("filesize");
        }
        service.Journal().Clear();
        lseek(bytes.context.fd, 0, SEEK_SET);
        EXPECT_TRUE(drive->UploadProcess(&bytes.xfer, meta)) << seams::LogDump();
        EXPECT_EQ(service.Journal().All()[0].Query("uploadType"), "resumable");
    }
}

TEST_F(GDriveDirect, DescribesTheItemInItsFirstPart) {
    const std::string docs = amy.AddFolder(root, "docs");
    Show("/docs");
    EXPECT_TRUE(Upload("hello", "/docs/a \"b\".docx")) << seams::LogDump();
    const auto entry = Last();
    EXPECT_THAT(entry.body, HasSubstr("name=\"Metadata\""));
    EXPECT_THAT(entry.body, HasSubstr("Content-Type: application/json; charset=UTF-8\r\n"));
    const size_t begin = entry.body.find('{');
    Json::Value wanted;
    wanted["title"] = "a \\\"b\\\".docx";
    wanted["mimeType"] = "application/vnd.openxmlformats-officedocument.wordprocessingml.document";
    wanted["parents"] = Object(R"([{"id":")" + docs + "\"}]");
    EXPECT_EQ(Object(entry.body.substr(begin, entry.body.find("\r\n", begin) - begin)), wanted);
    EXPECT_THAT(entry.body.substr(begin), HasSubstr("name=\"file\"; filename=\"file\""));
    EXPECT_FALSE(entry.HasHeader("Expect"));
    EXPECT_EQ(entry.Header("Authorization"), drive->Bearer());
    EXPECT_EQ(amy.Bytes(amy.List(docs).at(0).id), "hello");
}

TEST_F(GDriveDirect, SaysNothingThatItWasNotTold) {
    Bytes bytes(1, "hello");
    Json::Value meta;
    meta["url"] = service.ApiHost() + kUploadPath;
    meta["total_bytes"] = "5";
    EXPECT_TRUE(drive->DirectUpload(&bytes.xfer, meta)) << seams::LogDump();
    EXPECT_THAT(Requests(), ElementsAre(kPost));
    EXPECT_THAT(Last().body, HasSubstr("\r\n\r\n{}\r\n"));
}

TEST_F(GDriveDirect, ToAKnownPathReplacesTheContentOfThatItem) {
    const std::string id = amy.AddPath("/docs/a.txt", "old");
    Show("/docs");
    Show("/docs/a.txt");
    EXPECT_TRUE(Upload("new", "/docs/a.txt")) << seams::LogDump();
    EXPECT_EQ(amy.Bytes(id), "new");
    EXPECT_THAT(Requests(), ElementsAre(std::string("PUT ") + kUploadPath + "/" + id));
    EXPECT_THAT(amy.List(amy.Find("/docs")), SizeIs(1));
}

TEST_F(GDriveDirect, SendsItsAddressAsItIs) {
    service.AddFault(Fault::On("POST", "/up%2Fload?a=b").Answer(200, "{}"));
    Bytes bytes(1, "hello");
    Json::Value meta = Meta("/a.bin", 5);
    meta["url"] = service.ApiHost() + "/up%2Fload?a=b";
    EXPECT_TRUE(drive->UploadProcess(&bytes.xfer, meta)) << seams::LogDump();
    EXPECT_EQ(Last().target, "/up%2Fload?a=b&uploadType=multipart");
}

TEST_F(GDriveDirect, ThatFailsIsSentAgainFromByteZero) {
    service.AddFault(OnPost().Answer(503));
    service.AddFault(OnPost().After(1).Answer(403));
    const std::string content = Content(300000);
    EXPECT_TRUE(Upload(content)) << seams::LogDump();
    EXPECT_TRUE(Stored() == content);
    for (const auto& entry : service.Journal().All()) {
        EXPECT_EQ(entry.body_size, service.Journal().All()[0].body_size);
    }
    // The handler waits behind each failure, and so does the loop.
    EXPECT_THAT(seams::Sleeps(), ElementsAre(5, 5, 5, 5));
    EXPECT_TRUE(seams::Logged("Retry directly upload: 0/6")) << seams::LogDump();
    EXPECT_TRUE(seams::Logged("Retry directly upload: 1/6"));
    EXPECT_TRUE(seams::LoggedPart("gdrive_upload.cpp:"));
}

TEST_F(GDriveDirect, ThatFailsIsSentSixTimesInAll) {
    service.AddFault(OnPost().Times(6).Answer(503));
    EXPECT_FALSE(Upload("hello"));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_SERVER_ERROR);
    EXPECT_EQ(service.Journal().Count("POST", kUploadPath), 6U);
    EXPECT_TRUE(seams::LoggedPart("Retry times reach max times, " + service.ApiHost() +
                                  kUploadPath + ", err: {"))
        << seams::LogDump();
}

TEST_F(GDriveDirect, ThatIsRefusedHasItsCode) {
    const auto text = [](const char* reason) { return cloudsim::GDrive::ErrorText(403, reason); };
    const struct {
        int status;
        std::string body;
        __tag_vfs_err_ code;
    } rows[] = {{403, text("quotaExceeded"), VFS_ERR_QUOTA_EXCEEDED},
                {403, text("dailyLimitExceeded"), VFS_ERR_UNAUTHORIZED},
                {404, "", VFS_ERR_NOT_FOUND},
                {413, "", VFS_ERR_UNKNOWN},
                {400, "not JSON", VFS_ERR_TOKEN_REVOKED}};
    for (const auto& row : rows) {
        seams::Reset();
        const int times = row.code == VFS_ERR_UNAUTHORIZED ? 6 : 1;
        service.AddFault(OnPost().Times(times).Answer(row.status, row.body));
        EXPECT_FALSE(Upload("hello")) << row.status;
        EXPECT_EQ(drive->GetErrorCode(), row.code) << row.status;
        EXPECT_TRUE(seams::LoggedPart(service.ApiHost() + kUploadPath + ", err")) << row.status;
    }
    EXPECT_FALSE(amy.Exists("/a.bin"));
}

TEST_F(GDriveDirect, WithARefusedTokenRenewsItAndGoesOnWithTheOldOne) {
    service.AddFault(OnPost().ExpireToken());
    EXPECT_FALSE(Upload("hello"));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_UNAUTHORIZED);
    std::vector<std::string> wanted;
    for (int i = 0; i < 6; ++i) {
        wanted.insert(wanted.end(), {kPost, "POST /o/oauth2/token"});
    }
    EXPECT_THAT(Requests(), testing::ElementsAreArray(wanted));
    for (const auto& entry : service.Journal().Find("POST", kUploadPath)) {
        EXPECT_EQ(entry.Header("Authorization"), "Bearer " + granted.access_token);
    }
    // The next upload has the new one.
    EXPECT_TRUE(Upload("hello")) << seams::LogDump();
    EXPECT_EQ(Stored(), "hello");
}

TEST_F(GDriveDirect, WithATokenThatCannotBeRenewedEnds) {
    service.AddFault(OnPost().ExpireToken());
    amy.RevokeRefreshTokens();
    EXPECT_FALSE(Upload("hello"));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_UNAUTHORIZED);
    EXPECT_EQ(service.Journal().Count("POST", kUploadPath), 1U);
}

TEST_F(GDriveDirect, OfAStreamIsNotRepeated) {
    service.AddFault(OnPost().Answer(503));
    Bytes bytes(1, "hello");
    bytes.context.fd = -1;
    EXPECT_FALSE(drive->UploadProcess(&bytes.xfer, Meta("/a.bin", 5)));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_SERVER_ERROR);
    EXPECT_THAT(Requests(), SizeIs(1));
    EXPECT_FALSE(seams::LoggedPart("Retry directly upload")) << seams::LogDump();
}

TEST_F(GDriveDirect, OfWhatCannotSeekBackEndsWithALine) {
    service.AddFault(OnPost().Answer(503));
    Bytes bytes(1, "hello");
    int ends[2];
    ASSERT_EQ(pipe(ends), 0);
    const UniqueFd in(ends[0]);
    const UniqueFd out(ends[1]);
    bytes.context.fd = in.Get();
    EXPECT_FALSE(drive->UploadProcess(&bytes.xfer, Meta("/a.bin", 5)));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_SERVER_ERROR);
    EXPECT_TRUE(seams::Logged("Failed to seek file to back to zero position, Illegal seek"))
        << seams::LogDump();
}

TEST_F(GDriveDirect, CancelledInTheMiddleEndsThere) {
    const std::string content = Content(1 << 20);
    Bytes bytes(1, content);
    bytes.cancel_at = 2;
    EXPECT_FALSE(drive->UploadProcess(&bytes.xfer, Meta("/a.bin", content.size())));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CANCELLED);
    EXPECT_THAT(seams::Sleeps(), IsEmpty());
    EXPECT_FALSE(amy.Exists("/a.bin"));
}

TEST_F(GDriveDirect, CancelledBeforeItsRequestIsNotSent) {
    drive->SetError(VFS_ERR_CANCELLED, "");
    EXPECT_FALSE(Upload("hello"));
    EXPECT_THAT(Requests(), IsEmpty());
}

TEST_F(GDriveDirect, OnAKeptConnectionThatDiesInTheMiddleIsSentAgainOnANewOne) {
    service.AddFault(OnPost().After(1).CutUpload(100000).Reset());
    const std::string content = Content(8 << 20);
    EXPECT_TRUE(Upload("first", "/first"));
    EXPECT_TRUE(Upload(content)) << seams::LogDump();
    EXPECT_TRUE(Stored() == content);
    EXPECT_FALSE(seams::LoggedPart("Retry directly upload")) << seams::LogDump();
}

TEST_F(GDriveDirect, WithoutAnAddressOrASourceOrWithOddArgumentsFails) {
    Bytes bytes(1, "hello");
    XferData nothing{nullptr, 1, nullptr};
    const Json::Value whole = Meta("/a.bin", 5);
    for (XferData* xfer : {static_cast<XferData*>(nullptr), &nothing}) {
        drive->SetError(VFS_ERR_NONE, "");
        EXPECT_FALSE(drive->UploadProcess(xfer, whole));
        EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CLOUD_FAILED);
    }
    for (const char* odd :
         {"{}", "[1]", "7", R"({"url":[]})", R"({"url":"http://x","method":{}})",
          R"({"url":"http://x","title":[]})", R"({"url":"http://x","parent_id":{}})"}) {
        drive->SetError(VFS_ERR_NONE, "");
        EXPECT_FALSE(drive->DirectUpload(&bytes.xfer, Object(odd))) << odd;
        EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CLOUD_FAILED) << odd;
    }
    EXPECT_THAT(Requests(), IsEmpty());
}

TEST_F(GDriveDirect, OfAFileThatIsShorterOrLongerThanAnnouncedIsNeverStoredShort) {
    const UniqueFd file(memfd_create("file", MFD_CLOEXEC));
    const std::string content = Content(100000);
    ASSERT_EQ(write(file.Get(), content.data(), content.size()), 100000);
    lseek(file.Get(), 0, SEEK_SET);
    EXPECT_FALSE(Cloud::UploadFile(drive.get(), server_id + "/a.bin", file.Get(), 100001, nullptr,
                                   nullptr, nullptr));
    EXPECT_FALSE(amy.Exists("/a.bin"));
    lseek(file.Get(), 0, SEEK_SET);
    EXPECT_TRUE(Cloud::UploadFile(drive.get(), server_id + "/a.bin", file.Get(), 99999, nullptr,
                                  nullptr, nullptr))
        << seams::LogDump();
    EXPECT_TRUE(Stored() == content.substr(0, 99999));
}

}  // namespace
}  // namespace ZYROCloud
