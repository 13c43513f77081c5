/**
 * A Box driver before the simulated service, with a profile, a mounted tree and a client of its
 * own. Tokens and secrets must not reach the log, and every fault that a test declares must have
 * happened when it ends.
 */
#ifndef ZYROVFS_TESTS_BOX_FIXTURE_H
#define ZYROVFS_TESTS_BOX_FIXTURE_H

#include <gmock/gmock.h>
#include <zosplatform/error.h>

#include <memory>
#include <string>
#include <vector>

#include "cloud/box/box.h"
#include "core/json.h"
#include "core/paths.h"
#include "http/api_handler.h"
#include "support/cloudsim/cloudsim.h"
#include "support/profiles.h"
#include "support/seams.h"
#include "support/transfer_bytes.h"
#include "support/xattrtree/xattrtree.h"
#include "zyrovfs/cloud_utils.h"

namespace ZYROCloud {

using namespace ZYROVFS;  // NOLINT(google-build-using-namespace)
using cloudsim::Fault;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

inline constexpr const char* kServerId = "box://amy@example.com";

inline Json::Value Object(const std::string& text) {
    Json::Value value;
    EXPECT_TRUE(json::fromString(value, text)) << text;
    return value;
}

/** The text of an array's members under this key. */
inline std::vector<std::string> Each(const Json::Value& items, const char* key) {
    std::vector<std::string> texts;
    for (const Json::Value& item : items) {
        texts.push_back(item[key].asString());
    }
    return texts;
}

class BoxTest : public profiles::ProfileTest {
  protected:
    BoxTest() : amy(service.AddAccount("amy@example.com", "Amy Doe")), root(amy.Root()) {}

    void SetUp() override {
        ProfileTest::SetUp();
        service.AddClient("mine", kSecret);
        Json::Value document;
        document["hosts"]["BoxApiHost"] = service.ApiHost();
        document["hosts"]["BoxUploadHost"] = service.UploadHost();
        std::filesystem::create_directories(paths::kConfigRoot);
        ASSERT_TRUE(json::toFile(document, paths::kServiceConfig, 0640));
        ASSERT_TRUE(Utils::AddClient("box", "mine", kSecret));
        Renew();
        Json::Value connections;
        connections[kServerId] = Stored();
        profiles::Put(profiles::VFS_CONFIG_SERVER, connections);
        connections[kServerId]["path"] = tree.Folder();
        profiles::Put(profiles::VFS_CONFIG_CONNECT, connections);
        seams::Reset();
        YLIBCErrSetEx(0, "test", 1);
    }

    void TearDown() override {
        EXPECT_THAT(service.UnusedFaults(), IsEmpty()) << service.Journal().Text();
        std::vector<std::string> secrets = {kSecret, granted.access_token, granted.refresh_token};
        if (!amy.LastTokens().access_token.empty()) {
            secrets.push_back(amy.LastTokens().access_token);
            secrets.push_back(amy.LastTokens().refresh_token);
        }
        for (const std::string& secret : secrets) {
            EXPECT_FALSE(seams::LoggedPart(secret)) << seams::LogDump();
        }
    }

    /** A driver with fresh tokens, whose life the profile may tell. */
    void Renew(const std::string& expire_time = "") {
        granted = amy.IssueTokens(3600, "mine");
        Json::Value profile;
        profile["access_token"] = granted.access_token;
        profile["refresh_token"] = granted.refresh_token;
        profile["expire_time"] = expire_time;
        profile["client_id"] = "mine";
        profile["server_id"] = kServerId;
        box = std::make_unique<Box>(profiles::kUser, profile);
    }

    /** The profile as it stands in a file. */
    Json::Value Stored() const {
        Json::Value profile;
        profile["protocol"] = "box";
        profile["alias"] = profile["email"] = "amy@example.com";
        profile["account_info"] = "{}";
        profile["client_id"] = "mine";
        profile["expire_time"] = "500";
        profile["path"] = "";
        for (const auto& [key, token] : {std::pair("access_token", granted.access_token),
                                         std::pair("refresh_token", granted.refresh_token)}) {
            char cipher[4096] = "";
            EXPECT_NE(Server::SzEncrypt(token.c_str(), cipher, sizeof cipher), 0);
            profile[key] = cipher;
        }
        return profile;
    }

    /** Makes the mounted tree know what the account has at this path. */
    void Show(const std::string& path) {
        const cloudsim::Item item = amy.Get(amy.Find(path));
        tree.Set(path, "id::file", (item.folder ? "folders/" : "files/") + item.id);
    }

    /** "GET /2.0/users/me" for each request so far. */
    std::vector<std::string> Requests() const {
        std::vector<std::string> lines;
        for (const cloudsim::JournalEntry& entry : service.Journal().All()) {
            lines.push_back(entry.method + " " + entry.Path());
        }
        return lines;
    }
    cloudsim::JournalEntry Last() const { return service.Journal().All().back(); }

    static constexpr const char* kSecret = "secret-of-mine";
    cloudsim::BoxService service;
    cloudsim::Account& amy;
    const std::string root;
    XattrTree tree{"/tmp/box_tree"};
    cloudsim::Tokens granted;
    std::unique_ptr<Box> box;
};

}  // namespace ZYROCloud

#endif
