#include "cloud/transfer.h"

#include <fcntl.h>
#include <sys/mman.h>
#include <unistd.h>

#include "core/handle.h"
#include "support/scratch.h"
#include "unit/cloud/transfer_fixture.h"

namespace ZYROCloud {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

constexpr long long kMiB = 1024 * 1024;

class Transfers : public scratch::ScratchTest {
  protected:
    UniqueFd Open(const std::string& name) const {
        return UniqueFd(open(Path(name).c_str(), O_RDWR | O_CREAT | O_CLOEXEC, 0600));
    }
    bool Download(int fd, long long size) {
        return Cloud::DownloadFile(&driver_, "srv/file", fd, size, nullptr, nullptr, nullptr);
    }
    bool Upload(int fd, long long size) {
        return Cloud::UploadFile(&driver_, "srv/file", fd, size, nullptr, nullptr, nullptr);
    }

    FakeDriver driver_;
};

TEST_F(Transfers, AnUploadTellsTheDriverUriSizeAndAReadFunctionWithTheDescriptor) {
    const std::string bytes = Pattern(200000);
    Put("source", bytes);
    const UniqueFd fd = Open("source");
    XferContext seen;
    driver_.upload = [&](XferData* xfer, const Json::Value&) {
        EXPECT_EQ(xfer->callback, &FileReadCallback);
        EXPECT_EQ(xfer->direction, 1);
        seen = *xfer->context;
        return Drain(driver_, xfer, driver_.kept);
    };
    EXPECT_TRUE(Upload(fd.Get(), 200000));
    EXPECT_EQ(driver_.kept, bytes);
    EXPECT_THAT(driver_.actions, ElementsAre("Upload"));
    ASSERT_EQ(driver_.metas.size(), 1U);
    EXPECT_EQ(driver_.metas[0]["url"], "srv/file");
    EXPECT_EQ(driver_.metas[0]["total_bytes"].asInt64(), 200000);
    EXPECT_EQ(driver_.metas[0]["filesize"].asInt64(), 200000);
    EXPECT_EQ(seen.fd, fd.Get());
    EXPECT_EQ(seen.buffer, nullptr);
    EXPECT_FALSE(seen.limited);
    EXPECT_TRUE(seen.can_retry);
    EXPECT_EQ(seen.curl, driver_.GetAPIHandler()->GetCurlHandler());
}

TEST_F(Transfers, MetadataThatCannotBeHadDoesNotStopATransfer) {
    driver_.metadata_known = false;
    driver_.Keep();
    driver_.Serve("12345");
    Put("source", "abc");
    EXPECT_TRUE(Upload(Open("source").Get(), 3));
    EXPECT_EQ(driver_.kept, "abc");
    EXPECT_TRUE(Download(Open("target").Get(), 5));
    EXPECT_EQ(scratch::Text(Path("target")), "12345");
}

TEST_F(Transfers, AnUploadThatTheDriverFailsIsNotRepeated) {
    driver_.upload = [&](XferData*, const Json::Value&) {
        driver_.SetError(VFS_ERR_QUOTA_EXCEEDED, "");
        return false;
    };
    Put("source", "abc");
    EXPECT_FALSE(Upload(Open("source").Get(), 3));
    EXPECT_EQ(driver_.metas.size(), 1U);
    EXPECT_EQ(Cloud::GetUploadErrorCode(&driver_), -11);
}

TEST_F(Transfers, AFailureHasACodeAndASuccessNoneOfItsOwn) {
    for (const bool works : {false, true}) {
        FakeDriver driver;
        driver.upload = driver.download = [&](XferData*, const Json::Value&) {
            driver.SetError(works ? VFS_ERR_UNAUTHORIZED : VFS_ERR_NONE, "");
            return works;
        };
        const __tag_vfs_err_ code = works ? VFS_ERR_NONE : VFS_ERR_CLOUD_FAILED;
        const UniqueFd fd(memfd_create("file", MFD_CLOEXEC));
        EXPECT_EQ(Cloud::UploadFile(&driver, "u", fd.Get(), 0, nullptr, nullptr, nullptr), works);
        EXPECT_EQ(driver.GetErrorCode(), code);
        driver.SetError(VFS_ERR_NONE, "");
        EXPECT_EQ(Cloud::DownloadFile(&driver, "u", fd.Get(), 9, nullptr, nullptr, nullptr), works);
        EXPECT_EQ(driver.GetErrorCode(), code);
    }
}

TEST_F(Transfers, AnUploadOfMoreThanTwoGiBTellsItsSizeInFull) {
    const long long size = 3LL * 1024 * kMiB;
    const UniqueFd fd = Open("sparse");
    ASSERT_EQ(ftruncate(fd.Get(), size), 0);
    unsigned long long sent = 0;
    static unsigned long long last_done = 0;
    driver_.upload = [&](XferData* xfer, const Json::Value& meta) {
        EXPECT_EQ(meta["total_bytes"].asInt64(), size);
        std::vector<char> room(4 * kMiB);
        for (size_t n = 1; n > 0 && n <= room.size(); sent += n) {
            n = xfer->callback(room.data(), 1, room.size(), xfer->context);
        }
        return true;
    };
    const ProgressCallback progress = [](unsigned long long, unsigned long long done) {
        last_done = done;
        return 0;
    };
    EXPECT_TRUE(Cloud::UploadFile(&driver_, "big", fd.Get(), size, progress, nullptr, nullptr));
    EXPECT_EQ(sent, static_cast<unsigned long long>(size));
    EXPECT_EQ(last_done, static_cast<unsigned long long>(size));
}

TEST_F(Transfers, AnUploadOfUnknownSizeFindsOutTheSizeOfAFile) {
    driver_.Keep();
    Put("source", "0123456789");
    for (const off_t position : {0, 4, 10, 15}) {
        driver_.metas.clear();
        const UniqueFd fd = Open("source");
        lseek(fd.Get(), position, SEEK_SET);
        EXPECT_TRUE(Upload(fd.Get(), -1));
        const std::string rest = position > 10 ? "" : std::string("0123456789").substr(position);
        EXPECT_EQ(driver_.kept, rest);
        EXPECT_EQ(driver_.metas.at(0)["total_bytes"].asUInt(), rest.size());
        EXPECT_EQ(driver_.metas[0]["filesize"].asUInt(), rest.size());
    }
}

TEST_F(Transfers, AnUploadOfUnknownSizeThatIsNoFileIsSaidToBeUnknown) {
    driver_.Keep();
    int ends[2] = {-1, -1};
    ASSERT_EQ(pipe(ends), 0);
    ASSERT_EQ(write(ends[1], "abc", 3), 3);
    close(ends[1]);
    const UniqueFd from(ends[0]);
    EXPECT_TRUE(Upload(from.Get(), -7));
    EXPECT_EQ(driver_.kept, "abc");
    EXPECT_EQ(driver_.metas.at(0)["total_bytes"].asInt64(), -1);
    EXPECT_EQ(driver_.metas[0]["filesize"].asInt64(), -1);
}

TEST_F(Transfers, ADownloadWritesFromTheDescriptorsPositionOn) {
    Put("target", "0123456789");
    const UniqueFd fd = Open("target");
    lseek(fd.Get(), 4, SEEK_SET);
    driver_.download = [&](XferData* xfer, const Json::Value& meta) {
        EXPECT_EQ(xfer->callback, &FileWriteCallback);
        EXPECT_EQ(xfer->direction, 0);
        EXPECT_EQ(xfer->context->fd, fd.Get());
        EXPECT_FALSE(meta.isMember("from_bytes"));
        EXPECT_FALSE(meta.isMember("len"));
        EXPECT_EQ(meta["total_bytes"].asInt64(), 3);
        return Feed(driver_, xfer, "abc");
    };
    EXPECT_TRUE(Download(fd.Get(), 3));
    EXPECT_EQ(scratch::Text(Path("target")), "0123abc789");
    EXPECT_THAT(driver_.actions, ElementsAre("Download"));
}

TEST_F(Transfers, ADownloadInterruptedAfterThreeMiBOfTenAsksForTheRest) {
    const std::string bytes = Pattern(10 * kMiB);
    driver_.download = [&](XferData* xfer, const Json::Value& meta) {
        if (driver_.metas.size() == 1) {
            Feed(driver_, xfer, bytes.substr(0, 3 * kMiB));
            driver_.SetError(VFS_ERR_RECEIVE_FAILED, "");
            return false;
        }
        EXPECT_EQ(meta["from_bytes"].asInt64(), 3145728);
        EXPECT_EQ(meta["len"].asInt64(), 7340032);
        return Feed(driver_, xfer, bytes.substr(3 * kMiB));
    };
    EXPECT_TRUE(Download(Open("target").Get(), 10 * kMiB));
    EXPECT_EQ(driver_.metas.size(), 2U);
    EXPECT_THAT(seams::Sleeps(), ElementsAre(3U));
    EXPECT_EQ(scratch::Text(Path("target")), bytes);
}

TEST_F(Transfers, ADownloadInterruptedAfterAThousandBytesIsNotGoneOnWith) {
    driver_.download = [&](XferData* xfer, const Json::Value&) {
        Feed(driver_, xfer, Pattern(1000));
        driver_.SetError(VFS_ERR_RECEIVE_FAILED, "");
        return false;
    };
    EXPECT_FALSE(Download(Open("target").Get(), 10 * kMiB));
    EXPECT_EQ(driver_.metas.size(), 1U);
    EXPECT_TRUE(seams::Logged("Size is wrong, 1000, 10485760")) << seams::LogDump();
    EXPECT_THAT(seams::Sleeps(), IsEmpty());
}

TEST_F(Transfers, APassMustGainAWholeMiB) {
    driver_.download = [&](XferData* xfer, const Json::Value&) {
        Feed(driver_, xfer, Pattern(driver_.metas.size() == 1 ? kMiB : kMiB - 1));
        driver_.SetError(VFS_ERR_RECEIVE_FAILED, "");
        return false;
    };
    EXPECT_FALSE(Download(Open("target").Get(), 10 * kMiB));
    EXPECT_EQ(driver_.metas.size(), 2U);
    EXPECT_TRUE(seams::Logged("Size is wrong, 2097151, 10485760")) << seams::LogDump();
}

TEST_F(Transfers, AFileThatIsAllThereIsASuccessWhateverTheDriverSays) {
    driver_.download = [&](XferData* xfer, const Json::Value&) {
        Feed(driver_, xfer, "12345");
        driver_.SetError(VFS_ERR_RECEIVE_FAILED, "");
        return false;
    };
    EXPECT_TRUE(Download(Open("target").Get(), 5));
}

TEST_F(Transfers, AFailedDownloadBeyondTheSizeIsWrong) {
    driver_.download = [&](XferData* xfer, const Json::Value&) {
        Feed(driver_, xfer, Pattern(3 * kMiB));
        driver_.SetError(VFS_ERR_RECEIVE_FAILED, "");
        return false;
    };
    EXPECT_FALSE(Download(Open("target").Get(), 2 * kMiB));
    EXPECT_TRUE(seams::Logged("Size is wrong, 3145728, 2097152")) << seams::LogDump();
}

TEST_F(Transfers, SomeFailuresEndADownloadWhateverItGained) {
    for (const __tag_vfs_err_ code :
         {VFS_ERR_UNAUTHORIZED, VFS_ERR_FORBIDDEN, VFS_ERR_CANCELLED, VFS_ERR_SERVICE_UNAVAILABLE,
          VFS_ERR_RATE_LIMITED, VFS_ERR_PERMISSION_DENIED, VFS_ERR_NOT_FOUND}) {
        FakeDriver driver;
        const UniqueFd fd = Open("target" + std::to_string(code));
        driver.download = [&](XferData* xfer, const Json::Value&) {
            Feed(driver, xfer, Pattern(2 * kMiB));
            driver.SetError(code, "");
            return false;
        };
        EXPECT_FALSE(
            Cloud::DownloadFile(&driver, "x", fd.Get(), 2 * kMiB, nullptr, nullptr, nullptr))
            << code;
        EXPECT_EQ(driver.metas.size(), 1U) << code;
    }
    EXPECT_THAT(seams::LogLines(), IsEmpty());
}

TEST_F(Transfers, FiftyPassesWithoutAnEndFail) {
    const UniqueFd fd = Open("target");
    driver_.download = [&](XferData* xfer, const Json::Value&) {
        lseek(xfer->context->fd, kMiB, SEEK_CUR);
        driver_.SetError(VFS_ERR_RECEIVE_FAILED, "");
        return false;
    };
    EXPECT_FALSE(Download(fd.Get(), 1000 * kMiB));
    EXPECT_EQ(driver_.metas.size(), 50U);
    EXPECT_EQ(seams::Sleeps().size(), 50U);
    EXPECT_EQ(driver_.metas[49]["from_bytes"].asInt64(), 49 * kMiB);
}

TEST_F(Transfers, ADescriptorWithoutAPositionFailsADownloadBeforeItsRequest) {
    int ends[2];
    ASSERT_EQ(pipe(ends), 0);
    const UniqueFd in(ends[0]);
    const UniqueFd out(ends[1]);
    EXPECT_FALSE(Download(out.Get(), 5));
    EXPECT_THAT(driver_.metas, IsEmpty());
    EXPECT_TRUE(seams::LoggedPart("Failed to get pos Illegal seek")) << seams::LogDump();
    EXPECT_FALSE(Download(-1, 5));
}

TEST_F(Transfers, ABufferGetsARangeOfTheGivenUrl) {
    const std::string bytes = Pattern(1000);
    char buffer[101] = {};
    long long got = -1;
    driver_.download = [&](XferData* xfer, const Json::Value& meta) {
        EXPECT_EQ(meta.getMemberNames(), (std::vector<std::string>{"from_bytes", "len", "url"}));
        EXPECT_EQ(meta["url"], "https://host/content");
        EXPECT_EQ(meta["from_bytes"].asInt64(), 300);
        EXPECT_EQ(meta["len"].asInt64(), 100);
        EXPECT_EQ(xfer->context->fd, -1);
        return Feed(driver_, xfer, bytes.substr(300, 101), 7);
    };
    EXPECT_TRUE(Cloud::DownloadFileToBuffer(&driver_, "https://host/content", buffer, 300, 100,
                                            &got, nullptr, nullptr, nullptr));
    EXPECT_THAT(driver_.actions, IsEmpty());
    // One byte more than wanted is what drivers ask for, and what callers have room for.
    EXPECT_EQ(got, 101);
    EXPECT_EQ(std::string(buffer, 101), bytes.substr(300, 101));
}

TEST_F(Transfers, ABufferTakesNothingBeyondTheOneByteMore) {
    std::string buffer(201, '~');
    long long got = -1;
    driver_.Serve(Pattern(150), 50);
    EXPECT_FALSE(Cloud::DownloadFileToBuffer(&driver_, "x", buffer.data(), 0, 100, &got, nullptr,
                                             nullptr, nullptr));
    EXPECT_EQ(buffer.substr(101), std::string(100, '~'));
    EXPECT_EQ(got, -1);
    EXPECT_EQ(driver_.GetErrorCode(), VFS_ERR_TRANSFER_ABORTED);
}

TEST_F(Transfers, AShortAnswerToABufferIsNoFailure) {
    char buffer[101];
    long long got = -1;
    driver_.Serve("end of file");
    EXPECT_TRUE(Cloud::DownloadFileToBuffer(&driver_, "x", buffer, 5000, 100, &got, nullptr,
                                            nullptr, nullptr));
    EXPECT_EQ(got, 11);
}

TEST_F(Transfers, SenselessArgumentsFailAndAskNobody) {
    char buffer[1];
    long long got = 0;
    EXPECT_FALSE(Cloud::UploadFile(nullptr, "x", 0, 0, nullptr, nullptr, nullptr));
    EXPECT_FALSE(Cloud::DownloadFile(nullptr, "x", 0, 0, nullptr, nullptr, nullptr));
    EXPECT_FALSE(
        Cloud::DownloadFileToBuffer(nullptr, "x", buffer, 0, 1, &got, nullptr, nullptr, nullptr));
    EXPECT_FALSE(
        Cloud::DownloadFileToBuffer(&driver_, "x", buffer, 0, -5, &got, nullptr, nullptr, nullptr));
    EXPECT_FALSE(
        Cloud::DownloadFileToBuffer(&driver_, "x", buffer, -5, 1, &got, nullptr, nullptr, nullptr));
    EXPECT_THAT(driver_.metas, IsEmpty());
}

TEST_F(Transfers, AnExceptionOfADriverIsAFailure) {
    driver_.upload = driver_.download = [](XferData*, const Json::Value& meta) {
        return meta["url"].asInt64() != 0;  // text: jsoncpp throws
    };
    Put("source", "abc");
    long long got = 0;
    char buffer[11];
    EXPECT_FALSE(Upload(Open("source").Get(), 3));
    EXPECT_EQ(driver_.GetErrorCode(), VFS_ERR_CLOUD_FAILED);
    EXPECT_FALSE(Download(Open("target").Get(), 3));
    EXPECT_FALSE(
        Cloud::DownloadFileToBuffer(&driver_, "x", buffer, 0, 10, &got, nullptr, nullptr, nullptr));
}

TEST_F(Transfers, ACancelOfAnEarlierTransferIsNotThisOnes) {
    YLIBCErrSetEx(0xa600, "test", 1);
    driver_.Serve(Pattern(300));
    char buffer[11];
    long long got = 0;
    EXPECT_FALSE(
        Cloud::DownloadFileToBuffer(&driver_, "x", buffer, 0, 10, &got, nullptr, nullptr, nullptr));
    EXPECT_EQ(driver_.GetErrorCode(), VFS_ERR_TRANSFER_ABORTED);
}

TEST_F(Transfers, InitXferDataGivesFunctionAndContextToTheHandler) {
    XferContext context;
    XferData up{FileReadCallback, 1, &context};
    XferData down{FileWriteCallback, 0, &context};
    XferData odd{FileWriteCallback, 2, &context};
    XferData bare{nullptr, 0, nullptr};
    EXPECT_FALSE(driver_.InitXferData(nullptr));
    EXPECT_TRUE(driver_.InitXferData(&up));
    EXPECT_TRUE(driver_.InitXferData(&down));
    EXPECT_TRUE(driver_.InitXferData(&odd));
    EXPECT_TRUE(driver_.InitXferData(&bare));
}

}  // namespace
}  // namespace ZYROCloud
