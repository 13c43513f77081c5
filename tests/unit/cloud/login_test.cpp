// Logging in, through the consent page of each simulated service to stored tokens.
#include <gmock/gmock.h>

#include <memory>

#include "core/json.h"
#include "core/paths.h"
#include "support/cloudsim/cloudsim.h"
#include "support/cloudsim_client.h"
#include "support/profiles.h"
#include "support/seams.h"
#include "support/wire_server.h"
#include "zyrovfs/cloud_utils.h"

namespace ZYROCloud {
namespace {

using namespace ZYROVFS;
using testing::HasSubstr;
using testing::Not;
using Utils::BeginLogin;
using Utils::FinishLogin;
using Utils::Login;
using Utils::LoginRefusal;

constexpr const char* kRedirect = "http://localhost:48790/";

/** A service, under the names that the service configuration has for its addresses. */
struct Simulated {
    std::string name;
    std::unique_ptr<cloudsim::Service> service;
    Json::Value hosts;
};

template <typename Service>
Simulated Make(const std::string& name, std::string (Service::*page)() const, const char* page_name,
               std::string (Service::*token)() const, const char* token_name) {
    auto service = std::make_unique<Service>();
    Simulated made{name, nullptr, Json::objectValue};
    made.hosts[page_name] = (*service.*page)();
    made.hosts[token_name] = (*service.*token)();
    made.service = std::move(service);
    return made;
}

Simulated MakeService(const std::string& name) {
    using namespace cloudsim;
    return name == "box"       ? Make<BoxService>(name, &BoxService::AccountHost, "BoxAccountHost",
                                            &BoxService::ApiHost, "BoxApiHost")
           : name == "dropbox" ? Make<Dropbox>(name, &Dropbox::WebHost, "DropboxWebHost",
                                               &Dropbox::ApiHost, "DropboxApiHost")
           : name == "google"  ? Make<GDrive>(name, &GDrive::AccountsHost, "GoogleAccountsHost",
                                             &GDrive::AccountsHost, "GoogleAccountsHost")
                               : Make<OneDrive>(name, &OneDrive::LoginHost, "LiveLoginHost",
                                               &OneDrive::LoginHost, "LiveLoginHost");
}

class LoginAt : public profiles::ProfileTest, public testing::WithParamInterface<const char*> {
  protected:
    void SetUp() override {
        ProfileTest::SetUp();
        simulated_ = MakeService(GetParam());
        simulated_.service->AddClient("mine", "s3cret");
        amy_ = &simulated_.service->AddAccount("amy@example.com", "Amy");
        std::filesystem::create_directories(paths::kConfigRoot);
        Json::Value document;
        document["hosts"] = simulated_.hosts;
        ASSERT_TRUE(json::toFile(document, paths::kServiceConfig, 0640));
        ASSERT_TRUE(Utils::AddClient(GetParam(), "mine", "s3cret"));
    }
    void TearDown() override {
        // Neither the secret nor what proves a login may be logged.
        EXPECT_FALSE(seams::LoggedPart("s3cret")) << seams::LogDump();
        if (!login_.verifier.empty()) {
            EXPECT_FALSE(seams::LoggedPart(login_.verifier)) << seams::LogDump();
        }
        std::filesystem::remove(paths::kServiceConfig);
    }

    bool Begin() { return BeginLogin(GetParam(), "", kRedirect, login_); }
    /** Where the service sends the browser of a person who presses this button. */
    std::string Press(const std::string& decision) {
        EXPECT_THAT(browser_.Get(login_.address).body, HasSubstr("<option>amy@example.com"));
        const cloudsim::Got got =
            browser_.Send("POST", login_.address, "account=amy%40example.com&decision=" + decision);
        EXPECT_EQ(302, got.status) << got.body;
        const size_t begin = got.head.find("Location: ") + 10;
        return got.head.substr(begin, got.head.find("\r\n", begin) - begin);
    }
    bool Finish(const std::string& answer) {
        return FinishLogin(login_, answer, profile_, refusal_);
    }

