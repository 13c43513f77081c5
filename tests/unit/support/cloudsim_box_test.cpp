/** The simulated Box, asked by a plain HTTP client. */
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "support/cloudsim/cloudsim.h"
#include "support/cloudsim_client.h"

namespace {

using cloudsim::Got;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

struct BoxTest : testing::Test {
    cloudsim::BoxService box;
    cloudsim::Account& amy = box.AddAccount("amy@example.com", "Amy Adams");
    cloudsim::Client client{amy.IssueTokens().access_token};

    Got Get(const std::string& path) { return client.Get(box.ApiHost() + path); }
    Got Send(const std::string& method, const std::string& path, const std::string& body = "") {
        return client.Send(method, box.ApiHost() + path, body);
    }
    Got Upload(const std::string& path, const std::string& attributes, const std::string& bytes) {
        return client.Upload(box.UploadHost() + path,
                             {{"attributes", attributes}, {"@file", bytes}});
    }
    void TearDown() override { EXPECT_THAT(box.UnusedFaults(), IsEmpty()); }
};

std::string Code(const Got& got) {
    return got.Json()["code"].asString();
}

std::vector<std::string> Names(const Json::Value& list) {
    std::vector<std::string> names;
    for (const Json::Value& entry : list["entries"]) {
        names.push_back(entry["name"].asString());
    }
    return names;
}

TEST_F(BoxTest, TellsTheTokensUser) {
    const Got got = Get("/2.0/users/me");
    EXPECT_EQ(200, got.status);
    EXPECT_EQ("amy@example.com", got.Json()["login"].asString());
    EXPECT_EQ("Amy Adams", got.Json()["name"].asString());
    EXPECT_EQ(0u, got.Json()["space_used"].asUInt64());
}

TEST_F(BoxTest, RefusesAMissingOrUnknownTokenWithAChallenge) {
    client.UseToken("");
    EXPECT_THAT(Get("/2.0/users/me").head,
                HasSubstr("WWW-Authenticate: Bearer realm=\"Service\"\r"));
    client.UseToken("nonsense");
    const Got got = Get("/2.0/users/me");
    EXPECT_EQ(401, got.status);
    EXPECT_THAT(got.head, HasSubstr("error=\"invalid_token\""));
}

TEST_F(BoxTest, RefusesATokenWhoseLifeIsOver) {
    client.UseToken(amy.IssueTokens(5).access_token);
    EXPECT_EQ(200, Get("/2.0/users/me").status);
    box.AdvanceClock(5);
    EXPECT_EQ(401, Get("/2.0/users/me").status);
}

TEST_F(BoxTest, PagesThroughAFolderWithFoldersFirst) {
    amy.AddFile("0", "b.txt", "b");
    amy.AddFile("0", "a.txt", "a");
    amy.AddFolder("0", "Zoo");
    const Json::Value first = Get("/2.0/folders/0/items?limit=2&fields=name,size").Json();
    EXPECT_THAT(Names(first), ElementsAre("Zoo", "a.txt"));
    EXPECT_EQ(3, first["total_count"].asInt());
    EXPECT_EQ(2, first["limit"].asInt());
    EXPECT_FALSE(first["entries"][1].isMember("sha1"));
    EXPECT_THAT(Names(Get("/2.0/folders/0/items?limit=2&offset=2").Json()), ElementsAre("b.txt"));
}

TEST_F(BoxTest, CapsTheLimitAtAThousandAndTheOffsetAtTheDocumentedOne) {
    amy.AddMany("0", 1001, 10);
    const Json::Value page = Get("/2.0/folders/0/items?limit=5000&fields=id").Json();
    EXPECT_EQ(1000u, page["entries"].size());
    EXPECT_EQ(1000, page["limit"].asInt());
    EXPECT_EQ("invalid_offset", Code(Get("/2.0/folders/0/items?offset=10001")));
    EXPECT_EQ("invalid_limit", Code(Get("/2.0/folders/0/items?limit=many")));
}

TEST_F(BoxTest, PagesByMarkersUntilAPageHasNone) {
    amy.AddMany("0", 3, 1);
    const std::string path = "/2.0/folders/0/items?usemarker=true&limit=2";
    const Json::Value first = Get(path).Json();
    EXPECT_EQ(2u, first["entries"].size());
    EXPECT_FALSE(first.isMember("total_count"));
    const Json::Value last = Get(path + "&marker=" + first["next_marker"].asString()).Json();
    EXPECT_THAT(Names(last), ElementsAre("item-000002.bin"));
    EXPECT_FALSE(last.isMember("next_marker"));
}

TEST_F(BoxTest, SortsWithinFoldersAndFiles) {
    amy.AddFolder("0", "folder");
    amy.AddFile("0", "a", "longest");
    amy.AddFile("0", "b", "");
    EXPECT_THAT(Names(Get("/2.0/folders/0/items?sort=size").Json()),
                ElementsAre("folder", "b", "a"));
    EXPECT_THAT(Names(Get("/2.0/folders/0/items?direction=DESC").Json()),
                ElementsAre("folder", "b", "a"));
}

TEST_F(BoxTest, MakesAFolderOnceWithoutRegardToCase) {
    const Got made = Send("POST", "/2.0/folders", R"({"name":"Docs","parent":{"id":"0"}})");
    EXPECT_EQ(201, made.status);
    EXPECT_EQ(amy.Find("/docs"), made.Json()["id"].asString());
    const Got again = Send("POST", "/2.0/folders", R"({"name":"DOCS","parent":{"id":"0"}})");
    EXPECT_EQ(409, again.status);
    EXPECT_EQ("item_name_in_use", Code(again));
    EXPECT_EQ(made.Json()["id"], again.Json()["context_info"]["conflicts"][0]["id"]);
}

TEST_F(BoxTest, RefusesNamesThatBoxDoesNotTake) {
    for (const std::string name : {"", ".", "..", "a/b", "a\\\\b", " a", "a ", "\\u0007"}) {
        const Got got =
            Send("POST", "/2.0/folders", R"({"name":")" + name + R"(","parent":{"id":"0"}})");
        EXPECT_EQ(400, got.status) << name;
        EXPECT_EQ("item_name_invalid", Code(got)) << name;
    }
    std::string umlauts;
    for (int i = 0; i < 255; i++) {
        umlauts += "\xc3\xa4";
    }
    const auto body = [](const std::string& name) {
        return R"({"name":")" + name + R"(","parent":{"id":"0"}})";
    };
    EXPECT_EQ(201, Send("POST", "/2.0/folders", body(umlauts)).status);
    EXPECT_EQ("item_name_too_long", Code(Send("POST", "/2.0/folders", body(umlauts + "x"))));
}

TEST_F(BoxTest, RenamesAndMovesAndCountsTheChange) {
    const std::string folder = amy.AddFolder("0", "sub");
    const std::string file = amy.AddFile("0", "a.txt", "text");
    const Got got =
        Send("PUT", "/2.0/files/" + file, R"({"name":"b.txt","parent":{"id":")" + folder + "\"}}");
    EXPECT_EQ(200, got.status);
    EXPECT_EQ("1", got.Json()["etag"].asString());
    EXPECT_EQ(folder, got.Json()["parent"]["id"].asString());
    EXPECT_EQ(file, amy.Find("/sub/b.txt"));
    EXPECT_FALSE(amy.Exists("/a.txt"));
}

