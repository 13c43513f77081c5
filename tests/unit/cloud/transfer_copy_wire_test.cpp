#include "support/scratch.h"
#include "unit/cloud/transfer_wire.h"

namespace ZYROCloud {
namespace {

using testing::HasSubstr;
using wire::Answer;
using wire::ReadRequest;
using wire::Send;
using wire::WireServer;

constexpr long long kMiB = 1024 * 1024;

/** Copies between two servers, over sockets. */
class CopyWires : public testing::Test {
  protected:
    void SetUp() override { YLIBCErrSetEx(0, "test", 1); }
    bool Copy(const WireServer& from, const WireServer& to, long long size,
              SpeedCallback speed = nullptr) {
        return Cloud::CopyFile(&src_, &dst_, from.Url(), to.Url("/target"), size, nullptr, nullptr,
                               speed);
    }

    const std::string ten_ = Pattern(10 * kMiB);
    WireDriver src_, dst_;
};

TEST_F(CopyWires, EveryByteArrives) {
    const WireServer from({{ReadRequest(), Send(Answer(200, ten_))}});
    const WireServer to({{ReadRequest(), Send(Answer(201))}});
    EXPECT_TRUE(Copy(from, to, 10 * kMiB)) << seams::LogDump();
    EXPECT_TRUE(BodyOf(to) == ten_);
    EXPECT_THAT(to.ReceivedText(), HasSubstr("PUT /target HTTP/1.1\r\n"));
    EXPECT_EQ(YLIBCErrGet(), 0U);
}

TEST_F(CopyWires, TheSourceKnowsTheSizeBetterThanTheCaller) {
    for (const long long told : {0LL, 5 * kMiB, 20 * kMiB}) {
        const WireServer from({{ReadRequest(), Send(Answer(200, ten_))}});
        const WireServer to({{ReadRequest(), Send(Answer(201))}});
        EXPECT_TRUE(Copy(from, to, told)) << told << "\n" << seams::LogDump();
        EXPECT_TRUE(BodyOf(to) == ten_) << told;
        EXPECT_THAT(to.ReceivedText(), HasSubstr("Content-Length: 10485760\r\n"));
    }
}

TEST_F(CopyWires, AnEmptyFileArrives) {
    const WireServer from({{ReadRequest(), Send(Answer(200))}});
    const WireServer to({{ReadRequest(), Send(Answer(201))}});
    EXPECT_TRUE(Copy(from, to, 0)) << seams::LogDump();
    EXPECT_EQ(to.Received().size(), 1U);
    EXPECT_EQ(BodyOf(to), "");
}

TEST_F(CopyWires, AFileOfExactlyTwentyThreeBytesFails) {
    const WireServer from({{ReadRequest(), Send(Answer(200, std::string(23, 'x')))}});
    const WireServer to({{ReadRequest(), Send(Answer(201))}});
    EXPECT_FALSE(Copy(from, to, 23));
}

TEST_F(CopyWires, NeighboursOfTwentyThreeBytesArrive) {
    for (const size_t size : {1, 22, 24}) {
        const WireServer from({{ReadRequest(), Send(Answer(200, std::string(size, 'x')))}});
        const WireServer to({{ReadRequest(), Send(Answer(201))}});
        EXPECT_TRUE(Copy(from, to, static_cast<long long>(size))) << size << seams::LogDump();
        EXPECT_EQ(BodyOf(to), std::string(size, 'x'));
    }
}

TEST_F(CopyWires, ASourceThatHasNoSuchFileLeavesTheTargetAlone) {
    const WireServer from({{ReadRequest(), Send(Answer(404, "no such file"))}});
    const WireServer to({{ReadRequest(), Send(Answer(201))}});
    EXPECT_FALSE(Copy(from, to, 10));
    EXPECT_EQ(to.Connections(), 0U);
    EXPECT_EQ(YLIBCErrGet(), 0x600U);
    EXPECT_TRUE(seams::LoggedPart("Download Failed, err:")) << seams::LogDump();
}

TEST_F(CopyWires, ASourceThatDiesInTheMiddleFailsTheCopy) {
    const WireServer from(
        {{ReadRequest(), Send(CutAnswer(200, 10 * kMiB, ten_.substr(0, 3 * kMiB)))}});
    const WireServer to({{ReadRequest(), Send(Answer(201))}});
    EXPECT_FALSE(Copy(from, to, 10 * kMiB));
    EXPECT_EQ(src_.GetErrorCode(), VFS_ERR_RECEIVE_FAILED);
    EXPECT_EQ(dst_.GetErrorCode(), VFS_ERR_TRANSFER_ABORTED);
}

TEST_F(CopyWires, ATargetThatDiesInTheMiddleFailsTheCopy) {
    const WireServer from({{ReadRequest(), Send(Answer(200, ten_))}});
    const WireServer to({{wire::ReadHead(), wire::ReadBytes(kMiB), wire::Reset()}});
    EXPECT_FALSE(Copy(from, to, 10 * kMiB));
    EXPECT_NE(dst_.GetErrorCode(), VFS_ERR_NONE);
    EXPECT_NE(src_.GetErrorCode(), VFS_ERR_NONE);
}

TEST_F(CopyWires, ATargetThatDiesBehindItsContinueFailsTheCopy) {
    const WireServer from({{ReadRequest(), Send(Answer(200, ten_))}});
    const WireServer to({{wire::ReadHead(), Send("HTTP/1.1 100 Continue\r\n\r\n"),
                          wire::ReadBytes(kMiB), wire::Reset()}});
    dst_.expect_continue = true;
    EXPECT_FALSE(Copy(from, to, 10 * kMiB));
}

TEST_F(CopyWires, ATargetThatRefusesForItsSpaceIsTold) {
    // The source has ended by then, so that its driver has nothing to say.
    const WireServer from({{ReadRequest(), Send(Answer(200, "12345"))}});
    const WireServer to({{ReadRequest(), Send(Answer(507, "full"))}});
    EXPECT_FALSE(Copy(from, to, 5));
    EXPECT_EQ(dst_.GetErrorCode(), VFS_ERR_NO_SPACE);
    EXPECT_EQ(YLIBCErrGet(), 0x2900U);
    EXPECT_TRUE(seams::LoggedPart("Upload Failed, err:")) << seams::LogDump();
}

TEST_F(CopyWires, ATargetThatIsNotThereFailsTheCopy) {
    const WireServer from({{ReadRequest(), Send(Answer(200, ten_))}});
    std::string nowhere;
    {
        const WireServer gone({});
        nowhere = gone.Url();
    }
    EXPECT_FALSE(
        Cloud::CopyFile(&src_, &dst_, from.Url(), nowhere, 10 * kMiB, nullptr, nullptr, nullptr));
    EXPECT_EQ(dst_.GetErrorCode(), VFS_ERR_CONNECT_FAILED);
}

long long Slowly(unsigned long long, unsigned long long) {
    return 1500;
}

TEST_F(CopyWires, ALimitedSpeedChangesNothingButThePieces) {
    const std::string bytes = ten_.substr(0, 300000);
    const WireServer from({{ReadRequest(), Send(Answer(200, bytes))}});
    const WireServer to({{ReadRequest(), Send(Answer(201))}});
    EXPECT_TRUE(Copy(from, to, 300000, Slowly)) << seams::LogDump();
    EXPECT_TRUE(BodyOf(to) == bytes);
}

}  // namespace
}  // namespace ZYROCloud
