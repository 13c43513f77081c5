#include "range.h"

#include <gtest/gtest.h>

#include "failure.h"

namespace {

using web::Range;
using web::ReadRange;

struct Row {
    const char* header;
    long long from, to;
};

TEST(WebRange, OnePartIsReadAndCutAtTheEndOfTheFile) {
    for (const Row& row : {Row{"bytes=0-9", 0, 9}, Row{"bytes=5-", 5, 99}, Row{"bytes=-7", 93, 99},
                           Row{"bytes=90-5000", 90, 99}, Row{"bytes=-5000", 0, 99},
                           Row{"bytes=99-99", 99, 99}, Row{"bytes=0-9223372036854775807", 0, 99}}) {
        const std::optional<Range> range = ReadRange(row.header, 100);
        ASSERT_TRUE(range) << row.header;
        EXPECT_EQ(range->from, row.from) << row.header;
        EXPECT_EQ(range->to, row.to) << row.header;
        EXPECT_EQ(range->Size(), row.to - row.from + 1);
    }
}

TEST(WebRange, WhatIsNoOnePartGivesTheWholeFile) {
    for (const char* header :
         {"", "bytes", "bytes=", "bytes=-", "bytes=a-b", "bytes=1-2,4-5", "lines=1-2", "bytes=5-4",
          "bytes=--1", "bytes=1", "bytes= 1-2", "bytes=+1-2", "bytes=99999999999999999999-",
          "bytes=1-99999999999999999999", "bytes=0x1-2"}) {
        EXPECT_FALSE(ReadRange(header, 100)) << header;
    }
}

TEST(WebRange, APartThatIsNotThereIsRefused) {
    for (const char* header : {"bytes=100-", "bytes=100-200", "bytes=-0"}) {
        EXPECT_THROW(ReadRange(header, 100), web::Failure) << header;
    }
    for (const char* header : {"bytes=0-", "bytes=0-0", "bytes=-1"}) {
        EXPECT_THROW(ReadRange(header, 0), web::Failure) << header;
    }
}

}  // namespace
