#include "bridge/gvfs_box_item.h"

#include "support/seams.h"
#include "unit/bridge/item_fixture.h"

namespace ZYROCloud::gvfs {
namespace {

constexpr const char* kAmy = "17";

Json::Value File() {
    return Parsed(R"({"type":"file","id":"12","name":"a.txt","size":5,
                      "created_at":"2015-03-02T02:11:12-08:00",
                      "modified_at":"2016-03-02T02:11:12-08:00",
                      "parent":{"id":"0"},"owned_by":{"id":"99","name":"Ann"}})");
}

/** A folder at the top of the account. */
Json::Value TopFolder(const std::string& name, const std::string& owner_id,
                      const std::string& owner) {
    Json::Value item;
    item["type"] = "folder";
    item["id"] = "34";
    item["name"] = name;
    item["parent"] = Json::nullValue;
    item["owned_by"]["id"] = owner_id;
    item["owned_by"]["name"] = owner;
    return item;
}

class BoxItem : public testing::Test {
  protected:
    void SetUp() override { seams::Reset(); }
    bool Convert(const Json::Value& item) {
        record = ItemRecord();
        return BoxRecord(item, kAmy, record);
    }
    ItemRecord record;
};

TEST_F(BoxItem, ThatIsAFileHasItsKindInItsId) {
    ASSERT_TRUE(Convert(File()));
    EXPECT_EQ(record.id, "files/12");
    EXPECT_EQ(record.name, "a.txt");
    EXPECT_EQ(record.display_name, "a.txt");
    EXPECT_FALSE(record.is_dir);
    EXPECT_EQ(record.size, 5);
    EXPECT_EQ(record.modified.tv_sec, 1456913472);
    EXPECT_EQ(record.access.tv_sec, 1456913472);
    EXPECT_EQ(record.created.tv_sec, 1425291072);
    EXPECT_EQ(record.description, "");
    EXPECT_FALSE(record.keeps_display_name);
}

TEST_F(BoxItem, ThatIsAFolderHasNoSize) {
    Json::Value item = File();
    item["type"] = "folder";
    ASSERT_TRUE(Convert(item));
    EXPECT_EQ(record.id, "folders/12");
    EXPECT_TRUE(record.is_dir);
    EXPECT_EQ(record.size, 0);
    EXPECT_EQ(record.name, "a.txt");  // it has a parent
}

TEST_F(BoxItem, OfAnyOtherTypeIsAFile) {
    for (const char* type : {"file", "", "note"}) {
        Json::Value item = File();
        item["type"] = type;
        ASSERT_TRUE(Convert(item)) << type;
        EXPECT_EQ(record.id, "files/12") << type;
    }
}

TEST_F(BoxItem, ThatIsAWebLinkNeverAppears) {
    Json::Value item = File();
    item["type"] = "web_link";
    EXPECT_FALSE(Convert(item));
}

TEST_F(BoxItem, ThatAnnSharesAtTheTopIsShownWithHerName) {
    ASSERT_TRUE(Convert(TopFolder("Docs", "99", "Ann")));
    EXPECT_EQ(record.name, "Docs - Ann");
    EXPECT_EQ(record.display_name, "Docs");
    EXPECT_TRUE(record.keeps_display_name);
    EXPECT_EQ(record.size, 0);
}

TEST_F(BoxItem, ThatHasItsOwnersNameGetsNoSecondOne) {
    const struct {
        const char* name;
        const char* shown;
    } rows[] = {
        {"Docs - Ann", "Docs - Ann"},
        {"Docs - x - Ann", "Docs - x - Ann"},
        {"Docs - Ann - x", "Docs - Ann - x - Ann"},
        {"Docs - Anna", "Docs - Anna - Ann"},
        {"Docs -Ann", "Docs -Ann - Ann"},
        {"Ann", "Ann - Ann"},
        {" - Ann", " - Ann"},
    };
    for (const auto& row : rows) {
        ASSERT_TRUE(Convert(TopFolder(row.name, "99", "Ann")));
        EXPECT_EQ(record.name, row.shown);
        EXPECT_EQ(record.display_name, row.name);
        EXPECT_EQ(record.keeps_display_name, std::string(row.name) != row.shown);
    }
}

TEST_F(BoxItem, OfTheUserAtTheTopKeepsItsName) {
    ASSERT_TRUE(Convert(TopFolder("Docs", kAmy, "Amy")));
    EXPECT_EQ(record.name, "Docs");
    EXPECT_FALSE(record.keeps_display_name);
}

TEST_F(BoxItem, AtTheTopThatNobodyOwnsIsLeftOutWithALine) {
    for (const char* owner : {"null", "{}", R"({"id":""})", R"({"id":null})", "[]", "7"}) {
        seams::Reset();
        Json::Value item = TopFolder("Docs", "99", "Ann");
        item["owned_by"] = Parsed(owner);
        EXPECT_FALSE(Convert(item)) << owner;
        EXPECT_TRUE(seams::Logged("No owned_by")) << owner;
    }
    Json::Value item = TopFolder("Docs", "99", "Ann");
    item.removeMember("owned_by");
    EXPECT_FALSE(Convert(item));
}

TEST_F(BoxItem, ThatIsAFileAtTheTopIsNotAskedForItsOwner) {
    Json::Value item = TopFolder("a.txt", "99", "Ann");
    item["type"] = "file";
    ASSERT_TRUE(Convert(item));
    EXPECT_EQ(record.name, "a.txt");
}

TEST_F(BoxItem, WithoutTheMemberParentIsNotAtTheTop) {
    Json::Value item = TopFolder("Docs", "99", "Ann");
    item.removeMember("parent");
    ASSERT_TRUE(Convert(item));
    EXPECT_EQ(record.name, "Docs");
}

TEST_F(BoxItem, ThatIsNullIsNone) {
    EXPECT_FALSE(Convert(Json::Value()));
}

TEST_F(BoxItem, WithoutAnIdHasNoneOfItsKindEither) {
    Json::Value item = File();
    item.removeMember("id");
    ASSERT_TRUE(Convert(item));
    EXPECT_EQ(record.id, "");
}

TEST_F(BoxItem, WithMembersOfAnyTypeIsReadAsFarAsItCanBe) {
    ExpectReadWithMembersOfAnyType(
        File(), {"type", "id", "name", "size", "created_at", "modified_at", "parent", "owned_by"},
        [](const Json::Value& item, ItemRecord& out) { return BoxRecord(item, kAmy, out); });
}

}  // namespace
}  // namespace ZYROCloud::gvfs
