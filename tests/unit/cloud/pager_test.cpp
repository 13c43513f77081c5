#include "cloud/pager.h"

#include <gmock/gmock.h>
#include <json/value.h>

#include "core/json.h"
#include "support/bare_driver.h"
#include "support/seams.h"

namespace ZYROCloud {
namespace {

using testing::ElementsAre;

Json::Value Page(const std::string& text) {
    Json::Value page;
    EXPECT_TRUE(ZYROVFS::json::fromString(page, text)) << text;
    return page;
}

const auto kKeepAll = [](const Json::Value&) { return true; };

TEST(Pager, PagesByOffsetTokenAndCursorEndAsTheirServiceSays) {
    const std::vector<Json::Value> pages = {Page(R"({"entries":[1,2],"next":"b"})"),
                                            Page(R"({"entries":[3],"next":"c"})"),
                                            Page(R"({"entries":[4,5]})")};
    std::vector<std::string> cursors;
    std::string cursor;
    size_t fetched = 0;
    Json::Value out;
    EXPECT_TRUE(ForEachPage(
        "entries", out,
        [&](Json::Value& page) {
            cursors.push_back(cursor);
            page = pages[fetched++];
            return true;
        },
        kKeepAll,
        [&](const Json::Value& page) {
            cursor = page.get("next", "").asString();
            return !cursor.empty();
        }));
    EXPECT_EQ(ZYROVFS::json::toString(out), "[1,2,3,4,5]");
    EXPECT_THAT(cursors, ElementsAre("", "b", "c"));
}

TEST(Pager, WhatIsNotKeptIsLeftOut) {
    Json::Value out;
    EXPECT_TRUE(ForEachPage(
        "entries", out,
        [](Json::Value& page) {
            page = Page(R"({"entries":[1,2,3,4]})");
            return true;
        },
        [](const Json::Value& item) { return item.asInt() % 2 == 0; },
        [](const Json::Value&) { return false; }));
    EXPECT_EQ(ZYROVFS::json::toString(out), "[2,4]");
}

TEST(Pager, AnEmptyListingIsAnArray) {
    for (const char* text : {"{}", "null", R"({"entries":null})", R"({"entries":[]})"}) {
        Json::Value out;
        EXPECT_TRUE(ForEachPage(
            "entries", out,
            [&](Json::Value& page) {
                page = Page(text);
                return true;
            },
            kKeepAll, [](const Json::Value&) { return false; }));
        EXPECT_EQ(ZYROVFS::json::toString(out), "[]") << text;
    }
}

TEST(Pager, APageThatCannotBeHadKeepsWhatCameBefore) {
    int fetched = 0;
    Json::Value out;
    EXPECT_FALSE(ForEachPage(
        "entries", out,
        [&](Json::Value& page) {
            page = Page(R"({"entries":[1]})");
            return ++fetched < 3;
        },
        kKeepAll, [](const Json::Value&) { return true; }));
    EXPECT_EQ(ZYROVFS::json::toString(out), "[1,1]");
}

TEST(Pager, ItemsThatAreNoArrayAreAWrongValue) {
    for (const char* text :
         {R"({"entries":{"a":1}})", R"({"entries":"x"})", R"({"entries":7})", R"([1])", "7"}) {
        Json::Value out;
        EXPECT_THROW(ForEachPage(
                         "entries", out,
                         [&](Json::Value& page) {
                             page = Page(text);
                             return true;
                         },
                         kKeepAll, [](const Json::Value&) { return false; }),
                     Json::Exception)
            << text;
    }
}

TEST(Pager, ItemsAreMovedNotCopied) {
    Json::Value out(Json::arrayValue);
    for (const Json::ArrayIndex number : {0, 1}) {
        Json::Value page = Page(R"({"entries":[{"name":"too long to lie in the value itself"}]})");
        const char* begin = nullptr;
        const char* moved = nullptr;
        const char* end = nullptr;
        ASSERT_TRUE(page["entries"][0]["name"].getString(&begin, &end));
        MoveItems(page, "entries", out, kKeepAll);
        ASSERT_TRUE(out[number]["name"].getString(&moved, &end));
        EXPECT_EQ(moved, begin) << number;
    }
}

TEST(Pager, AListingWhosePagesGoInACircleFailsAndKeepsWhatCame) {
    bare::PlainDriver cloud;
    CursorGuard guard;
    std::string cursor;
    std::string letters = "abcab";
    size_t fetched = 0;
    Json::Value out;
    EXPECT_FALSE(ForEachPage(
        "entries", out,
        [&](Json::Value& page) {
            page = Page(R"({"entries":[1]})");
            return guard.Accept(cloud, cursor);
        },
        kKeepAll,
        [&](const Json::Value&) {
            cursor = letters[fetched++];
            return true;
        }));
    EXPECT_EQ(out.size(), 4U);
    EXPECT_EQ(cloud.GetErrorCode(), ZYROVFS::VFS_ERR_CLOUD_FAILED);
    EXPECT_THAT(seams::LogDump(), testing::HasSubstr("Listing goes in a circle, a"));
}

}  // namespace
}  // namespace ZYROCloud