TEST_F(BoxTest, RefusesAMoveIntoItselfAndOntoAnother) {
    const std::string folder = amy.AddFolder("0", "outer");
    const std::string inner = amy.AddFolder(folder, "inner");
    const std::string file = amy.AddFile("0", "Outer.txt", "");
    EXPECT_EQ("cyclical_folder_structure",
              Code(Send("PUT", "/2.0/folders/" + folder, R"({"parent":{"id":")" + inner + "\"}}")));
    const Got taken = Send("PUT", "/2.0/files/" + file, R"({"name":"OUTER"})");
    EXPECT_EQ(409, taken.status);
    EXPECT_EQ(folder, taken.Json()["context_info"]["conflicts"]["id"].asString());
}

TEST_F(BoxTest, CopiesFilesAndWholeFolders) {
    const std::string file = amy.AddPath("/from/deep/a.txt", "text");
    const std::string to = amy.AddFolder("0", "to");
    EXPECT_EQ(201, Send("POST", "/2.0/files/" + file + "/copy",
                        R"({"name":"c.txt","parent":{"id":")" + to + "\"}}")
                       .status);
    EXPECT_EQ(201, Send("POST", "/2.0/folders/" + amy.Find("/from") + "/copy",
                        R"({"parent":{"id":")" + to + "\"}}")
                       .status);
    EXPECT_EQ("text", amy.Bytes(amy.Find("/to/c.txt")));
    EXPECT_EQ("text", amy.Bytes(amy.Find("/to/from/deep/a.txt")));
    EXPECT_EQ("text", amy.Bytes(file));
}

