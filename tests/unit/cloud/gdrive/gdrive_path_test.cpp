#include "unit/cloud/gdrive/gdrive_fixture.h"

namespace ZYROCloud {
namespace {

using testing::SizeIs;

using GDriveTreeId = GDriveTest;
using GDriveNames = GDriveTest;
using GDrivePick = GDriveTest;
using GDriveWalk = GDriveTest;

constexpr const char* kFiles = "/drive/v2/files";
constexpr const char* kFolders = "mimeType = 'application/vnd.google-apps.folder'";
constexpr int64_t kCreated = 1425291072;  // 2015-03-02T10:11:12Z

Fault Found(const std::string& items) {
    return Fault::On("GET", kFiles).Answer(200, R"({"items":[)" + items + "]}");
}

/** This service's 403 is asked again, since it may be a limit of its rate. */
Fault Refused() {
    return Fault::On("GET", kFiles).Times(7).Answer(403, "{}");
}

TEST_F(GDriveTreeId, TheSlashAndTheEmptyPathAreTheRootWithoutARequest) {
    EXPECT_EQ(drive->GetFileIDByPath("/"), "root");
    EXPECT_EQ(drive->GetFileIDByPath(""), "root");
    EXPECT_EQ(drive->GetFileIDByPathFromFuse(""), "");
    EXPECT_THAT(Requests(), IsEmpty());
}

TEST_F(GDriveTreeId, OtherPathsAreAskedOfTheMountedTreeAloneAndSilently) {
    const std::string id = amy.AddPath("/docs/a.txt", "x");
    Show("/docs/a.txt");
    EXPECT_EQ(drive->GetFileIDByPath("/docs/a.txt"), id);
    EXPECT_EQ(drive->GetFileIDByPath("/docs/none.txt"), "");
    EXPECT_EQ(seams::LogDump(), "");
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_NONE);
    EXPECT_THAT(Requests(), IsEmpty());
}

TEST_F(GDriveTreeId, APathOfALostConnectionHasNoId) {
    profiles::Put(profiles::VFS_CONFIG_CONNECT, Object("{}"));
    EXPECT_EQ(drive->GetFileIDByPath("/docs/a.txt"), "");
    EXPECT_TRUE(seams::Logged("Failed to get full path by [/docs/a.txt]")) << seams::LogDump();
}

TEST_F(GDriveTreeId, AWalkMayBeginAtTheDeepestFolderThatTheTreeKnows) {
    amy.AddPath("/docs/old/a.txt", "x");
    Show("/docs");
    std::string found = "before";
    EXPECT_EQ(drive->FindListStartID("/docs/old/a.txt", found), amy.Find("/docs"));
    EXPECT_EQ(found, "/docs");
    Show("/docs/old/a.txt");
    EXPECT_EQ(drive->FindListStartID("/docs/old/a.txt", found), amy.Find("/docs/old/a.txt"));
    EXPECT_EQ(found, "/docs/old/a.txt");
}

TEST_F(GDriveTreeId, NoWalkBeginsWhereTheTreeKnowsNothing) {
    tree.Set("/", "id::file", "top");
    for (const char* path : {"", "/none", "/none/a"}) {
        std::string found = "before";
        EXPECT_EQ(drive->FindListStartID(path, found), "") << path << ": the top is never asked";
        EXPECT_EQ(found, "before") << path;
    }
    EXPECT_EQ(seams::LogDump(), "");
    std::string found;
    EXPECT_EQ(drive->FindListStartID("/", found), "top");
    EXPECT_EQ(drive->FindListStartID("none", found), "") << "not inside the connection";
    EXPECT_EQ(drive->FindListStartID("a/b", found), "");
}

TEST_F(GDriveTreeId, NoWalkBeginsInALostConnectionAndItIsAskedForOnce) {
    profiles::Put(profiles::VFS_CONFIG_CONNECT, Object("{}"));
    std::string found = "before";
    EXPECT_EQ(drive->FindListStartID("/docs/old/a.txt", found), "");
    EXPECT_EQ(found, "before");
    EXPECT_TRUE(seams::Logged("Failed to get full path by [/docs/old/a.txt]")) << seams::LogDump();
    EXPECT_FALSE(seams::Logged("Failed to get full path by [/docs/old]")) << seams::LogDump();
}

TEST_F(GDriveNames, AreSearchedInTheirFolderWithFewFields) {
    const std::string id = amy.AddPath("/docs/a.txt", "x");
    amy.AddPath("/a.txt", "x");
    std::vector<std::string> ids = {"before"};
    EXPECT_TRUE(drive->GetFileIDByNameFromServer(amy.Find("/docs"), "a.txt", "", ids));
    EXPECT_THAT(ids, ElementsAre("before", id));
    EXPECT_EQ(Last().Query("fields"), "items(createdDate,id,title)");
    EXPECT_EQ(Last().Query("q"),
              "trashed=false and '" + amy.Find("/docs") + "' in parents and (title='a.txt')");
}

TEST_F(GDriveNames, ADateFindsTheOneOfTwoItemsThatWasCreatedThen) {
    const std::string other = amy.AddPath("/a.txt", "x");
    const std::string wanted = amy.AddFile(root, "a.txt", "y");
    amy.SetTimes(other, kCreated + 1, kCreated);
    amy.SetTimes(wanted, kCreated, kCreated);
    std::vector<std::string> ids;
    EXPECT_TRUE(
        drive->GetFileIDByNameFromServer("root", "a - 2015-03-02T10:11:12.000Z.txt", "", ids));
    EXPECT_THAT(ids, ElementsAre(wanted));
    ids.clear();
    EXPECT_TRUE(drive->GetFileIDByNameFromServer("root", "a.txt", "", ids));
    EXPECT_THAT(ids, testing::UnorderedElementsAre(other, wanted));
}

TEST_F(GDriveNames, ADocumentWithACreationTimeIsNotTakenForItsPlainTitle) {
    service.AddDocument(amy, root, "Report", "document", "text");
    std::vector<std::string> ids;
    EXPECT_TRUE(drive->GetFileIDByNameFromServer("root", "Report.gdoc", "", ids));
    EXPECT_THAT(ids, IsEmpty());
    EXPECT_THAT(Last().Query("q"), HasSubstr("(title='Report.gdoc' or title='Report')"));
}

TEST_F(GDriveNames, AreComparedWithCaseWhateverTheServiceFinds) {
    amy.AddPath("/A.TXT", "x");
    std::vector<std::string> ids;
    EXPECT_TRUE(drive->GetFileIDByNameFromServer("root", "a.txt", "", ids));
    EXPECT_THAT(ids, IsEmpty());
}

TEST_F(GDriveNames, QuotesAreSentAndComparedAsUploadsWriteThem) {
    const std::string single = amy.AddFile(root, "it's", "x");
    std::vector<std::string> ids;
    EXPECT_TRUE(drive->GetFileIDByNameFromServer("root", "it's", "", ids)) << seams::LogDump();
    EXPECT_THAT(ids, ElementsAre(single));
    EXPECT_THAT(Last().Query("q"), HasSubstr("title='it\\'s'"));
    ids.clear();
    service.AddFault(Found(R"({"id":"1","title":"a\"b"},{"id":"2","title":"a\\\"b"})"));
    EXPECT_TRUE(drive->GetFileIDByNameFromServer("root", "a\"b", "", ids));
    EXPECT_THAT(ids, ElementsAre("2"));
}

TEST_F(GDriveNames, ABackslashInFrontOfAQuoteIsASearchThatTheServiceRefuses) {
    amy.AddPath("/a", "x");
    for (const char* name : {"a\\", "a\\' or title='a", "a\\' or title contains \"a"}) {
        std::vector<std::string> ids;
        EXPECT_FALSE(drive->GetFileIDByNameFromServer("root", name, "", ids)) << name;
        EXPECT_THAT(ids, IsEmpty()) << name;
        EXPECT_EQ(Last().status, 400) << name;
    }
}

TEST_F(GDriveNames, ItemsWithoutTitleOrIdAreNone) {
    service.AddFault(Found(
        R"({"title":"a"},{"id":"1"},{"id":"","title":"a"},{},null,{"id":null,"title":"a"},
           {"id":2,"title":"a"},{"id":"3","title":"a","createdDate":{}})"));
    std::vector<std::string> ids;
    EXPECT_TRUE(drive->GetFileIDByNameFromServer("root", "a", "", ids)) << seams::LogDump();
    EXPECT_THAT(ids, ElementsAre("2", "3"));
}

TEST_F(GDriveNames, ValuesOfTheWrongTypeAreAFailureOfTheCloud) {
    for (const char* item : {R"({"id":{},"title":"a.txt"})", R"({"id":[],"title":"a.txt"})",
                             R"({"id":"1","title":"a.txt","createdDate":[]})"}) {
        service.AddFault(Found(item));
        drive->SetError(VFS_ERR_NONE, "");
        std::vector<std::string> ids;
        EXPECT_FALSE(
            drive->GetFileIDByNameFromServer("root", "a - 2015-03-02T10:11:12Z.txt", "", ids))
            << item;
        EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CLOUD_FAILED) << item;
    }
}

TEST_F(GDriveNames, TenThousandItemsOfOneNameAreAllFound) {
    std::string items = R"({"id":"0","title":"a"})";
    for (int i = 1; i < 10000; ++i) {
        items += R"(,{"id":")" + std::to_string(i) + R"(","title":"a"})";
    }
    service.AddFault(Found(items));
    std::vector<std::string> ids;
    EXPECT_TRUE(drive->GetFileIDByNameFromServer("root", "a", "", ids));
    ASSERT_THAT(ids, SizeIs(10000));
    EXPECT_EQ(ids[9999], "9999");
}

TEST_F(GDriveNames, ThatCannotBeListedFail) {
    service.AddFault(Refused());
    std::vector<std::string> ids;
    EXPECT_FALSE(drive->GetFileIDByNameFromServer("root", "a", "", ids));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_FORBIDDEN);
}

