#include "unit/cloud/onedrive/onedrive_fixture.h"

namespace ZYROCloud {
namespace {

class OneDrivePath : public OneDriveTest {
  protected:
    /** The id at the end of a walk, "-" for none. */
    std::string Walk(const std::string& path) {
        std::string id;
        return drive->GetFileIDByPathFromServer("", path, "", "", id) ? id : "-";
    }
    std::vector<std::string> Ids(const std::string& name, bool search) {
        std::vector<std::string> ids;
        EXPECT_TRUE(drive->GetFileIDByNameFromServer("p", name, "", search, ids));
        return ids;
    }
};

TEST_F(OneDrivePath, ThePathSlashCostsOneRequest) {
    Give({Answer(200, R"({"id":"folder.r"})"), Answer(200, R"({"id":"folder.r"})")});
    EXPECT_EQ(drive->GetFileIDByPath("/"), "folder.r") << seams::LogDump();
    EXPECT_THAT(Requests(), ElementsAre("GET /v5.0/me/skydrive?pretty=false"));
    EXPECT_EQ(drive->GetFileIDByPath(""), "folder.r");
}

TEST_F(OneDrivePath, AnyOtherIsReadFromTheMountedTree) {
    Show("/docs/a.txt", "file.1");
    Give({});
    EXPECT_EQ(drive->GetFileIDByPath("/docs/a.txt"), "file.1") << seams::LogDump();
    EXPECT_EQ(drive->GetFileIDByPath("/docs/b.txt"), "");
    EXPECT_TRUE(seams::Logged("Failed to get file id from fuse cache, " + tree.Folder() +
                              "/docs/b.txt, No such file or directory"))
        << seams::LogDump();
    EXPECT_THAT(Requests(), IsEmpty());
}

TEST_F(OneDrivePath, WithoutAMountedTreeIsUnknown) {
    profiles::Put(profiles::VFS_CONFIG_CONNECT, Json::Value(Json::objectValue));
    EXPECT_EQ(drive->GetFileIDByPathFromFuse("/a"), "");
    EXPECT_TRUE(seams::LoggedPart("Failed to get full path by [/a]")) << seams::LogDump();
    EXPECT_EQ(drive->GetFileIDByPathFromFuse(""), "");
}

TEST_F(OneDrivePath, ReportInCapitalsFindsReportInSmallLetters) {
    const std::pair<const char*, const char*> names[] = {
        {"Report.TXT", "report.txt"},
        {"\xc3\x84RGER", "\xc3\xa4rger"},                          // A with diaeresis
        {"\xce\xa3\xce\x99\xce\x93", "\xcf\x83\xce\xb9\xce\xb3"},  // Greek
        {"\xd0\x96", "\xd0\xb6"},                                  // Cyrillic
    };
    for (const auto& [wanted, stored] : names) {
        Give({Listing(std::string(R"({"id":"0","name":"other"},{"id":"1","name":")") + stored +
                      "\"}")});
        EXPECT_EQ(Walk(std::string("/") + wanted), "1") << wanted;
    }
}

TEST_F(OneDrivePath, ANameThatStandsTwiceInDifferentCaseYieldsTheFirstWhenWalking) {
    const std::string both = R"({"id":"1","name":"a.TXT"},{"id":"2","name":"A.txt"})";
    Give({Listing(both), Listing(both)});
    EXPECT_THAT(Ids("a.txt", false), ElementsAre("1"));
    EXPECT_THAT(Ids("a.txt", true), ElementsAre("1", "2"));
    EXPECT_THAT(Requests(), ElementsAre("GET /v5.0/p/files?pretty=false",
                                        "GET /v5.0/me/skydrive/search?pretty=false&q=a.txt"));
}

TEST_F(OneDrivePath, IsWalkedByOneListingForEachPart) {
    Give({Listing(R"({"id":"folder.1","name":"docs","type":"folder"})"),
          Listing(R"({"id":"folder.2","name":"old","type":"folder"})"),
          Listing(R"({"id":"file.3","name":"a.txt","type":"file"})")});
    EXPECT_EQ(Walk("/docs/old/a.txt"), "file.3") << seams::LogDump();
    EXPECT_THAT(Requests(), ElementsAre("GET /v5.0/me/skydrive/files?pretty=false",
                                        "GET /v5.0/folder.1/files?pretty=false",
                                        "GET /v5.0/folder.2/files?pretty=false"));
}

TEST_F(OneDrivePath, OnlyTheFirstOfTwoFoldersIsWalked) {
    Give({Listing(R"({"id":"1","name":"docs"},{"id":"2","name":"DOCS"})"), Listing("")});
    EXPECT_EQ(Walk("/docs/a.txt"), "-");
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_NOT_FOUND);
    EXPECT_THAT(Requests(), SizeIs(2));
}

TEST_F(OneDrivePath, ThatIsEmptyIsTheRoot) {
    Give({Answer(200, R"({"id":"folder.r"})"), Answer(500)});
    EXPECT_EQ(Walk(""), "folder.r");
    EXPECT_THAT(Requests(), ElementsAre("GET /v5.0/me/skydrive?pretty=false"));
}

TEST_F(OneDrivePath, ThatCannotBeWalkedIsNotFoundWhateverTheReason) {
    for (const std::string& answer : {Answer(403), Answer(200, "{}"), Listing("")}) {
        Give({answer});
        EXPECT_EQ(Walk("/a"), "-");
        EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_NOT_FOUND);
    }
}

