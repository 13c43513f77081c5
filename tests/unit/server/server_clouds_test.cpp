// What Dropbox, Google Drive and OneDrive differ in: how an account is asked for and read.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <memory>

#include "core/json.h"
#include "core/paths.h"
#include "server/server_dropbox.h"
#include "server/server_gdrive.h"
#include "server/server_onedrive.h"
#include "support/profiles.h"
#include "support/seams.h"
#include "support/wire_server.h"

namespace ZYROVFS::Server {
namespace {

using profiles::kUser;
using testing::HasSubstr;

struct Service {
    const char* protocol;
    std::unique_ptr<CloudServer> (*make)();
    const char* host;     ///< of account requests, in the service configuration
    const char* request;  ///< how the one for the account begins
    const char* answer;
    const char* without_name;  ///< an answer in which the account is not told
    const char* kept;          ///< what becomes the account document
};

template <typename Type>
std::unique_ptr<CloudServer> Make() {
    return std::make_unique<Type>();
}

void PrintTo(const Service& service, std::ostream* out) {
    *out << service.protocol;
}

const Service kServices[] = {
    {"dropbox", Make<DropboxServer>, "DropboxApiHost", "POST /2/users/get_current_account ",
     R"({"account_id":"dbid:1","email":"amy@example.com"})", "{}",
     R"({"account_id":"dbid:1","email":"amy@example.com"})"},
    {"google", Make<GDriveServer>, "GoogleApiHost", "GET /drive/v2/about?fields=user ",
     R"({"user":{"displayName":"Amy","emailAddress":"amy@example.com"},"kind":"about"})", "{}",
     R"({"displayName":"Amy","emailAddress":"amy@example.com"})"},
    {"onedrive", Make<OneDriveServer>, "LiveApiHost", "GET /v5.0/me?pretty=false ",
     R"({"emails":{"account":"amy@example.com","preferred":"a@b"},"id":"c1d"})", "{\"id\":\"c1d\"}",
     R"({"emails":{"account":"amy@example.com","preferred":"a@b"},"id":"c1d"})"},
};

class CloudAccounts : public profiles::ProfileTest, public testing::WithParamInterface<Service> {
  protected:
    void SetUp() override {
        ProfileTest::SetUp();
        seams::Reset();
        conf["protocol"] = GetParam().protocol;
        conf["alias"] = "";
        conf["client_id"] = "client";
        conf["access_token"] = "canary-access";
        conf["refresh_token"] = "canary-refresh";
        conf["expires_in"] = "3600";
        server = GetParam().make();
    }
    void TearDown() override { EXPECT_FALSE(seams::LoggedPart("canary")) << seams::LogDump(); }

    bool Ask(const wire::WireServer& service) {
        profiles::PutText(paths::kServiceConfig, std::string(R"({"hosts":{")") + GetParam().host +
                                                     "\":\"" + service.Url("") + "\"}}");
        chmod(paths::kServiceConfig, 0640);
        ResetError();
        return server->Load(kUser, VFS_CONFIG_SERVER, conf, false, true);
    }
    static wire::Script Answering(int status, const std::string& body) {
        return {wire::ReadRequest(), wire::Send(wire::Answer(status, body))};
    }
    std::string Id() {
        std::string id;
        EXPECT_TRUE(server->GetServerID(id));
        return id;
    }

    Json::Value conf;
    std::unique_ptr<CloudServer> server;
};

TEST_P(CloudAccounts, TheAccountIsAskedForAndMakesTheServerId) {
    const wire::WireServer service({Answering(200, GetParam().answer)});
    ASSERT_TRUE(Ask(service)) << seams::LogDump();
    EXPECT_THAT(service.ReceivedText(), testing::StartsWith(GetParam().request));
    EXPECT_THAT(service.ReceivedText(), HasSubstr("Authorization: Bearer canary-access\r\n"));
    EXPECT_EQ(Id(), std::string(GetParam().protocol) + "://amy@example.com");
    Json::Value out;
    ASSERT_TRUE(server->CreateJsonObj(kUser, VFS_CONFIG_SERVER, out, false));
    EXPECT_EQ(out["email"], "amy@example.com");
    EXPECT_EQ(out["alias"], "amy@example.com");
    EXPECT_EQ(out["account_info"], GetParam().kept);
}

TEST_P(CloudAccounts, OfflineWithoutAStoredEmailTheServerIdIsTheBareScheme) {
    ASSERT_TRUE(server->Load(kUser, VFS_CONFIG_SERVER, conf, false, false));
    EXPECT_EQ(Id(), std::string(GetParam().protocol) + "://");
}

TEST_P(CloudAccounts, AnAnswerWithoutTheAccountIsRefusedWhereItIsNeeded) {
    const wire::WireServer service({Answering(200, GetParam().without_name)});
    const bool needed = std::string(GetParam().protocol) != "dropbox";
    EXPECT_EQ(Ask(service), !needed);
    EXPECT_EQ(seams::LoggedPart("GetAccountInfo failed, "), needed) << seams::LogDump();
    EXPECT_EQ(GetError() == VFS_ERR_CLOUD_FAILED, needed);
}

TEST_P(CloudAccounts, ARefusalOfTheServiceReachesTheCellAndTheLog) {
    const wire::WireServer service({Answering(403, "{}")});
    EXPECT_FALSE(Ask(service));
    EXPECT_NE(GetError(), VFS_ERR_NONE);
    EXPECT_NE(GetError(), VFS_ERR_FAILED);
    EXPECT_TRUE(seams::LoggedPart("GetAccountInfo failed, {")) << seams::LogDump();
}

TEST_P(CloudAccounts, AnswersOfWrongTypesAreRefused) {
    for (const char* answer : {"[]", "7", "\"text\"", R"({"email":{}})", R"({"user":7})",
                               R"({"user":{"emailAddress":[]}})", R"({"emails":[]})"}) {
        SCOPED_TRACE(answer);
        const wire::WireServer service({Answering(200, answer)});
        bool loaded = true;
        EXPECT_NO_THROW(loaded = Ask(service));
        if (loaded) {
            EXPECT_EQ(Id(), std::string(GetParam().protocol) + "://") << "no account is told";
        }
    }
}

INSTANTIATE_TEST_SUITE_P(Services, CloudAccounts, testing::ValuesIn(kServices),
                         [](const auto& service) { return std::string(service.param.protocol); });

}  // namespace
}  // namespace ZYROVFS::Server
