#include <gtest/gtest.h>

#include <climits>
#include <ctime>
#include <string>

#include "support/seams.h"
#include "zyrovfs/utils.h"

namespace ZYROVFS::Utils {
namespace {

constexpr long kMoment = 1282429880;  // 2010-08-21 22:31:20 UTC

class InZone {
  public:
    explicit InZone(const char* zone) {
        setenv("TZ", zone, 1);
        tzset();
    }
    InZone(const InZone&) = delete;
    InZone& operator=(const InZone&) = delete;
    ~InZone() {
        unsetenv("TZ");
        tzset();
    }
};

struct Good {
    const char* text;
    long seconds;
    long microseconds;
};

class GoodDate : public testing::TestWithParam<Good> {};

TEST_P(GoodDate, IsParsedInAnyTimeZone) {
    for (const char* zone : {"UTC", "Asia/Taipei", "America/New_York"}) {
        const InZone in_zone(zone);
        timeval time{-7, -7};
        EXPECT_TRUE(ParseRFC3339ToTime(GetParam().text, time)) << GetParam().text;
        EXPECT_EQ(time.tv_sec, GetParam().seconds) << zone;
        EXPECT_EQ(time.tv_usec, GetParam().microseconds) << zone;
    }
    EXPECT_TRUE(seams::LogLines().empty()) << seams::LogDump();
}

INSTANTIATE_TEST_SUITE_P(
    RFC3339, GoodDate,
    testing::Values(Good{"2010-08-21T22:31:20Z", kMoment, 0},
                    Good{"2010-08-21T22:31:20.5Z", kMoment, 500000},
                    Good{"2010-08-21T22:31:20.000Z", kMoment, 0},
                    Good{"2010-08-21T22:31:20.123456Z", kMoment, 123456},
                    Good{"2010-08-21T22:31:20.000001Z", kMoment, 1},
                    Good{"2010-08-21T22:31:20+08:00", kMoment - 8 * 3600, 0},
                    Good{"2010-08-21T22:31:20-08:00", kMoment + 8 * 3600, 0},
                    Good{"2010-08-21T22:31:20+0530", kMoment - 5 * 3600 - 30 * 60, 0},
                    Good{"2010-08-21T22:31:20.25-0330", kMoment + 3 * 3600 + 30 * 60, 250000},
                    Good{"2010-08-21T22:31:20+23:59", kMoment - 23 * 3600 - 59 * 60, 0},
                    Good{"2010-08-21T22:31:20+00:00", kMoment, 0},
                    Good{"2010-08-21T22:31:20-00:00", kMoment, 0},
                    Good{"1970-01-01T00:00:00Z", 0, 0}, Good{"1969-12-31T23:59:59Z", -1, 0},
                    Good{"2038-01-19T03:14:08Z", 2147483648L, 0},
                    Good{"2016-12-31T23:59:60Z", 1483228800, 0},  // leap second
                    Good{"2012-02-29T00:00:00Z", 1330473600, 0},
                    Good{"9999-12-31T23:59:59Z", 253402300799L, 0}));

class BadDate : public testing::TestWithParam<const char*> {};

TEST_P(BadDate, IsRefusedWithALogLineAndLeavesTheOutput) {
    timeval time{-7, -7};
    EXPECT_FALSE(ParseRFC3339ToTime(GetParam(), time)) << GetParam();
    EXPECT_EQ(time.tv_sec, -7);
    EXPECT_EQ(time.tv_usec, -7);
    EXPECT_TRUE(seams::Logged(std::string("Failed to parse ") + GetParam())) << seams::LogDump();
}

INSTANTIATE_TEST_SUITE_P(
    RFC3339, BadDate,
    testing::Values(
        "", "yesterday", "2010-08-21", "2010-08-21T22:31", "2010-08-21T22:31:20",
        "2010-08-21 22:31:20Z", "2010-08-21T22:31:20z",
        "2010-08-21T22:31:20.1234567Z",  // seven digits
        "2010-08-21T22:31:20.0000000Z", "2010-08-21T22:31:20.Z", "2010-08-21T22:31:20.+08:00",
        "2010-08-21T22:31:20.", "2010-08-21T22:31:20.-1Z", "2010-08-21T22:31:20+24:00",
        "2010-08-21T22:31:20-24:00", "2010-08-21T22:31:20+23:60", "2010-08-21T22:31:20+2400",
        "2010-08-21T22:31:20+2360", "2010-08-21T22:31:20+", "2010-08-21T22:31:20-",
        "2010-08-21T22:31:20+08", "2010-08-21T22:31:20+08:", "2010-08-21T22:31:20+-8:00",
        "2010-08-21T22:31:20+08:-1", "2010-08-21T22:31:20+ 8:00", "2010-08-21T22:31:20++8:00",
        "2010-08-21T22:31:20+08::00", "2010-08-21T22:31:20+008:00", "2010-08-21T22:31:20+08:00x",
        "2010-08-21T22:31:20+08000", "2010-08-21T22:31:20Zulu", "2010-08-21T22:31:20Z ",
        "2010-08-21T22:31:20ZZ", "2010-13-01T00:00:00Z", "2010-00-01T00:00:00Z",
        "2010-01-32T00:00:00Z", "2010-01-01T24:00:00Z", "2010-01-01T00:60:00Z",
        "2010-01-01T00:00:62Z", "\xff\xfe\x01"));

TEST(ParseRFC3339ToTime, SevenFractionDigitsAreRefusedAndSixAreNot) {
    timeval time{};
    EXPECT_TRUE(ParseRFC3339ToTime("2010-08-21T22:31:20.123456Z", time));
    EXPECT_EQ(time.tv_usec, 123456);
    EXPECT_FALSE(ParseRFC3339ToTime("2010-08-21T22:31:20.1234567Z", time));
    EXPECT_FALSE(ParseRFC3339ToTime("2010-08-21T22:31:20.0000000Z", time));
    EXPECT_EQ(time.tv_usec, 123456);
}

TEST(ParseRFC3339ToTime, HugeTextIsRefused) {
    timeval time{};
    EXPECT_FALSE(ParseRFC3339ToTime(std::string(1 << 20, '9'), time));
    EXPECT_FALSE(
        ParseRFC3339ToTime("2010-08-21T22:31:20." + std::string(1 << 20, '0') + "Z", time));
    EXPECT_FALSE(ParseRFC3339ToTime("2010-08-21T22:31:20Z" + std::string(1 << 20, ' '), time));
    EXPECT_FALSE(ParseRFC3339ToTime("2010-08-21T22:31:20+" + std::string(1 << 20, '1'), time));
}

TEST(ParseRFC3339ToTime, NothingMayHideBehindAnEmbeddedNul) {
    timeval time{};
    EXPECT_FALSE(ParseRFC3339ToTime(std::string("2010-08-21T22:31:20Z\0Z", 22), time));
    EXPECT_FALSE(ParseRFC3339ToTime(std::string("2010-08-21T22:31:20+08:00\0", 26), time));
}

TEST(ParseTimeToRFC3339, WholeSecondsHaveThreeZeros) {
    const timeval time{kMoment, 0};
    std::string text;
    EXPECT_TRUE(ParseTimeToRFC3339(&time, text));
    EXPECT_EQ(text, "2010-08-21T22:31:20.000Z");
}

TEST(ParseTimeToRFC3339, PartsOfASecondHaveSixDigits) {
    const timeval one{kMoment, 1};
    std::string text;
    EXPECT_TRUE(ParseTimeToRFC3339(&one, text));
    EXPECT_EQ(text, "2010-08-21T22:31:20.000001Z");
    const timeval half{kMoment, 500000};
    EXPECT_TRUE(ParseTimeToRFC3339(&half, text));
    EXPECT_EQ(text, "2010-08-21T22:31:20.500000Z");
}

TEST(ParseTimeToRFC3339, IsUtcInAnyZone) {
    const InZone in_zone("Asia/Taipei");
    const timeval time{0, 0};
    std::string text;
    EXPECT_TRUE(ParseTimeToRFC3339(&time, text));
    EXPECT_EQ(text, "1970-01-01T00:00:00.000Z");
}

TEST(ParseTimeToRFC3339, NullIsRefused) {
    std::string text = "as it was";
    EXPECT_FALSE(ParseTimeToRFC3339(nullptr, text));
    EXPECT_EQ(text, "as it was");
}

TEST(ParseTimeToRFC3339, TimesBeyondTheCalendarAreRefused) {
    std::string text = "as it was";
    for (const long seconds : {LONG_MAX, LONG_MIN}) {
        const timeval time{seconds, 0};
        EXPECT_FALSE(ParseTimeToRFC3339(&time, text));
        EXPECT_FALSE(ParseEpochToRFC3339(seconds, text));
    }
    EXPECT_EQ(text, "as it was");
}

TEST(ParseTimeToRFC3339, OddFieldsDoNoHarm) {
    std::string text;
    const timeval odd{-62200000000L, LONG_MIN};
    EXPECT_TRUE(ParseTimeToRFC3339(&odd, text));
    const timeval far{67767976233532799L, LONG_MAX};
    EXPECT_TRUE(ParseTimeToRFC3339(&far, text));
}

TEST(ParseEpochToRFC3339, IsTheSameForWholeSeconds) {
    std::string text;
    EXPECT_TRUE(ParseEpochToRFC3339(kMoment, text));
    EXPECT_EQ(text, "2010-08-21T22:31:20.000Z");
    EXPECT_TRUE(ParseEpochToRFC3339(-1, text));
    EXPECT_EQ(text, "1969-12-31T23:59:59.000Z");
}

TEST(ParseEpochToRFC3339, GoesThereAndBack) {
    for (const long seconds : {0L, 1L, -1L, kMoment, 253402300799L, -62135596800L}) {
        std::string text;
        timeval time{};
        ASSERT_TRUE(ParseEpochToRFC3339(seconds, text));
        ASSERT_TRUE(ParseRFC3339ToTime(text, time)) << text;
        EXPECT_EQ(time.tv_sec, seconds) << text;
    }
}

TEST(ParseDropboxTimeToEcho, ClockTimeCountsAsLocalTimeWhateverTheOffset) {
    long seconds = 0;
    {
        const InZone utc("UTC");
        EXPECT_TRUE(ParseDropboxTimeToEcho("Sat, 21 Aug 2010 22:31:20 +0000", seconds));
        EXPECT_EQ(seconds, kMoment);
        EXPECT_TRUE(ParseDropboxTimeToEcho("Sat, 21 Aug 2010 22:31:20 +0900", seconds));
        EXPECT_EQ(seconds, kMoment);
    }
    const InZone taipei("Asia/Taipei");
    EXPECT_TRUE(ParseDropboxTimeToEcho("Sat, 21 Aug 2010 22:31:20 +0000", seconds));
    EXPECT_EQ(seconds, kMoment - 8 * 3600);
}

TEST(ParseDropboxTimeToEcho, SummerTimeOfTheZoneIsKnown) {
    const InZone new_york("America/New_York");
    long seconds = 0;
    EXPECT_TRUE(ParseDropboxTimeToEcho("Sat, 21 Aug 2010 22:31:20 +0000", seconds));
    EXPECT_EQ(seconds, kMoment + 4 * 3600);
    EXPECT_TRUE(ParseDropboxTimeToEcho("Thu, 21 Jan 2010 22:31:20 +0000", seconds));
    EXPECT_EQ(seconds, 1264113080 + 5 * 3600);
}

TEST(ParseDropboxTimeToEcho, OtherTextIsRefused) {
    long seconds = -7;
    for (const char* text :
         {"", "Sat, 21 Aug 2010 22:31:20", "21 Aug 2010 22:31:20 +0000", "2010-08-21T22:31:20Z",
          "Sat, 21 Agosto 2010 22:31:20 +0000", "Sat, 21 Aug 2010 22:31:20 here", "\xff\x80"}) {
        EXPECT_FALSE(ParseDropboxTimeToEcho(text, seconds)) << text;
    }
    EXPECT_FALSE(ParseDropboxTimeToEcho(std::string(1 << 20, 'S'), seconds));
    EXPECT_EQ(seconds, -7);
}

}  // namespace
}  // namespace ZYROVFS::Utils
