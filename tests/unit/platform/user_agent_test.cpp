#include <gmock/gmock.h>
#include <sys/utsname.h>
#include <zosplatform/device.h>
#include <zosplatform/error.h>

#include <cstring>
#include <string>

namespace {

TEST(UserAgent, NamesProductVersionAndKernel) {
    char text[512];
    ASSERT_EQ(YLIBDsinfoUserAgentGet("fileharbor", text, sizeof text), 0);
    EXPECT_THAT(text, testing::MatchesRegex("fileharbor/[0-9]+\\.[0-9]+\\.[0-9]+ \\(Linux .+\\)"));
    utsname kernel{};
    ASSERT_EQ(uname(&kernel), 0);
    EXPECT_THAT(text, testing::HasSubstr(kernel.release));
}

TEST(UserAgent, BufferHasToHoldItAll) {
    char text[512];
    ASSERT_EQ(YLIBDsinfoUserAgentGet("fileharbor", text, sizeof text), 0);
    const int size = static_cast<int>(std::strlen(text)) + 1;
    char exact[512];
    EXPECT_EQ(YLIBDsinfoUserAgentGet("fileharbor", exact, size), 0);
    EXPECT_STREQ(exact, text);
    EXPECT_EQ(YLIBDsinfoUserAgentGet("fileharbor", exact, size - 1), -1);
    EXPECT_EQ(YLIBCErrGet(), ZOS_ERR_BUFFER_TOO_SMALL);
    EXPECT_STREQ(exact, "");
}

TEST(UserAgent, WrongArgumentsAreRefused) {
    char text[512];
    EXPECT_EQ(YLIBDsinfoUserAgentGet(nullptr, text, sizeof text), -1);
    EXPECT_EQ(YLIBDsinfoUserAgentGet("fileharbor", nullptr, 512), -1);
    EXPECT_EQ(YLIBDsinfoUserAgentGet("fileharbor", text, 0), -1);
    EXPECT_EQ(YLIBDsinfoUserAgentGet("fileharbor", text, -1), -1);
    EXPECT_EQ(YLIBCErrGet(), ZOS_ERR_BAD_PARAMETER);
}

}  // namespace
