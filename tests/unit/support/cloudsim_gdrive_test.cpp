/** The simulated Google Drive, asked by a plain HTTP client: what only reads, and tokens. */
#include "support/cloudsim_gdrive.h"

namespace {

using cloudsim::Fault;
using cloudsim::GDriveTest;
using cloudsim::Got;
using cloudsim::Reason;
using cloudsim::Titles;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::StartsWith;
using testing::UnorderedElementsAre;

TEST_F(GDriveTest, TellsTheTokensUserAndItsQuotaAsText) {
    amy.SetQuota(5000);
    amy.AddFile(root, "a", "12345");
    const Json::Value about = Get("/drive/v2/about").Json();
    EXPECT_EQ("drive#about", about["kind"].asString());
    EXPECT_EQ("amy@example.com", about["user"]["emailAddress"].asString());
    EXPECT_EQ("Amy Adams", about["user"]["displayName"].asString());
    EXPECT_TRUE(about["quotaBytesTotal"].isString());
    EXPECT_EQ("5000", about["quotaBytesTotal"].asString());
    EXPECT_EQ("5", about["quotaBytesUsed"].asString());
    EXPECT_EQ(root, about["rootFolderId"].asString());
}

TEST_F(GDriveTest, AnswersOnlyTheFieldsAskedFor) {
    EXPECT_THAT(Get("/drive/v2/about?fields=user").Json().getMemberNames(), ElementsAre("user"));
    const std::string file = amy.AddFile(root, "a.txt", "text");
    const Json::Value some =
        Get("/drive/v2/files/" + file + "?fields=id,labels(starred,trashed),parents/id").Json();
    EXPECT_THAT(some.getMemberNames(), UnorderedElementsAre("id", "labels", "parents"));
    EXPECT_THAT(some["labels"].getMemberNames(), UnorderedElementsAre("starred", "trashed"));
    EXPECT_THAT(some["parents"][0].getMemberNames(), ElementsAre("id"));
    EXPECT_EQ(root, some["parents"][0]["id"].asString());
    const Json::Value list = List("", "&fields=items(createdDate,id,title)");
    EXPECT_THAT(list.getMemberNames(), ElementsAre("items"));
    EXPECT_THAT(list["items"][0].getMemberNames(),
                UnorderedElementsAre("createdDate", "id", "title"));
    EXPECT_EQ("text/plain",
              Get("/drive/v2/files/" + file + "?fields=*").Json()["mimeType"].asString());
}

TEST_F(GDriveTest, RefusesFieldsThatNoResourceHas) {
    for (const std::string fields : {"name", "items(id)", "id,", "labels(starred", "labels(colour)",
                                     "id/x", "title)", "(id)"}) {
        const Got got = Get("/drive/v2/files/root?fields=" + fields);
        EXPECT_EQ(400, got.status) << fields;
        EXPECT_EQ("invalidParameter", Reason(got)) << fields;
    }
    EXPECT_EQ(400, Get("/drive/v2/files?fields=items(size)").status);
    EXPECT_EQ(200, Get("/drive/v2/files?fields=items(id,title,parents/id),nextPageToken").status);
}

TEST_F(GDriveTest, RefusesAMissingAndAnUnknownTokenWithTheDocumentedErrors) {
    client.UseToken("nonsense");
    const Got got = Get("/drive/v2/about");
    EXPECT_EQ(401, got.status);
    EXPECT_EQ("authError", Reason(got));
    EXPECT_EQ(401, got.Json()["error"]["code"].asInt());
    EXPECT_EQ("Invalid Credentials", got.Json()["error"]["message"].asString());
    EXPECT_EQ("Authorization", got.Json()["error"]["errors"][0]["location"].asString());
    client.UseToken("");
    EXPECT_EQ("required", Reason(Get("/drive/v2/about")));
}

TEST_F(GDriveTest, DescribesAFileWithSizesAsTextAndDatesWithMilliseconds) {
    const std::string file = amy.AddFile(root, "a.txt", "text");
    amy.SetTimes(file, 1357948800, 1357948801);
    const Json::Value got = Get("/drive/v2/files/" + file).Json();
    EXPECT_EQ("drive#file", got["kind"].asString());
    EXPECT_EQ("a.txt", got["title"].asString());
    EXPECT_TRUE(got["fileSize"].isString());
    EXPECT_EQ("4", got["fileSize"].asString());
    EXPECT_EQ("1cb251ec0d568de6a929b520c4aed8d1", got["md5Checksum"].asString());
    EXPECT_EQ("2013-01-12T00:00:00.000Z", got["createdDate"].asString());
    EXPECT_EQ("2013-01-12T00:00:01.000Z", got["modifiedDate"].asString());
    EXPECT_TRUE(got["parents"][0]["isRoot"].asBool());
    EXPECT_EQ("txt", got["fileExtension"].asString());
    EXPECT_FALSE(got.isMember("exportLinks"));
    EXPECT_FALSE(got["labels"]["trashed"].asBool());
}

TEST_F(GDriveTest, RootIsAnAliasOfTheTopmostFolder) {
    const Json::Value got = Get("/drive/v2/files/root").Json();
    EXPECT_EQ(root, got["id"].asString());
    EXPECT_EQ("application/vnd.google-apps.folder", got["mimeType"].asString());
    EXPECT_EQ(0u, got["parents"].size());
    EXPECT_FALSE(got.isMember("fileSize"));
    amy.AddFile(root, "a", "");
    EXPECT_THAT(Titles(List("'root' in parents")), ElementsAre("a"));
    EXPECT_THAT(Titles(List("'" + root + "' in parents")), ElementsAre("a"));
    EXPECT_NE(root, drive.AddAccount("ben@example.com").Root());
}

TEST_F(GDriveTest, AFolderHoldsSeveralItemsOfOneName) {
    const std::string first = amy.AddFile(root, "twin", "1"),
                      second = amy.AddFile(root, "twin", "2");
    EXPECT_NE(first, second);
    EXPECT_THAT(Titles(List("title = 'twin' and 'root' in parents")), ElementsAre("twin", "twin"));
    EXPECT_EQ(first, amy.Find("/twin"));
    EXPECT_EQ(200, Send("POST", "/drive/v2/files/" + first + "/trash").status);
    EXPECT_EQ(second, amy.Find("/twin"));
}

TEST_F(GDriveTest, PagesWithTokensUntilAPageHasNone) {
    amy.AddMany(root, 5, 1);
    const std::string path = "/drive/v2/files?maxResults=2&q=trashed%3Dfalse";
    Json::Value page = Get(path).Json();
    EXPECT_THAT(Titles(page), ElementsAre("item-000000.bin", "item-000001.bin"));
    EXPECT_THAT(page["nextLink"].asString(), HasSubstr("pageToken="));
    page = Get(path + "&pageToken=" + page["nextPageToken"].asString()).Json();
    page = Get(path + "&pageToken=" + page["nextPageToken"].asString()).Json();
    EXPECT_THAT(Titles(page), ElementsAre("item-000004.bin"));
    EXPECT_FALSE(page.isMember("nextPageToken"));
    EXPECT_EQ(400, Get(path + "&pageToken=made-up").status);
    EXPECT_EQ(400, Get("/drive/v2/files?maxResults=-1").status);
}

TEST_F(GDriveTest, ATokenBelongsToItsQueryAndToItsUser) {
    amy.AddMany(root, 3, 1);
    const std::string token =
        Get("/drive/v2/files?maxResults=1&q=trashed%3Dfalse").Json()["nextPageToken"].asString();
    EXPECT_EQ(400, Get("/drive/v2/files?q=starred%3Dtrue&pageToken=" + token).status);
    client.UseToken(drive.AddAccount("ben@example.com").IssueTokens().access_token);
    EXPECT_EQ(400, Get("/drive/v2/files?q=trashed%3Dfalse&pageToken=" + token).status);
}

TEST_F(GDriveTest, AHundredItemsMakeAPageUnlessToldOtherwise) {
    amy.AddMany(root, 101, 1);
    EXPECT_EQ(100u, List("")["items"].size());
    EXPECT_EQ(101u, List("", "&maxResults=1000")["items"].size());
    EXPECT_EQ(100u, List("", "&maxResults=0")["items"].size());
}

TEST_F(GDriveTest, NoPageHasMoreThanAThousandItems) {
    amy.AddMany(root, 1001, 1);
    const Json::Value page = List("", "&maxResults=5000&fields=items/id,nextPageToken");
    EXPECT_EQ(1000u, page["items"].size());
    EXPECT_TRUE(page.isMember("nextPageToken"));
}

TEST(GDrivePages, MayBeEmptyBeforeTheEnd) {
    cloudsim::GDriveOptions options;
    options.empty_pages = true;
    cloudsim::GDrive drive(options);
    cloudsim::Account& amy = drive.AddAccount("amy@example.com");
    amy.AddFile(amy.Root(), "a", "");
    cloudsim::Client client(amy.IssueTokens().access_token);
    const std::string url = drive.ApiHost() + "/drive/v2/files";
    const Json::Value first = client.Get(url).Json();
    EXPECT_EQ(0u, first["items"].size());
    const Json::Value next =
        client.Get(url + "?pageToken=" + first["nextPageToken"].asString()).Json();
    EXPECT_THAT(Titles(next), ElementsAre("a"));
    EXPECT_FALSE(next.isMember("nextPageToken"));
}

TEST_F(GDriveTest, AListingShowsEveryChangeAtOnceAndNobodyElsesItems) {
    EXPECT_THAT(Titles(List("")), IsEmpty());
    const std::string file = amy.AddFile(root, "a", "");
    EXPECT_THAT(Titles(List("")), ElementsAre("a"));
    Send("PUT", "/drive/v2/files/" + file, R"({"title":"b"})");
    EXPECT_THAT(Titles(List("")), ElementsAre("b"));
    client.UseToken(drive.AddAccount("ben@example.com").IssueTokens().access_token);
    EXPECT_THAT(Titles(List("")), IsEmpty());
    EXPECT_EQ("notFound", Reason(Get("/drive/v2/files/" + file)));
}

TEST_F(GDriveTest, DocumentsHaveExportLinksInsteadOfBytes) {
    const std::string id = drive.AddDocument(amy, root, "Plan", "document", "the plan");
    const Json::Value got = Get("/drive/v2/files/" + id).Json();
    EXPECT_FALSE(got.isMember("downloadUrl"));
    EXPECT_FALSE(got.isMember("fileSize"));
    EXPECT_FALSE(got.isMember("md5Checksum"));
    EXPECT_THAT(got["alternateLink"].asString(), HasSubstr("/document/d/" + id + "/edit"));
    client.headers = {"Range: bytes=1-2"};
    const Got pdf = client.Get(got["exportLinks"]["application/pdf"].asString());
    EXPECT_EQ(200, pdf.status);
    EXPECT_EQ("the plan", pdf.body);
    EXPECT_THAT(pdf.head, HasSubstr("Content-Type: application/pdf\r"));
    const Got odd = client.Get(drive.ContentHost() + "/feeds/download/documents/Export?id=" + id +
                               "&exportFormat=exe");
    EXPECT_EQ(400, odd.status);
    EXPECT_EQ(403, Get("/drive/v2/files/" + id + "?alt=media").status);
    EXPECT_EQ("the plan", Get("/drive/v2/files/" + id + "/export?mimeType=text/plain").body);
}

TEST_F(GDriveTest, DownloadsByAnAddressThatNeedsTheToken) {
    const std::string file = amy.AddFile(root, "a.txt", "0123456789");
    const std::string url = Get("/drive/v2/files/" + file).Json()["downloadUrl"].asString();
    EXPECT_THAT(url, StartsWith(drive.ContentHost()));
    EXPECT_EQ("0123456789", client.Get(url).body);
    client.headers = {"Range: bytes=3-5"};
    const Got part = client.Get(url);
    EXPECT_EQ(206, part.status);
    EXPECT_EQ("345", part.body);
    EXPECT_THAT(part.head, HasSubstr("Content-Range: bytes 3-5/10\r"));
    client.headers = {"Range: bytes=10-"};
    EXPECT_EQ(416, client.Get(url).status);
    client.headers.clear();
    client.UseToken("");
    EXPECT_EQ(401, client.Get(url).status);
}

TEST_F(GDriveTest, ADownloadAddressGoesStale) {
    const std::string file = amy.AddFile(root, "a.txt", "text");
    const auto address = [&] {
        return Get("/drive/v2/files/" + file + "?fields=downloadUrl")
            .Json()["downloadUrl"]
            .asString();
    };
    const std::string first = address();
    drive.ExpireDownloadUrls();
    EXPECT_EQ(403, client.Get(first).status);
    const std::string second = address();
    EXPECT_EQ("text", client.Get(second).body);
    client.UseToken(amy.IssueTokens(100000).access_token);
    drive.AdvanceClock(8 * 3600);
    EXPECT_EQ(403, client.Get(second).status);
    EXPECT_EQ("text", client.Get(address()).body);
}

TEST_F(GDriveTest, AddressesInListingsStayGoodForAsLongAsOneShownAlone) {
    amy.AddFile(root, "a.txt", "text");
    client.UseToken(amy.IssueTokens(100000).access_token);
    List("");
    drive.AdvanceClock(8 * 3600);
    EXPECT_EQ("text", client.Get(List("")["items"][0]["downloadUrl"].asString()).body);
    drive.ExpireDownloadUrls();
    EXPECT_EQ("text", client.Get(List("")["items"][0]["downloadUrl"].asString()).body);
}

TEST_F(GDriveTest, KeepsItsHostsApart) {
    EXPECT_EQ(404, client.Get(drive.ContentHost() + "/drive/v2/about").status);
    EXPECT_EQ(404, client.Get(drive.AccountsHost() + "/drive/v2/about").status);
    EXPECT_EQ(404, Get("/o/oauth2/token").status);
    EXPECT_EQ(200, client.Get(drive.Address("127.0.0.1") + "/drive/v2/about").status);
    EXPECT_EQ(404, Get("/drive/v2/nothing").status);
}

TEST_F(GDriveTest, FaultsCanWearTheServicesWords) {
    drive.AddFault(Fault::On("GET", "/drive/v2/about")
                       .Answer(403, cloudsim::GDrive::ErrorText(403, "userRateLimitExceeded")));
    const Got got = Get("/drive/v2/about");
    EXPECT_EQ(403, got.status);
    EXPECT_EQ("userRateLimitExceeded", Reason(got));
    EXPECT_EQ("usageLimits", got.Json()["error"]["errors"][0]["domain"].asString());
    drive.AddFault(Fault::On("GET", "/drive/v2/files").ExpireToken());
    EXPECT_EQ(401, Get("/drive/v2/files").status);
}

struct GDriveTokenTest : GDriveTest {
    Got Ask(const std::string& form) { return client.Send("POST", drive.TokenUrl(), form); }
    static std::string Form(const std::string& refresh, const std::string& secret = "secret") {
        return "grant_type=refresh_token&client_id=client&client_secret=" + secret +
               "&refresh_token=" + refresh;
    }
};

TEST_F(GDriveTokenTest, ARefreshTokenStaysGoodAndIsNotToldAgain) {
    const std::string refresh = amy.IssueTokens().refresh_token;
    const Got got = Ask(Form(refresh));
    EXPECT_EQ(200, got.status);
    EXPECT_EQ(3600, got.Json()["expires_in"].asInt());
    EXPECT_EQ("Bearer", got.Json()["token_type"].asString());
    EXPECT_FALSE(got.Json().isMember("refresh_token"));
    client.UseToken(got.Json()["access_token"].asString());
    EXPECT_EQ(200, Get("/drive/v2/about").status);
    EXPECT_EQ(200, Ask(Form(refresh)).status);
}

TEST_F(GDriveTokenTest, RotatesWhenToldTo) {
    drive.SetRotation(true);
    const std::string refresh = amy.IssueTokens().refresh_token;
    const std::string next = Ask(Form(refresh)).Json()["refresh_token"].asString();
    EXPECT_EQ("invalid_grant", Ask(Form(refresh)).Json()["error"].asString());
    EXPECT_EQ(200, Ask(Form(next)).status);
}

TEST_F(GDriveTokenTest, RefusesWhatIsRevokedUnknownOrIncomplete) {
    const std::string refresh = amy.IssueTokens().refresh_token;
    const Got client_error = Ask(Form(refresh, "wrong"));
    EXPECT_EQ(401, client_error.status);
    EXPECT_EQ("invalid_client", client_error.Json()["error"].asString());
    EXPECT_EQ("unsupported_grant_type", Ask("grant_type=password").Json()["error"].asString());
    EXPECT_EQ("invalid_request", Ask("grant_type=refresh_token").Json()["error"].asString());
    amy.RevokeRefreshTokens();
    const Got revoked = Ask(Form(refresh));
    EXPECT_EQ(400, revoked.status);
    EXPECT_EQ("invalid_grant", revoked.Json()["error"].asString());
    EXPECT_EQ(405, client.Get(drive.TokenUrl()).status);
    EXPECT_EQ(400, client.Send("POST", drive.ApiHost() + "/oauth2/v3/token", Form("x")).status);
}

}  // namespace