TEST_F(GDrivePick, OfNoneOrOneOrForNoNameAsksNothing) {
    std::vector<std::string> ids;
    std::string id = "before";
    EXPECT_TRUE(drive->GetFileIDFromListByName("a", ids, id));
    EXPECT_EQ(id, "before");
    ids = {"1"};
    EXPECT_TRUE(drive->GetFileIDFromListByName("a", ids, id));
    EXPECT_EQ(id, "1");
    ids = {"2", "1"};
    EXPECT_TRUE(drive->GetFileIDFromListByName("", ids, id));
    EXPECT_EQ(id, "2");
    EXPECT_THAT(Requests(), IsEmpty());
}

TEST_F(GDrivePick, OfSeveralIsTheOneThatHoldsTheName) {
    const std::string one = amy.AddFolder(root, "docs");
    const std::string two = amy.AddFolder(root, "docs");
    amy.AddFile(two, "it's", "x");
    std::vector<std::string> ids = {one, two};
    std::string id;
    EXPECT_TRUE(drive->GetFileIDFromListByName("it's", ids, id)) << seams::LogDump();
    EXPECT_EQ(id, two);
    EXPECT_EQ(Last().Query("q"), "trashed=false and (title='it\\'s' and ('" + one +
                                     "' in parents or '" + two + "' in parents))");
    EXPECT_EQ(Last().Query("fields"), "items(id,title,parents/id)");
}

