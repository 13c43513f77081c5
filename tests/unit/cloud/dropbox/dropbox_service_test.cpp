// The driver before the simulated service: what comes of its requests in an account.
#include "cloud/dropbox/dropbox.h"
#include "support/driver_fixture.h"

namespace ZYROCloud {
namespace {

using testing::UnorderedElementsAre;

constexpr size_t kPiece = 33554432;

/** A service that gives a few items at a time. */
struct SmallPages : cloudsim::Dropbox {
    SmallPages() : Dropbox(Options()) {}
    static cloudsim::DropboxOptions Options() {
        cloudsim::DropboxOptions options;
        options.page_size = 4;
        return options;
    }
};

class DropboxService : public DriverFixture<Dropbox, SmallPages> {
  protected:
    DropboxService() : DriverFixture("dropbox") {}

    std::map<std::string, std::string> Hosts() const override {
        return {{"DropboxApiHost", service.ApiHost()},
                {"DropboxContentHost", service.ContentHost()}};
    }
    bool Upload(const std::string& content, const std::string& path) {
        Bytes bytes(1, content);
        Json::Value meta;
        EXPECT_TRUE(drive->GetMetaDataByURI(server_id + path, meta, "Upload"));
        meta["total_bytes"] = static_cast<Json::UInt64>(content.size());
        return drive->UploadProcess(&bytes.xfer, meta);
    }
    bool Download(const std::string& path, std::string& content) {
        Bytes bytes(0);
        Json::Value meta;
        EXPECT_TRUE(drive->GetMetaDataByURI(server_id + path, meta, "Download"));
        const bool done = drive->DownloadProcess(&bytes.xfer, meta);
        content = bytes.received;
        return done;
    }
    std::string Stored(const std::string& path) { return amy.Bytes(amy.Find(path)); }
};

TEST_F(DropboxService, ListsAFolderInPages) {
    for (int i = 0; i < 10; ++i) {
        amy.AddPath("/docs/" + std::to_string(i), "x");
    }
    Json::Value out;
    EXPECT_TRUE(drive->ListFolder("/docs", Json::Value(), out)) << seams::LogDump();
    EXPECT_THAT(Each(out, "name"),
                UnorderedElementsAre("0", "1", "2", "3", "4", "5", "6", "7", "8", "9"));
    EXPECT_THAT(Requests(),
                ElementsAre("POST /2/files/list_folder", "POST /2/files/list_folder/continue",
                            "POST /2/files/list_folder/continue"));
}

TEST_F(DropboxService, ListsTheRootByEitherName) {
    amy.AddPath("/a.txt", "x");
    for (const char* root_name : {"", "/"}) {
        Json::Value out;
        EXPECT_TRUE(drive->ListFolder(root_name, Json::Value(), out)) << seams::LogDump();
        EXPECT_THAT(Each(out, "path_display"), ElementsAre("/a.txt"));
    }
}

TEST_F(DropboxService, KnowsTheAccountAndItems) {
    amy.AddPath("/docs/a b.txt", "hello");
    Json::Value out;
    EXPECT_TRUE(drive->GetAccountInfo(Json::Value(), out)) << seams::LogDump();
    EXPECT_EQ(out["email"], "amy@example.com");
    EXPECT_TRUE(drive->GetFileInfo("/docs/a b.txt", Json::Value(), out)) << seams::LogDump();
    EXPECT_FALSE(drive->IsDir(out));
    EXPECT_EQ(drive->GetFileID(out), "/docs/a b.txt");
    EXPECT_TRUE(drive->GetFileInfo("/docs", Json::Value(), out));
    EXPECT_TRUE(drive->IsDir(out));
    EXPECT_FALSE(drive->GetFileInfo("/none", Json::Value(), out));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_NOT_FOUND);
}

TEST_F(DropboxService, AMoveOntoAnExistingFileOverwritesItAndARenameDoesNot) {
    amy.AddPath("/a.txt", "new");
    amy.AddPath("/b.txt", "old");
    EXPECT_FALSE(drive->Rename("/a.txt", "b.txt"));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CONFLICT) << seams::LogDump();
    EXPECT_EQ(Stored("/b.txt"), "old");
    EXPECT_TRUE(drive->Move("/a.txt", "/b.txt")) << seams::LogDump();
    EXPECT_EQ(Stored("/b.txt"), "new");
    EXPECT_FALSE(amy.Exists("/a.txt"));
    EXPECT_TRUE(drive->Rename("/b.txt", "c.txt"));
    EXPECT_EQ(Stored("/c.txt"), "new");
}

