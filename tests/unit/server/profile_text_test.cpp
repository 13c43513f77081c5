#include "server/profile_text.h"

#include <gtest/gtest.h>

#include "support/seams.h"

namespace ZYROVFS::Server {
namespace {

TEST(ProfileText, RefusalTellsKeyAndReasonForTheCaller) {
    const std::pair<Json::Value, const char*> rows[] = {
        {Json::Value(7), "not a text"},
        {Json::Value(), "not a text"},
        {Json::Value(std::string(kLongestText + 1, 'x')), "too long"},
        {Json::Value(std::string("\0", 1)), "a NUL in it"},
        {Json::Value("\xc3"), "not UTF-8"},
    };
    for (const auto& [value, why] : rows) {
        EXPECT_FALSE(IsProfileText("key", value, kNameRule, {"caller.cpp", 3}));
        EXPECT_TRUE(seams::LoggedPart(
            std::string("caller.cpp:3 Wrong value of key in the profile, ") + why))
            << seams::LogDump();
    }
}

TEST(ProfileText, LongestTextPasses) {
    EXPECT_TRUE(IsProfileText("key", std::string(kLongestText, 'x'), kNameRule));
    EXPECT_TRUE(IsProfileText("key", "", kNameRule));
    EXPECT_TRUE(IsProfileText("key", std::string(1 << 20, 'x'), kAnyLengthRule));
    EXPECT_TRUE(IsProfileText("key", "\xff", kRemoteNameRule));
    EXPECT_TRUE(seams::LogLines().empty());
}

TEST(ProfileText, OptionalTextMayBeMissing) {
    EXPECT_TRUE(IsOptionalText("key", Json::Value(), kNameRule));
    EXPECT_FALSE(IsOptionalText("key", Json::Value(false), kNameRule));
}

TEST(ProfileText, NumbersAreUnsignedAndWhole) {
    for (const Json::Value& value : {Json::Value(0), Json::Value(4294967295U), Json::Value(21.0)}) {
        EXPECT_TRUE(IsProfileNumber("key", value)) << value.toStyledString();
    }
    for (const Json::Value& value :
         {Json::Value(-1), Json::Value(Json::UInt64(4294967296)), Json::Value(2.5),
          Json::Value("21"), Json::Value(true), Json::Value(), Json::Value(1e300)}) {
        EXPECT_FALSE(IsProfileNumber("key", value)) << value.toStyledString();
    }
    EXPECT_TRUE(IsOptionalNumber("key", Json::Value()));
    EXPECT_FALSE(IsOptionalNumber("key", Json::Value("21")));
}

}  // namespace
}  // namespace ZYROVFS::Server
