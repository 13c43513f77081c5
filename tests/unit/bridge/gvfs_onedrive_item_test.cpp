#include "bridge/gvfs_onedrive_item.h"

#include "unit/bridge/item_fixture.h"

namespace ZYROCloud::gvfs {
namespace {

Json::Value Item(const std::string& type = "file") {
    Json::Value item = Parsed(R"({"id":"file.a1","name":"a.txt","size":5,"parent_id":"folder.a1",
        "link":"https://example.com/a","created_time":"2015-03-02T10:11:12+0000",
        "updated_time":"2016-03-02T10:11:12+0000"})");
    item["type"] = type;
    return item;
}

TEST(OneDriveItem, ThatIsAFileHasAllThatTheServiceTells) {
    for (const char* type : {"file", "photo", "audio", "video", ""}) {
        ItemRecord record;
        ASSERT_TRUE(OneDriveRecord(Item(type), record)) << type;
        EXPECT_EQ(record.id, "file.a1");
        EXPECT_EQ(record.name, "a.txt");
        EXPECT_EQ(record.display_name, "a.txt");
        EXPECT_FALSE(record.is_dir);
        EXPECT_EQ(record.size, 5);
        EXPECT_EQ(record.modified.tv_sec, 1456913472);
        EXPECT_EQ(record.access.tv_sec, 1456913472);
        EXPECT_EQ(record.created.tv_sec, 1425291072);
        EXPECT_EQ(record.description, R"({"link":"https://example.com/a"})");
        EXPECT_FALSE(record.keeps_display_name);
    }
}

TEST(OneDriveItem, ThatIsAnAlbumIsADirectoryAsAFolderIs) {
    for (const char* type : {"folder", "album"}) {
        ItemRecord record;
        ASSERT_TRUE(OneDriveRecord(Item(type), record)) << type;
        EXPECT_TRUE(record.is_dir) << type;
        EXPECT_EQ(record.size, 0) << type;
    }
}

TEST(OneDriveItem, ThatIsANotebookIsLeftOut) {
    ItemRecord record;
    EXPECT_FALSE(OneDriveRecord(Item("notebook"), record));
}

TEST(OneDriveItem, ThatIsTheRootHasNoName) {
    Json::Value item = Item("folder");
    item["parent_id"] = Json::nullValue;
    ItemRecord record;
    ASSERT_TRUE(OneDriveRecord(item, record));
    EXPECT_EQ(record.name, "");
    EXPECT_EQ(record.display_name, "");
    item.removeMember("parent_id");
    ASSERT_TRUE(OneDriveRecord(item, record));
    EXPECT_EQ(record.name, "a.txt");
}

TEST(OneDriveItem, ThatIsNullIsNone) {
    ItemRecord record;
    EXPECT_FALSE(OneDriveRecord(Json::Value(), record));
}

TEST(OneDriveItem, WithMembersOfAnyTypeIsReadAsFarAsItCanBe) {
    ExpectReadWithMembersOfAnyType(
        Item(), {"type", "id", "name", "size", "parent_id", "link", "created_time", "updated_time"},
        OneDriveRecord);
}

}  // namespace
}  // namespace ZYROCloud::gvfs
