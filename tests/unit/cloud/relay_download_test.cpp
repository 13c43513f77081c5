// A cloud's file on its way to a browser.
#include <fcntl.h>
#include <unistd.h>

#include "cloud/relay.h"
#include "cloud/transfer.h"
#include "core/handle.h"
#include "support/scratch.h"
#include "unit/cloud/transfer_fixture.h"

namespace ZYROCloud {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

/** Knows a size, too. */
class SizedDriver : public FakeDriver {
  public:
    bool GetFileSize(const std::string& uri, long long* size) override {
        asked_for = uri;
        *size = size_;
        return size_ >= 0;
    }
    std::string asked_for;
    long long size_ = 10;
};

class RelayDownloads : public scratch::ScratchTest {
  protected:
    void SetUp() override {
        ScratchTest::SetUp();
        seams::Reset();
        driver_.Serve("0123456789");
    }
    bool Init(const std::string& mime = "", SpeedCallback speed = nullptr) {
        return Cloud::RelayDownloadInit(&driver_, "srv/file", speed, mime);
    }
    /** Into a fresh file. */
    bool Receive(long long from, long long to) {
        const UniqueFd fd(
            open(Path("target").c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC, 0600));
        return Cloud::RelayDownloadFile(fd.Get(), from, to);
    }
    std::string Received() const { return scratch::Text(Path("target")); }

