#include "cloud_services.h"

#include <json/writer.h>
#include <malloc.h>

#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>

#include "zyrovfs/cloud_utils.h"

namespace bench {
namespace {

constexpr const char* kServiceConfig = "/usr/zyro/etc/zyrovfs/cloud.conf";
constexpr uint64_t kNoLimit = 1000000;

/** The largest pages that Google gives; the driver leaves their size to its caller. */
Json::Value LargePages() {
    Json::Value params;
    params["maxResults"] = 1000;
    return params;
}

cloudsim::Running Start(const Service& service, bool keep_journal) {
    cloudsim::ServiceOptions options;
    options.storage.kind = cloudsim::Storage::Kind::kCountOnly;
    options.journal_hashes = options.hash_uploads = false;
    options.keep_journal = keep_journal;
    options.max_offset = kNoLimit;
    return cloudsim::FindServiceKind(service.option)->start(options);
}

}  // namespace

const std::vector<Service>& Services() {
    using namespace ZYROCloud;
    static const Json::Value none(Json::objectValue);
    static const std::vector<Service> services = {
        {"box",
         "--box",
         CLOUD_TYPE_BOX,
         "",
         none,
         {{"BoxApiHost", "api"}, {"BoxUploadHost", "upload"}}},
        {"dropbox",
         "--dropbox",
         CLOUD_TYPE_DROPBOX,
         "",
         none,
         {{"DropboxApiHost", "api"}, {"DropboxContentHost", "content"}}},
        {"google",
         "--google",
         CLOUD_TYPE_GOOGLE,
         "root",
         LargePages(),
         {{"GoogleApiHost", "api"}, {"GoogleAccountsHost", "accounts"}}},
        {"onedrive",
         "--onedrive",
         CLOUD_TYPE_ONEDRIVE,
         "",
         none,
         {{"LiveApiHost", "api"}, {"LiveLoginHost", "login"}, {"LiveStorageDomain", "storage"}}},
    };
    return services;
}

const Service& FindService(const std::string& name) {
    for (const Service& service : Services()) {
        if (name == service.name) {
            return service;
        }
    }
    std::fprintf(stderr, "no such service: %s\n", name.c_str());
    std::exit(2);
}

Simulated::Simulated(const Service& service, bool keep_journal)
    : running(Start(service, keep_journal)),
      amy(&running.service->AddAccount("amy@example.com", "Amy Doe")) {}

Access Simulated::Grant() const {
    return {{running.hosts.begin(), running.hosts.end()},
            amy->IssueTokens(86400).access_token,
            amy->Id()};
}

void SetHosts(const Service& service, const Hosts& hosts) {
    Json::Value document;
    for (const auto& [entry, use] : service.hosts) {
        const auto host = hosts.find(use);
        document["hosts"][entry] = host == hosts.end() ? "" : host->second;
    }
    std::filesystem::create_directories(std::filesystem::path(kServiceConfig).parent_path());
    std::ofstream(kServiceConfig) << document;
    std::filesystem::permissions(kServiceConfig, std::filesystem::perms(0640));
}

Json::Value Profile(const Service& service, const Access& access) {
    Json::Value profile;
    profile["access_token"] = access.token;
    profile["server_id"] = std::string(service.name) + "://amy@example.com";
    profile["account_info"] = "{\"id\":\"" + access.account + "\"}";
    return profile;
}

std::unique_ptr<ZYROCloud::Cloud> MakeDriver(const Service& service, const Access& access) {
    SetHosts(service, access.hosts);
    return std::unique_ptr<ZYROCloud::Cloud>(
        ZYROCloud::Utils::CreateCloudByConfig(service.type, 4001, Profile(service, access)));
}

long PeakMemory() {
    std::ifstream status("/proc/self/status");
    std::string word;
    long kib = 0;
    while (status >> word && word != "VmHWM:") {
    }
    status >> kib;
    return kib;
}

void ResetPeak() {
    malloc_trim(0);
    std::ofstream("/proc/self/clear_refs") << "5";
}

}  // namespace bench
