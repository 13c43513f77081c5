#include <gtest/gtest.h>
#include <zosplatform/error.h>

namespace {

TEST(PlatformError, NamesNoFileBeforeAnythingWasSet) {
    EXPECT_EQ(YLIBCErrGet(), 0U);
    EXPECT_STREQ(YLIBCErrorGetFile(), "");
    EXPECT_EQ(YLIBCErrorGetLine(), 0);
}

TEST(PlatformError, KeepsTheLastOne) {
    YLIBCErrSetEx(0x400, "lock.cpp", 3);
    YLIBCErrSetEx(0xa600, "cloud.cpp", 17);
    EXPECT_EQ(YLIBCErrGet(), 0xa600U);
    EXPECT_STREQ(YLIBCErrorGetFile(), "cloud.cpp");
    EXPECT_EQ(YLIBCErrorGetLine(), 17);
}

TEST(PlatformError, FileIsNeverNull) {
    YLIBCErrSetEx(0, nullptr, 0);
    EXPECT_STREQ(YLIBCErrorGetFile(), "");
}

}  // namespace
