#include "unit/cloud/box/box_fixture.h"

namespace ZYROCloud {
namespace {

class BoxDownload : public BoxTest {
  protected:
    void SetUp() override {
        BoxTest::SetUp();
        id_ = amy.AddPath("/a.txt", "0123456789");
        meta_["url"] = service.ApiHost() + Path();
    }
    std::string Path() const { return "/2.0/files/" + id_ + "/content"; }
    bool Download() { return box->DownloadProcess(&bytes_.xfer, meta_); }

    Bytes bytes_{0};
    Json::Value meta_;
    std::string id_;
};

TEST_F(BoxDownload, OfAllGoesWhereTheServiceSends) {
    EXPECT_TRUE(Download()) << seams::LogDump();
    EXPECT_EQ(bytes_.received, "0123456789");
    const auto first = service.Journal().All().front();
    EXPECT_EQ(first.Path(), Path());
    EXPECT_EQ(first.Header("Authorization"), box->Bearer());
    EXPECT_FALSE(first.HasHeader("Range"));
}

TEST_F(BoxDownload, OfAPartAsksForOneByteMore) {
    meta_["from_bytes"] = 2;
    meta_["len"] = 4;
    EXPECT_TRUE(Download()) << seams::LogDump();
    EXPECT_EQ(service.Journal().All().front().Header("Range"), "bytes=2-6");
    EXPECT_EQ(bytes_.received, "23456");
}

TEST_F(BoxDownload, FromAnOffsetWithoutALengthIsOfAll) {
    meta_["from_bytes"] = 2;
    EXPECT_TRUE(Download());
    EXPECT_EQ(bytes_.received, "0123456789");
}

TEST_F(BoxDownload, BeyondFourGiBAsksForSuchAPlace) {
    meta_["from_bytes"] = static_cast<Json::UInt64>(5368709120);
    meta_["len"] = static_cast<Json::UInt64>(4294967296);
    EXPECT_FALSE(Download());
    EXPECT_EQ(service.Journal().All().front().Header("Range"), "bytes=5368709120-9663676416");
}

TEST_F(BoxDownload, WithoutAnAddressFailsWithALine) {
    meta_.removeMember("url");
    EXPECT_FALSE(Download());
    EXPECT_EQ(box->GetErrorCode(), VFS_ERR_CLOUD_FAILED);
    EXPECT_TRUE(seams::Logged("Downlaod URL is empty")) << seams::LogDump();
    EXPECT_THAT(Requests(), IsEmpty());
}

TEST_F(BoxDownload, WithoutAPlaceForTheBytesOrOddMetadataFails) {
    XferData nothing{nullptr, 0, nullptr};
    for (XferData* xfer : {static_cast<XferData*>(nullptr), &nothing}) {
        box->SetError(VFS_ERR_NONE, "");
        EXPECT_FALSE(box->DownloadProcess(xfer, meta_));
        EXPECT_EQ(box->GetErrorCode(), VFS_ERR_CLOUD_FAILED);
    }
    for (const char* meta : {"[1]", R"({"url":{}})", "7"}) {
        box->SetError(VFS_ERR_NONE, "");
        EXPECT_FALSE(box->DownloadProcess(&bytes_.xfer, Object(meta))) << meta;
        EXPECT_EQ(box->GetErrorCode(), VFS_ERR_CLOUD_FAILED) << meta;
    }
    EXPECT_THAT(Requests(), IsEmpty());
}

TEST_F(BoxDownload, OfWhatIsGoneFailsAtOnceAndWritesNothing) {
    meta_["url"] = service.ApiHost() + "/2.0/files/404404/content";
    EXPECT_FALSE(Download());
    EXPECT_EQ(box->GetErrorCode(), VFS_ERR_NOT_FOUND);
    EXPECT_EQ(bytes_.received, "");
    EXPECT_THAT(seams::Sleeps(), IsEmpty());
    EXPECT_TRUE(seams::LoggedPart("Failed to process curl " + meta_["url"].asString() + ", err:"))
        << seams::LogDump();
}

TEST_F(BoxDownload, IsRepeatedBeforeItsFirstByte) {
    service.AddFault(Fault::On("GET", Path()).Times(2).Answer(503, "a body that nobody sees"));
    EXPECT_TRUE(Download()) << seams::LogDump();
    EXPECT_EQ(bytes_.received, "0123456789");
    // The handler waits behind each failure, and so does the loop.
    EXPECT_THAT(seams::Sleeps(), ElementsAre(5, 5, 5, 5));
    EXPECT_TRUE(seams::Logged("Retry Download: 0/6")) << seams::LogDump();
    EXPECT_TRUE(seams::Logged("Retry Download: 1/6"));
}

TEST_F(BoxDownload, IsTriedSixTimesInAll) {
    service.AddFault(Fault::On("GET", Path()).Times(6).Answer(503));
    EXPECT_FALSE(Download());
    EXPECT_EQ(box->GetErrorCode(), VFS_ERR_SERVER_ERROR);
    EXPECT_THAT(seams::Sleeps(), testing::SizeIs(12));
    EXPECT_TRUE(seams::LoggedPart("Failed to process curl")) << seams::LogDump();
}

TEST_F(BoxDownload, ThatFailsAfterTheFirstByteIsNotRepeated) {
    const std::string big = amy.AddPattern(root, "big", 1 << 20);
    meta_["url"] = service.ApiHost() + "/2.0/files/" + big + "/content";
    service.AddFault(Fault::On("GET", "/d/").AtHost("download").Throttle(500));
    bytes_.impatient = box->GetAPIHandler()->GetCurlHandler();
    EXPECT_FALSE(Download());
    EXPECT_EQ(box->GetErrorCode(), VFS_ERR_TIMEOUT);
    EXPECT_NE(bytes_.received, "");
    EXPECT_EQ(service.Journal().Count("GET", "/2.0/files/" + big), 1U);
    EXPECT_FALSE(seams::LoggedPart("Retry Download")) << seams::LogDump();
}

TEST_F(BoxDownload, CutShortBehindAGoodStatusCountsAsASuccess) {
    service.AddFault(Fault::On("GET", "/d/").AtHost("download").CutAnswer(4));
    EXPECT_TRUE(Download());
    EXPECT_EQ(bytes_.received, "0123");
}

TEST_F(BoxDownload, CancelledWhileBytesArriveEndsThere) {
    bytes_.cancel_at = 0;
    EXPECT_FALSE(Download());
    EXPECT_EQ(box->GetErrorCode(), VFS_ERR_CANCELLED);
    EXPECT_THAT(seams::Sleeps(), IsEmpty());
    box->SetError(VFS_ERR_CANCELLED, "");
    service.Journal().Clear();
    EXPECT_FALSE(Download());
    EXPECT_THAT(Requests(), IsEmpty());
}

TEST_F(BoxDownload, WithARefusedTokenRenewsItOnce) {
    amy.ExpireAccessTokens();
    EXPECT_TRUE(Download()) << seams::LogDump();
    EXPECT_EQ(bytes_.received, "0123456789");
    EXPECT_EQ(service.Journal().Count("POST", "/oauth2/token"), 1U);
}

TEST_F(BoxDownload, WithATokenThatCannotBeRenewedFails) {
    amy.ExpireAccessTokens();
    amy.RevokeRefreshTokens();
    EXPECT_FALSE(Download());
    EXPECT_EQ(box->GetErrorCode(), VFS_ERR_UNAUTHORIZED);
    EXPECT_EQ(bytes_.received, "");
}

TEST_F(BoxDownload, LeavesLaterRefusalsOnTheSameDriverWithoutABody) {
    EXPECT_TRUE(Download());
    // The check cannot learn what is in its way, so it leaves that alone.
    EXPECT_FALSE(box->PreflightCheck("", "a.txt", "0", "", 1));
    EXPECT_EQ(box->GetErrorCode(), VFS_ERR_CONFLICT);
    EXPECT_TRUE(amy.Exists("/a.txt"));
    EXPECT_EQ(service.Journal().Count("DELETE", "/"), 0U);
}

}  // namespace
}  // namespace ZYROCloud
