#include "unit/cloud/transfer_wire.h"

#include <fcntl.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <unistd.h>

#include "core/handle.h"
#include "support/scratch.h"

namespace ZYROCloud {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;
using wire::Answer;
using wire::ReadRequest;
using wire::Send;
using wire::WireServer;

constexpr long long kMiB = 1024 * 1024;

/** Files and buffers over a socket to a server that says what the test wrote down. */
class Wires : public scratch::ScratchTest {
  protected:
    void SetUp() override { YLIBCErrSetEx(0, "test", 1); }
    UniqueFd Open(const std::string& name) const {
        return UniqueFd(open(Path(name).c_str(), O_RDWR | O_CREAT | O_CLOEXEC, 0600));
    }
    bool Download(const WireServer& server, long long size) {
        const UniqueFd fd = Open("target");
        return Cloud::DownloadFile(&driver_, server.Url(), fd.Get(), size, nullptr, nullptr,
                                   nullptr);
    }
    std::string Target() const { return scratch::Text(Path("target")); }
    /** 100 bytes from 300 on, into a buffer whose every other byte is a tilde. */
    bool FillBuffer(const WireServer& server, long long from = 300) {
        buffer_.assign(1000, '~');
        got_ = -1;
        return Cloud::DownloadFileToBuffer(&driver_, server.Url(), buffer_.data(), from, 100, &got_,
                                           nullptr, nullptr, nullptr);
    }