TEST_F(DropboxService, ACopyReplacesAFileAndNeverAFolder) {
    amy.AddPath("/a.txt", "new");
    amy.AddPath("/b.txt", "old");
    amy.AddPath("/folder/inside", "kept");
    EXPECT_TRUE(drive->Copy("/a.txt", "/b.txt")) << seams::LogDump();
    EXPECT_EQ(Stored("/b.txt"), "new");
    EXPECT_EQ(Stored("/a.txt"), "new");
    EXPECT_FALSE(drive->Copy("/a.txt", "/folder"));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_IS_DIRECTORY);
    EXPECT_EQ(Stored("/folder/inside"), "kept");
}

TEST_F(DropboxService, WhatIsCopiedOrMovedOntoItselfIsStillThere) {
    amy.AddPath("/a.txt", "kept");
    drive->Copy("/a.txt", "/A.TXT");
    EXPECT_TRUE(amy.Exists("/a.txt")) << service.Journal().Text();
    drive->Move("/a.txt", "/a.txt");
    EXPECT_TRUE(amy.Exists("/a.txt")) << service.Journal().Text();
}

TEST_F(DropboxService, FoldersAreMadeAndDeletedOnceAndTwice) {
    EXPECT_TRUE(drive->CreateFolder("/", "new", Json::Value())) << seams::LogDump();
    EXPECT_TRUE(drive->CreateFolder("/new", "inner", Json::Value()));
    EXPECT_TRUE(amy.Exists("/new/inner"));
    EXPECT_FALSE(drive->CreateFolder("/", "new", Json::Value()));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CONFLICT);
    EXPECT_TRUE(drive->Delete("/new"));
    EXPECT_FALSE(amy.Exists("/new"));
    EXPECT_TRUE(drive->Delete("/new")) << seams::LogDump();
}

TEST_F(DropboxService, WhatGoesUpComesDown) {
    for (const size_t size : {size_t{0}, size_t{1}, size_t{23}, kPiece, kPiece + 1}) {
        const std::string content(size, static_cast<char>('a' + size % 26));
        const std::string path = "/\xc3\xa4\xf0\x9f\x98\x80 " + std::to_string(size);
        EXPECT_TRUE(Upload(content, path)) << size << seams::LogDump();
        EXPECT_TRUE(Stored(path) == content) << size;
        std::string back;
        EXPECT_TRUE(Download(path, back)) << size << seams::LogDump();
        EXPECT_TRUE(back == content) << size;
        drive->Init();
    }
}

TEST_F(DropboxService, ADirectUploadOverAnExistingNameMakesAFileUnderAChangedName) {
    amy.AddPath("/a.txt", "old");
    EXPECT_TRUE(Upload("new", "/a.txt")) << seams::LogDump();
    EXPECT_EQ(Stored("/a.txt"), "old");
    Json::Value out;
    EXPECT_TRUE(drive->ListFolder("/", Json::Value(), out));
    EXPECT_EQ(out.size(), 2U) << json::toString(out);
}

TEST_F(DropboxService, AChunkedUploadOverAnExistingNameIsLeftToTheService) {
    amy.AddPath("/a.txt", "old");
    EXPECT_FALSE(Upload(std::string(kPiece + 1, 'x'), "/a.txt"));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CONFLICT) << seams::LogDump();
    EXPECT_EQ(Stored("/a.txt"), "old");
}

TEST_F(DropboxService, AnAnswerLostAfterAPieceWasTakenLeavesNoFile) {
    service.AddFault(Fault::On("POST", "/2/files/upload_session/append_v2").LoseAnswer());
    EXPECT_FALSE(Upload(std::string(kPiece + 1, 'x'), "/a.txt"));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_BAD_REQUEST) << service.Journal().Text();
    EXPECT_FALSE(amy.Exists("/a.txt"));
}

