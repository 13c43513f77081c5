// The life of tokens over real sockets: what a service may answer, what is sent to it, what is
// written, how long is waited, and who may renew at the same time.
#include <gmock/gmock.h>
#include <sys/file.h>

#include <algorithm>
#include <ctime>
#include <thread>

#include "cloud/public_cloud.h"
#include "core/json.h"
#include "core/paths.h"
#include "support/bare_driver.h"
#include "support/other_process.h"
#include "support/scratch.h"
#include "support/token_profile.h"
#include "support/wire_server.h"
#include "zyrovfs/utils.h"

namespace ZYROCloud {

using namespace ZYROVFS;  // NOLINT(google-build-using-namespace)
using bare::TokenDriver;
using profiles::VFS_CONFIG_CONNECT;
using profiles::VFS_CONFIG_SERVER;
using testing::Each;
using testing::HasSubstr;
using testing::Not;
using testing::SizeIs;
using token_profile::kNow;
using token_profile::Stored;

constexpr const char* kGood =
    R"({"access_token":"new-CANARY-access","refresh_token":"new-CANARY-refresh","expires_in":3600})";

/** A connection that answers each of these in turn. */
wire::Script Answers(const std::vector<std::string>& answers) {
    wire::Script script;
    for (const std::string& answer : answers) {
        script.push_back(wire::ReadRequest());
        script.push_back(wire::Send(answer));
    }
    return script;
}

/** A connection that gives this answer on and on. */
wire::Script Always(const std::string& answer, size_t times = 60) {
    return Answers(std::vector<std::string>(times, answer));
}

class Token : public token_profile::TokenTest {
  protected:
    /** RefreshToken of an expired driver against a service that says this. */
    bool Renew(const wire::Script& script, bool force = false) {
        server_ = std::make_unique<wire::WireServer>(std::vector<wire::Script>{script});
        cloud_ = std::make_unique<TokenDriver>(profiles::kUser, Driven(Ago(3600)));
        cloud_->token_url = server_->Url("/token");
        return cloud_->RefreshToken(force);
    }
    bool RenewWithBody(const std::string& body) { return Renew(Always(wire::Answer(200, body))); }

    /** Neither memory nor files know of a new token. */
    void ExpectOldTokens() {
        EXPECT_EQ("old-CANARY-access", cloud_->Token().access_token);
        EXPECT_EQ("old-CANARY-refresh", cloud_->Token().refresh_token);
        EXPECT_EQ(Ago(3600), cloud_->Token().expire_time);
        for (const auto mode : {VFS_CONFIG_CONNECT, VFS_CONFIG_SERVER}) {
            EXPECT_EQ("old-CANARY-access", Stored(mode)["access_token"].asString());
            EXPECT_EQ("old-CANARY-refresh", Stored(mode)["refresh_token"].asString());
            EXPECT_EQ(Ago(3600), Stored(mode)["expire_time"].asString());
        }
    }
    void ExpectUnlocked() {
        EXPECT_TRUE(support::OthersCanLock(paths::MountLock(profiles::kUser).c_str(), LOCK_EX));
    }

    /** What came, without the empty end of a connection that the driver closed. */
    std::vector<std::string> Requests() const {
        std::vector<std::string> requests = server_->Received();
        requests.erase(std::remove(requests.begin(), requests.end(), ""), requests.end());
        return requests;
    }