TEST_F(GDrivePick, LooksAtTheFirstItemAloneAndItsParentsInOrder) {
    const struct {
        const char *items, *picked;
    } rows[] = {
        {R"({"parents":[{"id":"9"},{"id":"2"},{"id":"1"}]},{"parents":[{"id":"1"}]})", "2"},
        {R"({"parents":[{"id":"9"}]},{"parents":[{"id":"1"}]})", ""},
        {R"({"parents":[]})", ""},
        {R"({"parents":[{},null,{"id":""},{"id":2}]})", "2"},
        {R"({"parents":null})", ""},
        {"{}", ""},
        {"null", ""},
        {"", ""},
    };
    for (const auto& row : rows) {
        service.AddFault(Found(row.items));
        std::vector<std::string> ids = {"1", "2"};
        std::string id;
        EXPECT_TRUE(drive->GetFileIDFromListByName("a", ids, id)) << row.items << seams::LogDump();
        EXPECT_EQ(id, row.picked) << row.items;
    }
}

TEST_F(GDrivePick, ParentsThatAreNoListAreNone) {
    for (const char* item : {R"({"parents":"1"})", R"({"parents":7})", R"({"parents":true})"}) {
        service.AddFault(Found(item));
        std::vector<std::string> ids = {"1", "2"};
        std::string id;
        EXPECT_TRUE(drive->GetFileIDFromListByName("a", ids, id)) << item << seams::LogDump();
        EXPECT_EQ(id, "") << item;
    }
}

TEST_F(GDrivePick, ParentsOfTheWrongTypesAreAFailureOfTheCloud) {
    for (const char* item : {R"({"parents":["1"]})", R"({"parents":[7]})",
                             R"({"parents":[{"id":{}}]})", R"({"parents":[{"id":["1"]}]})"}) {
        service.AddFault(Found(item));
        drive->SetError(VFS_ERR_NONE, "");
        std::vector<std::string> ids = {"1", "2"};
        std::string id;
        EXPECT_FALSE(drive->GetFileIDFromListByName("a", ids, id)) << item;
        EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CLOUD_FAILED) << item;
        EXPECT_EQ(id, "") << item;
    }
}

