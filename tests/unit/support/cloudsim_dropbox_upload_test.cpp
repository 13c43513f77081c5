/** Uploads to the simulated Dropbox, at once and by sessions. */
#include "unit/support/cloudsim_dropbox_fixture.h"

namespace {

using cloudsim::Got;
using testing::HasSubstr;

struct DropboxUploadTest : DropboxTest {
    Got Upload(const std::string& path, const std::string& bytes, const Json::Value& mode = "add") {
        Json::Value args = Path(path);
        args["mode"] = mode;
        return Send("upload", args, bytes);
    }
    std::string Start(const std::string& bytes, bool close = false) {
        Json::Value args;
        args["close"] = close;
        return Send("upload_session/start", args, bytes).Json()["session_id"].asString();
    }
    static Json::Value Cursor(const std::string& session, uint64_t offset) {
        Json::Value cursor;
        cursor["session_id"] = session;
        cursor["offset"] = Json::UInt64(offset);
        return cursor;
    }
    Got Append(const std::string& session, uint64_t offset, const std::string& bytes,
               bool close = false) {
        Json::Value args;
        args["cursor"] = Cursor(session, offset);
        args["close"] = close;
        return Send("upload_session/append_v2", args, bytes);
    }
    static Json::Value End(const std::string& session, uint64_t offset, const std::string& path) {
        Json::Value args;
        args["cursor"] = Cursor(session, offset);
        args["commit"] = Path(path);
        return args;
    }
    Got Finish(const std::string& session, uint64_t offset, const std::string& path,
               const std::string& bytes = "") {
        return Send("upload_session/finish", End(session, offset, path), bytes);
    }
    static Json::Value Update(const Json::Value& rev) {
        Json::Value mode;
        mode[".tag"] = "update";
        mode["update"] = rev;
        return mode;
    }
};

TEST_F(DropboxUploadTest, UploadsANewFileWithAllThatLeadsToIt) {
    Json::Value args = Path(
        "/new/gr\xc3\xbc\xc3\x9f"
        "e.txt");
    args["client_modified"] = "2015-05-12T15:50:38Z";
    const Json::Value made = Send("upload", args, "hello").Json();
    EXPECT_EQ(
        "/new/gr\xc3\xbc\xc3\x9f"
        "e.txt",
        made["path_display"].asString());
    EXPECT_EQ("2015-05-12T15:50:38Z", made["client_modified"].asString());
    EXPECT_EQ(5u, made["size"].asUInt64());
    EXPECT_FALSE(made.isMember(".tag"));
    EXPECT_EQ("hello", Bytes("/new/gr\xc3\xbc\xc3\x9f"
                             "e.txt"));
}

TEST_F(DropboxUploadTest, AddingDoesNotReplaceAndTellsWhereTheBytesAreKept) {
    amy.AddFile("root", "a.txt", "old");
    const Got got = Upload("/A.txt", "new");
    EXPECT_EQ("409 path/conflict/file/", Summary(got));
    const Json::Value error = got.Json()["error"];
    EXPECT_EQ("file", error["reason"]["conflict"][".tag"].asString());
    EXPECT_EQ("old", Bytes("/a.txt"));
    const std::string kept = error["upload_session_id"].asString();
    EXPECT_EQ(200, Finish(kept, 3, "/b.txt").status);
    EXPECT_EQ("new", Bytes("/b.txt"));
}

TEST_F(DropboxUploadTest, TheSameBytesAreNoConflictUnlessAskedSo) {
    amy.AddFile("root", "a.txt", "same");
    const Json::Value rev = Call("files/get_metadata", Path("/a.txt")).Json()["rev"];
    EXPECT_EQ(rev, Upload("/a.txt", "same").Json()["rev"]);
    EXPECT_EQ(rev, Upload("/a.txt", "same", "overwrite").Json()["rev"]);
    Json::Value args = Path("/a.txt");
    args["strict_conflict"] = true;
    EXPECT_EQ("409 path/conflict/file/", Summary(Send("upload", args, "same")));
}

TEST_F(DropboxUploadTest, OverwritingKeepsTheIdAndNameAndChangesTheRevision) {
    const std::string id = amy.AddFile("root", "a.txt", "old");
    const Json::Value before = Call("files/get_metadata", Path("/a.txt")).Json();
    const Json::Value after = Upload("/A.TXT", "newer", "overwrite").Json();
    EXPECT_EQ(id, after["id"].asString());
    EXPECT_EQ("a.txt", after["name"].asString());
    EXPECT_NE(before["rev"], after["rev"]);
    EXPECT_NE(before["content_hash"], after["content_hash"]);
    EXPECT_EQ("newer", Bytes("/a.txt"));
}

TEST_F(DropboxUploadTest, UpdatesOnlyTheRevisionThatWasSaid) {
    amy.AddFile("root", "a.txt", "old");
    const Json::Value rev = Call("files/get_metadata", Path("/a.txt")).Json()["rev"];
    EXPECT_EQ("409 path/conflict/file/", Summary(Upload("/a.txt", "new", Update("000000009"))));
    EXPECT_EQ(200, Upload("/a.txt", "new", Update(rev)).status);
    EXPECT_EQ("409 path/conflict/file/", Summary(Upload("/a.txt", "newer", Update(rev))));
    Json::Value args = Path("/a.txt");
    args["mode"] = Update(rev);
    args["autorename"] = true;
    const Json::Value beside = Send("upload", args, "mine").Json();
    EXPECT_EQ("a (Amy Adams's conflicted copy).txt", beside["name"].asString());
}

TEST_F(DropboxUploadTest, AFileThatIsGoneIsUpdatedUnlessAskedStrictly) {
    Json::Value args = Path("/a.txt");
    args["mode"] = Update("000000001");
    args["strict_conflict"] = true;
    EXPECT_EQ("409 path/conflict/file/", Summary(Send("upload", args, "new")));
    args["strict_conflict"] = false;
    EXPECT_EQ(200, Send("upload", args, "new").status);
}

TEST_F(DropboxUploadTest, AFolderIsInTheWayOfAFileInEveryMode) {
    amy.AddFolder("root", "docs");
    amy.AddFile("root", "file", "");
    EXPECT_EQ("409 path/conflict/folder/", Summary(Upload("/docs", "x", "overwrite")));
    EXPECT_EQ("409 path/conflict/file_ancestor/", Summary(Upload("/file/x", "x")));
    EXPECT_EQ("409 path/malformed_path/", Summary(Upload("/docs/", "x")));
    Json::Value args = Path("/docs");
    args["autorename"] = true;
    EXPECT_EQ("docs (2)", Send("upload", args, "x").Json()["name"].asString());
}

TEST_F(DropboxUploadTest, RefusesWhatDoesNotFit) {
    amy.SetQuota(10);
    amy.AddFile("root", "a", "12345678");
    EXPECT_EQ("409 path/insufficient_space/", Summary(Upload("/b", "123")));
    EXPECT_EQ(200, Upload("/a", "1234567890", "overwrite").status);
    EXPECT_EQ("409 payload_too_large/", Summary(Upload("/b", std::string(101, 'x'))));
}

TEST_F(DropboxUploadTest, ComplainsInPlainWordsOfArgumentsItCannotRead) {
    client.headers = {"Content-Type: application/octet-stream"};
    const std::string url = dropbox.ContentHost() + "/2/files/upload", bytes = "text";
    EXPECT_THAT(client.Send("POST", url, &bytes).body, HasSubstr("Must provide HTTP header"));
    client.headers.emplace_back("Dropbox-API-Arg: {\"path\"");
    const Got got = client.Send("POST", url, &bytes);
    EXPECT_EQ(400, got.status);
    EXPECT_THAT(got.body, HasSubstr("could not decode input as JSON"));
    client.headers = {"Dropbox-API-Arg: {\"path\":\"/a\"}"};
    EXPECT_THAT(client.Send("POST", url, &bytes).body, HasSubstr("Bad HTTP \"Content-Type\""));
    Json::Value args = Path("/a");
    args["client_modified"] = "yesterday";
    EXPECT_THAT(Send("upload", args, "x").body, HasSubstr("client_modified: time data"));
    EXPECT_THAT(Upload("/a", "x", "replace").body, HasSubstr("mode: unknown tag 'replace'"));
    EXPECT_FALSE(amy.Exists("/a"));
}

TEST_F(DropboxUploadTest, ASessionTakesPiecesAndEndsInAFile) {
    const std::string session = Start("0123");
    const Got appended = Append(session, 4, "456");
    EXPECT_EQ(200, appended.status);
    EXPECT_EQ("null", appended.body);
    const Json::Value made = Finish(session, 7, "/a.bin", "789").Json();
    EXPECT_EQ(10u, made["size"].asUInt64());
    EXPECT_EQ("0123456789", Bytes("/a.bin"));
    EXPECT_EQ("3456", Download("/a.bin", {"Range: bytes=3-6"}).body);
    EXPECT_EQ("409 lookup_failed/not_found/", Summary(Finish(session, 10, "/b.bin")));
}

TEST_F(DropboxUploadTest, ASessionTellsTheOffsetWhereItStands) {
    const std::string session = Start("0123");
    Append(session, 4, "456");
    // As after an answer that was lost.
    const Got again = Append(session, 4, "456");
    EXPECT_EQ("409 incorrect_offset/", Summary(again));
    EXPECT_EQ(7u, again.Json()["error"]["correct_offset"].asUInt64());
    EXPECT_EQ("409 incorrect_offset/", Summary(Append(session, 8, "x")));
    const Got end = Finish(session, 6, "/a");
    EXPECT_EQ("409 lookup_failed/incorrect_offset/", Summary(end));
    EXPECT_EQ(7u, end.Json()["error"]["lookup_failed"]["correct_offset"].asUInt64());
    EXPECT_EQ(200, Finish(session, 7, "/a").status);
}

TEST_F(DropboxUploadTest, APieceThatWasCutLeavesTheSessionWhereItWas) {
    const std::string session = Start("0123");
    dropbox.AddFault(
        cloudsim::Fault::On("POST", "/2/files/upload_session/append_v2").CutUpload(10));
    // On a connection that was used before, libcurl would try again by itself.
    cloudsim::Client other(amy.IssueTokens().access_token);
    Json::Value args;
    args["cursor"] = Cursor(session, 4);
    other.headers = {"Content-Type: application/octet-stream",
                     "Dropbox-API-Arg: " + cloudsim::OneLine(args)};
    const std::string bytes(90, 'x');
    const Got cut =
        other.Send("POST", dropbox.ContentHost() + "/2/files/upload_session/append_v2", &bytes);
    EXPECT_NE(CURLE_OK, cut.code);
    EXPECT_EQ(200, Append(session, 4, "456").status);
    EXPECT_EQ(200, Finish(session, 7, "/a").status);
    EXPECT_EQ("0123456", Bytes("/a"));
}

TEST_F(DropboxUploadTest, AClosedSessionTakesNoMoreBytesButMayBeFinished) {
    const std::string session = Start("0123");
    EXPECT_EQ(200, Append(session, 4, "456", true).status);
    EXPECT_EQ("409 closed/", Summary(Append(session, 7, "x")));
    EXPECT_EQ("409 lookup_failed/closed/", Summary(Finish(session, 7, "/a", "x")));
    EXPECT_EQ(200, Finish(session, 7, "/a").status);
    EXPECT_EQ("409 closed/", Summary(Append(Start("", true), 0, "x")));
}

TEST_F(DropboxUploadTest, KnowsNoSessionsThatWereNeverOpenedAreTooOldOrAreOfOthers) {
    const std::string session = Start("0123");
    EXPECT_EQ("409 not_found/", Summary(Append("nonsense", 0, "x")));
    client.UseToken(bob.IssueTokens().access_token);
    EXPECT_EQ("409 not_found/", Summary(Append(session, 4, "x")));
    client.UseToken(amy.IssueTokens(3600 * 24 * 30).access_token);
    dropbox.AdvanceClock(7 * 24 * 3600);
    EXPECT_EQ("409 not_found/", Summary(Append(session, 4, "x")));
    EXPECT_EQ("409 lookup_failed/not_found/", Summary(Finish(session, 4, "/a")));
}

TEST_F(DropboxUploadTest, AConflictAtTheEndKeepsTheSession) {
    amy.AddFile("root", "a", "old");
    const std::string session = Start("0123");
    EXPECT_EQ("409 path/conflict/file/", Summary(Finish(session, 4, "/a", "45")));
    EXPECT_EQ("409 path/malformed_path/", Summary(Finish(session, 4, "/")));
    amy.SetQuota(8);
    EXPECT_EQ("409 path/insufficient_space/", Summary(Finish(session, 4, "/b", "45")));
    EXPECT_EQ(200, Finish(session, 4, "/b").status);
    EXPECT_EQ("0123", Bytes("/b"));
}

TEST_F(DropboxUploadTest, TheOlderAppendHasItsCursorWithoutAWrapping) {
    const std::string session = Start("0123");
    EXPECT_EQ(200, Send("upload_session/append", Cursor(session, 4), "456").status);
    EXPECT_EQ("409 incorrect_offset/",
              Summary(Send("upload_session/append", Cursor(session, 4), "456")));
}

TEST_F(DropboxUploadTest, EveryPieceHasItsOwnLimitAndTheFileThatOfTheAccount) {
    const std::string session = Start(std::string(100, 'x'));
    EXPECT_EQ("409 payload_too_large/", Summary(Append(session, 100, std::string(101, 'x'))));
    EXPECT_EQ(200, Append(session, 100, std::string(100, 'x')).status);
    amy.SetMaxUpload(199);
    EXPECT_EQ("409 lookup_failed/too_large/", Summary(Finish(session, 200, "/a")));
}

TEST_F(DropboxUploadTest, BatchesOpenAndFinishSeveralSessionsAtOnce) {
    Json::Value count, batch;
    count["num_sessions"] = 2;
    const Json::Value ids = Call("files/upload_session/start_batch", count).Json()["session_ids"];
    Append(ids[0].asString(), 0, "first", true);
    Append(ids[1].asString(), 0, "second");
    batch["entries"].append(End(ids[0].asString(), 5, "/a"));
    batch["entries"].append(End(ids[1].asString(), 6, "/b"));
    const Json::Value done = Call("files/upload_session/finish_batch", batch).Json();
    EXPECT_EQ("complete", done[".tag"].asString());
    EXPECT_EQ("success", done["entries"][0][".tag"].asString());
    EXPECT_EQ("a", done["entries"][0]["name"].asString());
    EXPECT_EQ("not_closed", done["entries"][1]["failure"]["lookup_failed"][".tag"].asString());
    Append(ids[1].asString(), 6, "", true);
    const Json::Value rest = Call("files/upload_session/finish_batch_v2", batch).Json();
    EXPECT_EQ("failure", rest["entries"][0][".tag"].asString());
    EXPECT_EQ("second", Bytes("/b"));
}

}  // namespace
