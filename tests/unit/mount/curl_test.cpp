#include "mount/curl.h"

#include <dlfcn.h>
#include <gtest/gtest.h>

#include <cstdarg>
#include <map>
#include <vector>

#include "mount/cert_info.h"
#include "support/seams.h"
#include "support/test_certs.h"
#include "zyrovfs/utils.h"

namespace {

/** What reaches libcurl. Nothing goes out: each conversation ends with the next planned code. */
struct Wire {
    std::map<CURLoption, long> numbers;
    std::map<CURLoption, std::string> texts;
    std::vector<long> resolve;
    std::vector<CURLcode> plan;
    size_t conversations = 0;
    CURLoption refused = CURLOPT_LASTENTRY;
    int user_agent_result = 0;
};
Wire wire;

}  // namespace

extern "C" {

#undef curl_easy_setopt
CURLcode curl_easy_setopt(CURL* curl, CURLoption option, ...) {
    using Real = CURLcode (*)(CURL*, CURLoption, ...);
    static const Real real = reinterpret_cast<Real>(dlsym(RTLD_NEXT, "curl_easy_setopt"));
    va_list args;
    va_start(args, option);
    const long number = va_arg(args, long);
    va_end(args);
    if (option == wire.refused) {
        return CURLE_UNKNOWN_OPTION;
    }
    if (option >= CURLOPTTYPE_FUNCTIONPOINT || option < CURLOPTTYPE_OBJECTPOINT) {
        wire.numbers[option] = number;
        if (option == CURLOPT_IPRESOLVE) {
            wire.resolve.push_back(number);
        }
    } else if (option == CURLOPT_URL || option == CURLOPT_USERNAME || option == CURLOPT_PASSWORD ||
               option == CURLOPT_USERAGENT || option == CURLOPT_CAINFO) {
        wire.texts[option] = reinterpret_cast<const char*>(number);
    }
    return real(curl, option, number);
}

CURLcode curl_easy_perform(CURL*) {
    const size_t turn = wire.conversations++;
    return turn < wire.plan.size() ? wire.plan[turn] : CURLE_OK;
}

int YLIBDsinfoUserAgentGet(const char* product, char* buffer, int size) {
    snprintf(buffer, static_cast<size_t>(size), "%s/1.0 (room %d)", product, size);
    return wire.user_agent_result;
}

}  // extern "C"

namespace ZYROVFS {
namespace {

class Curl : public testing::Test {
  protected:
    void SetUp() override {
        wire = Wire();
        ResetError();
    }

