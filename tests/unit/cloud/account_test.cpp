#include "cloud/account.h"

#include <gmock/gmock.h>

#include "core/json.h"
#include "support/seams.h"
#include "unit/cloud/box/box_fixture.h"

namespace ZYROCloud {
namespace {

class AskAccountTest : public BoxTest {
  protected:
    Json::Value Profile() const {
        Json::Value profile;
        profile["access_token"] = granted.access_token;
        profile["refresh_token"] = granted.refresh_token;
        profile["client_id"] = "mine";
        profile["server_id"] = kServerId;
        return profile;
    }
    Json::Value out, error;
};

TEST_F(AskAccountTest, GivesWhatTheServiceSays) {
    error = "before";
    EXPECT_TRUE(AskAccount(CLOUD_TYPE_BOX, profiles::kUser, Profile(), Json::Value(), out, error))
        << seams::LogDump();
    EXPECT_EQ(out["login"].asString(), "amy@example.com");
    EXPECT_TRUE(error.isNull());
}

TEST_F(AskAccountTest, OfAnAddressWhereNobodyListensLeavesTheDriversRecord) {
    Json::Value document;
    ASSERT_TRUE(json::fromFile(document, paths::kServiceConfig));
    document["hosts"]["BoxApiHost"] = "http://127.0.0.1:1";
    ASSERT_TRUE(json::toFile(document, paths::kServiceConfig, 0640));
    EXPECT_FALSE(AskAccount(CLOUD_TYPE_BOX, profiles::kUser, Profile(), Json::Value(), out, error));
    EXPECT_EQ(error["code"].asInt(), VFS_ERR_CONNECT_FAILED) << json::toString(error);
}

TEST_F(AskAccountTest, OfAServiceWithoutADriverFailsWithoutARecord) {
    for (const _tag_cloud_type type : {CLOUD_TYPE_GOOGLE, CLOUD_TYPE_DROPBOX, CLOUD_TYPE_ONEDRIVE,
                                       CLOUD_TYPE_UNKNOWN, CLOUD_TYPE_HUBIC}) {
        error = "before";
        EXPECT_FALSE(AskAccount(type, profiles::kUser, Profile(), Json::Value(), out, error));
        EXPECT_TRUE(error.isNull());
    }
    EXPECT_TRUE(seams::Logged("No driver for box://amy@example.com")) << seams::LogDump();
}

TEST_F(AskAccountTest, OfAServerOfAStandardProtocolFails) {
    EXPECT_FALSE(AskAccount(CLOUD_TYPE_VFS, profiles::kUser, Profile(), Json::Value(), out, error));
    EXPECT_EQ(json::toString(error), "{}");
    EXPECT_TRUE(seams::Logged("VFSCloud not implement get account info"));
}

}  // namespace
}  // namespace ZYROCloud