TEST_F(GDrivePick, OfTenThousandThatAnAddressCannotNameFails) {
    std::vector<std::string> ids;
    for (int i = 0; i < 10000; ++i) {
        ids.push_back("0B-" + std::to_string(5000000000 + i));
    }
    std::string id;
    EXPECT_FALSE(drive->GetFileIDFromListByName("a", ids, id));
    EXPECT_EQ(id, "");
    EXPECT_NE(drive->GetErrorCode(), VFS_ERR_NONE);
    EXPECT_TRUE(seams::Logged("Failed to list folder, a"));
}

TEST_F(GDrivePick, ThatCannotBeListedFailsWithALine) {
    service.AddFault(Refused());
    std::vector<std::string> ids = {"1", "2"};
    std::string id;
    EXPECT_FALSE(drive->GetFileIDFromListByName("a", ids, id));
    EXPECT_TRUE(seams::Logged("Failed to list folder, a")) << seams::LogDump();
}

TEST_F(GDriveWalk, LooksForTheFirstNameInAllTheDrive) {
    const std::string id = amy.AddPath("/deep/docs/old/a.txt", "x");
    std::string out;
    EXPECT_TRUE(drive->GetFileIDByPathFromServer("not read", "/docs/old/a.txt", "", "", out));
    EXPECT_EQ(out, id);
    std::vector<std::string> queries;
    for (const auto& entry : service.Journal().All()) {
        queries.push_back(entry.Query("q"));
    }
    EXPECT_THAT(queries, ElementsAre("trashed=false and (title='docs')",
                                     "trashed=false and '" + amy.Find("/deep/docs") +
                                         "' in parents and (title='old')",
                                     "trashed=false and '" + amy.Find("/deep/docs/old") +
                                         "' in parents and (title='a.txt')"));
}

TEST_F(GDriveWalk, OfTenNamesTakesTenRequests) {
    const std::string path = "/a/b/c/d/e/f/g/h/i/j.txt";
    const std::string id = amy.AddPath(path, "x");
    std::string out;
    EXPECT_TRUE(drive->GetFileIDByPathFromServer("", path, "", "", out));
    EXPECT_EQ(out, id);
    EXPECT_EQ(Requests().size(), 10U);
}

TEST_F(GDriveWalk, AlongAPathThatNoTreeHoldsAsksNothing) {
    std::string out;
    EXPECT_FALSE(drive->GetFileIDByPathFromServer("", "/" + std::string(5000, 'a'), "", "", out));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_NOT_FOUND);
    EXPECT_THAT(Requests(), IsEmpty());
}

TEST_F(GDriveWalk, ByNamesOfAnyKindFindsThem) {
    for (const std::string& name :
         {std::string(255, 'n'), std::string("\xf0\x9f\x98\x80 & + % # ?.txt"),
          std::string("\xe2\x80\x8f.txt"), std::string("\xc4\xb0"), std::string("it's - it"),
          std::string("%s%n"), std::string("a=b&q=c")}) {
        const std::string id = amy.AddFile(root, name, "x");
        std::string out;
        EXPECT_TRUE(drive->GetFileIDByPathFromServer("", "/" + name, "", "", out))
            << name << seams::LogDump();
        EXPECT_EQ(out, id) << name;
    }
}

TEST_F(GDriveWalk, ToAnEmptyPathIsTheRootWithoutARequest) {
    std::string out;
    EXPECT_TRUE(drive->GetFileIDByPathFromServer("", "", kFolders, "x", out));
    EXPECT_EQ(out, "root");
    EXPECT_THAT(Requests(), IsEmpty());
}

TEST_F(GDriveWalk, OfTwoFoldersOfOneNameTakesTheOneThatHoldsTheChild) {
    amy.AddFolder(root, "docs");
    const std::string second = amy.AddFolder(root, "docs");
    amy.AddFile(second, "a.txt", "x");
    std::string out;
    EXPECT_TRUE(drive->GetFileIDByPathFromServer("", "/docs", kFolders, "a.txt", out))
        << seams::LogDump();
    EXPECT_EQ(out, second);
}

TEST_F(GDriveWalk, OfTwoFoldersOfWhichNeitherHoldsTheChildIsNotFound) {
    amy.AddFolder(root, "docs");
    amy.AddFolder(root, "docs");
    std::string out = "before";
    EXPECT_FALSE(drive->GetFileIDByPathFromServer("", "/docs", kFolders, "a.txt", out));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_NOT_FOUND);
    EXPECT_EQ(out, "before");
}

