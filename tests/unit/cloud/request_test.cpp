// The frame, for each kind of service that uses it: description in, requests and waits out.
#include "cloud/request.h"

#include <gmock/gmock.h>

#include "core/json.h"
#include "http/api_handler.h"
#include "support/bare_driver.h"
#include "support/seams.h"
#include "support/wire_server.h"

namespace ZYROCloud {
namespace {

using namespace ZYROVFS;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;

constexpr const char* kCanary = "canary-4711";
constexpr FrameRules kRenewing{true, nullptr, false, false};
constexpr FrameRules kPretty{true, nullptr, true, false};
constexpr FrameRules kPlain{false, "application/json", false, true};

Json::Value Profile(const std::string& expire_time) {
    Json::Value profile;
    profile["access_token"] = kCanary;
    profile["expire_time"] = expire_time;
    profile["server_id"] = "box://amy@example.com";
    return profile;
}

class TestCloud : public bare::Driver<PublicCloud> {
  public:
    explicit TestCloud(const std::string& expire_time = "") : Driver(1234, Profile(expire_time)) {
        api->SetErrorHandler(new BoxErrorHandler);
        api->SetReturnOnError(false);
    }
    bool SetRefreshTokenParam(APIHandler*) override { return false; }
};

/** A server that gives these answers on one connection. */
std::vector<wire::Script> Answers(const std::vector<std::string>& answers) {
    wire::Script script;
    for (const std::string& answer : answers) {
        script.push_back(wire::ReadRequest());
        script.push_back(wire::Send(answer));
    }
    return {script};
}

class RequestFrame : public testing::Test {
  protected:
    void SetUp() override {
        setenv("ZYROVFS_UID", "1234", 1);
        seams::Reset();
    }
    void TearDown() override { EXPECT_FALSE(seams::LoggedPart(kCanary)) << seams::LogDump(); }
    TestCloud cloud_;
};

Json::Value Object(const std::string& text) {
    Json::Value value;
    EXPECT_TRUE(json::fromString(value, text)) << text;
    return value;
}

TEST_F(RequestFrame, EachServiceSendsItsOwnHeadersAndQuery) {
    struct {
        const FrameRules& rules;
        std::string line, type;
    } rows[] = {{kRenewing, "GET /a%20b/c?x=1 HTTP/1.1\r\n", ""},
                {kPretty, "GET /a%20b/c?pretty=false&x=1 HTTP/1.1\r\n", ""},
                {kPlain, "GET /a%20b/c?x=1 HTTP/1.1\r\n", "Content-Type: application/json\r\n"}};
    for (const auto& row : rows) {
        const wire::WireServer server(Answers({wire::Answer(200, R"({"id":"7"})")}));
        Json::Value out;
        EXPECT_TRUE(Request(cloud_, row.rules)
                        .Get(server.Url("/a b/c"))
                        .Query(Object(R"({"x":1})"))
                        .Send(out));
        EXPECT_EQ(out["id"], "7");
        EXPECT_THAT(server.ReceivedText(), testing::StartsWith(row.line));
        EXPECT_THAT(server.ReceivedText(), HasSubstr("Authorization: Bearer canary-4711\r\n"));
        EXPECT_THAT(server.ReceivedText(), HasSubstr(row.type));
    }
}

TEST_F(RequestFrame, ABodyHasItsTypeAndLength) {
    const wire::WireServer server(Answers({wire::Answer(201, "")}));
    EXPECT_TRUE(Request(cloud_, kRenewing)
                    .Put(server.Url("/x"))
                    .Body(Object(R"({"name":"\u00e9\u0000\""})"))
                    .Send());
    const std::string text = server.ReceivedText();
    EXPECT_THAT(text, testing::StartsWith("PUT /x HTTP/1.1\r\n"));
    EXPECT_THAT(text, HasSubstr("Content-Type: application/json\r\n"));
    const std::string body = text.substr(text.find("\r\n\r\n") + 4);
    EXPECT_EQ(Object(body), Object(R"({"name":"\u00e9\u0000\""})"));
    EXPECT_THAT(text, HasSubstr("Content-Length: " + std::to_string(body.size()) + "\r\n"));
}

TEST_F(RequestFrame, ARawBodyHasNoHeaderOfOursAboutIt) {
    const wire::WireServer server(Answers({wire::Answer(200, "")}));
    EXPECT_TRUE(Request(cloud_, kRenewing)
                    .To("OPTIONS", server.Url("/x"))
                    .Header("Expect", "")
                    .RawBody(Object(R"({"a":1})"))
                    .Send());
    EXPECT_THAT(server.ReceivedText(), testing::StartsWith("OPTIONS /x HTTP/1.1\r\n"));
    EXPECT_THAT(server.ReceivedText(), Not(HasSubstr("application/json")));
    EXPECT_THAT(server.ReceivedText(), testing::EndsWith("\r\n\r\n{\"a\":1}"));
}

TEST_F(RequestFrame, AnEmptyQueryLeavesNoQuestionMark) {
    const wire::WireServer server(Answers({wire::Answer(200, "{}")}));
    EXPECT_TRUE(Request(cloud_, kRenewing).Get(server.Url("/x")).Query(Object("{}")).Send());
    EXPECT_THAT(server.ReceivedText(), testing::StartsWith("GET /x HTTP/1.1\r\n"));
}

TEST_F(RequestFrame, AUrlMayGoOutAsItIs) {
    const wire::WireServer server(Answers({wire::Answer(200, "{}")}));
    EXPECT_TRUE(Request(cloud_, kRenewing).Get(server.Url("/a%2Fb")).Unescaped().Send());
    EXPECT_THAT(server.ReceivedText(), testing::StartsWith("GET /a%2Fb HTTP/1.1\r\n"));
}

TEST_F(RequestFrame, ARefusalIsCopiedAndLoggedInTheNameOfTheCaller) {
    const wire::WireServer server(Answers({wire::Answer(404, R"({"code":"not_found"})")}));
    EXPECT_FALSE(Request(cloud_, kRenewing).Get(server.Url("/x")).Send());
    EXPECT_EQ(cloud_.GetErrorCode(), VFS_ERR_NOT_FOUND);
    EXPECT_EQ(cloud_.GetError()["response_code"], 404);
    EXPECT_TRUE(seams::LoggedPart("Failed to process curl " + server.Url("/x") + ", err:{"))
        << seams::LogDump();
    EXPECT_TRUE(seams::LoggedPart("request_test.cpp:"));
}

TEST_F(RequestFrame, ARefusalThatTheCallerExpectsIsItsOwn) {
    const auto refuse = [](int status) { return Answers({wire::Answer(status, "{}")}); };
    bool called = false;
    const auto way_out = [&] {
        EXPECT_EQ(cloud_.GetErrorCode(), VFS_ERR_CONFLICT);
        return called = true;
    };
    const wire::WireServer conflict(refuse(409));
    EXPECT_TRUE(
        Request(cloud_, kRenewing).Get(conflict.Url()).Unless(VFS_ERR_CONFLICT, way_out).Send());
    EXPECT_TRUE(called);
    EXPECT_FALSE(seams::LoggedPart("Failed to process curl")) << seams::LogDump();
    EXPECT_EQ(cloud_.GetErrorCode(), VFS_ERR_NONE) << "the conflict was got round";

    called = false;
    const wire::WireServer other(refuse(403));
    EXPECT_FALSE(
        Request(cloud_, kRenewing).Get(other.Url()).Unless(VFS_ERR_CONFLICT, way_out).Send());
    EXPECT_FALSE(called);
    EXPECT_TRUE(seams::LoggedPart("Failed to process curl"));
}

TEST_F(RequestFrame, AnAnswerThatIsNoJsonFailsAtOnce) {
    const wire::WireServer server(Answers({wire::Answer(200, "<html>")}));
    Json::Value out;
    EXPECT_FALSE(Request(cloud_, kRenewing).Get(server.Url()).Send(out));
    EXPECT_EQ(cloud_.GetErrorCode(), VFS_ERR_CLOUD_FAILED);
    EXPECT_TRUE(seams::Logged("Failed to parse response to json format, <html>"))
        << seams::LogDump();
    EXPECT_THAT(seams::Sleeps(), IsEmpty());
}

TEST_F(RequestFrame, TheLineForAnAnswerThatIsNoJsonMayBeAnother) {
    const wire::WireServer server(Answers({wire::Answer(200, "%s%n")}));
    Json::Value out;
    EXPECT_FALSE(Request(cloud_, kRenewing)
                     .Get(server.Url())
                     .BadAnswer("Failed to parse result, format error")
                     .Send(out));
    EXPECT_TRUE(seams::Logged("Failed to parse result, format error")) << seams::LogDump();
}

TEST_F(RequestFrame, AServiceMayBeAskedAgainForAnAnswerThatIsNoJson) {
    const wire::WireServer server(
        Answers({wire::Answer(200, "<a>"), wire::Answer(200, "<b>"), wire::Answer(200, "{}")}));
    Json::Value out;
    EXPECT_TRUE(Request(cloud_, kPlain).Post(server.Url()).RawBody(Object("{}")).Send(out));
    EXPECT_THAT(seams::Sleeps(), testing::ElementsAre(1, 1));
    EXPECT_TRUE(seams::Logged("Failed to parse response to json format, <b>, retry: 2"))
        << seams::LogDump();
}

TEST_F(RequestFrame, SixAnswersThatAreNoJsonAreEnoughAndLeaveTheErrorAlone) {
    const wire::WireServer server(Answers(std::vector<std::string>(7, wire::Answer(200, "<a>"))));
    cloud_.SetError(VFS_ERR_FORBIDDEN, "");
    Json::Value out;
    EXPECT_FALSE(Request(cloud_, kPlain).Get(server.Url()).Send(out));
    EXPECT_THAT(seams::Sleeps(), testing::ElementsAre(1, 1, 1, 1, 1, 1));
    EXPECT_EQ(server.Received().size(), 6U);
    EXPECT_TRUE(seams::Logged("Reach max retry times")) << seams::LogDump();
    EXPECT_EQ(cloud_.GetErrorCode(), VFS_ERR_FORBIDDEN);
}

TEST_F(RequestFrame, ARequestIsRetriedSixTimesUnlessSaidOtherwise) {
    struct {
        const FrameRules& rules;
        int retries;
        size_t requests;
    } rows[] = {{kRenewing, -1, 7}, {kPlain, -1, 7}, {kRenewing, 0, 1}, {kPlain, 2, 3}};
    for (const auto& row : rows) {
        seams::Reset();
        const wire::WireServer server(
            Answers(std::vector<std::string>(row.requests, wire::Answer(503, ""))));
        Request request(cloud_, row.rules);
        request.Get(server.Url());
        if (row.retries >= 0) {
            request.Retries(row.retries);
        }
        EXPECT_FALSE(request.Send());
        EXPECT_EQ(cloud_.GetErrorCode(), VFS_ERR_SERVER_ERROR);
        EXPECT_EQ(server.Received().size(), row.requests);
        EXPECT_EQ(seams::Sleeps(), std::vector<unsigned>(row.requests, 5));
    }
}

TEST_F(RequestFrame, ATokenThatCannotBeRenewedEndsTheRequestBeforeItIsSent) {
    TestCloud cloud("1");
    const wire::WireServer server({});
    EXPECT_FALSE(Request(cloud, kRenewing).Get(server.Url()).Send());
    EXPECT_EQ(cloud.GetErrorCode(), VFS_ERR_UNAUTHORIZED);
    EXPECT_EQ(cloud.GetError()["msg"], "");
    EXPECT_EQ(server.Connections(), 0U);
    EXPECT_FALSE(seams::LoggedPart("Failed to process curl")) << seams::LogDump();
}

TEST_F(RequestFrame, AServiceWithoutRenewalIsAskedWithTheTokenThatThereIs) {
    TestCloud cloud("1");
    const wire::WireServer server(Answers({wire::Answer(401, "")}));
    EXPECT_FALSE(Request(cloud, kPlain).Get(server.Url()).Send());
    EXPECT_EQ(cloud.GetErrorCode(), VFS_ERR_UNAUTHORIZED);
    EXPECT_EQ(cloud.GetError()["response_code"], 401);
}

TEST_F(RequestFrame, ALocalStepThatFailsIsAFailureOfTheCloud) {
    const wire::WireServer server({});
    EXPECT_FALSE(Request(cloud_, kRenewing).Get(server.Url()).Query(Object("[1]")).Send());
    EXPECT_EQ(cloud_.GetErrorCode(), VFS_ERR_CLOUD_FAILED);
    EXPECT_FALSE(Request(cloud_, kRenewing).Post(server.Url()).RawBody(Json::Value("text")).Send());
    EXPECT_EQ(cloud_.GetErrorCode(), VFS_ERR_CLOUD_FAILED);
    EXPECT_EQ(server.Connections(), 0U);
}

TEST_F(RequestFrame, AQueryOfTheWrongTypeIsAFailureNotAnException) {
    const wire::WireServer server({});
    EXPECT_FALSE(Request(cloud_, kPretty).Get(server.Url()).Query(Object("[1]")).Send());
    EXPECT_EQ(cloud_.GetErrorCode(), VFS_ERR_CLOUD_FAILED);
    EXPECT_FALSE(
        Request(cloud_, kRenewing).Get(server.Url()).Query(Object(R"({"a":{"b":1}})")).Send());
    EXPECT_EQ(server.Connections(), 0U);
}

TEST_F(RequestFrame, FailingOnErrorsStaysInForceForLaterRequests) {
    const wire::WireServer server(Answers({wire::Answer(404, "first")}));
    EXPECT_FALSE(Request(cloud_, kRenewing).Get(server.Url()).FailOnError().Send());
    EXPECT_EQ(cloud_.GetError()["msg"], "");
    const wire::WireServer later(Answers({wire::Answer(404, "later")}));
    EXPECT_FALSE(Request(cloud_, kRenewing).Get(later.Url()).Send());
    EXPECT_EQ(cloud_.GetError()["msg"], "");
    EXPECT_EQ(cloud_.GetErrorCode(), VFS_ERR_NOT_FOUND);
}

TEST_F(RequestFrame, NoOtherProtocolThanHttpIsSpoken) {
    for (const char* url : {"file:///etc/passwd", "ftp://127.0.0.1/x", "dict://127.0.0.1/x"}) {
        EXPECT_FALSE(Request(cloud_, kRenewing).Get(url).Retries(0).Send()) << url;
        EXPECT_EQ(cloud_.GetError()["curl_code"], 1) << url;
        EXPECT_EQ(cloud_.GetAPIHandler()->GetResponse(), "") << url;
    }
}

}  // namespace
}  // namespace ZYROCloud
