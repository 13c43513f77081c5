#include "cloud/onedrive/onedrive.h"

#include "unit/cloud/onedrive/onedrive_fixture.h"

namespace ZYROCloud {
namespace {

class OneDriveAccount : public OneDriveTest {};

TEST_F(OneDriveAccount, IsAskedWithTheQueryOfTheCaller) {
    Give({Answer(200, R"({"id":"a1b2","name":"Amy"})"), Answer(200, "{}")});
    Json::Value out;
    EXPECT_TRUE(drive->GetAccountInfo(Json::Value(), out)) << seams::LogDump();
    EXPECT_EQ(out["name"], "Amy");
    EXPECT_TRUE(drive->GetAccountInfo(Object(R"({"fields":"id"})"), out));
    EXPECT_THAT(Requests(),
                ElementsAre("GET /v5.0/me?pretty=false", "GET /v5.0/me?fields=id&pretty=false"));
    EXPECT_THAT(Headers("Authorization"), testing::Each(testing::Eq("Bearer token-canary")));
}

TEST_F(OneDriveAccount, IsWrittenIntoBothProfiles) {
    Give({Answer(200, R"({"id":"a1b2","name":"Amy"})")});
    EXPECT_TRUE(drive->UpdateAccountInfo()) << seams::LogDump();
    EXPECT_THAT(Requests(), ElementsAre("GET /v5.0/me?pretty=false"));
    for (const auto mode : {profiles::VFS_CONFIG_CONNECT, profiles::VFS_CONFIG_SERVER}) {
        const Json::Value profile = profiles::Stored(mode)[kServerId];
        EXPECT_EQ(Object(profile["account_info"].asString())["name"], "Amy");
    }
}

TEST_F(OneDriveAccount, ThatCannotBeWrittenIsAnErrorOfItsOwn) {
    profiles::Put(profiles::VFS_CONFIG_CONNECT, Json::Value(Json::objectValue));
    Give({Answer(200, R"({"id":"a1b2"})")});
    EXPECT_FALSE(drive->UpdateAccountInfo());
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_PROFILE_UPDATE);
    EXPECT_TRUE(seams::Logged("Failed to update connection config")) << seams::LogDump();
    EXPECT_TRUE(seams::LoggedPart("onedrive.cpp:"));
}

TEST_F(OneDriveAccount, ThatIsRefusedHasTheServicesCode) {
    Give({Refusal(403, "request_token_unauthorized")});
    Json::Value out;
    EXPECT_FALSE(drive->GetAccountInfo(Json::Value(), out));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_FORBIDDEN);
    EXPECT_TRUE(seams::LoggedPart("Failed to process curl " + Api("/me") + ", err:{"))
        << seams::LogDump();
}

class OneDriveToken : public OneDriveTest {};

TEST_F(OneDriveToken, IsAskedForInTheNameOfTheOneClientWhateverTheProfileSays) {
    Renew("{}", "500");
    Serve({Answering({TokenAnswer()}), Answering({Answer(200, "{}")})});
    Json::Value out;
    EXPECT_TRUE(drive->GetFileInfo("x", Json::Value(), out)) << seams::LogDump();
    EXPECT_THAT(Requests(),
                ElementsAre("POST /oauth20_token.srf?pretty=false", "GET /v5.0/x?pretty=false"));
    EXPECT_EQ(BodyOf(Request(0)),
              "client_id=fixed&client_secret=secret-of-this&grant_type=refresh_token&"
              "refresh_token=grant-canary");
    EXPECT_EQ(HeaderOf(Request(1), "Authorization"), "Bearer fresh-canary");
    EXPECT_EQ(drive->ClientId(), "fixed");
}

TEST_F(OneDriveToken, ThatTheServiceRefusesIsRenewedAndTheRequestRepeated) {
    Serve({Answering({Refusal(401, "request_token_expired"), Answer(200, R"({"id":"r"})")}),
           Answering({TokenAnswer()})});
    EXPECT_EQ(drive->GetRootFileID(), "r") << seams::LogDump();
    EXPECT_EQ(server->Received().size(), 3U);
}

