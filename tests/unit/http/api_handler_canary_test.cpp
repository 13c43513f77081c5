// Nothing that a request was given, or has left, reaches the next user of its handle.
#include <cstring>

#include "unit/http/curl_seam.h"
#include "unit/http/http_fixture.h"

namespace ZYROCloud {
namespace {

using wire::Answer;
using wire::ReadRequest;
using wire::Script;
using wire::Send;

int calls = 0;

size_t CountBytes(char*, size_t size, size_t count, void*) {
    ++calls;
    return size * count;
}

int CountProgress(void*, curl_off_t, curl_off_t, curl_off_t, curl_off_t) {
    ++calls;
    return 0;
}

int CountDebug(CURL*, curl_infotype, char*, size_t, void*) {
    ++calls;
    return 0;
}

int CountSocket(void*, curl_socket_t, curlsocktype) {
    ++calls;
    return CURL_SOCKOPT_OK;
}

CURLcode CountContext(CURL*, void*, void*) {
    ++calls;
    return CURLE_ABORTED_BY_CALLBACK;
}

/** What one user leaves behind on purpose; all texts hold the word canary. */
struct Planted {
    explicit Planted(CURL* handle) : curl(handle) {
        list = curl_slist_append(nullptr, "X-Canary: 1");
        names = curl_slist_append(nullptr, "canary.example:80:127.0.0.1");
        routes = curl_slist_append(nullptr, "::canary.invalid:1");
    }
    Planted(const Planted&) = delete;
    Planted& operator=(const Planted&) = delete;
    ~Planted() {
        curl_slist_free_all(list);
        curl_slist_free_all(names);
        curl_slist_free_all(routes);
    }

    template <typename T>
    void Set(CURLoption option, T value) {
        EXPECT_EQ(curl_easy_setopt(curl, option, value), CURLE_OK) << option;
    }

    /** Goes to the wire with the first user's own request. */
    void Seen() {
        Set(CURLOPT_HTTPHEADER, list);
        Set(CURLOPT_USERPWD, "canary:canary");
        Set(CURLOPT_XOAUTH2_BEARER, "canary");
        Set(CURLOPT_COOKIE, "own=canary");
        Set(CURLOPT_COOKIEFILE, "");
        Set(CURLOPT_COOKIELIST, "Set-Cookie: list=canary; domain=127.0.0.1; path=/");
        Set(CURLOPT_REFERER, "http://canary.example/");
        Set(CURLOPT_USERAGENT, "canary");
        Set(CURLOPT_ACCEPT_ENCODING, "canary");
        Set(CURLOPT_HSTS_CTRL, static_cast<long>(CURLHSTS_ENABLE));
        Set(CURLOPT_VERBOSE, 1L);
        Set(CURLOPT_DEBUGFUNCTION, CountDebug);
        Set(CURLOPT_NOPROGRESS, 0L);
        Set(CURLOPT_XFERINFOFUNCTION, CountProgress);
        Set(CURLOPT_SOCKOPTFUNCTION, CountSocket);
    }

    /** Would spoil the first user's own request, but none was made behind it. */
    void Unseen() {
        Set(CURLOPT_PROXY, "http://canary.invalid:1");
        Set(CURLOPT_PROXYUSERPWD, "canary:canary");
        Set(CURLOPT_CONNECT_TO, routes);
        Set(CURLOPT_RESOLVE, names);
        Set(CURLOPT_INTERFACE, "canary");
        Set(CURLOPT_PINNEDPUBLICKEY, "sha256//canary");
        Set(CURLOPT_CAINFO, "/canary");
        Set(CURLOPT_SSL_CTX_FUNCTION, CountContext);
        Set(CURLOPT_URL, "http://canary.invalid/");
        Set(CURLOPT_CUSTOMREQUEST, "CANARY");
        Set(CURLOPT_RANGE, "1-2");
        Set(CURLOPT_COPYPOSTFIELDS, "canary");
        Set(CURLOPT_UPLOAD, 1L);
        Set(CURLOPT_NOBODY, 1L);
        Set(CURLOPT_WRITEFUNCTION, CountBytes);
        Set(CURLOPT_HEADERFUNCTION, CountBytes);
        Set(CURLOPT_READFUNCTION, CountBytes);
        Set(CURLOPT_ERRORBUFFER, error);
        Set(CURLOPT_PRIVATE, this);
    }

