#include <curl/curl.h>
#include <fcntl.h>
#include <sys/mount.h>
#include <sys/wait.h>
#include <unistd.h>

#include <climits>

#include "core/handle.h"
#include "support/scratch.h"
#include "unit/cloud/transfer_fixture.h"

namespace ZYROCloud {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

long long speed_answer = 0;
std::vector<std::pair<unsigned long long, unsigned long long>> speed_asked, progress_told;
int cancel_answer = 0;

long long Speed(unsigned long long chunk, unsigned long long done) {
    speed_asked.emplace_back(chunk, done);
    return speed_answer;
}
int Progress(unsigned long long chunk, unsigned long long done) {
    progress_told.emplace_back(chunk, done);
    return 1;  // what it answers is not looked at
}
int CancelWish() {
    return cancel_answer;
}

class Callbacks : public scratch::ScratchTest {
  protected:
    void SetUp() override {
        speed_asked.clear();
        progress_told.clear();
        speed_answer = cancel_answer = 0;
        BeginTransfer(1000, {nullptr, nullptr, nullptr});
        YLIBCErrSetEx(0, "test", 1);
    }
    UniqueFd Open(const std::string& name, int flags = O_RDWR | O_CREAT) const {
        return UniqueFd(open(Path(name).c_str(), flags | O_CLOEXEC, 0600));
    }
    size_t Read(size_t want) { return FileReadCallback(room_, 1, want, &context_); }
    size_t Write(const std::string& bytes) {
        std::string copy = bytes;
        return FileWriteCallback(copy.data(), 1, copy.size(), &context_);
    }

