#include "cloud/answer_header.h"

#include <gtest/gtest.h>

#include "support/wire_server.h"

namespace ZYROCloud {
namespace {

TEST(AnswerHeader, IsFoundInAnyCase) {
    const wire::WireServer server(
        {{wire::ReadRequest(),
          wire::Send(
              wire::Answer(200, "", "LOCATION: http://x/\r\nrange: bytes=0-4\r\nX-Empty: \r\n"))}});
    APIHandler api;
    api.SetErrorHandler(new ZYROCloud::BoxErrorHandler);
    ASSERT_TRUE(api.Init());
    EXPECT_EQ(AnswerHeader(api, "Location"), "");
    api.SetURL(server.Url(), false);
    ASSERT_TRUE(api.Process(0));
    EXPECT_EQ(AnswerHeader(api, "Location"), "http://x/");
    EXPECT_EQ(AnswerHeader(api, "Range"), "bytes=0-4");
    EXPECT_EQ(AnswerHeader(api, "X-Empty"), "");
    EXPECT_EQ(AnswerHeader(api, "Loc"), "");
}

}  // namespace
}  // namespace ZYROCloud
