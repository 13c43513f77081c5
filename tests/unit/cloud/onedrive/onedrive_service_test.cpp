// The driver before a service that keeps what it is given.
#include "unit/cloud/onedrive/onedrive_fixture.h"

namespace ZYROCloud {
namespace {

class OneDriveService : public OneDriveServiceTest {
  protected:
    /** The id under which the service shows the item at a path, which the tree then knows. */
    std::string Known(const std::string& path) {
        std::string id;
        EXPECT_TRUE(drive->GetFileIDByPathFromServer("", path, "", "", id)) << path;
        tree.Set(path, "id::file", id);
        return id;
    }
    bool Upload(const std::string& path, long long size, std::string* content = nullptr) {
        const UniqueFd file = PatternFile(size, content);
        return Cloud::UploadFile(drive.get(), kServerId + path, file.Get(), size, nullptr, nullptr,
                                 nullptr);
    }
    std::string Stored(const std::string& path) { return amy.Bytes(amy.Find(path)); }
};

TEST_F(OneDriveService, ShowsWhatAnAccountHolds) {
    amy.AddPath("/docs/a.txt", "hello");
    service.SetType(amy.AddFolder(amy.Root(), "pictures"), "album");
    Json::Value items;
    ASSERT_TRUE(drive->ListFolder("", Json::Value(), items)) << seams::LogDump();
    ASSERT_EQ(items.size(), 2U);
    for (const Json::Value& item : items) {
        EXPECT_TRUE(drive->IsDir(item)) << item;
    }
    Json::Value file;
    EXPECT_TRUE(drive->GetFileInfoByPathFromServer("/DOCS/A.TXT", "", Json::Value(), "", file));
    EXPECT_EQ(file["name"], "a.txt");
    EXPECT_FALSE(drive->IsDir(file));
    Json::Value account;
    EXPECT_TRUE(drive->GetAccountInfo(Json::Value(), account));
    EXPECT_EQ(account["id"], amy.Id());
}

TEST_F(OneDriveService, TakesChangesOfEveryKind) {
    amy.AddPath("/docs/a.txt", "hello");
    amy.AddPath("/b.txt", "other");
    const std::string docs = Known("/docs");
    Known("/docs/a.txt");
    EXPECT_TRUE(drive->CreateFolder(docs, "new", Json::Value())) << seams::LogDump();
    EXPECT_TRUE(drive->CreateFolder("", "top", Json::Value()));
    EXPECT_FALSE(drive->CreateFolder("", "top", Json::Value()));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CONFLICT);
    EXPECT_TRUE(drive->Rename(Known("/b.txt"), "c.txt"));
    EXPECT_EQ(Stored("/c.txt"), "other");
    Known("/top");
    EXPECT_TRUE(drive->Copy("/docs/a.txt", "/top/a.txt")) << seams::LogDump();
    EXPECT_EQ(Stored("/top/a.txt"), "hello");
    EXPECT_TRUE(drive->Move("/docs/a.txt", "/a.txt")) << seams::LogDump();
    EXPECT_EQ(Stored("/a.txt"), "hello");
    EXPECT_FALSE(amy.Exists("/docs/a.txt"));
    const std::string gone = Known("/top/a.txt");
    EXPECT_TRUE(drive->Delete(gone));
    EXPECT_FALSE(drive->Delete(gone));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_NOT_FOUND);
}

TEST_F(OneDriveService, ReplacesAFileThatIsInTheWayOfACopyAndNoFolder) {
    amy.AddPath("/a.txt", "new");
    amy.AddPath("/docs/a.txt", "old");
    amy.AddPath("/more/a.txt/inside", "kept");
    for (const char* path : {"/a.txt", "/docs", "/more"}) {
        Known(path);
    }
    EXPECT_TRUE(drive->Copy("/a.txt", "/docs/a.txt")) << seams::LogDump();
    EXPECT_EQ(Stored("/docs/a.txt"), "new");
    EXPECT_FALSE(drive->Copy("/a.txt", "/more/a.txt"));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_IS_DIRECTORY);
    EXPECT_EQ(Stored("/more/a.txt/inside"), "kept");
    EXPECT_FALSE(drive->Copy("/a.txt", "/a.txt"));
    EXPECT_EQ(Stored("/a.txt"), "new");
}

