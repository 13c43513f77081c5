// A Box profile whose account is asked from the (simulated) service.
#include "server/server_box.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <fstream>

#include "core/paths.h"
#include "support/cloudsim/cloudsim.h"
#include "support/profiles.h"
#include "support/seams.h"
#include "zyrovfs/cloud_utils.h"

namespace ZYROVFS::Server {
namespace {

using cloudsim::Fault;
using profiles::kUser;
using testing::IsEmpty;

cloudsim::BoxOptions AtLoopback() {
    cloudsim::BoxOptions options;
    options.api_name = options.upload_name = options.download_name = "127.0.0.1";
    return options;
}

class BoxAccount : public profiles::ProfileTest {
  protected:
    void SetUp() override {
        ProfileTest::SetUp();
        seams::Reset();
        profiles::PutText(paths::kServiceConfig, R"({"hosts":{"BoxApiHost":")" + box.ApiHost() +
                                                     R"(","BoxUploadHost":")" + box.UploadHost() +
                                                     "\"}}");
        chmod(paths::kServiceConfig, 0640);
        ASSERT_TRUE(ZYROCloud::Utils::AddClient("box", "client", "secret"));
        profiles::PutText("/usr/share/gvfs/mounts/box.mount", "[Mount]\nProtocol=box\nName=Box\n");
        const cloudsim::Tokens tokens = amy.IssueTokens();
        conf["protocol"] = "box";
        conf["alias"] = "";
        conf["client_id"] = "client";
        conf["access_token"] = tokens.access_token;
        conf["refresh_token"] = tokens.refresh_token;
        conf["expires_in"] = "3600";
    }
    void TearDown() override { EXPECT_THAT(box.UnusedFaults(), IsEmpty()); }

    bool Load() {
        ResetError();
        return server.Load(kUser, VFS_CONFIG_SERVER, conf, false, true);
    }
    void ExpectFailure(__tag_vfs_err_ code) {
        EXPECT_NO_THROW(EXPECT_FALSE(Load()));
        EXPECT_EQ(GetError(), code);
        EXPECT_FALSE(seams::LoggedPart(conf["access_token"].asString())) << seams::LogDump();
        EXPECT_FALSE(seams::LoggedPart(conf["refresh_token"].asString())) << seams::LogDump();
    }

    cloudsim::BoxService box{AtLoopback()};
    cloudsim::Account& amy = box.AddAccount("amy@example.com", "Amy");
    Json::Value conf;
    BoxServer server;
};

TEST_F(BoxAccount, EmailAndAccountComeFromTheService) {
    ASSERT_TRUE(Load()) << seams::LogDump();
    std::string id;
    EXPECT_TRUE(server.GetServerID(id));
    EXPECT_EQ(id, "box://amy@example.com");
    Json::Value out;
    ASSERT_TRUE(server.CreateJsonObj(kUser, VFS_CONFIG_SERVER, out, false));
    EXPECT_EQ(out["email"], "amy@example.com");
    EXPECT_EQ(out["alias"], "amy@example.com");
    Json::Value account;
    ASSERT_TRUE(json::fromString(account, out["account_info"].asString()));
    EXPECT_EQ(account["login"], "amy@example.com");
    EXPECT_EQ(account["name"], "Amy");
    EXPECT_EQ(box.Journal().Count("GET", "/2.0/users/me"), 1U);
}

TEST_F(BoxAccount, RefusalOfTheServiceReachesTheCellAndTheLog) {
    box.AddFault(Fault::On("GET", "/2.0/users/me").Answer(403, R"({"code":"access_denied"})"));
    ExpectFailure(VFS_ERR_FORBIDDEN);
    EXPECT_TRUE(seams::LoggedPart("GetAccountInfo failed, {")) << seams::LogDump();
}

TEST_F(BoxAccount, TokensThatAreGoodForNothingAreUnauthorized) {
    conf["access_token"] = "not a token";
    conf["refresh_token"] = "no token either";
    ExpectFailure(VFS_ERR_UNAUTHORIZED);
}

TEST_F(BoxAccount, AnswersOfWrongTypesAreRefused) {
    for (const char* answer : {"[]", "7", "\"text\"", R"({"login":{}})", R"({"login":[]})"}) {
        SCOPED_TRACE(answer);
        box.AddFault(Fault::On("GET", "/2.0/users/me").Answer(200, answer));
        ExpectFailure(VFS_ERR_CLOUD_FAILED);
    }
}

TEST_F(BoxAccount, AnAnswerWithoutAnEmailGivesTheBareScheme) {
    box.AddFault(Fault::On("GET", "/2.0/users/me").Answer(200, "{}"));
    ASSERT_TRUE(Load());
    std::string id;
    EXPECT_TRUE(server.GetServerID(id));
    EXPECT_EQ(id, "box://");
}

TEST_F(BoxAccount, TokensRenewedOnTheWayAreWhatIsStored) {
    conf.removeMember("expires_in");
    conf["expire_time"] = "1000000000";
    ASSERT_TRUE(Load()) << seams::LogDump();
    Json::Value out;
    ASSERT_TRUE(server.CreateJsonObj(kUser, VFS_CONFIG_SERVER, out, false));
    EXPECT_EQ(out["access_token"], amy.LastTokens().access_token);
    EXPECT_EQ(out["refresh_token"], amy.LastTokens().refresh_token);
    EXPECT_NE(out["access_token"], conf["access_token"]);
    EXPECT_NEAR(std::stoll(out["expire_time"].asString()), time(nullptr) + 3600, 60);
    EXPECT_EQ(box.Journal().Count("POST", "/oauth2/token"), 1U);
}

TEST_F(BoxAccount, AProfileIsAddedReadAndChanged) {
    std::string id;
    Json::Value stored;
    ASSERT_TRUE(Add(kUser, VFS_CONFIG_SERVER, id, conf, false, stored)) << seams::LogDump();
    EXPECT_EQ(id, "box://amy@example.com");
    EXPECT_FALSE(stored.isMember("expires_in"));
    EXPECT_FALSE(stored.isMember("server_id"));
    EXPECT_NE(stored["access_token"], conf["access_token"]);
    Json::Value read;
    ASSERT_TRUE(Get(kUser, VFS_CONFIG_SERVER, id.c_str(), true, false, read)) << seams::LogDump();
    EXPECT_EQ(read["access_token"], conf["access_token"]);
    EXPECT_EQ(read["refresh_token"], conf["refresh_token"]);
    Json::Value changes;
    changes["alias"] = "My Box";
    ASSERT_TRUE(Set(kUser, VFS_CONFIG_SERVER, id, changes, false)) << seams::LogDump();
    ASSERT_TRUE(Get(kUser, VFS_CONFIG_SERVER, id.c_str(), false, true, read));
    EXPECT_EQ(read["alias"], "My Box");
    EXPECT_FALSE(read.isMember("access_token"));
    EXPECT_EQ(box.Journal().Count("GET", "/2.0/users/me"), 2U) << "Add and the last Get ask";
    EXPECT_TRUE(Delete(kUser, VFS_CONFIG_SERVER, id.c_str()));
    EXPECT_FALSE(profiles::Stored(VFS_CONFIG_SERVER).isMember(id));
}

}  // namespace
}  // namespace ZYROVFS::Server
