// Requests that lie, browsers that go away, and clouds that refuse: a relay that did not move the
// whole file never says that it did.
#include <fcntl.h>
#include <gmock/gmock.h>
#include <unistd.h>

#include <cstring>

#include "cloud/transfer.h"
#include "core/handle.h"
#include "support/input_seam.h"
#include "unit/cloud/relay_fixture.h"

namespace ZYROCloud {
namespace {

using testing::IsEmpty;
using testing::SizeIs;

class RelayFaults : public RelayTest {
  protected:
    void SetUp() override {
        RelayTest::SetUp();
        input_seam::Reset();
    }
    void TearDown() override { input_seam::Reset(); }

    /** `total` is what the request says of itself. */
    bool RelayAs(unsigned long long total, const std::string& request, long long size = -1) {
        const Input input(request);
        progress_.current = 0;
        driver_.SetError(VFS_ERR_NONE, "");
        return Init(total, size) && Cloud::RelayUploadFile();
    }
};

TEST_F(RelayFaults, WithoutADriverATargetOrABoundaryNothingIsPrepared) {
    const auto init = [this](Cloud* cloud, const char* uri, const char* boundary) {
        progress_.error = 0;
        return Cloud::RelayUploadInit(cloud, uri, &progress_, boundary, nullptr, nullptr, nullptr,
                                      nullptr, -1);
    };
    EXPECT_FALSE(init(nullptr, "srv/a", kBoundary));
    EXPECT_EQ(progress_.error, -9);
    EXPECT_FALSE(init(&driver_, nullptr, kBoundary));
    EXPECT_FALSE(init(&driver_, "srv/a", nullptr));
    EXPECT_FALSE(init(&driver_, "srv/a", "")) << "any line would end the file";
    EXPECT_EQ(progress_.error, -9);
    EXPECT_FALSE(Cloud::RelayUploadInit(&driver_, "srv/a", nullptr, kBoundary, nullptr, nullptr,
                                        nullptr, nullptr, -1));
    EXPECT_FALSE(Cloud::RelayUploadFile());
    EXPECT_THAT(driver_.actions, IsEmpty());
}

TEST_F(RelayFaults, WithoutAStandardInputNothingIsPrepared) {
    input_seam::no_stdin = true;
    EXPECT_FALSE(Init(100, -1));
    EXPECT_EQ(progress_.error, -9);
    EXPECT_TRUE(
        seams::Logged(std::string("failed to get fileno of stdin, errno=") + strerror(EBADF)))
        << seams::LogDump();
    EXPECT_FALSE(Cloud::RelayUploadFile());
}

TEST_F(RelayFaults, CallbacksAndCounterMayBeLeftOut) {
    const std::string request = Pattern(1000) + Closing();
    const Input input(request);
    progress_ = {0, request.size(), 55};
    ASSERT_TRUE(Cloud::RelayUploadInit(&driver_, "srv/a", &progress_, kBoundary, nullptr, nullptr,
                                       nullptr, nullptr, 1000));
    EXPECT_TRUE(Cloud::RelayUploadFile()) << seams::LogDump();
    EXPECT_EQ(driver_.kept, Pattern(1000));
    EXPECT_EQ(progress_.error, 0);
}

TEST_F(RelayFaults, ABoundaryThatIsMissingFailsTheUpload) {
    for (const size_t size : {size_t{0}, size_t{100}, kTail, 3 * kTail}) {
        seams::Reset();
        EXPECT_FALSE(Relay(Pattern(size))) << size;
        EXPECT_EQ(progress_.error, -9) << size;
        EXPECT_EQ(driver_.GetErrorCode(), VFS_ERR_TRANSFER_ABORTED);
        EXPECT_TRUE(seams::Logged(std::string("Can NOT find boundary(\r\n") + kBoundary + ")"))
            << seams::LogDump();
    }
}

TEST_F(RelayFaults, LengthsOfARequestThatLieFailTheUpload) {
    for (const size_t size : {size_t{10}, size_t{3} * kTail}) {
        const std::string request = Pattern(size) + Closing();
        const unsigned long long real = request.size();
        const unsigned long long lies[] = {
            real + 1,
            real + 100,
            real + kTail,
            real + 10 * kTail,
            real - 5,
            real / 2,
            0,
            ~0ULL,
            ~0ULL - kTail,
            1ULL << 63,
            (1ULL << 63) - 1,
            static_cast<unsigned long long>(-200),
            (1ULL << 32) + 7,
        };
        for (const unsigned long long total : lies) {
            EXPECT_FALSE(RelayAs(total, request)) << size << " " << total;
            EXPECT_EQ(progress_.error, -9) << size << " " << total;
            EXPECT_NE(driver_.GetErrorCode(), VFS_ERR_NONE) << size << " " << total;
        }
    }
}

TEST_F(RelayFaults, ARequestThatIsSaidToBeConsumedFurtherThanItIsLongAsksNoCloud) {
    const std::string request = Pattern(10) + Closing();
    const Input input(request);
    progress_.current = request.size() + 1;
    ASSERT_TRUE(Init(request.size(), -1));
    EXPECT_FALSE(Cloud::RelayUploadFile());
    EXPECT_EQ(progress_.error, -9);
    EXPECT_EQ(driver_.GetErrorCode(), VFS_ERR_BAD_REQUEST);
    EXPECT_THAT(driver_.actions, IsEmpty());
}

TEST_F(RelayFaults, SizesOfAFileThatCannotBeAskNoCloud) {
    const std::string request = Pattern(3 * kTail) + Closing();
    const auto real = static_cast<long long>(3 * kTail);
    for (const long long size :
         {-2LL, LLONG_MIN, LLONG_MAX, real + 1000, real - 2 * 131072LL, 0LL}) {
        driver_.actions.clear();
        EXPECT_FALSE(RelayAs(request.size(), request, size)) << size;
        EXPECT_EQ(progress_.error, -9) << size;
        EXPECT_EQ(driver_.GetErrorCode(), VFS_ERR_BAD_REQUEST) << size;
        EXPECT_THAT(driver_.actions, IsEmpty()) << size;
    }
}

TEST_F(RelayFaults, ASizeThatIsNotTheFilesFailsBeforeItsLastBytesAreGiven) {
    for (const size_t real : {size_t{100}, 3 * kTail}) {
        for (const int off : {-1, 1}) {
            seams::Reset();
            driver_.kept.clear();
            const auto size = static_cast<long long>(real) + off;
            EXPECT_FALSE(RelayAs(real + Closing().size(), Pattern(real) + Closing(), size));
            EXPECT_EQ(progress_.error, -9);
            EXPECT_LT(driver_.kept.size(), real);
            EXPECT_TRUE(
                seams::Logged("Wrong size, " + std::to_string(real) + ", " + std::to_string(size)))
                << seams::LogDump();
        }
    }
}

TEST_F(RelayFaults, ABrowserThatGoesAwayLeavesNoSuccessAtAnyStage) {
    const std::string whole = Pattern(3 * kTail) + Closing();
    const size_t start = whole.size() - kTail;
    for (const size_t sent : {size_t{0}, size_t{1}, start - 1, start, start + 1, 3 * kTail - 1,
                              3 * kTail, 3 * kTail + 2, whole.size() - 1}) {
        EXPECT_FALSE(RelayAs(whole.size(), whole.substr(0, sent))) << sent;
        EXPECT_EQ(progress_.error, -9) << sent;
        EXPECT_EQ(driver_.GetErrorCode(), VFS_ERR_TRANSFER_ABORTED) << sent;
        EXPECT_TRUE(seams::LoggedPart("bytes before its length")) << seams::LogDump();
    }
}

TEST_F(RelayFaults, ASilentBrowserGivesMinusSevenWhateverTheDriverSays) {
    const std::string request = Pattern(3 * kTail) + Closing();
    const auto wait = [](pollfd& input) {
        input.revents = POLLIN;
        return 1;
    };
    for (int pieces = 0; pieces < 4; ++pieces) {
        input_seam::answers.assign(static_cast<size_t>(pieces), wait);
        input_seam::answers.push_back(input_seam::Silence());
        EXPECT_FALSE(RelayAs(request.size(), request)) << pieces;
        EXPECT_EQ(progress_.error, -7) << pieces;
        EXPECT_THAT(input_seam::answers, IsEmpty()) << "asked once more";
    }
    input_seam::Reset();
    EXPECT_TRUE(RelayAs(request.size(), request));
    EXPECT_EQ(progress_.error, 0) << "forgotten";
}

TEST_F(RelayFaults, AReadThatFailsCountsNothingAndIsNoSizeForLibcurl) {
    const UniqueFd folder(open("/", O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    const Input input(folder.Get());
    driver_.upload = [&](XferData* xfer, const Json::Value&) {
        std::string room(kTail, '\0');
        xfer->context->limited = true;
        xfer->context->chunk_left = 1000;
        EXPECT_EQ(xfer->callback(room.data(), 1, room.size(), xfer->context),
                  static_cast<size_t>(-1));
        EXPECT_EQ(xfer->context->chunk_left, 1000U);
        EXPECT_EQ(xfer->callback(room.data(), 1, room.size(), xfer->context),
                  static_cast<size_t>(CURL_READFUNC_ABORT))
            << "and is not tried again";
        return false;
    };
    ASSERT_TRUE(Init(4 * kTail, -1));
    EXPECT_FALSE(Cloud::RelayUploadFile());
    EXPECT_EQ(progress_.current, 0U);
    EXPECT_EQ(transferred_, 0U);
    EXPECT_EQ(progress_.error, -9);
    EXPECT_EQ(driver_.GetErrorCode(), VFS_ERR_TRANSFER_ABORTED);
    EXPECT_THAT(Browser::progress, IsEmpty());
    EXPECT_EQ(YLIBCErrGet(), 0x8000U);
}

TEST_F(RelayFaults, ACancelIsToldAsOneAtAnyStage) {
    const std::string request = Pattern(3 * kTail) + Closing();
    for (int at = 1; at <= 5; ++at) {
        Browser::Reset();
        Browser::cancel_at = at;
        EXPECT_FALSE(RelayAs(request.size(), request)) << at;
        EXPECT_EQ(YLIBCErrGet(), 0xa600U) << at;
        EXPECT_EQ(driver_.GetErrorCode(), VFS_ERR_CANCELLED) << at;
        EXPECT_EQ(progress_.error, -9);
        EXPECT_EQ(Browser::asked, at);
    }
    Browser::Reset();
    EXPECT_TRUE(RelayAs(request.size(), request)) << seams::LogDump();
}

TEST_F(RelayFaults, ACancelThatComesWithASignalIsToldAsOne) {
    const std::string request = Pattern(100) + Closing();
    Browser::cancel_at = 2;  // the first question is in front of the wait
    input_seam::answers = {input_seam::Fails(EINTR)};
    EXPECT_FALSE(RelayAs(request.size(), request));
    EXPECT_EQ(driver_.GetErrorCode(), VFS_ERR_CANCELLED);
    EXPECT_EQ(progress_.error, -9);
}

TEST_F(RelayFaults, ARefusalOfTheCloudIsToldByItsCode) {
    const std::pair<__tag_vfs_err_, int> rows[] = {
        {VFS_ERR_UNAUTHORIZED, -16},   {VFS_ERR_PERMISSION_DENIED, -1}, {VFS_ERR_NO_SPACE, -11},
        {VFS_ERR_FILE_TOO_LARGE, -15}, {VFS_ERR_INVALID_NAME, -17},     {VFS_ERR_NOT_FOUND, -4},
        {VFS_ERR_SERVER_ERROR, -9}};
    for (const auto& [code, error] : rows) {
        for (const int pieces : {0, 1, 9}) {
            driver_.upload = [&, code = code](XferData* xfer, const Json::Value&) {
                std::string room(kTail, '\0');
                for (int i = 0; i < pieces; ++i) {
                    xfer->callback(room.data(), 1, room.size(), xfer->context);
                }
                driver_.SetError(code, "");
                return false;
            };
            EXPECT_FALSE(Relay(Pattern(3 * kTail) + Closing()));
            EXPECT_EQ(progress_.error, error) << code << " " << pieces;
            EXPECT_EQ(driver_.GetErrorCode(), code);
        }
    }
}

TEST_F(RelayFaults, ADriverThatLeavesAPartOfTheFileHasNotUploadedIt) {
    for (const size_t taken : {size_t{0}, size_t{1}, size_t{99}}) {
        driver_.SetError(VFS_ERR_NONE, "");
        driver_.upload = [&](XferData* xfer, const Json::Value&) {
            char room[100];
            return taken == 0 || xfer->callback(room, 1, taken, xfer->context) == taken;
        };
        EXPECT_FALSE(Relay(Pattern(100) + Closing())) << taken;
        EXPECT_EQ(progress_.error, -9);
        EXPECT_EQ(driver_.GetErrorCode(), VFS_ERR_TRANSFER_ABORTED);
        EXPECT_TRUE(seams::Logged("Upload left out a part of the file, " + std::to_string(taken)))
            << seams::LogDump();
    }
}

TEST_F(RelayFaults, ADriverThatTakesAFailedReadForTheEndHasNotUploadedTheFile) {
    driver_.upload = [&](XferData* xfer, const Json::Value&) {
        Drain(driver_, xfer, driver_.kept);
        return true;
    };
    EXPECT_FALSE(RelayAs(5000, Pattern(100)));
    EXPECT_EQ(progress_.error, -9);
}

TEST_F(RelayFaults, ADriverThatKnowsTheSizeMayStopReadingAtIt) {
    for (const size_t size : {size_t{0}, size_t{100}, 3 * kTail}) {
        driver_.upload = [&](XferData* xfer, const Json::Value& meta) {
            std::string room(kTail, '\0');
            size_t left = meta["total_bytes"].asUInt();
            while (left > 0) {
                left -= xfer->callback(room.data(), 1, std::min(left, room.size()), xfer->context);
            }
            return true;
        };
        EXPECT_TRUE(Relay(Pattern(size) + Closing(), static_cast<long long>(size)))
            << size << seams::LogDump();
        EXPECT_EQ(progress_.current, progress_.total) << size;
    }
}

TEST_F(RelayFaults, WithoutAContextOrMemoryForItsBytesNothingIsRead) {
    driver_.upload = [&](XferData* xfer, const Json::Value&) {
        char byte = 0;
        EXPECT_EQ(xfer->callback(&byte, 1, 1, nullptr), static_cast<size_t>(CURL_READFUNC_ABORT));
        EXPECT_EQ(xfer->callback(nullptr, 1, 1, xfer->context),
                  static_cast<size_t>(CURL_READFUNC_ABORT));
        return Drain(driver_, xfer, driver_.kept);
    };
    EXPECT_TRUE(Relay("abc" + Closing())) << seams::LogDump();
    EXPECT_EQ(driver_.kept, "abc");
    char byte = 0;
    XferContext context;
    EXPECT_EQ(RelayReadCallback(&byte, 1, 1, &context), static_cast<size_t>(CURL_READFUNC_ABORT))
        << "no relay";
}

}  // namespace
}  // namespace ZYROCloud
