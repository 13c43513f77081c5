// Tokens, passwords and secrets reach the server and no log line.
#include "unit/http/curl_seam.h"
#include "unit/http/http_fixture.h"

namespace ZYROCloud {
namespace {

/** Every text that is planted below contains this. */
const std::string kCanary = "canary";

void ExpectNoCanary() {
    EXPECT_FALSE(seams::LogLines().empty()) << "the failures below are logged";
    EXPECT_FALSE(seams::LoggedPart(kCanary)) << seams::LogDump();
}

void Plant(APIHandler& api) {
    api.AddHeader(Parsed(R"({"Authorization":"Bearer canary-token","X-Arg":{"s":"canary-arg"}})"));
    api.AddPostParam("refresh_token", "canary-refresh");
    api.AddPostParam("client_secret", "canary-secret");
    api.AddGetParam("access_token", "canary-query");
    api.SetUserPwOpt("canary-user", "canary-password");
}

std::string WithSecrets(const std::string& url) {
    const size_t host = url.find("://") + 3;
    return url.substr(0, host) + "canary-user:canary-pw%40x@" + url.substr(host) +
           "?sig=canary-url";
}

class Secrets : public testing::Test {
  protected:
    void SetUp() override { curl_seam::Now() = {}; }
    void TearDown() override { curl_seam::Now() = {}; }
};

template <typename Errors>
void CheckStatuses() {
    const std::vector<int> statuses = {400, 401, 403, 404, 409, 420, 429, 500, 503, 507};
    std::vector<wire::Script> scripts;
    for (const int status : statuses) {
        scripts.push_back(Once(wire::Answer(status)));
    }
    const wire::WireServer server(scripts);
    for (const bool return_on_error : {true, false}) {
        for (size_t i = 0; i < statuses.size() / 2; ++i) {
            Conversation<Errors> talk(return_on_error);
            Plant(talk.api);
            EXPECT_FALSE(talk.Get(WithSecrets(server.Url("/path"))));
        }
    }
    EXPECT_THAT(server.ReceivedText(), HasSubstr("canary-token"));
    EXPECT_THAT(server.ReceivedText(), HasSubstr("canary-secret"));
    EXPECT_THAT(server.ReceivedText(), HasSubstr("canary-query"));
    EXPECT_THAT(server.ReceivedText(), HasSubstr("canary-url"));
    ExpectNoCanary();
}

TEST_F(Secrets, StayOutOfTheLogWhenAServiceRefuses) {
    CheckStatuses<GDriveErrorHandler>();
    CheckStatuses<OneDriveErrorHandler>();
    CheckStatuses<BoxErrorHandler>();
    CheckStatuses<DropboxErrorHandler>();
    CheckStatuses<DavErrorHandler>();
}

TEST_F(Secrets, StayOutOfTheLogWhenTheConnectionFails) {
    const wire::WireServer server({{wire::ReadRequest(), wire::Reset()}, {}});
    for (const std::string& url :
         {server.Url("/path"), server.Url("/path"), std::string("http://nohost.invalid/path"),
          "ftp://127.0.0.1:" + std::to_string(tls::RefusedPort()) + "/path"}) {
        Conversation<> talk;
        Plant(talk.api);
        EXPECT_FALSE(talk.Get(WithSecrets(url), 1));
        EXPECT_TRUE(seams::LoggedPart("Retry times: 2/2")) << seams::LogDump();
        ExpectNoCanary();
        seams::Reset();
    }
}

TEST_F(Secrets, StayOutOfTheLogWhenTheRequestCannotBeSetUp) {
    const char* url = "http://127.0.0.1/";
    for (const int option : {CURLOPT_HTTPHEADER, CURLOPT_URL, CURLOPT_POST, CURLOPT_COPYPOSTFIELDS,
                             CURLOPT_USERNAME, CURLOPT_PASSWORD}) {
        seams::Reset();
        Conversation<> talk;
        curl_seam::Now().refused = {{option, CURLE_OUT_OF_MEMORY}};
        Plant(talk.api);
        talk.Get(WithSecrets(url));
        curl_seam::Now() = {};
        ExpectNoCanary();
    }
    for (const char* headers : {R"({"Authorization":["canary"]})", R"({"A":"canary\r\ncanary"})",
                                R"({"canary\n":"x"})"}) {
        seams::Reset();
        Conversation<> talk;
        talk.api.AddHeader(Parsed(headers));
        EXPECT_FALSE(talk.Get(url));
        ExpectNoCanary();
    }
    seams::Reset();
    Conversation<> talk;
    talk.api.AddPostParam(Parsed(R"({"client_secret":{"canary":"canary"}})"));
    EXPECT_FALSE(talk.Get(url));
    ExpectNoCanary();
}

TEST_F(Secrets, StayOutOfTheLogInAForm) {
    FormUploadData form{nullptr, "", 0, Parsed(R"({"a":{"s":"canary"},"b":"canary"})")};
    Conversation<> talk;
    talk.api.SetFormUploadData(&form);
    EXPECT_FALSE(talk.Get("http://127.0.0.1/"));
    ExpectNoCanary();
}

}  // namespace
}  // namespace ZYROCloud