TEST_F(OneDrivePath, FoldersThatContainThemselvesEndWithThePath) {
    const std::string loop = Listing(R"({"id":"me","name":"loop","type":"folder"})");
    Give(std::vector<std::string>(4, loop));
    EXPECT_EQ(Walk("/loop/loop/loop/loop"), "me");
    EXPECT_THAT(Requests(), SizeIs(4));
    Give({});
    std::string endless;
    while (endless.size() <= 4096) {
        endless += "/loop";
    }
    EXPECT_EQ(Walk(endless), "-");
    EXPECT_THAT(Requests(), IsEmpty());
}

TEST_F(OneDrivePath, ItemsWithoutNameOrIdLeadNowhere) {
    // An empty id would be the root, and the walk would go on there.
    const std::string odd =
        R"({"name":"a"},{"id":"","name":"a"},{"id":[],"name":"a"},{"id":"1"},{"id":"2","name":""},)"
        R"({"id":"3","name":{}},{"id":"4","name":"a\u0000b"},7,null,"a",[],{"id":5,"name":"b"})";
    Give({Listing(odd), Listing(odd), Listing(odd), Listing(odd)});
    EXPECT_EQ(Walk("/a/b"), "-");
    EXPECT_EQ(Walk("//"), "-");
    EXPECT_EQ(Walk("/a/"), "-");
    EXPECT_EQ(Walk("/b"), "5");
}

TEST_F(OneDrivePath, NamesOfEveryKindAreComparedAsTheyAre) {
    const std::string names[] = {std::string(255, 'x'),
                                 std::string(256, 'x'),
                                 std::string(4090, 'x'),
                                 "a\\\"b'",
                                 "\xf0\x9f\x98\x80",
                                 "\xe2\x80\x8f\xd7\x90",
                                 "\xff\xfe"};
    for (const std::string& name : names) {
        Json::Value answer;
        answer["data"][0]["name"] = "other";
        answer["data"][1]["name"] = name;
        answer["data"][0]["id"] = "0";
        answer["data"][1]["id"] = "1";
        Give({Answer(200, json::toString(answer))});
        EXPECT_EQ(Walk("/" + name), "1") << name;
    }
}

TEST_F(OneDrivePath, LeadsToADescription) {
    Give({Listing(R"({"id":"file.1","name":"a"})"), Answer(200, R"({"id":"file.1","size":5})"),
          Listing("")});
    Json::Value out;
    EXPECT_TRUE(drive->GetFileInfoByPathFromServer("/a", "", Json::Value(), "", out));
    EXPECT_EQ(out["size"], 5);
    EXPECT_FALSE(drive->GetFileInfoByPathFromServer("/b", "", Json::Value(), "", out));
    EXPECT_TRUE(seams::Logged("Failed to get file id from onedrive-server, /b"))
        << seams::LogDump();
}

class OneDriveMeta : public OneDriveTest {
  protected:
    bool Describe(const std::string& path, const std::string& action) {
        return drive->GetMetaDataByURI(kServerId + path, meta, action);
    }
    Json::Value meta;
};

TEST_F(OneDriveMeta, OfADownloadIsTheContentOfTheItem) {
    Show("/a b.txt", "file.1!2");
    Give({});
    for (const char* action : {"Download", "DOWNLOAD=text/plain"}) {
        meta = Json::Value();
        EXPECT_TRUE(Describe("/a b.txt", action)) << seams::LogDump();
        EXPECT_EQ(meta["url"], Api("/file.1!2/content"));
        EXPECT_EQ(meta["server_path"], "/a b.txt");
    }
}

TEST_F(OneDriveMeta, OfADownloadWithoutAKnownIdFailsAndSetsNoError) {
    EXPECT_FALSE(Describe("/unknown", "Download"));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_NONE);
    EXPECT_TRUE(meta.isNull());
}

TEST_F(OneDriveMeta, OfAnUploadIsThePlaceInTheStorageOfTheOwner) {
    Give({});
    for (const char* action : {"Upload", "uploading"}) {
        EXPECT_TRUE(Describe("/docs/a b.txt", action)) << seams::LogDump();
        EXPECT_EQ(meta["url"], "http://cid-a1b2.localhost:" + std::to_string(server->Port()) +
                                   "/users/0xa1b2/LiveFolders/docs/a b.txt");
        EXPECT_EQ(meta["server_path"], "/docs/a b.txt");
    }
}

TEST_F(OneDriveMeta, OfAnUploadNeedsTheStoredAccountInformation) {
    for (const char* account : {"", "{}", "[]", "no json", R"({"id":""})", R"({"id":{}})",
                                R"({"id":"x@evil.example/"})", R"({"id":"a/b"})"}) {
        Renew(account);
        EXPECT_FALSE(Describe("/a.txt", "Upload")) << account;
        EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_NONE) << account;
        EXPECT_TRUE(meta.isNull());
    }
}

TEST_F(OneDriveMeta, OfAnyOtherActionFails) {
    for (const char* action : {"", "Downloa", "Uploa", "Copy"}) {
        EXPECT_FALSE(Describe("/a.txt", action)) << action;
    }
    meta = Json::Value(7);
    EXPECT_FALSE(Describe("/a.txt", "Upload"));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CLOUD_FAILED);
}

}  // namespace
}  // namespace ZYROCloud
