#include "unit/cloud/gdrive/gdrive_fixture.h"

namespace ZYROCloud {
namespace {

using testing::SizeIs;
using testing::StartsWith;

constexpr const char* kPdf = "application/pdf";

// --- where the bytes of an item are --------------------------------------------------------------

class GDriveLink : public GDriveTest {
  protected:
    void Describe(const std::string& text) { tree.Set("/a", "standard::description", text); }
    bool Ask(const std::string& link_attr = "") {
        return drive->GetFileDownloadURL(server_id + "/a", link_attr, url);
    }
    std::string url;
};

TEST_F(GDriveLink, OfAFileIsWhatItsDescriptionHas) {
    Describe(R"({"downloadUrl":"https://d/1","alternateLink":"https://l"})");
    EXPECT_TRUE(Ask()) << seams::LogDump();
    EXPECT_EQ(url, "https://d/1");
    EXPECT_THAT(Requests(), IsEmpty());
}

TEST_F(GDriveLink, OfADocumentInAListedTypeIsThatMemberOfItsExportLinks) {
    Describe(R"({"downloadUrl":"https://d/1","exportLinks":{"application/pdf":"https://e/pdf",
                 "text/plain":"https://e/txt"},"alternateLink":"https://l"})");
    EXPECT_TRUE(Ask(kPdf)) << seams::LogDump();
    EXPECT_EQ(url, "https://e/pdf");
    EXPECT_TRUE(Ask("text/html"));
    EXPECT_EQ(url, "alternateLink://https://l");
}

TEST_F(GDriveLink, OfADocumentWithoutAnyIsTheAddressOfItsPage) {
    Describe(R"({"alternateLink":"https://l"})");
    EXPECT_TRUE(Ask());
    EXPECT_EQ(url, "alternateLink://https://l");
    EXPECT_TRUE(Ask(kPdf));
    EXPECT_EQ(url, "alternateLink://https://l");
}

TEST_F(GDriveLink, OfADescriptionThatLacksAllIsAnEmptyAddressOfAPage) {
    for (const char* text :
         {"{}", "[]", "7", "null", R"({"downloadUrl":7})",
          R"({"downloadUrl":"","alternateLink":[]})", R"({"exportLinks":"x"})"}) {
        Describe(text);
        for (const char* link_attr : {"", kPdf}) {
            url = "old";
            EXPECT_TRUE(Ask(link_attr)) << text;
            EXPECT_EQ(url, "alternateLink://") << text;
        }
    }
}

TEST_F(GDriveLink, OfADescriptionThatIsNoJsonFailsWithALine) {
    Describe("{\"downloadUrl\":");
    EXPECT_FALSE(Ask());
    EXPECT_TRUE(seams::Logged("Failed to parse to json format, {\"downloadUrl\":"))
        << seams::LogDump();
}

TEST_F(GDriveLink, OfAnItemThatTheTreeDoesNotKnowFailsWithALine) {
    EXPECT_FALSE(Ask());
    EXPECT_TRUE(seams::Logged("Failed to get download url by [" + tree.Folder() +
                              "/a], No such file or directory"))
        << seams::LogDump();
    tree.Add("/a");
    EXPECT_FALSE(Ask());
    EXPECT_TRUE(
        seams::Logged("Failed to get download url by [" + tree.Folder() + "/a], No data available"))
        << seams::LogDump();
}

TEST_F(GDriveLink, OfAnAddressOfAnotherConnectionFailsWithALine) {
    EXPECT_FALSE(drive->GetFileDownloadURL("box://amy@example.com/a", "", url));
    EXPECT_TRUE(seams::Logged("Failed to get full path by uri:[box://amy@example.com/a]"))
        << seams::LogDump();
}

TEST_F(GDriveLink, IsReadFromEightKiBAndNoMore) {
    const std::string fits = R"({"downloadUrl":"https://d/1","x":")";
    Describe(fits + std::string(8192 - fits.size() - 2, 'x') + "\"}");
    EXPECT_TRUE(Ask()) << seams::LogDump();
    EXPECT_EQ(url, "https://d/1");
    Describe(fits + std::string(8193 - fits.size() - 2, 'x') + "\"}");
    EXPECT_FALSE(Ask());
    EXPECT_TRUE(seams::LoggedPart("Failed to get download url by [")) << seams::LogDump();
}

// --- the link of a document ----------------------------------------------------------------------

class GDriveDocument : public GDriveTest {
  protected:
    bool Download() { return drive->DownloadProcess(&bytes.xfer, meta); }
    Bytes bytes{0};
    Json::Value meta = Object(R"({"url":"alternateLink://https://docs/1"})");
};

TEST_F(GDriveDocument, WithoutAnExportLinkForTheWantedTypeYieldsTheTextOfAnObjectWithItsUrl) {
    service.AddDocument(amy, root, "Plan", "form", "");
    Show("/Plan");
    ASSERT_TRUE(drive->GetMetaDataByURI(server_id + "/Plan", meta, std::string("Download=") + kPdf))
        << seams::LogDump();
    service.Journal().Clear();
    EXPECT_TRUE(Download()) << seams::LogDump();
    const Json::Value link = Object(bytes.received);
    EXPECT_THAT(link.getMemberNames(), ElementsAre("url"));
    EXPECT_EQ("alternateLink://" + link["url"].asString(), meta["url"].asString());
    EXPECT_THAT(Requests(), IsEmpty());
}

TEST_F(GDriveDocument, NeedsNoToken) {
    Renew("1");
    amy.RevokeRefreshTokens();
    EXPECT_TRUE(Download()) << seams::LogDump();
    EXPECT_EQ(bytes.received, R"({"url":"https://docs/1"})");
    EXPECT_FALSE(bytes.context.can_retry);
}

TEST_F(GDriveDocument, OfALongAddressIsCutAt1023Bytes) {
    meta["url"] = "alternateLink://" + std::string(2000, 'x');
    EXPECT_TRUE(Download());
    EXPECT_EQ(bytes.received, R"({"url":")" + std::string(1015, 'x'));
}

TEST_F(GDriveDocument, IsReadInPartsFromWhereTheyBegin) {
    const struct {
        int from, length;
        const char* text;
    } rows[] = {{0, 24, R"({"url":"https://docs/1"})"},
                {0, 5, R"({"url)"},
                {17, 100, R"(ocs/1"})"},
                {24, 10, ""},
                {1000, 10, ""},
                {8, 0, R"({"url":"https://docs/1"})"}};
    for (const auto& row : rows) {
        bytes.received.clear();
        meta["from_bytes"] = row.from;
        meta["len"] = row.length;
        EXPECT_TRUE(Download()) << row.from;
        EXPECT_EQ(bytes.received, row.text) << row.from;
    }
}

TEST_F(GDriveDocument, IsReadThroughTheEngineBehindARangeOfAFile) {
    const std::string id = amy.AddPath("/a.txt", "0123456789");
    Show("/a.txt");
    std::string url;
    ASSERT_TRUE(drive->GetFileDownloadURL(server_id + "/a.txt", "", url));
    char buffer[101] = "";
    long long got = 0;
    const auto read = [&](const std::string& from, long long at, long long length) {
        return Cloud::DownloadFileToBuffer(drive.get(), from, buffer, at, length, &got, nullptr,
                                           nullptr, nullptr);
    };
    EXPECT_TRUE(read(url, 2, 4)) << seams::LogDump();
    // The handler's last answer was a part of another file.
    EXPECT_TRUE(read("alternateLink://https://docs/1", 0, 100)) << seams::LogDump();
    EXPECT_EQ(std::string(buffer, got), R"({"url":"https://docs/1"})");
    EXPECT_TRUE(read("alternateLink://https://docs/1", 17, 100)) << seams::LogDump();
    EXPECT_EQ(std::string(buffer, got), R"(ocs/1"})");
}

TEST_F(GDriveDocument, WithoutACallbackFails) {
    bytes.xfer.callback = nullptr;
    EXPECT_FALSE(Download());
    EXPECT_FALSE(drive->DownloadProcess(nullptr, meta));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CLOUD_FAILED);
}

TEST_F(GDriveDocument, ThatCannotBeWrittenIsNoSuccess) {
    bytes.cancel_at = 0;
    EXPECT_FALSE(Download());
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CANCELLED);
    YLIBCErrSetEx(0x2900, "test", 1);
    bytes.xfer.callback = [](char*, size_t, size_t, void*) -> size_t { return 0; };
    EXPECT_FALSE(Download());
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_TRANSFER_ABORTED);
}

// --- files ---------------------------------------------------------------------------------------

class GDriveDownload : public GDriveTest {
  protected:
    void SetUp() override {
        GDriveTest::SetUp();
        id = amy.AddPath("/a.txt", "0123456789");
        Show("/a.txt");
        ASSERT_TRUE(drive->GetMetaDataByURI(server_id + "/a.txt", meta, "Download"))
            << seams::LogDump();
        path = meta["url"].asString().substr(service.ContentHost().size());
        service.Journal().Clear();
    }
    bool Download() { return drive->DownloadProcess(&bytes.xfer, meta); }
    /** The old address is good for nothing, and the tree learns the new one when it forgets. */
    void Expire() {
        service.ExpireDownloadUrls();
        Show("/a.txt");
    }

    Bytes bytes{0};
    Json::Value meta{Json::objectValue};
    std::string id, path;
};

TEST_F(GDriveDownload, OfAllAsksTheAddressAsItIs) {
    EXPECT_TRUE(Download()) << seams::LogDump();
    EXPECT_EQ(bytes.received, "0123456789");
    ASSERT_THAT(Requests(), SizeIs(1));
    EXPECT_EQ(Last().target, path);
    EXPECT_EQ(Last().Header("Authorization"), drive->Bearer());
    EXPECT_FALSE(Last().HasHeader("Range"));
}

TEST_F(GDriveDownload, OfAPartAsksForOneByteMore) {
    meta["from_bytes"] = 2;
    meta["len"] = 4;
    EXPECT_TRUE(Download()) << seams::LogDump();
    EXPECT_EQ(Last().Header("Range"), "bytes=2-6");
    EXPECT_EQ(bytes.received, "23456");
}

TEST_F(GDriveDownload, BeyondFourGiBAsksForSuchAPlace) {
    meta["from_bytes"] = "5368709120";
    meta["len"] = static_cast<Json::UInt64>(4294967296);
    EXPECT_FALSE(Download());
    EXPECT_EQ(Last().Header("Range"), "bytes=5368709120-9663676416");
}

TEST_F(GDriveDownload, InATypeOfExportIsThatDocument) {
    service.AddDocument(amy, root, "Plan", "document", "exported");
    Show("/Plan");
    Json::Value document;
    ASSERT_TRUE(
        drive->GetMetaDataByURI(server_id + "/Plan", document, std::string("Download=") + kPdf))
        << seams::LogDump();
    EXPECT_TRUE(drive->DownloadProcess(&bytes.xfer, document)) << seams::LogDump();
    EXPECT_EQ(bytes.received, "exported");
}

TEST_F(GDriveDownload, WithoutAnAddressFailsWithALine) {
    meta.removeMember("url");
    EXPECT_FALSE(Download());
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CLOUD_FAILED);
    EXPECT_TRUE(seams::Logged("Downlaod URL is empty")) << seams::LogDump();
    EXPECT_THAT(Requests(), IsEmpty());
}

TEST_F(GDriveDownload, WithoutAPlaceForTheBytesOrOddArgumentsFails) {
    XferData nothing{nullptr, 0, nullptr};
    for (XferData* xfer : {static_cast<XferData*>(nullptr), &nothing}) {
        drive->SetError(VFS_ERR_NONE, "");
        EXPECT_FALSE(drive->DownloadProcess(xfer, meta));
        EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CLOUD_FAILED);
    }
    for (const char* odd : {"[1]", R"({"url":{}})", "7", R"({"url":"http://x","path":[]})"}) {
        drive->SetError(VFS_ERR_NONE, "");
        EXPECT_FALSE(drive->DownloadProcess(&bytes.xfer, Object(odd))) << odd;
        EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CLOUD_FAILED) << odd;
    }
    EXPECT_THAT(Requests(), IsEmpty());
}

TEST_F(GDriveDownload, RefusedWith403EmptiesTheDescriptionTakesAFreshAddressAndTriesAgain) {
    Expire();
    EXPECT_TRUE(Download()) << seams::LogDump();
    EXPECT_EQ(bytes.received, "0123456789");
    const auto writes = tree.Writes();
    ASSERT_THAT(writes, SizeIs(1));
    EXPECT_EQ(writes[0].path + " " + writes[0].name + " [" + writes[0].value + "]",
              "/a.txt zyro::cacheclean []");
    const auto all = service.Journal().All();
    ASSERT_THAT(all, SizeIs(2));
    EXPECT_EQ(all[0].status, 403);
    EXPECT_NE(all[0].target, all[1].target);
    // The handler waits behind a failure, and so does the loop.
    EXPECT_THAT(seams::Sleeps(), ElementsAre(5, 5));
    EXPECT_TRUE(seams::Logged("Retry Download: 0/6")) << seams::LogDump();
}

TEST_F(GDriveDownload, OfAPartIsOfThatPartFromTheFreshAddressToo) {
    meta["from_bytes"] = 2;
    meta["len"] = 4;
    Expire();
    EXPECT_TRUE(Download()) << seams::LogDump();
    EXPECT_EQ(bytes.received, "23456");
}

TEST_F(GDriveDownload, RefusedWithoutAnEntryInTheTreeFailsWithALine) {
    service.ExpireDownloadUrls();
    tree.Remove("/a.txt");
    EXPECT_FALSE(Download());
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_FORBIDDEN);
    EXPECT_TRUE(seams::Logged("Failed to clean fuse cache [" + tree.Folder() +
                              "/a.txt], No such file or directory"))
        << seams::LogDump();
    EXPECT_THAT(Requests(), SizeIs(1));
}

