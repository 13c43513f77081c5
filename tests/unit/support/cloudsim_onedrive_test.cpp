/** The simulated OneDrive's REST interface, asked by a plain HTTP client. */
#include "support/cloudsim_onedrive.h"

namespace {

using cloudsim::ErrorOf;
using cloudsim::Got;
using cloudsim::HeaderOf;
using cloudsim::NamesOf;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::MatchesRegex;
using testing::Not;

struct OneDriveTest : cloudsim::OneDriveFixture {
    using OneDriveFixture::OneDriveFixture;
    Got Put(const std::string& path, const std::string& bytes) { return Send("PUT", path, bytes); }
};

std::string NameBody(const std::string& name) {
    return R"({"name":")" + name + "\"}";
}

std::string To(const std::string& id) {
    return R"({"destination":")" + id + "\"}";
}

TEST_F(OneDriveTest, TellsTheTokensUser) {
    const Json::Value user = Get("me?pretty=false").Json();
    EXPECT_EQ(amy.Id(), user["id"].asString());
    EXPECT_THAT(user["id"].asString(), MatchesRegex("[0-9a-f]{16}"));
    EXPECT_EQ("Amy Adams", user["name"].asString());
    EXPECT_EQ("amy@example.com", user["emails"]["preferred"].asString());
    EXPECT_EQ("amy@example.com", user["emails"]["account"].asString());
    EXPECT_TRUE(user["emails"].isMember("personal"));
    EXPECT_TRUE(user["emails"]["business"].isNull());
}

TEST_F(OneDriveTest, TheTopFolderHasAnIdOfItsOwnAndNoParent) {
    amy.AddFile(amy.Root(), "a", "");
    const Json::Value root = Get("me/skydrive").Json();
    EXPECT_EQ("folder." + amy.Id(), root["id"].asString());
    EXPECT_EQ(amy.Root(), root["id"].asString());
    EXPECT_TRUE(root["parent_id"].isNull());
    EXPECT_EQ("folder", root["type"].asString());
    EXPECT_EQ(1, root["count"].asInt());
    EXPECT_EQ(root, Get(amy.Root()).Json());
    EXPECT_EQ(root, Get(amy.Id() + "/skydrive").Json());
}

TEST_F(OneDriveTest, ShowsAFileAsDocumented) {
    const std::string folder = amy.AddFolder(amy.Root(), "docs");
    const std::string id = amy.AddFile(folder, "a b.docx", "12345");
    amy.SetTimes(id, 1318461503, 1318461504);
    const Json::Value file = Get(id).Json();
    EXPECT_THAT(id, MatchesRegex("file\\.[0-9a-f]{16}\\.[0-9A-F]{16}![0-9]+"));
    EXPECT_EQ(id, file["id"].asString());
    EXPECT_EQ("Amy Adams", file["from"]["name"].asString());
    EXPECT_EQ(folder, file["parent_id"].asString());
    EXPECT_TRUE(file["size"].isIntegral());
    EXPECT_EQ(5, file["size"].asInt());
    EXPECT_EQ("file", file["type"].asString());
    EXPECT_EQ(Api(id + "/content/"), file["upload_location"].asString());
    EXPECT_EQ("2011-10-12T23:18:23+0000", file["created_time"].asString());
    EXPECT_EQ("2011-10-12T23:18:24+0000", file["updated_time"].asString());
    EXPECT_THAT(file["link"].asString(), HasSubstr("resid=" + id.substr(id.rfind('.') + 1)));
    client.UseToken("");
    EXPECT_EQ("12345", client.Get(file["source"].asString()).body);
}

TEST_F(OneDriveTest, ShowsAFolderWithItsCountAndWhereUploadsGo) {
    const std::string id = amy.AddFolder(amy.Root(), "docs");
    amy.AddFile(id, "a", "x");
    const Json::Value folder = Get(id).Json();
    EXPECT_THAT(id, MatchesRegex("folder\\.[0-9a-f]{16}\\.[0-9A-F]{16}![0-9]+"));
    EXPECT_EQ("folder", folder["type"].asString());
    EXPECT_EQ(1, folder["count"].asInt());
    EXPECT_EQ(Api(id + "/files/"), folder["upload_location"].asString());
    EXPECT_FALSE(folder.isMember("source"));
}

