#include <algorithm>

#include "cloud/size_limit.h"
#include "cloud/transfer.h"
#include "unit/cloud/gdrive/gdrive_upload_fixture.h"

namespace ZYROCloud {
namespace {

// --- the three steps -----------------------------------------------------------------------------

TEST_F(GDriveResumable, OpensASessionAsksForItsOffsetAndSendsAll) {
    const std::string docs = amy.AddFolder(root, "docs");
    Show("/docs");
    EXPECT_TRUE(Upload("/docs/a \"b\".DOCX")) << seams::LogDump();
    EXPECT_TRUE(amy.Bytes(amy.List(docs).at(0).id) == content);
    EXPECT_THAT(Requests(), ElementsAre(kOpen, kPiece, kPiece));
    const JournalEntry open = service.Journal().All()[0];
    EXPECT_EQ(open.Query("uploadType"), "resumable");
    EXPECT_EQ(open.Header("Content-Type"), "application/json");
    EXPECT_EQ(open.Header("Content-Length"), std::to_string(open.body.size()));
    Json::Value wanted;
    wanted["title"] = "a \\\"b\\\".DOCX";
    wanted["mimeType"] = "application/vnd.openxmlformats-officedocument.wordprocessingml.document";
    wanted["parents"] = Object(R"([{"id":")" + docs + "\"}]");
    EXPECT_EQ(Object(open.body), wanted);
    EXPECT_EQ(Put(0).Header("Content-Range"), "bytes */*");
    EXPECT_EQ(Put(0).Header("Content-Length"), "0");
    EXPECT_EQ(Put(1).Header("Content-Length"), std::to_string(kAllBytes));
    const cloudsim::Headers sent = Put(1).headers;
    EXPECT_EQ(std::count_if(sent.begin(), sent.end(),
                            [](const auto& line) { return line.first == "Content-Length"; }),
              1);
    EXPECT_FALSE(Put(1).HasHeader("Content-Range"));
    EXPECT_FALSE(Put(1).HasHeader("Transfer-Encoding"));
    for (const JournalEntry& entry : service.Journal().All()) {
        EXPECT_EQ(entry.Header("Authorization"), drive->Bearer());
    }
}

TEST_F(GDriveResumable, ToAKnownPathReplacesTheContentOfThatItem) {
    const std::string id = amy.AddPath("/a.bin", "old");
    Show("/a.bin");
    EXPECT_TRUE(Upload()) << seams::LogDump();
    EXPECT_TRUE(amy.Bytes(id) == content);
    EXPECT_THAT(Requests(), ElementsAre(kPiece + "/" + id, kPiece + "/" + id, kPiece + "/" + id));
}

TEST_F(GDriveResumable, OfNoBytesMakesAnEmptyFile) {
    Bytes bytes(1, "");
    EXPECT_TRUE(drive->ResumableUpload(&bytes.xfer, Meta("/a.bin", 0))) << seams::LogDump();
    EXPECT_EQ(Stored(), "");
    EXPECT_EQ(Put(1).Header("Content-Length"), "0");
}

TEST_F(GDriveResumable, OpensAtTheCollectionWithoutAnAddress) {
    std::string session;
    EXPECT_TRUE(drive->StartResumableUpload("", "POST", Object(R"({"title":"x"})"), session))
        << seams::LogDump();
    EXPECT_THAT(Requests(), ElementsAre(kOpen));
    EXPECT_THAT(session, testing::StartsWith(Host() + kUploadPath + "?"));
}

TEST_F(GDriveResumable, WithoutASessionInTheAnswerFailsWithALine) {
    service.AddFault(Fault::On("POST", kUploadPath).Answer(200, "{}"));
    EXPECT_FALSE(Upload());
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CLOUD_FAILED);
    EXPECT_TRUE(seams::Logged("Has no location field in header response")) << seams::LogDump();
    EXPECT_TRUE(seams::Logged("Failed to start upload session"));
}

