/** The simulated Dropbox's listings and cursors. */
#include "unit/support/cloudsim_dropbox_fixture.h"

namespace {

using cloudsim::Got;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::UnorderedElementsAre;

struct DropboxListTest : DropboxTest {
    Json::Value List(const Json::Value& args) { return Call("files/list_folder", args).Json(); }
    Got More(const Json::Value& page) {
        Json::Value args;
        args["cursor"] = page["cursor"];
        return Call("files/list_folder/continue", args);
    }
};

TEST_F(DropboxListTest, PagesThroughAFolderUntilThereIsNoMore) {
    amy.AddMany("root", 7, 1);
    Json::Value page = List(Path(""));
    EXPECT_THAT(Names(page), ElementsAre("item-000000.bin", "item-000001.bin", "item-000002.bin"));
    EXPECT_TRUE(page["has_more"].asBool());
    page = More(page).Json();
    EXPECT_EQ(3u, page["entries"].size());
    EXPECT_TRUE(page["has_more"].asBool());
    page = More(page).Json();
    EXPECT_THAT(Names(page), ElementsAre("item-000006.bin"));
    EXPECT_FALSE(page["has_more"].asBool());
}

TEST_F(DropboxListTest, AFullLastPageIsFollowedByNone) {
    amy.AddMany("root", 6, 1);
    const Json::Value last = More(List(Path(""))).Json();
    EXPECT_EQ(3u, last["entries"].size());
    EXPECT_FALSE(last["has_more"].asBool());
}

TEST_F(DropboxListTest, TakesASmallerLimitButNoLargerOneThanItsOwn) {
    amy.AddMany("root", 5, 1);
    Json::Value args = Path("");
    args["limit"] = 2;
    EXPECT_EQ(2u, List(args)["entries"].size());
    args["limit"] = 2000;
    EXPECT_EQ(3u, List(args)["entries"].size());
    args["limit"] = 2001;
    EXPECT_EQ(400, Call("files/list_folder", args).status);
}

TEST_F(DropboxListTest, ACursorMayBeUsedAgain) {
    amy.AddMany("root", 5, 1);
    const Json::Value first = List(Path(""));
    EXPECT_EQ(More(first).body, More(first).body);
}

TEST_F(DropboxListTest, GoesDownOnlyWhenAskedAndShowsTheFolderItselfThen) {
    amy.AddPath("/a/b/c.txt", "text");
    EXPECT_THAT(Names(List(Path("/A"))), ElementsAre("b"));
    Json::Value args = Path("/A");
    args["recursive"] = true;
    EXPECT_THAT(Names(List(args)), UnorderedElementsAre("a", "b", "c.txt"));
    args["path"] = "";
    EXPECT_THAT(Names(List(args)), UnorderedElementsAre("a", "b", "c.txt"));
}

TEST_F(DropboxListTest, EntriesTellFilesFromFolders) {
    amy.AddPath("/docs/a.txt", "text");
    amy.AddFile("root", "z", "text");
    const Json::Value entries = List(Path(""))["entries"];
    EXPECT_EQ("folder", entries[0][".tag"].asString());
    EXPECT_FALSE(entries[0].isMember("size"));
    EXPECT_EQ("file", entries[1][".tag"].asString());
    EXPECT_EQ(4u, entries[1]["size"].asUInt64());
}

TEST_F(DropboxListTest, ListsAnEmptyFolder) {
    amy.AddFolder("root", "docs");
    const Json::Value page = List(Path("/docs"));
    EXPECT_TRUE(page["entries"].isArray());
    EXPECT_EQ(0u, page["entries"].size());
    EXPECT_FALSE(page["has_more"].asBool());
}

TEST_F(DropboxListTest, ListsNeitherFilesNorWhatIsMissing) {
    amy.AddFile("root", "a", "text");
    EXPECT_EQ("409 path/not_folder/", Summary(Call("files/list_folder", Path("/a"))));
    EXPECT_EQ("409 path/not_found/", Summary(Call("files/list_folder", Path("/none"))));
    EXPECT_EQ("409 path/not_found/", Summary(Call("files/list_folder", Path("/a/b"))));
}

TEST_F(DropboxListTest, BehindTheEndACursorTellsWhatHasChanged) {
    amy.AddFile("root", "kept", "text");
    amy.AddFile("root", "Gone", "text");
    const std::string other = amy.AddFile("root", "other", "text");
    Json::Value page = List(Path(""));
    EXPECT_FALSE(page["has_more"].asBool());
    EXPECT_THAT(Names(More(page).Json()), IsEmpty());
    Call("files/delete_v2", Path("/gone"));
    amy.AddFolder("root", "new");
    Json::Value args = Path("/other");
    args["mode"] = "overwrite";
    Send("upload", args, "another");
    page = More(page).Json();
    EXPECT_THAT(Names(page), ElementsAre("new", "other", "Gone"));
    EXPECT_EQ("deleted", page["entries"][2][".tag"].asString());
    EXPECT_THAT(Names(More(page).Json()), IsEmpty());
}

TEST_F(DropboxListTest, TheLatestCursorTellsOnlyWhatComesLater) {
    amy.AddMany("root", 5, 1);
    const Json::Value latest = Call("files/list_folder/get_latest_cursor", Path("")).Json();
    EXPECT_THAT(Names(More(latest).Json()), IsEmpty());
    amy.AddFile("root", "new", "");
    EXPECT_THAT(Names(More(latest).Json()), ElementsAre("new"));
}

TEST_F(DropboxListTest, AListingGoesOnAsItBeganAndTheChangesComeBehind) {
    amy.AddMany("root", 4, 1);
    Json::Value page = List(Path(""));
    Call("files/delete_v2", Path("/item-000003.bin"));
    page = More(page).Json();
    EXPECT_THAT(Names(page), ElementsAre("item-000003.bin"));
    page = More(page).Json();
    EXPECT_EQ("deleted", page["entries"][0][".tag"].asString());
}

TEST_F(DropboxListTest, ShowsDeletedItemsToThoseWhoAskForThem) {
    amy.AddPath("/docs/a.txt", "text");
    amy.AddPath("/docs/b.txt", "text");
    Call("files/delete_v2", Path("/docs/a.txt"));
    Json::Value args = Path("/docs");
    EXPECT_THAT(Names(List(args)), ElementsAre("b.txt"));
    args["include_deleted"] = true;
    EXPECT_THAT(Names(List(args)), ElementsAre("b.txt", "a.txt"));
}

TEST_F(DropboxListTest, RefusesCursorsThatItNeverGaveAndThoseOfOthers) {
    Json::Value wrong;
    wrong["cursor"] = "nonsense";
    const Got got = More(wrong);
    EXPECT_EQ(400, got.status);
    EXPECT_THAT(got.body, HasSubstr("Invalid \"cursor\" parameter"));
    const Json::Value page = List(Path(""));
    client.UseToken(bob.IssueTokens().access_token);
    EXPECT_EQ(400, More(page).status);
}

TEST_F(DropboxListTest, TellsOfCursorsThatWereResetAndFoldersThatAreGone) {
    amy.AddPath("/docs/a.txt", "text");
    const Json::Value page = List(Path("/docs"));
    Call("files/delete_v2", Path("/docs"));
    EXPECT_EQ("409 path/not_found/", Summary(More(page)));
    dropbox.ResetCursors();
    EXPECT_EQ("409 reset/", Summary(More(page)));
}

}  // namespace