TEST_F(OneDriveService, LeavesAFileOfAnotherNameThanTheCopyHas) {
    amy.AddPath("/a.txt", "new");
    amy.AddPath("/docs/a.txt", "met");
    amy.AddPath("/docs/b.txt", "named");
    Known("/a.txt");
    Known("/docs");
    EXPECT_FALSE(drive->Copy("/a.txt", "/docs/b.txt"));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CONFLICT);
    EXPECT_EQ(Stored("/docs/a.txt"), "met");
    EXPECT_EQ(Stored("/docs/b.txt"), "named");
}

TEST_F(OneDriveService, GivesBackWhatItWasGiven) {
    amy.AddFolder(amy.Root(), "docs");
    Known("/docs");
    for (const long long size : {0LL, 1LL, 23LL, 32 * kMiB, 32 * kMiB + 1, 40 * kMiB}) {
        const std::string path = "/docs/" + std::to_string(size) + " #&.bin";
        std::string content;
        ASSERT_TRUE(Upload(path, size, &content)) << size << seams::LogDump();
        EXPECT_TRUE(Stored(path) == content) << size;
        Known(path);
        long long told = -1;
        EXPECT_TRUE(drive->GetFileSize(kServerId + path, &told)) << seams::LogDump();
        EXPECT_EQ(told, size);
        UniqueFd back(memfd_create("back", MFD_CLOEXEC));
        EXPECT_TRUE(Cloud::DownloadFile(drive.get(), kServerId + path, back.Get(), size, nullptr,
                                        nullptr, nullptr))
            << seams::LogDump();
        EXPECT_EQ(lseek(back.Get(), 0, SEEK_END), size);
        std::string arrived(content.size(), '\0');
        EXPECT_EQ(pread(back.Get(), arrived.data(), arrived.size(), 0), size);
        EXPECT_TRUE(arrived == content) << size;
    }
    EXPECT_EQ(service.UploadSessions(), 0U);
}

TEST_F(OneDriveService, GivesAPartOfAFile) {
    amy.AddPath("/a.txt", "0123456789");
    const std::string url = service.ApiHost() + "/v5.0/" + Known("/a.txt") + "/content";
    char buffer[8] = "";
    long long got = 0;
    EXPECT_TRUE(Cloud::DownloadFileToBuffer(drive.get(), url, buffer, 3, 4, &got, nullptr, nullptr,
                                            nullptr))
        << seams::LogDump();
    EXPECT_EQ(got, 5);
    EXPECT_EQ(std::string(buffer, 4), "3456");
}

TEST_F(OneDriveService, KeepsAFileWhoseSessionSufferedAtEveryStep) {
    struct {
        const char* name;
        Fault fault;
    } rows[] = {
        {"the first answer is lost", Fault::On("BITS_POST", "/").After(1).LoseAnswer()},
        {"the second answer is lost", Fault::On("BITS_POST", "/").After(2).LoseAnswer()},
        {"the service is busy", Fault::On("BITS_POST", "/").After(2).Times(2).Answer(503)},
        {"the service is busy for long", Fault::On("BITS_POST", "/").After(2).Times(2).Answer(503)},
        {"the last fragment meets it", Fault::On("BITS_POST", "/").After(3).Times(2).Answer(500)},
        {"the last answer is lost", Fault::On("BITS_POST", "/").After(3).LoseAnswer()},
        {"the token expires", Fault::On("BITS_POST", "/").After(2).ExpireToken()},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(row.name);
        seams::Reset();
        drive->SetError(VFS_ERR_NONE, "");
        service.AddFault(row.fault);
        const std::string path = std::string("/") + row.name;
        std::string content;
        EXPECT_TRUE(Upload(path, 66 * kMiB, &content)) << seams::LogDump();
        EXPECT_TRUE(Stored(path) == content);
        EXPECT_THAT(service.UnusedFaults(), IsEmpty());
        service.ClearFaults();
    }
}