TEST_F(GDriveResumable, TakesTheAddressOfASessionInAnySpelling) {
    service.AddFault(
        Fault::On("POST", kUploadPath).Answer(200, "", {{"lOcAtIoN", Host() + "/there?x=%2F"}}));
    std::string session;
    EXPECT_TRUE(drive->StartResumableUpload("", "POST", Object("{}"), session));
    EXPECT_EQ(session, Host() + "/there?x=%2F");
}

TEST_F(GDriveResumable, ABodyThatIsNoObjectFailsWithALine) {
    std::string session;
    for (const char* body : {"7", "[]", "\"text\"", "null"}) {
        drive->SetError(VFS_ERR_NONE, "");
        EXPECT_FALSE(drive->StartResumableUpload("", "POST", Object(body), session)) << body;
        EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CLOUD_FAILED) << body;
    }
    EXPECT_TRUE(seams::Logged("Failed to add post raw data")) << seams::LogDump();
    EXPECT_THAT(Requests(), IsEmpty());
}

TEST_F(GDriveResumable, ThatIsNotOpenedHasTheCodeOfItsStatus) {
    const struct {
        int status;
        __tag_vfs_err_ code;
    } rows[] = {{400, VFS_ERR_TOKEN_REVOKED}, {403, VFS_ERR_FORBIDDEN},
                {404, VFS_ERR_NOT_FOUND},     {410, VFS_ERR_UNKNOWN},
                {429, VFS_ERR_UNKNOWN},       {500, VFS_ERR_SERVER_ERROR},
                {503, VFS_ERR_SERVER_ERROR},  {507, VFS_ERR_SERVER_ERROR}};
    for (const auto& row : rows) {
        service.AddFault(Fault::On("POST", kUploadPath).Answer(row.status));
        EXPECT_FALSE(Upload()) << row.status;
        EXPECT_EQ(drive->GetErrorCode(), row.code) << row.status;
    }
    EXPECT_EQ(Puts(), 0U);
    EXPECT_TRUE(seams::LoggedPart("Failed to process curl " + Host() + kUploadPath))
        << seams::LogDump();
}

TEST_F(GDriveResumable, ThatIsNotTellingItsOffsetHasTheCodeOfItsStatus) {
    const struct {
        int status;
        __tag_vfs_err_ code;
    } rows[] = {{400, VFS_ERR_TOKEN_REVOKED},
                {403, VFS_ERR_FORBIDDEN},
                {404, VFS_ERR_NOT_FOUND},
                {503, VFS_ERR_SERVER_ERROR}};
    for (const auto& row : rows) {
        seams::Reset();
        service.Journal().Clear();
        service.AddFault(OnPut(0).Answer(row.status));
        EXPECT_FALSE(Upload()) << row.status;
        EXPECT_EQ(drive->GetErrorCode(), row.code) << row.status;
        EXPECT_EQ(Puts(), 1U);
        EXPECT_TRUE(seams::Logged("Failed to get start bytes")) << seams::LogDump();
    }
    EXPECT_FALSE(amy.Exists("/a.bin"));
}

TEST_F(GDriveResumable, WithoutAnAddressOrASourceFailsWithALine) {
    Bytes bytes(1, content);
    XferData nothing{nullptr, 1, nullptr};
    const Json::Value whole = Meta("/a.bin", kAllBytes);
    EXPECT_FALSE(drive->ResumableUpload(nullptr, whole));
    EXPECT_FALSE(drive->ResumableUpload(&nothing, whole));
    EXPECT_FALSE(drive->ResumableUpload(&bytes.xfer, Json::Value(Json::objectValue)));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CLOUD_FAILED);
    EXPECT_TRUE(seams::Logged("Upload URL is empty")) << seams::LogDump();
    for (const char* odd : {"[1]", "7", R"({"url":[]})", R"({"url":"http://x","title":[]})"}) {
        drive->SetError(VFS_ERR_NONE, "");
        EXPECT_FALSE(drive->ResumableUpload(&bytes.xfer, Object(odd))) << odd;
        EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CLOUD_FAILED) << odd;
    }
    EXPECT_THAT(Requests(), IsEmpty());
}

// --- sources -------------------------------------------------------------------------------------

