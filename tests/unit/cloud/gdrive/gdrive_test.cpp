#include "unit/cloud/gdrive/gdrive_fixture.h"

namespace ZYROCloud {
namespace {

using GDriveAccount = GDriveTest;
using GDriveItem = GDriveTest;
using GDriveToken = GDriveTest;

constexpr const char* kFiles = "/drive/v2/files";

TEST_F(GDriveAccount, IsAskedWithTheCallersQuery) {
    Json::Value out;
    EXPECT_TRUE(drive->GetAccountInfo(Json::Value(), out)) << seams::LogDump();
    EXPECT_EQ(out["user"]["displayName"], "Amy Doe");
    EXPECT_EQ(Last().target, "/drive/v2/about");
    EXPECT_TRUE(drive->GetAccountInfo(Object(R"({"fields":"quotaBytesTotal"})"), out));
    EXPECT_EQ(out.getMemberNames(), std::vector<std::string>{"quotaBytesTotal"});
    EXPECT_EQ(Last().Query("fields"), "quotaBytesTotal");
    EXPECT_EQ(Last().Header("Authorization"), "Bearer " + granted.access_token);
    EXPECT_EQ(drive->GetCloudType(), 2);
}

TEST_F(GDriveAccount, ParametersThatAreNoObjectAreAFailure) {
    Json::Value out;
    for (const char* params : {"[1]", "7", "\"text\""}) {
        EXPECT_FALSE(drive->GetAccountInfo(Object(params), out)) << params;
        EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CLOUD_FAILED);
        EXPECT_FALSE(drive->GetFileInfo("1", Object(params), out)) << params;
        EXPECT_FALSE(drive->ListFolder("", Object(params), out)) << params;
    }
    EXPECT_FALSE(drive->GetFileInfo("1", Json::Value(), out)) << "nothing is no object";
    EXPECT_THAT(Requests(), IsEmpty());
}

TEST_F(GDriveAccount, IsWrittenIntoBothProfiles) {
    EXPECT_TRUE(drive->UpdateAccountInfo()) << seams::LogDump();
    EXPECT_EQ(Last().Query("fields"), "user");
    for (const auto mode : {profiles::VFS_CONFIG_CONNECT, profiles::VFS_CONFIG_SERVER}) {
        const Json::Value stored = profiles::Stored(mode)[server_id];
        const Json::Value account = Object(stored["account_info"].asString());
        EXPECT_EQ(account["user"]["emailAddress"], "amy@example.com") << mode;
    }
}

TEST_F(GDriveAccount, OfALostConnectionCannotBeWritten) {
    profiles::Put(profiles::VFS_CONFIG_CONNECT, Object("{}"));
    EXPECT_FALSE(drive->UpdateAccountInfo());
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_PROFILE_UPDATE);
    EXPECT_TRUE(seams::Logged("Failed to update connection config")) << seams::LogDump();
    EXPECT_TRUE(seams::LoggedPart("gdrive.cpp:"));
}

TEST_F(GDriveAccount, OfAProfileThatWasNeverSavedIsWrittenIntoTheConnection) {
    profiles::Put(profiles::VFS_CONFIG_SERVER, Object("{}"));
    EXPECT_TRUE(drive->UpdateAccountInfo()) << seams::LogDump();
}

TEST_F(GDriveAccount, ThatCannotBeReadIsLoggedAndTheDriverWorksOn) {
    Json::Value profile;
    profile["server_id"] = server_id;
    profile["access_token"] = granted.access_token;
    profile["account_info"] = "{broken";
    GDrive other(profiles::kUser, profile);
    EXPECT_TRUE(seams::LoggedPart("Failed to decode to json format, ")) << seams::LogDump();
    Json::Value out;
    EXPECT_TRUE(other.GetAccountInfo(Json::Value(), out));
}