TEST_F(GDriveDownload, RefusedWithoutAFreshDescriptionFailsWithALine) {
    service.ExpireDownloadUrls();
    tree.Unset("/a.txt", "standard::description");
    EXPECT_FALSE(Download());
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_FORBIDDEN);
    EXPECT_TRUE(seams::Logged("Failed to get download url from " + server_id + "/a.txt"))
        << seams::LogDump();
    EXPECT_THAT(Requests(), SizeIs(1));
}

TEST_F(GDriveDownload, RefusedForEverIsTriedSixTimesInAll) {
    service.AddFault(Fault::On("GET", "/").AtHost("download").Times(6).Answer(403));
    EXPECT_FALSE(Download());
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_FORBIDDEN);
    EXPECT_THAT(Requests(), SizeIs(6));
    EXPECT_THAT(tree.Writes(), SizeIs(6));
    // The service makes addresses anew, with the second in them.
    EXPECT_TRUE(seams::LoggedPart("Failed to process curl " + service.ContentHost() + "/docs/"))
        << seams::LogDump();
}

TEST_F(GDriveDownload, IsRepeatedFromTheSameAddressForAFailureOfTheService) {
    service.AddFault(Fault::On("GET", path).Times(2).Answer(503));
    EXPECT_TRUE(Download()) << seams::LogDump();
    EXPECT_EQ(bytes.received, "0123456789");
    EXPECT_THAT(tree.Writes(), IsEmpty());
    EXPECT_TRUE(seams::Logged("Retry Download: 1/6")) << seams::LogDump();
}

