#include "cloud/public_cloud.h"

#include <gmock/gmock.h>

#include "core/json.h"
#include "support/bare_driver.h"
#include "support/token_profile.h"

namespace ZYROCloud {

using namespace ZYROVFS;  // NOLINT(google-build-using-namespace)
using bare::TokenDriver;
using profiles::VFS_CONFIG_CONNECT;
using profiles::VFS_CONFIG_SERVER;
using token_profile::kNow;
using token_profile::Stored;

class PublicCloudTest : public token_profile::TokenTest {};

TEST_F(PublicCloudTest, TakesWhatAProfileHolds) {
    const TokenDriver cloud(7, Driven("123"));
    EXPECT_EQ(7U, cloud.Owner());
    EXPECT_EQ("old-CANARY-access", cloud.Token().access_token);
    EXPECT_EQ("Bearer old-CANARY-access", cloud.Bearer());
    EXPECT_EQ("old-CANARY-refresh", cloud.Token().refresh_token);
    EXPECT_EQ("123", cloud.Token().expire_time);
    EXPECT_EQ("client", cloud.ClientId());
    EXPECT_EQ(token_profile::kId, cloud.GetServerID());
    EXPECT_EQ("1", cloud.Account()["id"].asString());
}

TEST_F(PublicCloudTest, WhatIsMissingIsEmpty) {
    const TokenDriver cloud(7, Json::Value());
    EXPECT_EQ("", cloud.Token().access_token + cloud.Token().refresh_token +
                      cloud.Token().expire_time + cloud.ClientId() + cloud.GetServerID());
    EXPECT_TRUE(cloud.Account().isObject());
    EXPECT_TRUE(seams::LogLines().empty()) << seams::LogDump();
}

TEST_F(PublicCloudTest, ABadAccountIsLoggedAndNoMore) {
    for (const char* text : {"", "{", "[1]", "7", "{}x"}) {
        seams::Reset();
        Json::Value profile = Driven("123");
        profile["account_info"] = text;
        const TokenDriver cloud(7, profile);
        EXPECT_TRUE(cloud.Account().isNull()) << text;
        EXPECT_TRUE(seams::Logged("Failed to decode to json format, Invalid argument")) << text;
        EXPECT_EQ("123", cloud.Token().expire_time);
    }
}

TEST_F(PublicCloudTest, MembersOfTheWrongTypeCountAsMissing) {
    Json::Value profile = Driven("123"), object;
    object["secret"] = "CANARY";
    for (const char* key : {"access_token", "refresh_token", "expire_time", "client_id",
                            "server_id", "account_info"}) {
        profile[key] = object;
    }
    const TokenDriver cloud(7, profile);
    EXPECT_EQ("", cloud.Token().access_token + cloud.Token().refresh_token +
                      cloud.Token().expire_time + cloud.ClientId() + cloud.GetServerID());
    EXPECT_TRUE(seams::Logged("Wrong type of access_token in a profile")) << seams::LogDump();
}

TEST_F(PublicCloudTest, AProfileThatIsNoObjectHasNothing) {
    for (const Json::Value& profile :
         {Json::Value(Json::arrayValue), Json::Value("text"), Json::Value(7)}) {
        EXPECT_EQ("", TokenDriver(7, profile).GetServerID());
    }
}

TEST_F(PublicCloudTest, ATokenIsValidUpTo60SecondsPastItsEnd) {
    EXPECT_EQ(1, TokenDriver(7, Driven(Ago(60))).IsAccessTokenValid());
    EXPECT_EQ(0, TokenDriver(7, Driven(Ago(61))).IsAccessTokenValid());
    EXPECT_EQ(1, TokenDriver(7, Driven(Ago(-1))).IsAccessTokenValid());
}

TEST_F(PublicCloudTest, ATokenWithoutAnEndStaysValid) {
    seams::SetTime(-1);
    EXPECT_EQ(1, TokenDriver(7, Driven("")).IsAccessTokenValid());
}

TEST_F(PublicCloudTest, AnEndThatIsNoNumberIsLongPast) {
    EXPECT_EQ(0, TokenDriver(7, Driven("soon")).IsAccessTokenValid());
    EXPECT_EQ(1, TokenDriver(7, Driven("99999999999999999999")).IsAccessTokenValid());
}

TEST_F(PublicCloudTest, AClockThatFailsIsToldApart) {
    TokenDriver cloud(7, Driven(Ago(0)));
    seams::SetTime(-1);
    EXPECT_EQ(-1, cloud.IsAccessTokenValid());
    EXPECT_TRUE(seams::LoggedPart("Failed to call time function, errno=75, ")) << seams::LogDump();
}

TEST_F(PublicCloudTest, FieldsAreLaidOverTheStoredProfile) {
    TokenDriver cloud(profiles::kUser, Driven(Ago(0)));
    Json::Value fields;
    fields["expire_time"] = "5";
    EXPECT_TRUE(cloud.UpdateProfileConfig(VFS_CONFIG_CONNECT, fields));
    EXPECT_EQ("5", Stored(VFS_CONFIG_CONNECT)["expire_time"].asString());
    EXPECT_EQ("mine", Stored(VFS_CONFIG_CONNECT)["alias"].asString());
    EXPECT_EQ(Ago(3600), Stored(VFS_CONFIG_SERVER)["expire_time"].asString());
}

TEST_F(PublicCloudTest, AProfileThatIsNotStoredCannotBeUpdated) {
    Json::Value profile = Driven(Ago(0)), fields;
    profile["server_id"] = "box://bob@example.com";
    fields["expire_time"] = "5";
    EXPECT_FALSE(
        TokenDriver(profiles::kUser, profile).UpdateProfileConfig(VFS_CONFIG_CONNECT, fields));
    EXPECT_FALSE(TokenDriver(profiles::kUser, Driven(Ago(0)))
                     .UpdateProfileConfig(VFS_CONFIG_CONNECT, "text"));
}

TEST_F(PublicCloudTest, TheAccountIsWrittenIntoBothProfiles) {
    TokenDriver cloud(profiles::kUser, Driven(Ago(0)));
    cloud.account["login"] = "amy";
    EXPECT_TRUE(cloud.UpdateAccountInfo()) << seams::LogDump();
    EXPECT_TRUE(cloud.asked_with.isNull());
    for (const auto mode : {VFS_CONFIG_CONNECT, VFS_CONFIG_SERVER}) {
        EXPECT_EQ("{\"login\":\"amy\"}", Stored(mode)["account_info"].asString());
        EXPECT_EQ("old-CANARY-access", Stored(mode)["access_token"].asString());
    }
    EXPECT_EQ(VFS_ERR_NONE, cloud.GetErrorCode());
}

TEST_F(PublicCloudTest, AnAccountThatIsNotToldLeavesTheProfiles) {
    TokenDriver cloud(profiles::kUser, Driven(Ago(0)));
    cloud.account_known = false;
    EXPECT_FALSE(cloud.UpdateAccountInfo());
    EXPECT_EQ("{\"id\":\"1\"}", Stored(VFS_CONFIG_CONNECT)["account_info"].asString());
}

TEST_F(PublicCloudTest, AConnectionThatCannotBeWrittenFailsTheUpdateOfTheAccount) {
    profiles::Put(VFS_CONFIG_CONNECT, Json::Value(Json::objectValue));
    TokenDriver cloud(profiles::kUser, Driven(Ago(0)));
    EXPECT_FALSE(cloud.UpdateAccountInfo());
    EXPECT_EQ(VFS_ERR_PROFILE_UPDATE, cloud.GetErrorCode());
    EXPECT_EQ("", cloud.GetError()["msg"].asString());
    EXPECT_TRUE(seams::Logged("Failed to update connection config")) << seams::LogDump();
    EXPECT_EQ("{\"id\":\"1\"}", Stored(VFS_CONFIG_SERVER)["account_info"].asString());
}

TEST_F(PublicCloudTest, ASavedProfileNeedNotBeThereForTheUpdateOfTheAccount) {
    profiles::Put(VFS_CONFIG_SERVER, Json::Value(Json::objectValue));
    TokenDriver cloud(profiles::kUser, Driven(Ago(0)));
    EXPECT_TRUE(cloud.UpdateAccountInfo()) << seams::LogDump();
}

TEST_F(PublicCloudTest, TheAccountIsAskedWithTheQueryOfTheService) {
    TokenDriver cloud(profiles::kUser, Driven(Ago(0)));
    Json::Value query;
    query["fields"] = "user";
    EXPECT_TRUE(cloud.UpdateAccountInfoWith(query));
    EXPECT_EQ("user", cloud.asked_with["fields"].asString());
}

}  // namespace ZYROCloud
