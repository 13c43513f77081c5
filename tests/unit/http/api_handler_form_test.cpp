// Bodies that come from a read function: plain uploads and multipart forms.
#include <sys/mman.h>
#include <unistd.h>

#include "unit/http/curl_seam.h"
#include "unit/http/http_fixture.h"

namespace ZYROCloud {
namespace {

using wire::Answer;
using wire::ReadRequest;
using wire::Send;

class Upload : public testing::Test {
  protected:
    void SetUp() override { curl_seam::Now() = {}; }
    void TearDown() override { curl_seam::Now() = {}; }
};

/** A file in memory, as the source of an upload. */
class Source {
  public:
    explicit Source(const std::string& text) : text_(text) {
        context.fd = memfd_create("source", MFD_CLOEXEC);
        EXPECT_EQ(write(context.fd, text.data(), text.size()), static_cast<ssize_t>(text.size()));
        lseek(context.fd, 0, SEEK_SET);
    }
    explicit Source(size_t size) : Source(Bytes(size)) {}
    Source(const Source&) = delete;
    Source& operator=(const Source&) = delete;
    ~Source() { close(context.fd); }

    const std::string& Text() const { return text_; }

    static size_t Read(char* data, size_t size, size_t count, void* context) {
        const ssize_t n = read(static_cast<XferContext*>(context)->fd, data, size * count);
        return n < 0 ? CURL_READFUNC_ABORT : static_cast<size_t>(n);
    }
    static int Seek(void* context, curl_off_t offset, int origin) {
        const bool done = lseek(static_cast<XferContext*>(context)->fd, offset, origin) >= 0;
        return done ? CURL_SEEKFUNC_OK : CURL_SEEKFUNC_FAIL;
    }

    XferContext context;
    XferData xfer{Read, 1, &context};

