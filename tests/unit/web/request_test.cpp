#include "request.h"

#include <gmock/gmock.h>

#include <cstdlib>

#include "failure.h"

namespace {

using testing::ElementsAre;
using web::CheckOrigin;
using web::ReadRequest;
using web::Request;
using web::Unescape;

int StatusOf(const std::function<void()>& call) {
    try {
        call();
    } catch (const web::Failure& failure) {
        return failure.Status();
    }
    return 200;
}

class WebRequest : public testing::Test {
  protected:
    void SetUp() override {
        for (const char* name : {"QUERY_STRING", "CONTENT_LENGTH", "HTTP_HOST", "HTTP_ORIGIN",
                                 "HTTP_X_ZYROVFS_REQUEST", "REQUEST_SCHEME", "HTTPS"}) {
            unsetenv(name);
        }
    }
    static void Set(const char* name, const std::string& value) { setenv(name, value.c_str(), 1); }
};

TEST_F(WebRequest, EscapesAreUndoneOnce) {
    EXPECT_EQ(Unescape("a%20b+c%2f%25%C3%BC"), "a b c/%ü");
    for (const char* broken : {"%", "%1", "%zz", "%0", "%00", "a%00b"}) {
        EXPECT_EQ(StatusOf([&] { Unescape(broken); }), 400) << broken;
    }
}

TEST_F(WebRequest, TheQueryKeepsAllValuesOfAName) {
    Set("QUERY_STRING", "path=%2Fa&x&path=%2Fb&=y&path=");
    const Request request = ReadRequest();
    EXPECT_THAT(request.Parameters("path"), ElementsAre("/a", "/b", ""));
    EXPECT_EQ(request.Parameter("path"), "/a");
    EXPECT_EQ(request.Parameter("none", "otherwise"), "otherwise");
    EXPECT_EQ(StatusOf([&] { request.Parameter("none"); }), 400);
    Set("QUERY_STRING", std::string(40000, 'a'));
    EXPECT_EQ(StatusOf([] { ReadRequest(); }), 414);
}

TEST_F(WebRequest, ALengthIsANumberThatCanBeOrIsRefused) {
    EXPECT_EQ(ReadRequest().length, -1);
    Set("CONTENT_LENGTH", "9223372036854775807");
    EXPECT_EQ(ReadRequest().length, 9223372036854775807LL);
    for (const char* length : {"-1", "9223372036854775808", "x", "1x", " 1", "+1", "1e3"}) {
        Set("CONTENT_LENGTH", length);
        EXPECT_EQ(StatusOf([] { ReadRequest(); }), 400) << length;
    }
}

TEST_F(WebRequest, OnlyThePageOfThisHostMayChangeAnything) {
    Set("HTTP_HOST", "box:8443");
    Set("HTTP_ORIGIN", "https://box:8443");
    Set("HTTP_X_ZYROVFS_REQUEST", "1");
    Set("HTTPS", "on");
    EXPECT_EQ(StatusOf(CheckOrigin), 200);
    for (const char* origin : {"http://box:8443", "https://box", "https://box:8443.evil", "null",
                               "", "https://evil", "https://box:8443/"}) {
        Set("HTTP_ORIGIN", origin);
        EXPECT_EQ(StatusOf(CheckOrigin), 403) << origin;
    }
    Set("HTTP_ORIGIN", "https://box:8443");
    Set("HTTP_X_ZYROVFS_REQUEST", "2");
    EXPECT_EQ(StatusOf(CheckOrigin), 403);
    Set("HTTP_X_ZYROVFS_REQUEST", "1");
    Set("HTTP_HOST", "");
    Set("HTTP_ORIGIN", "https://");
    EXPECT_EQ(StatusOf(CheckOrigin), 403);
}

}  // namespace
