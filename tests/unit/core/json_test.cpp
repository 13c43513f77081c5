#include "core/json.h"

#include <gtest/gtest.h>

#include <cerrno>
#include <limits>
#include <string>

namespace ZYROVFS::json {
namespace {

Json::Value Document(int number = 1) {
    Json::Value value;
    value["sftp://amy@h"]["alias"] = "nas";
    value["sftp://amy@h"]["number"] = number;
    return value;
}

TEST(JsonText, IsOneLineWithoutANewline) {
    EXPECT_EQ(toString(Json::Value()), "null");
    EXPECT_EQ(toString(Document()), R"({"sftp://amy@h":{"alias":"nas","number":1}})");
    EXPECT_EQ(toString(Json::Value("a\nb")), R"("a\nb")");
    EXPECT_EQ(toString(Json::Value("\xc3\xa4\x7f")), "\"\xc3\xa4\x7f\"");
}

TEST(JsonText, CommentsAreReadPastAndNeverWritten) {
    Json::Value value;
    ASSERT_TRUE(
        fromString(value, "// head\n{ // in\n \"a\" : 1 /* here */, // end\n\"b\":[2//x\n]}"));
    EXPECT_EQ(toString(value), R"({"a":1,"b":[2]})");
}

TEST(JsonText, ParsesOneDocumentAndNothingBehindIt) {
    Json::Value value;
    EXPECT_TRUE(fromString(value, " {\"a\": [1, 2.5, \"x\", null, true]} \n"));
    EXPECT_EQ(value["a"].size(), 5U);
    EXPECT_TRUE(fromString(value, "null"));
    EXPECT_TRUE(value.isNull());
    EXPECT_TRUE(fromString(value, "7"));
    for (const char* text : {"", " ", "{", "{\"a\":}", "[1,]x", "{} {}", "nul", "{'a':1}", "\"open",
                             "\xff", "{\"a\" 1}", "<html>", "]", "1 2"}) {
        value = Document();
        errno = 0;
        EXPECT_FALSE(fromString(value, text)) << text;
        EXPECT_TRUE(value.isNull()) << text;
        EXPECT_EQ(errno, EINVAL) << text;
    }
}

TEST(JsonText, TenThousandLevelsAreRefusedAndAHundredAreNot) {
    const auto nested = [](size_t levels) {
        return std::string(levels, '[') + std::string(levels, ']');
    };
    Json::Value value;
    EXPECT_TRUE(fromString(value, nested(100)));
    EXPECT_EQ(toString(value), nested(100));
    EXPECT_FALSE(fromString(value, nested(10000)));
    EXPECT_TRUE(value.isNull());
    EXPECT_FALSE(fromString(value, std::string(1 << 20, '[')));
    std::string objects;
    for (int i = 0; i < 10000; ++i) {
        objects += "{\"a\":";
    }
    EXPECT_FALSE(fromString(value, objects));
}

TEST(JsonText, StringsKeepTheirBytes) {
    const std::string texts[] = {
        std::string("a\0b\0", 4),
        "\xff\xfe\x80 latin \xe4",
        "\xE4\xBD\xA0\xE5\xA5\xBD",
        "\xF0\x9F\x98\x80",
        "\x01\x02\x1f\x7f",
        "quote \" back \\ slash /",
        "\xC0\x80 overlong",
        "\xED\xA0\x80 surrogate",
        "cut \xE4\xBD",
        std::string(1, '\xF0'),
        "\t\r\n\b\f",
        "",
    };
    for (const std::string& text : texts) {
        Json::Value in;
        in["value"] = text;
        in[text] = "key";
        Json::Value out;
        ASSERT_TRUE(fromString(out, toString(in))) << toString(in);
        EXPECT_EQ(out["value"].asString(), text);
        EXPECT_TRUE(out.isMember(text));
        EXPECT_EQ(toString(in).find('\n'), std::string::npos);
    }
}

TEST(JsonText, NumbersComeBackAsTheyWere) {
    Json::Value in;
    in["min"] = Json::Int64(std::numeric_limits<int64_t>::min());
    in["max"] = Json::UInt64(std::numeric_limits<uint64_t>::max());
    in["third"] = 1.0 / 3;
    in["big"] = 1e300;
    Json::Value out;
    ASSERT_TRUE(fromString(out, toString(in)));
    EXPECT_EQ(out, in);
}

TEST(JsonNumber, DecimalTextGivesTheNumber) {
    int64_t number = 7;
    EXPECT_TRUE(toInt64(Json::Value("-12"), number));
    EXPECT_EQ(number, -12);
    EXPECT_TRUE(toInt64(Json::Value(Json::Int64(1) << 40), number));
    EXPECT_EQ(number, int64_t{1} << 40);
    EXPECT_TRUE(toInt64(Json::Value("9223372036854775807"), number));
    EXPECT_TRUE(toInt64(Json::Value(3.0), number));
    EXPECT_EQ(number, 3);
    uint64_t positive = 7;
    EXPECT_TRUE(toUInt64(Json::Value("18446744073709551615"), positive));
    EXPECT_EQ(positive, UINT64_MAX);
    EXPECT_TRUE(toUInt64(Json::Value(5), positive));
    EXPECT_EQ(positive, 5U);
}

TEST(JsonNumber, AnythingElseIsRefusedAndLeavesTheOutput) {
    Json::Value object;
    object["a"] = 1;
    const Json::Value values[] = {Json::Value(),
                                  Json::Value(""),
                                  Json::Value(" 1"),
                                  Json::Value("1 "),
                                  Json::Value("0x10"),
                                  Json::Value("1.5"),
                                  Json::Value(1.5),
                                  Json::Value(true),
                                  object,
                                  Json::Value(Json::arrayValue),
                                  Json::Value("99999999999999999999"),
                                  Json::Value(1e300),
                                  Json::Value(std::string("1\0", 2)),
                                  Json::Value(std::string(1 << 20, '9'))};
    for (const Json::Value& value : values) {
        int64_t number = 7;
        uint64_t positive = 7;
        EXPECT_FALSE(toInt64(value, number)) << toString(value).substr(0, 40);
        EXPECT_FALSE(toUInt64(value, positive)) << toString(value).substr(0, 40);
        EXPECT_EQ(number, 7);
        EXPECT_EQ(positive, 7U);
    }
    uint64_t positive = 7;
    EXPECT_FALSE(toUInt64(Json::Value("-1"), positive));
    EXPECT_FALSE(toUInt64(Json::Value(-1), positive));
}

TEST(JsonText, AsciiTextHoldsWhatItWasMadeFrom) {
    Json::Value in;
    in["\xc3\xa4"] = "a\x7f\x7f\\ \xe2\x82\xac \xf0\x9f\x98\x80\t\"";
    const std::string text = toAscii(in);
    for (const char c : text) {
        EXPECT_TRUE(c >= ' ' && c < '\x7f') << text;
    }
    Json::Value out;
    ASSERT_TRUE(fromString(out, text)) << text;
    EXPECT_EQ(out, in);
}

}  // namespace
}  // namespace ZYROVFS::json