TEST_F(DropboxService, ALostAnswerToTheBeginningOfASessionBeginsAnotherOne) {
    service.AddFault(Fault::On("POST", "/2/files/upload_session/start").LoseAnswer());
    EXPECT_TRUE(Upload(std::string(kPiece + 1, 'x'), "/a.txt")) << seams::LogDump();
    EXPECT_EQ(Stored("/a.txt").size(), kPiece + 1);
    EXPECT_EQ(service.Journal().Count("POST", "/2/files/upload_session/start"), 2U);
}

TEST_F(DropboxService, ALostAnswerToTheCommitIsAFailureAndTheFileIsThere) {
    service.AddFault(Fault::On("POST", "/2/files/upload_session/finish").LoseAnswer());
    EXPECT_FALSE(Upload(std::string(kPiece + 1, 'x'), "/a.txt"));
    EXPECT_NE(drive->GetErrorCode(), VFS_ERR_NONE);
    EXPECT_EQ(Stored("/a.txt").size(), kPiece + 1) << service.Journal().Text();
    EXPECT_EQ(service.Journal().Count("POST", "/2/files/upload_session/finish"), 2U);
}

TEST_F(DropboxService, ASessionThatIsGoneEndsTheUpload) {
    std::string session;
    Bytes bytes(1, "hello");
    unsigned long long offset = 0;
    ASSERT_TRUE(drive->StartChunkUploadSession(session));
    service.AdvanceClock(8 * 24 * 3600);
    Renew();
    EXPECT_FALSE(drive->StartChunkUpload(&bytes.xfer, session, &offset, 5));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_NOT_FOUND) << seams::LogDump();
    EXPECT_EQ(offset, 0U);
    EXPECT_FALSE(drive->CommitChunkUpload(session, "/a.txt", 0));
    EXPECT_FALSE(amy.Exists("/a.txt"));
}

TEST_F(DropboxService, ACopyBetweenAccountsMovesNoBytesThroughHere) {
    cloudsim::Account& bob = service.AddAccount("bob@example.com", "Bob Roe");
    amy.AddPath("/a.txt", "hello");
    Json::Value profile;
    profile["access_token"] = bob.IssueTokens(3600, "mine").access_token;
    Dropbox target(profiles::kUser, profile);
    EXPECT_TRUE(target.CopyFromRef("/a.txt", "/b.txt", drive.get())) << seams::LogDump();
    EXPECT_EQ(bob.Bytes(bob.Find("/b.txt")), "hello");
    EXPECT_EQ(Stored("/a.txt"), "hello");
}

TEST_F(DropboxService, AnExpiredTokenIsReported) {
    amy.ExpireAccessTokens();
    Json::Value out;
    EXPECT_FALSE(drive->ListFolder("/", Json::Value(), out));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_UNAUTHORIZED);
    EXPECT_THAT(Requests(), ElementsAre("POST /2/files/list_folder"));
}

TEST_F(DropboxService, ACursorThatTheServiceForgotEndsTheListing) {
    for (int i = 0; i < 5; ++i) {
        amy.AddPath("/" + std::to_string(i), "x");
    }
    service.AddFault(Fault::On("POST", "/2/files/list_folder/continue")
                         .Answer(409, R"({"error_summary":"reset/","error":{".tag":"reset"}})"));
    Json::Value out;
    EXPECT_FALSE(drive->ListFolder("/", Json::Value(), out));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_BAD_REQUEST);
}

TEST_F(DropboxService, ACopyToWhereItComesFromInTheSameAccountKeepsTheFile) {
    amy.AddPath("/a.txt", "only");
    Json::Value profile;
    profile["access_token"] = drive->Token().access_token;
    Dropbox twin(profiles::kUser, profile);
    for (const char* to : {"/a.txt", "/A.TXT"}) {
        EXPECT_FALSE(drive->CopyFromRef("/a.txt", to, &twin)) << to;
        EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CONFLICT);
        EXPECT_EQ(Stored("/a.txt"), "only");
    }
}

}  // namespace
}  // namespace ZYROCloud
