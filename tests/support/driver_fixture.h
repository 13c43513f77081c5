/**
 * A driver before its simulated service, with a profile, a mounted tree and an OAuth client of its
 * own. Tokens and secrets must not reach the log, and every fault that a test declares must have
 * happened when it ends.
 */
#ifndef ZYROVFS_TESTS_DRIVER_FIXTURE_H
#define ZYROVFS_TESTS_DRIVER_FIXTURE_H

#include <gmock/gmock.h>
#include <zosplatform/error.h>

#include <map>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "core/json.h"
#include "core/paths.h"
#include "http/api_handler.h"
#include "support/cloudsim/cloudsim.h"
#include "support/profiles.h"
#include "support/seams.h"
#include "support/token_profile.h"
#include "support/transfer_bytes.h"
#include "support/xattrtree/xattrtree.h"
#include "zyrovfs/cloud_utils.h"

namespace ZYROCloud {

using namespace ZYROVFS;  // NOLINT(google-build-using-namespace)
using cloudsim::Fault;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

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

template <typename Driver, typename Service>
class DriverFixture : public profiles::ProfileTest {
  protected:
    explicit DriverFixture(std::string scheme)
        : protocol(std::move(scheme)),
          server_id(protocol + "://amy@example.com"),
          amy(service.AddAccount("amy@example.com", "Amy Doe")),
          root(amy.Root()),
          tree("/tmp/" + protocol + "_tree") {}

    /** Names of the service configuration, with the addresses that the service has. */
    virtual std::map<std::string, std::string> Hosts() const = 0;

    void SetUp() override {
        ProfileTest::SetUp();
        service.AddClient("mine", kSecret);
        Json::Value document;
        for (const auto& [name, address] : Hosts()) {
            document["hosts"][name] = address;
        }
        std::filesystem::create_directories(paths::kConfigRoot);
        ASSERT_TRUE(json::toFile(document, paths::kServiceConfig, 0640));
        ASSERT_TRUE(Utils::AddClient(protocol, "mine", kSecret));
        Renew();
        Json::Value connections;
        connections[server_id] = Stored();
        profiles::Put(profiles::VFS_CONFIG_SERVER, connections);
        connections[server_id]["path"] = tree.Folder();
        profiles::Put(profiles::VFS_CONFIG_CONNECT, connections);
        seams::Reset();
        YLIBCErrSetEx(0, "test", 1);
    }

    void TearDown() override {
        EXPECT_THAT(service.UnusedFaults(), IsEmpty()) << service.Journal().Text();
        const cloudsim::Tokens last = amy.LastTokens();
        for (const std::string& secret :
             {std::string(kSecret), granted.access_token, granted.refresh_token, last.access_token,
              last.refresh_token}) {
            EXPECT_FALSE(!secret.empty() && seams::LoggedPart(secret)) << seams::LogDump();
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
        profile["server_id"] = server_id;
        profile["account_info"] = account_info;
        drive = std::make_unique<Driver>(profiles::kUser, profile);
    }

    /** The profile as it stands in a file. */
    Json::Value Stored() const {
        Json::Value profile;
        profile["protocol"] = protocol;
        profile["alias"] = profile["email"] = "amy@example.com";
        profile["account_info"] = "{}";
        profile["client_id"] = "mine";
        profile["expire_time"] = "500";
        profile["path"] = "";
        profile["access_token"] = token_profile::Enciphered(granted.access_token);
        profile["refresh_token"] = token_profile::Enciphered(granted.refresh_token);
        return profile;
    }

    /** Makes the mounted tree know what the account has at this path. */
    void Show(const std::string& path) {
        for (const auto& [name, value] : service.Attributes(amy, amy.Get(amy.Find(path)))) {
            tree.Set(path, name, value);
        }
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
    const std::string protocol, server_id;
    /** What the profile knows of the account, for a driver that looks at it. */
    std::string account_info = "{}";
    Service service;
    cloudsim::Account& amy;
    const std::string root;
    XattrTree tree;
    cloudsim::Tokens granted;
    std::unique_ptr<Driver> drive;
};

}  // namespace ZYROCloud

#endif