  private:
    static std::string Bytes(size_t size) {
        std::string bytes(size, '\0');
        for (size_t i = 0; i < size; ++i) {
            bytes[i] = static_cast<char>(i * 2654435761U >> 24);
        }
        return bytes;
    }
    std::string text_;
};

std::string BodyOf(const std::string& request) {
    return request.substr(request.find("\r\n\r\n") + 4);
}

/** A PUT of the whole source. */
bool Put(APIHandler& api, Source& source, const std::string& url, bool mute = false) {
    api.SetReadFunAndData(Source::Read, nullptr);
    api.SetReadFunAndData(nullptr, &source.context);
    api.SetSeekFunAndData(Source::Seek, &source.context);
    api.SetUploadOpt(mute);
    api.SetUploadSize(static_cast<long long>(source.Text().size()));
    api.AddHeader(Parsed(R"({"Expect":""})"));
    api.SetURL(url, false);
    return api.Process(0);
}

TEST_F(Upload, SendsWhatTheReadFunctionGives) {
    for (const size_t size : {0U, 1U, 65536U, 3U << 20}) {
        const wire::WireServer server({Once(Answer(201, "made"))});
        Source source(size);
        Conversation<> talk;
        EXPECT_TRUE(Put(talk.api, source, server.Url("/x"))) << seams::LogDump();
        EXPECT_THAT(server.ReceivedText(), HasSubstr("PUT /x HTTP/1.1\r\n"));
        EXPECT_TRUE(BodyOf(server.ReceivedText()) == source.Text()) << size;
        EXPECT_EQ(talk.api.GetResponse(), "made");
    }
}

TEST_F(Upload, AMutedUploadThrowsTheAnswerAway) {
    const wire::WireServer server({Once(Answer(201, "made"))});
    Source source(10);
    Conversation<> talk;
    EXPECT_TRUE(Put(talk.api, source, server.Url(), true));
    EXPECT_EQ(talk.api.GetResponse(), "");
}

/** Puts 128 KiB at once, whatever room it is told of. */
size_t FillBlindly(char* data, size_t size, size_t count, void* context) {
    auto* left = static_cast<size_t*>(context);
    constexpr size_t kPiece = 131072;
    EXPECT_GE(size * count, kPiece);
    const size_t n = std::min(*left, kPiece);
    memset(data, 'x', n);
    *left -= n;
    return n;
}

TEST_F(Upload, ThereIsAlwaysRoomFor128KibibytesBesidesTheFraming) {
    size_t left = 1 << 20;
    const wire::WireServer server({Once(Answer(200)), Once(Answer(200)), Once(Answer(200))});
    Conversation<> talk;
    talk.api.SetReadFunAndData(FillBlindly, &left);
    talk.api.SetUploadOpt(true);
    EXPECT_TRUE(talk.Get(server.Url())) << "chunked";

    left = 1 << 20;
    ASSERT_TRUE(talk.api.Init());
    talk.api.SetReadFunAndData(FillBlindly, &left);
    talk.api.SetUploadOpt(true);
    talk.api.SetUploadSize(1 << 20);
    EXPECT_TRUE(talk.Get(server.Url())) << "with a length";

    left = 1 << 20;
    ASSERT_TRUE(talk.api.Init());
    XferData xfer{FillBlindly, 1, reinterpret_cast<XferContext*>(&left)};
    FormUploadData form{&xfer, "file", 1 << 20, Parsed(R"({"attributes":"{}"})")};
    talk.api.SetFormUploadData(&form);
    EXPECT_TRUE(talk.Get(server.Url())) << "in a form";
    EXPECT_EQ(left, 0U);
}

TEST_F(Upload, AReadFunctionThatAbortsCancelsOrAborts) {
    for (const bool cancel : {false, true}) {
        const wire::WireServer server({{ReadRequest()}});
        Conversation<> talk;
        talk.api.SetReadFunAndData(
            [](char*, size_t, size_t, void* wanted) -> size_t {
                YLIBCErrSetEx(*static_cast<bool*>(wanted) ? 0xa600 : 0x8000, "test", 1);
                return CURL_READFUNC_ABORT;
            },
            const_cast<bool*>(&cancel));
        talk.api.SetUploadOpt(true);
        talk.api.SetUploadSize(100);
        EXPECT_FALSE(talk.Get(server.Url(), 6));
        EXPECT_EQ(talk.Curl(), 42);
        EXPECT_EQ(talk.Code(), cancel ? VFS_ERR_CANCELLED : VFS_ERR_TRANSFER_ABORTED);
        EXPECT_THAT(seams::Sleeps(), IsEmpty());
    }
}

/** A kept connection that takes one request and dies in the middle of the next one's body. The
 * client sees that in what it reads or in what it sends, as it happens. */
wire::Script DiesInTheSecondBody(bool reset) {
    wire::Script script = {ReadRequest(), Send(Answer(200)), wire::ReadHead(),
                           wire::ReadBytes(100000)};
    if (reset) {
        script.push_back(wire::Reset());
    }
    return script;
}

constexpr int kRounds = 10;

TEST_F(Upload, AKeptConnectionThatDiesInTheMiddleOfABodyIsReplacedAndTheBodySentWhole) {
    for (int round = 0; round < kRounds; ++round) {
        const wire::WireServer server(
            {DiesInTheSecondBody(round % 2 == 0), Once(Answer(201, "made"))});
        Conversation<> talk;
        EXPECT_TRUE(talk.Get(server.Url()));
        ASSERT_TRUE(talk.api.Init());
        Source source(8 << 20);
        EXPECT_TRUE(Put(talk.api, source, server.Url())) << seams::LogDump();
        EXPECT_EQ(talk.api.GetResponse(), "made");
        EXPECT_TRUE(BodyOf(server.Received().back()) == source.Text());
        EXPECT_EQ(server.Connections(), 2U);
    }
    EXPECT_THAT(seams::Sleeps(), IsEmpty());
}

TEST_F(Upload, AFormOnAKeptConnectionThatDiesInItsMiddleIsSentWholeOnAnother) {
    for (int round = 0; round < kRounds; ++round) {
        const wire::WireServer server(
            {DiesInTheSecondBody(round % 2 == 0), Once(Answer(201, "made"))});
        Conversation<> talk;
        EXPECT_TRUE(talk.Get(server.Url()));
        ASSERT_TRUE(talk.api.Init());
        Source source(8 << 20);
        FormUploadData form{&source.xfer, "file", source.Text().size(), Parsed(R"({"a":"b"})")};
        talk.api.AddHeader(Parsed(R"({"Expect":""})"));
        talk.api.SetSeekFunAndData(Source::Seek, source.xfer.context);
        talk.api.SetFormUploadData(&form);
        EXPECT_TRUE(talk.Get(server.Url())) << seams::LogDump();
        EXPECT_EQ(talk.api.GetResponse(), "made");
        EXPECT_TRUE(server.Received().back().find(source.Text()) != std::string::npos);
    }
}

TEST_F(Upload, AStreamOnAKeptConnectionThatDiesFailsAndIsNotSentTwice) {
    for (int round = 0; round < kRounds; ++round) {
        const wire::WireServer server({DiesInTheSecondBody(round % 2 == 0), {ReadRequest()}});
        Conversation<> talk;
        EXPECT_TRUE(talk.Get(server.Url()));
        ASSERT_TRUE(talk.api.Init());
        Source source(8 << 20);
        talk.api.SetReadFunAndData(Source::Read, &source.context);
        talk.api.SetUploadOpt(true);
        talk.api.SetUploadSize(8 << 20);
        talk.api.AddHeader(Parsed(R"({"Expect":""})"));
        EXPECT_FALSE(talk.Get(server.Url()));
        EXPECT_NE(talk.Curl(), 0);
        EXPECT_EQ(talk.Status(), 0);
        EXPECT_NE(talk.Code(), VFS_ERR_NONE);
    }
}

TEST_F(Upload, AFreshConnectionThatDiesInTheMiddleOfABodyFails) {
    const wire::WireServer server({{wire::ReadHead(), wire::ReadBytes(100000), wire::Reset()}});
    Conversation<> talk;
    Source source(8 << 20);
    EXPECT_FALSE(Put(talk.api, source, server.Url()));
    EXPECT_EQ(talk.Status(), 0);
    EXPECT_NE(talk.Code(), VFS_ERR_NONE);
}

TEST_F(Upload, AnEarlyRefusalOfABodyIsTheOutcome) {
    const wire::WireServer server({{wire::ReadHead(), Send(Answer(507))}});
    Conversation<OneDriveErrorHandler> talk;
    Source source(8 << 20);
    EXPECT_FALSE(Put(talk.api, source, server.Url()));
    EXPECT_EQ(talk.Code(), VFS_ERR_QUOTA_EXCEEDED);
}

TEST_F(Upload, AFormHasItsTextPartsFirstAndThenTheFile) {
    const wire::WireServer server({Once(Answer(201, "made"))});
    Source source("the file's bytes");
    FormUploadData form{&source.xfer, "content", source.Text().size(),
                        Parsed(R"({"b":"{\"x\":1}","a":"first"})")};
    Conversation<> talk;
    talk.api.SetFormUploadData(&form);
    EXPECT_TRUE(talk.Get(server.Url())) << seams::LogDump();
    const std::string request = server.ReceivedText();
    EXPECT_THAT(request, HasSubstr("POST / HTTP/1.1\r\n"));
    const std::string mark = "Content-Type: multipart/form-data; boundary=";
    ASSERT_THAT(request, HasSubstr(mark));
    const size_t at = request.find(mark) + mark.size();
    const std::string line = "--" + request.substr(at, request.find("\r\n", at) - at);
    const std::string type = "Content-Type: application/json; charset=UTF-8\r\n\r\n";
    EXPECT_EQ(BodyOf(request),
              line + "\r\nContent-Disposition: form-data; name=\"a\"\r\n" + type + "first\r\n" +
                  line + "\r\nContent-Disposition: form-data; name=\"b\"\r\n" + type +
                  "{\"x\":1}\r\n" + line +
                  "\r\nContent-Disposition: form-data; name=\"content\"; filename=\"file\"\r\n"
                  "\r\nthe file's bytes\r\n" +
                  line + "--\r\n");
    EXPECT_THAT(request, HasSubstr("Content-Length: " + std::to_string(BodyOf(request).size())));
}

TEST_F(Upload, AnEmptyFileInAFormHasAKnownLength) {
    const wire::WireServer server({Once(Answer(201))});
    Source source("");
    FormUploadData form{&source.xfer, "file", 0, Json::Value(Json::objectValue)};
    Conversation<> talk;
    talk.api.SetFormUploadData(&form);
    EXPECT_TRUE(talk.Get(server.Url()));
    EXPECT_THAT(server.ReceivedText(), HasSubstr("Content-Length: "));
    EXPECT_THAT(server.ReceivedText(), Not(HasSubstr("chunked")));
    EXPECT_THAT(server.ReceivedText(), HasSubstr("filename=\"file\""));
}

TEST_F(Upload, AFormWithoutANameHasNoFilePart) {
    const wire::WireServer server({Once(Answer(201))});
    FormUploadData form{nullptr, "", 0, Parsed(R"({"a":"b"})")};
    Conversation<> talk;
    talk.api.SetFormUploadData(&form);
    EXPECT_TRUE(talk.Get(server.Url()));
    EXPECT_THAT(server.ReceivedText(), HasSubstr("name=\"a\""));
    EXPECT_THAT(server.ReceivedText(), Not(HasSubstr("filename")));
}

TEST_F(Upload, AFormThatCannotBeBuiltFailsBeforeAnyTransfer) {
    Source source("x");
    XferData no_callback{nullptr, 1, &source.context};
    const FormUploadData forms[] = {
        {&source.xfer, "file", 1, Parsed(R"({"a":{}})")},
        {&source.xfer, "file", 1, Parsed(R"({"a":7})")},
        {&source.xfer, "file", 1, Parsed("[1]")},
        {nullptr, "file", 1, Json::Value(Json::objectValue)},
        {&no_callback, "file", 1, Json::Value(Json::objectValue)},
    };
    for (FormUploadData form : forms) {
        seams::Reset();
        curl_seam::Now() = {};
        Conversation<> talk;
        talk.api.SetFormUploadData(&form);
        EXPECT_FALSE(talk.Get("http://127.0.0.1/", 6));
        EXPECT_THAT(curl_seam::Values(curl_seam::kPerform), IsEmpty());
        EXPECT_TRUE(seams::LoggedPart("Failed to add form upload, code=") ||
                    seams::LoggedPart("Failed to set up the request, "))
            << seams::LogDump();
    }
}

TEST_F(Upload, InitForgetsTheForm) {
    const wire::WireServer server(
        {{ReadRequest(), Send(Answer(200)), ReadRequest(), Send(Answer(200))}});
    Conversation<> talk;
    {
        Source source("x");
        FormUploadData form{&source.xfer, "file", 1, Json::Value(Json::objectValue)};
        talk.api.SetFormUploadData(&form);
        EXPECT_TRUE(talk.Get(server.Url()));
    }
    EXPECT_TRUE(talk.api.Init());
    EXPECT_TRUE(talk.Get(server.Url()));
    EXPECT_THAT(server.Received()[1], HasSubstr("GET / HTTP/1.1\r\n"));
}

}  // namespace
}  // namespace ZYROCloud
