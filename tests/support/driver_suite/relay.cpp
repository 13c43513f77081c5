/** A browser's file up, through the relay, of known and of unknown size. */
#include <unistd.h>

#include "support/driver_suite.h"
#include "support/relay_input.h"
#include "support/seams.h"

namespace driver_suite {
namespace {

constexpr long long kTail = 131072;
constexpr long long kSizes[] = {0, 1, 23, kTail - 1, kTail, kTail + 1};
constexpr const char* kFieldBehind =
    "\r\nContent-Disposition: form-data; name=\"mtime\"\r\n\r\n1700000000\r\n"
    "--a-boundary-of-the-browser--\r\n";

bool Always() {
    return true;
}

}  // namespace

bool DriverRelay::Relay(const BrowserFile& file, const std::string& path, long long size) {
    const relay_input::Input input(file.request.Get());
    lseek(file.request.Get(), 0, SEEK_SET);
    progress = {0, file.total, 0};
    const std::string uri = Uri(path);
    const auto told = [](unsigned long long current, unsigned long long) { User::done = current; };
    return Cloud::RelayUploadInit(cloud.get(), uri.c_str(), &progress, BrowserFile::kBoundary, told,
                                  User::Cancel, nullptr, nullptr, size) &&
           Cloud::RelayUploadFile();
}

TEST_P(DriverRelay, FilesOfAllSizesGoUpWithAndWithoutTheirSize) {
    for (const long long size : kSizes) {
        for (const bool known : {true, false}) {
            const std::string path =
                "/up-" + std::to_string(size) + (known ? "-known" : "-unknown");
            const BrowserFile file(size);
            EXPECT_TRUE(Relay(file, path, known ? size : -1)) << path << seams::LogDump();
            EXPECT_EQ(SumOf(path), file.sum) << path;
            EXPECT_EQ(progress.current, file.total) << path;
            EXPECT_EQ(progress.error, 0) << path;
        }
    }
}

TEST_P(DriverRelay, OneChunkAndOneByteMoreGoUpWithAndWithoutTheirSize) {
    for (const long long size : {kChunk - 1, kChunk, kChunk + 1}) {
        for (const bool known : {true, false}) {
            const std::string path =
                "/up-" + std::to_string(size) + (known ? "-known" : "-unknown");
            const BrowserFile file(size);
            EXPECT_TRUE(Relay(file, path, known ? size : -1)) << path << seams::LogDump();
            EXPECT_EQ(SumOf(path), file.sum) << path;
        }
    }
}

TEST_P(DriverRelay, FieldsBehindAFileStayBehind) {
    const BrowserFile small(1000, kFieldBehind);
    EXPECT_TRUE(Relay(small, "/small", -1)) << seams::LogDump();
    EXPECT_EQ(SumOf("/small"), small.sum);

    const BrowserFile large(kChunk + 1000, kFieldBehind);
    EXPECT_TRUE(Relay(large, "/known", large.size)) << seams::LogDump();
    EXPECT_EQ(SumOf("/known"), large.sum);
    EXPECT_EQ(Relay(large, "/unknown", -1), can.takes_any_stream) << seams::LogDump();
    EXPECT_EQ(SumOf("/unknown"), can.takes_any_stream ? large.sum : "");
    EXPECT_EQ(progress.error, can.takes_any_stream ? 0 : -9);
}

TEST_P(DriverRelay, AFileThatIsLongerThanItLooksIsNeverStoredInPart) {
    // As some programs send it, the last line of a request does not end with a line break.
    const BrowserFile file(kChunk + 1000, "--");
    const bool sent = Relay(file, "/up", -1);
    EXPECT_EQ(sent, can.takes_any_stream) << seams::LogDump();
    EXPECT_EQ(SumOf("/up"), sent ? file.sum : "");
}

TEST_P(DriverRelay, ABrowserThatGoesAwayStoresNothing) {
    for (const long long size : {100LL, 3 * kTail, kChunk + 5}) {
        for (const long long sent : {0LL, size / 2, size - 1, size + 3}) {
            for (const bool known : {true, false}) {
                const BrowserFile file(size);
                ASSERT_EQ(ftruncate(file.request.Get(), sent), 0);
                cloud->SetError(VFS_ERR_NONE, "");
                EXPECT_FALSE(Relay(file, "/up.bin", known ? size : -1)) << size << " " << sent;
                EXPECT_NE(Code(), VFS_ERR_NONE) << size << " " << sent;
                EXPECT_EQ(progress.error, Cloud::GetUploadErrorCode(cloud.get()));
                EXPECT_EQ(SumOf("/up.bin"), "") << size << " " << sent << seams::LogDump();
            }
        }
    }
}

TEST_P(DriverRelay, ABrowserThatGoesAwayLeavesWhatIsThere) {
    const std::string before = SumOf("/docs/a.txt");
    for (const long long size : {100LL, 3 * kTail, kChunk + 5}) {
        const BrowserFile file(size);
        ASSERT_EQ(ftruncate(file.request.Get(), size / 2), 0);
        cloud->SetError(VFS_ERR_NONE, "");
        EXPECT_FALSE(Relay(file, "/docs/a.txt", -1)) << size;
        EXPECT_EQ(SumOf("/docs/a.txt"), before) << size;
        EXPECT_EQ(amy.List(amy.Find("/docs")).size(), 1U) << size;
    }
}

TEST_P(DriverRelay, ACancelAtEachStageStoresNothing) {
    const BrowserFile file(4 * kMiB);
    const std::function<bool()> stages[] = {
        Always,
        [] { return User::asked > 1; },
        [] { return User::done >= 3U * kMiB; },
        [] { return User::done >= 4U * kMiB - kTail + 1; },
    };
    for (const auto& stage : stages) {
        User::Reset();
        User::wants_to_stop = stage;
        cloud->SetError(VFS_ERR_NONE, "");
        EXPECT_FALSE(Relay(file, "/up.bin", -1));
        EXPECT_EQ(Code(), VFS_ERR_CANCELLED) << seams::LogDump();
        EXPECT_EQ(progress.error, -9);
        EXPECT_FALSE(amy.Exists("/up.bin"));
    }
    User::Reset();
    cloud->SetError(VFS_ERR_NONE, "");
    EXPECT_TRUE(Relay(file, "/up.bin", -1)) << seams::LogDump();
    EXPECT_EQ(SumOf("/up.bin"), file.sum);
}

void DriverRelay::ExpectRefusal(const Fault& fault, bool known) {
    Restore();
    Add(fault);
    const BrowserFile file(4 * kMiB);
    EXPECT_FALSE(Relay(file, "/up.bin", known ? file.size : -1)) << fault.Text();
    EXPECT_NE(Code(), VFS_ERR_NONE) << fault.Text();
    EXPECT_EQ(progress.error, Cloud::GetUploadErrorCode(cloud.get())) << fault.Text();
    EXPECT_EQ(SumOf("/up.bin"), "") << fault.Text();
    // A stream cannot be sent again.
    EXPECT_LE(Count(Op::kUpload), 1U) << sim.Journal().Text();
}

TEST_P(DriverRelay, ACloudThatRefusesIsToldAndNothingIsSentAgain) {
    ExpectRefusal(On(Op::kUpload).Answer(503), true);
    if (!can.streams_in_session) {
        ExpectRefusal(On(Op::kUpload).Answer(503), false);
        return;
    }
    for (const SessionStep& step : rig->SessionSteps()) {
        ExpectRefusal(Fault::On(step.at.method, step.at.path).After(step.after).Answer(503), false);
    }
}

TEST_P(DriverRelay, AFileOfUnknownSizeIsSentFromADescriptorToItsEnd) {
    for (const long long size : {0LL, 1LL, 3 * kTail}) {
        const std::string path = "/up-" + std::to_string(size);
        Source source(size);
        const std::string sum = source.sum;
        source.size = -1;
        EXPECT_TRUE(Upload(source, path)) << size << seams::LogDump();
        EXPECT_EQ(SumOf(path), sum) << size;
    }
}

TEST_P(DriverRelay, APipesBytesAreSentToTheirEnd) {
    const std::string text(3 * kTail, 'p');
    const relay_input::Sender sender(text);
    EXPECT_TRUE(Cloud::UploadFile(cloud.get(), Uri("/pipe"), sender.Get(), -1, User::Progress,
                                  User::Cancel, nullptr))
        << seams::LogDump();
    EXPECT_TRUE(TextOf("/pipe") == text);
}

}  // namespace driver_suite
