/** Uploads to the simulated Google Drive. */
#include "support/cloudsim_gdrive.h"

namespace {

using cloudsim::GDriveTest;
using cloudsim::Got;
using cloudsim::Reason;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;

constexpr const char* kUpload = "/upload/drive/v2/files";

std::string Pattern(size_t size) {
    return cloudsim::MakePattern(size, 5)->Bytes();
}

TEST_F(GDriveTest, TakesBytesAlone) {
    client.headers = {"Content-Type: image/png"};
    const Got got = Send("POST", std::string(kUpload) + "?uploadType=media", "bytes");
    EXPECT_EQ(200, got.status) << got.body;
    EXPECT_EQ("Untitled", got.Json()["title"].asString());
    EXPECT_EQ("image/png", got.Json()["mimeType"].asString());
    const std::string id = got.Json()["id"].asString();
    EXPECT_EQ("bytes", amy.Bytes(id));
    EXPECT_EQ(200,
              Send("PUT", std::string(kUpload) + "/" + id + "?uploadType=media", "new").status);
    EXPECT_EQ("new", amy.Bytes(id));
}

TEST_F(GDriveTest, TakesMetadataAndBytesAsRelatedParts) {
    std::string bytes = Pattern(700000);
    bytes[3] = '\0';
    client.headers = {"Content-Type: multipart/related; boundary=\"foo bar\""};
    const std::string body =
        "--foo bar\r\nContent-Type: application/json; charset=UTF-8\r\n\r\n"
        R"({"title":"a.bin","modifiedDate":"2012-01-02T03:04:05.678Z"})"
        "\r\n--foo bar\r\nContent-Type: image/gif\r\n\r\n" +
        bytes + "\r\n--foo bar--";
    const Got got =
        Send("POST", std::string(kUpload) + "?uploadType=multipart&fields=id,mimeType", body);
    EXPECT_EQ(200, got.status) << got.body;
    EXPECT_EQ("image/gif", got.Json()["mimeType"].asString());
    EXPECT_FALSE(got.Json().isMember("title"));
    const std::string id = got.Json()["id"].asString();
    EXPECT_EQ(bytes, amy.Bytes(id));
    EXPECT_EQ(id, amy.Find("/a.bin"));
    EXPECT_EQ(678, drive.Facts(amy, id).modified.millis);
}

TEST_F(GDriveTest, TakesAFormAsWellAndReadsItsPartsByTheirOrder) {
    const std::string folder = amy.AddFolder(root, "to");
    const std::string url = drive.ApiHost() + kUpload + "?uploadType=multipart";
    const Got got =
        client.Upload(url, {{"Metadata", R"({"title":"a","parents":[{"id":")" + folder + "\"}]}"},
                            {"@file", "bytes"}});
    EXPECT_EQ(200, got.status) << got.body;
    EXPECT_EQ("bytes", amy.Bytes(amy.Find("/to/a")));
    EXPECT_EQ("parseError", Reason(client.Upload(url, {{"@file", "bytes"}, {"Metadata", "{}"}})));
    EXPECT_EQ(400, client.Upload(url, {{"Metadata", "{}"}}).status);
    EXPECT_EQ(400, client.Upload(url, {{"Metadata", "{}"}, {"@file", "x"}, {"@more", "y"}}).status);
}

TEST_F(GDriveTest, RefusesBodiesThatAreCutOrHaveNoBoundary) {
    const std::string url = std::string(kUpload) + "?uploadType=multipart";
    client.headers = {"Content-Type: multipart/related; boundary=b"};
    EXPECT_EQ(400, Send("POST", url, "--b\r\n\r\n{}\r\n--b\r\n\r\nbytes").status);
    client.headers = {"Content-Type: multipart/related"};
    EXPECT_EQ(400, Send("POST", url, "--b\r\n\r\n{}\r\n--b\r\n\r\nbytes\r\n--b--").status);
    EXPECT_EQ(400, Send("POST", kUpload, "bytes").status);
    EXPECT_EQ(400, Send("POST", std::string(kUpload) + "?uploadType=other", "bytes").status);
    EXPECT_THAT(amy.List(root), IsEmpty());
}

TEST_F(GDriveTest, AnUploadPutsASecondFileOfTheSameNameBesideTheFirst) {
    const std::string url = drive.ApiHost() + kUpload + "?uploadType=multipart";
    for (const char* bytes : {"1", "2"}) {
        EXPECT_EQ(200,
                  client.Upload(url, {{"Metadata", R"({"title":"a"})"}, {"@file", bytes}}).status);
    }
    EXPECT_EQ(2u, amy.List(root).size());
}

TEST_F(GDriveTest, ANewContentKeepsNameAndFolderAndTakesADateOnlyWhenAsked) {
    const std::string folder = amy.AddFolder(root, "docs");
    const std::string file = amy.AddFile(folder, "a.txt", "old");
    const auto put = [&](const std::string& more) {
        client.headers = {"Content-Type: multipart/related; boundary=b"};
        return Send("PUT", std::string(kUpload) + "/" + file + "?uploadType=multipart" + more,
                    "--b\r\n\r\n{\"modifiedDate\":\"2012-01-02T03:04:05.678Z\"}\r\n"
                    "--b\r\n\r\nnew\r\n--b--");
    };
    EXPECT_THAT(put("").Json()["modifiedDate"].asString(), Not(HasSubstr("2012")));
    EXPECT_EQ("2012-01-02T03:04:05.678Z",
              put("&setModifiedDate=true").Json()["modifiedDate"].asString());
    EXPECT_EQ("new", amy.Bytes(amy.Find("/docs/a.txt")));
    EXPECT_EQ("text/plain", drive.Facts(amy, file).mime_type);
}

TEST_F(GDriveTest, RefusesUploadsBeyondTheQuota) {
    amy.SetQuota(10);
    const std::string url = std::string(kUpload) + "?uploadType=media";
    EXPECT_EQ(200, Send("POST", url, "0123456789").status);
    const Got full = Send("POST", url, "x");
    EXPECT_EQ(403, full.status);
    EXPECT_EQ("storageQuotaExceeded", Reason(full));
    client.headers = {"X-Upload-Content-Length: 1"};
    EXPECT_EQ(403, Send("POST", std::string(kUpload) + "?uploadType=resumable", "{}").status);
    amy.SetMaxUpload(5);
    EXPECT_EQ(413, Send("POST", url, "123456").status);
    EXPECT_EQ(1u, amy.List(root).size());
}

TEST(GDriveQuota, CanBeRefusedInTheWordsOfOlderDays) {
    cloudsim::GDriveOptions options;
    options.quota_reason = "quotaExceeded";
    cloudsim::GDrive drive(options);
    cloudsim::Account& amy = drive.AddAccount("amy@example.com");
    amy.SetQuota(0);
    cloudsim::Client client(amy.IssueTokens().access_token);
    EXPECT_EQ("quotaExceeded",
              Reason(client.Send("POST", drive.ApiHost() + kUpload + "?uploadType=media", "x")));
}

TEST_F(GDriveTest, RefusesAnUploadIntoWhatIsGone) {
    client.headers = {"Content-Type: application/json"};
    EXPECT_EQ(404, Send("PUT", std::string(kUpload) + "/gone?uploadType=media", "x").status);
    EXPECT_EQ(404, Send("PUT", std::string(kUpload) + "/gone?uploadType=resumable", "{}").status);
    EXPECT_EQ(404, Send("POST", std::string(kUpload) + "?uploadType=resumable",
                        R"({"parents":[{"id":"gone"}]})")
                       .status);
    EXPECT_EQ(0u, drive.UploadSessions());
}

}  // namespace
