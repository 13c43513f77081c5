#include "bridge/gvfs_flow_item.h"

#include <gmock/gmock.h>

#include "core/json.h"
#include "support/seams.h"

namespace ZYROCloud::gvfs {
namespace {

using testing::HasSubstr;

class FlowItem : public testing::Test {
  protected:
    void SetUp() override {
        seams::Reset();
        record.id = "x1";
        record.name = record.display_name = "a.txt";
    }
    bool HasFitName(const std::string& name, const std::string& path = "/docs") {
        record.name = name;
        return gvfs::HasFitName(record, path.c_str());
    }
    ItemRecord record;
};

TEST_F(FlowItem, WithAUsualNameFits) {
    for (const char* name : {"a", "a.txt", ".hidden", "...", "..a", " ", "a\nb", "\r", "Straße 😀",
                             "a\\b", "\"", "-rf", "a:b"}) {
        EXPECT_TRUE(HasFitName(name)) << name;
    }
    EXPECT_THAT(seams::LogLines(), testing::IsEmpty()) << seams::LogDump();
}

TEST_F(FlowItem, WhoseNameIsAnotherPlaceOfTheTreeDoesNotFit) {
    for (const char* name : {"", ".", "..", "/", "a/b", "../a", "/etc/passwd", "a/"}) {
        seams::Reset();
        EXPECT_FALSE(HasFitName(name)) << name;
        EXPECT_TRUE(seams::Logged(std::string("File name is none, /docs -> ") + name)) << name;
    }
}

TEST_F(FlowItem, FitsWithANameOf255BytesAndNotOf256) {
    EXPECT_TRUE(HasFitName(std::string(255, 'n')));
    EXPECT_FALSE(HasFitName(std::string(256, 'n')));
    EXPECT_TRUE(seams::LoggedPart("File name is too long, /docs -> nnn")) << seams::LogDump();
}

TEST_F(FlowItem, FitsWithAPathOf4096BytesAndNotOf4097) {
    const std::string path = "/" + std::string(4088, 'p');
    EXPECT_TRUE(HasFitName("123456", path));
    EXPECT_FALSE(HasFitName("1234567", path));
    EXPECT_TRUE(seams::LoggedPart("File path is too long, /ppp")) << seams::LogDump();
    EXPECT_FALSE(HasFitName("a", std::string(4096, 'p')));
    EXPECT_FALSE(HasFitName("a", std::string(4097, 'p')));
}

TEST_F(FlowItem, WithoutAnIdCannotBeTold) {
    EXPECT_TRUE(HasFitTexts(record));
    record.id = "";
    EXPECT_FALSE(HasFitTexts(record));
    EXPECT_TRUE(seams::Logged("Item without an id, a.txt")) << seams::LogDump();
}

TEST_F(FlowItem, WhoseTextsAreNoUtf8CannotBeTold) {
    for (const std::string& text :
         {std::string("a\xff"), std::string("\xc3"), std::string("a\0b", 3),
          std::string("\xed\xa0\x80"), std::string("\xc0\xaf")}) {
        seams::Reset();
        record.name = text;
        EXPECT_FALSE(HasFitTexts(record)) << text;
        EXPECT_TRUE(seams::LoggedPart("Item with a text that is no UTF-8, x1")) << seams::LogDump();
        record.name = "a.txt";
        record.id = text;
        EXPECT_FALSE(HasFitTexts(record)) << text;
        record.id = "x1";
    }
}

TEST_F(FlowItem, DescriptionIsOfTheMembersThatAreThere) {
    Json::Value item;
    ASSERT_TRUE(ZYROVFS::json::fromString(item, R"({"a":"x","b":null,"c":{"d":[1]},"e":2})"));
    EXPECT_EQ(TextOfMembers(item, {"a", "b", "c", "f"}), R"({"a":"x","c":{"d":[1]}})");
    EXPECT_EQ(TextOfMembers(item, {"f"}), "{}");
    EXPECT_EQ(TextOfMembers(Json::Value("text"), {"a"}), "{}");
}

TEST_F(FlowItem, DescriptionIsUtf8WhateverTheServiceSends) {
    Json::Value item;
    item["link"] =
        "a\xff"
        "b";
    const std::string text = TextOfMembers(item, {"link"});
    EXPECT_TRUE(g_utf8_validate(text.c_str(), -1, nullptr)) << text;
    EXPECT_THAT(text, HasSubstr("link"));
}

TEST_F(FlowItem, TimeIsReadFromTextAlone) {
    Json::Value item;
    item["good"] = "2016-03-02T10:11:12.250Z";
    item["bad"] = "yesterday";
    item["number"] = 7;
    EXPECT_EQ(TimeOf(item, "good").tv_sec, 1456913472);
    EXPECT_EQ(TimeOf(item, "good").tv_usec, 250000);
    for (const char* key : {"bad", "number", "missing"}) {
        EXPECT_EQ(TimeOf(item, key).tv_sec, 0) << key;
        EXPECT_EQ(TimeOf(item, key).tv_usec, 0) << key;
    }
    EXPECT_EQ(TimeOf(Json::Value(), "good").tv_sec, 0);
}

TEST_F(FlowItem, SizeIsANumberOrItsTextAndNeverNegative) {
    Json::Value item;
    item["number"] = 12;
    item["text"] = "5368709120";
    item["negative"] = -1;
    item["negative text"] = "-1";
    item["huge"] = "99999999999999999999";
    item["list"] = Json::arrayValue;
    EXPECT_EQ(SizeOf(item, "number"), 12);
    EXPECT_EQ(SizeOf(item, "text"), 5368709120);
    for (const char* key : {"negative", "negative text", "huge", "list", "missing"}) {
        EXPECT_EQ(SizeOf(item, key), 0) << key;
    }
}

TEST_F(FlowItem, BecomesARecordOfItsAttributes) {
    record.is_dir = true;
    record.display_name = "shown";
    record.size = 5368709120;
    record.modified = {1, 2};
    record.access = {3, 4};
    record.created = {5, 6};
    record.description = "{}";
    const UniqueFileInfo info = ToFileInfo(record);
    const auto seconds = [&](const char* name) {
        return g_file_info_get_attribute_uint64(info.get(), name);
    };
    EXPECT_STREQ(AttrText(info.get(), kAttrFileId), "x1");
    EXPECT_EQ(g_file_info_get_file_type(info.get()), G_FILE_TYPE_DIRECTORY);
    EXPECT_STREQ(g_file_info_get_name(info.get()), "a.txt");
    EXPECT_STREQ(g_file_info_get_display_name(info.get()), "shown");
    EXPECT_EQ(g_file_info_get_size(info.get()), 5368709120);
    EXPECT_EQ(seconds("time::modified"), 1U);
    EXPECT_EQ(seconds("time::access"), 3U);
    EXPECT_EQ(seconds("time::changed"), 5U);
    EXPECT_EQ(seconds("time::created"), 5U);
    EXPECT_STREQ(AttrText(info.get(), kAttrDescription), "{}");
}

TEST_F(FlowItem, WithoutADescriptionHasNoSuchAttribute) {
    const UniqueFileInfo info = ToFileInfo(record);
    EXPECT_FALSE(g_file_info_has_attribute(info.get(), kAttrDescription));
    EXPECT_EQ(g_file_info_get_file_type(info.get()), G_FILE_TYPE_REGULAR);
}

}  // namespace
}  // namespace ZYROCloud::gvfs
