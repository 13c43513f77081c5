#include "cloud/size_limit.h"

#include <gtest/gtest.h>

#include "support/bare_driver.h"

namespace ZYROCloud {
namespace {

using namespace ZYROVFS;  // NOLINT(google-build-using-namespace)

TEST(SizeLimit, TakesUpToTheLimitAndASizeThatIsNotKnown) {
    bare::PlainDriver drive;
    for (const unsigned long long size : {0ULL, 9ULL, 10ULL, kSizeNotKnown}) {
        EXPECT_TRUE(FitsLimit(drive, size, 10)) << size;
    }
    EXPECT_EQ(drive.GetErrorCode(), VFS_ERR_NONE);
}

TEST(SizeLimit, RefusesMoreWithBothErrors) {
    bare::PlainDriver drive;
    for (const unsigned long long size : {11ULL, kSizeNotKnown - 1}) {
        YLIBCErrSetEx(0, "test", 1);
        EXPECT_FALSE(FitsLimit(drive, size, 10)) << size;
        EXPECT_EQ(YLIBCErrGet(), 0xa400U);
        EXPECT_STREQ(YLIBCErrorGetFile(), "size_limit_test.cpp");
        EXPECT_EQ(drive.GetErrorCode(), VFS_ERR_FILE_TOO_LARGE);
    }
}

}  // namespace
}  // namespace ZYROCloud