TEST_F(OneDriveTest, TypesAreToldByNamesOrByTheTest) {
    amy.AddFile(amy.Root(), "a.JPG", "");
    amy.AddFile(amy.Root(), "b.mp3", "");
    amy.AddFile(amy.Root(), "c.mp4", "");
    amy.AddFile(amy.Root(), "d", "");
    drive.SetType(amy.AddFolder(amy.Root(), "e"), "album");
    drive.SetType(amy.AddFolder(amy.Root(), "f"), "notebook");
    std::vector<std::string> types;
    const Json::Value list = Get("me/skydrive/files").Json();
    for (const Json::Value& item : list["data"]) {
        types.push_back(item["type"].asString());
    }
    EXPECT_THAT(types, ElementsAre("album", "notebook", "photo", "audio", "video", "file"));
    EXPECT_THAT(NamesOf(Get("me/skydrive/files?filter=albums,photos").Json()),
                ElementsAre("e", "a.JPG"));
}

TEST_F(OneDriveTest, AlbumsLieInTheTopFolder) {
    amy.AddFolder(amy.Root(), "folder");
    const Got made = Send("POST", "me/albums", NameBody("My album"));
    EXPECT_EQ(201, made.status);
    EXPECT_EQ("album", made.Json()["type"].asString());
    EXPECT_EQ(amy.Root(), made.Json()["parent_id"].asString());
    EXPECT_THAT(NamesOf(Get("me/albums").Json()), ElementsAre("My album"));
    const std::string id = amy.Find("/My album");
    EXPECT_EQ(201, Put(id + "/files/a.jpg", "x").status);
    EXPECT_THAT(NamesOf(Get(id + "/files").Json()), ElementsAre("a.jpg"));
    EXPECT_EQ("album", Get(id).Json()["type"].asString());
}

TEST_F(OneDriveTest, NamesMayHoldAnyBytes) {
    const std::string odd = "\xff\x01\"\\/\xe2\x80\x8f\xf0\x9f\x98\x80";
    const std::string id = amy.AddFile(amy.Root(), odd, "text");
    amy.AddFile(amy.Root(), std::string(4096, 'n'), "");
    amy.AddFile(amy.Root(), "", "");
    EXPECT_THAT(Get("me/skydrive/files?pretty=false").body, HasSubstr("\\u0001\\\"\\\\/"));
    client.follow = true;
    EXPECT_EQ("text", Get(id + "/content").body);
}

TEST_F(OneDriveTest, ListsAllAtOnceUnlessALimitIsGiven) {
    amy.AddMany(amy.Root(), 1200, 1);
    const Json::Value all = Get("me/skydrive/files?pretty=false").Json();
    EXPECT_EQ(1200u, all["data"].size());
    EXPECT_FALSE(all.isMember("paging"));
    const Json::Value page = Get(amy.Root() + "/files?limit=2&offset=2").Json();
    EXPECT_THAT(NamesOf(page), ElementsAre("item-000002.bin", "item-000003.bin"));
    EXPECT_EQ(Api(amy.Root() + "/files?limit=2&offset=4"), page["paging"]["next"].asString());
    EXPECT_EQ(Api(amy.Root() + "/files?limit=2&offset=0"), page["paging"]["previous"].asString());
    EXPECT_THAT(NamesOf(client.Get(page["paging"]["next"].asString()).Json()),
                ElementsAre("item-000004.bin", "item-000005.bin"));
    EXPECT_FALSE(Get("me/skydrive/files?limit=10&offset=1195").Json()["paging"].isMember("next"));
    EXPECT_EQ("request_parameter_invalid", ErrorOf(Get("me/skydrive/files?limit=all")));
}

TEST_F(OneDriveTest, SortsByWhatIsAsked) {
    amy.SetTimes(amy.AddFile(amy.Root(), "a", "longest"), 10, 30);
    amy.SetTimes(amy.AddFile(amy.Root(), "B", ""), 10, 20);
    amy.SetTimes(amy.AddFile(amy.Root(), "c", "x"), 10, 40);
    const auto sorted = [&](const std::string& how) {
        return NamesOf(Get("me/skydrive/files?sort_by=" + how).Json());
    };
    EXPECT_THAT(sorted("name&sort_order=descending"), ElementsAre("c", "B", "a"));
    EXPECT_THAT(sorted("size"), ElementsAre("B", "c", "a"));
    EXPECT_THAT(sorted("updated&sort_order=ascending"), ElementsAre("B", "a", "c"));
}