TEST_F(GDriveResumable, OfASourceOfUnknownSizeSendsWhatItGives) {
    Bytes bytes(1, content);
    bytes.context.fd = -1;
    Json::Value meta = Meta("/a.bin", kAllBytes);
    // A browser's request is longer than the file in it.
    meta["total_bytes"] = kAllBytes + 999;
    meta["filesize"] = -1;
    EXPECT_TRUE(drive->UploadProcess(&bytes.xfer, meta)) << seams::LogDump();
    EXPECT_TRUE(Stored() == content);
    EXPECT_EQ(Put(1).Header("Transfer-Encoding"), "chunked");
    EXPECT_FALSE(Put(1).HasHeader("Content-Length"));
}

TEST_F(GDriveResumable, OfASourceOfUnknownSizeThatFailsIsFinal) {
    service.AddFault(OnPut(1).Answer(503));
    Bytes bytes(1, content);
    bytes.context.fd = -1;
    Json::Value meta = Meta("/a.bin", kAllBytes);
    meta["filesize"] = -1;
    EXPECT_FALSE(drive->UploadProcess(&bytes.xfer, meta));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_SERVER_ERROR);
    EXPECT_EQ(Puts(), 2U);
    EXPECT_FALSE(seams::LoggedPart("Retry upload")) << seams::LogDump();
}

TEST_F(GDriveResumable, OfAStreamThatWasStoredShortIsFinal) {
    service.AddFault(OnPut(1).ShortUpload(2 * kUnit));
    Bytes bytes(1, content);
    bytes.context.fd = -1;
    EXPECT_FALSE(Upload(bytes));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_RANGE_FAILED);
    EXPECT_EQ(Puts(), 2U);
    EXPECT_FALSE(amy.Exists("/a.bin"));
}

TEST_F(GDriveResumable, OfAStreamThatIsWantedFromItsMiddleSendsNothing) {
    service.AddFault(Arrived(0, "bytes=0-41"));
    Bytes bytes(1, content);
    bytes.context.fd = -1;
    EXPECT_FALSE(Upload(bytes));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_RANGE_FAILED);
    EXPECT_TRUE(seams::Logged("The service wants a stream from 42 on")) << seams::LogDump();
    EXPECT_EQ(Puts(), 1U);
}

TEST_F(GDriveResumable, OfWhatCannotSeekEndsWithALine) {
    Bytes bytes(1, content);
    int ends[2];
    ASSERT_EQ(pipe(ends), 0);
    const UniqueFd in(ends[0]);
    const UniqueFd out(ends[1]);
    bytes.context.fd = in.Get();
    EXPECT_FALSE(Upload(bytes));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CLOUD_FAILED);
    EXPECT_TRUE(seams::Logged("Failed to seek file to 0, Illegal seek")) << seams::LogDump();
    EXPECT_EQ(Puts(), 1U);
}

class GDriveFile : public GDriveResumable {
  protected:
    GDriveFile() : file(memfd_create("file", MFD_CLOEXEC)) {
        const auto length = static_cast<ssize_t>(whole.size());
        EXPECT_EQ(write(file.Get(), whole.data(), whole.size()), length);
        lseek(file.Get(), 0, SEEK_SET);
    }
    bool Upload(long long size) {
        return Cloud::UploadFile(drive.get(), server_id + "/a.bin", file.Get(), size, nullptr,
                                 nullptr, nullptr);
    }
    /** As from a caller who knows no size. */
    bool UploadToItsEnd() {
        BeginTransfer(kSizeNotKnown, {});
        XferContext context;
        context.fd = file.Get();
        XferData xfer{FileReadCallback, 1, &context};
        Json::Value meta;
        EXPECT_TRUE(drive->GetMetaDataByURI(server_id + "/a.bin", meta, "Upload"));
        meta["total_bytes"] = meta["filesize"] = -1;
        return drive->Upload(&xfer, meta);
    }
    const UniqueFd file;
    const std::string whole = Content(kDirect + 100);
};

