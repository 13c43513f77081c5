#include "bridge/file_info.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <memory>
#include <set>
#include <string>
#include <vector>

namespace ZYROCloud {
namespace {

UniqueFileInfo Filled(const char* id, bool is_dir, const char* display_name, const char* name,
                      const char* description) {
    GFileInfo* info = g_file_info_new();
    SetGFileInfo(&info, id, is_dir, display_name, name, 5000000000LL, {1700000001, 1},
                 {1700000002, 2}, {1700000003, 3}, {1700000004, 999999}, description);
    return UniqueFileInfo(info);
}

std::set<std::string> Attributes(const UniqueFileInfo& info) {
    std::set<std::string> names;
    char** const list = g_file_info_list_attributes(info.get(), nullptr);
    for (char** name = list; *name != nullptr; ++name) {
        names.insert(*name);
    }
    g_strfreev(list);
    return names;
}

TEST(SetGFileInfo, FillsARecord) {
    const UniqueFileInfo info = Filled("files/1", false, "shown", "name", "{}");
    GFileInfo* const record = info.get();
    EXPECT_STREQ(AttrText(record, "id::file"), "files/1");
    EXPECT_STREQ(AttrText(record, "standard::description"), "{}");
    EXPECT_EQ(g_file_info_get_file_type(record), G_FILE_TYPE_REGULAR);
    EXPECT_STREQ(g_file_info_get_name(record), "name");
    EXPECT_STREQ(g_file_info_get_display_name(record), "shown");
    EXPECT_EQ(g_file_info_get_size(record), 5000000000LL);
    const struct {
        const char* seconds;
        guint64 second;
        const char* microseconds;
        guint32 microsecond;
    } times[] = {{"time::modified", 1700000001, "time::modified-usec", 1},
                 {"time::access", 1700000002, "time::access-usec", 2},
                 {"time::changed", 1700000003, "time::changed-usec", 3},
                 {"time::created", 1700000004, "time::created-usec", 999999}};
    for (const auto& time : times) {
        EXPECT_EQ(g_file_info_get_attribute_uint64(record, time.seconds), time.second);
        EXPECT_EQ(g_file_info_get_attribute_uint32(record, time.microseconds), time.microsecond);
    }
    for (const char* right : {"access::can-read", "access::can-write", "access::can-delete",
                              "access::can-execute", "access::can-trash", "access::can-rename"}) {
        EXPECT_TRUE(g_file_info_get_attribute_boolean(record, right)) << right;
    }
}

TEST(SetGFileInfo, AFolderIsADirectory) {
    EXPECT_EQ(g_file_info_get_file_type(Filled("1", true, "n", "n", nullptr).get()),
              G_FILE_TYPE_DIRECTORY);
}

TEST(SetGFileInfo, WhatIsNullIsLeftOut) {
    const std::set<std::string> all = Attributes(Filled("1", false, "n", "n", "d"));
    std::set<std::string> few = Attributes(Filled(nullptr, false, nullptr, nullptr, nullptr));
    for (const char* text :
         {"id::file", "standard::name", "standard::display-name", "standard::description"}) {
        EXPECT_EQ(all.count(text), 1U) << text;
        EXPECT_EQ(few.count(text), 0U) << text;
        few.insert(text);
    }
    EXPECT_EQ(few, all);
}

TEST(SetGFileInfo, EmptyTextsAreTexts) {
    const UniqueFileInfo info = Filled("", false, "", "", "");
    EXPECT_EQ(Attributes(info), Attributes(Filled("1", false, "n", "n", "d")));
    EXPECT_STREQ(InfoName(info.get()), "");
}

TEST(SetGFileInfo, NoRecordIsNoHarm) {
    GFileInfo* none = nullptr;
    SetGFileInfo(nullptr, "1", false, "n", "n", 0, {}, {}, {}, {}, nullptr);
    SetGFileInfo(&none, "1", false, "n", "n", 0, {}, {}, {}, {}, nullptr);
    EXPECT_EQ(none, nullptr);
}

std::vector<std::string> Attributes(GFileInfo* info) {
    std::vector<std::string> found;
    char** names = g_file_info_list_attributes(info, nullptr);
    for (char** name = names; *name != nullptr; ++name) {
        const std::unique_ptr<char, ZYROVFS::FreeWith<g_free>> value(
            g_file_info_get_attribute_as_string(info, *name));
        found.push_back(std::string(*name) + "=" + value.get());
    }
    g_strfreev(names);
    std::sort(found.begin(), found.end());
    return found;
}

TEST(NewGFileInfo, WhenFilledIsWhatAnEmptyRecordBecomes) {
    for (const char* description : {static_cast<const char*>(nullptr), "text"}) {
        const UniqueFileInfo empty(g_file_info_new());
        const UniqueFileInfo full = NewGFileInfo();
        for (GFileInfo* info : {empty.get(), full.get()}) {
            SetGFileInfo(&info, "id", true, "shown", "name", 7, {1, 2}, {3, 4}, {5, 6}, {7, 8},
                         description);
        }
        EXPECT_EQ(Attributes(full.get()), Attributes(empty.get()));
        EXPECT_GT(Attributes(full.get()).size(), 15U);
    }
}

TEST(NewGFileInfo, IsAnotherOneEachTime) {
    const UniqueFileInfo first = NewGFileInfo();
    g_file_info_set_name(first.get(), "first");
    EXPECT_STREQ(InfoName(NewGFileInfo().get()), "");
}

TEST(FileInfoTexts, OfARecordWithoutThemOrNoneAreNoTexts) {
    const UniqueFileInfo info(g_file_info_new());
    for (GFileInfo* record : {info.get(), static_cast<GFileInfo*>(nullptr)}) {
        EXPECT_EQ(InfoName(record), nullptr);
        EXPECT_EQ(InfoDisplayName(record), nullptr);
        EXPECT_STREQ(AttrText(record, kAttrFileId), "");
    }
}

}  // namespace
}  // namespace ZYROCloud
