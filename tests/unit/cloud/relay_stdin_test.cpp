#include "cloud/relay_stdin.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <sys/resource.h>
#include <sys/select.h>
#include <unistd.h>
#include <zosplatform/error.h>

#include <algorithm>
#include <cstring>
#include <string>

#include "cloud/transfer.h"
#include "core/handle.h"
#include "support/input_seam.h"
#include "support/relay_input.h"
#include "support/seams.h"

namespace ZYROCloud {
namespace {

using namespace ZYROVFS;  // NOLINT(google-build-using-namespace)
using testing::AllOf;
using testing::ElementsAre;
using testing::Gt;
using testing::Le;

class RelayStdin : public testing::Test {
  protected:
    void SetUp() override {
        seams::Reset();
        input_seam::Reset();
        BeginTransfer(0, {});
        YLIBCErrSetEx(0, "test", 1);
    }
    void TearDown() override { input_seam::Reset(); }

    ssize_t Read(int fd, size_t size = sizeof data_) {
        return RelayStdinRead(fd, data_, size, &error_);
    }

    char data_[4096] = "";
    int error_ = 0;
};

TEST_F(RelayStdin, GivesWhatIsThereAndThenTheEnd) {
    const relay_input::Sender sender("hello");
    std::string all;
    for (ssize_t n = 1; n > 0;) {
        n = Read(sender.Get(), 2);
        ASSERT_GE(n, 0);
        all.append(data_, static_cast<size_t>(n));
    }
    EXPECT_EQ(all, "hello");
    EXPECT_EQ(error_, 0);
}

TEST_F(RelayStdin, AnHourOfSilenceIsTheCallersCodeMinusSeven) {
    const relay_input::Sender sender("late");
    input_seam::answers = {input_seam::Silence()};
    EXPECT_EQ(Read(sender.Get()), -1);
    EXPECT_EQ(error_, -7);
    EXPECT_THAT(input_seam::waits, ElementsAre(AllOf(Gt(3590 * 1000), Le(3600 * 1000))));
    EXPECT_TRUE(
        seams::Logged("(pid=" + std::to_string(getpid()) +
                      ") NO data within 3600 seconds, return=0, errno=" + strerror(ETIMEDOUT)))
        << seams::LogDump();
}

TEST_F(RelayStdin, AWaitThatFailsIsTheSameCode) {
    const relay_input::Sender sender("late");
    input_seam::answers = {input_seam::Fails(ENOMEM)};
    EXPECT_EQ(Read(sender.Get()), -1);
    EXPECT_EQ(error_, -7);
    EXPECT_TRUE(seams::LoggedPart(std::string("return=-1, errno=") + strerror(ENOMEM)))
        << seams::LogDump();
}

TEST_F(RelayStdin, ASignalNeitherEndsTheWaitNorBeginsTheHourAnew) {
    const relay_input::Sender sender("x");
    input_seam::answers = {input_seam::Fails(EINTR), input_seam::Fails(EINTR),
                           input_seam::Silence()};
    EXPECT_EQ(Read(sender.Get()), -1);
    EXPECT_EQ(error_, -7);
    ASSERT_EQ(input_seam::waits.size(), 3U);
    EXPECT_LE(input_seam::waits[2], input_seam::waits[1]);
    EXPECT_LE(input_seam::waits[1], input_seam::waits[0]);
    input_seam::answers = {input_seam::Fails(EINTR)};
    EXPECT_EQ(Read(sender.Get()), 1) << "goes on where the signal came";
}

TEST_F(RelayStdin, ASignalMayBringACancel) {
    const relay_input::Sender sender("x");
    BeginTransfer(0, {nullptr, [] { return 1; }, nullptr});
    input_seam::answers = {input_seam::Fails(EINTR)};
    EXPECT_EQ(Read(sender.Get()), -1);
    EXPECT_EQ(error_, 0);
    EXPECT_EQ(YLIBCErrGet(), 0xa600U);
}

TEST_F(RelayStdin, ADescriptorThatIsNotOpenIsTheCallersCodeMinusSeven) {
    int closed = -1;
    {
        const UniqueFd gone(open("/dev/null", O_RDONLY | O_CLOEXEC));
        closed = gone.Get();
    }
    EXPECT_EQ(Read(closed), -1);
    EXPECT_EQ(error_, -7);
    EXPECT_TRUE(seams::Logged(
        std::string("failed to wait for the change of file descriptor, errno=") + strerror(EBADF)))
        << seams::LogDump();
}

TEST_F(RelayStdin, ADescriptorBeyondWhatSelectCanTakeIsReadLikeAnyOther) {
    rlimit limit{};
    ASSERT_EQ(getrlimit(RLIMIT_NOFILE, &limit), 0);
    if (limit.rlim_cur <= FD_SETSIZE + 10) {
        limit.rlim_cur = std::min<rlim_t>(limit.rlim_max, FD_SETSIZE + 100);
        ASSERT_EQ(setrlimit(RLIMIT_NOFILE, &limit), 0);
    }
    const relay_input::Sender sender("far out");
    const UniqueFd high(fcntl(sender.Get(), F_DUPFD_CLOEXEC, FD_SETSIZE + 7));
    ASSERT_GE(high.Get(), FD_SETSIZE);
    EXPECT_EQ(Read(high.Get()), 7);
    EXPECT_EQ(std::string(data_, 7), "far out");
}

TEST_F(RelayStdin, AReadThatFailsLeavesThePlatformErrorAndNoCode) {
    const UniqueFd write_only(open("/dev/null", O_WRONLY | O_CLOEXEC));
    EXPECT_EQ(Read(write_only.Get()), -1);
    EXPECT_EQ(YLIBCErrGet(), 0x600U) << "not open for reading";

    const UniqueFd folder(open("/", O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    EXPECT_EQ(Read(folder.Get()), -1);
    EXPECT_EQ(YLIBCErrGet(), 0x8000U);
    EXPECT_TRUE(seams::Logged("Unable to readfile, errno=" + std::to_string(EISDIR) + "(" +
                              strerror(EISDIR) + ")"))
        << seams::LogDump();

    const relay_input::Sender sender("x");
    EXPECT_EQ(RelayStdinRead(sender.Get(), reinterpret_cast<char*>(1), 1, &error_), -1);
    EXPECT_EQ(YLIBCErrGet(), 0x300U) << "no such memory";
    EXPECT_EQ(error_, 0);
}

}  // namespace
}  // namespace ZYROCloud
