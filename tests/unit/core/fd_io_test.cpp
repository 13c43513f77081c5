#include "core/fd_io.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <csignal>
#include <thread>

#include "core/handle.h"

namespace ZYROVFS {
namespace {

class Pipe : public testing::Test {
  protected:
    Pipe() {
        int ends[2];
        EXPECT_EQ(pipe2(ends, O_CLOEXEC), 0);
        out_.Reset(ends[0]);
        in_.Reset(ends[1]);
    }

    UniqueFd out_;
    UniqueFd in_;
};

TEST_F(Pipe, TakesAndGivesATextThatIsLargerThanIt) {
    const std::string text(1 << 20, 'x');
    std::thread writer([&] {
        EXPECT_TRUE(WriteAll(in_.Get(), text));
        in_.Reset();
    });
    std::string back = "before ";
    EXPECT_TRUE(ReadAll(out_.Get(), back));
    writer.join();
    EXPECT_EQ(back, "before " + text);
}

TEST_F(Pipe, GivesNothingWhenNothingWasWritten) {
    EXPECT_TRUE(WriteAll(in_.Get(), ""));
    in_.Reset();
    std::string text;
    EXPECT_TRUE(ReadAll(out_.Get(), text));
    EXPECT_EQ(text, "");
}

TEST_F(Pipe, WithoutAReaderTellsTheCause) {
    signal(SIGPIPE, SIG_IGN);
    out_.Reset();
    EXPECT_FALSE(WriteAll(in_.Get(), "text"));
    EXPECT_EQ(errno, EPIPE);
    signal(SIGPIPE, SIG_DFL);
}

TEST_F(Pipe, ThatIsBrokenOffLeavesWhatWasReadAndTheCause) {
    ASSERT_TRUE(WriteAll(in_.Get(), "half"));
    ASSERT_EQ(fcntl(out_.Get(), F_SETFL, O_NONBLOCK), 0);
    std::string text;
    EXPECT_FALSE(ReadAll(out_.Get(), text));
    EXPECT_EQ(errno, EAGAIN);
    EXPECT_EQ(text, "half");
}

/** Signals that interrupt a call every millisecond. */
class Interruptions {
  public:
    Interruptions() {
        struct sigaction action {};
        action.sa_handler = [](int) {};
        sigaction(SIGUSR1, &action, &old_);
        const pthread_t target = pthread_self();
        thread_ = std::thread([this, target] {
            while (!stop_) {
                pthread_kill(target, SIGUSR1);
                timespec pause{0, 1000000};
                nanosleep(&pause, nullptr);
            }
        });
    }
    Interruptions(const Interruptions&) = delete;
    Interruptions& operator=(const Interruptions&) = delete;
    ~Interruptions() {
        stop_ = true;
        thread_.join();
        sigaction(SIGUSR1, &old_, nullptr);
    }

  private:
    struct sigaction old_ {};
    std::atomic<bool> stop_{false};
    std::thread thread_;
};

TEST_F(Pipe, IsReadThroughInterruptions) {
    std::thread writer([this] {
        timespec pause{0, 20000000};
        nanosleep(&pause, nullptr);
        EXPECT_TRUE(WriteAll(in_.Get(), "late"));
        in_.Reset();
    });
    std::string text;
    {
        const Interruptions often;
        EXPECT_TRUE(ReadAll(out_.Get(), text));
    }
    writer.join();
    EXPECT_EQ(text, "late");
}

TEST_F(Pipe, IsWrittenThroughInterruptions) {
    const std::string text(1 << 20, 'x');
    std::string back;
    std::thread reader([&] {
        timespec pause{0, 20000000};
        nanosleep(&pause, nullptr);
        EXPECT_TRUE(ReadAll(out_.Get(), back));
    });
    {
        const Interruptions often;
        EXPECT_TRUE(WriteAll(in_.Get(), text));
    }
    in_.Reset();
    reader.join();
    EXPECT_EQ(back, text);
}

}  // namespace
}  // namespace ZYROVFS
