#include "bridge/gvfs_gdrive_item.h"

#include "support/seams.h"
#include "unit/bridge/item_fixture.h"
#include "zyrovfs/zyrocloud.h"

namespace ZYROCloud::gvfs {
namespace {

constexpr const char* kDocument = "application/vnd.google-apps.document";
constexpr const char* kFolder = "application/vnd.google-apps.folder";

bool Free(const std::string&) {
    return false;
}
bool Taken(const std::string&) {
    return true;
}

Json::Value Item(const std::string& title, const std::string& type = "text/plain") {
    Json::Value item;
    item["id"] = "x1";
    item["title"] = title;
    item["mimeType"] = type;
    item["createdDate"] = "2015-03-02T10:11:12.000Z";
    item["modifiedDate"] = "2016-03-02T10:11:12.250Z";
    item["lastViewedByMeDate"] = "2017-03-02T10:11:12.000Z";
    return item;
}

ItemRecord Converted(const Json::Value& item, const IsTaken& is_taken = Free) {
    ItemRecord record;
    EXPECT_TRUE(GoogleRecord(item, is_taken, record));
    return record;
}

TEST(GooglePath, StandsForWhatItsFirstNameSays) {
    const struct {
        const char* path;
        int kind;
    } rows[] = {
        {nullptr, 0},
        {"", 1},
        {"/", 1},
        {"///", 1},
        {"/My Drive", 2},
        {"My Drive", 2},
        {"//My Drive/", 2},
        {"/Starred", 3},
        {"/Starred/", 3},
        {"/My Drive/a", 4},
        {"/My Drive/a/b", 4},
        {"/My Drive//", 4},
        {"/Starred/a", 5},
        {"/Starred/a/b", 6},
        {"/Starred//", 6},
        {"/My Drives", 0},
        {"/Starred x", 0},
        {"/my drive", 0},
        {"/other", 0},
        {"/other/My Drive", 0},
        {" /My Drive", 0},
    };
    for (const auto& row : rows) {
        EXPECT_EQ(ZYROCloud_Cloud_Google_Get_File_Type(row.path), row.kind)
            << (row.path == nullptr ? "null" : row.path);
    }
}

TEST(GooglePath, IsAFirstFolderOnlyByItsExactName) {
    for (const char* path : {"Starred", "/Starred", "//My Drive", "My Drive"}) {
        EXPECT_EQ(ZYROCloud_Cloud_Google_Is_First_Folder(path), 1) << path;
    }
    for (const char* path : {"", "/", "/Starred/", "My Drive/", "/Starred/a", "starred", "other"}) {
        EXPECT_EQ(ZYROCloud_Cloud_Google_Is_First_Folder(path), 0) << path;
    }
    EXPECT_EQ(ZYROCloud_Cloud_Google_Is_First_Folder(nullptr), 0);
}

TEST(GooglePath, BelowMyDriveIsOneOfTheAccount) {
    EXPECT_EQ(PathInMyDrive("/My Drive/a/b"), "/a/b");
    EXPECT_EQ(PathInMyDrive("My Drive/a"), "/a");
    for (const char* path : {"", "/", "/My Drive", "/My Drive/", "/Starred/a", "/My Drives/a"}) {
        EXPECT_EQ(PathInMyDrive(path), "") << path;
    }
}

TEST(GoogleItem, ThatIsADocumentGetsTheExtensionOfItsKind) {
    const struct {
        const char* title;
        const char* type;
        const char* name;
    } rows[] = {
        {"report", "application/vnd.google-apps.document", "report.gdoc"},
        {"report.txt", "application/vnd.google-apps.document", "report.txt.gdoc"},
        {"report.gdoc", "application/vnd.google-apps.document", "report.gdoc"},
        {"report.GDOC", "application/vnd.google-apps.document", "report.GDOC.gdoc"},
        {"a.gdoc.b", "application/vnd.google-apps.document", "a.gdoc.b.gdoc"},
        {"d", "application/vnd.google-apps.drawing", "d.gdraw"},
        {"f", "application/vnd.google-apps.form", "f.gform"},
        {"p", "application/vnd.google-apps.presentation", "p.gslides"},
        {"s", "application/vnd.google-apps.spreadsheet", "s.gsheet"},
        {"t", "application/vnd.google-apps.fusiontable", "t.gtable"},
        {"j", "application/vnd.google-apps.script", "j.gscript"},
        {"plain", "text/plain", "plain"},
        {"folder", "application/vnd.google-apps.folder", "folder"},
    };
    for (const auto& row : rows) {
        const ItemRecord record = Converted(Item(row.title, row.type));
        EXPECT_EQ(record.name, row.name);
        EXPECT_EQ(record.display_name, row.name);
    }
}

TEST(GoogleItem, WithoutATitleHasTheNameThatItWasUploadedBy) {
    Json::Value item = Item("");
    item["originalFilename"] = "scan.pdf";
    EXPECT_EQ(Converted(item).name, "scan.pdf");
    EXPECT_EQ(Converted(item).display_name, "scan.pdf");
    item["title"] = "title";
    EXPECT_EQ(Converted(item).name, "title");
}

TEST(GoogleItem, WhoseNameIsTakenGetsItsDateOfCreationIntoIt) {
    const struct {
        const char* title;
        const char* type;
        const char* name;
    } rows[] = {
        {"a.txt", "text/plain", "a - 2015-03-02T10:11:12.000Z.txt"},
        {"a.b.txt", "text/plain", "a.b - 2015-03-02T10:11:12.000Z.txt"},
        {"a", "text/plain", "a - 2015-03-02T10:11:12.000Z"},
        {"a", kDocument, "a - 2015-03-02T10:11:12.000Z.gdoc"},
        {"a", kFolder, "a - 2015-03-02T10:11:12.000Z"},
        {".a", "text/plain", " - 2015-03-02T10:11:12.000Z.a"},
    };
    for (const auto& row : rows) {
        const ItemRecord record = Converted(Item(row.title, row.type), Taken);
        EXPECT_EQ(record.name, row.name);
        EXPECT_EQ(record.display_name,
                  std::string(row.title) + (row.type == kDocument ? ".gdoc" : ""));
        EXPECT_TRUE(record.keeps_display_name);
    }
}

TEST(GoogleItem, AsksForItsNameWithTheExtensionThatItIsShownWith) {
    std::string asked;
    Converted(Item("report", kDocument), [&asked](const std::string& name) {
        asked = name;
        return false;
    });
    EXPECT_EQ(asked, "report.gdoc");
}

TEST(GoogleItem, HasTheSizeOfItsBytesOrOfItsLinksText) {
    Json::Value item = Item("a");
    item["fileSize"] = "12";
    item["alternateLink"] = "https://example.com/a";
    EXPECT_EQ(Converted(item).size, 12);
    item["fileSize"] = 13;
    EXPECT_EQ(Converted(item).size, 13);
    item.removeMember("fileSize");
    EXPECT_EQ(Converted(item).size,
              static_cast<long long>(std::string(R"({"url":"https://example.com/a"})").size()));
    item.removeMember("alternateLink");
    EXPECT_EQ(Converted(item).size, 0);
    for (const char* size : {"-5", "no number", "", "99999999999999999999"}) {
        item["fileSize"] = size;
        EXPECT_EQ(Converted(item).size, 0) << size;
    }
}

TEST(GoogleItem, ThatIsAFolderHasNoSize) {
    Json::Value item = Item("a", kFolder);
    item["fileSize"] = "12";
    item["alternateLink"] = "https://example.com/a";
    const ItemRecord record = Converted(item);
    EXPECT_TRUE(record.is_dir);
    EXPECT_EQ(record.size, 0);
}

TEST(GoogleItem, HasItsTimes) {
    const ItemRecord record = Converted(Item("a"));
    EXPECT_EQ(record.modified.tv_sec, 1456913472);
    EXPECT_EQ(record.modified.tv_usec, 250000);
    EXPECT_EQ(record.access.tv_sec, 1488449472);
    EXPECT_EQ(record.created.tv_sec, 1425291072);
    EXPECT_FALSE(record.is_dir);
}

TEST(GoogleItem, ThatNobodyHasViewedWasReadWhenItWasWritten) {
    for (const char* viewed : {"", "1970-01-01T00:00:00.000Z", "never"}) {
        Json::Value item = Item("a");
        item["lastViewedByMeDate"] = viewed;
        EXPECT_EQ(Converted(item).access.tv_sec, 1456913472) << viewed;
        EXPECT_EQ(Converted(item).access.tv_usec, 250000) << viewed;
    }
}

TEST(GoogleItem, WithoutTimesHasThoseOfTheEpochAndNoLine) {
    seams::Reset();
    Json::Value item = Item("a");
    for (const char* date : {"createdDate", "modifiedDate", "lastViewedByMeDate"}) {
        item.removeMember(date);
    }
    const ItemRecord record = Converted(item);
    for (const timeval& time : {record.modified, record.access, record.created}) {
        EXPECT_EQ(time.tv_sec, 0);
        EXPECT_EQ(time.tv_usec, 0);
    }
    EXPECT_THAT(seams::LogLines(), testing::IsEmpty()) << seams::LogDump();
}

TEST(GoogleItem, TellsDriversWhereItsBytesAre) {
    Json::Value item = Item("a", kDocument);
    item["alternateLink"] = "https://example.com/a";
    item["exportLinks"]["text/plain"] = "https://example.com/export";
    item["downloadUrl"] = "https://example.com/d";
    item["labels"]["starred"] = true;
    const Json::Value description = Parsed(Converted(item).description);
    EXPECT_EQ(
        description.getMemberNames(),
        (std::vector<std::string>{"alternateLink", "downloadUrl", "exportLinks", "mimeType"}));
    for (const char* member : {"alternateLink", "downloadUrl", "exportLinks", "mimeType"}) {
        EXPECT_EQ(description[member], item[member]) << member;
    }
}

TEST(GoogleItem, ThatIsNullIsNone) {
    ItemRecord record;
    EXPECT_FALSE(GoogleRecord(Json::Value(), Free, record));
}

TEST(GoogleItem, WithMembersOfAnyTypeIsReadAsFarAsItCanBe) {
    for (const char* value :
         {"null", "7", "-7", "1e300", "true", "[]", "[1]", "{}", R"({"a":1})"}) {
        for (const char* member :
             {"id", "title", "originalFilename", "mimeType", "fileSize", "alternateLink",
              "downloadUrl", "exportLinks", "createdDate", "modifiedDate", "lastViewedByMeDate"}) {
            Json::Value item = Item("a.txt");
            item[member] = Parsed(value);
            ItemRecord record;
            EXPECT_TRUE(GoogleRecord(item, Taken, record)) << member << value;
            EXPECT_EQ(record.id, member == std::string("id") ? "" : "x1") << member << value;
        }
    }
    for (const char* item : {"7", "true", "\"text\"", "[]", "[{}]", "{}"}) {
        ItemRecord record;
        EXPECT_TRUE(GoogleRecord(Parsed(item), Free, record)) << item;
        EXPECT_EQ(record.id, "") << item;
    }
}

}  // namespace
}  // namespace ZYROCloud::gvfs