TEST_F(GDriveItem, IsDescribedById) {
    const std::string id = amy.AddPath("/docs/a.txt", "hello");
    Json::Value out;
    EXPECT_TRUE(drive->GetFileInfo(id, Object(R"({"fields":"title,fileSize"})"), out));
    EXPECT_EQ(json::toString(out), R"({"fileSize":"5","title":"a.txt"})");
    EXPECT_TRUE(drive->GetFileInfo("root", Object("{}"), out));
    EXPECT_EQ(out["id"], root);
    EXPECT_EQ(Last().target, "/drive/v2/files/root");
}

TEST_F(GDriveItem, InTheTrashIsNotFoundAlthoughTheServiceDescribesIt) {
    const std::string id = amy.AddPath("/docs/a.txt", "hello");
    service.SetTrashed(amy, id, true);
    Json::Value out;
    EXPECT_FALSE(drive->GetFileInfo(id, Object("{}"), out));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_NOT_FOUND);
    EXPECT_EQ(Last().status, 200);
    EXPECT_TRUE(seams::Logged("This file(" + id + ") is in the trash")) << seams::LogDump();
}

TEST_F(GDriveItem, ThatIsNotThereIsNotFound) {
    Json::Value out;
    EXPECT_FALSE(drive->GetFileInfo("none", Object("{}"), out));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_NOT_FOUND);
    EXPECT_TRUE(
        seams::LoggedPart("Failed to process curl " + service.ApiHost() + kFiles + "/none, err:"))
        << seams::LogDump();
}

TEST_F(GDriveItem, WithoutLabelsIsNotInTheTrash) {
    for (const char* body :
         {"{}", R"({"labels":{}})", R"({"labels":null})", R"({"labels":{"trashed":false}})",
          R"({"labels":{"trashed":null}})", R"({"labels":{"trashed":0}})", "null"}) {
        service.AddFault(Fault::On("GET", kFiles).Answer(200, body));
        Json::Value out;
        EXPECT_TRUE(drive->GetFileInfo("x", Object("{}"), out)) << body << seams::LogDump();
    }
}

TEST_F(GDriveItem, OfTheWrongTypesIsAFailureOfTheCloud) {
    for (const char* body :
         {R"({"labels":"trashed"})", R"({"labels":[true]})", R"({"labels":{"trashed":"true"}})",
          R"({"labels":{"trashed":{"a":1}}})", "[]", "7", "\"text\"", "{\"labels\":", "<html>",
          ""}) {
        service.AddFault(Fault::On("GET", kFiles).Answer(200, body));
        drive->SetError(VFS_ERR_NONE, "");
        seams::Reset();
        Json::Value out;
        EXPECT_FALSE(drive->GetFileInfo("x", Object("{}"), out)) << body;
        EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CLOUD_FAILED) << body;
        EXPECT_NE(seams::LogDump(), "") << body;
    }
    EXPECT_TRUE(seams::Logged("Failed to parse response to json format, ")) << seams::LogDump();
}

TEST_F(GDriveItem, OfABusyServiceIsAskedSevenTimesInAll) {
    const std::string id = amy.AddPath("/a.txt", "x");
    service.AddFault(Fault::On("GET", kFiles).Times(6).Answer(503));
    Json::Value out;
    EXPECT_TRUE(drive->GetFileInfo(id, Object("{}"), out)) << seams::LogDump();
    EXPECT_THAT(seams::Sleeps(), ElementsAre(5, 5, 5, 5, 5, 5));
    service.AddFault(Fault::On("GET", kFiles).Times(7).Answer(503));
    EXPECT_FALSE(drive->GetFileInfo(id, Object("{}"), out));
    EXPECT_EQ(Requests().size(), 14U);
}

TEST_F(GDriveItem, IdsOfAnyTextStayInTheirPlace) {
    Json::Value out;
    for (const std::string& id :
         {std::string("a b"), std::string("a?q=1"), std::string("a#b"), std::string("\xff\xfe"),
          std::string("%2e%2e"), std::string(4096, 'x'), std::string("a'b\"c\\")}) {
        EXPECT_FALSE(drive->GetFileInfo(id, Object("{}"), out)) << id;
        EXPECT_EQ(Last().target.rfind("/drive/v2/files/", 0), 0U) << Last().target;
        EXPECT_EQ(Last().Query("q"), "") << id;
    }
}

