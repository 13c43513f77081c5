#include "unit/cloud/box/box_fixture.h"

namespace ZYROCloud {
namespace {

using BoxAccount = BoxTest;
using BoxListing = BoxTest;
using BoxLimit = BoxTest;
using BoxToken = BoxTest;

TEST_F(BoxAccount, IsAskedWithTheFieldsThatAreKept) {
    Json::Value out;
    EXPECT_TRUE(box->GetAccountInfo(Json::Value(), out));
    EXPECT_EQ(out["login"], "amy@example.com");
    EXPECT_EQ(out["name"], "Amy Doe");
    EXPECT_THAT(Requests(), ElementsAre("GET /2.0/users/me"));
    EXPECT_EQ(Last().Query("fields"), "id,name,login,space_used,space_amount,max_upload_size");
    EXPECT_EQ(box->GetCloudType(), 6);
}

TEST_F(BoxAccount, ACallersOwnFieldsAndQueryGoOut) {
    Json::Value out;
    EXPECT_TRUE(box->GetAccountInfo(Object(R"({"fields":"login","x":7})"), out));
    EXPECT_EQ(Last().Query("fields"), "login");
    EXPECT_EQ(Last().Query("x"), "7");
}

TEST_F(BoxAccount, ParametersThatAreNoObjectAreAFailure) {
    Json::Value out;
    for (const char* params : {"[1]", "7", "\"text\""}) {
        EXPECT_FALSE(box->GetAccountInfo(Object(params), out)) << params;
        EXPECT_EQ(box->GetErrorCode(), VFS_ERR_CLOUD_FAILED);
        EXPECT_FALSE(box->GetFileInfo("files/1", Object(params), out)) << params;
        EXPECT_FALSE(box->ListFolder("", Object(params), out)) << params;
    }
    EXPECT_THAT(Requests(), IsEmpty());
}

TEST_F(BoxAccount, AnAnswerThatIsNoJsonFailsWithoutARetry) {
    service.AddFault(Fault::On("GET", "/2.0/users/me").Body("<html>"));
    Json::Value out;
    EXPECT_FALSE(box->GetAccountInfo(Json::Value(), out));
    EXPECT_EQ(box->GetErrorCode(), VFS_ERR_CLOUD_FAILED);
    EXPECT_TRUE(seams::Logged("Failed to parse response to json format, <html>"))
        << seams::LogDump();
    EXPECT_EQ(Requests().size(), 1U);
}

TEST_F(BoxAccount, AnInfoOfAnItemIsAskedByItsItemId) {
    const std::string id = amy.AddPath("/docs/a.txt", "hello");
    Json::Value out;
    EXPECT_TRUE(box->GetFileInfo("files/" + id, Json::Value(), out));
    EXPECT_EQ(out["name"], "a.txt");
    EXPECT_EQ(box->GetFileID(out), "files/" + id);
    EXPECT_FALSE(box->IsDir(out));
    EXPECT_EQ(Last().Query("fields"), "id,name,size,created_at,modified_at,parent,owned_by");
    EXPECT_TRUE(box->GetFileInfo("folders/0", Json::Value(), out));
    EXPECT_EQ(box->GetFileID(out), "folders/0");
    EXPECT_TRUE(box->IsDir(out));
    EXPECT_FALSE(box->GetFileInfo("files/404404", Json::Value(), out));
    EXPECT_EQ(box->GetErrorCode(), VFS_ERR_NOT_FOUND);
}

TEST_F(BoxAccount, OfABusyServiceIsAskedSevenTimesInAll) {
    service.AddFault(Fault::On("GET", "/2.0/users/me").Times(6).Answer(503));
    Json::Value out;
    EXPECT_TRUE(box->GetAccountInfo(Json::Value(), out));
    EXPECT_THAT(seams::Sleeps(), ElementsAre(5, 5, 5, 5, 5, 5));
    seams::Reset();
    service.AddFault(Fault::On("GET", "/2.0/users/me").Times(7).Answer(429));
    EXPECT_FALSE(box->GetAccountInfo(Json::Value(), out));
    EXPECT_EQ(box->GetErrorCode(), VFS_ERR_RATE_LIMITED);
    EXPECT_TRUE(
        seams::LoggedPart("Failed to process curl " + service.ApiHost() + "/2.0/users/me, err:"))
        << seams::LogDump();
}

TEST_F(BoxAccount, IsWrittenIntoBothProfiles) {
    EXPECT_TRUE(box->UpdateAccountInfo()) << seams::LogDump();
    EXPECT_EQ(Last().Query("fields"), "id,name,login,space_used,space_amount,max_upload_size");
    for (const auto mode : {profiles::VFS_CONFIG_CONNECT, profiles::VFS_CONFIG_SERVER}) {
        const Json::Value stored = profiles::Stored(mode)[kServerId];
        EXPECT_EQ(Object(stored["account_info"].asString())["login"], "amy@example.com") << mode;
    }
}

TEST_F(BoxAccount, OfALostConnectionCannotBeWritten) {
    profiles::Put(profiles::VFS_CONFIG_CONNECT, Object("{}"));
    EXPECT_FALSE(box->UpdateAccountInfo());
    EXPECT_EQ(box->GetErrorCode(), VFS_ERR_PROFILE_UPDATE);
    EXPECT_TRUE(seams::Logged("Failed to update connection config")) << seams::LogDump();
    EXPECT_TRUE(seams::LoggedPart("box.cpp:"));
}

TEST_F(BoxListing, AFolderOf2500VisibleItemsTakesThreeRequests) {
    const std::string many = amy.AddFolder(root, "many");
    amy.AddMany(many, 2500, 1);
    Json::Value out;
    EXPECT_TRUE(box->ListFolder("folders/" + many, Json::Value(), out));
    EXPECT_EQ(out.size(), 2500U);
    EXPECT_EQ(out[2499]["name"], "item-002499.bin");
    std::vector<std::string> offsets;
    for (const auto& entry : service.Journal().All()) {
        EXPECT_EQ(entry.Path(), "/2.0/folders/" + many + "/items");
        EXPECT_EQ(entry.Query("limit"), "1000");
        offsets.push_back(entry.Query("offset"));
    }
    EXPECT_THAT(offsets, ElementsAre("0", "1000", "2000"));
}

TEST_F(BoxListing, ExactlyOnePageIsOneRequest) {
    const std::string many = amy.AddFolder(root, "many");
    amy.AddMany(many, 1000, 1);
    Json::Value out;
    EXPECT_TRUE(box->ListFolder(many, Json::Value(), out));
    EXPECT_EQ(out.size(), 1000U);
    EXPECT_EQ(Requests().size(), 1U);
}

TEST_F(BoxListing, TheRootIsListedByNoIdABareIdAndAnItemId) {
    amy.AddPath("/a.txt", "x");
    for (const char* id : {"", "0", "folders/0"}) {
        Json::Value out;
        EXPECT_TRUE(box->ListFolder(id, Json::Value(), out)) << id;
        EXPECT_THAT(Each(out, "name"), ElementsAre("a.txt")) << id;
        EXPECT_EQ(Last().Path(), "/2.0/folders/0/items");
    }
}

TEST_F(BoxListing, HiddenNamesAreLeftOut) {
    amy.AddPath("/'", "x");
    amy.AddPath("/a.txt", "x");
    amy.AddFolder(root, ".ZyrotechWorkingDirectory");
    Json::Value out;
    EXPECT_TRUE(box->ListFolder("", Json::Value(), out));
    EXPECT_THAT(Each(out, "name"), ElementsAre("a.txt"));
}

TEST_F(BoxListing, APageWithoutATotalIsTheLast) {
    service.AddFault(
        Fault::On("GET", "/2.0/folders/0/items").Body(R"({"entries":[{"name":"a"}]})"));
    Json::Value out;
    EXPECT_TRUE(box->ListFolder("", Json::Value(), out));
    EXPECT_THAT(Each(out, "name"), ElementsAre("a"));
    EXPECT_EQ(Requests().size(), 1U);
}

TEST_F(BoxListing, APageThatFailsFailsTheListing) {
    const std::string many = amy.AddFolder(root, "many");
    amy.AddMany(many, 1001, 1);
    service.AddFault(Fault::On("GET", "*offset=1000").Answer(403, "{}"));
    Json::Value out;
    EXPECT_FALSE(box->ListFolder(many, Json::Value(), out));
    EXPECT_EQ(box->GetErrorCode(), VFS_ERR_FORBIDDEN);
}

TEST_F(BoxListing, OnePageMovesTheOffsetOnAndNeverBack) {
    amy.AddPath("/a.txt", "x");
    Json::Value out;
    unsigned int offset = 0;
    EXPECT_TRUE(box->ListFolder("", Json::Value(), out, &offset));
    EXPECT_EQ(offset, 1000U);
    EXPECT_EQ(out["total_count"], 1);
    service.AddFault(Fault::On("GET", "/2.0/folders/0/items").Answer(200, "{}"));
    offset = 4294967000U;
    EXPECT_TRUE(box->ListFolder("", Json::Value(), out, &offset));
    EXPECT_EQ(offset, 4294967295U);
}

TEST_F(BoxListing, ValuesOfTheWrongTypeAreAFailureOfTheCloud) {
    for (const char* body :
         {R"({"entries":{"a":{"name":"x"}}})", R"({"entries":"text"})",
          R"({"entries":[],"total_count":"many"})", R"({"entries":[],"total_count":-1})",
          R"({"entries":[],"total_count":1e300})", R"({"entries":[],"total_count":[]})", "[]",
          R"("text")", "7"}) {
        service.AddFault(Fault::On("GET", "/2.0/folders/0/items").Body(body));
        box->SetError(VFS_ERR_NONE, "");
        seams::Reset();
        Json::Value out;
        EXPECT_FALSE(box->ListFolder("", Json::Value(), out)) << body;
        EXPECT_EQ(box->GetErrorCode(), VFS_ERR_CLOUD_FAILED) << body;
        EXPECT_NE(seams::LogDump(), "") << body;
    }
}

TEST_F(BoxListing, AnItemOfTheWrongTypeDoesNotHideTheOthers) {
    for (const char* item : {"7", R"({"name":{"x":1}})", R"({"name":["x"]})"}) {
        service.AddFault(
            Fault::On("GET", "/2.0/folders/0/items")
                .Body(std::string(R"({"entries":[)") + item + R"(,{"name":"good"}]})"));
        Json::Value out;
        EXPECT_TRUE(box->ListFolder("", Json::Value(), out)) << item;
        ASSERT_EQ(out.size(), 2U) << item;
        EXPECT_EQ(out[1]["name"], "good") << item;
    }
}

TEST_F(BoxListing, ASearchGivesTheEntriesOfTheAnswer) {
    amy.AddPath("/docs/report.txt", "x");
    Json::Value out;
    EXPECT_TRUE(box->SearchFile("report", out));
    EXPECT_THAT(Each(out, "name"), ElementsAre("report.txt"));
    EXPECT_EQ(Last().Path(), "/2.0/search");
    EXPECT_EQ(Last().Query("query"), "report");
    EXPECT_EQ(Last().Query("content_types"), "name");
}

TEST_F(BoxListing, ASearchAnswerWithoutEntriesIsAFailure) {
    service.AddFault(Fault::On("GET", "/2.0/search").Body("{}"));
    Json::Value out;
    EXPECT_FALSE(box->SearchFile("report", out));
    EXPECT_EQ(box->GetErrorCode(), VFS_ERR_CLOUD_FAILED);
    EXPECT_TRUE(seams::Logged("Response has no data member")) << seams::LogDump();
}

TEST_F(BoxLimit, OfSizes) {
    EXPECT_TRUE(box->CanFileUpload(~0ULL));
    EXPECT_TRUE(box->CanFileUpload(0));
    EXPECT_TRUE(box->CanFileUpload(262144000));
    EXPECT_THAT(Requests(), IsEmpty());
    EXPECT_FALSE(box->CanFileUpload(5368709121));
    EXPECT_EQ(box->GetErrorCode(), VFS_ERR_FILE_TOO_LARGE);
    EXPECT_EQ(YLIBCErrGet(), 0xa400U);
    EXPECT_THAT(Requests(), IsEmpty());
}

TEST_F(BoxLimit, AByteBeyond250MiBAsksTheService) {
    amy.SetQuota(1ULL << 40);
    amy.SetMaxUpload(5368709120ULL);
    EXPECT_TRUE(box->CanFileUpload(262144001));
    EXPECT_THAT(Requests(), ElementsAre("OPTIONS /2.0/files/content"));
    const Json::Value body = Object(Last().body);
    EXPECT_EQ(body["parent"]["id"], "0");
    EXPECT_EQ(body["size"].asUInt64(), 262144001U);
    EXPECT_THAT(body["name"].asString(), testing::MatchesRegex("[0-9]+"));
    EXPECT_TRUE(box->CanFileUpload(5368709120));
    amy.SetMaxUpload(262144000);
    EXPECT_FALSE(box->CanFileUpload(262144001));
    EXPECT_EQ(box->GetErrorCode(), VFS_ERR_FILE_TOO_LARGE);
}

TEST_F(BoxToken, ThatIsRefusedIsRenewedOnceAndTheRequestRepeated) {
    amy.ExpireAccessTokens();
    Json::Value out;
    EXPECT_TRUE(box->GetAccountInfo(Json::Value(), out)) << seams::LogDump();
    EXPECT_THAT(Requests(),
                ElementsAre("GET /2.0/users/me", "POST /oauth2/token", "GET /2.0/users/me"));
    EXPECT_EQ(box->Token().access_token, amy.LastTokens().access_token);
    EXPECT_EQ(box->Token().refresh_token, amy.LastTokens().refresh_token);
    EXPECT_NE(box->Token().refresh_token, granted.refresh_token);
    EXPECT_NE(profiles::Stored(profiles::VFS_CONFIG_CONNECT)[kServerId]["expire_time"], "500");
}

TEST_F(BoxToken, ThatHasEndedIsRenewedBeforeTheRequest) {
    Renew("1000");
    Json::Value out;
    EXPECT_TRUE(box->GetAccountInfo(Json::Value(), out)) << seams::LogDump();
    EXPECT_THAT(Requests(), ElementsAre("POST /oauth2/token", "GET /2.0/users/me"));
}

TEST_F(BoxToken, ThatCannotBeRenewedLeavesTheRequestUnsent) {
    Renew("1000");
    amy.RevokeRefreshTokens();
    Json::Value out;
    EXPECT_FALSE(box->GetAccountInfo(Json::Value(), out));
    EXPECT_EQ(box->GetErrorCode(), VFS_ERR_UNAUTHORIZED);
    EXPECT_THAT(Requests(), ElementsAre("POST /oauth2/token"));
}

TEST_F(BoxToken, OfAClientWithoutASecretCannotBeRenewed) {
    ASSERT_TRUE(Utils::RemoveClient("box", "mine"));
    Renew("1000");
    Json::Value out;
    EXPECT_FALSE(box->GetAccountInfo(Json::Value(), out));
    EXPECT_EQ(box->GetErrorCode(), VFS_ERR_UNAUTHORIZED);
    EXPECT_TRUE(seams::Logged("Failed to find the secret by mine")) << seams::LogDump();
    EXPECT_FALSE(box->SetRefreshTokenParam(nullptr));
}

TEST_F(BoxToken, DriversWithoutAProfileAreSafeToAsk) {
    Box nobody;
    Json::Value out;
    EXPECT_FALSE(nobody.GetAccountInfo(Json::Value(), out));
    EXPECT_EQ(nobody.GetErrorCode(), VFS_ERR_UNAUTHORIZED);
    EXPECT_FALSE(nobody.SetAPIErrorHandler(nullptr));
}

}  // namespace
}  // namespace ZYROCloud
