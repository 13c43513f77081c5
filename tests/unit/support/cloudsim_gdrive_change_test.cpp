/** What changes the items of the simulated Google Drive. */
#include "support/cloudsim_gdrive.h"

namespace {

using cloudsim::GDriveTest;
using cloudsim::Got;
using cloudsim::Reason;
using cloudsim::Titles;
using testing::ElementsAre;
using testing::IsEmpty;

TEST_F(GDriveTest, MakesFoldersAndEmptyFilesFromMetadataAlone) {
    const Got folder = Send("POST", "/drive/v2/files",
                            R"({"title":"Docs","mimeType":"application/vnd.google-apps.folder"})");
    EXPECT_EQ(200, folder.status);
    const std::string id = folder.Json()["id"].asString();
    EXPECT_EQ(id, amy.Find("/Docs"));
    EXPECT_TRUE(amy.Get(id).folder);
    const Json::Value file = Send("POST", "/drive/v2/files",
                                  R"({"title":"a/b","parents":[{"id":")" + id +
                                      R"("}],"modifiedDate":"2012-06-04T12:00:00.123-08:00"})")
                                 .Json();
    EXPECT_EQ("0", file["fileSize"].asString());
    EXPECT_EQ("2012-06-04T20:00:00.123Z", file["modifiedDate"].asString());
    EXPECT_THAT(Titles(List("'" + id + "' in parents")), ElementsAre("a/b"));
    EXPECT_EQ("Untitled", Send("POST", "/drive/v2/files", "{}").Json()["title"].asString());
}

TEST_F(GDriveTest, RefusesParentsThatAreMissingOrNoFolders) {
    const std::string file = amy.AddFile(root, "a", "");
    const auto insert = [&](const std::string& parent) {
        return Send("POST", "/drive/v2/files", R"({"parents":[{"id":")" + parent + "\"}]}");
    };
    EXPECT_EQ("notFound", Reason(insert("gone")));
    EXPECT_EQ("parentNotAFolder", Reason(insert(file)));
    EXPECT_EQ(1u, amy.List(root).size());
}

TEST_F(GDriveTest, RenamesAndMovesBetweenParents) {
    const std::string from = amy.AddFolder(root, "from"), to = amy.AddFolder(root, "to");
    const std::string file = amy.AddFile(from, "a", "text");
    const std::string url = "/drive/v2/files/" + file;
    EXPECT_EQ("b", Send("PUT", url, R"({"title":"b"})").Json()["title"].asString());
    EXPECT_EQ(200, Send("PUT", url + "?addParents=" + to + "&removeParents=" + from, "{}").status);
    EXPECT_EQ(file, amy.Find("/to/b"));
    EXPECT_FALSE(amy.Exists("/from/b"));
    EXPECT_EQ(200, Send("PATCH", url + "?addParents=" + from).status);
    EXPECT_THAT(drive.Facts(amy, file).parents, ElementsAre(to, from));
    EXPECT_EQ(file, amy.Find("/from/b"));
    EXPECT_EQ("text", amy.Bytes(file));
}

TEST_F(GDriveTest, ANewTitleLeavesTheTypeAlone) {
    const std::string file = amy.AddFile(root, "a.txt", "text");
    const Got got = Send("PATCH", "/drive/v2/files/" + file, R"({"title":"a.png"})");
    EXPECT_EQ("text/plain", got.Json()["mimeType"].asString());
}

TEST_F(GDriveTest, AMoveWithinOneFolderChangesNothing) {
    const std::string file = amy.AddFile(root, "a", "");
    const std::string url = "/drive/v2/files/" + file;
    EXPECT_EQ(200, Send("PUT", url + "?addParents=root&removeParents=" + root, "{}").status);
    EXPECT_THAT(drive.Facts(amy, file).parents, ElementsAre(root));
    EXPECT_EQ("badRequest", Reason(Send("PUT", url + "?addParents=root", "{}")));
}

TEST_F(GDriveTest, RefusesCirclesOfFolders) {
    const std::string outer = amy.AddFolder(root, "outer"), inner = amy.AddFolder(outer, "inner");
    EXPECT_EQ("badRequest",
              Reason(Send("PUT", "/drive/v2/files/" + outer + "?addParents=" + inner)));
    EXPECT_EQ("badRequest",
              Reason(Send("PUT", "/drive/v2/files/" + outer + "?addParents=" + outer)));
    EXPECT_THAT(drive.Facts(amy, outer).parents, ElementsAre(root));
}