    XferContext context_;
    char room_[200000] = {};
};

TEST_F(Callbacks, AReadWithoutAContextAborts) {
    EXPECT_EQ(FileReadCallback(room_, 1, 10, nullptr), size_t{CURL_READFUNC_ABORT});
}

TEST_F(Callbacks, ACancelAbortsAReadWithThePlatformErrorOfACancel) {
    const UniqueFd fd = Open("source");
    context_.fd = fd.Get();
    transfer.cancel_cb = CancelWish;
    EXPECT_EQ(Read(10), 0U);
    cancel_answer = -7;
    EXPECT_EQ(Read(10), size_t{CURL_READFUNC_ABORT});
    EXPECT_EQ(YLIBCErrGet(), 0xa600U);
}

TEST_F(Callbacks, AReadCountsDownWhatIsLeftAndTellsTheProgress) {
    Put("source", Pattern(1000));
    const UniqueFd fd = Open("source");
    context_.fd = fd.Get();
    transfer.progress_cb = Progress;
    EXPECT_EQ(FileReadCallback(room_, 100, 6, &context_), 600U);
    EXPECT_EQ(Read(600), 400U);
    EXPECT_EQ(Read(600), 0U);
    EXPECT_THAT(progress_told, ElementsAre(std::pair(600ULL, 600ULL), std::pair(400ULL, 1000ULL),
                                           std::pair(0ULL, 1000ULL)));
    EXPECT_EQ(transfer.bytes_left, 0U);
}

TEST_F(Callbacks, ARetryThatSendsTheFileAgainDoesNotRunPastTheTotal) {
    Put("source", Pattern(1500));
    const UniqueFd fd = Open("source");
    context_.fd = fd.Get();
    ASSERT_EQ(lseek(fd.Get(), 500, SEEK_SET), 500);
    transfer.source_end = 1500;
    transfer.progress_cb = Progress;
    EXPECT_EQ(Read(600), 600U);
    ASSERT_EQ(lseek(fd.Get(), 500, SEEK_SET), 500);
    EXPECT_EQ(Read(600), 600U);
    EXPECT_EQ(Read(600), 400U);
    EXPECT_THAT(progress_told, ElementsAre(std::pair(600ULL, 600ULL), std::pair(600ULL, 600ULL),
                                           std::pair(400ULL, 1000ULL)));
}

TEST_F(Callbacks, ASpeedWithinWhatIsWantedLimitsAReadAndAnyOtherLeavesItAsItWas) {
    Put("source", Pattern(1000));
    const UniqueFd fd = Open("source");
    context_.fd = fd.Get();
    transfer.speed_cb = Speed;
    speed_answer = 40;
    EXPECT_EQ(Read(100), 40U);
    for (const long long odd : {0LL, -1LL, 101LL, LLONG_MIN, LLONG_MAX}) {
        speed_answer = odd;
        EXPECT_EQ(Read(100), 100U) << odd;
    }
    speed_answer = 100;
    EXPECT_EQ(Read(100), 100U);
    EXPECT_EQ(speed_asked[1], std::pair(100ULL, 40ULL));
}

TEST_F(Callbacks, ALimitedReadStopsAtTheEndOfTheChunk) {
    Put("source", Pattern(1000));
    const UniqueFd fd = Open("source");
    context_.fd = fd.Get();
    context_.limited = true;
    context_.chunk_left = 150;
    EXPECT_EQ(Read(100), 100U);
    EXPECT_EQ(Read(100), 50U);
    EXPECT_EQ(Read(100), 0U);
    EXPECT_EQ(context_.chunk_left, 0U);
    EXPECT_EQ(transfer.bytes_left, 850U);
}

TEST_F(Callbacks, AReadThatFailsLeavesThePlatformErrorOfItsCause) {
    EXPECT_EQ(Read(10), size_t{CURL_READFUNC_ABORT});  // no descriptor
    EXPECT_EQ(YLIBCErrGet(), 0x600U);
    Put("source", "abc");
    const UniqueFd fd = Open("source");
    context_.fd = fd.Get();
    EXPECT_EQ(FileReadCallback(nullptr, 1, 3, &context_), size_t{CURL_READFUNC_ABORT});
    EXPECT_EQ(YLIBCErrGet(), 0x300U);
    EXPECT_THAT(seams::LogLines(), IsEmpty());
    const UniqueFd folder(open(directory_.c_str(), O_RDONLY | O_CLOEXEC));
    context_.fd = folder.Get();
    EXPECT_EQ(Read(10), size_t{CURL_READFUNC_ABORT});
    EXPECT_EQ(YLIBCErrGet(), 0x8000U);
    EXPECT_TRUE(seams::Logged("Unable to readfile, errno=21(Is a directory)")) << seams::LogDump();
}

TEST_F(Callbacks, AFileThatGrowsWhileItIsReadIsSentInItsFirstSize) {
    Put("source", Pattern(2000));
    const UniqueFd fd = Open("source");
    context_.fd = fd.Get();
    transfer.source_end = 1000;
    EXPECT_EQ(Read(700), 700U);
    EXPECT_EQ(Read(700), 300U);
    EXPECT_EQ(Read(700), 0U);
    EXPECT_EQ(transfer.bytes_left, 0U);
}

TEST_F(Callbacks, AFileThatShrinksWhileItIsReadEndsTheUpload) {
    Put("source", Pattern(1000));
    const UniqueFd fd = Open("source");
    context_.fd = fd.Get();
    transfer.source_end = 1000;
    EXPECT_EQ(Read(700), 700U);
    ASSERT_EQ(ftruncate(fd.Get(), 800), 0);
    EXPECT_EQ(Read(700), 100U);
    EXPECT_EQ(Read(700), size_t{CURL_READFUNC_ABORT});
    EXPECT_EQ(YLIBCErrGet(), 0x3b00U);
    EXPECT_TRUE(seams::LoggedPart("The file ended 200 bytes before its size"));
}

TEST_F(Callbacks, AFileThatIsReadAgainFromItsStartIsSentWhole) {
    Put("source", Pattern(1000));
    const UniqueFd fd = Open("source");
    context_.fd = fd.Get();
    transfer.source_end = 1000;
    EXPECT_EQ(Read(700), 700U);
    lseek(fd.Get(), 0, SEEK_SET);
    EXPECT_EQ(Read(2000), 1000U);
    EXPECT_EQ(Read(2000), 0U);
}

TEST_F(Callbacks, ReadsGetOutOfStepWithABufferThatBeginsJustBehindAPage) {
    Put("source", Pattern(100000));
    const UniqueFd fd = Open("source");
    context_.fd = fd.Get();
    transfer.source_end = 100000;
    alignas(4096) static char page[40960];
    EXPECT_EQ(FileReadCallback(page + 16, 1, 32768, &context_), 32768U - 2048U);
    EXPECT_EQ(FileReadCallback(page + 16, 1, 32768, &context_), 32768U);
    EXPECT_EQ(FileReadCallback(page + 16, 1, 8192, &context_), 8192U);
    lseek(fd.Get(), 0, SEEK_SET);
    EXPECT_EQ(FileReadCallback(page, 1, 32768, &context_), 32768U);
    EXPECT_EQ(FileReadCallback(page + 16, 1, 8192, &context_), 8192U) << "too short for that";
    EXPECT_EQ(std::string(page + 16, 8192), Pattern(100000).substr(32768, 8192));
}

TEST_F(Callbacks, APipeHasNoEndThatIsKnown) {
    int ends[2];
    ASSERT_EQ(pipe(ends), 0);
    const UniqueFd in(ends[0]);
    UniqueFd out(ends[1]);
    ASSERT_EQ(write(out.Get(), "abc", 3), 3);
    out.Reset();
    FakeDriver driver;
    driver.Keep();
    EXPECT_TRUE(Cloud::UploadFile(&driver, "x", in.Get(), 10, nullptr, nullptr, nullptr));
    EXPECT_EQ(driver.kept, "abc");
}

TEST_F(Callbacks, AWriteWithoutAContextFailsWithTwentyThree) {
    EXPECT_EQ(FileWriteCallback(room_, 1, 10, nullptr), 23U);
}

TEST_F(Callbacks, AWriteForbidsARetryBeforeAnythingElse) {
    transfer.cancel_cb = CancelWish;
    cancel_answer = 1;
    EXPECT_EQ(Write("abc"), 23U);
    EXPECT_FALSE(context_.can_retry);
    EXPECT_EQ(YLIBCErrGet(), 0xa600U);
}

TEST_F(Callbacks, AFailedWriteOfTwentyThreeBytesLooksLikeASuccess) {
    const std::string bytes(23, 'x');
    EXPECT_EQ(Write(bytes), bytes.size());  // neither descriptor nor buffer
    EXPECT_TRUE(seams::Logged("Wrong callback data"));
}

TEST_F(Callbacks, NeitherAndBothOfDescriptorAndBufferAreWrong) {
    EXPECT_EQ(Write("abc"), 23U);
    const UniqueFd fd = Open("target");
    context_.fd = fd.Get();
    context_.buffer = room_;
    EXPECT_EQ(Write("abc"), 23U);
    EXPECT_EQ(seams::LogLines().size(), 2U);
    EXPECT_EQ(scratch::Text(Path("target")), "");
    EXPECT_EQ(transfer.bytes_left, 1000U);
}

TEST_F(Callbacks, AWriteToAFileCountsAndTellsTheProgress) {
    const UniqueFd fd = Open("target");
    context_.fd = fd.Get();
    transfer.progress_cb = Progress;
    EXPECT_EQ(Write(std::string(300, 'a')), 300U);
    EXPECT_EQ(Write(std::string(700, 'b')), 700U);
    EXPECT_EQ(scratch::Text(Path("target")), std::string(300, 'a') + std::string(700, 'b'));
    EXPECT_THAT(progress_told, ElementsAre(std::pair(300ULL, 300ULL), std::pair(700ULL, 1000ULL)));
    EXPECT_EQ(transfer.bytes_left, 0U);
}

TEST_F(Callbacks, AWriteToABufferAdvancesIt) {
    context_.buffer = room_;
    EXPECT_EQ(Write("abc"), 3U);
    EXPECT_EQ(Write("de"), 2U);
    EXPECT_EQ(std::string(room_, 5), "abcde");
    EXPECT_EQ(context_.buffer_used, 5U);
}

TEST_F(Callbacks, ABufferEndsOneByteBehindWhatWasAskedFor) {
    context_.buffer = room_;
    EXPECT_EQ(Write(std::string(1000, 'a')), 1000U);
    EXPECT_EQ(Write("bc"), 23U);
    EXPECT_EQ(room_[1000], '\0');
    EXPECT_EQ(Write("b"), 1U);
    EXPECT_EQ(Write("c"), 23U);
    EXPECT_EQ(room_[1001], '\0');
    EXPECT_EQ(context_.buffer_used, 1001U);
}

/** What curl_easy_setopt was last told for the size of its buffer. */
long buffer_size = -1;

TEST_F(Callbacks, EverySpeedOfAWriteIsOneTo131072AndGoesToTheHandle) {
    CURL* curl = curl_easy_init();
    context_.buffer = room_;
    context_.curl = curl;
    transfer.speed_cb = Speed;
    const std::pair<long long, long> rows[] = {
        {1, 1},      {1024, 1024}, {131072, 131072},    {131073, 131072},
        {0, 131072}, {-1, 131072}, {LLONG_MIN, 131072}, {LLONG_MAX, 131072},
    };
    for (const auto& [answer, set] : rows) {
        speed_answer = answer;
        buffer_size = -1;
        EXPECT_EQ(Write("abc"), 3U);
        EXPECT_EQ(buffer_size, set) << answer;
    }
    EXPECT_EQ(speed_asked[1], std::pair(3ULL, 3ULL));
    context_.curl = nullptr;
    buffer_size = -1;
    EXPECT_EQ(Write("abc"), 3U);
    EXPECT_EQ(buffer_size, -1);
    curl_easy_cleanup(curl);
}

TEST_F(Callbacks, AWriteThatFailsLeavesThePlatformErrorOfItsCause) {
    const UniqueFd closed = Open("target", O_RDONLY | O_CREAT);
    context_.fd = closed.Get();
    EXPECT_EQ(Write("abc"), 23U);
    EXPECT_EQ(YLIBCErrGet(), 0x600U);  // EBADF
    const UniqueFd full(open("/dev/full", O_WRONLY | O_CLOEXEC));
    context_.fd = full.Get();
    EXPECT_EQ(Write("abc"), 23U);
    EXPECT_EQ(YLIBCErrGet(), 0x2900U);
    const UniqueFd target = Open("target");
    context_.fd = target.Get();
    EXPECT_EQ(FileWriteCallback(nullptr, 1, 3, &context_), 23U);
    EXPECT_EQ(YLIBCErrGet(), 0x300U);
    EXPECT_THAT(seams::LogLines(), IsEmpty());
    int ends[2];
    ASSERT_EQ(pipe(ends), 0);
    close(ends[0]);
    const UniqueFd out(ends[1]);
    signal(SIGPIPE, SIG_IGN);
    context_.fd = out.Get();
    EXPECT_EQ(Write("abc"), 23U);
    EXPECT_EQ(YLIBCErrGet(), 0x8000U);
    EXPECT_TRUE(seams::Logged("Unable to writefile, errno=32(Broken pipe)")) << seams::LogDump();
    EXPECT_EQ(transfer.bytes_left, 1000U);
}

TEST_F(Callbacks, ADiskThatGetsFullInAWriteLeavesWhatItTookAndFails) {
    ASSERT_EQ(mkdir(Path("disk").c_str(), 0700), 0);
    ASSERT_EQ(mount("tmpfs", Path("disk").c_str(), "tmpfs", 0, "size=64k"), 0);
    {
        const UniqueFd fd = Open("disk/target");
        context_.fd = fd.Get();
        EXPECT_EQ(Write(Pattern(60000)), 60000U);
        EXPECT_EQ(Write(Pattern(60000)), 23U);
        EXPECT_EQ(YLIBCErrGet(), 0x3b00U);  // a part went in
        EXPECT_EQ(lseek(fd.Get(), 0, SEEK_CUR), 65536);
        EXPECT_EQ(Write(Pattern(10)), 23U);
        EXPECT_EQ(YLIBCErrGet(), 0x2900U);
    }
    EXPECT_EQ(umount(Path("disk").c_str()), 0);
}

TEST_F(Callbacks, TheDeathOfAWatchedProcessIsACancel) {
    const pid_t child = scratch::Start([] { return 0; });
    EXPECT_EQ(scratch::End(child), 0);
    EXPECT_FALSE(IsStopAsked());
    transfer.watched_pid = getpid();
    EXPECT_FALSE(IsStopAsked());
    transfer.watched_pid = getppid() > 0 ? getppid() : 1;
    EXPECT_FALSE(IsStopAsked());
    transfer.watched_pid = child;
    EXPECT_TRUE(IsStopAsked());
    EXPECT_EQ(YLIBCErrGet(), 0xa600U);
}

}  // namespace
}  // namespace ZYROCloud

#include <dlfcn.h>

#include <cstdarg>

#undef curl_easy_setopt
extern "C" CURLcode curl_easy_setopt(CURL* curl, CURLoption option, ...) {
    using Real = CURLcode (*)(CURL*, CURLoption, ...);
    static const Real real = reinterpret_cast<Real>(dlsym(RTLD_NEXT, "curl_easy_setopt"));
    va_list args;
    va_start(args, option);
    const long value = va_arg(args, long);  // pointers and numbers are passed alike
    va_end(args);
    if (option == CURLOPT_BUFFERSIZE) {
        ZYROCloud::buffer_size = value;
    }
    return real(curl, option, value);
}
