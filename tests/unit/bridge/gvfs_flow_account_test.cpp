// What the account checks of all services have in common.
#include "bridge/gvfs_flow_account.h"

#include "support/backend.h"

namespace backend {
namespace {

class FlowAccount : public EachBackend {
  protected:
    Json::Value StoredAccount() const {
        Json::Value account;
        json::fromString(
            account,
            profiles::Stored(profiles::VFS_CONFIG_CONNECT)[server_id]["account_info"].asString());
        return account;
    }
};

TEST_P(FlowAccount, AcceptsWhatTheServiceAcceptsAndKeepsTheAccount) {
    EXPECT_EQ(Check(Credentials()), 1) << seams::LogDump();
    EXPECT_EQ(err, kUntouched);
    EXPECT_EQ(Requests().size(), 1U);
    EXPECT_EQ(Last().Header("Authorization"), "Bearer " + granted.access_token);
    EXPECT_FALSE(StoredAccount().empty());
}

TEST_P(FlowAccount, AsksWithTheCredentialsInPlaceOfThoseThatAreStored) {
    Connect();
    Json::Value credentials = Credentials();
    const cloudsim::Tokens fresh = amy.IssueTokens(3600, "mine");
    credentials["access_token"] = fresh.access_token;
    credentials["refresh_token"] = fresh.refresh_token;
    EXPECT_EQ(Check(credentials), 1) << seams::LogDump();
    EXPECT_EQ(Last().Header("Authorization"), "Bearer " + fresh.access_token);
}

TEST_P(FlowAccount, WithoutAStoredConnectionHasNothingToCompare) {
    Disconnect();
    amy.ExpireAccessTokens();
    EXPECT_EQ(Check(Credentials()), 1);
    EXPECT_THAT(Requests(), IsEmpty());
    EXPECT_EQ(err, kUntouched);
}

TEST_P(FlowAccount, RefusesWhatTheServiceRefuses) {
    amy.ExpireAccessTokens();
    amy.RevokeRefreshTokens();
    EXPECT_EQ(Check(Credentials()), 0);
    EXPECT_EQ(err, G_IO_ERROR_CONNECTION_REFUSED);
    EXPECT_TRUE(seams::LoggedPart("Failed to get account from " + server_id + ", err: {"))
        << seams::LogDump();
}

TEST_P(FlowAccount, RenewsATokenThatRanOut) {
    if (!rig->Renews()) {
        GTEST_SKIP() << "tokens are not renewed";
    }
    amy.ExpireAccessTokens();
    EXPECT_EQ(Check(Credentials()), 1) << seams::LogDump();
    EXPECT_EQ(err, kUntouched);
}

TEST_P(FlowAccount, OfCredentialsThatCannotBeReadFailsAndShowsNoToken) {
    const std::string broken =
        R"({"client_id":"mine","access_token":")" + granted.access_token + "\"";
    for (const std::string& text :
         {broken, std::string(), std::string("no JSON"), std::string("[]"), std::string("7")}) {
        seams::Reset();
        EXPECT_EQ(rig->Check(server_id.c_str(), text.c_str(), &err), 0) << text;
        EXPECT_TRUE(seams::LoggedPart("Failed to parse " + text.substr(0, 6))) << seams::LogDump();
    }
    EXPECT_EQ(err, kUntouched);
    EXPECT_THAT(Requests(), IsEmpty());
}

TEST_P(FlowAccount, WithCredentialsOfOddTypesEndsWithAnAnswer) {
    for (const char* value : {"null", "7", "true", "[1]", R"({"a":1})"}) {
        for (const char* member : {"access_token", "refresh_token", "expire_time", "client_id",
                                   "server_id", "protocol"}) {
            Json::Value credentials = Credentials();
            credentials[member] = Object(value);
            const int result = Check(credentials);
            EXPECT_TRUE(result == 0 || result == 1) << member << value;
        }
    }
}

TEST_P(FlowAccount, WithoutAnArgumentThatItNeedsIsRefused) {
    const std::string text = json::toString(Credentials());
    EXPECT_EQ(rig->Check(nullptr, text.c_str(), &err), 0);
    EXPECT_TRUE(seams::Logged("Wrong parameters")) << seams::LogDump();
    EXPECT_EQ(rig->Check(server_id.c_str(), nullptr, &err), 0);
    EXPECT_EQ(rig->Check(nullptr, nullptr, nullptr), 0);
    EXPECT_THAT(Requests(), IsEmpty());
    EXPECT_EQ(rig->Check(server_id.c_str(), text.c_str(), nullptr), 1);
    amy.ExpireAccessTokens();
    amy.RevokeRefreshTokens();
    EXPECT_EQ(rig->Check(server_id.c_str(), text.c_str(), nullptr), 0);
}

}  // namespace

RUN_FOR_EACH_BACKEND(FlowAccount);

}  // namespace backend