    SizedDriver driver_;
};

TEST_F(RelayDownloads, AskTheDriverOnceForWhatItNeedsToKnow) {
    ASSERT_TRUE(Init());
    EXPECT_THAT(driver_.actions, ElementsAre("Download"));
    ASSERT_TRUE(Receive(0, 10)) << seams::LogDump();
    EXPECT_EQ(Received(), "0123456789");
    EXPECT_EQ(driver_.metas.at(0)["url"], "srv/file");
    EXPECT_EQ(driver_.metas[0]["from_bytes"].asInt64(), 0);
    EXPECT_EQ(driver_.metas[0]["len"].asInt64(), 10);
    EXPECT_THAT(driver_.actions, ElementsAre("Download"));
}

TEST_F(RelayDownloads, WithAMimeTheActionIsDownloadAnEqualsSignAndThatMime) {
    ASSERT_TRUE(Init("application/pdf"));
    EXPECT_THAT(driver_.actions, ElementsAre("Download=application/pdf"));
    ASSERT_TRUE(Init("text/plain"));
    ASSERT_TRUE(Init());
    EXPECT_THAT(driver_.actions,
                ElementsAre("Download=application/pdf", "Download=text/plain", "Download"));
}

TEST_F(RelayDownloads, SizeAndMimeAreTheFilesAndNone) {
    ASSERT_TRUE(Init());
    long long size = -1;
    std::string mime = "x";
    EXPECT_TRUE(Cloud::RelayDownloadGetFileSizeAndMimeType(&size, mime));
    EXPECT_EQ(size, 10);
    EXPECT_EQ(mime, "");
    EXPECT_EQ(driver_.asked_for, "srv/file");
}

TEST_F(RelayDownloads, OfAFormatTheSizeIsNotKnownBeforehand) {
    ASSERT_TRUE(Init("application/pdf"));
    long long size = -1;
    std::string mime;
    EXPECT_TRUE(Cloud::RelayDownloadGetFileSizeAndMimeType(&size, mime));
    EXPECT_EQ(size, 0);
    EXPECT_EQ(mime, "application/pdf");
    EXPECT_EQ(driver_.asked_for, "");
}

TEST_F(RelayDownloads, ASizeThatCannotBeHadIsAFailure) {
    ASSERT_TRUE(Init());
    driver_.size_ = -1;
    long long size = 7;
    std::string mime = "kept";
    EXPECT_FALSE(Cloud::RelayDownloadGetFileSizeAndMimeType(&size, mime));
    EXPECT_EQ(mime, "kept");
    EXPECT_FALSE(Cloud::RelayDownloadGetFileSizeAndMimeType(nullptr, mime));
}

TEST_F(RelayDownloads, OnePartAfterAnotherKeepsTheMetadata) {
    driver_.download = [&](XferData* xfer, const Json::Value& meta) {
        EXPECT_EQ(xfer->callback, &FileWriteCallback);
        EXPECT_EQ(xfer->direction, 0);
        EXPECT_EQ(transfer.bytes_left, meta["len"].asUInt64());
        EXPECT_EQ(transfer.bytes_total, meta["len"].asUInt64());
        const size_t from = meta["from_bytes"].asUInt();
        // Services are asked for one byte more, and it comes.
        return Feed(driver_, xfer,
                    std::string("0123456789").substr(from, meta["len"].asUInt() + 1));
    };
    ASSERT_TRUE(Init());
    ASSERT_TRUE(Receive(2, 4));
    EXPECT_EQ(Received(), "234");
    ASSERT_TRUE(Receive(7, 9));
    EXPECT_EQ(Received(), "789");
    EXPECT_EQ(driver_.metas.at(1)["url"], "srv/file");
    EXPECT_EQ(driver_.metas[1]["from_bytes"].asInt64(), 7);
}

TEST_F(RelayDownloads, PlacesBeyondFourGiBAreToldInFull) {
    ASSERT_TRUE(Init());
    ASSERT_TRUE(Receive(6000000000LL, 6000000010LL));
    EXPECT_EQ(driver_.metas.at(0)["from_bytes"].asInt64(), 6000000000LL);
    EXPECT_EQ(driver_.metas[0]["len"].asInt64(), 10);
}

TEST_F(RelayDownloads, EqualNumbersAskForTheWholeFile) {
    ASSERT_TRUE(Init("application/pdf"));
    ASSERT_TRUE(Receive(0, 0));
    EXPECT_EQ(Received(), "0123456789");
    EXPECT_EQ(driver_.metas.at(0)["len"].asInt64(), 0);
}

TEST_F(RelayDownloads, NumbersOutOfOrderAreRefusedAndAskNoCloud) {
    ASSERT_TRUE(Init());
    for (const auto& [from, to] : {std::pair<long long, long long>{-1, 5}, {5, 4}, {-5, -3}}) {
        driver_.SetError(VFS_ERR_NONE, "");
        EXPECT_FALSE(Receive(from, to)) << from;
        EXPECT_EQ(driver_.GetErrorCode(), VFS_ERR_RANGE_FAILED);
    }
    EXPECT_THAT(driver_.metas, IsEmpty());
}

TEST_F(RelayDownloads, ASpeedFunctionIsAskedAndAnEarlierUploadsCancelIsNot) {
    static int asked;
    asked = 0;
    BeginTransfer(0, {nullptr, [] { return 1; }, nullptr});
    ASSERT_TRUE(Init("", [](unsigned long long, unsigned long long) -> long long {
        ++asked;
        return 1;
    }));
    EXPECT_TRUE(Receive(0, 10)) << seams::LogDump();
    EXPECT_EQ(asked, 1);
}

TEST_F(RelayDownloads, ABrowserThatIsGoneFailsTheDownload) {
    ASSERT_TRUE(Init());
    const UniqueFd closed(open("/dev/full", O_WRONLY | O_CLOEXEC));
    EXPECT_FALSE(Cloud::RelayDownloadFile(closed.Get(), 0, 10));
    EXPECT_EQ(YLIBCErrGet(), 0x2900U);
    EXPECT_FALSE(Cloud::RelayDownloadFile(-1, 0, 10));
}

TEST_F(RelayDownloads, WithoutADriverOrAPathNothingIsPrepared) {
    EXPECT_FALSE(Cloud::RelayDownloadInit(nullptr, "srv/file", nullptr, ""));
    EXPECT_FALSE(Cloud::RelayDownloadInit(&driver_, nullptr, nullptr, ""));
    long long size = 0;
    std::string mime;
    EXPECT_FALSE(Cloud::RelayDownloadGetFileSizeAndMimeType(&size, mime));
    EXPECT_FALSE(Receive(0, 10));
    EXPECT_THAT(driver_.actions, IsEmpty());
}

TEST_F(RelayDownloads, MetadataThatCannotBeHadShowsWhenItIsUsed) {
    driver_.metadata_known = false;
    EXPECT_TRUE(Init());
}

}  // namespace
}  // namespace ZYROCloud