TEST_F(GDriveTest, WithoutParentsAnItemLiesNowhereAndIsStillListed) {
    const std::string file = amy.AddFile(root, "a", "");
    EXPECT_EQ(200, Send("PUT", "/drive/v2/files/" + file + "?removeParents=root").status);
    EXPECT_THAT(amy.List(root), IsEmpty());
    EXPECT_THAT(Titles(List("trashed = false")), ElementsAre("a"));
    EXPECT_EQ(0u, Get("/drive/v2/files/" + file).Json()["parents"].size());
}

TEST_F(GDriveTest, SetsTheModificationDateOnlyWhenAskedTo) {
    const std::string file = amy.AddFile(root, "a", "");
    amy.SetTimes(file, 1000, 1000);
    const std::string url = "/drive/v2/files/" + file;
    const std::string body = R"({"modifiedDate":"2014-05-06T07:08:09.010Z"})";
    EXPECT_EQ("1970-01-01T00:16:40.000Z", Send("PUT", url, body).Json()["modifiedDate"].asString());
    const Got got = Send("PUT", url + "?setModifiedDate=true", body);
    EXPECT_EQ("2014-05-06T07:08:09.010Z", got.Json()["modifiedDate"].asString());
    EXPECT_EQ(10, drive.Facts(amy, file).modified.millis);
    for (const std::string date : {"yesterday", "2014-05-06", "2014-05-06T07:08:09.Z", ""}) {
        EXPECT_EQ(400,
                  Send("PUT", url + "?setModifiedDate=true", R"({"modifiedDate":")" + date + "\"}")
                      .status)
            << date;
    }
}

TEST_F(GDriveTest, StarsAndUnstars) {
    const std::string file = amy.AddFile(root, "a", "");
    const std::string url = "/drive/v2/files/" + file;
    EXPECT_TRUE(
        Send("PUT", url, R"({"labels":{"starred":true}})").Json()["labels"]["starred"].asBool());
    EXPECT_THAT(Titles(List("starred = true")), ElementsAre("a"));
    EXPECT_EQ(200, Send("PATCH", url, R"({"labels":{"starred":false}})").status);
    EXPECT_FALSE(drive.Facts(amy, file).starred);
}

TEST_F(GDriveTest, TheTrashTakesAllThatIsInAFolder) {
    const std::string file = amy.AddPath("/docs/deep/a.txt", "text");
    const std::string docs = amy.Find("/docs");
    const Got got = Send("POST", "/drive/v2/files/" + docs + "/trash");
    EXPECT_TRUE(got.Json()["labels"]["trashed"].asBool());
    EXPECT_TRUE(got.Json()["explicitlyTrashed"].asBool());
    const Json::Value inside = Get("/drive/v2/files/" + file).Json();
    EXPECT_TRUE(inside["labels"]["trashed"].asBool());
    EXPECT_FALSE(inside["explicitlyTrashed"].asBool());
    EXPECT_FALSE(amy.Exists("/docs/deep/a.txt"));
    EXPECT_THAT(Titles(List("trashed = false")), IsEmpty());
    EXPECT_EQ("4", Get("/drive/v2/about").Json()["quotaBytesUsedInTrash"].asString());
    EXPECT_EQ(200, Send("POST", "/drive/v2/files/" + docs + "/untrash").status);
    EXPECT_EQ(file, amy.Find("/docs/deep/a.txt"));
}

TEST_F(GDriveTest, WhatLiesInAnotherFolderAsWellIsNotTrashedWithOne) {
    const std::string one = amy.AddFolder(root, "one"), two = amy.AddFolder(root, "two");
    const std::string file = amy.AddFile(one, "a", "text");
    drive.SetParents(amy, file, {one, two});
    Send("POST", "/drive/v2/files/" + one + "/trash");
    EXPECT_FALSE(drive.Facts(amy, file).trashed);
    EXPECT_EQ(204, Send("DELETE", "/drive/v2/files/" + one).status);
    EXPECT_EQ(file, amy.Find("/two/a"));
    EXPECT_THAT(drive.Facts(amy, file).parents, ElementsAre(two));
}