    static std::string Escape(const std::string& url) {
        std::string out = "untouched";
        EXPECT_TRUE(Utils::CurlURLEscape(url, out)) << url;
        return out;
    }
    static bool Perform(std::vector<CURLcode> plan) {
        wire.plan = std::move(plan);
        const UniqueCurl curl(curl_easy_init());
        return PerformCurl(curl.get(), "https://nas.example/dav");
    }
};

using CurlEscape = Curl;

TEST_F(CurlEscape, AUrlWithoutSchemeIsRefused) {
    std::string out = "untouched";
    EXPECT_FALSE(Utils::CurlURLEscape("nas.example/dav", out));
    EXPECT_EQ(out, "untouched");
    EXPECT_TRUE(seams::Logged("Failed to find :// from nas.example/dav"));
    EXPECT_FALSE(Utils::CurlURLEscape("", out));
}

TEST_F(CurlEscape, AUrlWithoutPathStaysAsItIs) {
    EXPECT_EQ(Escape("https://nas.example:5006"), "https://nas.example:5006");
    EXPECT_EQ(Escape("https://na s.example"), "https://na s.example");
    EXPECT_EQ(Escape("://"), "://");
}

TEST_F(CurlEscape, SpacesUtf8AndPercentSignsOfThePathAreEscaped) {
    EXPECT_EQ(Escape("https://h/my files/\xC3\xA9t\xC3\xA9/50%25"),
              "https://h/my%20files/%C3%A9t%C3%A9/50%2525");
    EXPECT_EQ(Escape("https://h/a?b=c&d#e"), "https://h/a%3Fb%3Dc%26d%23e");
    EXPECT_EQ(Escape("https://h/\xFF\x01\"<>"), "https://h/%FF%01%22%3C%3E");
}

TEST_F(CurlEscape, EmptyPartsAndSlashesKeepTheirPlaces) {
    EXPECT_EQ(Escape("https://h/"), "https://h/");
    EXPECT_EQ(Escape("https://h//a///b/"), "https://h//a///b/");
    EXPECT_EQ(Escape("https://h/a://b"), "https://h/a%3A//b");
}

TEST_F(CurlEscape, ANulByteInThePathIsEscapedLikeAnyOther) {
    EXPECT_EQ(Escape(std::string("https://h/a\0b", 13)), "https://h/a%00b");
}

TEST_F(CurlEscape, ALongPathIsEscapedWhole) {
    std::string expected = "https://h/";
    for (int i = 0; i < 100000; ++i) {
        expected += "%20";
    }
    EXPECT_EQ(Escape("https://h/" + std::string(100000, ' ')), expected);
}

TEST_F(CurlEscape, TheResultMayBeTheArgument) {
    std::string url = "https://h/a b";
    EXPECT_TRUE(Utils::CurlURLEscape(url, url));
    EXPECT_EQ(url, "https://h/a%20b");
}

using CurlSetup = Curl;

TEST_F(CurlSetup, AllConversationsShareTheirLimits) {
    const UniqueCurl curl = NewCurl();
    ASSERT_NE(curl, nullptr);
    EXPECT_EQ(wire.numbers[CURLOPT_FAILONERROR], 1);
    EXPECT_EQ(wire.numbers[CURLOPT_FOLLOWLOCATION], 1);
    EXPECT_EQ(wire.numbers[CURLOPT_LOW_SPEED_LIMIT], 16);
    EXPECT_EQ(wire.numbers[CURLOPT_LOW_SPEED_TIME], 60);
    EXPECT_EQ(wire.numbers[CURLOPT_CONNECTTIMEOUT], 90);
    EXPECT_EQ(wire.texts[CURLOPT_USERAGENT], "fileharbor/1.0 (room 512)");
}

TEST_F(CurlSetup, WithoutAUserAgentTheHandleGoesOn) {
    wire.user_agent_result = -1;
    const UniqueCurl curl = NewCurl();
    ASSERT_NE(curl, nullptr);
    EXPECT_EQ(wire.texts.count(CURLOPT_USERAGENT), 0U);
    EXPECT_EQ(wire.numbers[CURLOPT_FAILONERROR], 1);
    EXPECT_TRUE(seams::LoggedPart("Failed to get UserAgent")) << seams::LogDump();
    EXPECT_EQ(GetError(), VFS_ERR_NONE);
}

TEST_F(CurlSetup, AnOptionThatIsRefusedIsAFailure) {
    wire.refused = CURLOPT_FAILONERROR;
    EXPECT_EQ(NewCurl(), nullptr);
    EXPECT_EQ(GetError(), VFS_ERR_FAILED);
    EXPECT_TRUE(seams::LoggedPart("Failed to set curl option")) << seams::LogDump();
}

TEST_F(CurlSetup, TheBodyIsThrownAwayWhole) {
    const UniqueCurl curl = NewCurl();
    using Write = size_t (*)(char*, size_t, size_t, void*);
    const auto write = reinterpret_cast<Write>(wire.numbers[CURLOPT_WRITEFUNCTION]);
    ASSERT_NE(write, nullptr);
    EXPECT_EQ(write(nullptr, 3, 7, nullptr), 21U);
    EXPECT_EQ(write(nullptr, 1, 0, nullptr), 0U);
}

TEST_F(CurlSetup, VerificationIsBothChecksAgainstTheBundleOrNone) {
    const UniqueCurl curl(curl_easy_init());
    ASSERT_TRUE(SetCurlVerification(curl.get(), true));
    EXPECT_EQ(wire.numbers[CURLOPT_SSL_VERIFYPEER], 1);
    EXPECT_EQ(wire.numbers[CURLOPT_SSL_VERIFYHOST], 2);
    EXPECT_EQ(wire.texts[CURLOPT_CAINFO], "/etc/ssl/certs/ca-certificates.crt");
    wire.texts.clear();
    ASSERT_TRUE(SetCurlVerification(curl.get(), false));
    EXPECT_EQ(wire.numbers[CURLOPT_SSL_VERIFYPEER], 0);
    EXPECT_EQ(wire.numbers[CURLOPT_SSL_VERIFYHOST], 0);
    EXPECT_EQ(wire.texts.count(CURLOPT_CAINFO), 0U);
}

TEST_F(CurlSetup, CredentialsAreSetWhenNotEmpty) {
    const UniqueCurl curl(curl_easy_init());
    ASSERT_TRUE(SetCurlTarget(curl.get(), "dom\\am\xC3\xA9lie", "p:w @/%", "https://h/a b"));
    EXPECT_EQ(wire.texts[CURLOPT_URL], "https://h/a%20b");
    EXPECT_EQ(wire.texts[CURLOPT_USERNAME], "dom\\am\xC3\xA9lie");
    EXPECT_EQ(wire.texts[CURLOPT_PASSWORD], "p:w @/%");
}

TEST_F(CurlSetup, EmptyAndNullCredentialsAreLeftOut) {
    const UniqueCurl curl(curl_easy_init());
    ASSERT_TRUE(SetCurlTarget(curl.get(), "", nullptr, "https://h/"));
    EXPECT_EQ(wire.texts.count(CURLOPT_USERNAME), 0U);
    EXPECT_EQ(wire.texts.count(CURLOPT_PASSWORD), 0U);
}

TEST_F(CurlSetup, AUrlThatCannotBeEscapedIsUsedAsItIs) {
    const UniqueCurl curl(curl_easy_init());
    ASSERT_TRUE(SetCurlTarget(curl.get(), nullptr, nullptr, "no scheme/a b"));
    EXPECT_EQ(wire.texts[CURLOPT_URL], "no scheme/a b");
    EXPECT_TRUE(seams::Logged("Failed to escape url no scheme/a b")) << seams::LogDump();
}

using CurlPerform = Curl;

TEST_F(CurlPerform, SuccessLeavesTheCellAlone) {
    SetErr(VFS_ERR_BUSY);
    EXPECT_TRUE(Perform({CURLE_OK}));
    EXPECT_EQ(GetError(), VFS_ERR_BUSY);
    EXPECT_EQ(wire.resolve, std::vector<long>{0});
}

TEST_F(CurlPerform, EveryCurlCodeHasItsFailureCode) {
    const std::map<int, int> told = {
        {5, VFS_ERR_HOST_UNREACHABLE},  {6, VFS_ERR_HOST_UNREACHABLE},
        {7, VFS_ERR_HOST_UNREACHABLE},  {28, VFS_ERR_HOST_UNREACHABLE},
        {35, VFS_ERR_HOST_UNREACHABLE}, {9, VFS_ERR_ACCESS_DENIED},
        {67, VFS_ERR_ACCESS_DENIED},    {51, VFS_ERR_CERT_UNTRUSTED},
        {60, VFS_ERR_CERT_UNTRUSTED},
    };
    for (int code = 1; code < CURL_LAST; ++code) {
        if (code == CURLE_HTTP_RETURNED_ERROR) {
            continue;  // an answer
        }
        wire = Wire();
        seams::Reset();
        ResetError();
        EXPECT_FALSE(Perform({static_cast<CURLcode>(code), static_cast<CURLcode>(code)}));
        const auto row = told.find(code);
        EXPECT_EQ(GetError(), row == told.end() ? VFS_ERR_FAILED : row->second) << code;
        const std::string line = "https://nas.example/dav, code=" + std::to_string(code) +
                                 ", err=" + curl_easy_strerror(static_cast<CURLcode>(code));
        EXPECT_EQ(seams::Logged(line), GetError() != VFS_ERR_CERT_UNTRUSTED) << line;
    }
}

TEST_F(CurlPerform, AnAnswerIsASuccessWhateverItsStatus) {
    EXPECT_TRUE(Perform({CURLE_HTTP_RETURNED_ERROR}));
    EXPECT_EQ(GetError(), VFS_ERR_NONE);
}

TEST_F(CurlPerform, ANameThatDoesNotResolveIsTriedOnceMoreOverIpv4) {
    for (const CURLcode code : {CURLE_COULDNT_RESOLVE_PROXY, CURLE_COULDNT_RESOLVE_HOST}) {
        wire = Wire();
        EXPECT_TRUE(Perform({code, CURLE_OK}));
        EXPECT_EQ(wire.conversations, 2U);
        EXPECT_EQ(wire.resolve, (std::vector<long>{0, 1}));
    }
}

TEST_F(CurlPerform, TheSecondAttemptIsTheLast) {
    EXPECT_FALSE(Perform({CURLE_COULDNT_RESOLVE_HOST, CURLE_COULDNT_RESOLVE_HOST, CURLE_OK}));
    EXPECT_EQ(wire.conversations, 2U);
    EXPECT_EQ(GetError(), VFS_ERR_HOST_UNREACHABLE);
}

TEST_F(CurlPerform, TheSecondAttemptDecidesTheCode) {
    EXPECT_FALSE(Perform({CURLE_COULDNT_RESOLVE_HOST, CURLE_LOGIN_DENIED}));
    EXPECT_EQ(GetError(), VFS_ERR_ACCESS_DENIED);
}

TEST_F(CurlPerform, OtherFailuresAreNotRepeated) {
    EXPECT_FALSE(Perform({CURLE_COULDNT_CONNECT, CURLE_OK}));
    EXPECT_EQ(wire.conversations, 1U);
}

TEST_F(CurlPerform, AnUntrustedCertificateIsLeftAsDetail) {
    tls::CertSpec spec;
    spec.common_names = {"nas.example"};
    KeepCertificate(tls::Parse(tls::Make(spec).certificate).get());
    for (const int code : {51, 60}) {
        VFSSetJson(Json::Value());
        wire = Wire();
        EXPECT_FALSE(Perform({static_cast<CURLcode>(code)}));
        Json::Value detail;
        VFSGetJson(detail);
        EXPECT_EQ(detail["subject"], "nas.example");
    }
}

TEST_F(CurlPerform, OtherFailuresLeaveTheDetailAlone) {
    VFSSetJson("before");
    EXPECT_FALSE(Perform({CURLE_COULDNT_CONNECT}));
    Json::Value detail;
    VFSGetJson(detail);
    EXPECT_EQ(detail, "before");
}

}  // namespace
}  // namespace ZYROVFS