    Simulated simulated_;
    cloudsim::Account* amy_ = nullptr;
    cloudsim::Client browser_;
    Login login_;
    Json::Value profile_;
    LoginRefusal refusal_;
};

TEST_P(LoginAt, AConsentGivesTheTokensOfAProfile) {
    ASSERT_TRUE(Begin()) << seams::LogDump();
    const std::string answer = Press("allow");
    EXPECT_EQ(0U, answer.find(std::string(kRedirect) + "?"));
    ASSERT_TRUE(Finish(answer)) << seams::LogDump();
    EXPECT_EQ(GetParam(), profile_["protocol"].asString());
    EXPECT_EQ("mine", profile_["client_id"].asString());
    EXPECT_EQ(amy_->LastTokens().access_token, profile_["access_token"].asString());
    EXPECT_GT(std::stoi(profile_["expires_in"].asString()), 0);
    const bool renews = std::string(GetParam()) != "dropbox";
    EXPECT_EQ(renews ? amy_->LastTokens().refresh_token : "", profile_["refresh_token"].asString());
}

TEST_P(LoginAt, WhatFollowsTheQuestionMarkIsEnough) {
    ASSERT_TRUE(Begin());
    const std::string answer = Press("allow");
    EXPECT_TRUE(Finish(answer.substr(answer.find('?') + 1) + "#_=_")) << seams::LogDump();
}

TEST_P(LoginAt, ARefusalOfThePersonIsAccessDenied) {
    ASSERT_TRUE(Begin());
    EXPECT_FALSE(Finish(Press("deny")));
    EXPECT_EQ(VFS_ERR_ACCESS_DENIED, GetError());
    EXPECT_EQ("access_denied", refusal_.error);
    EXPECT_TRUE(profile_.empty());
}

TEST_P(LoginAt, TheAnswerToAnotherLoginIsRefusedAndNothingSent) {
    ASSERT_TRUE(Begin());
    const std::string first = Press("allow");
    Login other;
    ASSERT_TRUE(BeginLogin(GetParam(), "mine", kRedirect, other));
    EXPECT_NE(login_.state, other.state);
    EXPECT_NE(login_.verifier, other.verifier);
    const size_t before = simulated_.service->Journal().All().size();
    EXPECT_FALSE(FinishLogin(other, first, profile_, refusal_));
    EXPECT_EQ(VFS_ERR_BAD_PARAM, GetError());
    for (const char* nothing : {"", "?", "state=", "code=4%2Fx", "http://localhost/"}) {
        EXPECT_FALSE(Finish(nothing)) << nothing;
        EXPECT_EQ(VFS_ERR_BAD_PARAM, GetError()) << nothing;
    }
    EXPECT_FALSE(Finish("?state=" + login_.state));
    EXPECT_EQ(VFS_ERR_BAD_PARAM, GetError());
    EXPECT_EQ(before, simulated_.service->Journal().All().size());
}

TEST_P(LoginAt, ACodeIsGoodOnceAndForItsOwnVerifierAlone) {
    ASSERT_TRUE(Begin());
    const std::string answer = Press("allow");
    Login thief = login_;
    thief.verifier = "a-verifier-that-somebody-else-has-made-up-xx";
    EXPECT_FALSE(FinishLogin(thief, answer, profile_, refusal_));
    EXPECT_NE(VFS_ERR_NONE, GetError());
    EXPECT_EQ("invalid_grant", refusal_.error);
    EXPECT_FALSE(Finish(answer)) << "the code was spent";
    ASSERT_TRUE(Begin());
    const std::string again = Press("allow");
    EXPECT_TRUE(Finish(again));
    EXPECT_FALSE(Finish(again));
    EXPECT_TRUE(profile_.empty());
}

TEST_P(LoginAt, AWrongSecretIsToldInTheServicesWords) {
    ASSERT_TRUE(Utils::AddClient(GetParam(), "mine", "another"));
    ASSERT_TRUE(Begin());
    EXPECT_FALSE(Finish(Press("allow")));
    EXPECT_EQ("invalid_client", refusal_.error);
    EXPECT_NE("", refusal_.description);
    EXPECT_NE(VFS_ERR_NONE, GetError());
}

TEST_P(LoginAt, AServiceThatIsGoneIsAFailureWithACode) {
    ASSERT_TRUE(Begin());
    const std::string answer = Press("allow");
    simulated_.service.reset();
    EXPECT_FALSE(Finish(answer));
    EXPECT_NE(VFS_ERR_NONE, GetError());
    EXPECT_NE(VFS_ERR_BAD_PARAM, GetError());
}

TEST_P(LoginAt, WhatIsNoAnswerWithTokensFails) {
    for (const char* body :
         {"", "[]", "null", "{}", "not JSON", R"({"access_token":7,"expires_in":1})",
          R"({"access_token":"","refresh_token":"r","expires_in":1})",
          R"({"access_token":{"a":1},"refresh_token":"r","expires_in":1})"}) {
        const wire::WireServer server({{wire::ReadRequest(), wire::Send(wire::Answer(200, body))}});
        Json::Value document;
        ASSERT_TRUE(json::fromFile(document, paths::kServiceConfig));
        for (const std::string& host : document["hosts"].getMemberNames()) {
            document["hosts"][host] = server.Url("");
        }
        ASSERT_TRUE(json::toFile(document, paths::kServiceConfig, 0640));
        ASSERT_TRUE(Begin());
        EXPECT_FALSE(Finish("code=x&state=" + login_.state)) << body;
        EXPECT_EQ(VFS_ERR_CLOUD_FAILED, GetError()) << body;
        EXPECT_TRUE(profile_.empty()) << body;
    }
}

TEST_P(LoginAt, TheAddressAsksForWhatItsServiceNeeds) {
    ASSERT_TRUE(Begin());
    EXPECT_THAT(login_.address, HasSubstr("redirect_uri=http%3A%2F%2Flocalhost%3A48790%2F"));
    EXPECT_THAT(login_.address, HasSubstr("&code_challenge_method=S256"));
    EXPECT_THAT(login_.address, Not(HasSubstr(login_.verifier)));
    if (std::string(GetParam()) == "google") {
        EXPECT_THAT(login_.address, HasSubstr("&access_type=offline&prompt=consent"));
    }
}

TEST_P(LoginAt, AClientThatIsNotNamedMustBeTheOnlyOne) {
    ASSERT_TRUE(Utils::AddClient(GetParam(), "second", "s3cret"));
    const bool fixed = std::string(GetParam()) == "onedrive";
    EXPECT_EQ(fixed, Begin());
    EXPECT_EQ(!fixed, BeginLogin(GetParam(), "second", kRedirect, login_));
    EXPECT_FALSE(BeginLogin(GetParam(), "third", kRedirect, login_));
    EXPECT_EQ(VFS_ERR_BAD_PARAM, GetError());
}

INSTANTIATE_TEST_SUITE_P(Services, LoginAt, testing::Values("box", "dropbox", "google", "onedrive"),
                         [](const auto& service) { return std::string(service.param); });

TEST(LoginParameters, UnknownServicesAndEmptyAddressesAreRefused) {
    Login login;
    EXPECT_FALSE(BeginLogin("ftp", "", kRedirect, login));
    EXPECT_EQ(VFS_ERR_BAD_PARAM, GetError());
    EXPECT_FALSE(BeginLogin("box", "", "", login));
    EXPECT_EQ(VFS_ERR_BAD_PARAM, GetError());
    Json::Value profile;
    LoginRefusal refusal;
    EXPECT_FALSE(FinishLogin(login, "code=1&state=2", profile, refusal));
    EXPECT_EQ(VFS_ERR_BAD_PARAM, GetError());
}

}  // namespace
}  // namespace ZYROCloud
