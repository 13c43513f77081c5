#include "cloud/account.h"

#include <gmock/gmock.h>

#include "core/json.h"
#include "support/seams.h"
#include "unit/cloud/box/box_fixture.h"

namespace ZYROCloud {
namespace {

class AskAccountTest : public BoxTest {
  protected:
    void SetUp() override {
        BoxTest::SetUp();
        profile["access_token"] = granted.access_token;
        profile["refresh_token"] = granted.refresh_token;
        profile["client_id"] = "mine";
        profile["server_id"] = kServerId;
    }
    bool Ask(_tag_cloud_type type) {
        return AskAccount(type, profiles::kUser, profile, Json::Value(), out, error);
    }
    Json::Value profile, out, error;
};

TEST_F(AskAccountTest, GivesWhatTheServiceSays) {
    error = "before";
    EXPECT_TRUE(Ask(CLOUD_TYPE_BOX)) << seams::LogDump();
    EXPECT_EQ(out["login"].asString(), "amy@example.com");
    EXPECT_EQ(json::toString(error), "{}");
    EXPECT_EQ(profile["access_token"], granted.access_token) << "still the same";
}

TEST_F(AskAccountTest, WithATokenAtItsEndHandsTheNewOneBack) {
    profile["expire_time"] = "1";
    profile["expires_in"] = 3600;
    EXPECT_TRUE(Ask(CLOUD_TYPE_BOX)) << seams::LogDump();
    EXPECT_NE(profile["access_token"], granted.access_token);
    EXPECT_EQ(profile["access_token"], amy.LastTokens().access_token);
    EXPECT_EQ(profile["refresh_token"], amy.LastTokens().refresh_token);
    EXPECT_NE(profile["expire_time"], "1");
    EXPECT_FALSE(profile.isMember("expires_in"));
}

TEST_F(AskAccountTest, OfAnAddressWhereNobodyListensLeavesTheDriversRecord) {
    Json::Value document;
    ASSERT_TRUE(json::fromFile(document, paths::kServiceConfig));
    document["hosts"]["BoxApiHost"] = "http://127.0.0.1:1";
    ASSERT_TRUE(json::toFile(document, paths::kServiceConfig, 0640));
    EXPECT_FALSE(Ask(CLOUD_TYPE_BOX));
    EXPECT_EQ(error["code"].asInt(), VFS_ERR_CONNECT_FAILED) << json::toString(error);
}

TEST_F(AskAccountTest, OfAServiceWithoutADriverFailsWithoutARecord) {
    for (const _tag_cloud_type type : {CLOUD_TYPE_UNKNOWN, CLOUD_TYPE_HUBIC, CLOUD_TYPE_AWSS3}) {
        error = "before";
        EXPECT_FALSE(Ask(type));
        EXPECT_TRUE(error.isNull());
    }
    EXPECT_TRUE(seams::Logged("Unknown cloud type, uri: 0")) << seams::LogDump();
}

TEST_F(AskAccountTest, OfAServerOfAStandardProtocolFails) {
    EXPECT_FALSE(Ask(CLOUD_TYPE_VFS));
    EXPECT_EQ(error["code"], VFS_ERR_CLOUD_FAILED);
    EXPECT_TRUE(seams::Logged("VFSCloud not implement get account info"));
}

}  // namespace
}  // namespace ZYROCloud
