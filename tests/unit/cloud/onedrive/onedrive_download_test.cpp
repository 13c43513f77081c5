#include "unit/cloud/onedrive/onedrive_fixture.h"

namespace ZYROCloud {
namespace {

class OneDriveDownload : public OneDriveTest {
  protected:
    /** libcurl leaves a connection on which it failed a status. */
    void Give(const std::vector<std::string>& answers) {
        std::vector<wire::Script> scripts;
        for (const std::string& answer : answers) {
            scripts.push_back(Answering({answer}));
        }
        Serve(scripts);
        meta["url"] = Api("/file.1!2/content");
        bytes.received.clear();
        bytes.context = XferContext();
    }
    bool Download() { return drive->DownloadProcess(&bytes.xfer, meta); }

    Bytes bytes{0};
    Json::Value meta;
};

TEST_F(OneDriveDownload, OfAllIsOneRequestForItsEscapedUrl) {
    Give({Answer(200, "0123456789")});
    EXPECT_TRUE(Download()) << seams::LogDump();
    EXPECT_EQ(bytes.received, "0123456789");
    EXPECT_THAT(Requests(), ElementsAre("GET /v5.0/file.1%212/content?pretty=false"));
    EXPECT_EQ(HeaderOf(Request(0), "Authorization"), "Bearer token-canary");
    EXPECT_EQ(HeaderOf(Request(0), "Range"), "-");
}

TEST_F(OneDriveDownload, OfAPartAsksForOneByteMore) {
    Give({Answer(206, "3456", "Content-Range: bytes 3-6/10\r\n")});
    meta["from_bytes"] = 3;
    meta["len"] = "3";
    EXPECT_TRUE(Download()) << seams::LogDump();
    EXPECT_EQ(HeaderOf(Request(0), "Range"), "bytes=3-6");
}

TEST_F(OneDriveDownload, IsRepeatedBeforeItsFirstByte) {
    Give({Answer(503, "unseen"), Refusal(420, "request_throttled", "Wait 9 seconds"),
          Answer(200, "x")});
    EXPECT_TRUE(Download()) << seams::LogDump();
    EXPECT_EQ(bytes.received, "x");
    // Behind a failure that libcurl tells, there is no body with a time to wait. The handler waits
    // behind each failure, and so does the loop.
    EXPECT_THAT(seams::Sleeps(), ElementsAre(5, 5, 5, 5));
    EXPECT_TRUE(seams::Logged("Retry Download: 0/6")) << seams::LogDump();
    EXPECT_TRUE(seams::Logged("Retry Download: 1/6"));
    EXPECT_TRUE(seams::LoggedPart("onedrive_download.cpp:"));
}

TEST_F(OneDriveDownload, IsTriedSixTimesInAll) {
    Give(std::vector<std::string>(7, Answer(500)));
    EXPECT_FALSE(Download());
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_SERVER_ERROR);
    EXPECT_THAT(Requests(), SizeIs(6));
    EXPECT_TRUE(seams::Logged("Retry Download: 5/6")) << seams::LogDump();
    EXPECT_TRUE(seams::LoggedPart("Failed to process curl " + meta["url"].asString()));
}

TEST_F(OneDriveDownload, ThatIsForbiddenOrGoneFailsAtOnce) {
    for (const auto& [status, code] : {std::pair(403, VFS_ERR_FORBIDDEN),
                                       {404, VFS_ERR_NOT_FOUND},
                                       {416, VFS_ERR_RANGE_FAILED}}) {
        Give({Answer(status, "unseen")});
        EXPECT_FALSE(Download());
        EXPECT_EQ(drive->GetErrorCode(), code);
        EXPECT_EQ(bytes.received, "");
        EXPECT_THAT(Requests(), SizeIs(1));
    }
    EXPECT_THAT(tree.Writes(), IsEmpty());
}

TEST_F(OneDriveDownload, ThatMayNotBeRepeatedIsNot) {
    Give({Answer(503)});
    bytes.context.can_retry = false;
    EXPECT_FALSE(Download());
    EXPECT_THAT(Requests(), SizeIs(1));
    EXPECT_FALSE(seams::LoggedPart("Retry Download")) << seams::LogDump();
}

TEST_F(OneDriveDownload, CancelledEndsThere) {
    Give({Answer(200, "0123")});
    bytes.cancel_at = 0;
    EXPECT_FALSE(Download());
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CANCELLED);
    EXPECT_THAT(seams::Sleeps(), IsEmpty());
    Give({});
    EXPECT_FALSE(Download());
    EXPECT_THAT(Requests(), IsEmpty());
}