    WireDriver driver_;
    const std::string ten_ = Pattern(10 * kMiB);
    std::string buffer_;
    long long got_ = -1;
};

TEST_F(Wires, AWholeFileArrives) {
    const WireServer server({{ReadRequest(), Send(Answer(200, ten_))}});
    EXPECT_TRUE(Download(server, 10 * kMiB)) << seams::LogDump();
    EXPECT_TRUE(Target() == ten_);
    EXPECT_THAT(server.ReceivedText(), Not(HasSubstr("Range:")));
}

TEST_F(Wires, ADownloadCutAfterThreeMiBOfTenGoesOnThere) {
    const WireServer server(
        {{ReadRequest(), Send(CutAnswer(200, 10 * kMiB, ten_.substr(0, 3 * kMiB)))},
         {ReadRequest(),
          Send(Answer(206, ten_.substr(3 * kMiB), ContentRange(3 * kMiB, 10 * kMiB - 1)))}});
    EXPECT_TRUE(Download(server, 10 * kMiB)) << seams::LogDump();
    EXPECT_TRUE(Target() == ten_);
    EXPECT_THAT(seams::Sleeps(), ElementsAre(3U));
    EXPECT_THAT(server.Received().at(1), HasSubstr("Range: bytes=3145728-10485760\r\n"));
    EXPECT_TRUE(server.Finished());
}

TEST_F(Wires, ADownloadCutAfterAThousandBytesFails) {
    const WireServer server(
        {{ReadRequest(), Send(CutAnswer(200, 10 * kMiB, ten_.substr(0, 1000)))}});
    EXPECT_FALSE(Download(server, 10 * kMiB));
    EXPECT_EQ(Target(), ten_.substr(0, 1000));
    EXPECT_EQ(driver_.requests, 1);
    EXPECT_TRUE(seams::Logged("Size is wrong, 1000, 10485760")) << seams::LogDump();
    EXPECT_EQ(driver_.GetErrorCode(), VFS_ERR_RECEIVE_FAILED);
}

TEST_F(Wires, AConnectionResetInTheBodyLeavesAPrefixOfTheFile) {
    const WireServer server(
        {{ReadRequest(), Send(CutAnswer(200, 10 * kMiB, ten_.substr(0, 4 * kMiB))),
          wire::ReadBytes(0), wire::Reset()},
         {ReadRequest(), Send(CutAnswer(206, 6 * kMiB, ten_.substr(4 * kMiB, 2 * kMiB),
                                        ContentRange(4 * kMiB, 10 * kMiB - 1)))},
         {ReadRequest(), Send(Answer(200, "never"))}});
    // What a reset leaves of the bytes on their way is the kernel's to say: each pass is a prefix.
    Download(server, 10 * kMiB);
    const std::string got = Target();
    EXPECT_LE(got.size(), 6 * kMiB);
    EXPECT_TRUE(got == ten_.substr(0, got.size()));
}

TEST_F(Wires, AChunkedBodyThatIsCutIsNoSuccess) {
    const std::string head = "HTTP/1.1 200 Told\r\nTransfer-Encoding: chunked\r\n\r\n";
    const WireServer server({{ReadRequest(), Send(head + "5\r\n12345\r\n5\r\n67")}});
    EXPECT_FALSE(Download(server, 10));
    EXPECT_EQ(Target(), "1234567");
}

TEST_F(Wires, HeadersWithoutTheirBodyAreNoSuccess) {
    const WireServer server({{ReadRequest(), Send(CutAnswer(200, 10, ""))}});
    EXPECT_FALSE(Download(server, 10));
    EXPECT_EQ(Target(), "");
    EXPECT_EQ(driver_.GetErrorCode(), VFS_ERR_RECEIVE_FAILED);
}

TEST_F(Wires, ABodyThatEndsWithTheConnectionIsWhole) {
    const WireServer server({{ReadRequest(), Send("HTTP/1.1 200 Told\r\n\r\n12345")}});
    EXPECT_TRUE(Download(server, 5)) << seams::LogDump();
    EXPECT_EQ(Target(), "12345");
}

TEST_F(Wires, TheBodyOfAFailureNeverReachesTheFile) {
    const WireServer server({{ReadRequest(), Send(Answer(404, "not the file"))}});
    EXPECT_FALSE(Download(server, 12));
    EXPECT_EQ(Target(), "");
    EXPECT_EQ(driver_.GetErrorCode(), VFS_ERR_NOT_FOUND);
}

TEST_F(Wires, TheBodyOfARedirectNeverReachesTheFile) {
    const WireServer content({{ReadRequest(), Send(Answer(200, "12345"))}});
    const WireServer server(
        {{ReadRequest(), Send(Answer(302, "gone there", "Location: " + content.Url() + "\r\n"))}});
    EXPECT_TRUE(Download(server, 5)) << seams::LogDump();
    EXPECT_EQ(Target(), "12345");
}

TEST_F(Wires, AResumeThatIsAnsweredWithTheWholeFileWritesNothing) {
    const WireServer server(
        {{ReadRequest(), Send(CutAnswer(200, 10 * kMiB, ten_.substr(0, 3 * kMiB)))},
         {ReadRequest(), Send(Answer(200, ten_))}});
    EXPECT_FALSE(Download(server, 10 * kMiB));
    EXPECT_TRUE(Target() == ten_.substr(0, 3 * kMiB));
    EXPECT_TRUE(seams::Logged("Answer begins at 0 in place of 3145728")) << seams::LogDump();
    EXPECT_EQ(driver_.requests, 2);
}

TEST_F(Wires, AResumeThatIsAnsweredFromAnotherStartWritesNothing) {
    const WireServer server(
        {{ReadRequest(), Send(CutAnswer(200, 10 * kMiB, ten_.substr(0, 3 * kMiB)))},
         {ReadRequest(),
          Send(Answer(206, ten_.substr(2 * kMiB), ContentRange(2 * kMiB, 10 * kMiB - 1)))}});
    EXPECT_FALSE(Download(server, 10 * kMiB));
    EXPECT_TRUE(Target() == ten_.substr(0, 3 * kMiB));
    EXPECT_TRUE(seams::Logged("Answer begins at 2097152 in place of 3145728"));
}

TEST_F(Wires, AResumeThatIsAnsweredWithLessThanAnnouncedGoesOnFromTheTruePosition) {
    const WireServer server(
        {{ReadRequest(), Send(CutAnswer(200, 10 * kMiB, ten_.substr(0, 3 * kMiB)))},
         {ReadRequest(), Send(CutAnswer(206, 7 * kMiB, ten_.substr(3 * kMiB, 2 * kMiB + 5),
                                        ContentRange(3 * kMiB, 10 * kMiB - 1)))},
         {ReadRequest(), Send(Answer(206, ten_.substr(5 * kMiB + 5),
                                     ContentRange(5 * kMiB + 5, 10 * kMiB - 1)))}});
    EXPECT_TRUE(Download(server, 10 * kMiB)) << seams::LogDump();
    EXPECT_TRUE(Target() == ten_);
    EXPECT_THAT(server.Received().at(2), HasSubstr("Range: bytes=5242885-10485760\r\n"));
}

TEST_F(Wires, ABufferGetsTheRangeThatWasAskedFor) {
    const WireServer server(
        {{ReadRequest(), Send(Answer(206, ten_.substr(300, 101), ContentRange(300, 400)))}});
    EXPECT_TRUE(FillBuffer(server)) << seams::LogDump();
    EXPECT_EQ(got_, 101);
    EXPECT_EQ(buffer_, ten_.substr(300, 101) + std::string(899, '~'));
    EXPECT_THAT(server.ReceivedText(), HasSubstr("Range: bytes=300-400\r\n"));
}

TEST_F(Wires, ABufferTakesNothingOfAnotherPart) {
    const std::string part = ten_.substr(0, 101);
    for (const std::string& answer :
         {Answer(200, ten_), Answer(206, part, ContentRange(299, 399)),
          Answer(206, part, ContentRange(301, 401)),
          Answer(206, part, "Content-Range: bytes */9\r\n"),
          Answer(206, part, "Content-Range: lines 300-400/9\r\n"),
          Answer(206, part, "Content-Range: bytes 300\r\n"),
          Answer(206, part, "Content-Range: bytes 99999999999999999999999-4/9\r\n"),
          Answer(206, part, "Content-Type: multipart/byteranges; boundary=x\r\n")}) {
        const WireServer server({{ReadRequest(), Send(answer)}});
        EXPECT_FALSE(FillBuffer(server)) << answer.substr(0, 100);
        EXPECT_EQ(buffer_, std::string(1000, '~')) << answer.substr(0, 100);
        EXPECT_EQ(got_, -1);
        EXPECT_EQ(driver_.GetErrorCode(), VFS_ERR_TRANSFER_ABORTED);
    }
}

TEST_F(Wires, APartWhoseServerDoesNotNameItIsBelieved) {
    const WireServer server({{ReadRequest(), Send(Answer(206, ten_.substr(300, 101)))}});
    EXPECT_TRUE(FillBuffer(server)) << seams::LogDump();
    EXPECT_EQ(buffer_.substr(0, 101), ten_.substr(300, 101));
}

TEST_F(Wires, ABufferFromTheStartStopsAtItsEndWhenTheWholeFileComes) {
    const WireServer server({{ReadRequest(), Send(Answer(200, ten_))}});
    EXPECT_FALSE(FillBuffer(server, 0));
    EXPECT_EQ(buffer_.substr(101), std::string(899, '~'));
}

TEST_F(Wires, AWholeFileThatFitsIsTakenForARangeFromTheStart) {
    const WireServer server({{ReadRequest(), Send(Answer(200, "short file"))}});
    EXPECT_TRUE(FillBuffer(server, 0)) << seams::LogDump();
    EXPECT_EQ(got_, 10);
}

TEST_F(Wires, APartWithMoreBytesThanItsRangeStopsAtTheEndOfTheBuffer) {
    const WireServer server(
        {{ReadRequest(), Send(Answer(206, ten_.substr(300, 600), ContentRange(300, 400)))}});
    EXPECT_FALSE(FillBuffer(server));
    EXPECT_EQ(buffer_.substr(101), std::string(899, '~'));
}

TEST_F(Wires, APartWithFewerBytesThanAnnouncedIsNoSuccess) {
    const WireServer server(
        {{ReadRequest(), Send(CutAnswer(206, 101, ten_.substr(300, 40), ContentRange(300, 400)))}});
    EXPECT_FALSE(FillBuffer(server));
    EXPECT_EQ(buffer_, ten_.substr(300, 40) + std::string(960, '~'));
    EXPECT_EQ(driver_.GetErrorCode(), VFS_ERR_RECEIVE_FAILED);
}

TEST_F(Wires, APartUpToTheEndOfTheFileIsWhole) {
    const WireServer server(
        {{ReadRequest(), Send(Answer(206, ten_.substr(300, 40), ContentRange(300, 339)))}});
    EXPECT_TRUE(FillBuffer(server)) << seams::LogDump();
    EXPECT_EQ(got_, 40);
}

TEST_F(Wires, AFullDiskEndsADownloadWithWhatFitsInPlace) {
    ASSERT_EQ(mkdir(Path("disk").c_str(), 0700), 0);
    ASSERT_EQ(mount("tmpfs", Path("disk").c_str(), "tmpfs", 0, "size=2m"), 0);
    const WireServer server({{ReadRequest(), Send(Answer(200, ten_))},
                             {ReadRequest(), Send(Answer(206, ten_.substr(2 * kMiB),
                                                         ContentRange(2 * kMiB, 10 * kMiB - 1)))}});
    {
        const UniqueFd fd = Open("disk/target");
        EXPECT_FALSE(Cloud::DownloadFile(&driver_, server.Url(), fd.Get(), 10 * kMiB, nullptr,
                                         nullptr, nullptr));
        EXPECT_EQ(lseek(fd.Get(), 0, SEEK_CUR), 2 * kMiB);
    }
    EXPECT_TRUE(scratch::Text(Path("disk/target")) == ten_.substr(0, 2 * kMiB));
    EXPECT_EQ(driver_.GetErrorCode(), VFS_ERR_TRANSFER_ABORTED);
    EXPECT_EQ(YLIBCErrGet(), 0x2900U);
    EXPECT_TRUE(seams::Logged("Size is wrong, 2097152, 10485760")) << seams::LogDump();
    EXPECT_EQ(umount(Path("disk").c_str()), 0);
}

TEST_F(Wires, AChunkOfAnySizeThatTheDiskDoesNotTakeIsNoSuccess) {
    for (const size_t size : {22, 23, 24}) {
        const WireServer server({{ReadRequest(), Send(Answer(200, std::string(size, 'x')))}});
        WireDriver driver;
        const UniqueFd full(open("/dev/full", O_WRONLY | O_CLOEXEC));
        EXPECT_FALSE(Cloud::DownloadFile(&driver, server.Url(), full.Get(),
                                         static_cast<long long>(size), nullptr, nullptr, nullptr))
            << size;
        EXPECT_EQ(driver.GetErrorCode(), VFS_ERR_TRANSFER_ABORTED) << size;
        EXPECT_EQ(YLIBCErrGet(), 0x2900U) << size;
    }
}

int cancel_in = 0;
int CancelLater() {
    return --cancel_in < 0 ? 1 : 0;
}

TEST_F(Wires, ACancelAtAChunkOfAnySizeIsOne) {
    for (const size_t size : {22, 23, 24}) {
        const WireServer server({{ReadRequest(), Send(Answer(200, std::string(size, 'x')))}});
        WireDriver driver;
        const UniqueFd fd = Open("target");
        cancel_in = 0;
        EXPECT_FALSE(Cloud::DownloadFile(&driver, server.Url(), fd.Get(),
                                         static_cast<long long>(size), nullptr, CancelLater,
                                         nullptr))
            << size;
        EXPECT_EQ(driver.GetErrorCode(), VFS_ERR_CANCELLED) << size;
        EXPECT_EQ(Target(), "") << size;
    }
}

TEST_F(Wires, ACancelEndsADownloadAndAnUploadAsCancelled) {
    const WireServer down({{ReadRequest(), Send(Answer(200, ten_))}});
    const UniqueFd fd = Open("target");
    cancel_in = 5;
    EXPECT_FALSE(Cloud::DownloadFile(&driver_, down.Url(), fd.Get(), 10 * kMiB, nullptr,
                                     CancelLater, nullptr));
    EXPECT_EQ(driver_.GetErrorCode(), VFS_ERR_CANCELLED);
    EXPECT_EQ(driver_.requests, 1);

    Put("source", ten_);
    const UniqueFd source = Open("source");
    const WireServer up({{ReadRequest(), Send(Answer(201))}});
    WireDriver driver;
    cancel_in = 5;
    EXPECT_FALSE(Cloud::UploadFile(&driver, up.Url(), source.Get(), 10 * kMiB, nullptr, CancelLater,
                                   nullptr));
    EXPECT_EQ(driver.GetErrorCode(), VFS_ERR_CANCELLED);
}

long long Slowly(unsigned long long, unsigned long long) {
    return 1500;
}

TEST_F(Wires, ALimitedSpeedChangesNothingButThePieces) {
    const std::string bytes = ten_.substr(0, 300000);
    const WireServer down({{ReadRequest(), Send(Answer(200, bytes))}});
    const UniqueFd fd = Open("target");
    EXPECT_TRUE(
        Cloud::DownloadFile(&driver_, down.Url(), fd.Get(), 300000, nullptr, nullptr, Slowly));
    EXPECT_TRUE(Target() == bytes);
    const WireServer up({{ReadRequest(), Send(Answer(201))}});
    lseek(fd.Get(), 0, SEEK_SET);
    EXPECT_TRUE(Cloud::UploadFile(&driver_, up.Url(), fd.Get(), 300000, nullptr, nullptr, Slowly));
    EXPECT_TRUE(BodyOf(up) == bytes);
}

/** Changes the file in the middle of its upload. */
int changing_fd = -1;
off_t changed_size = 0;
int Change(unsigned long long, unsigned long long) {
    return ftruncate(changing_fd, changed_size);
}

TEST_F(Wires, AFileThatGrowsDuringItsUploadArrivesInTheSizeThatWasAnnounced) {
    Put("source", ten_);
    const UniqueFd fd = Open("source");
    changing_fd = fd.Get();
    changed_size = 12 * kMiB;
    const WireServer server({{ReadRequest(), Send(Answer(201))}});
    EXPECT_TRUE(
        Cloud::UploadFile(&driver_, server.Url(), fd.Get(), 10 * kMiB, Change, nullptr, nullptr))
        << seams::LogDump();
    EXPECT_TRUE(BodyOf(server) == ten_);
}

TEST_F(Wires, AFileThatShrinksDuringItsUploadFailsAtOnce) {
    Put("source", ten_);
    const UniqueFd fd = Open("source");
    changing_fd = fd.Get();
    changed_size = 5 * kMiB;
    const WireServer server({{ReadRequest(), Send(Answer(201))}});
    EXPECT_FALSE(
        Cloud::UploadFile(&driver_, server.Url(), fd.Get(), 10 * kMiB, Change, nullptr, nullptr));
    EXPECT_EQ(driver_.GetErrorCode(), VFS_ERR_TRANSFER_ABORTED);
    EXPECT_TRUE(seams::LoggedPart("The file ended 5242880 bytes before its size"))
        << seams::LogDump();
    EXPECT_LT(BodyOf(server).size(), ten_.size());
}

TEST_F(Wires, AnUploadWhoseServerDiesBehindItsContinueIsNoSuccess) {
    Put("source", ten_);
    const UniqueFd fd = Open("source");
    const WireServer server({{wire::ReadHead(), Send("HTTP/1.1 100 Continue\r\n\r\n"),
                              wire::ReadBytes(100000), wire::Reset()}});
    driver_.expect_continue = true;
    EXPECT_FALSE(
        Cloud::UploadFile(&driver_, server.Url(), fd.Get(), 10 * kMiB, nullptr, nullptr, nullptr));
    EXPECT_NE(driver_.GetErrorCode(), VFS_ERR_NONE);
}

TEST_F(Wires, AnFtpServerThatGoesBeforeItHasTheFileIsNoSuccess) {
    Put("source", std::string(1000, 'x'));
    Put("empty", "");
    for (const char* name : {"source", "empty"}) {
        SCOPED_TRACE(name);
        const WireServer data({{wire::ReadAll()}});
        wire::Script script = {Send("220 ready\r\n")};
        const std::string passive = "229 Entering (|||" + std::to_string(data.Port()) + "|)";
        for (const std::string& reply :
             {std::string("331 password?"), std::string("230 in"), std::string("257 \"/\""),
              passive, std::string("200 binary")}) {
            script.push_back(wire::ReadLine());
            script.push_back(Send(reply + "\r\n"));
        }
        script.push_back(wire::ReadLine());  // STOR, and no answer
        const WireServer server({script});
        const UniqueFd fd = Open(name);
        const off_t size = lseek(fd.Get(), 0, SEEK_END);
        lseek(fd.Get(), 0, SEEK_SET);
        WireDriver driver;
        EXPECT_FALSE(Cloud::UploadFile(&driver, server.Url("/file", "ftp"), fd.Get(), size, nullptr,
                                       nullptr, nullptr));
        EXPECT_THAT(server.ReceivedText(), HasSubstr("STOR file"));
        EXPECT_NE(driver.GetErrorCode(), VFS_ERR_NONE);
    }
}

TEST_F(Wires, AnUploadThatWasSentElsewhereAndBrokeThereIsNoSuccess) {
    Put("source", std::string(1000, 'x'));
    const UniqueFd fd = Open("source");
    const WireServer other({{wire::ReadHead(), wire::Reset()}});
    const WireServer server(
        {{ReadRequest(), Send(Answer(307, "", "Location: " + other.Url() + "\r\n"))}});
    EXPECT_FALSE(
        Cloud::UploadFile(&driver_, server.Url(), fd.Get(), 1000, nullptr, nullptr, nullptr));
    EXPECT_NE(driver_.GetErrorCode(), VFS_ERR_NONE);
}

}  // namespace
}  // namespace ZYROCloud
