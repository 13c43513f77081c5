// The check of a certificate as a conversation: credentials, paths, redirects, and all that may
// happen to it on its way.
#include "support/shortened_waits.h"
#include "unit/mount/ssl_fixture.h"

namespace ZYROVFS {
namespace {

class Conversation : public testing::Test {
  protected:
    void SetUp() override {
        file_ = WriteFile("saved.pem", identity_.certificate);
        options_.identity = identity_;
    }

    Answer Ask(const std::string& path = "/", const char* user = nullptr,
               const char* password = nullptr) {
        tls::TlsServer server(options_);
        const Answer answer = Verify(server.Url(path), file_, user, password);
        requests_ = server.Requests();
        return answer;
    }

    tls::Identity identity_ = tls::Make({});
    tls::ServerOptions options_;
    std::string file_;
    std::vector<tls::Request> requests_;
};

TEST_F(Conversation, SendsUserAndPasswordAsTheyAre) {
    EXPECT_TRUE(Ask("/dav/", "dom\\am\xC3\xA9lie b@x%41", "p:w / \xE2\x82\xAC").ok);
    ASSERT_EQ(requests_.size(), 1U);
    EXPECT_EQ(requests_[0].headers["authorization"],
              tls::Basic("dom\\am\xC3\xA9lie b@x%41", "p:w / \xE2\x82\xAC"));
    EXPECT_EQ(requests_[0].method, "GET");
}

TEST_F(Conversation, SendsNoCredentialsWhenThereAreNone) {
    EXPECT_TRUE(Ask("/", "", "").ok);
    ASSERT_EQ(requests_.size(), 1U);
    EXPECT_EQ(requests_[0].headers.count("authorization"), 0U);
}

TEST_F(Conversation, AsksForTheEscapedPath) {
    EXPECT_TRUE(Ask("/my files/\xC3\xA9/50%").ok);
    ASSERT_EQ(requests_.size(), 1U);
    EXPECT_EQ(requests_[0].target, "/my%20files/%C3%A9/50%25");
}

TEST_F(Conversation, WhatATrustedServerAnswersIsNoMatterOfTrust) {
    for (const int status : {400, 401, 403, 404, 405, 500, 501, 503}) {
        options_.answer = [status](const tls::Request&) { return tls::Response{status, {}, ""}; };
        const Answer answer = Ask("/", "amy", "wrong");
        EXPECT_TRUE(answer.ok) << status << answer;
        EXPECT_EQ(requests_.size(), 1U);
    }
}

TEST_F(Conversation, AnAnswerMakesNoServerTrusted) {
    file_ = WriteFile("saved.pem", tls::Make({}).certificate);
    options_.answer = [](const tls::Request&) { return tls::Response{405, {}, ""}; };
    EXPECT_EQ(Ask().code, VFS_ERR_CERT_UNTRUSTED);
    EXPECT_TRUE(requests_.empty());
}

TEST_F(Conversation, FollowsARedirect) {
    options_.answer = [](const tls::Request& request) {
        return request.target == "/" ? tls::Response{302, {{"Location", "/dav/"}}, ""}
                                     : tls::Response();
    };
    EXPECT_TRUE(Ask().ok);
    ASSERT_EQ(requests_.size(), 2U);
    EXPECT_EQ(requests_[1].target, "/dav/");
}

TEST_F(Conversation, ChecksTheServerBehindARedirectAsWell) {
    const tls::TlsServer other(tls::Make({}));
    const std::string there = other.Url();
    options_.answer = [there](const tls::Request&) {
        return tls::Response{301, {{"Location", there}}, ""};
    };
    EXPECT_EQ(Ask().code, VFS_ERR_CERT_UNTRUSTED);
    EXPECT_TRUE(other.Requests().empty());
}

TEST_F(Conversation, ARedirectInCirclesEnds) {
    options_.answer = [](const tls::Request&) {
        return tls::Response{302, {{"Location", "/again"}}, ""};
    };
    EXPECT_EQ(Ask().code, VFS_ERR_FAILED);
}

TEST_F(Conversation, ThrowsALargeBodyAway) {
    options_.answer = [](const tls::Request&) {
        return tls::Response{200, {}, std::string(3000000, 'x')};
    };
    EXPECT_TRUE(Ask().ok);
}

TEST_F(Conversation, ARefusedPortIsAnUnreachableHost) {
    const std::string url = "https://localhost:" + std::to_string(tls::RefusedPort()) + "/";
    const Answer answer = Verify(url, file_);
    EXPECT_EQ(answer.code, VFS_ERR_HOST_UNREACHABLE) << answer;
    EXPECT_TRUE(answer.Logged(url + ", code=7, err=")) << answer;
    EXPECT_TRUE(answer.detail.isNull());
}

TEST_F(Conversation, ANameThatNobodyKnowsIsAnUnreachableHost) {
    const Answer answer = Verify("https://no-such-host.invalid/", file_);
    EXPECT_EQ(answer.code, VFS_ERR_HOST_UNREACHABLE) << answer;
}

TEST_F(Conversation, AServerThatHangsUpIsAnUnreachableHost) {
    options_.manner = tls::Manner::kCloseAtOnce;
    const Answer answer = Ask();
    EXPECT_EQ(answer.code, VFS_ERR_HOST_UNREACHABLE) << answer;
}

TEST_F(Conversation, AServerThatSpeaksNoTlsIsAnUnreachableHost) {
    options_.identity = {};
    const tls::TlsServer server(options_);
    const Answer answer = Verify("https://localhost:" + std::to_string(server.Port()) + "/", file_);
    EXPECT_EQ(answer.code, VFS_ERR_HOST_UNREACHABLE) << answer;
}

TEST_F(Conversation, AServerThatIsSilentIsAnUnreachableHost) {
    shortened_waits = true;
    options_.manner = tls::Manner::kSilent;
    const Answer answer = Ask();
    shortened_waits = false;
    EXPECT_EQ(answer.code, VFS_ERR_HOST_UNREACHABLE) << answer;
    EXPECT_TRUE(answer.Logged(", code=28, err=")) << answer;
}

TEST_F(Conversation, AServerThatGoesAwayInsteadOfAnsweringIsAFailure) {
    options_.manner = tls::Manner::kCloseAfterHandshake;
    EXPECT_EQ(Ask().code, VFS_ERR_FAILED);
}

TEST_F(Conversation, UrlsThatAreNoneAreAFailure) {
    for (const std::string url : {"", "https://", "https://[", "nonsense", "gopherx://h/"}) {
        const Answer answer = Verify(url, file_);
        EXPECT_TRUE(answer.finished && !answer.ok) << url << answer;
        EXPECT_NE(answer.code, VFS_ERR_NONE) << url << answer;
    }
}

TEST_F(Conversation, AUrlWithoutEndIsAFailure) {
    const Answer answer = Verify("https://localhost/" + std::string(9000000, ' '), file_);
    EXPECT_EQ(answer.code, VFS_ERR_FAILED);
}

}  // namespace
}  // namespace ZYROVFS