TEST_F(OneDriveToken, ThatCannotBeRenewedFailsBeforeTheRequest) {
    Renew("{}", "500");
    Serve({Answering({Answer(400, R"({"error":"invalid_grant"})")})});
    Json::Value out;
    EXPECT_FALSE(drive->ListFolder("x", Json::Value(), out));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_UNAUTHORIZED);
    EXPECT_THAT(Requests(), ElementsAre("POST /oauth20_token.srf?pretty=false"));
}

TEST_F(OneDriveToken, NeedsAClientThatIsKnownAndASecretThatCanBeRead) {
    APIHandler api;
    EXPECT_FALSE(drive->SetRefreshTokenParam(nullptr));
    Json::Value document;
    ASSERT_TRUE(json::fromFile(document, paths::kServiceConfig));
    document["clients"]["onedrive"]["fixed"] = "no cipher";
    ASSERT_TRUE(json::toFile(document, paths::kServiceConfig, 0640));
    EXPECT_FALSE(drive->SetRefreshTokenParam(&api));
    EXPECT_TRUE(seams::Logged("Failed to decrypt secret key")) << seams::LogDump();
    ASSERT_TRUE(Utils::RemoveClient("onedrive", "fixed"));
    EXPECT_FALSE(drive->SetRefreshTokenParam(&api));
    EXPECT_TRUE(seams::Logged("Failed to find the secret by ")) << seams::LogDump();
}

class OneDriveItems : public OneDriveTest {};

TEST_F(OneDriveItems, AreDescribedByIdAndTheRootWithoutOne) {
    Give({Answer(200, R"({"id":"file.1"})"), Answer(200, R"({"id":"folder.r"})")});
    Json::Value out;
    const Json::Value params = Object(R"({"fields":"id"})");
    EXPECT_TRUE(drive->GetFileInfo("file.1", params, out)) << seams::LogDump();
    EXPECT_EQ(out["id"], "file.1");
    EXPECT_TRUE(drive->GetFileInfo("", params, out));
    EXPECT_THAT(Requests(),
                ElementsAre("GET /v5.0/file.1?pretty=false", "GET /v5.0/me/skydrive?pretty=false"));
}

TEST_F(OneDriveItems, AreListedWithOneRequestAndNoneIsHidden) {
    const std::string items = R"({"id":"1","name":"a"},{"id":"2","name":"@eaDir"},7,null)";
    Give({Listing(items), Listing("")});
    Json::Value out;
    EXPECT_TRUE(drive->ListFolder("folder.1", Object(R"({"limit":1})"), out)) << seams::LogDump();
    EXPECT_EQ(out.size(), 4U);
    EXPECT_TRUE(drive->ListFolder("", Json::Value(), out));
    EXPECT_TRUE(out.isArray());
    EXPECT_EQ(out.size(), 0U);
    EXPECT_THAT(Requests(), ElementsAre("GET /v5.0/folder.1/files?pretty=false",
                                        "GET /v5.0/me/skydrive/files?pretty=false"));
}

TEST_F(OneDriveItems, AListingAnswerWithoutDataIsAnErrorAndNoEmptyFolder) {
    for (const char* answer : {"{}", R"({"items":[]})", "[]", "null", "7", R"({"data":null})",
                               R"({"data":{"id":"1"}})", R"({"data":"[]"})"}) {
        seams::Reset();
        Give({Answer(200, answer), Answer(200, answer)});
        Json::Value out("before");
        drive->SetError(VFS_ERR_NONE, "");
        EXPECT_FALSE(drive->ListFolder("x", Json::Value(), out)) << answer;
        EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CLOUD_FAILED) << answer;
        EXPECT_TRUE(seams::LoggedPart("Response has no data member, ")) << seams::LogDump();
        EXPECT_EQ(out, "before");
        EXPECT_FALSE(drive->SearchFile("x", out)) << answer;
    }
}

TEST_F(OneDriveItems, AnAnswerThatIsNoJsonIsAnError) {
    for (const char* answer : {"", "<html>", "{\"data\":[", "{\"data\":[]} x"}) {
        seams::Reset();
        Give({Answer(200, answer)});
        Json::Value out;
        EXPECT_FALSE(drive->ListFolder("x", Json::Value(), out)) << answer;
        EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CLOUD_FAILED) << answer;
        EXPECT_TRUE(
            seams::Logged(std::string("Failed to parse response to json format, ") + answer))
            << seams::LogDump();
    }
}

