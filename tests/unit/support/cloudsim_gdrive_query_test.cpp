/** The query language of the simulated Google Drive. */
#include "support/cloudsim_gdrive.h"

namespace {

using cloudsim::GDriveTest;
using cloudsim::Got;
using cloudsim::Reason;
using cloudsim::Titles;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::UnorderedElementsAre;

struct GDriveQueryTest : GDriveTest {
    std::vector<std::string> Found(const std::string& query) { return Titles(List(query)); }
};

TEST_F(GDriveQueryTest, NoQueryFindsAllAndTheTrashAsWell) {
    amy.AddFile(root, "a", "");
    drive.SetTrashed(amy, amy.AddFile(root, "b", ""), true);
    EXPECT_THAT(Found(""), ElementsAre("a", "b"));
    EXPECT_THAT(Found("  "), ElementsAre("a", "b"));
    EXPECT_THAT(Found("trashed=false"), ElementsAre("a"));
    EXPECT_THAT(Found("trashed != false"), ElementsAre("b"));
    EXPECT_THAT(Found("trashed"), ElementsAre("b"));
}

TEST_F(GDriveQueryTest, TitlesAreEqualWithoutRegardToCase) {
    amy.AddFile(root, "Photo", "");
    amy.AddFile(root, "photo", "");
    amy.AddFile(root, "photos", "");
    EXPECT_THAT(Found("title = 'PHOTO'"), UnorderedElementsAre("Photo", "photo"));
    EXPECT_THAT(Found("title != 'photo'"), ElementsAre("photos"));
}

TEST_F(GDriveQueryTest, ContainsFindsOnlyBeginningsOfWords) {
    amy.AddFile(root, "HelloWorld", "");
    amy.AddFile(root, "Brave World", "");
    EXPECT_THAT(Found("title contains 'hello'"), ElementsAre("HelloWorld"));
    EXPECT_THAT(Found("title contains 'world'"), ElementsAre("Brave World"));
}

TEST_F(GDriveQueryTest, QuotesAndBackslashesAreEscaped) {
    amy.AddFile(root, "Valentine's Day", "");
    amy.AddFile(root, "back\\slash", "");
    amy.AddFile(root, "end\\", "");
    amy.AddFile(root, "say \"it\"", "");
    EXPECT_THAT(Found("title = 'Valentine\\'s Day'"), ElementsAre("Valentine's Day"));
    EXPECT_THAT(Found("title = 'back\\\\slash'"), ElementsAre("back\\slash"));
    EXPECT_THAT(Found("title = 'end\\\\'"), ElementsAre("end\\"));
    EXPECT_THAT(Found("title = 'say \"it\"'"), ElementsAre("say \"it\""));
    for (const char* query : {"title = 'Valentine's Day'", "title = 'end\\'",
                              "title = 'back\\slash'", "title = 'open", "title = '"}) {
        EXPECT_EQ("invalid", Reason(Query(query))) << query;
    }
}

TEST_F(GDriveQueryTest, AnInjectedConditionStaysText) {
    amy.AddFile(root, "secret", "");
    amy.AddFile(root, "x' or title = 'secret", "");
    EXPECT_THAT(Found("title = 'x\\' or title = \\'secret'"), ElementsAre("x' or title = 'secret"));
}

TEST_F(GDriveQueryTest, MimeTypesAreEqualOrHoldAPart) {
    amy.AddFolder(root, "folder");
    amy.AddFile(root, "a.png", "");
    amy.AddFile(root, "a.txt", "");
    drive.AddDocument(amy, root, "doc", "document", "");
    EXPECT_THAT(Found("mimeType = 'application/vnd.google-apps.folder'"), ElementsAre("folder"));
    EXPECT_THAT(Found("mimeType contains 'image/'"), ElementsAre("a.png"));
    EXPECT_THAT(Found("mimeType contains 'google-apps' and "
                      "mimeType != 'application/vnd.google-apps.folder'"),
                ElementsAre("doc"));
}

TEST_F(GDriveQueryTest, InParentsLooksIntoOneFolderOnly) {
    const std::string one = amy.AddFolder(root, "one"), two = amy.AddFolder(root, "two");
    const std::string both = amy.AddFile(one, "both", "");
    amy.AddFile(one, "first", "");
    drive.SetParents(amy, both, {one, two});
    EXPECT_THAT(Found("'" + one + "' in parents"), UnorderedElementsAre("both", "first"));
    EXPECT_THAT(Found("'" + two + "' in parents"), ElementsAre("both"));
    EXPECT_THAT(Found("'" + one + "' in parents and '" + two + "' in parents"),
                ElementsAre("both"));
    EXPECT_THAT(Found("'" + two + "' in parents or 'root' in parents"),
                UnorderedElementsAre("one", "two", "both"));
    EXPECT_THAT(Found("not '" + one + "' in parents and title contains 'f'"), IsEmpty());
    const Got gone = Query("trashed=false and 'gone' in parents");
    EXPECT_EQ(404, gone.status);
    EXPECT_EQ("notFound", Reason(gone));
}

TEST_F(GDriveQueryTest, ReadsFromLeftToRightAndGroupsByBracketsAlone) {
    amy.AddFile(root, "a", "");
    amy.AddFile(root, "b", "");
    drive.SetStarred(amy, amy.AddFile(root, "c", ""), true);
    EXPECT_THAT(Found("title = 'a' or title = 'c' and starred = true"), ElementsAre("c"));
    EXPECT_THAT(Found("title = 'a' or (title = 'c' and starred = true)"), ElementsAre("a", "c"));
    EXPECT_THAT(Found("starred = true and title = 'c' or title = 'a'"), ElementsAre("a", "c"));
    EXPECT_THAT(Found("trashed=false and 'root' in parents and ((title = 'a') or (title='b'))"),
                ElementsAre("a", "b"));
    EXPECT_THAT(Found("not (title = 'a' or title = 'b')"), ElementsAre("c"));
    EXPECT_THAT(Found("not title = 'a' and not title = 'b'"), ElementsAre("c"));
    EXPECT_THAT(Found("not not title = 'a'"), ElementsAre("a"));
    EXPECT_THAT(Found("title='a' OR title='b'"), ElementsAre("a", "b"));
}

TEST_F(GDriveQueryTest, ComparesDatesInAnyZone) {
    const std::string file = amy.AddFile(root, "old", "");
    amy.SetTimes(file, 1338840000, 1338840000);  // 2012-06-04T20:00:00Z
    amy.AddFile(root, "new", "");
    EXPECT_THAT(Found("modifiedDate = '2012-06-04T12:00:00-08:00'"), ElementsAre("old"));
    EXPECT_THAT(Found("modifiedDate > '2012-06-04T20:00:00'"), ElementsAre("new"));
    EXPECT_THAT(Found("modifiedDate <= '2012-06-04T20:00:00.000Z'"), ElementsAre("old"));
    EXPECT_EQ(400, Query("modifiedDate > 'yesterday'").status);
    EXPECT_EQ(400, Query("modifiedDate contains '2012'").status);
}

TEST_F(GDriveQueryTest, RefusesWhatIsNoQuery) {
    for (const char* query : {"title",
                              "title =",
                              "= 'a'",
                              "title = a",
                              "title = 'a' and",
                              "and title = 'a'",
                              "(title = 'a'",
                              "title = 'a')",
                              "()",
                              "title = 'a' title = 'b'",
                              "name = 'a'",
                              "Title = 'a'",
                              "'a' in",
                              "'a' in folders",
                              "parents in 'a'",
                              "starred = 'true'",
                              "starred = yes",
                              "title > 'a'",
                              "not",
                              "mimeType = 3",
                              "title = 'a';",
                              "fullText = 'a'",
                              "\xff"}) {
        const Got got = Query(query);
        EXPECT_EQ(400, got.status) << query;
        EXPECT_EQ("invalid", Reason(got)) << query;
        EXPECT_EQ("q", got.Json()["error"]["errors"][0]["location"].asString()) << query;
    }
    EXPECT_EQ(400, Query(std::string(500, '(')).status);
    std::string many;
    for (int i = 0; i < 500; i++) {
        many += "not ";
    }
    EXPECT_EQ(400, Query(many + "starred").status);
}

TEST_F(GDriveQueryTest, FindsTitlesOfAnyLetters) {
    for (const std::string title :
         {"\xf0\x9f\x8d\x8e", "\xe2\x80\x8fright", "a b+c&d=e%20", "\xc3\x84", "tab\there", "'"}) {
        amy.AddFile(root, title, "");
        std::string quoted;
        for (const char c : title) {
            quoted += c == '\'' || c == '\\' ? std::string("\\") + c : std::string(1, c);
        }
        EXPECT_THAT(Found("title = '" + quoted + "'"), ElementsAre(title));
    }
    EXPECT_THAT(Found("title = '\xc3\xa4'"), ElementsAre("\xc3\x84"));
}

}  // namespace
