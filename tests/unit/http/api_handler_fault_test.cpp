// Servers and connections that misbehave, over real sockets.
#include "unit/http/curl_seam.h"
#include "unit/http/http_fixture.h"

namespace ZYROCloud {
namespace {

using wire::Answer;
using wire::ReadRequest;
using wire::Script;
using wire::Send;

class Fault : public testing::Test {
  protected:
    void SetUp() override { curl_seam::Now() = {}; }
    void TearDown() override { curl_seam::Now() = {}; }
};

struct Outcome {
    int curl;
    int status;
    int code;
    bool success;
};

/** One request, without retries, to a server with this one script. */
void Expect(const Outcome& expected, const Script& script, const std::string& body = "") {
    const wire::WireServer server({script});
    Conversation<> talk;
    EXPECT_EQ(talk.Get(server.Url()), expected.success) << seams::LogDump();
    EXPECT_EQ(talk.Curl(), expected.curl) << seams::LogDump();
    EXPECT_EQ(talk.Status(), expected.status);
    EXPECT_EQ(talk.Code(), expected.code);
    EXPECT_EQ(talk.api.GetResponse(), body);
    EXPECT_TRUE(server.Finished());
}

TEST_F(Fault, ARefusedConnectionIsAConnectFailureAndTriedAgain) {
    Conversation<> talk;
    EXPECT_FALSE(talk.Get("http://127.0.0.1:" + std::to_string(tls::RefusedPort()) + "/", 2));
    EXPECT_EQ(talk.Curl(), 7);
    EXPECT_EQ(talk.Code(), VFS_ERR_CONNECT_FAILED);
    EXPECT_EQ(YLIBCErrGet(), 0x1100U);
    EXPECT_THAT(seams::Sleeps(), ElementsAre(3, 3, 3));
}

TEST_F(Fault, AResetBeforeTheAnswerIsAFailedReceive) {
    Expect({56, 0, VFS_ERR_RECEIVE_FAILED, false}, {ReadRequest(), wire::Reset()});
    EXPECT_THAT(seams::Sleeps(), ElementsAre(3));
}

TEST_F(Fault, AnEmptyAnswerIsTriedAgain) {
    Expect({52, 0, VFS_ERR_UNKNOWN, false}, {ReadRequest()});
    EXPECT_THAT(seams::Sleeps(), ElementsAre(3));
}

TEST_F(Fault, AResetInTheHeadersIsJudgedByTheStatusThatCame) {
    Expect({56, 200, VFS_ERR_NONE, true},
           {ReadRequest(), wire::Drip("HTTP/1.1 200 OK\r\nX-Half: 1\r\nX-Th", 1000, 1),
            wire::Drip(" ", 1, 50), wire::Reset()});
    Expect({56, 503, VFS_ERR_SERVER_ERROR, false},
           {ReadRequest(), Send("HTTP/1.1 503 Busy\r\nX-Half: 1\r\nX-Th"), wire::Drip(" ", 1, 50),
            wire::Reset()});
}

TEST_F(Fault, AResetInOrBehindTheBodyIsJudgedByTheStatusThatCame) {
    Expect({56, 200, VFS_ERR_NONE, true},
           {ReadRequest(), Send("HTTP/1.1 200 OK\r\nContent-Length: 10\r\n\r\nhalf"),
            wire::Drip("!", 1, 50), wire::Reset()},
           "half!");
    Expect({0, 200, VFS_ERR_NONE, true}, {ReadRequest(), Send(Answer(200, "whole")), wire::Reset()},
           "whole");
}

TEST_F(Fault, ABodyShorterThanAnnouncedIsASuccessOfItsStatus) {
    Expect({18, 200, VFS_ERR_NONE, true},
           {ReadRequest(), Send("HTTP/1.1 200 OK\r\nContent-Length: 10\r\n\r\nhalf")}, "half");
}

TEST_F(Fault, OfABodyLongerThanAnnouncedTheRestIsNotRead) {
    const wire::WireServer server(
        {{ReadRequest(), Send(Answer(200, "whole") + "HTTP/1.1 500 More\r\n\r\n")},
         Script{ReadRequest(), Send(Answer(200, "next"))}});
    Conversation<> talk;
    EXPECT_TRUE(talk.Get(server.Url()));
    EXPECT_EQ(talk.api.GetResponse(), "whole");
    EXPECT_TRUE(talk.Get(server.Url(), 1));
    EXPECT_EQ(talk.api.GetResponse(), "next") << "what was too much is no answer";
}

TEST_F(Fault, InterimAnswersArePassedOver) {
    Expect({0, 200, VFS_ERR_NONE, true},
           {ReadRequest(),
            Send("HTTP/1.1 100 Continue\r\n\r\nHTTP/1.1 103 Early Hints\r\nLink: x\r\n\r\n" +
                 Answer(200, "final"))},
           "final");
}

TEST_F(Fault, AResetBehindAnInterimAnswerIsAFailedReceive) {
    Expect({56, 0, VFS_ERR_RECEIVE_FAILED, false},
           {ReadRequest(), Send("HTTP/1.1 100 Continue\r\n\r\n"), wire::Drip("H", 1, 50),
            wire::Reset()});
}

TEST_F(Fault, AnAnswerThatIsNoHttpFails) {
    Conversation<> talk;
    const wire::WireServer server({{ReadRequest(), Send("hello, who are you?\r\n")}});
    EXPECT_FALSE(talk.Get(server.Url(), 3));
    EXPECT_EQ(talk.Code(), VFS_ERR_UNKNOWN);
    EXPECT_EQ(talk.Status(), 0);
}

TEST_F(Fault, ASlowServerEndsByTheLowSpeedRuleAsATimeout) {
    const std::string head = "HTTP/1.1 200 OK\r\nContent-Length: 1000\r\n\r\n";
    for (const bool drips : {false, true}) {
        seams::Reset();
        curl_seam::Now() = {};
        curl_seam::Now().replaced[CURLOPT_LOW_SPEED_TIME] = 1;
        const wire::WireServer server(
            {{ReadRequest(), Send(head),
              drips ? wire::Drip(std::string(1000, 'x'), 1, 200) : wire::Stall()}});
        Conversation<> talk;
        EXPECT_FALSE(talk.Get(server.Url()));
        EXPECT_EQ(talk.Curl(), 28);
        EXPECT_EQ(talk.Status(), 200);
        EXPECT_EQ(talk.Code(), VFS_ERR_TIMEOUT);
        EXPECT_THAT(seams::Sleeps(), ElementsAre(3));
    }
}

TEST_F(Fault, AServerThatNeverAnswersEndsByTheLowSpeedRule) {
    curl_seam::Now().replaced[CURLOPT_LOW_SPEED_TIME] = 1;
    const wire::WireServer server({{ReadRequest(), wire::Stall()}});
    Conversation<> talk;
    EXPECT_FALSE(talk.Get(server.Url()));
    EXPECT_EQ(talk.Code(), VFS_ERR_TIMEOUT);
}

TEST_F(Fault, AServerAboveTheLowSpeedLimitMayTakeItsTime) {
    curl_seam::Now().replaced[CURLOPT_LOW_SPEED_TIME] = 1;
    const std::string body(120, 'x');
    const wire::WireServer server(
        {{ReadRequest(), Send("HTTP/1.1 200 OK\r\nContent-Length: 120\r\n\r\n"),
          wire::Drip(body, 6, 100)}});
    Conversation<> talk;
    EXPECT_TRUE(talk.Get(server.Url()));
    EXPECT_EQ(talk.api.GetResponse(), body);
}

TEST_F(Fault, AKeptConnectionThatTheServerClosedBetweenRequestsIsReplaced) {
    const wire::WireServer server({Once(Answer(200, "one")), Once(Answer(200, "two"))});
    Conversation<> talk;
    EXPECT_TRUE(talk.Get(server.Url()));
    EXPECT_TRUE(server.Connections() == 1U && talk.api.Init());
    EXPECT_TRUE(talk.Get(server.Url()));
    EXPECT_EQ(talk.api.GetResponse(), "two");
    EXPECT_THAT(seams::Sleeps(), IsEmpty());
}

TEST_F(Fault, AKeptConnectionThatDiesAtTheNextRequestIsReplacedWithoutARetry) {
    for (const wire::Step& end : {wire::Reset(), ReadRequest()}) {
        Script dying = {ReadRequest(), Send(Answer(200, "one"))};
        if (end.kind == wire::Step::kReset) {
            dying.push_back(ReadRequest());
        }
        dying.push_back(end);
        const wire::WireServer server({dying, Once(Answer(200, "two"))});
        Conversation<> talk;
        EXPECT_TRUE(talk.Get(server.Url()));
        EXPECT_TRUE(talk.Get(server.Url()));
        EXPECT_EQ(talk.api.GetResponse(), "two");
        EXPECT_THAT(seams::Sleeps(), IsEmpty());
        EXPECT_TRUE(server.Finished());
    }
}

TEST_F(Fault, ACompressedBodyThatNobodyAskedForStaysAsItCame) {
    const std::string packed("\x1f\x8b\x08\x00\x00\x00\x00\x00\x00\x03\x4b\x04\x00\x43", 14);
    Expect({0, 200, VFS_ERR_NONE, true},
           {ReadRequest(), Send(Answer(200, packed, "Content-Encoding: gzip\r\n"))}, packed);
}

TEST_F(Fault, ABrokenChunkedBodyIsJudgedByItsStatus) {
    Expect({56, 200, VFS_ERR_NONE, true},
           {ReadRequest(),
            Send("HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\n\r\n2\r\nab\r\nzz\r\n")},
           "ab");
}

size_t Refuse(char*, size_t, size_t, void*) {
    return 0;
}

size_t Cancel(char*, size_t, size_t, void*) {
    YLIBCErrSetEx(0xa600, "test", 1);
    return 0;
}

TEST_F(Fault, AWriteFunctionThatTakesNothingAbortsAndThatOfACancelCancels) {
    for (const bool cancel : {false, true}) {
        const wire::WireServer server({Once(Answer(200, "body"))});
        Conversation<> talk;
        talk.api.SetWriteFunAndData(cancel ? Cancel : Refuse, nullptr);
        EXPECT_FALSE(talk.Get(server.Url(), 6));
        EXPECT_EQ(talk.Curl(), 23);
        EXPECT_EQ(talk.Code(), cancel ? VFS_ERR_CANCELLED : VFS_ERR_TRANSFER_ABORTED);
        EXPECT_THAT(seams::Sleeps(), IsEmpty());
    }
}

// Header lines.

TEST_F(Fault, HeaderLinesThatAreNoneAreSkippedAndTheTransferGoesOn) {
    const std::string longest(64 * 1024, 'v');
    const std::string lines =
        "Empty:\r\nBlank: \r\nNoBlank:value\r\n: nameless\r\nColons: a:b: c\r\n"
        "X-Long: " +
        longest +
        "\r\n"
        "X-Binary: \x01\xff\xfe\x80\r\nTwice: 1\r\nTwice: 2\r\n";
    const wire::WireServer server({Once(Answer(200, "body", lines))});
    Conversation<> talk;
    EXPECT_TRUE(talk.Get(server.Url()));
    EXPECT_EQ(talk.Curl(), 0) << seams::LogDump();
    EXPECT_EQ(talk.api.GetResponse(), "body");
    const Json::Value headers = talk.api.GetHeaderResponse();
    EXPECT_FALSE(headers.isMember("Empty"));
    EXPECT_EQ(headers["Blank"], "");
    EXPECT_EQ(headers["NoBlank"], "alue") << "the character behind the colon is skipped";
    EXPECT_EQ(headers["Colons"], "a:b: c");
    EXPECT_EQ(headers["X-Long"], longest);
    EXPECT_EQ(headers["X-Binary"], "\x01\xff\xfe\x80");
    EXPECT_EQ(headers["Twice"], "2");
    EXPECT_EQ(headers["Content-Length"], "4");
}

TEST_F(Fault, AHeaderLineWithoutAColonDoesNoHarm) {
    const wire::WireServer server({Once(Answer(200, "body", "no colon here\r\nX-A: 1\r\n"))});
    Conversation<> talk;
    EXPECT_TRUE(talk.Get(server.Url()));
    EXPECT_FALSE(talk.api.GetHeaderResponse().isMember("no colon here"));
}

TEST_F(Fault, AHeaderLineBeyondEveryLimitEndsTheTransfer) {
    const wire::WireServer server(
        {Once(Answer(200, "body", "X: " + std::string(1 << 20, 'v') + "\r\n"))});
    Conversation<> talk;
    talk.Get(server.Url(), 0);
    EXPECT_NE(talk.Curl(), 0);
    EXPECT_FALSE(talk.api.GetHeaderResponse().isMember("X"));
}

TEST_F(Fault, BodiesOfManyMebibytesArriveWhole) {
    std::string body(20 << 20, '\0');
    for (size_t i = 0; i < body.size(); ++i) {
        body[i] = static_cast<char>(i * 2654435761U >> 24);
    }
    const wire::WireServer server({Once(Answer(200, body))});
    Conversation<> talk;
    EXPECT_TRUE(talk.Get(server.Url()));
    EXPECT_TRUE(talk.api.GetResponse() == body);
}

// Redirects.

std::string MovedTo(const std::string& url, int status = 302) {
    return Answer(status, "moved", "Location: " + url + "\r\n");
}

TEST_F(Fault, TheAuthorizationHeaderDoesNotFollowToAnotherHost) {
    const wire::WireServer content({Once(Answer(200, "bytes"))});
    const wire::WireServer service({Once(MovedTo(content.Url("/bytes")))});
    Conversation<> talk(false);
    talk.api.AddHeader(Parsed(R"({"Authorization":"Bearer token-1","X-Other":"kept"})"));
    EXPECT_TRUE(talk.Get(service.Url()));
    EXPECT_EQ(talk.api.GetResponse(), "bytes") << "the redirect's own body is not part of it";
    EXPECT_THAT(service.ReceivedText(), HasSubstr("Authorization: Bearer token-1\r\n"));
    EXPECT_THAT(content.ReceivedText(), Not(HasSubstr("token-1")));
    EXPECT_THAT(content.ReceivedText(), HasSubstr("X-Other: kept\r\n"));
}

TEST_F(Fault, UserAndPasswordDoNotFollowToAnotherHost) {
    const wire::WireServer other({Once(Answer(200))});
    const wire::WireServer server(
        {{ReadRequest(), Send(Answer(401, "", "WWW-Authenticate: Basic realm=x\r\n")),
          ReadRequest(), Send(MovedTo(other.Url()))}});
    Conversation<DavErrorHandler> talk(false);
    talk.api.SetUserPwOpt("amy", "password-1");
    EXPECT_TRUE(talk.Get(server.Url())) << seams::LogDump();
    EXPECT_THAT(server.ReceivedText(), HasSubstr(tls::Basic("amy", "password-1")));
    EXPECT_THAT(other.ReceivedText(), Not(HasSubstr("Authorization")));
}

TEST_F(Fault, TheAuthorizationHeaderStaysOnTheSameHost) {
    const wire::WireServer server(
        {{ReadRequest(), Send(MovedTo("/next")), ReadRequest(), Send(Answer(200, "bytes"))}});
    Conversation<> talk;
    talk.api.AddHeader("Authorization", "Bearer token-1");
    EXPECT_TRUE(talk.Get(server.Url()));
    ASSERT_EQ(server.Received().size(), 2U);
    EXPECT_THAT(server.Received()[1], HasSubstr("GET /next HTTP/1.1\r\n"));
    EXPECT_THAT(server.Received()[1], HasSubstr("Authorization: Bearer token-1\r\n"));
}

TEST_F(Fault, RedirectsInACircleEnd) {
    Script script;
    for (int i = 0; i < 100; ++i) {
        script.push_back(ReadRequest());
        script.push_back(Send(MovedTo("/")));
    }
    const wire::WireServer server({script});
    Conversation<> talk;
    EXPECT_FALSE(talk.Get(server.Url(), 6));
    EXPECT_EQ(talk.Curl(), 47);
    EXPECT_EQ(server.Received().size(), 31U);
    EXPECT_THAT(seams::Sleeps(), IsEmpty());
}

TEST_F(Fault, ARedirectLeadsNowhereButToAnotherWebServer) {
    for (const char* target : {"file:///etc/passwd", "ftp://127.0.0.1/x", "dict://127.0.0.1/x",
                               "gopher://127.0.0.1/x"}) {
        const wire::WireServer server({Once(MovedTo(target))});
        Conversation<> talk;
        EXPECT_FALSE(talk.Get(server.Url())) << target;
        EXPECT_EQ(talk.Curl(), 1) << target;
        EXPECT_THAT(talk.api.GetResponse(), Not(HasSubstr("root:"))) << target;
    }
}

}  // namespace
}  // namespace ZYROCloud