    std::unique_ptr<wire::WireServer> server_;
    std::unique_ptr<TokenDriver> cloud_;
};

TEST_F(Token, WithoutAnEndIsNeitherLockedNorAskedFor) {
    wire::WireServer server({});
    TokenDriver cloud(profiles::kUser, Driven(""));
    cloud.token_url = server.Url("/token");
    const support::OtherProcess holder([] { return ZYROVFS::Utils::LockMnt(true); });
    ASSERT_TRUE(holder.ok());
    EXPECT_TRUE(cloud.RefreshToken(false));
    EXPECT_TRUE(seams::MicroSleeps().empty());
    EXPECT_EQ(0U, server.Connections());
}

TEST_F(Token, ThatEndedAMinuteAgoIsNotRenewedYet) {
    wire::WireServer server({});
    TokenDriver cloud(profiles::kUser, Driven(Ago(60)));
    cloud.token_url = server.Url("/token");
    EXPECT_TRUE(cloud.RefreshToken(false));
    EXPECT_EQ(0U, server.Connections());
}

TEST_F(Token, ThatExpiredIsRenewedAndWrittenIntoBothProfiles) {
    EXPECT_TRUE(RenewWithBody(kGood)) << seams::LogDump();
    EXPECT_EQ("new-CANARY-access", cloud_->Token().access_token);
    EXPECT_EQ("new-CANARY-refresh", cloud_->Token().refresh_token);
    EXPECT_EQ(std::to_string(kNow + 3600), cloud_->Token().expire_time);
    for (const auto mode : {VFS_CONFIG_CONNECT, VFS_CONFIG_SERVER}) {
        EXPECT_EQ("new-CANARY-access", Stored(mode)["access_token"].asString());
        EXPECT_EQ("new-CANARY-refresh", Stored(mode)["refresh_token"].asString());
        EXPECT_EQ(std::to_string(kNow + 3600), Stored(mode)["expire_time"].asString());
        EXPECT_EQ("mine", Stored(mode)["alias"].asString());
    }
    ASSERT_THAT(Requests(), SizeIs(1));
    EXPECT_THAT(server_->ReceivedText(), HasSubstr("POST /token HTTP/1.1\r\n"));
    EXPECT_THAT(server_->ReceivedText(),
                HasSubstr("\r\nAuthorization: Bearer old-CANARY-access\r\n"));
    EXPECT_THAT(server_->ReceivedText(),
                HasSubstr("grant_type=refresh_token&refresh_token=old-CANARY-refresh"));
    EXPECT_EQ(VFS_ERR_NONE, cloud_->GetErrorCode());
    ExpectUnlocked();
}

TEST_F(Token, ThatIsStillGoodIsRenewedByForce) {
    wire::WireServer server({Always(wire::Answer(200, kGood))});
    TokenDriver cloud(profiles::kUser, Driven(Ago(-1000)));
    cloud.token_url = server.Url("/token");
    EXPECT_TRUE(cloud.RefreshToken(false));
    EXPECT_EQ(0U, server.Connections());
    EXPECT_TRUE(cloud.RefreshToken(true));
    EXPECT_EQ("new-CANARY-access", cloud.Token().access_token);
}

TEST_F(Token, AnAnswerWithoutARefreshTokenLeavesTheStoredOne) {
    EXPECT_TRUE(RenewWithBody(R"({"access_token":"new-CANARY-access","expires_in":10})"));
    EXPECT_EQ("old-CANARY-refresh", cloud_->Token().refresh_token);
    for (const auto mode : {VFS_CONFIG_CONNECT, VFS_CONFIG_SERVER}) {
        EXPECT_EQ("new-CANARY-access", Stored(mode)["access_token"].asString());
        EXPECT_EQ("old-CANARY-refresh", Stored(mode)["refresh_token"].asString());
    }
}

TEST_F(Token, WithoutALifeInTheAnswerEndsNowAndIsGoodFor60SecondsMore) {
    EXPECT_TRUE(RenewWithBody(R"({"access_token":"new-CANARY-access"})"));
    EXPECT_EQ(Ago(0), cloud_->Token().expire_time);
    seams::SetTime(kNow + 60);
    EXPECT_EQ(1, cloud_->IsAccessTokenValid());
    seams::SetTime(kNow + 61);
    EXPECT_EQ(0, cloud_->IsAccessTokenValid());
}

TEST_F(Token, LifeAsTextGivesTheNumber) {
    EXPECT_TRUE(RenewWithBody(R"({"access_token":"a","expires_in":"3600"})"));
    EXPECT_EQ(std::to_string(kNow + 3600), cloud_->Token().expire_time);
}

TEST_F(Token, ALifeBeyondAllNumbersEndsAtTheLastOne) {
    EXPECT_TRUE(RenewWithBody(R"({"access_token":"a","expires_in":9223372036854775807})"));
    EXPECT_EQ("9223372036854775807", cloud_->Token().expire_time);
}

TEST_F(Token, WithAFailingClockBehindTheAnswerTheLifeAloneIsStored) {
    server_ = std::make_unique<wire::WireServer>(
        std::vector<wire::Script>{Always(wire::Answer(200, kGood))});
    cloud_ = std::make_unique<TokenDriver>(profiles::kUser, Driven(Ago(3600)));
    cloud_->token_url = server_->Url("/token");
    seams::SetTime(-1);
    EXPECT_TRUE(cloud_->RefreshToken(true)) << seams::LogDump();
    EXPECT_EQ("3600", cloud_->Token().expire_time);
}

TEST_F(Token, IsNotRenewedWhileTheClockFails) {
    wire::WireServer server({});
    TokenDriver cloud(profiles::kUser, Driven(Ago(3600)));
    cloud.token_url = server.Url("/token");
    seams::SetTime(-1);
    EXPECT_FALSE(cloud.RefreshToken(false));
    EXPECT_EQ(0U, server.Connections());
    ExpectUnlocked();
}

TEST_F(Token, AClockThatFailsBehindTheLockGivesTheLockBack) {
    const auto holder =
        std::make_unique<support::OtherProcess>([] { return ZYROVFS::Utils::LockMnt(true); });
    wire::WireServer server({});
    TokenDriver cloud(profiles::kUser, Driven(Ago(3600)));
    cloud.token_url = server.Url("/token");
    seams::OnMicroSleep([&holder] {
        holder->End();
        seams::SetTime(-1);
    });
    EXPECT_FALSE(cloud.RefreshToken(false));
    EXPECT_EQ(0U, server.Connections());
    ExpectUnlocked();
}

TEST_F(Token, ARefusedGrantStopsAtOnceAndKeepsTheOldTokens) {
    EXPECT_FALSE(Renew(Always(wire::Answer(400, R"({"error":"invalid_grant"})"))));
    EXPECT_EQ(VFS_ERR_UNAUTHORIZED, cloud_->GetErrorCode());
    EXPECT_THAT(Requests(), SizeIs(1));
    EXPECT_TRUE(seams::Sleeps().empty());
    EXPECT_TRUE(seams::LoggedPart("Failed to process curl, err:{")) << seams::LogDump();
    EXPECT_TRUE(seams::Logged("Failed to refresh token, err=25")) << seams::LogDump();
    ExpectOldTokens();
    ExpectUnlocked();
}

TEST_F(Token, AnyOtherBadRequestCountsAsRevoked) {
    for (const char* body : {R"({"error":"invalid_client"})", "", "no JSON", "[]", "null",
                             R"({"error":{"a":1}})", R"({"error":7})"}) {
        EXPECT_FALSE(Renew(Always(wire::Answer(400, body)))) << body;
        EXPECT_EQ(VFS_ERR_TOKEN_REVOKED, cloud_->GetErrorCode()) << body;
        EXPECT_THAT(Requests(), SizeIs(1)) << body;
    }
    EXPECT_TRUE(seams::Logged("Failed to refresh token, err=27")) << seams::LogDump();
    ExpectOldTokens();
}

TEST_F(Token, ARequestThatIsRefusedWith401StopsAtOnce) {
    EXPECT_FALSE(Renew(Always(wire::Answer(401))));
    EXPECT_EQ(VFS_ERR_UNAUTHORIZED, cloud_->GetErrorCode());
    EXPECT_THAT(Requests(), SizeIs(1));
    ExpectOldTokens();
}

TEST_F(Token, ABusyServiceIsAsked42TimesWithTheHandlersWaits) {
    EXPECT_FALSE(Renew(Always(wire::Answer(503))));
    EXPECT_EQ(VFS_ERR_SERVER_ERROR, cloud_->GetErrorCode());
    EXPECT_THAT(Requests(), SizeIs(42));
    EXPECT_THAT(seams::Sleeps(), SizeIs(42));
    EXPECT_THAT(seams::Sleeps(), Each(5U));
    EXPECT_TRUE(seams::Logged("Failed to refresh token, err=44")) << seams::LogDump();
    ExpectOldTokens();
    ExpectUnlocked();
}

/** Of a service that may say how long it wants to be left alone. */
class ThrottledDriver : public TokenDriver {
  public:
    using TokenDriver::TokenDriver;
    bool SetAPIErrorHandler(APIHandler* handler) override {
        return handler != nullptr && handler->SetErrorHandler(new OneDriveErrorHandler);
    }
};

TEST_F(Token, AServiceCannotOrderALongSleepUnderTheMountLock) {
    const std::string years =
        R"({"error":{"code":"request_throttled","message":"Wait 99999999 seconds."}})";
    const wire::WireServer server(
        {Answers({wire::Answer(420, years), wire::Answer(420, years), wire::Answer(200, kGood)})});
    ThrottledDriver cloud(profiles::kUser, Driven(Ago(3600)));
    cloud.token_url = server.Url("/token");
    EXPECT_TRUE(cloud.RefreshToken(false)) << seams::LogDump();
    EXPECT_EQ(std::vector<unsigned>(2, 30U), seams::Sleeps());
}

TEST_F(Token, AFailureThatIsNotRetriedIsAskedOncePerPassWithoutAWait) {
    EXPECT_FALSE(Renew(Always(wire::Answer(404))));
    EXPECT_EQ(VFS_ERR_NOT_FOUND, cloud_->GetErrorCode());
    EXPECT_THAT(Requests(), SizeIs(6));
    EXPECT_TRUE(seams::Sleeps().empty());
}

TEST_F(Token, IsRenewedWhenTheServiceComesBackAtTheLastAttempt) {
    std::vector<std::string> answers(41, wire::Answer(503));
    answers.push_back(wire::Answer(200, kGood));
    EXPECT_TRUE(Renew(Answers(answers))) << seams::LogDump();
    EXPECT_THAT(Requests(), SizeIs(42));
    EXPECT_EQ("new-CANARY-access", Stored(VFS_CONFIG_CONNECT)["access_token"].asString());
}

TEST_F(Token, AServiceThatIsNotThereIsTriedForOnePass) {
    std::string url;
    {
        const wire::WireServer gone({});
        url = gone.Url("/token");
    }
    cloud_ = std::make_unique<TokenDriver>(profiles::kUser, Driven(Ago(3600)));
    cloud_->token_url = url;
    EXPECT_FALSE(cloud_->RefreshToken(false));
    EXPECT_EQ(VFS_ERR_CONNECT_FAILED, cloud_->GetErrorCode());
    EXPECT_EQ(std::vector<unsigned>(7, 3U), seams::Sleeps());
    ExpectOldTokens();
}

TEST_F(Token, AnAnswerThatIsNoJsonChangesNothing) {
    EXPECT_FALSE(RenewWithBody("<html>busy</html>"));
    EXPECT_TRUE(seams::Logged("Failed to parse response to json format, <html>busy</html>"))
        << seams::LogDump();
    EXPECT_THAT(Requests(), SizeIs(1));
    ExpectOldTokens();
    ExpectUnlocked();
}

TEST_F(Token, AnAnswerThatBreaksOffLeavesNoTokenInTheLog) {
    EXPECT_FALSE(RenewWithBody(R"({"access_token":"new-CANARY-access","refresh_tok)"));
    EXPECT_TRUE(seams::Logged("Failed to parse response to json format, {\"access"))
        << seams::LogDump();
    EXPECT_FALSE(Renew(Always(wire::Answer(403, kGood))));
    EXPECT_TRUE(seams::LoggedPart("Failed to process curl, err:")) << seams::LogDump();
    ExpectOldTokens();
}

TEST_F(Token, MembersOfTheWrongTypeChangeNothing) {
    for (const char* body : {
             R"({"access_token":{"a":"new-CANARY"},"expires_in":1})",
             R"({"access_token":["new-CANARY"],"expires_in":1})",
             R"({"access_token":"new-CANARY","expires_in":"soon"})",
             R"({"access_token":"new-CANARY","expires_in":{}})",
             R"({"access_token":"new-CANARY","expires_in":[]})",
             R"({"access_token":"new-CANARY","expires_in":1e300})",
             R"({"access_token":"new-CANARY","expires_in":18446744073709551615})",
             R"({"access_token":"new-CANARY","expires_in":1,"refresh_token":{}})",
             R"({"access_token":"new-CANARY","expires_in":1,"refresh_token":[1]})",
             "[]",
             R"(["new-CANARY"])",
             "\"new-CANARY\"",
             "7",
             "true",
         }) {
        EXPECT_FALSE(RenewWithBody(body)) << body;
        EXPECT_EQ(VFS_ERR_CLOUD_FAILED, cloud_->GetErrorCode()) << body;
        ExpectOldTokens();
        ExpectUnlocked();
    }
    EXPECT_TRUE(seams::LoggedPart("Wrong value in a request or its answer, ")) << seams::LogDump();
}

TEST_F(Token, ProfilesThatCannotBeRewrittenDoNotKeepTheNewTokenFromTheDriver) {
    for (const auto mode : {VFS_CONFIG_CONNECT, VFS_CONFIG_SERVER}) {
        profiles::Put(mode, Json::Value(Json::objectValue));
    }
    EXPECT_TRUE(RenewWithBody(kGood)) << seams::LogDump();
    EXPECT_EQ("new-CANARY-access", cloud_->Token().access_token);
    EXPECT_EQ("new-CANARY-refresh", cloud_->Token().refresh_token);
    ExpectUnlocked();
}

TEST_F(Token, OneProfileThatCannotBeRewrittenDoesNotKeepItFromTheOther) {
    profiles::PutText(profiles::File(VFS_CONFIG_CONNECT), "garbage");
    EXPECT_TRUE(RenewWithBody(kGood)) << seams::LogDump();
    EXPECT_EQ("new-CANARY-access", Stored(VFS_CONFIG_SERVER)["access_token"].asString());
    EXPECT_EQ("garbage", profiles::Text(profiles::File(VFS_CONFIG_CONNECT)));
}

TEST_F(Token, ADriverThatDescribesNoRequestFailsAndUnlocks) {
    cloud_ = std::make_unique<TokenDriver>(profiles::kUser, Driven(Ago(3600)));
    EXPECT_FALSE(cloud_->RefreshToken(false));
    ExpectOldTokens();
    ExpectUnlocked();
}

TEST_F(Token, ALockThatSomebodyElseKeepsIsWaitedForAndThenDoneWithout) {
    const support::OtherProcess holder([] { return ZYROVFS::Utils::LockMnt(true); });
    ASSERT_TRUE(holder.ok());
    EXPECT_TRUE(RenewWithBody(kGood)) << seams::LogDump();
    EXPECT_THAT(seams::MicroSleeps(), SizeIs(2200));
    EXPECT_TRUE(seams::Logged("Failed to lock")) << seams::LogDump();
    EXPECT_EQ("new-CANARY-access", Stored(VFS_CONFIG_CONNECT)["access_token"].asString());
}

TEST_F(Token, ASharedLockOfThisProcessIsNotGivenBackByARenewalThatGotNone) {
    ASSERT_TRUE(ZYROVFS::Utils::LockMnt(false));
    EXPECT_TRUE(RenewWithBody(kGood)) << seams::LogDump();
    EXPECT_TRUE(seams::Logged("Failed to lock")) << seams::LogDump();
    EXPECT_FALSE(support::OthersCanLock(paths::MountLock(profiles::kUser).c_str(), LOCK_EX));
    ZYROVFS::Utils::UnLockMnt();
    ExpectUnlocked();
}

// --- requests that find their token refused ------------------------------------------------------

class Recovery : public Token {
  protected:
    /** DoAPIRequest against a service that answers these in turn, tokens included. */
    bool Ask(const std::vector<std::string>& answers) {
        std::vector<wire::Script> scripts;
        for (const std::string& answer : answers) {
            scripts.push_back(Answers({answer}));
        }
        server_ = std::make_unique<wire::WireServer>(scripts);
        cloud_ = std::make_unique<TokenDriver>(profiles::kUser, Driven(Ago(-1000)));
        cloud_->token_url = server_->Url("/token");
        APIHandler* const api = cloud_->GetAPIHandler();
        return api->Init() && api->AddHeader("Authorization", cloud_->Bearer()) &&
               api->SetURL(server_->Url("/item"), false) && cloud_->DoAPIRequest(0);
    }
    static std::string Closing(int status, const std::string& body = "") {
        return wire::Answer(status, body, "Connection: close\r\n");
    }
};

TEST_F(Recovery, ATokenRefusedOnceCostsOneRenewalAndOneRepeat) {
    EXPECT_TRUE(Ask({Closing(401), Closing(200, kGood), Closing(200, "item")})) << seams::LogDump();
    EXPECT_EQ("item", cloud_->GetAPIHandler()->GetResponse());
    const std::vector<std::string> received = Requests();
    ASSERT_THAT(received, SizeIs(3));
    EXPECT_THAT(received[0], HasSubstr("Authorization: Bearer old-CANARY-access\r\n"));
    EXPECT_THAT(received[1], HasSubstr("POST /token"));
    EXPECT_THAT(received[2], HasSubstr("GET /item"));
    EXPECT_THAT(received[2], HasSubstr("Authorization: Bearer new-CANARY-access\r\n"));
    EXPECT_THAT(received[2], Not(HasSubstr("old-CANARY-access")));
}

TEST_F(Recovery, ATokenRefusedTwiceFails) {
    EXPECT_FALSE(Ask({Closing(401), Closing(200, kGood), Closing(401)}));
    EXPECT_EQ(VFS_ERR_UNAUTHORIZED, cloud_->GetErrorCode());
    EXPECT_THAT(Requests(), SizeIs(3));
    EXPECT_EQ(401, cloud_->GetAPIHandler()->GetError()["response_code"].asInt());
}

TEST_F(Recovery, AFailureOfTheRepeatLeavesTheRecordOfTheRefusal) {
    EXPECT_FALSE(Ask({Closing(401), Closing(200, kGood), Closing(404)}));
    EXPECT_EQ(VFS_ERR_UNAUTHORIZED, cloud_->GetErrorCode());
    EXPECT_EQ(VFS_ERR_NOT_FOUND, cloud_->GetAPIHandler()->GetError()["code"].asInt());
}

TEST_F(Recovery, AGrantThatIsRefusedEndsTheRequest) {
    EXPECT_FALSE(Ask({Closing(401), Closing(400, R"({"error":"invalid_grant"})"), Closing(200)}));
    EXPECT_EQ(VFS_ERR_UNAUTHORIZED, cloud_->GetErrorCode());
    EXPECT_THAT(Requests(), SizeIs(2));
}

TEST_F(Recovery, OtherFailuresAreNoMatterOfTokens) {
    EXPECT_FALSE(Ask({Closing(404), Closing(200, kGood), Closing(200)}));
    EXPECT_EQ(VFS_ERR_NOT_FOUND, cloud_->GetErrorCode());
    EXPECT_THAT(Requests(), SizeIs(1));
    EXPECT_EQ("old-CANARY-access", cloud_->Token().access_token);
}

// --- several at once -----------------------------------------------------------------------------

/** An answer that takes its time, so that others come to wait. */
wire::Script Slowly(const std::string& body) {
    const std::string answer = wire::Answer(200, body, "Connection: close\r\n");
    return {wire::ReadRequest(), wire::Drip(answer, answer.size(), 300)};
}

constexpr const char* kSecond =
    R"({"access_token":"third-CANARY","refresh_token":"fourth-CANARY","expires_in":7200})";

class Rivals : public Token {
  protected:
    /** Two processes renew at once, each with the old tokens in memory; true when both succeed. */
    bool BothRenew(bool force, const std::string& expected) {
        pid_t children[2];
        for (pid_t& child : children) {
            TokenDriver cloud(profiles::kUser, Driven(Ago(3600)));
            cloud.token_url = server_->Url("/token");
            child = scratch::Start([&] {
                seams::OnMicroSleep([] {
                    const timespec pause{0, 1000000};
                    nanosleep(&pause, nullptr);
                });
                const bool renewed = cloud.RefreshToken(force);
                return renewed && (expected.empty() || cloud.Token().access_token == expected) &&
                               !seams::LoggedPart(token_profile::kCanary)
                           ? 0
                           : 1;
            });
        }
        const int first = scratch::End(children[0]);
        return scratch::End(children[1]) == 0 && first == 0;
    }
};

TEST_F(Rivals, TwoProcessesWithOneRefreshTokenSendOneRequest) {
    server_ = std::make_unique<wire::WireServer>(
        std::vector<wire::Script>{Slowly(kGood), Always(wire::Answer(400))});
    EXPECT_TRUE(BothRenew(false, "new-CANARY-access"));
    EXPECT_EQ(1U, server_->Connections());
    EXPECT_EQ("new-CANARY-access", Stored(VFS_CONFIG_CONNECT)["access_token"].asString());
}

TEST_F(Rivals, TheSecondFindsTheNewTokenAlsoInTheSavedProfileAlone) {
    profiles::Put(VFS_CONFIG_CONNECT, Json::Value(Json::objectValue));
    server_ = std::make_unique<wire::WireServer>(
        std::vector<wire::Script>{Slowly(kGood), Always(wire::Answer(400))});
    EXPECT_TRUE(BothRenew(false, "new-CANARY-access"));
    EXPECT_EQ(1U, server_->Connections());
}

TEST_F(Rivals, ForcedRenewalsSpendEachRefreshTokenOnce) {
    server_ = std::make_unique<wire::WireServer>(
        std::vector<wire::Script>{Slowly(kGood), Slowly(kSecond)});
    EXPECT_TRUE(BothRenew(true, ""));
    const std::vector<std::string> received = Requests();
    ASSERT_THAT(received, SizeIs(2));
    EXPECT_THAT(received[0], HasSubstr("refresh_token=old-CANARY-refresh"));
    EXPECT_THAT(received[1], HasSubstr("refresh_token=new-CANARY-refresh"));
    EXPECT_EQ("third-CANARY", Stored(VFS_CONFIG_SERVER)["access_token"].asString());
}

TEST_F(Rivals, TwoThreadsWithOneRefreshTokenSendOneRequest) {
    server_ = std::make_unique<wire::WireServer>(
        std::vector<wire::Script>{Slowly(kGood), Always(wire::Answer(400))});
    TokenDriver first(profiles::kUser, Driven(Ago(3600)));
    TokenDriver second(profiles::kUser, Driven(Ago(3600)));
    first.token_url = second.token_url = server_->Url("/token");
    bool renewed[2] = {false, false};
    std::thread other([&] { renewed[0] = first.RefreshToken(false); });
    renewed[1] = second.RefreshToken(false);
    other.join();
    EXPECT_TRUE(renewed[0] && renewed[1]) << seams::LogDump();
    EXPECT_EQ(1U, server_->Connections());
    EXPECT_EQ(first.Token().access_token, second.Token().access_token);
    ExpectUnlocked();
}

TEST_F(Rivals, AnOlderTokenInTheProfileIsNotTaken) {
    wire::WireServer server({});
    TokenDriver cloud(profiles::kUser, Driven(Ago(3599)));
    cloud.token_url = server.Url("/token");
    EXPECT_FALSE(cloud.RefreshToken(true));
    EXPECT_EQ(Ago(3599), cloud.Token().expire_time);
}

TEST_F(Rivals, AStoredTokenThatThisMachineCannotReadIsNotTaken) {
    Json::Value servers;
    servers[token_profile::kId] = token_profile::Plain(Ago(-1000));  // not enciphered
    for (const auto mode : {VFS_CONFIG_CONNECT, VFS_CONFIG_SERVER}) {
        profiles::Put(mode, servers);
    }
    cloud_ = std::make_unique<TokenDriver>(profiles::kUser, Driven(Ago(3600)));
    EXPECT_FALSE(cloud_->RefreshToken(false));
    EXPECT_EQ("old-CANARY-refresh", cloud_->Token().refresh_token);
    EXPECT_EQ(Ago(3600), cloud_->Token().expire_time);
}

}  // namespace ZYROCloud