TEST_F(OneDriveTest, AListingShowsEveryChangeAtOnce) {
    EXPECT_THAT(NamesOf(Get("me/skydrive/files").Json()), IsEmpty());
    const std::string id = amy.AddFile(amy.Root(), "a", "");
    EXPECT_THAT(NamesOf(Get("me/skydrive/files").Json()), ElementsAre("a"));
    Send("PUT", id, NameBody("b"));
    EXPECT_THAT(NamesOf(Get("me/skydrive/files").Json()), ElementsAre("b"));
    client.UseToken(drive.AddAccount("ben@example.com").IssueTokens().access_token);
    EXPECT_THAT(NamesOf(Get("me/skydrive/files").Json()), IsEmpty());
    EXPECT_EQ(404, Get(id).status);
}

TEST_F(OneDriveTest, FindsByPartsOfNamesBelowAFolder) {
    amy.AddPath("/docs/Yearly report.txt", "");
    amy.AddPath("/more/report.txt", "");
    EXPECT_THAT(NamesOf(Get("me/skydrive/search?q=REPORT").Json()),
                ElementsAre("Yearly report.txt", "report.txt"));
    EXPECT_THAT(NamesOf(Get(amy.Find("/more") + "/search?q=report").Json()),
                ElementsAre("report.txt"));
    EXPECT_EQ("request_parameter_missing", ErrorOf(Get("me/skydrive/search")));
}

TEST_F(OneDriveTest, TellsTheQuota) {
    amy.SetQuota(100);
    amy.AddFile(amy.Root(), "a", "0123456789");
    const Json::Value quota = Get("me/skydrive/quota").Json();
    EXPECT_EQ(100, quota["quota"].asInt());
    EXPECT_EQ(90, quota["available"].asInt());
}

TEST_F(OneDriveTest, OnePrettyParameterMakesDocumentsOneLine) {
    EXPECT_THAT(Get("me").body, HasSubstr("\n   \"id\""));
    EXPECT_THAT(Get("me?pretty=false").body, Not(HasSubstr("\n")));
    EXPECT_THAT(Get("me/skydrive/files?pretty=false").body, Not(HasSubstr("\n")));
}

TEST_F(OneDriveTest, MakesAFolderOnceWithoutRegardToCase) {
    const Got made = Send("POST", "me/skydrive?pretty=false", NameBody("Docs"));
    EXPECT_EQ(201, made.status);
    const std::string id = amy.Find("/docs");
    EXPECT_EQ(id, made.Json()["id"].asString());
    EXPECT_EQ(Api(id + "/"), HeaderOf(made, "Location"));
    const Got again = Send("POST", amy.Root(), NameBody("DOCS"));
    EXPECT_EQ(409, again.status);
    EXPECT_EQ("resource_already_exists", ErrorOf(again));
    EXPECT_THAT(again.Json()["error"]["message"].asString(), HasSubstr("DOCS"));
    EXPECT_EQ(201, Send("POST", id, NameBody("Docs")).status);
    EXPECT_TRUE(amy.Exists("/Docs/Docs"));
}

TEST_F(OneDriveTest, RefusesNamesThatWindowsDoesNotTake) {
    for (const std::string name : {"", "a/b", "a\\\\b", "a:b", "a*", "a?", "a\\\"b", "<a>", "a|b",
                                   " a", "a ", "a.", "\\u0007"}) {
        const Got got = Send("POST", "me/skydrive", NameBody(name));
        EXPECT_EQ(400, got.status) << name;
        EXPECT_EQ("resource_name_invalid", ErrorOf(got)) << name;
    }
    EXPECT_EQ(400, Send("POST", "me/skydrive", NameBody(std::string(256, 'a'))).status);
    EXPECT_EQ(201, Send("POST", "me/skydrive", NameBody(std::string(255, 'a'))).status);
}

