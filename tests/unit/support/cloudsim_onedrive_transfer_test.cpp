/** The simulated OneDrive's contents: up by PUT, down by redirect, and the tokens for all that. */
#include <filesystem>

#include "support/cloudsim_onedrive.h"
#include "support/scratch.h"

namespace {

using cloudsim::ErrorOf;
using cloudsim::Fault;
using cloudsim::Got;
using cloudsim::HeaderOf;
using testing::HasSubstr;
using testing::SizeIs;

struct OneDriveTransfer : cloudsim::OneDriveFixture {
    using OneDriveFixture::OneDriveFixture;
    Got Put(const std::string& path, const std::string& bytes) { return Send("PUT", path, bytes); }
};

TEST_F(OneDriveTransfer, APutMakesAFileOrItsNextVersion) {
    const std::string folder = amy.AddFolder(amy.Root(), "docs");
    std::string bytes(3000000, 'x');
    bytes[7] = '\0';
    const Got made = Put(folder + "/files/a%20b.bin?pretty=false", bytes);
    EXPECT_EQ(201, made.status);
    const std::string id = amy.Find("/docs/a b.bin");
    EXPECT_EQ(id, made.Json()["id"].asString());
    EXPECT_EQ("a b.bin", made.Json()["name"].asString());
    EXPECT_TRUE(made.Json().isMember("source"));
    EXPECT_EQ(bytes, amy.Bytes(id));
    EXPECT_EQ(200, Put(folder + "/files/A%20b.bin?overwrite=true", "new").status);
    EXPECT_EQ("new", amy.Bytes(id));
    EXPECT_EQ(200, Put(id + "/content", "newer").status);
    EXPECT_EQ("newer", amy.Bytes(id));
    EXPECT_THAT(amy.List(folder), SizeIs(1));
}

TEST_F(OneDriveTransfer, OverwritingIsWhatHappensUnlessForbidden) {
    const std::string id = amy.AddFile(amy.Root(), "a.txt", "old");
    EXPECT_EQ("resource_already_exists",
              ErrorOf(Put("me/skydrive/files/a.txt?overwrite=false", "new")));
    EXPECT_EQ("old", amy.Bytes(id));
    const Got other =
        Put("me/skydrive/files/a.txt?overwrite=ChooseNewName&downsize_photo_uploads=false", "new");
    EXPECT_EQ(201, other.status);
    EXPECT_EQ("a 1.txt", other.Json()["name"].asString());
    EXPECT_EQ("new", amy.Bytes(amy.Find("/a 1.txt")));
    EXPECT_EQ(200, Put("me/skydrive/files/a.txt", "newest").status);
    EXPECT_EQ("newest", amy.Bytes(id));
    client.headers = {"Overwrite: false"};
    EXPECT_EQ("resource_already_exists", ErrorOf(Put("me/skydrive/files/a.txt", "x")));
}

TEST_F(OneDriveTransfer, APutMeetsFoldersMissingPlacesAndTheQuota) {
    const std::string file = amy.AddFile(amy.Root(), "a", "");
    amy.AddFolder(amy.Root(), "docs");
    EXPECT_EQ("resource_already_exists", ErrorOf(Put("me/skydrive/files/docs", "x")));
    EXPECT_EQ("resource_not_found", ErrorOf(Put("folder.none/files/b", "x")));
    EXPECT_EQ("request_url_invalid", ErrorOf(Put(file + "/files/b", "x")));
    EXPECT_EQ("request_url_invalid", ErrorOf(Put(amy.Root() + "/content", "x")));
    EXPECT_EQ("resource_name_invalid", ErrorOf(Put("me/skydrive/files/b%3f", "x")));
    amy.SetQuota(10);
    EXPECT_EQ(200, Put(file + "/content", "0123456789").status);
    EXPECT_EQ(200, Put(file + "/content", "9876543210").status);
    const Got full = Put("me/skydrive/files/b", "x");
    EXPECT_EQ(507, full.status);
    EXPECT_EQ("resource_quota_exceeded", ErrorOf(full));
}

TEST_F(OneDriveTransfer, AnInterruptedPutLeavesNothing) {
    drive.AddFault(cloudsim::Fault::On("PUT", "/v5.0/me/skydrive/files/a").CutUpload(1000));
    EXPECT_NE(CURLE_OK, Put("me/skydrive/files/a", std::string(100000, 'x')).code);
    EXPECT_FALSE(amy.Exists("/a"));
}

TEST_F(OneDriveTransfer, ContentComesFromAnotherHostThatNeedsNoToken) {
    const std::string id = amy.AddFile(amy.Root(), "a \"b\"?.txt", "0123456789");
    const Got got = Get(id + "/content?pretty=false");
    EXPECT_EQ(302, got.status);
    const std::string url = HeaderOf(got, "Location");
    EXPECT_THAT(url, testing::StartsWith(drive.ContentHost()));
    client.UseToken("");
    EXPECT_EQ("0123456789", client.Get(url).body);
    client.headers = {"Range: bytes=3-5"};
    const Got part = client.Get(url);
    EXPECT_EQ(206, part.status);
    EXPECT_EQ("345", part.body);
    EXPECT_EQ("bytes 3-5/10", HeaderOf(part, "Content-Range"));
    client.headers = {"Range: bytes=10-"};
    EXPECT_EQ(416, client.Get(url).status);
    amy.Remove(id);
    EXPECT_EQ(404, client.Get(url).status);
}

TEST_F(OneDriveTransfer, ARequestWithoutBodyTellsTheSize) {
    const std::string id = amy.AddPattern(amy.Root(), "big", 5000000000);
    client.follow = true;
    const Got plain = client.Head(Api(id + "/content"));
    EXPECT_EQ(200, plain.status);
    EXPECT_EQ("", plain.body);
    EXPECT_EQ("5000000000", HeaderOf(plain, "Content-Length"));
}

TEST_F(OneDriveTransfer, TheLocationOfAContentCanBeAskedFor) {
    const std::string id = amy.AddFile(amy.Root(), "a", "text");
    const Got got = Get(id + "/content?download=true&suppress_redirects=true");
    EXPECT_EQ(200, got.status);
    EXPECT_EQ("text", client.Get(got.Json()["location"].asString()).body);
    EXPECT_EQ("request_url_invalid", ErrorOf(Get(amy.Root() + "/content")));
}

struct MildOneDriveTransfer : OneDriveTransfer {
    static cloudsim::OneDriveOptions Options() {
        cloudsim::OneDriveOptions options;
        options.redirects = false;
        options.put_limit = 10;
        return options;
    }
    MildOneDriveTransfer() : OneDriveTransfer(Options()) {}
};

TEST_F(MildOneDriveTransfer, ContentsComeAtOnceWithoutARedirect) {
    const std::string id = amy.AddFile(amy.Root(), "a", "0123456789");
    EXPECT_EQ("0123456789", Get(id + "/content").body);
    client.headers = {"Range: bytes=2-4"};
    EXPECT_EQ("234", Get(id + "/content").body);
    client.headers.clear();
    EXPECT_EQ("10", HeaderOf(client.Head(Api(id + "/content")), "Content-Length"));
}

TEST_F(MildOneDriveTransfer, APutOfTooMuchIsRefused) {
    EXPECT_EQ(201, Put("me/skydrive/files/a", "0123456789").status);
    const Got got = Put("me/skydrive/files/b", "0123456789x");
    EXPECT_EQ(413, got.status);
    EXPECT_EQ("request_entity_too_large", ErrorOf(got));
    EXPECT_FALSE(amy.Exists("/b"));
}

TEST_F(OneDriveTransfer, FaultsReachOneHostAlone) {
    const std::string id = amy.AddFile(amy.Root(), "a", "0123456789");
    client.follow = true;
    drive.AddFault(Fault::On("GET", "/").AtHost("content").Answer(503, "", {{"Retry-After", "7"}}));
    const Got got = Get(id + "/content");
    EXPECT_EQ(503, got.status);
    EXPECT_EQ("7", HeaderOf(got, "Retry-After"));
    client.fresh = true;
    drive.AddFault(Fault::On("GET", "/").AtHost("content").CutAnswer(4));
    EXPECT_EQ("0123", Get(id + "/content").body);
    EXPECT_EQ("0123456789", Get(id + "/content").body);
}

TEST_F(OneDriveTransfer, ThrottlingCanBeDeclaredForAnyRequest) {
    for (const int status : {420, 429, 503}) {
        drive.AddFault(Fault::On("PUT", "/v5.0/").Answer(status, "", {{"Retry-After", "3"}}));
        const Got got = Put("me/skydrive/files/a", "x");
        EXPECT_EQ(status, got.status);
        EXPECT_EQ("3", HeaderOf(got, "Retry-After"));
        EXPECT_FALSE(amy.Exists("/a"));
    }
}

TEST_F(OneDriveTransfer, ATokenCanExpireAtAnyRequest) {
    drive.AddFault(Fault::On("PUT", "/v5.0/").ExpireToken());
    EXPECT_EQ("request_token_expired", ErrorOf(Put("me/skydrive/files/a", "x")));
    EXPECT_EQ(401, Get("me").status);
    client.UseToken(amy.IssueTokens().access_token);
    EXPECT_EQ(200, Get("me").status);
}

struct ServedOneDrive : scratch::ScratchTest {};

TEST_F(ServedOneDrive, KeepsOnDiskWhatClientsChange) {
    cloudsim::OneDriveOptions options;
    options.storage = {cloudsim::Storage::Kind::kFolder, Path("")};
    cloudsim::OneDrive drive(options);
    cloudsim::Account& amy = drive.AddAccount("amy@example.com");
    std::filesystem::create_directory(Path("served"));
    scratch::PutText(Path("served/a.txt"), "hello");
    amy.Serve(Path("served"));
    cloudsim::Client client(amy.IssueTokens().access_token);
    const std::string api = drive.ApiHost() + "/v5.0/";
    EXPECT_EQ("hello", amy.Bytes(amy.Find("/a.txt")));
    client.Send("PUT", api + "me/skydrive/files/b.txt", "fresh");
    EXPECT_EQ("fresh", scratch::Text(Path("served/b.txt")));
    client.Send("PUT", api + amy.Find("/b.txt"), R"({"name":"c.txt"})");
    client.Send("DELETE", api + amy.Find("/a.txt"));
    EXPECT_EQ("fresh", scratch::Text(Path("served/c.txt")));
    EXPECT_FALSE(std::filesystem::exists(Path("served/a.txt")));
}

struct OneDriveTokenTest : cloudsim::OneDriveFixture {
    Got Ask(const std::string& form) {
        return client.Send("POST", drive.TokenUrl() + "?pretty=false", form);
    }
    static std::string Form(const std::string& refresh, const std::string& secret = "secret") {
        return "grant_type=refresh_token&client_id=client&client_secret=" + secret +
               "&refresh_token=" + refresh;
    }
};

TEST_F(OneDriveTokenTest, ARefreshTokenIsGoodOnce) {
    const cloudsim::Tokens old = amy.IssueTokens();
    drive.SetTokenLife(77);
    const Json::Value tokens = Ask(Form(old.refresh_token)).Json();
    EXPECT_EQ(77, tokens["expires_in"].asInt());
    EXPECT_EQ("bearer", tokens["token_type"].asString());
    EXPECT_EQ(amy.Id(), tokens["user_id"].asString());
    EXPECT_THAT(tokens["scope"].asString(), HasSubstr("wl.skydrive_update"));
    EXPECT_EQ(amy.LastTokens().refresh_token, tokens["refresh_token"].asString());
    client.UseToken(tokens["access_token"].asString());
    EXPECT_EQ(200, Get("me").status);
    const Got again = Ask(Form(old.refresh_token));
    EXPECT_EQ(400, again.status);
    EXPECT_EQ("invalid_grant", again.Json()["error"].asString());
    EXPECT_EQ(200, Ask(Form(amy.LastTokens().refresh_token)).status);
}

TEST_F(OneDriveTokenTest, ARefusedClientDoesNotUseTheTokenUp) {
    const cloudsim::Tokens old = amy.IssueTokens();
    EXPECT_EQ("invalid_client", Ask(Form(old.refresh_token, "no")).Json()["error"].asString());
    EXPECT_EQ("unsupported_grant_type", Ask("grant_type=password").Json()["error"].asString());
    EXPECT_EQ("invalid_request", Ask("grant_type=refresh_token").Json()["error"].asString());
    EXPECT_EQ(200, Ask(Form(old.refresh_token)).status);
}

TEST_F(OneDriveTokenTest, RevokedRefreshTokensAreRefused) {
    const cloudsim::Tokens old = amy.IssueTokens();
    amy.RevokeRefreshTokens();
    EXPECT_EQ("invalid_grant", Ask(Form(old.refresh_token)).Json()["error"].asString());
}

}  // namespace
