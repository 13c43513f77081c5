#include "cloud/service_config.h"

#include <gmock/gmock.h>
#include <sys/stat.h>
#include <unistd.h>

#include "core/json.h"
#include "core/paths.h"
#include "support/profiles.h"
#include "support/seams.h"
#include "zyrovfs/cloud_utils.h"

namespace ZYROCloud {
namespace {

using namespace ZYROVFS;
namespace fs = std::filesystem;

/** Where each address is asked, and what it is without a document. */
struct Address {
    const char* name;
    std::string (*ask)();
    const char* standard;
};

const Address kAddresses[] = {
    {"BoxApiHost", BoxApiHost, "https://api.box.com"},
    {"BoxUploadHost", BoxUploadHost, "https://upload.box.com"},
    {"DropboxApiHost", DropboxApiHost, "https://api.dropboxapi.com"},
    {"DropboxContentHost", DropboxContentHost, "https://content.dropboxapi.com"},
    {"GoogleApiHost", GoogleApiHost, "https://www.googleapis.com"},
    {"GoogleAccountsHost", GoogleAccountsHost, "https://accounts.google.com"},
    {"LiveApiHost", LiveApiHost, "https://apis.live.net"},
    {"LiveLoginHost", LiveLoginHost, "https://login.live.com"},
    {"LiveStorageDomain", LiveStorageDomain, ".users.storage.live.com"},
};

class ServiceConfig : public testing::Test {
  protected:
    void SetUp() override {
        fs::remove(paths::kServiceConfig);
        seams::Reset();
    }
    static void Put(const std::string& text, mode_t mode = 0640) {
        profiles::PutText(paths::kServiceConfig, text);
        chmod(paths::kServiceConfig, mode);
    }
};

TEST_F(ServiceConfig, WithoutADocumentTheAddressesAreThePublicOnes) {
    for (const Address& address : kAddresses) {
        EXPECT_EQ(address.ask(), address.standard) << address.name;
    }
    EXPECT_EQ(seams::LogDump(), "");
}

TEST_F(ServiceConfig, EachAddressHasItsOwnNameInTheDocument) {
    for (const Address& address : kAddresses) {
        const bool domain = address.standard[0] == '.';
        Json::Value document;
        document["hosts"][address.name] = domain ? ".localhost:81/" : "http://127.0.0.1:8081/";
        Put(json::toString(document));
        for (const Address& other : kAddresses) {
            const std::string own = domain ? ".localhost:81" : "http://127.0.0.1:8081";
            EXPECT_EQ(other.ask(), &other == &address ? own : other.standard) << address.name;
        }
    }
    EXPECT_EQ(seams::LogDump(), "");
}

TEST_F(ServiceConfig, WhatIsNoAddressIsIgnoredWithALogLine) {
    for (const char* wrong :
         {"7", "null_", "[]", "{}", "\"\"", "\"/\"", "\"ftp://x\"", "\"https://\"", "\"https:///\"",
          "\"api.box.com\"", "\"https://a b\"", "\"https://a\\nb\"", "\"https://a/b\"",
          "\"https://a?b\"", "\"https://a#b\"", "\"https://me:pw@a\"", "\"https://a\\u0000b\"",
          "\"https://gr\xc3\xbc\xc3\x9f\""}) {
        seams::Reset();
        const bool none = std::string(wrong) == "null_";
        Put(std::string("{\"hosts\":{\"BoxApiHost\":") + (none ? "true" : wrong) + "}}");
        EXPECT_EQ(BoxApiHost(), "https://api.box.com") << wrong;
        EXPECT_TRUE(
            seams::Logged("Ignored BoxApiHost of /usr/zyro/etc/zyrovfs/cloud.conf, it is "
                          "no address"))
            << wrong << seams::LogDump();
        EXPECT_EQ(BoxUploadHost(), "https://upload.box.com");
    }
}

TEST_F(ServiceConfig, AStorageDomainBeginsWithADot) {
    for (const char* wrong : {"storage.live.com", ".", "./x", ".:80", ".a b", "", ".a@b", ".a/b"}) {
        seams::Reset();
        Json::Value document;
        document["hosts"]["LiveStorageDomain"] = wrong;
        Put(json::toString(document));
        EXPECT_EQ(LiveStorageDomain(), ".users.storage.live.com") << wrong;
        EXPECT_TRUE(seams::LoggedPart("Ignored LiveStorageDomain")) << wrong;
    }
}

TEST_F(ServiceConfig, HostsThatAreNoObjectAreIgnoredWithALogLine) {
    for (const char* wrong : {"[]", "\"x\"", "3"}) {
        seams::Reset();
        Put(std::string("{\"hosts\":") + wrong + "}");
        EXPECT_EQ(GoogleApiHost(), "https://www.googleapis.com");
        EXPECT_TRUE(seams::LoggedPart("Ignored GoogleApiHost")) << wrong;
    }
}

TEST_F(ServiceConfig, ADocumentThatOthersMayWriteIsIgnoredWithALogLine) {
    const std::string text =
        R"({"hosts":{"BoxApiHost":"http://evil"},"clients":{"box":{"a":"b"}}})";
    std::string secret;
    for (const mode_t mode : {0660, 0642, 0666, 0620}) {
        seams::Reset();
        Put(text, mode);
        EXPECT_EQ(BoxApiHost(), "https://api.box.com");
        EXPECT_FALSE(FindClientSecret("box", "a", secret));
        EXPECT_EQ(FixedClientId("box"), "");
        EXPECT_TRUE(
            seams::Logged("Ignored /usr/zyro/etc/zyrovfs/cloud.conf, others than root may "
                          "write it"))
            << seams::LogDump();
    }
    Put(text, 0640);
    ASSERT_EQ(chown(paths::kServiceConfig, 1234, 0), 0);
    EXPECT_EQ(BoxApiHost(), "https://api.box.com");
    ASSERT_EQ(chown(paths::kServiceConfig, 0, 100), 0);
    EXPECT_EQ(BoxApiHost(), "http://evil");
}

TEST_F(ServiceConfig, OnlyARegularFileIsRead) {
    fs::remove(paths::kServiceConfig);
    profiles::PutText("/tmp/elsewhere.conf", R"({"hosts":{"BoxApiHost":"http://evil"}})");
    fs::create_symlink("/tmp/elsewhere.conf", paths::kServiceConfig);
    EXPECT_EQ(BoxApiHost(), "https://api.box.com");
    EXPECT_TRUE(seams::LoggedPart("Ignored /usr/zyro/etc/zyrovfs/cloud.conf"));
    fs::remove(paths::kServiceConfig);
    ASSERT_EQ(mkfifo(paths::kServiceConfig, 0640), 0);
    seams::Reset();
    EXPECT_EQ(BoxApiHost(), "https://api.box.com");
    EXPECT_TRUE(seams::LoggedPart("Ignored /usr/zyro/etc/zyrovfs/cloud.conf"));
}

TEST_F(ServiceConfig, ADocumentThatIsNoJsonObjectIsIgnoredWithALogLine) {
    for (const char* wrong : {"", "{", "[]", "7", "\"x\"", "{} {}"}) {
        seams::Reset();
        Put(wrong);
        EXPECT_EQ(BoxApiHost(), "https://api.box.com");
        EXPECT_EQ(FixedClientId("box"), "");
        EXPECT_TRUE(seams::LoggedPart("Ignored /usr/zyro/etc/zyrovfs/cloud.conf")) << wrong;
    }
}

TEST_F(ServiceConfig, ASecretIsFoundByServiceAndClient) {
    Put(R"({"clients":{"box":{"b":"2","a":"1"},"google":7,"onedrive":{"x":{}}}})");
    std::string secret = "before";
    EXPECT_TRUE(FindClientSecret("box", "a", secret));
    EXPECT_EQ(secret, "1");
    EXPECT_FALSE(FindClientSecret("box", "c", secret));
    EXPECT_FALSE(FindClientSecret("google", "a", secret));
    EXPECT_FALSE(FindClientSecret("onedrive", "x", secret));
    EXPECT_FALSE(FindClientSecret("", "", secret));
    EXPECT_EQ(secret, "1");
    EXPECT_EQ(FixedClientId("box"), "a");
    EXPECT_EQ(FixedClientId("google"), "");
    EXPECT_EQ(FixedClientId("dropbox"), "");
}

}  // namespace
}  // namespace ZYROCloud
