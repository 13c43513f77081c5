// The body of an upload, asked for again by libcurl in the middle of a request.
#include "cloud/upload_body.h"

#include <gmock/gmock.h>
#include <sys/mman.h>
#include <unistd.h>

#include <string>

#include "core/handle.h"
#include "core/json.h"
#include "support/bare_driver.h"
#include "support/seams.h"
#include "support/wire_server.h"
#include "unit/cloud/attempt_plans.h"

namespace ZYROCloud {
namespace {

/** A file of 0123456789... and a driver whose uploads read it. */
class UploadBodies : public testing::Test {
  protected:
    static constexpr size_t kSize = 4 << 20;

    UploadBodies() : file_(memfd_create("source", MFD_CLOEXEC)) {
        for (size_t i = 0; i < kSize; ++i) {
            text_ += static_cast<char>('0' + i % 10);
        }
        EXPECT_EQ(write(file_.Get(), text_.data(), text_.size()),
                  static_cast<ssize_t>(text_.size()));
        context_.fd = file_.Get();
    }

    static size_t Read(char* data, size_t size, size_t count, void* context) {
        auto& self = *static_cast<XferContext*>(context);
        const size_t want =
            self.limited ? std::min<size_t>(size * count, self.chunk_left) : size * count;
        const ssize_t n = read(self.fd, data, want);
        if (self.limited && n > 0) {
            self.chunk_left -= static_cast<unsigned int>(n);
        }
        return n < 0 ? CURL_READFUNC_ABORT : static_cast<size_t>(n);
    }

    /** Sends from `from` on, on a kept connection that dies in the middle of the body. */
    bool SendOnADyingConnection(off_t from, unsigned long long size, std::string& arrived) {
        const wire::WireServer server({{wire::ReadRequest(), wire::Send(wire::Answer(200)),
                                        wire::ReadHead(), wire::ReadBytes(100000), wire::Reset()},
                                       {wire::ReadRequest(), wire::Send(wire::Answer(201))}});
        APIHandler& api = *driver_.GetAPIHandler();
        driver_.Init();
        EXPECT_TRUE(api.Init());
        api.SetURL(server.Url(), false);
        EXPECT_TRUE(api.Process(0));
        lseek(file_.Get(), from, SEEK_SET);
        Json::Value headers;
        headers["Expect"] = "";
        EXPECT_TRUE(api.Init() && driver_.InitXferData(&xfer_) && api.SetUploadOpt(true) &&
                    api.AddHeader(headers) && api.SetUploadSize(static_cast<long long>(size)));
        api.SetURL(server.Url(), false);
        const bool sent = SendUpload(driver_, xfer_);
        if (sent) {
            const std::string last = server.Received().back();
            arrived = last.substr(last.find("\r\n\r\n") + 4);
        }
        return sent;
    }

