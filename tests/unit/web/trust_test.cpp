// Servers whose identity a person has to decide about.
#include "trust.h"

#include <gtest/gtest.h>
#include <zyrovfs/error.h>

#include "failure.h"

namespace {

using namespace ZYROVFS;
using web::DescribeTrust;
using web::WithTrust;

Json::Value HostKey(const std::string& fingerprint) {
    Json::Value detail;
    detail["host"] = "nas";
    detail["fingerprint"] = fingerprint;
    return detail;
}

Json::Value QuestionOf(const std::string& accept, const std::function<bool(bool)>& operation) {
    try {
        WithTrust("Not connected", "nas", accept, operation);
    } catch (const web::Failure& failure) {
        return failure.Describe();
    }
    return {};
}

TEST(WebTrust, AnUnknownHostKeyIsShownWithItsFingerprint) {
    const Json::Value question =
        DescribeTrust(VFS_ERR_IDENTITY_QUESTION, "nas:2222", HostKey("SHA256:abc"));
    EXPECT_EQ(question["kind"], "host_key");
    EXPECT_EQ(question["host"], "nas");
    EXPECT_EQ(question["fingerprint"], "SHA256:abc");
    EXPECT_FALSE(question["changed"].asBool());
    EXPECT_FALSE(question["token"].asString().empty());
    EXPECT_TRUE(DescribeTrust(VFS_ERR_IDENTITY_WRONG, "nas", Json::Value())["changed"].asBool());
    EXPECT_TRUE(DescribeTrust(VFS_ERR_WRONG_PASSWORD, "nas", HostKey("x")).isNull());
}

TEST(WebTrust, ATokenStandsForExactlyWhatWasShown) {
    const auto token = [](__tag_vfs_err_ code, const std::string& host, const Json::Value& detail) {
        return DescribeTrust(code, host, detail)["token"].asString();
    };
    const std::string one = token(VFS_ERR_IDENTITY_QUESTION, "nas", HostKey("a"));
    EXPECT_EQ(one, token(VFS_ERR_IDENTITY_QUESTION, "nas", HostKey("a")));
    EXPECT_NE(one, token(VFS_ERR_IDENTITY_QUESTION, "nas", HostKey("b")));
    EXPECT_NE(one, token(VFS_ERR_IDENTITY_WRONG, "nas", HostKey("a")));
    EXPECT_NE(token(VFS_ERR_CERT_UNTRUSTED, "nas", Json::Value()),
              token(VFS_ERR_CERT_UNTRUSTED, "other", Json::Value()));
}

TEST(WebTrust, OnlyWhatThePersonHasSeenIsAccepted) {
    std::vector<bool> forced;
    std::string shown = "first";
    const auto server = [&](bool force) {
        forced.push_back(force);
        VFSSetErrEx(VFS_ERR_IDENTITY_QUESTION, "x", 1);
        VFSSetJson(HostKey(shown));
        return force;
    };
    const Json::Value asked = QuestionOf("", server);
    EXPECT_EQ(asked["status"], 409);
    EXPECT_EQ(asked["trust"]["fingerprint"], "first");
    EXPECT_EQ(asked["name"], "VFS_ERR_IDENTITY_QUESTION");
    const std::string token = asked["trust"]["token"].asString();
    shown = "another";
    EXPECT_EQ(QuestionOf(token, server)["trust"]["fingerprint"], "another");
    EXPECT_EQ(forced, (std::vector<bool>{false, false}));
    shown = "first";
    EXPECT_TRUE(QuestionOf(token, server).isNull());
    EXPECT_EQ(forced, (std::vector<bool>{false, false, false, true}));
}

TEST(WebTrust, AnotherFailureIsNoQuestion) {
    const Json::Value refused = QuestionOf("token", [](bool) {
        VFSSetErrEx(VFS_ERR_WRONG_PASSWORD, "x", 1);
        return false;
    });
    EXPECT_EQ(refused["status"], 403);
    EXPECT_FALSE(refused.isMember("trust"));
}

}  // namespace
