#include "unit/cloud/gdrive/gdrive_fixture.h"

namespace ZYROCloud {
namespace {

using GDriveListing = GDriveTest;
using GDriveCondition = GDriveTest;

constexpr const char* kFiles = "/drive/v2/files";

Fault Page(const std::string& body) {
    return Fault::On("GET", kFiles).Answer(200, body);
}

TEST_F(GDriveListing, TwoPagesOfThreeAndTwoItemsGiveFiveInPageOrderLessTheHidden) {
    service.AddFault(Page(
        R"({"items":[{"title":"a"},{"title":"'"},{"title":"b"}],"nextPageToken":"~next token&"})"));
    service.AddFault(
        Page(R"({"items":[{"title":"c"},{"title":".ZyrotechWorkingDirectory"}]})").After(1));
    Json::Value out;
    EXPECT_TRUE(drive->ListFolder("root", Json::Value(), out)) << seams::LogDump();
    EXPECT_THAT(Each(out, "title"), ElementsAre("a", "b", "c"));
    const auto requests = service.Journal().All();
    ASSERT_EQ(requests.size(), 2U);
    EXPECT_EQ(requests[0].Query("pageToken"), "");
    EXPECT_EQ(requests[1].Query("pageToken"), "~next token&");
    EXPECT_EQ(requests[1].Query("q"), requests[0].Query("q"));
}

TEST_F(GDriveListing, AFolderOfThreePagesIsReadToItsEnd) {
    const std::string many = amy.AddFolder(root, "many");
    amy.AddMany(many, 250, 1);
    Json::Value out;
    EXPECT_TRUE(drive->ListFolder(many, Json::Value(), out)) << seams::LogDump();
    EXPECT_EQ(out.size(), 250U);
    EXPECT_EQ(Requests().size(), 3U);
    EXPECT_FALSE(service.Journal().All()[0].target.find("maxResults") != std::string::npos);
}

TEST_F(GDriveListing, LeavesOutTheTrash) {
    amy.AddPath("/docs/a.txt", "x");
    service.SetTrashed(amy, amy.AddPath("/docs/b.txt", "x"), true);
    Json::Value out;
    EXPECT_TRUE(drive->ListFolder(amy.Find("/docs"), Json::Value(), out));
    EXPECT_THAT(Each(out, "title"), ElementsAre("a.txt"));
}

TEST_F(GDriveListing, OfAnItemInSeveralFoldersShowsItInEach) {
    const std::string id = amy.AddPath("/one/a.txt", "x");
    const std::string two = amy.AddFolder(root, "two");
    service.SetParents(amy, id, {amy.Find("/one"), two});
    for (const std::string& folder : {amy.Find("/one"), two}) {
        Json::Value out;
        EXPECT_TRUE(drive->ListFolder(folder, Json::Value(), out));
        EXPECT_THAT(Each(out, "id"), ElementsAre(id));
    }
}

TEST_F(GDriveListing, OfAFolderThatIsGoneIsNotFound) {
    Json::Value out;
    EXPECT_FALSE(drive->ListFolder("none", Json::Value(), out));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_NOT_FOUND);
}

TEST_F(GDriveCondition, NamesTheFolderAndTheCallersOwnInBrackets) {
    service.AddFault(Fault::On("GET", kFiles).Times(4).Answer(200, "{}"));
    const struct {
        const char *folder, *params, *query;
    } rows[] = {
        {"", "{}", "trashed=false"},
        {"12", "{}", "trashed=false and '12' in parents"},
        {"", R"({"q":"starred=true"})", "trashed=false and (starred=true)"},
        {"12", R"({"q":"a or b","fields":"items"})",
         "trashed=false and '12' in parents and (a or b)"},
    };
    for (const auto& row : rows) {
        Json::Value out;
        EXPECT_TRUE(drive->ListFolder(row.folder, Object(row.params), out)) << row.params;
        EXPECT_EQ(Last().Query("q"), row.query);
        EXPECT_TRUE(out.isArray());
    }
    EXPECT_EQ(Last().Query("fields"), "items");
}

TEST_F(GDriveCondition, FindsWhatIsStarredInAllTheAccount) {
    service.SetStarred(amy, amy.AddPath("/deep/down/a.txt", "x"), true);
    amy.AddPath("/b.txt", "x");
    Json::Value out;
    EXPECT_TRUE(drive->ListFolder("", Object(R"({"q":"starred=true"})"), out));
    EXPECT_THAT(Each(out, "title"), ElementsAre("a.txt"));
}

TEST_F(GDriveListing, OnePageIsTheServicesAnswer) {
    amy.AddPath("/'", "x");
    Json::Value out;
    EXPECT_TRUE(drive->ListFolder("root", Json::Value(), out, ""));
    EXPECT_EQ(out["kind"], "drive#fileList");
    EXPECT_THAT(Each(out["items"], "title"), ElementsAre("'")) << "nothing is hidden here";
    EXPECT_FALSE(drive->ListFolder("root", Json::Value(), out, "no token of ours"));
}

TEST_F(GDriveListing, AnAnswerThatIsNoJsonHasALineOfItsOwn) {
    for (const char* body : {"<html>", "", "{\"items\":[", "{} {}"}) {
        service.AddFault(Page(body));
        drive->SetError(VFS_ERR_NONE, "");
        seams::Reset();
        Json::Value out;
        EXPECT_FALSE(drive->ListFolder("root", Json::Value(), out)) << body;
        EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CLOUD_FAILED);
        EXPECT_TRUE(seams::Logged("Failed to parse result, format error")) << seams::LogDump();
    }
}

TEST_F(GDriveListing, APageThatFailsFailsTheListingAndItemsStay) {
    service.AddFault(Page(R"({"items":[{"title":"a"}],"nextPageToken":"2"})"));
    service.AddFault(Fault::On("GET", kFiles).After(1).Times(7).Answer(403, "{}"));
    Json::Value out;
    EXPECT_FALSE(drive->ListFolder("root", Json::Value(), out));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_FORBIDDEN);
    EXPECT_THAT(Each(out, "title"), ElementsAre("a"));
}

TEST_F(GDriveListing, APageThatRepeatsItsOwnTokenEndsTheListingWithALine) {
    service.AddFault(Fault::On("GET", kFiles)
                         .Times(2)
                         .Answer(200, R"({"items":[{"title":"a"}],"nextPageToken":"again"})"));
    Json::Value out;
    EXPECT_FALSE(drive->ListFolder("root", Json::Value(), out));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CLOUD_FAILED);
    EXPECT_TRUE(seams::Logged("Listing goes in a circle, again")) << seams::LogDump();
    EXPECT_THAT(Each(out, "title"), ElementsAre("a", "a")) << "what came stays";
    EXPECT_EQ(Requests().size(), 2U);
}

