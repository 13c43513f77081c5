#include "unit/cloud/box/box_fixture.h"

namespace ZYROCloud {
namespace {

using BoxTreeId = BoxTest;
using BoxNames = BoxTest;
using BoxWalk = BoxTest;
using BoxMeta = BoxTest;

TEST_F(BoxTreeId, TheSlashAndTheEmptyPathAreTheRoot) {
    EXPECT_EQ(box->GetFileIDByPath("/"), "folders/0");
    EXPECT_EQ(box->GetFileIDByPath(""), "folders/0");
    EXPECT_EQ(box->GetFileIDByPathFromFuse(""), "");
    EXPECT_THAT(Requests(), IsEmpty());
}

TEST_F(BoxTreeId, OtherPathsAreAskedOfTheMountedTreeAlone) {
    const std::string id = amy.AddPath("/docs/a.txt", "x");
    Show("/docs/a.txt");
    EXPECT_EQ(box->GetFileIDByPath("/docs/a.txt"), "files/" + id);
    EXPECT_EQ(box->GetFileIDByPath("/docs/none.txt"), "");
    EXPECT_EQ(box->GetErrorCode(), VFS_ERR_NONE);
    EXPECT_THAT(Requests(), IsEmpty());
}

TEST_F(BoxTreeId, APathOfALostConnectionHasNoId) {
    profiles::Put(profiles::VFS_CONFIG_CONNECT, Object("{}"));
    EXPECT_EQ(box->GetFileIDByPath("/docs/a.txt"), "");
    EXPECT_TRUE(seams::Logged("Failed to get full path by [/docs/a.txt]")) << seams::LogDump();
}

class BoxNamesInAList : public BoxTest {
  protected:
    /** The ids that this name finds in a folder listed like this. */
    std::vector<std::string> Find(const std::string& name, const std::string& entries) {
        service.AddFault(
            Fault::On("GET", "/2.0/folders/0/items").Body(R"({"entries":)" + entries + "}"));
        std::vector<std::string> ids;
        EXPECT_TRUE(box->GetFileIDByNameFromServer("", name, "", false, ids)) << seams::LogDump();
        return ids;
    }
};

TEST_F(BoxNamesInAList, AllMatchesAreKeptInOrderWithTheirKind) {
    EXPECT_THAT(Find("A.txt", R"([{"id":"1","name":"a.TXT","type":"file"},
                                  {"id":"2","name":"b.txt","type":"file"},
                                  {"id":"3","name":"A.txt","type":"folder"},
                                  {"id":"4","name":"a.txt","type":"web_link"}])"),
                ElementsAre("files/1", "folders/3", "4"));
}

TEST_F(BoxNamesInAList, AreComparedWithoutCaseBeyondAscii) {
    EXPECT_THAT(Find("Größe", R"([{"id":"1","name":"GRÖßE","type":"file"}])"),
                ElementsAre("files/1"));
}

TEST_F(BoxNamesInAList, ANameWithItsOwnerFindsTheItemOfThatOwner) {
    const std::string list = R"([{"id":"1","name":"a.txt","type":"file","owned_by":{"name":"Bob"}},
                                 {"id":"2","name":"A.txt","type":"file","owned_by":{"name":"AMY doe"}},
                                 {"id":"3","name":"a.txt","type":"file"}])";
    EXPECT_THAT(Find("a.txt - Amy Doe", list), ElementsAre("files/2"));
    EXPECT_THAT(Find("a.txt - Eve", list), IsEmpty());
    EXPECT_THAT(Find("a.txt", list), ElementsAre("files/1", "files/2", "files/3"));
}

TEST_F(BoxNamesInAList, TheFullNameMatchesAsWellAsNameAndOwner) {
    EXPECT_THAT(Find("a - b", R"([{"id":"1","name":"a","type":"file","owned_by":{"name":"b"}},
                                  {"id":"2","name":"a - b","type":"file"}])"),
                ElementsAre("files/1", "files/2"));
}

TEST_F(BoxNamesInAList, TheFirstDashParts) {
    EXPECT_THAT(
        Find("a - b - c", R"([{"id":"1","name":"a","type":"file","owned_by":{"name":"b - c"}},
                                      {"id":"2","name":"a - b","type":"file","owned_by":{"name":"c"}}])"),
        ElementsAre("files/1"));
}

TEST_F(BoxNamesInAList, AnEmptyNameOrOwnerPartsNothing) {
    const std::string list = R"([{"id":"1","name":"","type":"file","owned_by":{"name":"b"}},
                                 {"id":"2","name":"a","type":"file","owned_by":{"name":""}}])";
    EXPECT_THAT(Find(" - b", list), IsEmpty());
    EXPECT_THAT(Find("a - ", list), IsEmpty());
}