TEST(GDriveLimit, Passes5497558138880AndRefusesOneByteMore) {
    GDrive drive;
    EXPECT_TRUE(drive.CanFileUpload(0));
    EXPECT_TRUE(drive.CanFileUpload(5497558138880ULL));
    EXPECT_TRUE(drive.CanFileUpload(~0ULL)) << "a size that is not known";
    EXPECT_EQ(drive.GetErrorCode(), VFS_ERR_NONE);
    YLIBCErrSetEx(0, "test", 1);
    EXPECT_FALSE(drive.CanFileUpload(5497558138881ULL));
    EXPECT_EQ(drive.GetErrorCode(), VFS_ERR_FILE_TOO_LARGE);
    EXPECT_EQ(drive.GetError()["msg"], "");
    EXPECT_EQ(YLIBCErrGet(), 0xa400U);
}

TEST_F(GDriveToken, ThatIsRefusedIsRenewedOnceAndTheRequestRepeated) {
    amy.ExpireAccessTokens();
    Json::Value out;
    EXPECT_TRUE(drive->GetAccountInfo(Json::Value(), out)) << seams::LogDump();
    EXPECT_THAT(Requests(),
                ElementsAre("GET /drive/v2/about", "POST /o/oauth2/token", "GET /drive/v2/about"));
    const auto form = service.Journal().All()[1].body;
    for (const char* field : {"client_id=mine", "client_secret=secret-of-mine",
                              "refresh_token=", "grant_type=refresh_token"}) {
        EXPECT_THAT(form, HasSubstr(field));
    }
    EXPECT_EQ(drive->Token().access_token, amy.LastTokens().access_token);
    EXPECT_EQ(drive->Token().refresh_token, granted.refresh_token) << "this service keeps it";
}

TEST_F(GDriveToken, ThatCannotBeRenewedLeavesTheRequestUnsent) {
    Renew("1000");
    amy.RevokeRefreshTokens();
    Json::Value out;
    EXPECT_FALSE(drive->ListFolder("root", Json::Value(), out));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_UNAUTHORIZED);
    EXPECT_THAT(Requests(), ElementsAre("POST /o/oauth2/token"));
}

TEST_F(GDriveToken, OfAClientWithoutASecretCannotBeRenewed) {
    ASSERT_TRUE(Utils::RemoveClient("google", "mine"));
    Renew("1000");
    Json::Value out;
    EXPECT_FALSE(drive->GetAccountInfo(Json::Value(), out));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_UNAUTHORIZED);
    EXPECT_TRUE(seams::Logged("Failed to find the secret by mine")) << seams::LogDump();
    EXPECT_FALSE(drive->SetRefreshTokenParam(nullptr));
}

TEST_F(GDriveToken, OfAClientWhoseSecretCannotBeReadCannotBeRenewed) {
    Json::Value document;
    ASSERT_TRUE(json::fromFile(document, paths::kServiceConfig));
    document["clients"]["google"]["mine"] = "not enciphered";
    ASSERT_TRUE(json::toFile(document, paths::kServiceConfig, 0640));
    APIHandler handler;
    EXPECT_FALSE(drive->SetRefreshTokenParam(&handler));
    EXPECT_TRUE(seams::Logged("Failed to decrypt secret key")) << seams::LogDump();
}

TEST_F(GDriveToken, DriversWithoutAProfileAreSafeToAsk) {
    GDrive nobody;
    Json::Value out;
    EXPECT_FALSE(nobody.GetAccountInfo(Json::Value(), out));
    EXPECT_EQ(nobody.GetErrorCode(), VFS_ERR_UNAUTHORIZED);
    EXPECT_FALSE(nobody.SetAPIErrorHandler(nullptr));
    EXPECT_EQ(nobody.GetFileIDByPath("/a"), "");
}

}  // namespace
}  // namespace ZYROCloud
