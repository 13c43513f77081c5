// Tokens where nothing can be asked: memory that ran out. What a service says to them is tested
// over real sockets in tests/integration/token_test.cpp.
#include <gtest/gtest.h>

#include <new>

#include "cloud/handler.h"
#include "support/bare_driver.h"
#include "support/token_profile.h"

namespace {
bool no_handler = false;
}

/** Memory for an APIHandler can be had or not; whatever else is asked for this way is there. */
void* operator new(std::size_t size, const std::nothrow_t&) noexcept {
    if (no_handler && size == sizeof(ZYROCloud::APIHandler)) {
        return nullptr;
    }
    try {
        return ::operator new(size);
    } catch (const std::bad_alloc&) {
        return nullptr;
    }
}

namespace ZYROCloud {

using namespace ZYROVFS;  // NOLINT(google-build-using-namespace)
using bare::TokenDriver;

class NoMemory : public token_profile::TokenTest {
  protected:
    void SetUp() override {
        TokenTest::SetUp();
        no_handler = true;
    }
    void TearDown() override {
        no_handler = false;
        TokenTest::TearDown();
    }
};

TEST_F(NoMemory, ADriverWithoutAHandlerFailsItsRequests) {
    TokenDriver cloud(profiles::kUser, Driven(""));
    ASSERT_EQ(nullptr, cloud.GetAPIHandler());
    EXPECT_FALSE(cloud.DoAPIRequest(6));
    EXPECT_EQ(VFS_ERR_CLOUD_FAILED, cloud.GetErrorCode());
    EXPECT_FALSE(cloud.IsNeedRetry());
    EXPECT_EQ(0U, cloud.GetRetrySleepTime());
    EXPECT_EQ(1, cloud.IsAccessTokenValid());
    EXPECT_TRUE(cloud.RefreshToken(false));
}

TEST_F(NoMemory, ARenewalWithoutAHandlerFailsAndUnlocks) {
    no_handler = false;
    TokenDriver cloud(profiles::kUser, Driven(Ago(3600)));
    cloud.token_url = "http://127.0.0.1:9/token";
    ASSERT_NE(nullptr, cloud.GetAPIHandler());
    no_handler = true;
    EXPECT_FALSE(cloud.RefreshToken(false));
    EXPECT_EQ(VFS_ERR_CLOUD_FAILED, cloud.GetErrorCode());
    EXPECT_EQ("old-CANARY-access", cloud.Token().access_token);
    no_handler = false;
    cloud.token_url = "";
    EXPECT_FALSE(cloud.RefreshToken(false));
    EXPECT_FALSE(seams::LoggedPart("Failed to lock")) << seams::LogDump();
}

/** A service whose answers have shapes that its driver does not expect. */
class CarelessDriver : public TokenDriver {
  public:
    using TokenDriver::TokenDriver;
    bool GetAccountInfo(const Json::Value&, Json::Value& out) override {
        out = Json::Value(Json::arrayValue);
        return out["login"].isString();
    }
    bool SetRefreshTokenParam(APIHandler*) override {
        return !Json::Value(Json::objectValue).asString().empty();
    }
};

class Careless : public token_profile::TokenTest {};

TEST_F(Careless, AnExceptionOfADriverIsAFailureOfTheOperation) {
    CarelessDriver cloud(profiles::kUser, Driven(Ago(3600)));
    EXPECT_FALSE(cloud.UpdateAccountInfo());
    EXPECT_EQ(VFS_ERR_CLOUD_FAILED, cloud.GetErrorCode());
    cloud.SetError(Json::Value());
    EXPECT_FALSE(cloud.RefreshToken(false));
    EXPECT_EQ(VFS_ERR_CLOUD_FAILED, cloud.GetErrorCode());
    EXPECT_TRUE(seams::LoggedPart("Wrong value in a request or its answer, ")) << seams::LogDump();
}

}  // namespace ZYROCloud
