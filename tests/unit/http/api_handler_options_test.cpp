#include <zosplatform/device.h>

#include "core/paths.h"
#include "unit/http/curl_seam.h"
#include "unit/http/http_fixture.h"

namespace {
bool agent_fails = false;
}

// The library asks the platform for the user agent; here it asks this.
extern "C" int YLIBDsinfoUserAgentGet(const char* product, char* buffer, int size) {
    snprintf(buffer, static_cast<size_t>(size), "%s/test", product);
    return agent_fails ? -1 : 0;
}

namespace ZYROCloud {
namespace {

class Options : public testing::Test {
  protected:
    void SetUp() override {
        curl_seam::Now() = {};
        agent_fails = false;
    }
    void TearDown() override { curl_seam::Now() = {}; }
};

long Only(int option) {
    const std::vector<long> values = curl_seam::Values(option);
    EXPECT_EQ(values.size(), 1U) << option;
    return values.empty() ? -1 : values[0];
}

const char* Text(long value) {
    return reinterpret_cast<const char*>(value);
}

const std::vector<int> kOrder = {
    CURLOPT_USERAGENT,      CURLOPT_LOW_SPEED_LIMIT,  CURLOPT_LOW_SPEED_TIME,
    CURLOPT_CONNECTTIMEOUT, CURLOPT_TCP_KEEPALIVE,    CURLOPT_TCP_KEEPINTVL,
    CURLOPT_TCP_KEEPIDLE,   CURLOPT_SSL_VERIFYPEER,   CURLOPT_SSL_VERIFYHOST,
    CURLOPT_CAPATH,         CURLOPT_HEADERFUNCTION,   CURLOPT_HEADERDATA,
    CURLOPT_WRITEFUNCTION,  CURLOPT_WRITEDATA,        CURLOPT_FAILONERROR,
    CURLOPT_FOLLOWLOCATION, CURLOPT_DNS_CACHE_TIMEOUT};

TEST_F(Options, InitSetsTheSameOptionsForAllRequestsInOrder) {
    Conversation<> talk;
    std::vector<int> order;
    for (const curl_seam::Call& call : curl_seam::Now().calls) {
        order.push_back(call.option);
    }
    ASSERT_GE(order.size(), kOrder.size());
    EXPECT_EQ(std::vector<int>(order.begin(), order.begin() + static_cast<long>(kOrder.size())),
              kOrder);
    EXPECT_EQ(Only(CURLOPT_LOW_SPEED_LIMIT), 16);
    EXPECT_EQ(Only(CURLOPT_LOW_SPEED_TIME), 270);
    EXPECT_EQ(Only(CURLOPT_CONNECTTIMEOUT), 90);
    EXPECT_EQ(Only(CURLOPT_TCP_KEEPALIVE), 1);
    EXPECT_EQ(Only(CURLOPT_TCP_KEEPINTVL), 30);
    EXPECT_EQ(Only(CURLOPT_TCP_KEEPIDLE), 30);
    EXPECT_EQ(Only(CURLOPT_SSL_VERIFYPEER), 1);
    EXPECT_EQ(Only(CURLOPT_SSL_VERIFYHOST), 2);
    EXPECT_STREQ(Text(Only(CURLOPT_CAPATH)), "/etc/ssl/certs/ca-certificates.crt");
    EXPECT_EQ(Only(CURLOPT_FAILONERROR), 1);
    EXPECT_EQ(Only(CURLOPT_FOLLOWLOCATION), 1);
    EXPECT_EQ(Only(CURLOPT_DNS_CACHE_TIMEOUT), 269);
    EXPECT_GE(Only(CURLOPT_UPLOAD_BUFFERSIZE), 131072 + 65536);
    EXPECT_GE(Only(CURLOPT_BUFFERSIZE), 131072);
    EXPECT_THAT(curl_seam::Values(CURLOPT_SHARE), IsEmpty());
}

TEST_F(Options, ReturnOnErrorIsInForceFromTheNextInitOnAndStays) {
    Conversation<> talk;
    talk.api.SetReturnOnError(false);
    EXPECT_TRUE(talk.api.Init());
    EXPECT_TRUE(talk.api.Init());
    EXPECT_THAT(curl_seam::Values(CURLOPT_FAILONERROR), ElementsAre(1, 0, 0));
}

TEST_F(Options, TheShareOfTheConstructorOrOfTheSetterIsUsed) {
    CURLSH* share = curl_share_init();
    {
        APIHandler api(share);
        EXPECT_TRUE(api.Init());
        EXPECT_EQ(Only(CURLOPT_SHARE), reinterpret_cast<long>(share));
        curl_seam::Now() = {};
        APIHandler other;
        EXPECT_FALSE(other.SetShareCurlHandler(nullptr));
        EXPECT_TRUE(seams::Logged("curl handler or share handler is null"));
        EXPECT_TRUE(other.SetShareCurlHandler(share));
        EXPECT_TRUE(other.Init());
        EXPECT_EQ(Only(CURLOPT_SHARE), reinterpret_cast<long>(share));
    }
    EXPECT_EQ(curl_share_cleanup(share), CURLSHE_OK) << "no handle holds it any more";
}

TEST_F(Options, TheFirstOptionThatCurlRefusesEndsInitWithTheMeaningOfItsCode) {
    for (const int option : kOrder) {
        seams::Reset();
        curl_seam::Now() = {};
        curl_seam::Now().refused[option] = CURLE_COULDNT_CONNECT;
        APIHandler api;
        api.SetErrorHandler(new BoxErrorHandler);
        EXPECT_FALSE(api.Init()) << option;
        EXPECT_EQ(api.GetError()["code"].asInt(), VFS_ERR_CONNECT_FAILED) << option;
        EXPECT_EQ(curl_seam::Now().calls.back().option, option) << "nothing is set behind it";
    }
}

TEST_F(Options, RefusedOptionsAreLoggedByStep) {
    const struct {
        int option;
        const char* what;
    } rows[] = {
        {CURLOPT_USERAGENT, "time-out"},      {CURLOPT_LOW_SPEED_LIMIT, "time-out"},
        {CURLOPT_LOW_SPEED_TIME, "time-out"}, {CURLOPT_CONNECTTIMEOUT, "time-out"},
        {CURLOPT_TCP_KEEPALIVE, "keepalive"}, {CURLOPT_TCP_KEEPINTVL, "keepalive"},
        {CURLOPT_TCP_KEEPIDLE, "keepalive"},  {CURLOPT_DNS_CACHE_TIMEOUT, "dns cache timeout"}};
    for (const auto& row : rows) {
        seams::Reset();
        curl_seam::Now().refused = {{row.option, CURLE_OUT_OF_MEMORY}};
        APIHandler api;
        EXPECT_FALSE(api.Init());
        EXPECT_TRUE(seams::Logged("Failed to set " + std::string(row.what) +
                                  ", return value=27, err=Out of memory"))
            << seams::LogDump();
    }
}

TEST_F(Options, WithoutAUserAgentInitFailsAsNotSupported) {
    agent_fails = true;
    YLIBCErrSetEx(0x2a00, "device.cpp", 12);
    APIHandler api;
    api.SetErrorHandler(new BoxErrorHandler);
    EXPECT_FALSE(api.Init());
    EXPECT_TRUE(seams::Logged("Failed to get UserAgent [0x2A00 device.cpp:12]"))
        << seams::LogDump();
    EXPECT_EQ(api.GetError()["code"].asInt(), VFS_ERR_NOT_SUPPORTED);
    EXPECT_EQ(api.GetError()["curl_code"].asInt(), 2);
}

TEST_F(Options, TheUserAgentIsThePlatforms) {
    const wire::WireServer server({Once(wire::Answer(200))});
    Conversation<> talk;
    EXPECT_TRUE(talk.Get(server.Url()));
    EXPECT_THAT(server.ReceivedText(), HasSubstr("User-Agent: fileharbor/test\r\n"));
}

TEST_F(Options, DirectSettersSetTheirOption) {
    Conversation<> talk;
    APIHandler& api = talk.api;
    curl_seam::Now() = {};
    EXPECT_TRUE(api.SetUploadSize(5LL << 32));
    EXPECT_TRUE(api.SetUserPwOpt("amy", "pw"));
    EXPECT_TRUE(api.SetFTPEPSV(false));
    EXPECT_TRUE(api.SetFTPCWD(true));
    EXPECT_TRUE(api.SetRange("1-2"));
    EXPECT_TRUE(api.SetNoBody(true));
    EXPECT_EQ(Only(CURLOPT_INFILESIZE_LARGE), 5LL << 32);
    EXPECT_EQ(Only(CURLOPT_HTTPAUTH), 0xffffffefL);
    EXPECT_EQ(Only(CURLOPT_FTP_USE_EPSV), 0);
    EXPECT_EQ(Only(CURLOPT_FTP_FILEMETHOD), 3);
    EXPECT_EQ(Only(CURLOPT_NOBODY), 1);
    EXPECT_EQ(curl_seam::Values(CURLOPT_USERNAME).size(), 1U);
    EXPECT_EQ(curl_seam::Values(CURLOPT_PASSWORD).size(), 1U);
    EXPECT_EQ(curl_seam::Values(CURLOPT_RANGE).size(), 1U);
    EXPECT_TRUE(api.SetFTPCWD(false));
    EXPECT_THAT(curl_seam::Values(CURLOPT_FTP_FILEMETHOD), ElementsAre(3, 1));
}

TEST_F(Options, SettersWithNothingToSetDoNothing) {
    Conversation<> talk;
    curl_seam::Now() = {};
    EXPECT_TRUE(talk.api.SetRange(""));
    EXPECT_TRUE(talk.api.SetWriteFunAndData(nullptr, nullptr));
    EXPECT_TRUE(talk.api.SetReadFunAndData(nullptr, nullptr));
    EXPECT_TRUE(talk.api.SetHeaderFunAndData(nullptr, nullptr));
    EXPECT_TRUE(talk.api.SetSeekFunAndData(nullptr, nullptr));
    curl_slist* none = nullptr;
    EXPECT_TRUE(talk.api.SetCodePage("UTF-8", nullptr));
    EXPECT_TRUE(talk.api.SetCodePage("UTF-8", &none));
    EXPECT_TRUE(curl_seam::Now().calls.empty());
}

size_t Count(char*, size_t size, size_t count, void* total) {
    *static_cast<size_t*>(total) += size * count;
    return size * count;
}

TEST_F(Options, FunctionAndDataCanBeSetApart) {
    const wire::WireServer server({Once(wire::Answer(200, "12345"))});
    Conversation<> talk;
    size_t body = 0;
    size_t head = 0;
    EXPECT_TRUE(talk.api.SetWriteFunAndData(Count, nullptr));
    EXPECT_TRUE(talk.api.SetWriteFunAndData(nullptr, &body));
    EXPECT_TRUE(talk.api.SetHeaderFunAndData(Count, &head));
    EXPECT_TRUE(talk.Get(server.Url()));
    EXPECT_EQ(body, 5U);
    EXPECT_EQ(head, wire::Answer(200, "12345").size() - 5);
    EXPECT_EQ(talk.api.GetResponse(), "");
}

TEST_F(Options, ASetterThatCurlRefusesFailsWithTheMeaningOfTheCode) {
    Conversation<> talk;
    APIHandler& api = talk.api;
    curl_slist* list = curl_slist_append(nullptr, "NOOP");
    const std::vector<std::pair<int, std::function<bool()>>> rows = {
        {CURLOPT_WRITEFUNCTION, [&] { return api.SetWriteFunAndData(Count, nullptr); }},
        {CURLOPT_WRITEDATA, [&] { return api.SetWriteFunAndData(nullptr, &api); }},
        {CURLOPT_READFUNCTION, [&] { return api.SetReadFunAndData(Count, nullptr); }},
        {CURLOPT_READDATA, [&] { return api.SetReadFunAndData(nullptr, &api); }},
        {CURLOPT_HEADERFUNCTION, [&] { return api.SetHeaderFunAndData(Count, nullptr); }},
        {CURLOPT_HEADERDATA, [&] { return api.SetHeaderFunAndData(nullptr, &api); }},
        {CURLOPT_SEEKDATA, [&] { return api.SetSeekFunAndData(nullptr, &api); }},
        {CURLOPT_UPLOAD, [&] { return api.SetUploadOpt(true); }},
        {CURLOPT_WRITEFUNCTION, [&] { return api.SetUploadOpt(false); }},
        {CURLOPT_INFILESIZE_LARGE, [&] { return api.SetUploadSize(1); }},
        {CURLOPT_HTTPAUTH, [&] { return api.SetUserPwOpt("a", "b"); }},
        {CURLOPT_USERNAME, [&] { return api.SetUserPwOpt("a", "b"); }},
        {CURLOPT_PASSWORD, [&] { return api.SetUserPwOpt("a", "b"); }},
        {CURLOPT_QUOTE, [&] { return api.SetCodePage("", &list); }},
        {CURLOPT_FTP_USE_EPSV, [&] { return api.SetFTPEPSV(true); }},
        {CURLOPT_FTP_FILEMETHOD, [&] { return api.SetFTPCWD(true); }},
        {CURLOPT_RANGE, [&] { return api.SetRange("0-1"); }},
        {CURLOPT_NOBODY, [&] { return api.SetNoBody(true); }},
    };
    for (const auto& [option, set] : rows) {
        seams::Reset();
        api.ParseCurlError(CURLE_OK);
        curl_seam::Now().refused = {{option, CURLE_COULDNT_CONNECT}};
        EXPECT_FALSE(set()) << option;
        EXPECT_EQ(talk.Code(), VFS_ERR_CONNECT_FAILED) << option;
        EXPECT_TRUE(seams::LoggedPart("return value=7, err=")) << option;
        curl_seam::Now().refused = {};
        EXPECT_TRUE(set()) << option;
    }
    curl_slist_free_all(list);
}

}  // namespace
}  // namespace ZYROCloud