TEST_F(GDriveListing, ItemsWithoutNameIdOrAnythingStay) {
    service.AddFault(Page(
        R"({"items":[{"id":"1"},{"title":""},{},null,{"title":null},{"title":7,"fileSize":{}}]})"));
    Json::Value out;
    EXPECT_TRUE(drive->ListFolder("root", Json::Value(), out)) << seams::LogDump();
    EXPECT_EQ(out.size(), 6U);
}

TEST_F(GDriveListing, NamesOfAnyKindAreShownUnlessTheTreeCannotHoldThem) {
    const std::vector<std::string> shown = {std::string(255, 'n'),  "a\"b'c\\d",
                                            "\xf0\x9f\x98\x80.txt", "\xe2\x80\x8f right to left",
                                            "\xc4\xb0\xc4\xb1",     "%s%n"};
    Json::Value page;
    for (const std::string& title : shown) {
        page["items"][page["items"].size()]["title"] = title;
    }
    for (const std::string& title : {std::string(256, 'n'), std::string(4096, 'n'),
                                     std::string("a/b"), std::string("\""), std::string("'")}) {
        page["items"][page["items"].size()]["title"] = title;
    }
    service.AddFault(Page(json::toString(page)));
    Json::Value out;
    EXPECT_TRUE(drive->ListFolder("root", Json::Value(), out)) << seams::LogDump();
    EXPECT_EQ(Each(out, "title"), shown);
}

TEST_F(GDriveListing, NamesThatAreNoUtf8StayOrFailTheListing) {
    service.AddFault(Page("{\"items\":[{\"title\":\"\xff\xfe\x80\"},{\"title\":\"a\\u0000b\"}]}"));
    Json::Value out;
    EXPECT_TRUE(drive->ListFolder("root", Json::Value(), out)) << seams::LogDump();
    ASSERT_EQ(out.size(), 2U);
    EXPECT_EQ(out[0]["title"].asString(), "\xff\xfe\x80");
    EXPECT_EQ(out[1]["title"].asString(), std::string("a\0b", 3));
}

TEST_F(GDriveListing, ValuesOfTheWrongTypeAreAFailureOfTheCloud) {
    for (const char* body : {R"({"items":{"a":{"title":"x"}}})", R"({"items":"text"})",
                             R"({"items":7})", R"({"items":[],"nextPageToken":{"x":1}})",
                             R"({"items":[],"nextPageToken":["x"]})", "[]", R"("text")", "7"}) {
        service.AddFault(Page(body));
        drive->SetError(VFS_ERR_NONE, "");
        seams::Reset();
        Json::Value out;
        EXPECT_FALSE(drive->ListFolder("root", Json::Value(), out)) << body;
        EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CLOUD_FAILED) << body;
        EXPECT_NE(seams::LogDump(), "") << body;
    }
}

TEST_F(GDriveListing, AnItemOfTheWrongTypeDoesNotHideTheOthers) {
    for (const char* item : {"7", "\"text\"", "[]", R"({"title":{"x":1}})", R"({"title":["x"]})"}) {
        service.AddFault(Page(std::string(R"({"items":[)") + item + R"(,{"title":"good"}]})"));
        Json::Value out;
        EXPECT_TRUE(drive->ListFolder("root", Json::Value(), out)) << item;
        ASSERT_EQ(out.size(), 2U) << item;
        EXPECT_EQ(out[1]["title"], "good") << item;
    }
}

TEST_F(GDriveListing, AnAnswerWithoutItemsIsAnEmptyFolder) {
    for (const char* body : {"{}", "null", R"({"items":null})", R"({"items":[]})",
                             R"({"nextPageToken":null})", R"({"nextPageToken":""})"}) {
        service.AddFault(Page(body));
        Json::Value out;
        EXPECT_TRUE(drive->ListFolder("root", Json::Value(), out)) << body << seams::LogDump();
        EXPECT_TRUE(out.isArray() && out.empty()) << body;
    }
}

TEST_F(GDriveListing, ACallersQueryOfTheWrongTypeIsAFailure) {
    Json::Value out;
    EXPECT_FALSE(drive->ListFolder("", Object(R"({"q":{"a":1}})"), out));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CLOUD_FAILED);
    EXPECT_THAT(Requests(), IsEmpty());
}

}  // namespace
}  // namespace ZYROCloud
