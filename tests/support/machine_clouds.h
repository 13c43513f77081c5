/** The four simulated clouds on the private host, an account of Amy's at each, and her profiles. */
#ifndef ZYROVFS_TESTS_MACHINE_CLOUDS_H
#define ZYROVFS_TESTS_MACHINE_CLOUDS_H

#include <gtest/gtest.h>
#include <json/value.h>

#include <fstream>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "support/cloudsim/cloudsim.h"
#include "support/cloudsim/mounted_account.h"
#include "support/locations.h"
#include "support/machine.h"

namespace machine_clouds {

using machine::Must;

inline const std::string kTool = BuildDir() + "/tools/zyrovfs/zyrovfs";
inline constexpr size_t kMiB = 1 << 20;

/** A service with Amy's account, and what the box would have mounted of it. */
struct Place {
    std::string protocol;
    std::unique_ptr<cloudsim::Service> service;
    cloudsim::Account* account = nullptr;
    std::unique_ptr<cloudsim::MountedAccount> tree;

    std::string Id() const { return protocol + "://amy@example.com"; }
    std::string Folder() const { return "/tmp/clouds/" + protocol; }
    std::string Bytes(const std::string& path) const {
        const std::string id = account->Find(path);
        return id.empty() ? "nothing" : account->Bytes(id);
    }
};

template <typename Options>
Options AtLoopback(std::string Options::*a, std::string Options::*b) {
    Options options;
    options.api_name = options.*a = options.*b = "127.0.0.1";
    return options;
}

class Clouds : public testing::Environment {
  public:
    void SetUp() override {
        machine::AddUser("amy", 4001);
        using cloudsim::BoxOptions;
        using cloudsim::GDriveOptions;
        using cloudsim::OneDriveOptions;
        auto box = std::make_unique<cloudsim::BoxService>(
            AtLoopback(&BoxOptions::upload_name, &BoxOptions::download_name));
        auto google = std::make_unique<cloudsim::GDrive>(
            AtLoopback(&GDriveOptions::accounts_name, &GDriveOptions::content_name));
        // The storage host has a name of its own, so names it is.
        auto onedrive = std::make_unique<cloudsim::OneDrive>();
        auto dropbox = std::make_unique<cloudsim::Dropbox>();
        Json::Value hosts;
        hosts["BoxApiHost"] = box->ApiHost();
        hosts["BoxUploadHost"] = box->UploadHost();
        hosts["BoxAccountHost"] = box->AccountHost();
        hosts["DropboxApiHost"] = dropbox->ApiHost();
        hosts["DropboxContentHost"] = dropbox->ContentHost();
        hosts["DropboxWebHost"] = dropbox->WebHost();
        hosts["GoogleApiHost"] = google->ApiHost();
        hosts["GoogleAccountsHost"] = google->AccountsHost();
        hosts["LiveApiHost"] = onedrive->ApiHost();
        hosts["LiveLoginHost"] = onedrive->LoginHost();
        hosts["LiveStorageDomain"] = onedrive->StorageDomain();
        Configure(hosts);
        Add("box", std::move(box));
        Add("dropbox", std::move(dropbox));
        Add("google", std::move(google));
        Add("onedrive", std::move(onedrive));
        RecordConnections();
    }
    void TearDown() override { places.clear(); }

    /** New tokens in /tmp/access and /tmp/refresh, as the owner gets them by signing in. */
    static void SignIn(const Place& place) {
        const cloudsim::Tokens tokens = place.account->IssueTokens();
        std::ofstream("/tmp/access") << tokens.access_token << '\n';
        std::ofstream("/tmp/refresh") << tokens.refresh_token << '\n';
    }

    /** Stands for the mounts: the box's own backends serve the trees that drivers look at. */
    static void RecordConnections() {
        Must(
            "sed -E 's|\"path\":\"\",\"protocol\":\"([a-z]+)\"|"
            "\"path\":\"/tmp/clouds/\\1\",\"protocol\":\"\\1\"|g' "
            "/usr/zyro/etc/zyrovfs/4001/servers.conf >/var/tmp/zyrovfs/4001/connect.conf");
    }

    std::vector<Place> places;
    /** Where Google's backend shows the account's root. */
    std::string google_top;

  private:
    static void Configure(const Json::Value& hosts) {
        Must("mkdir -p /usr/zyro/etc/zyrovfs /var/tmp/zyrovfs/4001 /tmp/clouds");
        Json::Value document;
        document["hosts"] = hosts;
        std::ofstream("/usr/zyro/etc/zyrovfs/cloud.conf") << cloudsim::OneLine(document) << '\n';
        std::ofstream("/tmp/secret") << "secret\n";
    }

    void Add(const std::string& protocol, std::unique_ptr<cloudsim::Service> service) {
        Place place{protocol, std::move(service), nullptr, nullptr};
        place.account = &place.service->AddAccount("amy@example.com", "Amy");
        place.account->SetQuota(50 * kMiB);
        place.tree = std::make_unique<cloudsim::MountedAccount>(
            *place.service, *place.account, place.Folder(), protocol == "google" ? google_top : "");
        SignIn(place);
        Must(kTool + " cloud client add " + protocol + " client --password-file /tmp/secret");
        Must(kTool + " profile add --user amy --protocol " + protocol +
             " --client-id client --access-token-file /tmp/access --refresh-token-file "
             "/tmp/refresh --expires-in 3600");
        places.push_back(std::move(place));
    }
};

/** Ready while tests run: a program with them registers it as a global environment. */
inline Clouds& TheClouds() {
    static auto* const clouds = new Clouds;
    return *clouds;
}

}  // namespace machine_clouds

#endif
