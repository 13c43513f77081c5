/** What the public documentation tells of searches and errors, as the simulator does it. */
#include "support/cloudsim_gdrive.h"

namespace {

using cloudsim::GDriveTest;
using cloudsim::Got;
using cloudsim::Reason;
using cloudsim::Titles;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::UnorderedElementsAre;

struct GDriveDocumentedTest : GDriveTest {
    std::vector<std::string> Found(const std::string& query) { return Titles(List(query)); }
    void Describe(const std::string& title, const std::string& description) {
        const Got got =
            Send("POST", "/drive/v2/files",
                 R"({"title":")" + title + R"(","description":")" + description + R"("})");
        EXPECT_EQ(200, got.status) << got.body;
    }
};

TEST_F(GDriveDocumentedTest, TitleContainsFindsTheBeginningOfAWordButNotItsMiddle) {
    amy.AddFile(root, "HelloWorld", "");
    EXPECT_THAT(Found("title contains 'Hello'"), ElementsAre("HelloWorld"));
    EXPECT_THAT(Found("title contains 'HELLOW'"), ElementsAre("HelloWorld"));
    EXPECT_THAT(Found("title contains 'World'"), IsEmpty());
}

// How titles fall into words is what users have written down; the service tells only the above.
TEST_F(GDriveDocumentedTest, TitleContainsTakesSignsForSpacesBetweenWords) {
    amy.AddFile(root, "summer-photo_2012.jpg", "");
    for (const char* words : {"photo", "2012", "jpg", "photo.j", "summer photo"}) {
        EXPECT_THAT(Found(std::string("title contains '") + words + "'"),
                    ElementsAre("summer-photo_2012.jpg"))
            << words;
    }
    EXPECT_THAT(Found("title contains 'hoto'"), IsEmpty());
}

TEST_F(GDriveDocumentedTest, TitleContainsWantsEveryWordInAnyOrder) {
    amy.AddFile(root, "annual report draft", "");
    EXPECT_THAT(Found("title contains 'draft ann'"), ElementsAre("annual report draft"));
    EXPECT_THAT(Found("title contains 'draft final'"), IsEmpty());
}

TEST_F(GDriveDocumentedTest, AnApostropheAndABackslashAreEscapedInAContainsAsWell) {
    amy.AddFile(root, "quinn's paper\\essay", "");
    EXPECT_THAT(Found("title contains 'quinn\\'s paper\\\\essay'"),
                ElementsAre("quinn's paper\\essay"));
    EXPECT_EQ(400, Query("title contains 'quinn's paper'").status);
}

TEST_F(GDriveDocumentedTest, FullTextContainsFindsWholeWordsOnly) {
    Describe("a", "HelloWorld");
    EXPECT_THAT(Found("fullText contains 'helloworld'"), ElementsAre("a"));
    EXPECT_THAT(Found("fullText contains 'Hello'"), IsEmpty());
    EXPECT_THAT(Found("fullText contains 'World'"), IsEmpty());
}

TEST_F(GDriveDocumentedTest, FullTextInDoubleQuotesIsAPhrase) {
    Describe("a", "Hello there world");
    Describe("b", "Hello_world");
    EXPECT_THAT(Found("fullText contains '\"Hello there\"'"), ElementsAre("a"));
    EXPECT_THAT(Found("fullText contains '\"Hello world\"'"), ElementsAre("b"));
    EXPECT_THAT(Found("fullText contains 'hello world'"), UnorderedElementsAre("a", "b"));
}

TEST_F(GDriveDocumentedTest, ADateWithoutAZoneIsUtc) {
    const std::string file = amy.AddFile(root, "old", "");
    amy.SetTimes(file, 1338840000, 1338840000);
    EXPECT_THAT(Found("modifiedDate = '2012-06-04T20:00:00'"), ElementsAre("old"));
    EXPECT_THAT(Found("modifiedDate = '2012-06-04T12:00:00-08:00'"), ElementsAre("old"));
}

TEST_F(GDriveDocumentedTest, AParentThatIsOneAlreadyAndOneThatMakesACircleAreBadRequests) {
    const std::string outer = amy.AddFolder(root, "outer"), inner = amy.AddFolder(outer, "inner");
    for (const std::string& parent : {root, inner}) {
        const Got got = Send("PUT", "/drive/v2/files/" + outer + "?addParents=" + parent, "{}");
        EXPECT_EQ(400, got.status) << got.body;
        EXPECT_EQ("badRequest", Reason(got));
    }
}

TEST_F(GDriveDocumentedTest, OnlyItsOwnerTrashesAFile) {
    const std::string file = drive.AddShared(amy, "hers", "abc");
    const Got got = Send("POST", "/drive/v2/files/" + file + "/trash");
    EXPECT_EQ(403, got.status);
    EXPECT_EQ("insufficientFilePermissions", Reason(got));
    EXPECT_FALSE(drive.Facts(amy, file).trashed);
}

}  // namespace