TEST_F(GDriveTest, DeletesForGood) {
    const std::string file = amy.AddPath("/docs/a", "");
    EXPECT_EQ(204, Send("DELETE", "/drive/v2/files/" + amy.Find("/docs")).status);
    const Got got = Get("/drive/v2/files/" + file);
    EXPECT_EQ(404, got.status);
    EXPECT_EQ("notFound", Reason(got));
    EXPECT_EQ("File not found: " + file, got.Json()["error"]["message"].asString());
    EXPECT_EQ(404, Send("DELETE", "/drive/v2/files/" + file).status);
    EXPECT_EQ(403, Send("DELETE", "/drive/v2/files/root").status);
}

TEST_F(GDriveTest, EmptiesTheTrash) {
    amy.AddFile(root, "stays", "");
    Send("POST", "/drive/v2/files/" + amy.AddFile(root, "a", "") + "/trash");
    amy.AddPath("/docs/b", "");
    Send("POST", "/drive/v2/files/" + amy.Find("/docs") + "/trash");
    EXPECT_EQ(204, Send("DELETE", "/drive/v2/files/trash").status);
    EXPECT_THAT(Titles(List("")), ElementsAre("stays"));
}

TEST_F(GDriveTest, CopiesFilesButNoFolders) {
    const std::string file = amy.AddFile(root, "a.txt", "text"), to = amy.AddFolder(root, "to");
    const Got got = Send("POST", "/drive/v2/files/" + file + "/copy",
                         R"({"title":"c.txt","parents":[{"id":")" + to + "\"}]}");
    EXPECT_EQ(200, got.status);
    EXPECT_EQ("text", amy.Bytes(amy.Find("/to/c.txt")));
    EXPECT_EQ(200, Send("POST", "/drive/v2/files/" + file + "/copy").status);
    EXPECT_TRUE(amy.Exists("/Copy of a.txt"));
    EXPECT_EQ("cannotCopyFile", Reason(Send("POST", "/drive/v2/files/" + to + "/copy")));
    amy.SetQuota(12);
    const Got full = Send("POST", "/drive/v2/files/" + file + "/copy");
    EXPECT_EQ(403, full.status);
    EXPECT_EQ("storageQuotaExceeded", Reason(full));
}

TEST_F(GDriveTest, WhatOthersShareIsReadAndStarredAndNoMore) {
    const std::string file = drive.AddShared(amy, "theirs.txt", "text", "zoe@example.com");
    amy.AddFile(root, "mine.txt", "");
    EXPECT_THAT(Titles(List("sharedWithMe")), ElementsAre("theirs.txt"));
    EXPECT_THAT(Titles(List("sharedWithMe = false")), ElementsAre("mine.txt"));
    EXPECT_THAT(Titles(List("'me' in owners")), ElementsAre("mine.txt"));
    EXPECT_THAT(Titles(List("not 'me' in owners")), ElementsAre("theirs.txt"));
    EXPECT_THAT(Titles(List("'zoe@example.com' in owners")), ElementsAre("theirs.txt"));
    const std::string url = "/drive/v2/files/" + file;
    EXPECT_EQ("zoe@example.com", Get(url).Json()["owners"][0]["emailAddress"].asString());
    EXPECT_EQ(200, Send("PUT", url, R"({"labels":{"starred":true}})").status);
    EXPECT_EQ("insufficientFilePermissions", Reason(Send("PUT", url, R"({"title":"b"})")));
    EXPECT_EQ("insufficientFilePermissions", Reason(Send("POST", url + "/trash")));
    EXPECT_EQ("0", Get("/drive/v2/about").Json()["quotaBytesUsed"].asString());
    EXPECT_EQ(200, Send("POST", url + "/copy", R"({"title":"own"})").status);
    EXPECT_EQ("text", amy.Bytes(amy.Find("/own")));
    EXPECT_EQ("4", Get("/drive/v2/about").Json()["quotaBytesUsed"].asString());
}

TEST_F(GDriveTest, AnswersBodiesOfTheWrongShapeWithBadRequest) {
    for (const char* body :
         {"{", "[]", R"({"title":{}})", R"({"parents":"root"})", R"({"parents":[1]})",
          R"({"labels":[]})", R"({"labels":{"starred":"yes"}})", R"({"modifiedDate":12})"}) {
        EXPECT_EQ(400, Send("POST", "/drive/v2/files", body).status) << body;
    }
    EXPECT_EQ("parseError", Reason(Send("POST", "/drive/v2/files", "{")));
    EXPECT_THAT(amy.List(root), IsEmpty());
}

}  // namespace