TEST_F(OneDriveDownload, WithARefusedTokenRenewsItOnce) {
    Give({Answer(401), TokenAnswer(), Answer(200, "x")});
    EXPECT_TRUE(Download()) << seams::LogDump();
    EXPECT_THAT(seams::Sleeps(), IsEmpty());
    EXPECT_THAT(Requests(), SizeIs(3));
}

TEST_F(OneDriveDownload, WithoutAUrlOrAPlaceToGoToFails) {
    Give({});
    for (const char* text : {"{}", R"({"url":""})", R"({"url":{}})", "[]", "7"}) {
        drive->SetError(VFS_ERR_NONE, "");
        EXPECT_FALSE(drive->DownloadProcess(&bytes.xfer, Object(text))) << text;
        EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CLOUD_FAILED) << text;
    }
    EXPECT_TRUE(seams::Logged("Downlaod URL is empty")) << seams::LogDump();
    drive->SetError(VFS_ERR_NONE, "");
    EXPECT_FALSE(drive->DownloadProcess(nullptr, meta));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CLOUD_FAILED);
    EXPECT_THAT(Requests(), IsEmpty());
}

class OneDriveSize : public OneDriveTest {
  protected:
    void SetUp() override {
        OneDriveTest::SetUp();
        Show("/a.txt", "file.1");
    }
    bool Ask(const std::string& path = "/a.txt") {
        return drive->GetFileSize(kServerId + path, &size);
    }
    /** Heads of answers, each on a connection of its own. */
    void GiveHeads(const std::vector<std::string>& heads) {
        std::vector<wire::Script> scripts;
        for (const std::string& head : heads) {
            scripts.push_back({wire::ReadHead(), wire::Send("HTTP/1.1 " + head + "\r\n\r\n")});
        }
        Serve(scripts);
    }
    long long size = -1;
};

TEST_F(OneDriveSize, IsThatOfTheContentWhichIsNotFetched) {
    GiveHeads({"200 OK\r\nContent-Length: 5368709120"});
    EXPECT_TRUE(Ask()) << seams::LogDump();
    EXPECT_EQ(size, 5368709120LL);
    EXPECT_THAT(Requests(), ElementsAre("HEAD /v5.0/file.1/content?pretty=false"));
    EXPECT_EQ(HeaderOf(Request(0), "Authorization"), "Bearer token-canary");
}

TEST_F(OneDriveSize, IsReadInAnyCaseOfTheHeadersName) {
    GiveHeads({"200 OK\r\ncontent-length: 77"});
    EXPECT_TRUE(Ask()) << seams::LogDump();
    EXPECT_EQ(size, 77);
}

TEST_F(OneDriveSize, WithoutAContentLengthIsZeroAndSuccess) {
    GiveHeads({"200 OK\r\nConnection: close"});
    EXPECT_TRUE(Ask()) << seams::LogDump();
    EXPECT_EQ(size, 0);
}

TEST_F(OneDriveSize, OfWhatIsUnknownFails) {
    EXPECT_FALSE(Ask("/unknown"));
    EXPECT_TRUE(seams::Logged("Failed to get meta by uri")) << seams::LogDump();
    EXPECT_FALSE(drive->GetFileSize(std::string(kServerId) + "/a.txt", nullptr));
    EXPECT_EQ(size, -1);
}

TEST_F(OneDriveSize, IsAskedForSixTimesWhileTheServiceIsBusy) {
    GiveHeads(std::vector<std::string>(6, "503 Busy\r\nContent-Length: 9"));
    EXPECT_FALSE(Ask());
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_SERVER_ERROR);
    EXPECT_EQ(size, -1);
    EXPECT_THAT(Requests(), SizeIs(6));
    EXPECT_TRUE(seams::Logged("Retry Download: 5/6")) << seams::LogDump();
    EXPECT_TRUE(seams::LoggedPart("Failed to process curl " + Api("/file.1/content") + ", err:{"));
}

TEST_F(OneDriveSize, OfWhatIsForbiddenFailsAtOnce) {
    GiveHeads({"403 No\r\nContent-Length: 9"});
    EXPECT_FALSE(Ask());
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_FORBIDDEN);
    EXPECT_EQ(size, -1);
    EXPECT_TRUE(seams::LoggedPart("Failed to process curl")) << seams::LogDump();
}

TEST_F(OneDriveSize, IsNotAskedForBehindACancel) {
    GiveHeads({});
    drive->SetError(VFS_ERR_CANCELLED, "");
    EXPECT_FALSE(Ask());
    EXPECT_THAT(Requests(), IsEmpty());
}

TEST_F(OneDriveSize, WithATokenThatCannotBeRenewedIsUnauthorized) {
    Renew("{}", "500");
    Serve({Answering({Answer(400, R"({"error":"invalid_grant"})")})});
    EXPECT_FALSE(Ask());
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_UNAUTHORIZED);
}

}  // namespace
}  // namespace ZYROCloud
