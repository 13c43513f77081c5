#include "core/log.h"

#include <gtest/gtest.h>

#include <cerrno>
#include <string>

#include "support/seams.h"

namespace ZYROVFS {
namespace {

std::string Last() {
    return seams::LogLines().empty() ? "" : seams::LogLines().back().text;
}

TEST(Log, LineBeginsWithUnitAndLine) {
    LOG_ERROR("Failed to mkdir %s", "/a");
    EXPECT_EQ(Last(), "log_test.cpp:" + std::to_string(__LINE__ - 1) + " Failed to mkdir /a");
    EXPECT_EQ(seams::LogLines().back().priority, LOG_ERR);
}

TEST(Log, ErrnoIsTheCallersAndStaysSo) {
    errno = ENOSPC;
    LOG_ERROR("%m");
    EXPECT_EQ(errno, ENOSPC);
    EXPECT_TRUE(seams::Logged("No space left on device")) << seams::LogDump();
}

TEST(Log, HelperSpeaksForItsCaller) {
    LOG_ERROR_AT((SourceLine{"caller.cpp", 7}), "text");
    EXPECT_EQ(Last(), "caller.cpp:7 text");
}

TEST(Log, IdentityGoesToTheAuthFacility) {
    const SourceLine at{"caller.cpp", 7};
    LOG_AUTH_ERROR(at, "e");
    EXPECT_EQ(seams::LogLines().back().priority, 0x23);
    LOG_AUTH_INFO(at, "i");
    EXPECT_EQ(seams::LogLines().back().priority, 0x26);
    LOG_AUTH_CRIT(at, "c");
    EXPECT_EQ(seams::LogLines().back().priority, 0x22);
}

TEST(Log, ArgumentsAreNoFormats) {
    LOG_ERROR("Wrong uri, %s", "%s%n%m %d");
    EXPECT_TRUE(seams::Logged("Wrong uri, %s%n%m %d")) << seams::LogDump();
}

TEST(Log, HugeAndBinaryTextDoesNoHarm) {
    LOG_ERROR("%s", std::string(1 << 20, 'x').c_str());
    LOG_ERROR("%s", "\xff\xfe\x01\n");
    EXPECT_EQ(seams::LogLines().size(), 2U);
}

TEST(Log, PlatformErrorIsQuotedInFourHexDigitsWithItsPlace) {
    YLIBCErrSetEx(0x400, "lock.cpp", 12);
    LOG_ERROR("Nothing, " ZYROERR_FORMAT, ZYROERR_ARGS);
    EXPECT_TRUE(seams::Logged("Nothing, zyroerr=[0x0400 lock.cpp:12]")) << seams::LogDump();
    LOG_ERROR("Nothing " PLATFORM_ERROR_FORMAT, ZYROERR_ARGS);
    EXPECT_TRUE(seams::Logged("Nothing [0x0400 lock.cpp:12]")) << seams::LogDump();
}

TEST(SourceLine, IsTheNameWithoutItsFolders) {
    EXPECT_STREQ(SourceLine::Here("/a/b/unit.cpp", 3).file, "unit.cpp");
    EXPECT_STREQ(SourceLine::Here("unit.cpp", 3).file, "unit.cpp");
    EXPECT_STREQ(SourceLine::Here().file, "log_test.cpp");
}

}  // namespace
}  // namespace ZYROVFS