TEST_F(BoxTest, DeletesAFullFolderOnlyRecursively) {
    const std::string folder = amy.AddFolder("0", "full");
    const std::string file = amy.AddFile(folder, "a.txt", "text");
    EXPECT_EQ("folder_not_empty", Code(Send("DELETE", "/2.0/folders/" + folder)));
    EXPECT_EQ(204, Send("DELETE", "/2.0/folders/" + folder + "?recursive=true").status);
    EXPECT_EQ("trashed", Code(Get("/2.0/files/" + file)));
    EXPECT_EQ("not_found", Code(Get("/2.0/files/12")));
}

TEST_F(BoxTest, PreflightTellsWhatAnUploadWouldMeet) {
    const std::string file = amy.AddFile("0", "a.txt", "text");
    amy.SetMaxUpload(1000);
    const auto ask = [&](const std::string& body) {
        return Send("OPTIONS", "/2.0/files/content", body);
    };
    const Got good = ask(R"({"name":"b.txt","parent":{"id":"0"},"size":5})");
    EXPECT_EQ(200, good.status);
    EXPECT_THAT(good.Json()["upload_url"].asString(), HasSubstr(box.UploadHost()));
    const Got taken = ask(R"({"name":"A.txt","parent":{"id":"0"},"size":5})");
    EXPECT_EQ(409, taken.status);
    EXPECT_EQ(file, taken.Json()["context_info"]["conflicts"]["id"].asString());
    EXPECT_EQ("file_size_limit_exceeded",
              Code(ask(R"({"name":"b.txt","parent":{"id":"0"},"size":1001})")));
    EXPECT_EQ(404, ask(R"({"name":"b.txt","parent":{"id":"77"}})").status);
    EXPECT_EQ("item_name_invalid", Code(ask(R"({"name":"b/c","parent":{"id":"0"}})")));
    amy.SetQuota(10);
    const Got full = ask(R"({"name":"b.txt","parent":{"id":"0"},"size":7})");
    EXPECT_EQ(403, full.status);
    EXPECT_EQ("storage_limit_exceeded", Code(full));
    EXPECT_EQ(200, Send("OPTIONS", "/2.0/files/" + file + "/content", R"({"size":10})").status);
}

TEST_F(BoxTest, TakesANewFileAndThenANewVersion) {
    std::string bytes(3000000, 'x');
    bytes[7] = '\0';
    const Got made =
        Upload("/api/2.0/files/content", R"({"name":"a.bin","parent":{"id":"0"}})", bytes);
    EXPECT_EQ(201, made.status) << made.body;
    const Json::Value file = made.Json()["entries"][0];
    EXPECT_EQ(bytes, amy.Bytes(file["id"].asString()));
    EXPECT_EQ(amy.Get(file["id"].asString()).sha1, file["sha1"].asString());
    const Got version =
        Upload("/api/2.0/files/" + file["id"].asString() + "/content", "{}", "short");
    EXPECT_EQ(201, version.status) << version.body;
    EXPECT_EQ("1", version.Json()["entries"][0]["etag"].asString());
    EXPECT_EQ("short", amy.Bytes(amy.Find("/a.bin")));
    EXPECT_EQ(
        409,
        Upload("/api/2.0/files/content", R"({"name":"A.bin","parent":{"id":"0"}})", "").status);
}