TEST_F(OneDriveItems, AreRepeatedWhileTheServiceIsBusy) {
    Give({Answer(503), Refusal(420, "request_throttled", "Wait 10 seconds"),
          Refusal(420, "request_throttled", "Wait 0 seconds"), Refusal(420, "other"), Listing("")});
    Json::Value out;
    EXPECT_TRUE(drive->ListFolder("x", Json::Value(), out)) << seams::LogDump();
    EXPECT_THAT(seams::Sleeps(), ElementsAre(5, 40, 0, 5));
}

TEST_F(OneDriveItems, AreAskedForSevenTimesAtMost) {
    Give(std::vector<std::string>(7, Answer(500)));
    Json::Value out;
    EXPECT_FALSE(drive->ListFolder("x", Json::Value(), out));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_SERVER_ERROR);
    EXPECT_THAT(Requests(), SizeIs(7));
}

TEST_F(OneDriveItems, AreSearchedForByName) {
    Give({Listing(R"({"id":"1","name":"a b"})")});
    Json::Value out;
    EXPECT_TRUE(drive->SearchFile("a b&c", out)) << seams::LogDump();
    EXPECT_EQ(out[0]["id"], "1");
    EXPECT_THAT(Requests(), ElementsAre("GET /v5.0/me/skydrive/search?pretty=false&q=a%20b%26c"));
}

TEST_F(OneDriveItems, OfTypeAlbumAreDirectories) {
    EXPECT_TRUE(drive->IsDir(Object(R"({"type":"album"})")));
    EXPECT_TRUE(drive->IsDir(Object(R"({"type":"folder"})")));
    for (const char* item : {R"({"type":"notebook"})", R"({"type":"photo"})", R"({"type":"Album"})",
                             R"({"type":7})", R"({"type":{}})", "{}", "[]", "null", "\"album\""}) {
        EXPECT_FALSE(drive->IsDir(Object(item))) << item;
    }
}

TEST_F(OneDriveItems, HaveAnIdThatMayBeANumberOrMissing) {
    EXPECT_EQ(drive->GetFileID(Object(R"({"id":"file.1!2"})")), "file.1!2");
    EXPECT_EQ(drive->GetFileID(Object(R"({"id":17})")), "17");
    for (const char* item : {"{}", "[1]", "7", R"({"id":null})", R"({"id":["1"]})"}) {
        EXPECT_EQ(drive->GetFileID(Object(item)), "") << item;
    }
}

TEST_F(OneDriveItems, ARootWithoutAnIdOrNoAnswerHasNone) {
    Give({Answer(200, "{}"), Answer(200, "[]"), Answer(404)});
    for (int i = 0; i < 3; ++i) {
        EXPECT_EQ(drive->GetRootFileID(), "");
    }
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_NOT_FOUND);
}

TEST_F(OneDriveItems, MayBeUpToTenGiBLargeOrOfAnUnknownSize) {
    EXPECT_TRUE(drive->CanFileUpload(0));
    EXPECT_TRUE(drive->CanFileUpload(10737418240ULL));
    EXPECT_TRUE(drive->CanFileUpload(~0ULL));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_NONE);
    for (const unsigned long long size : {10737418241ULL, ~0ULL - 1}) {
        YLIBCErrSetEx(0, "test", 1);
        EXPECT_FALSE(drive->CanFileUpload(size));
        EXPECT_EQ(YLIBCErrGet(), 0xa400U);
        EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_FILE_TOO_LARGE);
        EXPECT_EQ(drive->GetError()["msg"], "");
    }
}

TEST_F(OneDriveItems, SetModifiedDateSucceedsAndChangesNothing) {
    Give({});
    EXPECT_TRUE(drive->SetModifiedDate("file.1", "2001-01-01T00:00:00Z"));
    EXPECT_THAT(Requests(), IsEmpty());
}

TEST_F(OneDriveItems, ADriverKnowsWhatItIs) {
    EXPECT_EQ(drive->GetCloudType(), CLOUD_TYPE_ONEDRIVE);
    EXPECT_FALSE(drive->SetAPIErrorHandler(nullptr));
    OneDrive empty;
    EXPECT_TRUE(empty.Init());
    EXPECT_EQ(empty.GetServerID(), "");
}

}  // namespace
}  // namespace ZYROCloud