    UniqueFd file_;
    std::string text_;
    XferContext context_;
    XferData xfer_{Read, 1, &context_};
    bare::Driver<Cloud> driver_;
};

TEST_F(UploadBodies, AFileIsReadAgainFromWhereTheBodyBegan) {
    std::string arrived;
    ASSERT_TRUE(SendOnADyingConnection(1003, kSize - 1003, arrived)) << seams::LogDump();
    EXPECT_TRUE(arrived == text_.substr(1003));
}

TEST_F(UploadBodies, APieceIsReadAgainToItsEndAndNoFurther) {
    constexpr unsigned int kPiece = 2 << 20;
    context_.limited = true;
    context_.chunk_size = kPiece;
    context_.chunk_left = kPiece;
    std::string arrived;
    ASSERT_TRUE(SendOnADyingConnection(1003, kPiece, arrived)) << seams::LogDump();
    EXPECT_TRUE(arrived == text_.substr(1003, kPiece));
    EXPECT_EQ(context_.chunk_left, 0U);
}

TEST_F(UploadBodies, AStreamThatHasBegunIsNotSentAgain) {
    const int stream = file_.Get();
    static int from;
    from = stream;
    context_.fd = -1;
    xfer_.callback = [](char* data, size_t size, size_t count, void*) -> size_t {
        return static_cast<size_t>(read(from, data, size * count));
    };
    std::string arrived;
    EXPECT_FALSE(SendOnADyingConnection(0, kSize, arrived));
}

TEST_F(UploadBodies, ADriverWithoutAContextSendsNothing) {
    xfer_.context = nullptr;
    EXPECT_FALSE(SendUpload(driver_, xfer_));
}

TEST_F(UploadBodies, AnUploadInOneRequestBeginsAgainWhereItBegan) {
    seams::Reset();
    ScriptedCloud cloud({kBusy, kLost, kDone});
    const std::string what = "/a.txt";
    lseek(context_.fd, 5, SEEK_SET);
    AttemptPlan plan = WholeUploadPlan(cloud, xfer_, what);
    std::vector<off_t> starts;
    plan.send = [&] {
        starts.push_back(lseek(context_.fd, 0, SEEK_CUR));
        lseek(context_.fd, 7, SEEK_SET);
        return cloud.Process();
    };
    EXPECT_TRUE(RunAttempts(cloud, plan)) << seams::LogDump();
    EXPECT_THAT(starts, testing::ElementsAre(5, 5, 5));
    EXPECT_TRUE(seams::Logged("Retry directly upload: 0/6")) << seams::LogDump();
    EXPECT_TRUE(seams::Logged("Retry directly upload: 1/6"));
}

TEST_F(UploadBodies, AnUploadInOneRequestSaysWhatItGaveUp) {
    seams::Reset();
    ScriptedCloud cloud(std::deque<Outcome>(6, kBusy));
    const std::string what = "/a.txt";
    AttemptPlan plan = WholeUploadPlan(cloud, xfer_, what);
    plan.send = [&] { return cloud.Process(); };
    EXPECT_FALSE(RunAttempts(cloud, plan));
    EXPECT_EQ(cloud.GetErrorCode(), VFS_ERR_SERVER_ERROR);
    EXPECT_TRUE(seams::LoggedPart("Retry times reach max times, /a.txt, err: {"))
        << seams::LogDump();

    context_.fd = -1;
    ScriptedCloud stream({kBusy});
    AttemptPlan once = WholeUploadPlan(stream, xfer_, what);
    once.send = [&] { return stream.Process(); };
    seams::Reset();
    EXPECT_FALSE(RunAttempts(stream, once));
    EXPECT_TRUE(seams::Sleeps().empty());
}

// --- how much is sent ---------------------------------------------------------------------------

TEST(UploadSizes, AreKnownUnlessTheFilesSizeIsMinusOne) {
    const struct {
        const char* meta;
        bool known;
        uint64_t total;
    } rows[] = {
        {"{}", true, 0},
        {R"({"total_bytes":7})", true, 7},
        {R"({"total_bytes":7,"filesize":7})", true, 7},
        {R"({"total_bytes":"7","filesize":"7"})", true, 7},
        {R"({"total_bytes":900,"filesize":-1})", false, 900},
        {R"({"total_bytes":900,"filesize":"-1"})", false, 900},
        {R"({"total_bytes":-1,"filesize":-1})", false, kSizeNotKnown},
        {R"({"total_bytes":-1})", false, kSizeNotKnown},
        {R"({"total_bytes":18446744073709551615})", false, kSizeNotKnown},
        {R"({"total_bytes":{},"filesize":[]})", true, 0},
        {R"({"total_bytes":6000000000,"filesize":6000000000})", true, 6000000000},
    };
    for (const auto& row : rows) {
        Json::Value meta;
        ASSERT_TRUE(ZYROVFS::json::fromString(meta, row.meta));
        const UploadSize size(meta);
        EXPECT_EQ(size.known, row.known) << row.meta;
        EXPECT_EQ(size.total, row.total) << row.meta;
    }
    EXPECT_THROW(UploadSize(Json::Value(7)), Json::LogicError);
}

/** Sends the rest of the file as a body of unknown length. */
class UploadCounts : public UploadBodies {
  protected:
    bool Send(uint64_t announced, SentBytes& sent) {
        const wire::WireServer server({{wire::ReadRequest(), wire::Send(wire::Answer(201))}});
        Json::Value headers;
        headers["Expect"] = "";
        APIHandler& api = *driver_.GetAPIHandler();
        driver_.Init();
        EXPECT_TRUE(api.Init() && driver_.InitXferData(&xfer_) && api.SetUploadOpt(true) &&
                    api.AddHeader(headers));
        if (announced != kSizeNotKnown) {
            EXPECT_TRUE(api.SetUploadSize(static_cast<long long>(announced)));
        }
        api.SetURL(server.Url(), false);
        return SendUpload(driver_, xfer_, announced, &sent);
    }
};

TEST_F(UploadCounts, TellWhatWasSentAndThatTheSourceHasNoMore) {
    SentBytes sent;
    lseek(context_.fd, static_cast<off_t>(kSize) - 1000, SEEK_SET);
    ASSERT_TRUE(Send(kSizeNotKnown, sent)) << seams::LogDump();
    EXPECT_EQ(sent.count, 1000U);
    EXPECT_TRUE(sent.ended);
}

TEST_F(UploadCounts, APieceThatIsFullIsNotTheEnd) {
    SentBytes sent;
    lseek(context_.fd, 0, SEEK_SET);
    context_.limited = true;
    context_.chunk_left = 1000;
    ASSERT_TRUE(Send(kSizeNotKnown, sent)) << seams::LogDump();
    EXPECT_EQ(sent.count, 1000U);
    EXPECT_FALSE(sent.ended);
    EXPECT_FALSE(IsAtEnd(xfer_));
    lseek(context_.fd, 0, SEEK_END);
    EXPECT_TRUE(IsAtEnd(xfer_));
}

TEST_F(UploadCounts, OfWhatWasAnnouncedNoMoreIsTaken) {
    SentBytes sent;
    lseek(context_.fd, 0, SEEK_SET);
    ASSERT_TRUE(Send(1000, sent)) << seams::LogDump();
    EXPECT_EQ(sent.count, 1000U);
    EXPECT_EQ(lseek(context_.fd, 0, SEEK_CUR), 1000);
}

TEST_F(UploadCounts, LessThanWasAnnouncedEndsTheRequestAtOnce) {
    SentBytes sent;
    seams::Reset();
    lseek(context_.fd, static_cast<off_t>(kSize) - 1000, SEEK_SET);
    EXPECT_FALSE(Send(1001, sent));
    EXPECT_TRUE(seams::Logged("The file ended 1 bytes before its size")) << seams::LogDump();
    EXPECT_EQ(YLIBCErrGet(), 0x3b00U);
}

}  // namespace
}  // namespace ZYROCloud