TEST_F(OneDriveTest, RefusesBodiesOfTheWrongShape) {
    for (const char* body : {"{", "[]", "{}", R"({"name":7})", R"({"name":null})"}) {
        EXPECT_EQ("request_body_invalid", ErrorOf(Send("POST", "me/skydrive", body))) << body;
    }
    const std::string id = amy.AddFile(amy.Root(), "a", "");
    EXPECT_EQ("request_body_invalid", ErrorOf(Send("MOVE", id, "{}")));
    EXPECT_EQ("request_body_invalid", ErrorOf(Send("PUT", id, R"({"size":7})")));
}

TEST_F(OneDriveTest, RenamesAnItemAndItsCase) {
    const std::string id = amy.AddFile(amy.Root(), "a.txt", "text");
    amy.AddFile(amy.Root(), "b.txt", "");
    EXPECT_EQ("resource_already_exists", ErrorOf(Send("PUT", id, NameBody("B.txt"))));
    const Got got = Send("PUT", id, NameBody("A.TXT"));
    EXPECT_EQ(200, got.status);
    EXPECT_EQ("A.TXT", got.Json()["name"].asString());
    EXPECT_EQ(id, amy.Find("/a.txt"));
    EXPECT_EQ("A.TXT", amy.Get(id).name);
}

TEST_F(OneDriveTest, DeletesAnItemOnceWithAllBelow) {
    const std::string folder = amy.AddFolder(amy.Root(), "docs");
    const std::string file = amy.AddFile(folder, "a", "");
    EXPECT_EQ(204, Send("DELETE", folder + "?pretty=false").status);
    EXPECT_EQ("resource_not_found", ErrorOf(Send("DELETE", folder)));
    EXPECT_EQ("resource_not_found", ErrorOf(Get(file)));
    EXPECT_EQ(403, Send("DELETE", amy.Root()).status);
}

TEST_F(OneDriveTest, MovesAnItemUnderItsOwnNameAndId) {
    const std::string folder = amy.AddFolder(amy.Root(), "docs");
    const std::string file = amy.AddFile(amy.Root(), "a", "text");
    const Got got = Send("MOVE", file, To(folder));
    EXPECT_EQ(201, got.status);
    EXPECT_EQ(folder, got.Json()["parent_id"].asString());
    EXPECT_EQ(file, amy.Find("/docs/a"));
    EXPECT_FALSE(amy.Exists("/a"));
}

TEST_F(OneDriveTest, AMoveMeetsConflictsCirclesAndMissingPlaces) {
    const std::string outer = amy.AddFolder(amy.Root(), "outer");
    const std::string inner = amy.AddFolder(outer, "inner");
    const std::string file = amy.AddFile(amy.Root(), "a", "");
    amy.AddFile(outer, "A", "");
    EXPECT_EQ("resource_already_exists", ErrorOf(Send("MOVE", file, To(outer))));
    EXPECT_EQ("request_body_invalid", ErrorOf(Send("MOVE", outer, To(inner))));
    EXPECT_EQ("request_body_invalid", ErrorOf(Send("MOVE", outer, To(outer))));
    EXPECT_EQ("resource_not_found", ErrorOf(Send("MOVE", file, To("folder.none"))));
    EXPECT_EQ("resource_not_found", ErrorOf(Send("MOVE", "file.none", To(outer))));
    EXPECT_EQ("request_url_invalid", ErrorOf(Send("MOVE", inner, To(file))));
    EXPECT_EQ(403, Send("MOVE", amy.Root(), To(outer)).status);
    EXPECT_THAT(amy.List(outer), testing::SizeIs(2));
}

TEST_F(OneDriveTest, CopiesAFileUnderANewId) {
    const std::string folder = amy.AddFolder(amy.Root(), "docs");
    const std::string file = amy.AddFile(amy.Root(), "a", "text");
    const Got got = Send("COPY", file, To(folder));
    EXPECT_EQ(201, got.status);
    EXPECT_NE(file, got.Json()["id"].asString());
    EXPECT_EQ("text", amy.Bytes(amy.Find("/docs/a")));
    EXPECT_EQ(file, amy.Find("/a"));
    EXPECT_EQ("resource_already_exists", ErrorOf(Send("COPY", file, To(folder))));
    EXPECT_EQ("resource_already_exists", ErrorOf(Send("COPY", file, To(amy.Root()))));
    amy.SetQuota(10);
    const Got full = Send("COPY", file, To(amy.AddFolder(folder, "deep")));
    EXPECT_EQ(507, full.status);
    EXPECT_EQ("resource_quota_exceeded", ErrorOf(full));
}

