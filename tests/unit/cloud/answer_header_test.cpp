#include "cloud/answer_header.h"

#include <gtest/gtest.h>

#include "support/seams.h"
#include "support/wire_server.h"

namespace ZYROCloud {
namespace {

TEST(AnswerHeader, IsFoundInAnyCase) {
    const wire::WireServer server(
        {{wire::ReadRequest(),
          wire::Send(
              wire::Answer(200, "", "LOCATION: http://x/\r\nrange: bytes=0-4\r\nX-Empty: \r\n"))}});
    APIHandler api;
    api.SetErrorHandler(new BoxErrorHandler);
    ASSERT_TRUE(api.Init());
    EXPECT_EQ(AnswerHeader(api, "Location"), "");
    api.SetURL(server.Url(), false);
    ASSERT_TRUE(api.Process(0));
    EXPECT_EQ(AnswerHeader(api, "Location"), "http://x/");
    EXPECT_EQ(AnswerHeader(api, "Range"), "bytes=0-4");
    EXPECT_EQ(AnswerHeader(api, "X-Empty"), "");
    EXPECT_EQ(AnswerHeader(api, "Loc"), "");
}

TEST(AnswerHeader, IsThatOfTheLastAnswerAndNotOfARedirectionBeforeIt) {
    const wire::WireServer last(
        {{wire::ReadRequest(), wire::Send(wire::Answer(200, "", "x-size: 7\r\n"))},
         {wire::ReadRequest(), wire::Send(wire::Answer(200))}});
    for (const char* text : {"7", ""}) {
        const wire::WireServer first(
            {{wire::ReadRequest(),
              wire::Send(wire::Answer(302, "", "X-Size: 3\r\nLocation: " + last.Url() + "\r\n"))}});
        APIHandler api;
        api.SetErrorHandler(new BoxErrorHandler);
        ASSERT_TRUE(api.Init());
        api.SetURL(first.Url(), false);
        ASSERT_TRUE(api.Process(0));
        EXPECT_EQ(AnswerHeader(api, "X-Size"), text);
        ASSERT_TRUE(api.Init());
        EXPECT_EQ(AnswerHeader(api, "X-Size"), "") << "nothing has been asked";
    }
}

TEST(AnswerStatus, OfTwoHundredsAloneMeansStored) {
    for (const int status : {200, 201, 204, 299, 304, 308, 400, 503}) {
        const wire::WireServer server({{wire::ReadRequest(), wire::Send(wire::Answer(status))}});
        APIHandler api;
        api.SetErrorHandler(new BoxErrorHandler);
        api.SetReturnOnError(false);
        ASSERT_TRUE(api.Init());
        EXPECT_EQ(AnswerStatus(api), 0);
        EXPECT_FALSE(IsStored(api));
        api.SetURL(server.Url(), false);
        EXPECT_EQ(api.Process(0), status < 400);
        EXPECT_EQ(AnswerStatus(api), status);
        EXPECT_EQ(IsStored(api), status < 300) << status;
    }
    const APIHandler none;
    EXPECT_EQ(AnswerStatus(none), 0);
}

}  // namespace
}  // namespace ZYROCloud