TEST_F(BoxNamesInAList, QuotesCompareInTheFormInWhichUploadsWriteThem) {
    EXPECT_THAT(Find("a\"b", R"([{"id":"1","name":"a\"b","type":"file"},
                                 {"id":"2","name":"a\\\"b","type":"file"}])"),
                ElementsAre("files/2"));
    EXPECT_THAT(Find("a\"b - Amy",
                     R"([{"id":"3","name":"a\\\"b","type":"file","owned_by":{"name":"Amy"}}])"),
                ElementsAre("files/3"));
}

TEST_F(BoxNamesInAList, WrongTypesAreAFailureOfTheCloud) {
    for (const char* entry :
         {R"({"id":"1","name":"a - b","type":[]})", R"({"id":{},"name":"a - b","type":"file"})",
          R"({"id":"1","name":"a","owned_by":"text"})",
          R"({"id":"1","name":"a","owned_by":{"name":{}}})"}) {
        service.AddFault(Fault::On("GET", "/2.0/folders/0/items")
                             .Body(std::string(R"({"entries":[)") + entry + "]}"));
        box->SetError(VFS_ERR_NONE, "");
        std::vector<std::string> ids;
        EXPECT_FALSE(box->GetFileIDByNameFromServer("", "a - b", "", false, ids)) << entry;
        EXPECT_EQ(box->GetErrorCode(), VFS_ERR_CLOUD_FAILED) << entry;
    }
}

TEST_F(BoxNames, ASearchLooksInAllOfTheAccount) {
    const std::string id = amy.AddPath("/deep/down/report.txt", "x");
    std::vector<std::string> ids;
    EXPECT_TRUE(box->GetFileIDByNameFromServer("", "report.txt", "", true, ids));
    EXPECT_THAT(ids, ElementsAre("files/" + id));
    EXPECT_EQ(Last().Path(), "/2.0/search");
}

TEST_F(BoxNames, ABaseNameAndItsOwnerFindTheFile) {
    const std::string id = amy.AddPath("/a.txt", "x");
    std::vector<std::string> ids;
    EXPECT_TRUE(box->GetFileIDByNameFromServer("", "a.txt - Amy Doe", "", false, ids));
    EXPECT_THAT(ids, ElementsAre("files/" + id));
}

TEST_F(BoxWalk, GoesDownFromTheRoot) {
    const std::string id = amy.AddPath("/docs/old/a.txt", "x");
    std::string out;
    EXPECT_TRUE(box->GetFileIDByPathFromServer("", "/docs/old/a.txt", "", "", out));
    EXPECT_EQ(out, "files/" + id);
    EXPECT_THAT(Requests(), ElementsAre("GET /2.0/folders/0/items",
                                        "GET /2.0/folders/" + amy.Find("/docs") + "/items",
                                        "GET /2.0/folders/" + amy.Find("/docs/old") + "/items"));
    EXPECT_TRUE(box->GetFileIDByPathFromServer("", "", "", "", out));
    EXPECT_EQ(out, "folders/0");
}

TEST_F(BoxWalk, ToNothingIsNotFound) {
    amy.AddPath("/docs/a.txt", "x");
    for (const char* path : {"/none", "/docs/none", "/docs/a.txt/below", "/", "//docs"}) {
        std::string out = "before";
        box->SetError(VFS_ERR_NONE, "");
        EXPECT_FALSE(box->GetFileIDByPathFromServer("", path, "", "", out)) << path;
        EXPECT_EQ(box->GetErrorCode(), VFS_ERR_NOT_FOUND) << path;
        EXPECT_EQ(out, "before");
    }
}

TEST_F(BoxWalk, AFolderThatCannotBeListedIsLoggedAndNotFound) {
    service.AddFault(Fault::On("GET", "/2.0/folders/0/items").Answer(403, "{}"));
    std::string out;
    EXPECT_FALSE(box->GetFileIDByPathFromServer("", "/docs", "", "", out));
    EXPECT_EQ(box->GetErrorCode(), VFS_ERR_NOT_FOUND);
    EXPECT_TRUE(seams::Logged("Failed to get id by name docs from server")) << seams::LogDump();
}

TEST_F(BoxWalk, TwoFoldersOfOneNameAreSearchedDepthFirst) {
    service.AddFault(Fault::On("GET", "/2.0/folders/0/items")
                         .Body(R"({"entries":[{"id":"71","name":"docs","type":"folder"},
                                              {"id":"72","name":"docs","type":"folder"}]})"));
    service.AddFault(Fault::On("GET", "/2.0/folders/71/items").Answer(200, R"({"entries":[]})"));
    service.AddFault(Fault::On("GET", "/2.0/folders/72/items")
                         .Answer(200, R"({"entries":[{"id":"73","name":"a.txt","type":"file"}]})"));
    std::string out;
    EXPECT_TRUE(box->GetFileIDByPathFromServer("", "/docs/a.txt", "", "", out));
    EXPECT_EQ(out, "files/73");
}