TEST_F(OneDriveTest, FoldersCannotBeCopied) {
    const std::string folder = amy.AddFolder(amy.Root(), "docs");
    const std::string other = amy.AddFolder(amy.Root(), "other");
    EXPECT_EQ("request_body_invalid", ErrorOf(Send("COPY", folder, To(other))));
    EXPECT_THAT(amy.List(other), IsEmpty());
}

struct CopyingOneDriveTest : OneDriveTest {
    static cloudsim::OneDriveOptions Options() {
        cloudsim::OneDriveOptions options;
        options.copies_folders = true;
        options.conflict_status = 400;
        return options;
    }
    CopyingOneDriveTest() : OneDriveTest(Options()) {}
};

TEST_F(CopyingOneDriveTest, FoldersCanBeCopiedWhereATestWantsThat) {
    amy.AddPath("/docs/deep/a", "text");
    const std::string other = amy.AddFolder(amy.Root(), "other");
    EXPECT_EQ(201, Send("COPY", amy.Find("/docs"), To(other)).status);
    EXPECT_EQ("text", amy.Bytes(amy.Find("/other/docs/deep/a")));
    EXPECT_EQ(400, Send("COPY", amy.Find("/docs"), To(other)).status);
    EXPECT_EQ(400, Send("COPY", amy.Find("/docs"), To(amy.Find("/docs/deep"))).status);
}

TEST_F(OneDriveTest, RefusesAMissingAndAnExpiredToken) {
    client.UseToken("");
    EXPECT_EQ(401, Get("me").status);
    EXPECT_EQ("request_token_missing", ErrorOf(Get("me")));
    const std::string token = amy.IssueTokens(5).access_token;
    EXPECT_EQ(200, Get("me?access_token=" + token).status);
    drive.AdvanceClock(5);
    EXPECT_EQ("request_token_expired", ErrorOf(Get("me?access_token=" + token)));
    client.UseToken("nonsense");
    EXPECT_EQ(401, Put("me/skydrive/files/a", "x").status);
    EXPECT_FALSE(amy.Exists("/a"));
}

TEST_F(OneDriveTest, TooManyRequestsAreAnsweredWithTheTimeToWait) {
    drive.LimitRate(2, 30);
    EXPECT_EQ(200, Get("me").status);
    EXPECT_EQ(200, Get("me").status);
    const Got got = Get("me");
    EXPECT_EQ(420, got.status);
    EXPECT_EQ("request_throttled", ErrorOf(got));
    EXPECT_THAT(HeaderOf(got, "Retry-After"), testing::AnyOf("30", "29"));
    drive.AdvanceClock(30);
    EXPECT_EQ(200, Get("me").status);
}

TEST_F(OneDriveTest, KeepsItsHostsApart) {
    EXPECT_EQ(404, client.Get(drive.LoginHost() + "/v5.0/me").status);
    EXPECT_EQ(404, client.Get(drive.ContentHost() + "/v5.0/me").status);
    EXPECT_EQ(404, client.Get(drive.StorageHost(amy) + "/v5.0/me").status);
    EXPECT_EQ(404, client.Send("POST", drive.ApiHost() + "/oauth20_token.srf", "x").status);
    EXPECT_EQ(200, client.Get(drive.Address("127.0.0.1") + "/v5.0/me").status);
}

TEST_F(OneDriveTest, TellsUnknownPathsFromUnknownMethods) {
    EXPECT_EQ(404, client.Get(drive.ApiHost() + "/me").status);
    EXPECT_EQ(404, client.Get(drive.ApiHost() + "/v4.0/me").status);
    EXPECT_EQ(404, Get("me/skydrive/nothing").status);
    EXPECT_EQ(404, Get("me/files").status);
    EXPECT_EQ(405, Get("me/skydrive/files/a").status);
    EXPECT_EQ(405, Send("PATCH", amy.Root()).status);
    EXPECT_EQ(405, Send("DELETE", "me").status);
    EXPECT_EQ(405, client.Get(drive.TokenUrl()).status);
}

}  // namespace