    CURL* curl;
    curl_slist *list = nullptr, *names = nullptr, *routes = nullptr;
    char error[CURL_ERROR_SIZE] = "";
};

class Canary : public testing::Test {
  protected:
    void SetUp() override {
        curl_seam::Now() = {};
        HandlePool::Instance().Empty();
        calls = 0;
    }
    void TearDown() override {
        curl_seam::Now() = {};
        HandlePool::Instance().Empty();
    }
};

/** Answers `requests` requests with a cookie and a header of its own. */
Script Serve(int requests) {
    Script script;
    for (int i = 0; i < requests; ++i) {
        script.push_back(ReadRequest());
        script.push_back(
            Send(Answer(200, "canary-body", "Set-Cookie: set=canary\r\nX-Left: canary\r\n")));
    }
    script.push_back(wire::ReadAll());
    return script;
}

std::string LastRequest(const wire::WireServer& server) {
    return server.Received().back();
}

TEST_F(Canary, TheNextUserSendsWhatTheFirstOfAllWouldHave) {
    const wire::WireServer server({Serve(2), Serve(1)});
    char error[CURL_ERROR_SIZE] = "";
    CURL* first = nullptr;
    {
        Conversation<> talk;
        first = talk.api.GetCurlHandler();
        Planted planted(first);
        talk.api.AddHeader("Authorization", "Bearer canary");
        talk.api.AddPostParam("name", "canary");
        planted.Seen();
        EXPECT_TRUE(talk.Get(server.Url()));
        EXPECT_THAT(LastRequest(server), HasSubstr("list=canary")) << "cookies are on";
        EXPECT_GT(calls, 0);
        planted.Unseen();
        curl_easy_setopt(first, CURLOPT_ERRORBUFFER, error);
    }
    calls = 0;
    error[0] = '\0';
    {
        Conversation<> talk;
        ASSERT_EQ(talk.api.GetCurlHandler(), first) << "the test needs the very handle";
        EXPECT_TRUE(talk.Get(server.Url())) << seams::LogDump();
        EXPECT_FALSE(talk.Get("http://127.0.0.1:" + std::to_string(tls::RefusedPort())));
    }
    const std::string second = LastRequest(server);
    EXPECT_EQ(server.Connections(), 1U) << "the connection is what stays";
    HandlePool::Instance().Empty();
    {
        Conversation<> talk;
        EXPECT_TRUE(talk.Get(server.Url()));
    }
    EXPECT_EQ(server.Connections(), 2U);
    EXPECT_EQ(second, LastRequest(server)) << "as from a handle that was never used";
    EXPECT_THAT(second, Not(HasSubstr("anary")));
    EXPECT_EQ(calls, 0) << "no function of the first user is called";
    EXPECT_STREQ(error, "") << "nor is its buffer written";
}

TEST_F(Canary, CookiesAreOffForTheNextUserEvenThoseOfItsOwn) {
    const wire::WireServer server({Serve(3)});
    {
        Conversation<> talk;
        curl_easy_setopt(talk.api.GetCurlHandler(), CURLOPT_COOKIEFILE, "");
        EXPECT_TRUE(talk.Get(server.Url()));
    }
    for (int i = 0; i < 2; ++i) {
        Conversation<> talk;
        EXPECT_TRUE(talk.Get(server.Url()));
        EXPECT_THAT(LastRequest(server), Not(HasSubstr("Cookie")));
    }
}

TEST_F(Canary, TheNextUserFindsNoAnswerOfTheFirst) {
    const wire::WireServer server({Serve(1)});
    {
        Conversation<> talk;
        EXPECT_TRUE(talk.Get(server.Url()));
        curl_easy_setopt(talk.api.GetCurlHandler(), CURLOPT_PRIVATE, this);
    }
    APIHandler api;
    CURL* const curl = api.GetCurlHandler();
    curl_header* header = nullptr;
    EXPECT_NE(curl_easy_header(curl, "X-Left", 0, CURLH_HEADER, -1, &header), CURLHE_OK);
    char* left = nullptr;
    EXPECT_EQ(curl_easy_getinfo(curl, CURLINFO_PRIVATE, &left), CURLE_OK);
    EXPECT_EQ(left, nullptr);
    long status = -1;
    EXPECT_EQ(curl_easy_getinfo(curl, CURLINFO_RESPONSE_CODE, &status), CURLE_OK);
    EXPECT_EQ(status, 0);
    curl_slist* cookies = nullptr;
    EXPECT_EQ(curl_easy_getinfo(curl, CURLINFO_COOKIELIST, &cookies), CURLE_OK);
    EXPECT_EQ(cookies, nullptr);
    EXPECT_EQ(api.GetResponse(), "");
    EXPECT_TRUE(api.GetHeaderResponse().empty());
}

TEST_F(Canary, AHandleThatWaitsHoldsNoShare) {
    CURLSH* share = curl_share_init();
    curl_share_setopt(share, CURLSHOPT_SHARE, CURL_LOCK_DATA_DNS);
    const wire::WireServer server({Serve(1)});
    {
        APIHandler api(share);
        api.SetErrorHandler(new BoxErrorHandler);
        EXPECT_TRUE(api.Init() && api.SetURL(server.Url(), false) && api.Process(0));
    }
    EXPECT_EQ(HandlePool::Instance().Idle(), 1U);
    EXPECT_EQ(curl_share_cleanup(share), CURLSHE_OK);
}

}  // namespace
}  // namespace ZYROCloud
