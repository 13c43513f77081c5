/** What changes the simulated Dropbox's tree. */
#include "unit/support/cloudsim_dropbox_fixture.h"

namespace {

using cloudsim::Got;

struct DropboxChangeTest : DropboxTest {
    std::string Tried(const std::string& function, const Json::Value& args) {
        return Summary(Call("files/" + function, args));
    }
    static Json::Value Renaming(Json::Value args) {
        args["autorename"] = true;
        return args;
    }
};

TEST_F(DropboxChangeTest, MakesAFolderWithAllThatLeadsToIt) {
    const Json::Value made = Call("files/create_folder_v2", Path("/a/b/C")).Json()["metadata"];
    EXPECT_EQ("/a/b/C", made["path_display"].asString());
    EXPECT_EQ(amy.Find("/a/b/c"), made["id"].asString());
}

TEST_F(DropboxChangeTest, TheOlderFunctionsAnswerWithBareMetadata) {
    amy.AddPath("/a.txt", "text");
    EXPECT_EQ("docs", Call("files/create_folder", Path("/docs")).Json()["name"].asString());
    const Json::Value copied = Call("files/copy", FromTo("/a.txt", "/docs/b.txt")).Json();
    EXPECT_EQ("/docs/b.txt", copied["path_display"].asString());
    EXPECT_EQ("file", copied[".tag"].asString());
    const Json::Value moved = Call("files/move", FromTo("/docs", "/papers")).Json();
    EXPECT_EQ("folder", moved[".tag"].asString());
    EXPECT_EQ("papers", moved["name"].asString());
    EXPECT_EQ("papers", Call("files/delete", Path("/papers")).Json()["name"].asString());
}

TEST_F(DropboxChangeTest, AFolderIsInTheWayOfAFolderWithoutRegardToCase) {
    amy.AddFolder("root", "Docs");
    amy.AddFile("root", "a.b", "text");
    EXPECT_EQ("409 path/conflict/folder/", Tried("create_folder_v2", Path("/DOCS")));
    EXPECT_EQ("409 path/conflict/folder/", Tried("create_folder", Path("/DOCS")));
    EXPECT_EQ("409 path/conflict/file/", Tried("create_folder_v2", Path("/a.b")));
    EXPECT_EQ("409 path/conflict/file_ancestor/", Tried("create_folder_v2", Path("/a.b/c")));
    EXPECT_EQ("409 path/malformed_path/", Tried("create_folder_v2", Path("/a/../b")));
    Call("files/create_folder_v2", Renaming(Path("/a.b")));
    EXPECT_TRUE(amy.Exists("/a.b (2)"));
}

TEST_F(DropboxChangeTest, DeletesAFolderWithAllInItOnce) {
    amy.AddPath("/docs/deep/a.txt", "text");
    const Json::Value gone = Call("files/delete_v2", Path("/Docs")).Json()["metadata"];
    EXPECT_EQ("folder", gone[".tag"].asString());
    EXPECT_FALSE(amy.Exists("/docs"));
    EXPECT_EQ("409 path_lookup/not_found/", Tried("delete_v2", Path("/docs")));
    EXPECT_EQ("409 path_lookup/not_found/", Tried("delete", Path("/docs/deep")));
}

TEST_F(DropboxChangeTest, DeletesAFileOnlyAtTheRevisionThatWasSaid) {
    amy.AddPath("/a.txt", "text");
    Json::Value args = Path("/a.txt");
    args["parent_rev"] = "000000001";
    EXPECT_EQ("409 path_write/conflict/file/", Tried("delete_v2", args));
    args["parent_rev"] = Call("files/get_metadata", Path("/a.txt")).Json()["rev"];
    EXPECT_EQ(200, Call("files/delete_v2", args).status);
}

TEST_F(DropboxChangeTest, TheTopFolderIsNeitherDeletedNorMoved) {
    EXPECT_EQ("409 path_lookup/malformed_path/", Tried("delete_v2", Path("/")));
    EXPECT_EQ("409 from_lookup/malformed_path/", Tried("move_v2", FromTo("/", "/a")));
    EXPECT_EQ("409 from_lookup/malformed_path/", Tried("copy_v2", FromTo("/", "/a")));
    EXPECT_EQ("409 path/malformed_path/", Tried("create_folder_v2", Path("/")));
}

TEST_F(DropboxChangeTest, CopiesAFolderWithAllInIt) {
    amy.AddPath("/docs/a.txt", "text");
    const Json::Value copied =
        Call("files/copy_v2", FromTo("/docs", "/new/Docs 2")).Json()["metadata"];
    EXPECT_EQ("/new/Docs 2", copied["path_display"].asString());
    EXPECT_EQ("text", Bytes("/new/docs 2/a.txt"));
    EXPECT_NE(amy.Find("/docs/a.txt"), amy.Find("/new/docs 2/a.txt"));
}

TEST_F(DropboxChangeTest, MovesKeepTheId) {
    const std::string id = amy.AddPath("/docs/a.txt", "text");
    Call("files/move_v2", FromTo("/docs/a.txt", "/other/b.txt"));
    EXPECT_EQ(id, amy.Find("/other/b.txt"));
    EXPECT_FALSE(amy.Exists("/docs/a.txt"));
}

TEST_F(DropboxChangeTest, WhatIsInTheWayIsToldByItsKind) {
    amy.AddFile("root", "file", "text");
    amy.AddFile("root", "second", "text");
    amy.AddFolder("root", "folder");
    for (const std::string function : {"copy", "copy_v2", "move", "move_v2"}) {
        EXPECT_EQ("409 to/conflict/file/", Tried(function, FromTo("/second", "/FILE")));
        EXPECT_EQ("409 to/conflict/folder/", Tried(function, FromTo("/second", "/folder")));
        EXPECT_EQ("409 to/conflict/file_ancestor/", Tried(function, FromTo("/second", "/file/x")));
        EXPECT_EQ("409 from_lookup/not_found/", Tried(function, FromTo("/none", "/x")));
        EXPECT_EQ("409 to/malformed_path/", Tried(function, FromTo("/second", "/x/")));
    }
}

TEST_F(DropboxChangeTest, FindsAnotherNameWhenAskedTo) {
    amy.AddFile("root", "a.txt", "old");
    amy.AddFile("root", "b.txt", "new");
    Call("files/copy_v2", Renaming(FromTo("/b.txt", "/a.txt")));
    EXPECT_EQ("new", Bytes("/a (2).txt"));
    const Json::Value moved = Call("files/move_v2", Renaming(FromTo("/b.txt", "/a.txt"))).Json();
    EXPECT_EQ("a (3).txt", moved["metadata"]["name"].asString());
    EXPECT_EQ("old", Bytes("/a.txt"));
}

TEST_F(DropboxChangeTest, AFolderGoesNeitherOntoNorIntoItself) {
    amy.AddPath("/docs/deep/a.txt", "text");
    EXPECT_EQ("409 to/conflict/folder/", Tried("move_v2", FromTo("/docs", "/docs")));
    EXPECT_EQ("409 to/conflict/folder/", Tried("copy_v2", FromTo("/docs", "/docs")));
    EXPECT_EQ("409 cant_move_folder_into_itself/",
              Tried("move_v2", FromTo("/docs", "/docs/deep/x")));
    EXPECT_EQ("409 duplicated_or_nested_paths/", Tried("copy_v2", FromTo("/docs", "/docs/new/x")));
    EXPECT_FALSE(amy.Exists("/docs/new"));
}

TEST_F(DropboxChangeTest, ChangesOfCaseAloneHaveNoEffect) {
    amy.AddFile("root", "Case.md", "text");
    const Json::Value moved = Call("files/move_v2", FromTo("/Case.md", "/case.md")).Json();
    EXPECT_EQ("/Case.md", moved["metadata"]["path_display"].asString());
}

TEST_F(DropboxChangeTest, CopiesCountAgainstTheQuota) {
    amy.AddFile("root", "a", "0123456789");
    amy.SetQuota(19);
    EXPECT_EQ("409 insufficient_quota/", Tried("copy_v2", FromTo("/a", "/b")));
    EXPECT_EQ(200, Call("files/move_v2", FromTo("/a", "/b")).status);
}

TEST_F(DropboxChangeTest, AReferenceCopiesIntoAnotherAccount) {
    amy.AddPath("/Docs/a.txt", "text");
    const Json::Value given = Call("files/copy_reference/get", Path("/docs")).Json();
    EXPECT_EQ("folder", given["metadata"][".tag"].asString());
    EXPECT_EQ(20u, given["expires"].asString().size());
    client.UseToken(bob.IssueTokens().access_token);
    Json::Value args = Path("/from amy");
    args["copy_reference"] = given["copy_reference"];
    const Json::Value saved = Call("files/copy_reference/save", args).Json();
    EXPECT_EQ("/from amy", saved["metadata"]["path_display"].asString());
    EXPECT_EQ("text", bob.Bytes(bob.Find("/from amy/a.txt")));
    EXPECT_EQ("409 path/conflict/folder/", Tried("copy_reference/save", args));
    EXPECT_EQ("text", Bytes("/docs/a.txt"));
}

TEST_F(DropboxChangeTest, AReferenceIsNoGoodWhenUnknownGoneOrTooLarge) {
    EXPECT_EQ("409 path/not_found/", Tried("copy_reference/get", Path("/none")));
    amy.AddPath("/a.txt", "text");
    Json::Value args = Path("/b.txt");
    args["copy_reference"] = "nonsense";
    EXPECT_EQ("409 invalid_copy_reference/", Tried("copy_reference/save", args));
    args["copy_reference"] =
        Call("files/copy_reference/get", Path("/a.txt")).Json()["copy_reference"];
    amy.SetQuota(5);
    EXPECT_EQ("409 path/insufficient_space/", Tried("copy_reference/save", args));
    Call("files/delete_v2", Path("/a.txt"));
    EXPECT_EQ("409 not_found/", Tried("copy_reference/save", args));
}

}  // namespace