TEST_F(GDriveFile, ThatIsShorterThanAnnouncedIsNotStored) {
    EXPECT_FALSE(Upload(kDirect + 101));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_TRANSFER_ABORTED);
    EXPECT_FALSE(amy.Exists("/a.bin"));
    EXPECT_TRUE(seams::Logged("The file ended 1 bytes before its size")) << seams::LogDump();
}

TEST_F(GDriveFile, IsStoredFromWhereItStands) {
    lseek(file.Get(), 77, SEEK_SET);
    EXPECT_TRUE(Upload(kDirect + 23)) << seams::LogDump();
    EXPECT_TRUE(Stored() == whole.substr(77));
}

TEST_F(GDriveFile, ThatIsLongerThanAnnouncedIsStoredUpToThere) {
    EXPECT_TRUE(Upload(kDirect + 99)) << seams::LogDump();
    EXPECT_TRUE(Stored() == whole.substr(0, kDirect + 99));
}

TEST_F(GDriveFile, OfASizeThatNobodyKnowsIsStoredWhole) {
    EXPECT_TRUE(UploadToItsEnd()) << seams::LogDump();
    EXPECT_TRUE(Stored() == whole);
    EXPECT_EQ(Put(1).Header("Transfer-Encoding"), "chunked");
}

TEST_F(GDriveFile, OfASizeThatNobodyKnowsIsSentAgainFromItsStart) {
    service.AddFault(OnPut(1).Answer(503));
    service.AddFault(Arrived(2, "bytes=0-524287"));
    EXPECT_TRUE(UploadToItsEnd()) << seams::LogDump();
    EXPECT_TRUE(Stored() == whole);
    EXPECT_FALSE(Put(3).HasHeader("Content-Range"));
}

// --- tokens and cancels --------------------------------------------------------------------------

TEST_F(GDriveResumable, WithARefusedTokenAtAnyStepRenewsItAndGoesOn) {
    for (int put = -1; put < 2; ++put) {
        const std::string path = "/" + std::to_string(put);
        service.Journal().Clear();
        Renew();
        service.AddFault(put < 0 ? Fault::On("POST", kUploadPath).ExpireToken()
                                 : OnPut(put).ExpireToken());
        EXPECT_TRUE(Upload(path)) << put << seams::LogDump();
        EXPECT_TRUE(Stored(path) == content);
        EXPECT_EQ(service.Journal().Count("POST", "/o/oauth2/token"), 1U);
        EXPECT_EQ(Last().Header("Authorization"), drive->Bearer());
    }
}

TEST_F(GDriveResumable, WithATokenThatCannotBeRenewedEnds) {
    service.AddFault(OnPut(1).ExpireToken());
    amy.RevokeRefreshTokens();
    EXPECT_FALSE(Upload());
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_UNAUTHORIZED);
    EXPECT_EQ(Puts(), 2U);
    EXPECT_FALSE(seams::LoggedPart("Retry upload")) << seams::LogDump();
}

TEST_F(GDriveResumable, CancelledInTheMiddleEndsThere) {
    Bytes bytes(1, content);
    bytes.cancel_at = 2;
    EXPECT_FALSE(Upload(bytes));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CANCELLED);
    EXPECT_THAT(seams::Sleeps(), IsEmpty());
    EXPECT_EQ(Puts(), 2U);
    EXPECT_FALSE(amy.Exists("/a.bin"));
}

TEST_F(GDriveResumable, CancelledDuringAWaitSendsNothingMore) {
    service.AddFault(OnPut(1).Answer(503));
    seams::OnSleep([this] { drive->SetError(VFS_ERR_CANCELLED, ""); });
    EXPECT_FALSE(Upload());
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CANCELLED);
    EXPECT_EQ(Puts(), 2U);
}

TEST_F(GDriveResumable, CancelledBeforehandSendsNothing) {
    drive->SetError(VFS_ERR_CANCELLED, "");
    EXPECT_FALSE(Upload());
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CANCELLED);
    EXPECT_THAT(Requests(), ElementsAre(kOpen));
}

}  // namespace
}  // namespace ZYROCloud