TEST_F(BoxTest, KeepsTheDatesThatTheUploaderTells) {
    const auto attributes = [](const std::string& date) {
        return R"({"name":"a","parent":{"id":"0"},"content_modified_at":")" + date + "\"}";
    };
    EXPECT_EQ(400, Upload("/api/2.0/files/content", attributes("yesterday"), "x").status);
    EXPECT_FALSE(amy.Exists("/a"));
    const Got got =
        Upload("/api/2.0/files/content", attributes("2020-02-03T04:05:06.5+01:00"), "x");
    EXPECT_EQ("2020-02-02T19:05:06-08:00",
              got.Json()["entries"][0]["content_modified_at"].asString());
}

TEST_F(BoxTest, RefusesWhatTheUploadersSumContradicts) {
    client.headers = {"Content-MD5: 0123456789012345678901234567890123456789"};
    const Got got =
        Upload("/api/2.0/files/content", R"({"name":"a","parent":{"id":"0"}})", "bytes");
    EXPECT_EQ("bad_digest", Code(got));
    EXPECT_FALSE(amy.Exists("/a"));
}

TEST_F(BoxTest, RefusesChangesOfAnotherVersionThanTheOneMeant) {
    const std::string file = amy.AddFile("0", "a", "text");
    client.headers = {"If-Match: 3"};
    EXPECT_EQ(412, Send("PUT", "/2.0/files/" + file, R"({"name":"b"})").status);
    EXPECT_EQ(412, Send("DELETE", "/2.0/files/" + file).status);
    client.headers = {"If-Match: 0"};
    EXPECT_EQ(200, Send("PUT", "/2.0/files/" + file, R"({"name":"b"})").status);
}

TEST_F(BoxTest, AListingShowsEveryChangeAtOnce) {
    const std::string path = "/2.0/folders/0/items?fields=name";
    EXPECT_THAT(Names(Get(path).Json()), IsEmpty());
    const std::string file = amy.AddFile("0", "a", "text");
    EXPECT_THAT(Names(Get(path).Json()), ElementsAre("a"));
    Send("PUT", "/2.0/files/" + file, R"({"name":"b"})");
    EXPECT_THAT(Names(Get(path).Json()), ElementsAre("b"));
    cloudsim::Account& ben = box.AddAccount("ben@example.com");
    client.UseToken(ben.IssueTokens().access_token);
    EXPECT_THAT(Names(Get(path).Json()), IsEmpty());
    EXPECT_EQ(404, Get("/2.0/files/" + file).status);
}

TEST_F(BoxTest, RefusesAttributesBehindTheFile) {
    const Got got =
        client.Upload(box.UploadHost() + "/api/2.0/files/content",
                      {{"@file", "bytes"}, {"attributes", R"({"name":"a","parent":{"id":"0"}})"}});
    EXPECT_EQ("metadata_after_file_contents", Code(got));
    EXPECT_THAT(amy.List("0"), IsEmpty());
}

TEST_F(BoxTest, AnswersContentByARedirectThatNeedsNoToken) {
    const std::string file = amy.AddFile("0", "a.txt", "0123456789");
    const Got got = Get("/2.0/files/" + file + "/content");
    EXPECT_EQ(302, got.status);
    const size_t at = got.head.find("Location: ") + 10;
    const std::string url = got.head.substr(at, got.head.find('\r', at) - at);
    EXPECT_THAT(url, HasSubstr(box.DownloadHost()));
    client.UseToken("");
    EXPECT_EQ("0123456789", client.Get(url).body);
    client.headers = {"Range: bytes=3-5"};
    const Got part = client.Get(url);
    EXPECT_EQ(206, part.status);
    EXPECT_EQ("345", part.body);
    EXPECT_THAT(part.head, HasSubstr("Content-Range: bytes 3-5/10\r"));
    client.headers = {"Range: bytes=10-"};
    EXPECT_EQ(416, client.Get(url).status);
    EXPECT_EQ(404, client.Get(box.DownloadHost() + "/d/1/unknown/download").status);
}

