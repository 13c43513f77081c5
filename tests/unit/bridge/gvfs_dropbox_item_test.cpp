#include "bridge/gvfs_dropbox_item.h"

#include "unit/bridge/item_fixture.h"

namespace ZYROCloud::gvfs {
namespace {

Json::Value File(const std::string& name = "A.txt") {
    Json::Value item = Parsed(R"({".tag":"file","path_display":"/Docs/A.txt","size":5,
        "path_lower":"/docs/a.txt","id":"id:1","client_modified":"2000-01-01T00:00:00Z",
        "server_modified":"2016-03-02T10:11:12Z"})");
    item["name"] = name;
    return item;
}

TEST(DropboxItem, IsKnownByItsPath) {
    ItemRecord record;
    ASSERT_TRUE(DropboxRecord(File(), record));
    EXPECT_EQ(record.id, "/Docs/A.txt");
    EXPECT_EQ(record.name, "A.txt");
    EXPECT_EQ(record.display_name, "A.txt");
    EXPECT_FALSE(record.is_dir);
    EXPECT_EQ(record.size, 5);
    for (const timeval& time : {record.modified, record.access, record.created}) {
        EXPECT_EQ(time.tv_sec, 1456913472);
    }
    EXPECT_EQ(record.description, "");
    EXPECT_FALSE(record.keeps_display_name);
}

TEST(DropboxItem, ThatIsAFolderHasNoSizeAndNoTime) {
    ItemRecord record;
    ASSERT_TRUE(DropboxRecord(
        Parsed(R"({".tag":"folder","path_display":"/Docs","name":"Docs","size":7})"), record));
    EXPECT_TRUE(record.is_dir);
    EXPECT_EQ(record.size, 0);
    EXPECT_EQ(record.modified.tv_sec, 0);
}

TEST(DropboxItem, HasTheLastPartOfAPathForItsName) {
    ItemRecord record;
    ASSERT_TRUE(DropboxRecord(File("Docs/A.txt"), record));
    EXPECT_EQ(record.name, "A.txt");
}

TEST(DropboxItem, WithAHiddenNameIsNone) {
    for (const std::string& name :
         {std::string("\""), std::string("'"), std::string(".ZyrotechWorkingDirectory"),
          std::string(256, 'n')}) {
        ItemRecord record;
        EXPECT_FALSE(DropboxRecord(File(name), record)) << name;
    }
    ItemRecord record;
    EXPECT_TRUE(DropboxRecord(File(std::string(255, 'n')), record));
}

TEST(DropboxItem, ThatIsNullIsNone) {
    ItemRecord record;
    EXPECT_FALSE(DropboxRecord(Json::Value(), record));
}

TEST(DropboxItem, WithMembersOfAnyTypeIsReadAsFarAsItCanBe) {
    ExpectReadWithMembersOfAnyType(
        File(), {".tag", "path_display", "name", "size", "server_modified"}, DropboxRecord);
}

}  // namespace
}  // namespace ZYROCloud::gvfs