TEST_F(BoxWalk, GivesTheDescriptionOfTheItemAtItsEnd) {
    amy.AddPath("/docs/a.txt", "hello");
    Json::Value out;
    EXPECT_TRUE(box->GetFileInfoByPathFromServer("", "/docs/a.txt", Object("{}"), "", out));
    EXPECT_EQ(out["size"], 5);
    EXPECT_FALSE(box->GetFileInfoByPathFromServer("", "/none", Object("{}"), "", out));
    EXPECT_TRUE(seams::Logged("Failed to get file id from box-server, /none")) << seams::LogDump();
}

TEST_F(BoxMeta, OfADownloadHasTheAddressOfTheContent) {
    const std::string id = amy.AddPath("/docs/a.txt", "x");
    Show("/docs/a.txt");
    for (const char* action : {"Download", "download", "Download=text/plain"}) {
        Json::Value meta;
        EXPECT_TRUE(box->GetMetaDataByURI(std::string(kServerId) + "/docs/a.txt", meta, action));
        EXPECT_EQ(meta["url"], service.ApiHost() + "/2.0/files/" + id + "/content");
        EXPECT_EQ(meta["server_path"], "/docs/a.txt");
        EXPECT_EQ(meta["full_path"], tree.Folder() + "/docs/a.txt");
    }
    EXPECT_THAT(Requests(), IsEmpty());
}

TEST_F(BoxMeta, OfADownloadOfNothingKnownFails) {
    Json::Value meta;
    EXPECT_FALSE(box->GetMetaDataByURI(std::string(kServerId) + "/none", meta, "Download"));
    EXPECT_TRUE(meta.isNull());
    EXPECT_EQ(box->GetErrorCode(), VFS_ERR_CLOUD_FAILED);
}

TEST_F(BoxMeta, OfAnUploadTellsNewFromKnown) {
    const std::string id = amy.AddPath("/docs/a.txt", "x");
    Show("/docs");
    Json::Value meta;
    EXPECT_TRUE(box->GetMetaDataByURI(std::string(kServerId) + "/docs/a.txt", meta, "Upload"));
    EXPECT_EQ(meta["url"], service.UploadHost() + "/api/2.0/files/content");
    EXPECT_FALSE(meta.isMember("id"));
    EXPECT_EQ(meta["name"], "a.txt");
    EXPECT_EQ(meta["parent_id"], amy.Find("/docs"));
    EXPECT_EQ(meta["server_path"], "/docs/a.txt");
    EXPECT_EQ(meta["full_path"], tree.Folder() + "/docs/a.txt");

    Show("/docs/a.txt");
    EXPECT_TRUE(box->GetMetaDataByURI(std::string(kServerId) + "/docs/a.txt", meta, "UPLOAD"));
    EXPECT_EQ(meta["url"], service.UploadHost() + "/api/2.0/files/" + id + "/content");
    EXPECT_EQ(meta["id"], id);
}

TEST_F(BoxMeta, OfAnUploadIntoTheRootOrNowhere) {
    Json::Value meta;
    EXPECT_TRUE(box->GetMetaDataByURI(std::string(kServerId) + "/a.txt", meta, "Upload"));
    EXPECT_EQ(meta["parent_id"], "0");
    for (const char* path : {"", "/", "/docs/", "/none/a.txt"}) {
        EXPECT_FALSE(box->GetMetaDataByURI(kServerId + std::string(path), meta, "Upload")) << path;
    }
    EXPECT_FALSE(box->GetMetaDataByURI("ftp://elsewhere/a.txt", meta, "Upload"));
}

TEST_F(BoxMeta, OfAnyOtherActionIsRefusedWithALine) {
    Json::Value meta;
    EXPECT_FALSE(box->GetMetaDataByURI(std::string(kServerId) + "/a.txt", meta, "Rename"));
    EXPECT_TRUE(seams::Logged("Non support action, Rename")) << seams::LogDump();
    EXPECT_FALSE(box->GetMetaDataByURI(std::string(kServerId) + "/a.txt", meta, ""));
}

TEST_F(BoxMeta, IntoAValueThatIsNoObjectIsAFailureOfTheCloud) {
    Json::Value meta = Object("[1]");
    EXPECT_FALSE(box->GetMetaDataByURI(std::string(kServerId) + "/a.txt", meta, "Upload"));
    EXPECT_EQ(box->GetErrorCode(), VFS_ERR_CLOUD_FAILED);
}

}  // namespace
}  // namespace ZYROCloud
