#include "cloud/secret.h"

#include <gmock/gmock.h>

#include "core/json.h"
#include "core/paths.h"
#include "support/profiles.h"
#include "support/seams.h"
#include "support/wire_server.h"
#include "zyrovfs/cloud_utils.h"

namespace ZYROCloud {
namespace {

using namespace ZYROVFS;
using testing::EndsWith;
using testing::HasSubstr;

class Secret : public testing::Test {
  protected:
    void SetUp() override {
        std::filesystem::create_directories(paths::kConfigRoot);
        std::filesystem::remove(paths::kServiceConfig);
        seams::Reset();
    }
    void TearDown() override { EXPECT_FALSE(seams::LoggedPart("s3cret")) << seams::LogDump(); }
};

TEST_F(Secret, OfAClientIsFoundByServiceAndId) {
    ASSERT_TRUE(Utils::AddClient("box", "mine", "s3cret & more"));
    std::string secret;
    EXPECT_TRUE(FindSecret("box", "mine", secret)) << seams::LogDump();
    EXPECT_EQ(secret, "s3cret & more");
    EXPECT_FALSE(FindSecret("google", "mine", secret));
    EXPECT_FALSE(FindSecret("box", "other", secret));
    EXPECT_TRUE(seams::Logged("Failed to find the secret by other")) << seams::LogDump();
    EXPECT_TRUE(seams::LoggedPart("secret_test.cpp:"));
}

TEST_F(Secret, ThatThisMachineDidNotEncipherIsRefused) {
    ASSERT_TRUE(Utils::AddClient("box", "mine", "s3cret"));
    Json::Value document;
    ASSERT_TRUE(json::fromFile(document, paths::kServiceConfig));
    document["clients"]["box"]["mine"] = "s3cret in plain text";
    ASSERT_TRUE(json::toFile(document, paths::kServiceConfig, 0640));
    std::string secret = "before";
    EXPECT_FALSE(FindSecret("box", "mine", secret));
    EXPECT_EQ(secret, "before");
    EXPECT_TRUE(seams::Logged("Failed to decrypt secret key")) << seams::LogDump();
}

TEST_F(Secret, GoesIntoTheFormThatAsksForANewToken) {
    ASSERT_TRUE(Utils::AddClient("box", "my id", "s3cret&=+"));
    const wire::WireServer server({{wire::ReadRequest(), wire::Send(wire::Answer(200, "{}"))}});
    APIHandler api;
    api.SetErrorHandler(new BoxErrorHandler);
    ASSERT_TRUE(api.Init());
    EXPECT_TRUE(AddRefreshGrant(api, "box", "my id", "refresh/1"));
    api.SetURL(server.Url("/oauth2/token"), true);
    EXPECT_TRUE(api.Process(0));
    EXPECT_THAT(server.ReceivedText(),
                HasSubstr("Content-Type: application/x-www-form-urlencoded\r\n"));
    EXPECT_THAT(server.ReceivedText(),
                EndsWith("client_id=my%20id&client_secret=s3cret%26%3D%2B&"
                         "grant_type=refresh_token&refresh_token=refresh%2F1"));
}

TEST_F(Secret, ThatIsMissingLeavesTheFormAlone) {
    APIHandler api;
    api.SetErrorHandler(new BoxErrorHandler);
    EXPECT_FALSE(AddRefreshGrant(api, "box", "nobody", "refresh"));
    EXPECT_TRUE(seams::Logged("Failed to find the secret by nobody")) << seams::LogDump();
}

}  // namespace
}  // namespace ZYROCloud
