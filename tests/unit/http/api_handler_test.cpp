#include "http/api_handler.h"

#include "unit/http/curl_seam.h"
#include "unit/http/http_fixture.h"

namespace ZYROCloud {
namespace {

class Handler : public testing::Test {
  protected:
    void SetUp() override { curl_seam::Now() = {}; }
    void TearDown() override { curl_seam::Now() = {}; }
};

/** The n-th request of a server, without its body. */
std::string Head(const wire::WireServer& server, size_t n = 0) {
    const std::vector<std::string> received = server.Received();
    return n < received.size() ? received[n].substr(0, received[n].find("\r\n\r\n") + 4) : "";
}

std::string Body(const wire::WireServer& server, size_t n = 0) {
    const std::vector<std::string> received = server.Received();
    return n < received.size() ? received[n].substr(received[n].find("\r\n\r\n") + 4) : "";
}

TEST_F(Handler, ObjectFormsTakeOnlyObjectsAndReplaceTheWholeKey) {
    const wire::WireServer server({Once(wire::Answer(200))});
    Conversation<> talk;
    for (const char* text : {"null", "[]", "7", "\"x\""}) {
        const Json::Value value = Parsed("[" + std::string(text) + "]")[0];
        EXPECT_FALSE(talk.api.AddHeader(value)) << text;
        EXPECT_FALSE(talk.api.AddGetParam(value)) << text;
        EXPECT_FALSE(talk.api.AddPostParam(value)) << text;
        EXPECT_EQ(talk.api.AddPostRawParam(value), value.isNull()) << text;
    }
    talk.api.Init();
    EXPECT_TRUE(talk.api.AddHeader(Parsed(R"({"X-Old":"1"})")));
    EXPECT_TRUE(talk.api.AddHeader(Parsed(R"({"X-New":"2"})")));
    EXPECT_TRUE(talk.api.AddGetParam(Parsed(R"({"old":"1"})")));
    EXPECT_TRUE(talk.api.AddGetParam(Parsed(R"({"new":"2"})")));
    EXPECT_TRUE(talk.Get(server.Url()));
    EXPECT_THAT(Head(server), HasSubstr("GET /?new=2 HTTP/1.1\r\n"));
    EXPECT_THAT(Head(server), HasSubstr("X-New: 2\r\n"));
    EXPECT_THAT(Head(server), Not(HasSubstr("X-Old")));
}

TEST_F(Handler, TextFormsRefuseAnEmptyNameOrValueAndAddOneMember) {
    const wire::WireServer server({Once(wire::Answer(200))});
    Conversation<> talk;
    APIHandler& api = talk.api;
    EXPECT_FALSE(api.AddHeader("", "x"));
    EXPECT_FALSE(api.AddGetParam("", "x"));
    EXPECT_FALSE(api.AddGetParam("x", ""));
    EXPECT_FALSE(api.AddGetParam("x", static_cast<const char*>(nullptr)));
    EXPECT_FALSE(api.AddGetParam("", true));
    EXPECT_FALSE(api.AddPostParam("", "x"));
    EXPECT_FALSE(api.AddPostParam("x", ""));
    EXPECT_FALSE(api.SetReqMethod(""));
    EXPECT_TRUE(api.AddHeader("X-A", "1"));
    EXPECT_TRUE(api.AddHeader("X-B", "2"));
    EXPECT_TRUE(api.AddGetParam("b", std::string("x y")));
    EXPECT_TRUE(api.AddGetParam("a", true));
    EXPECT_TRUE(api.AddPostParam("q", "1&2"));
    EXPECT_TRUE(talk.Get(server.Url()));
    EXPECT_THAT(Head(server), HasSubstr("POST /?a=true&b=x%20y HTTP/1.1\r\n"));
    EXPECT_THAT(Head(server), HasSubstr("X-A: 1\r\nX-B: 2\r\n"));
    EXPECT_EQ(Body(server), "q=1%262");
}

TEST_F(Handler, AddHeaderWithAnEmptyValueFailsInTheTextFormAndDropsTheHeaderInTheObjectForm) {
    const wire::WireServer server({Once(wire::Answer(200)), Once(wire::Answer(200))});
    Conversation<> talk;
    EXPECT_FALSE(talk.api.AddHeader("Expect", ""));
    EXPECT_TRUE(talk.api.AddHeader(Parsed(R"({"Expect":"","User-Agent":"","X-Arg":{"a":[1]}})")));
    EXPECT_TRUE(talk.Get(server.Url()));
    EXPECT_THAT(Head(server), Not(HasSubstr("User-Agent")));
    EXPECT_THAT(Head(server), Not(HasSubstr("Expect")));
    EXPECT_THAT(Head(server), HasSubstr("X-Arg: {\"a\":[1]}\r\n"));
}

TEST_F(Handler, AUrlThatAlreadyHoldsAQuestionMarkGetsItsParametersAfterAnAmpersand) {
    const wire::WireServer server({Once(wire::Answer(200))});
    Conversation<> talk;
    talk.api.AddGetParam("b", "2");
    EXPECT_TRUE(talk.Get(server.Url("/x?a=1")));
    EXPECT_THAT(Head(server), HasSubstr("GET /x?a=1&b=2 HTTP/1.1\r\n"));
}

TEST_F(Handler, AnEmptyGetParamObjectLeavesATrailingQuestionMark) {
    const wire::WireServer server({Once(wire::Answer(200))});
    Conversation<> talk;
    talk.api.AddGetParam(Json::Value(Json::objectValue));
    EXPECT_TRUE(talk.Get(server.Url("/x")));
    EXPECT_THAT(Head(server), HasSubstr("GET /x? HTTP/1.1\r\n"));
}

TEST_F(Handler, PostParamAndPostRawParamBothPresentOnlyPostParamIsSent) {
    const wire::WireServer server({Once(wire::Answer(200))});
    Conversation<> talk;
    talk.api.AddPostRawParam(Parsed(R"({"raw":1})"));
    talk.api.AddPostParam("form", "1");
    EXPECT_TRUE(talk.Get(server.Url()));
    EXPECT_EQ(Body(server), "form=1");
}

TEST_F(Handler, ARawBodyIsOneLineOfJson) {
    const wire::WireServer server({Once(wire::Answer(200))});
    Conversation<> talk;
    talk.api.AddPostRawParam(Parsed("{\"name\":\"a\\nb\",\n\"list\":[1,2],\"zero\":\"\\u0000\"}"));
    talk.api.SetReqMethod("PUT");
    EXPECT_TRUE(talk.Get(server.Url()));
    EXPECT_THAT(Head(server), HasSubstr("PUT / HTTP/1.1\r\n"));
    EXPECT_EQ(Parsed(Body(server))["name"], "a\nb");
    EXPECT_THAT(Body(server), Not(HasSubstr("\n")));
}

TEST_F(Handler, ARawBodyMayBeNull) {
    const wire::WireServer server({Once(wire::Answer(200))});
    Conversation<> talk;
    EXPECT_TRUE(talk.api.AddPostRawParam(Json::Value()));
    EXPECT_TRUE(talk.Get(server.Url()));
    EXPECT_THAT(Head(server), HasSubstr("POST / HTTP/1.1\r\n"));
    EXPECT_EQ(Body(server), "null");
}

TEST_F(Handler, AnObjectInAHeaderIsPrintableAscii) {
    const wire::WireServer server({Once(wire::Answer(200))});
    Conversation<> talk;
    Json::Value headers;
    headers["X-Arg"]["path"] = "/\xc3\xa4\xf0\x9f\x98\x80\r\nX-Evil: \x7f\xff";
    EXPECT_TRUE(talk.api.AddHeader(headers));
    EXPECT_TRUE(talk.Get(server.Url()));
    EXPECT_THAT(Head(server),
                HasSubstr(R"(X-Arg: {"path":"/\u00e4\ud83d\ude00\r\nX-Evil: \u007f\ufffd"})"
                          "\r\n"));
}

TEST_F(Handler, TheUrlIsEscapedUnlessToldOtherwise) {
    const wire::WireServer server({{wire::ReadRequest(), wire::Send(wire::Answer(200)),
                                    wire::ReadRequest(), wire::Send(wire::Answer(200))}});
    Conversation<> talk;
    talk.api.SetURL(server.Url("/a b/\xc3\xa4"), true);
    EXPECT_TRUE(talk.api.Process(0));
    talk.api.SetURL(server.Url("/a%20b"), false);
    EXPECT_TRUE(talk.api.Process(0));
    EXPECT_THAT(Head(server), HasSubstr("GET /a%20b/%C3%A4 HTTP/1.1\r\n"));
    EXPECT_THAT(Head(server, 1), HasSubstr("GET /a%20b HTTP/1.1\r\n"));
}

TEST_F(Handler, ASetupFailureLeavesTheRecordOfThePreviousState) {
    const wire::WireServer server({Once(wire::Answer(404))});
    Conversation<> talk;
    EXPECT_FALSE(talk.Get(server.Url()));
    const Json::Value before = talk.api.GetError();
    EXPECT_EQ(talk.Code(), VFS_ERR_NOT_FOUND);

    EXPECT_FALSE(talk.Get(""));
    EXPECT_TRUE(seams::Logged("Failed to escape url, "));
    talk.api.SetURL("no scheme", true);
    EXPECT_FALSE(talk.api.Process(6));
    EXPECT_TRUE(seams::Logged("Failed to escape url, no scheme"));
    for (const char* bad : {R"({"X":[1]})", R"({"X":"a\r\nInjected: 1"})", R"({"X\n":"a"})"}) {
        talk.api.AddHeader(Parsed(bad));
        EXPECT_FALSE(talk.Get(server.Url(), 6)) << bad;
    }
    talk.api.AddHeader(Json::Value(Json::objectValue));
    talk.api.AddGetParam(Parsed(R"({"a":{"b":1}})"));
    EXPECT_FALSE(talk.Get(server.Url(), 6));
    talk.api.AddGetParam(Json::Value(Json::objectValue));
    talk.api.AddPostParam(Parsed(R"({"a":[1]})"));
    EXPECT_FALSE(talk.Get(server.Url(), 6));

    EXPECT_EQ(talk.api.GetError(), before);
    EXPECT_THAT(seams::Sleeps(), IsEmpty());
    EXPECT_EQ(server.Connections(), 1U);
}

TEST_F(Handler, OptionsThatCurlRefusesInProcessFailWithoutATransferAndWithoutARecord) {
    Conversation<> talk;
    talk.api.AddHeader("A", "b");
    talk.api.AddPostParam("a", "b");
    talk.api.SetReqMethod("PUT");
    for (const int option :
         {CURLOPT_HTTPHEADER, CURLOPT_URL, CURLOPT_POST, CURLOPT_COPYPOSTFIELDS}) {
        curl_seam::Now() = {};
        curl_seam::Now().refused[option] = CURLE_OUT_OF_MEMORY;
        EXPECT_FALSE(talk.Get("http://127.0.0.1/", 6)) << option;
        EXPECT_THAT(curl_seam::Values(curl_seam::kPerform), IsEmpty());
    }
    curl_seam::Now() = {};
    curl_seam::Now().refused[CURLOPT_CUSTOMREQUEST] = CURLE_OUT_OF_MEMORY;
    EXPECT_FALSE(talk.Get("http://127.0.0.1/", 6));
    EXPECT_TRUE(seams::Logged("Failed to set custom method, code=27, err=Out of memory"));
    EXPECT_TRUE(talk.api.GetError().isNull());
}

TEST_F(Handler, ProcessMinusThreeMakesOneAttempt) {
    const wire::WireServer server({Once(wire::Answer(503))});
    Conversation<> talk;
    EXPECT_FALSE(talk.Get(server.Url(), -3));
    EXPECT_EQ(server.Connections(), 1U);
    EXPECT_THAT(seams::Sleeps(), ElementsAre(5));
    EXPECT_TRUE(seams::Logged("Retry times: 1/1, err: 22, url: " + server.Url()))
        << seams::LogDump();
}

TEST_F(Handler, ProcessSixMakesSevenAttemptsAndSleepsAfterEachAlsoTheSeventh) {
    const wire::WireServer server(std::vector<wire::Script>(8, Once(wire::Answer(503))));
    Conversation<> talk;
    EXPECT_FALSE(talk.Get(server.Url(), 6));
    EXPECT_EQ(server.Connections(), 7U);
    EXPECT_THAT(seams::Sleeps(), ElementsAre(5, 5, 5, 5, 5, 5, 5));
    for (int n = 1; n <= 7; ++n) {
        EXPECT_TRUE(seams::Logged("Retry times: " + std::to_string(n) +
                                  "/7, err: 22, url: " + server.Url()));
    }
}

TEST_F(Handler, TheFirstSuccessEndsTheLoop) {
    const wire::WireServer server({Once(wire::Answer(503)), Once(wire::Answer(429)),
                                   Once(wire::Answer(200, "good", "X-N: 3\r\n"))});
    Conversation<> talk(false);
    EXPECT_TRUE(talk.Get(server.Url(), 6));
    EXPECT_THAT(seams::Sleeps(), ElementsAre(5, 5));
    EXPECT_EQ(talk.api.GetResponse(), "good");
    EXPECT_EQ(talk.api.GetHeaderResponse()["X-N"], "3");
    EXPECT_TRUE(server.Finished());
}

TEST_F(Handler, WhatIsNotWorthARetryIsNotRepeated) {
    const wire::WireServer server({Once(wire::Answer(404))});
    Conversation<> talk;
    EXPECT_FALSE(talk.Get(server.Url(), 6));
    EXPECT_THAT(seams::Sleeps(), IsEmpty());
    EXPECT_EQ(server.Connections(), 1U);
}

TEST_F(Handler, EachAttemptBeginsWithAnEmptyBodyAndNoHeaders) {
    const wire::WireServer server({Once(wire::Answer(503, "old", "X-Old: 1\r\n")),
                                   Once(wire::Answer(404, "new", "X-New: 1\r\n"))});
    Conversation<> talk(false);
    EXPECT_FALSE(talk.Get(server.Url(), 6));
    EXPECT_EQ(talk.api.GetResponse(), "new");
    EXPECT_TRUE(talk.api.GetHeaderResponse().isMember("X-New"));
    EXPECT_FALSE(talk.api.GetHeaderResponse().isMember("X-Old"));
    EXPECT_EQ(talk.api.GetError()["msg"], "new");
}

TEST_F(Handler, AThrottledOneDriveIsLeftAloneAsLongAsItAsks) {
    const std::string wait10 =
        R"({"error":{"code":"request_throttled","message":"Wait 10 seconds."}})";
    const std::string wait0 =
        R"({"error":{"code":"request_throttled","message":"Wait 0 seconds."}})";
    const wire::WireServer server({Once(wire::Answer(420, wait10)), Once(wire::Answer(420, wait0)),
                                   Once(wire::Answer(503)), Once(wire::Answer(200))});
    Conversation<OneDriveErrorHandler> talk(false);
    EXPECT_TRUE(talk.Get(server.Url(), 6));
    EXPECT_THAT(seams::Sleeps(), ElementsAre(40, 0, 5));
}

TEST_F(Handler, ALongestSleepBoundsWhatAServiceMayOrder) {
    const std::string years =
        R"({"error":{"code":"request_throttled","message":"Wait 99999999 seconds."}})";
    const wire::WireServer server({Once(wire::Answer(420, years)), Once(wire::Answer(420, years)),
                                   Once(wire::Answer(503)), Once(wire::Answer(200))});
    Conversation<OneDriveErrorHandler> talk(false);
    talk.api.SetLongestSleep(30);
    EXPECT_TRUE(talk.Get(server.Url(), 6));
    EXPECT_THAT(seams::Sleeps(), ElementsAre(30, 30, 5));
}

TEST_F(Handler, AResolveFailureOnTheThirdAttemptTurnsIpv4OnlyOnForAttemptsFourOnward) {
    for (const CURLcode code : {CURLE_COULDNT_RESOLVE_PROXY, CURLE_COULDNT_RESOLVE_HOST}) {
        Conversation<> talk;
        curl_seam::Now() = {};
        curl_seam::Now().results.assign(5, code);
        EXPECT_FALSE(talk.Get("http://127.0.0.1/", 4));
        EXPECT_THAT(curl_seam::AmongTransfers(CURLOPT_IPRESOLVE), ElementsAre(0, 0, 0, 0, 1, 0, 0))
            << "any address, three transfers, then IPv4";
        EXPECT_EQ(talk.Code(), VFS_ERR_CONNECT_FAILED);
    }
}

TEST_F(Handler, AResolveFailureOfAnotherAttemptLeavesTheAddressFamilyAlone) {
    Conversation<> talk;
    curl_seam::Now() = {};
    const CURLcode unresolved = CURLE_COULDNT_RESOLVE_HOST;
    curl_seam::Now().results = {unresolved, unresolved, CURLE_COULDNT_CONNECT, unresolved};
    EXPECT_FALSE(talk.Get("http://127.0.0.1/", 3));
    EXPECT_EQ(curl_seam::Values(CURLOPT_IPRESOLVE), std::vector<long>{0});
}

TEST_F(Handler, AStrangePassiveReplySwitchesToActiveMode) {
    Conversation<FTPErrorHandler> talk;
    curl_seam::Now() = {};
    curl_seam::Now().results.assign(2, CURLE_FTP_WEIRD_PASV_REPLY);
    EXPECT_FALSE(talk.Get("ftp://127.0.0.1/x", 1));
    const std::vector<long> ports = curl_seam::Values(CURLOPT_FTPPORT);
    ASSERT_EQ(ports.size(), 2U);
    EXPECT_STREQ(reinterpret_cast<const char*>(ports[0]), "-");
}

TEST_F(Handler, AnOptionRefusedBetweenAttemptsIsLoggedAndTheLoopGoesOn) {
    Conversation<FTPErrorHandler> talk;
    curl_seam::Now() = {};
    curl_seam::Now().results = {CURLE_FTP_WEIRD_PASV_REPLY, CURLE_OK};
    curl_seam::Now().refused[CURLOPT_FTPPORT] = CURLE_OUT_OF_MEMORY;
    EXPECT_TRUE(talk.Get("ftp://127.0.0.1/x", 6));
    EXPECT_TRUE(seams::Logged("Failed to set return value=27, err=Out of memory"));
}

TEST_F(Handler, ANameThatDoesNotResolveIsAConnectFailure) {
    Conversation<> talk;
    EXPECT_FALSE(talk.Get("http://nohost.invalid/", 0));
    EXPECT_EQ(talk.Curl(), CURLE_COULDNT_RESOLVE_HOST);
    EXPECT_EQ(talk.Code(), VFS_ERR_CONNECT_FAILED);
    EXPECT_EQ(talk.Status(), 0);
    EXPECT_THAT(seams::Sleeps(), ElementsAre(3));
}

TEST_F(Handler, TheStatusOfAnEarlierAttemptDoesNotJudgeALaterOne) {
    const wire::WireServer server({Once(wire::Answer(503)), {wire::ReadRequest(), wire::Reset()}});
    Conversation<> talk;
    EXPECT_FALSE(talk.Get(server.Url(), 1));
    EXPECT_EQ(talk.Curl(), CURLE_RECV_ERROR);
    EXPECT_EQ(talk.Status(), 0);
    EXPECT_EQ(talk.Code(), VFS_ERR_RECEIVE_FAILED);
    EXPECT_THAT(seams::Sleeps(), ElementsAre(5, 3));
}

TEST_F(Handler, ProcessTwiceOnOneDescriptionSendsItTwiceWithTheNewHeader) {
    const wire::WireServer server({{wire::ReadRequest(), wire::Send(wire::Answer(401)),
                                    wire::ReadRequest(), wire::Send(wire::Answer(200, "yes"))}});
    Conversation<> talk(false);
    talk.api.AddHeader(Parsed(R"({"Authorization":"Bearer old","X-Kept":"1"})"));
    talk.api.AddPostRawParam(Parsed(R"({"a":1})"));
    talk.api.AddGetParam("g", "1");
    EXPECT_FALSE(talk.Get(server.Url()));
    talk.api.AddHeader("Authorization", "Bearer new");
    EXPECT_TRUE(talk.api.Process(0));
    EXPECT_THAT(Head(server, 0), HasSubstr("Authorization: Bearer old\r\n"));
    EXPECT_THAT(Head(server, 1), HasSubstr("POST /?g=1 HTTP/1.1\r\n"));
    EXPECT_THAT(Head(server, 1), HasSubstr("Authorization: Bearer new\r\nX-Kept: 1\r\n"));
    EXPECT_EQ(Body(server, 1), R"({"a":1})");
    EXPECT_EQ(talk.api.GetResponse(), "yes");
    EXPECT_EQ(server.Connections(), 1U);
}

TEST_F(Handler, InitForgetsTheLastRequestAndItsAnswerButKeepsTheConnection) {
    const wire::WireServer server(
        {{wire::ReadRequest(), wire::Send(wire::Answer(200, "one", "X-One: 1\r\n")),
          wire::ReadRequest(), wire::Send(wire::Answer(200))}});
    Conversation<> talk;
    talk.api.AddHeader("X-Secret", "1");
    talk.api.AddPostParam("a", "b");
    talk.api.SetReqMethod("PATCH");
    talk.api.AddGetParam("q", "1");
    EXPECT_TRUE(talk.Get(server.Url()));
    EXPECT_TRUE(talk.api.Init());
    EXPECT_EQ(talk.api.GetResponse(), "");
    EXPECT_EQ(talk.api.GetHeaderResponse(), Json::Value(Json::objectValue));
    EXPECT_FALSE(talk.api.Process(0)) << "there is no URL any more";
    EXPECT_TRUE(talk.Get(server.Url()));
    EXPECT_THAT(Head(server, 1), HasSubstr("GET / HTTP/1.1\r\n"));
    EXPECT_THAT(Head(server, 1), Not(HasSubstr("X-Secret")));
    EXPECT_EQ(server.Connections(), 1U);
}

TEST_F(Handler, WithoutAnErrorHandlerNothingIsASuccess) {
    const wire::WireServer server({Once(wire::Answer(200))});
    APIHandler api;
    EXPECT_TRUE(api.Init());
    api.SetURL(server.Url(), false);
    EXPECT_FALSE(api.Process(6));
    EXPECT_FALSE(api.IsNeedRetry());
    EXPECT_EQ(api.GetRetrySleepTime(), 0U);
    EXPECT_TRUE(api.GetError().isNull());
}

TEST_F(Handler, AnotherErrorHandlerTakesThePlaceOfTheFirst) {
    const wire::WireServer server({Once(wire::Answer(409, R"({"error":{".tag":"not_found"}})"))});
    Conversation<BoxErrorHandler> talk(false);
    talk.api.SetErrorHandler(new DropboxErrorHandler);
    EXPECT_FALSE(talk.Get(server.Url()));
    EXPECT_EQ(talk.Code(), VFS_ERR_NOT_FOUND);
}

TEST_F(Handler, AHandlerWithoutACurlHandleFailsAndMakesOneAtTheNextInit) {
    HandlePool::Instance().Empty();
    curl_seam::Now().no_handle = true;
    APIHandler api;
    api.SetErrorHandler(new BoxErrorHandler);
    EXPECT_EQ(api.GetCurlHandler(), nullptr);
    EXPECT_FALSE(api.Init());
    EXPECT_FALSE(api.SetNoBody(true));
    EXPECT_FALSE(api.SetShareCurlHandler(&api));
    EXPECT_TRUE(seams::Logged("curl handler or share handler is null"));
    api.SetURL("http://127.0.0.1/", false);
    EXPECT_FALSE(api.Process(0));
    curl_seam::Now().no_handle = false;
    EXPECT_TRUE(api.Init());
    EXPECT_NE(api.GetCurlHandler(), nullptr);
}

TEST_F(Handler, EscapedTextEndsAtTheFirstNul) {
    Conversation<> talk;
    EXPECT_EQ(talk.api.EscapeURLString(std::string("a b\0c", 5)), "a%20b");
    EXPECT_EQ(talk.api.EscapeURLString(""), "");
    EXPECT_EQ(talk.api.BuildParamString(Parsed(R"({"b":2,"a":true,"n":null,"c d":"/"})")),
              "a=true&b=2&c d=%2F&n=");
    EXPECT_EQ(talk.api.BuildParamString(Json::Value(Json::objectValue)), "");
}

}  // namespace
}  // namespace ZYROCloud