TEST_F(BoxTest, KeepsItsHostsApart) {
    EXPECT_EQ(404, client.Get(box.UploadHost() + "/2.0/users/me").status);
    EXPECT_EQ(404, Send("POST", "/api/2.0/files/content").status);
    EXPECT_EQ(404, client.Get(box.DownloadHost() + "/2.0/users/me").status);
    EXPECT_EQ(200, client.Get(box.Address("127.0.0.1") + "/2.0/users/me").status);
}

TEST_F(BoxTest, TellsUnknownPathsFromUnknownMethods) {
    EXPECT_EQ(404, Get("/2.0/nothing").status);
    EXPECT_EQ(405, Send("PATCH", "/2.0/folders/0").status);
    EXPECT_EQ(405, Get("/oauth2/token").status);
}

TEST_F(BoxTest, AnswersBodiesOfTheWrongShapeWithBadRequest) {
    for (const char* body : {"{", "[]", R"({"name":{},"parent":{"id":"0"}})",
                             R"({"name":"a","parent":"0"})", R"({"name":"a","parent":{"id":0}})"}) {
        EXPECT_EQ(400, Send("POST", "/2.0/folders", body).status) << body;
    }
}

TEST_F(BoxTest, FindsByWordsOfNames) {
    amy.AddPath("/docs/Yearly report.txt", "");
    amy.AddPath("/docs/report 2.txt", "");
    amy.AddFolder("0", "Reports");
    const Json::Value found = Get("/2.0/search?query=REPORT&type=file").Json();
    EXPECT_THAT(Names(found), ElementsAre("report 2.txt", "Yearly report.txt"));
    EXPECT_EQ(2, found["total_count"].asInt());
    EXPECT_THAT(Names(Get("/2.0/search?query=report%20yearly").Json()),
                ElementsAre("Yearly report.txt"));
}

struct BoxTokenTest : BoxTest {
    Got Ask(const std::string& form) { return client.Send("POST", box.TokenUrl(), form); }
    static std::string Form(const std::string& refresh, const std::string& secret = "secret") {
        return "grant_type=refresh_token&client_id=client&client_secret=" + secret +
               "&refresh_token=" + refresh;
    }
};

TEST_F(BoxTokenTest, ARefreshTokenIsGoodOnce) {
    const cloudsim::Tokens old = amy.IssueTokens();
    box.SetTokenLife(77);
    const Got got = Ask(Form(old.refresh_token));
    EXPECT_EQ(200, got.status);
    EXPECT_EQ(77, got.Json()["expires_in"].asInt());
    EXPECT_EQ("bearer", got.Json()["token_type"].asString());
    client.UseToken(got.Json()["access_token"].asString());
    EXPECT_EQ(200, Get("/2.0/users/me").status);
    EXPECT_EQ(amy.LastTokens().refresh_token, got.Json()["refresh_token"].asString());
    const Got again = Ask(Form(old.refresh_token));
    EXPECT_EQ(400, again.status);
    EXPECT_EQ("invalid_grant", again.Json()["error"].asString());
    EXPECT_EQ(200, Ask(Form(amy.LastTokens().refresh_token)).status);
}

TEST_F(BoxTokenTest, ARefusedClientDoesNotUseTheTokenUp) {
    const cloudsim::Tokens old = amy.IssueTokens();
    EXPECT_EQ("invalid_client", Ask(Form(old.refresh_token, "wrong")).Json()["error"].asString());
    EXPECT_EQ("invalid_request", Ask("grant_type=password").Json()["error"].asString());
    EXPECT_EQ(200, Ask(Form(old.refresh_token)).status);
}

TEST_F(BoxTokenTest, RevokedRefreshTokensAreRefused) {
    const cloudsim::Tokens old = amy.IssueTokens();
    amy.RevokeRefreshTokens();
    EXPECT_EQ("invalid_grant", Ask(Form(old.refresh_token)).Json()["error"].asString());
}

}  // namespace
