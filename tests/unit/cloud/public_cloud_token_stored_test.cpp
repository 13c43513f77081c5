// Which token a renewal spends, and what of its answer is kept, when profiles and memory differ.
#include <gmock/gmock.h>

#include "cloud/public_cloud.h"
#include "support/bare_driver.h"
#include "support/token_profile.h"
#include "support/wire_server.h"

namespace ZYROCloud {

using namespace ZYROVFS;  // NOLINT(google-build-using-namespace)
using bare::TokenDriver;
using profiles::VFS_CONFIG_CONNECT;
using profiles::VFS_CONFIG_SERVER;
using testing::HasSubstr;
using testing::Not;
using token_profile::Plain;
using token_profile::Store;
using token_profile::Stored;

class StoredToken : public token_profile::TokenTest {
  protected:
    /** Renews before a service that gives this; true when the renewal succeeds. */
    bool Renew(TokenDriver& cloud, bool force, const std::string& body = kGood) {
        const std::string answer = wire::Answer(200, body, "Connection: close\r\n");
        server_ = std::make_unique<wire::WireServer>(
            std::vector<wire::Script>{{wire::ReadRequest(), wire::Send(answer)}});
        cloud.token_url = server_->Url("/token");
        return cloud.RefreshToken(force);
    }
    /** The refresh token that the service got. */
    std::string Spent() const {
        const std::string text = server_->ReceivedText();
        const std::string member = "&refresh_token=";
        const size_t at = text.find(member);
        return at == std::string::npos ? "" : text.substr(at + member.size());
    }
    static Json::Value Token(const std::string& owner, const std::string& expire_time) {
        Json::Value profile = Plain(expire_time);
        profile["server_id"] = token_profile::kId;
        profile["access_token"] = owner + "-CANARY-access";
        profile["refresh_token"] = owner + "-CANARY-refresh";
        return profile;
    }

    static constexpr const char* kGood =
        R"({"access_token":"new-CANARY-access","refresh_token":"new-CANARY-refresh",)"
        R"("expires_in":3600})";
    std::unique_ptr<wire::WireServer> server_;
};

TEST_F(StoredToken, IsKeptWhenTheAnswerHasNoRefreshTokenOrAnEmptyOne) {
    for (const char* member : {"", R"("refresh_token":null,)", R"("refresh_token":"",)"}) {
        TokenDriver cloud(profiles::kUser, Driven(Ago(3600)));
        EXPECT_TRUE(Renew(
            cloud, true,
            "{" + std::string(member) + R"("access_token":"new-CANARY-access","expires_in":10})"));
        EXPECT_EQ("new-CANARY-access", cloud.Token().access_token);
        EXPECT_EQ("old-CANARY-refresh", cloud.Token().refresh_token) << member;
        for (const auto mode : {VFS_CONFIG_CONNECT, VFS_CONFIG_SERVER}) {
            EXPECT_EQ("new-CANARY-access", Stored(mode)["access_token"].asString());
            EXPECT_EQ("old-CANARY-refresh", Stored(mode)["refresh_token"].asString()) << member;
        }
    }
}

TEST_F(StoredToken, OfOthersIsTakenAlsoWhenItEndsEarlier) {
    for (const auto mode : {VFS_CONFIG_CONNECT, VFS_CONFIG_SERVER}) {
        Store(mode, Token("others", Ago(-600)));
    }
    TokenDriver cloud(profiles::kUser, Driven(Ago(-1000)));
    EXPECT_TRUE(Renew(cloud, true)) << seams::LogDump();
    EXPECT_EQ("others-CANARY-refresh", Spent());
    EXPECT_EQ("new-CANARY-refresh", cloud.Token().refresh_token);
}

TEST_F(StoredToken, ThatEndsEarlierIsNotTakenWhileAnotherProfileHasTheDrivers) {
    Store(VFS_CONFIG_SERVER, Token("older", Ago(7200)));
    TokenDriver cloud(profiles::kUser, Driven(Ago(3600)));
    EXPECT_TRUE(Renew(cloud, false)) << seams::LogDump();
    EXPECT_EQ("old-CANARY-refresh", Spent());
}

TEST_F(StoredToken, ThatWasSpentDoesNotComeBackFromAFileThatCouldNotBeRewritten) {
    TokenDriver cloud(profiles::kUser, Driven(Ago(3600)));
    EXPECT_TRUE(Renew(cloud, true)) << seams::LogDump();
    for (const long long later : {0, 7200}) {
        for (const auto mode : {VFS_CONFIG_CONNECT, VFS_CONFIG_SERVER}) {
            Store(mode, Plain(Ago(3600 - 2 * later)));
        }
        EXPECT_TRUE(Renew(cloud, true)) << seams::LogDump();
        EXPECT_EQ("new-CANARY-refresh", Spent());
    }
}

TEST_F(StoredToken, DoesNotTakeThePlaceOfTheOneThatACallerGave) {
    TokenDriver cloud(profiles::kUser, Token("given", Ago(4000)));
    cloud.TokenIsGiven();
    Store(VFS_CONFIG_CONNECT, Plain(Ago(5000)));
    Store(VFS_CONFIG_SERVER, Plain(Ago(5000)));
    EXPECT_TRUE(Renew(cloud, false)) << seams::LogDump();
    EXPECT_EQ("given-CANARY-refresh", Spent());
}

}  // namespace ZYROCloud