TEST_F(OneDriveService, ThatBreaksOffInAFragmentHasAllOfTheFileOrNothing) {
    // A dead connection that had been kept is replaced; one that dies later ends the upload.
    for (const bool reset : {false, true}) {
        for (const int fragment : {1, 2}) {
            Fault fault = Fault::On("BITS_POST", "/").After(fragment).CutUpload(1 << 20);
            service.AddFault(reset ? fault.Reset() : fault);
            const std::string path = "/" + std::to_string(fragment) + std::to_string(reset);
            std::string content;
            const bool sent = Upload(path, 40 * kMiB, &content);
            EXPECT_EQ(sent, amy.Exists(path)) << path;
            EXPECT_TRUE(!sent || Stored(path) == content);
            EXPECT_TRUE(sent || drive->GetErrorCode() != VFS_ERR_NONE) << path;
            drive->SetError(VFS_ERR_NONE, "");
            service.ClearFaults();
        }
    }
}

TEST_F(OneDriveService, ThatHasForgottenASessionEndsTheUpload) {
    service.AddFault(Fault::On("BITS_POST", "/").After(2).Answer(404));
    EXPECT_FALSE(Upload("/a", 40 * kMiB));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_NOT_FOUND);
    EXPECT_FALSE(amy.Exists("/a"));
}

TEST_F(OneDriveService, WithoutRoomEndsTheUpload) {
    amy.SetQuota(kMiB);
    for (const long long size : {2 * kMiB, 40 * kMiB}) {
        EXPECT_FALSE(Upload("/a", size));
        EXPECT_NE(drive->GetErrorCode(), VFS_ERR_NONE);
        EXPECT_FALSE(amy.Exists("/a"));
    }
}

TEST_F(OneDriveService, ThatWantsToBeLeftAloneIsLeftAloneForThatTimeAndMore) {
    service.AddFault(Fault::On("GET", "/v5.0/me/skydrive/files")
                         .Answer(420, R"({"error":{"code":"request_throttled",)"
                                      R"("message":"Too many requests. Wait 20 seconds."}})"));
    Json::Value items;
    EXPECT_TRUE(drive->ListFolder("", Json::Value(), items)) << seams::LogDump();
    EXPECT_THAT(seams::Sleeps(), ElementsAre(50));
}

TEST_F(OneDriveService, RenewsATokenThatRanOut) {
    amy.ExpireAccessTokens();
    Json::Value items;
    EXPECT_TRUE(drive->ListFolder("", Json::Value(), items)) << seams::LogDump();
    const auto stored = profiles::Stored(profiles::VFS_CONFIG_CONNECT)[kServerId];
    EXPECT_EQ(token_profile::Deciphered(stored["access_token"].asString()),
              amy.LastTokens().access_token);
    EXPECT_EQ(token_profile::Deciphered(stored["refresh_token"].asString()),
              amy.LastTokens().refresh_token);
    amy.ExpireAccessTokens();
    amy.RevokeRefreshTokens();
    EXPECT_FALSE(drive->ListFolder("", Json::Value(), items));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_UNAUTHORIZED);
}

TEST_F(OneDriveService, ListsTenThousandItemsAndFindsTheLast) {
    const std::string folder = amy.AddFolder(amy.Root(), "many");
    amy.AddMany(folder, 10000, 1);
    EXPECT_NE(Known("/many/ITEM-009999.BIN"), "");
}

}  // namespace
}  // namespace ZYROCloud
