/** Amy's account at a simulated service, as a driver and the profile files know it. */
#ifndef ZYROVFS_TESTS_DRIVER_ACCOUNT_H
#define ZYROVFS_TESTS_DRIVER_ACCOUNT_H

#include <gtest/gtest.h>
#include <json/value.h>

#include <filesystem>
#include <string>

#include "core/json.h"
#include "core/paths.h"
#include "support/cloudsim/service.h"
#include "support/profiles.h"
#include "support/seams.h"
#include "support/token_profile.h"
#include "zyrovfs/cloud_utils.h"

namespace driver_account {

inline constexpr const char* kClient = "mine";
inline constexpr const char* kSecret = "secret-of-mine";

struct Account {
    std::string protocol;
    std::string account_info;  ///< what the profile knows of it
    cloudsim::Tokens granted;

    std::string ServerId() const { return protocol + "://amy@example.com"; }

    /** The profile as a driver gets it; it may tell the life of the token. */
    Json::Value Plain(const std::string& expire_time) const {
        Json::Value profile;
        profile["access_token"] = granted.access_token;
        profile["refresh_token"] = granted.refresh_token;
        profile["expire_time"] = expire_time;
        profile["client_id"] = kClient;
        profile["server_id"] = ServerId();
        profile["account_info"] = account_info;
        return profile;
    }

    /** The profile as it stands in a file. */
    Json::Value Stored() const {
        Json::Value profile;
        profile["protocol"] = protocol;
        profile["alias"] = profile["email"] = "amy@example.com";
        profile["account_info"] = account_info;
        profile["client_id"] = kClient;
        profile["expire_time"] = "500";
        profile["path"] = "";
        profile["access_token"] = token_profile::Enciphered(granted.access_token);
        profile["refresh_token"] = token_profile::Enciphered(granted.refresh_token);
        return profile;
    }

    /** Saved, and connected at this folder. */
    void Save(const std::string& folder) const {
        Json::Value connections;
        connections[ServerId()] = Stored();
        profiles::Put(profiles::VFS_CONFIG_SERVER, connections);
        connections[ServerId()]["path"] = folder;
        profiles::Put(profiles::VFS_CONFIG_CONNECT, connections);
    }
};

/** The service's addresses, and the client that it and this installation know. */
inline void Configure(cloudsim::Service& service, const std::string& protocol,
                      const Json::Value& hosts) {
    service.AddClient(kClient, kSecret);
    Json::Value document;
    document["hosts"] = hosts;
    std::filesystem::create_directories(ZYROVFS::paths::kConfigRoot);
    ASSERT_TRUE(ZYROVFS::json::toFile(document, ZYROVFS::paths::kServiceConfig, 0640));
    ASSERT_TRUE(ZYROCloud::Utils::AddClient(protocol, kClient, kSecret));
}

/** Every declared fault happened, and neither tokens nor the secret reached the log. */
inline void ExpectCleanEnd(const cloudsim::Service& service, const cloudsim::Account& amy,
                           const cloudsim::Tokens& granted) {
    EXPECT_TRUE(service.UnusedFaults().empty())
        << testing::PrintToString(service.UnusedFaults()) << service.Journal().Text();
    const cloudsim::Tokens last = amy.LastTokens();
    for (const std::string& secret :
         {std::string(kSecret), granted.access_token, granted.refresh_token, last.access_token,
          last.refresh_token}) {
        EXPECT_FALSE(!secret.empty() && seams::LoggedPart(secret)) << seams::LogDump();
    }
}

}  // namespace driver_account

#endif
