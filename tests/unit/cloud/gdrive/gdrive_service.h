/**
 * A Google Drive driver before the simulated service, with a profile, a mounted tree and a client
 * of its own. Tokens and secrets must not reach the log, and every fault that a test declares must
 * have happened when it ends.
 */
#ifndef ZYROVFS_TESTS_GDRIVE_SERVICE_H
#define ZYROVFS_TESTS_GDRIVE_SERVICE_H

#include <gmock/gmock.h>
#include <zosplatform/error.h>

#include <memory>
#include <string>
#include <vector>

#include "cloud/gdrive/gdrive.h"
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
using cloudsim::JournalEntry;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

inline constexpr const char* kServerId = "google://amy@example.com";
inline constexpr const char* kFilesPath = "/drive/v2/files";
inline constexpr const char* kUploadPath = "/upload/drive/v2/files";

inline Json::Value Object(const std::string& text) {
    Json::Value value;
    EXPECT_TRUE(json::fromString(value, text)) << text;
    return value;
}

/** The folder of an item, as a request tells it. */
inline Json::Value Into(const std::string& id) {
    return Object(R"([{"id":")" + id + "\"}]");
}

class GDriveServiceTest : public profiles::ProfileTest {
  protected:
    GDriveServiceTest() : amy(service.AddAccount("amy@example.com", "Amy Doe")), root(amy.Root()) {}

    void SetUp() override {
        ProfileTest::SetUp();
        service.AddClient("mine", kSecret);
        Json::Value document;
        document["hosts"]["GoogleApiHost"] = service.ApiHost();
        document["hosts"]["GoogleAccountsHost"] = service.AccountsHost();
        std::filesystem::create_directories(paths::kConfigRoot);
        ASSERT_TRUE(json::toFile(document, paths::kServiceConfig, 0640));
        ASSERT_TRUE(Utils::AddClient("google", "mine", kSecret));
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
        for (const cloudsim::Tokens& tokens : {granted, amy.LastTokens()}) {
            EXPECT_FALSE(seams::LoggedPart(tokens.access_token)) << seams::LogDump();
            EXPECT_FALSE(seams::LoggedPart(tokens.refresh_token)) << seams::LogDump();
        }
        EXPECT_FALSE(seams::LoggedPart(kSecret)) << seams::LogDump();
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
        drive = std::make_unique<GDrive>(profiles::kUser, profile);
    }

    /** The profile as it stands in a file. */
    Json::Value Stored() const {
        Json::Value profile;
        profile["protocol"] = "google";
        profile["alias"] = profile["email"] = "amy@example.com";
        profile["account_info"] = "{}";
        profile["client_id"] = "mine";
        profile["expire_time"] = "500";
        profile["path"] = "";
        profile["access_token"] = token_profile::Enciphered(granted.access_token);
        profile["refresh_token"] = token_profile::Enciphered(granted.refresh_token);
        return profile;
    }

    /** Makes the mounted tree know the id of an item at this path. */
    void Show(const std::string& path, const std::string& id) { tree.Set(path, "id::file", id); }
    void Show(const std::string& path) { Show(path, amy.Find(path)); }

    /** "GET /drive/v2/about" for each request so far. */
    std::vector<std::string> Requests() const {
        std::vector<std::string> lines;
        for (const JournalEntry& entry : service.Journal().All()) {
            lines.push_back(entry.method + " " + entry.Path());
        }
        return lines;
    }
    JournalEntry Last() const { return service.Journal().All().back(); }

    static constexpr const char* kSecret = "secret-of-mine";
    cloudsim::GDrive service;
    cloudsim::Account& amy;
    const std::string root;
    XattrTree tree{"/tmp/gdrive_tree"};
    cloudsim::Tokens granted;
    std::unique_ptr<GDrive> drive;
};

}  // namespace ZYROCloud

#endif