TEST_F(GDriveDownload, OfWhatIsGoneFailsAtOnceAndWritesNothing) {
    amy.Remove(id);
    EXPECT_FALSE(Download());
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_NOT_FOUND);
    EXPECT_EQ(bytes.received, "");
    EXPECT_THAT(seams::Sleeps(), IsEmpty());
}

TEST_F(GDriveDownload, BehindItsFirstByteIsNotRepeated) {
    bytes.context.can_retry = false;
    service.AddFault(Fault::On("GET", path).Answer(503));
    EXPECT_FALSE(Download());
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_SERVER_ERROR);
    EXPECT_FALSE(seams::LoggedPart("Retry Download")) << seams::LogDump();
}

TEST_F(GDriveDownload, CancelledWhileBytesArriveEndsThere) {
    bytes.cancel_at = 0;
    EXPECT_FALSE(Download());
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CANCELLED);
    EXPECT_THAT(seams::Sleeps(), IsEmpty());
    service.Journal().Clear();
    EXPECT_FALSE(Download());
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CANCELLED);
    EXPECT_THAT(Requests(), IsEmpty());
}

TEST_F(GDriveDownload, WithARefusedTokenRenewsItOnce) {
    amy.ExpireAccessTokens();
    EXPECT_TRUE(Download()) << seams::LogDump();
    EXPECT_EQ(bytes.received, "0123456789");
    EXPECT_EQ(service.Journal().Count("POST", "/o/oauth2/token"), 1U);
}

TEST_F(GDriveDownload, WithATokenThatCannotBeRenewedFails) {
    amy.ExpireAccessTokens();
    amy.RevokeRefreshTokens();
    EXPECT_FALSE(Download());
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_UNAUTHORIZED);
    EXPECT_EQ(bytes.received, "");
}

}  // namespace
}  // namespace ZYROCloud