TEST_F(GDriveWalk, WithoutAChildsNameTakesTheFolderThatHoldsOneOfItsOwnName) {
    amy.AddFolder(root, "docs");
    const std::string second = amy.AddFolder(root, "docs");
    const std::string inner = amy.AddFolder(second, "docs");
    std::string out;
    EXPECT_TRUE(drive->GetFileIDByPathFromServer("", "/docs", "", "", out)) << seams::LogDump();
    EXPECT_EQ(out, second);
    EXPECT_NE(out, inner);
    EXPECT_THAT(Last().Query("q"), HasSubstr("title='docs' and ("));
}

TEST_F(GDriveWalk, FollowsEachOfTheFoldersOfOneName) {
    amy.AddFolder(root, "docs");
    const std::string second = amy.AddFolder(root, "docs");
    const std::string id = amy.AddFile(second, "a.txt", "x");
    std::string out;
    EXPECT_TRUE(drive->GetFileIDByPathFromServer("", "/docs/a.txt", "", "", out));
    EXPECT_EQ(out, id);
    EXPECT_EQ(Requests().size(), 3U);
}

TEST_F(GDriveWalk, NarrowedToFoldersPassesFilesBy) {
    amy.AddFile(root, "docs", "a file");
    const std::string id = amy.AddFolder(root, "docs");
    std::string out;
    EXPECT_TRUE(drive->GetFileIDByPathFromServer(
        "", "/docs", std::string("'me' in owners and ") + kFolders, "x", out));
    EXPECT_EQ(out, id);
    EXPECT_EQ(Last().Query("q"),
              "trashed=false and (title='docs' and ('me' in owners and mimeType = "
              "'application/vnd.google-apps.folder') and trashed=false)");
}

TEST_F(GDriveWalk, ToNothingIsNotFound) {
    amy.AddPath("/docs/a.txt", "x");
    for (const char* path : {"/none", "/docs/none", "/docs/a.txt/below", "/", "//docs", "/docs/"}) {
        std::string out = "before";
        drive->SetError(VFS_ERR_NONE, "");
        EXPECT_FALSE(drive->GetFileIDByPathFromServer("", path, "", "", out)) << path;
        EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_NOT_FOUND) << path;
        EXPECT_EQ(out, "before");
    }
}

TEST_F(GDriveWalk, ThatFindsNothingIsTrueWithoutAnIdOnItsWay) {
    std::string out = "before";
    EXPECT_TRUE(drive->GetFileIDByPathFromServerRecursive("", "/none/a", "", "a", out));
    EXPECT_EQ(out, "before");
}

TEST_F(GDriveWalk, AFolderThatCannotBeListedIsLoggedAndNotFound) {
    service.AddFault(Refused());
    std::string out;
    EXPECT_FALSE(drive->GetFileIDByPathFromServer("", "/docs", "", "", out));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_NOT_FOUND);
    EXPECT_TRUE(seams::Logged("Failed to get id by name docs from server")) << seams::LogDump();
}

TEST_F(GDriveWalk, ThroughFoldersThatContainEachOtherEnds) {
    // Two folders named "a", each of which holds both: without a memory, 2^20 requests.
    service.AddFault(
        Fault::On("GET", kFiles)
            .Forever()
            .Answer(200, R"({"items":[{"id":"1","title":"a"},{"id":"2","title":"a"}]})"));
    std::string path;
    for (int i = 0; i < 20; ++i) {
        path += "/a";
    }
    std::string out;
    EXPECT_FALSE(drive->GetFileIDByPathFromServer("", path + "/b", "", "", out));
    EXPECT_LE(Requests().size(), 2U * 21U);
}

TEST_F(GDriveWalk, GivesTheDescriptionOfTheItemAtItsEnd) {
    amy.AddPath("/docs/a.txt", "hello");
    Json::Value out;
    EXPECT_TRUE(drive->GetFileInfoByPathFromServer("/docs/a.txt", "", Object("{}"), "", out));
    EXPECT_EQ(out["fileSize"], "5");
    EXPECT_FALSE(drive->GetFileInfoByPathFromServer("/none", "", Object("{}"), "", out));
    EXPECT_TRUE(seams::Logged("Failed to get file id from google-server, /none"))
        << seams::LogDump();
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_NOT_FOUND);
}

}  // namespace
}  // namespace ZYROCloud
