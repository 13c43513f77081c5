#include "gvfs_services.h"

#include <cstdio>
#include <cstdlib>
#include <map>

#include "profiles.h"

namespace bench {
namespace {

constexpr const char* kUnused = "";

const Backend kBackends[] = {
    {"box", "/",
     [](const char* id, ZYROCloud_Cache* cache, const char* path, ZYROCloud_ListCallback callback,
        void* user_data) {
         return ZYROCloud_Cloud_Box_List("account", id, cache, path, nullptr, callback, user_data,
                                         nullptr);
     },
     [](const char*, ZYROCloud_Handle* handle, char** dest, long long size) {
         return ZYROCloud_Cloud_Box_Download(handle, kUnused, kUnused, dest, size, nullptr);
     }},
    {"dropbox", "/",
     [](const char* id, ZYROCloud_Cache* cache, const char* path, ZYROCloud_ListCallback callback,
        void* user_data) {
         return ZYROCloud_Cloud_Dropbox_List(id, cache, path, callback, user_data, nullptr);
     },
     [](const char* id, ZYROCloud_Handle* handle, char** dest, long long size) {
         return ZYROCloud_Cloud_Dropbox_Download(handle, id, kUnused, dest, size, nullptr);
     }},
    {"google", "/My Drive",
     [](const char* id, ZYROCloud_Cache* cache, const char* path, ZYROCloud_ListCallback callback,
        void* user_data) {
         return ZYROCloud_Cloud_Google_List(id, cache, path, nullptr, callback, user_data, nullptr);
     },
     [](const char*, ZYROCloud_Handle* handle, char** dest, long long size) {
         return ZYROCloud_Cloud_Google_Download(handle, kUnused, kUnused, dest, size, nullptr);
     }},
    {"onedrive", "/",
     [](const char* id, ZYROCloud_Cache* cache, const char* path, ZYROCloud_ListCallback callback,
        void* user_data) {
         return ZYROCloud_Cloud_OneDrive_List(id, cache, path, nullptr, callback, user_data,
                                              nullptr);
     },
     [](const char*, ZYROCloud_Handle* handle, char** dest, long long size) {
         return ZYROCloud_Cloud_OneDrive_Download(handle, kUnused, kUnused, dest, size, nullptr);
     }},
};

}  // namespace

const Backend& FindBackend(const std::string& service) {
    for (const Backend& backend : kBackends) {
        if (service == backend.service) {
            return backend;
        }
    }
    std::fprintf(stderr, "no such service: %s\n", service.c_str());
    std::exit(2);
}

const Service& AsBackendsList(const std::string& name) {
    static std::map<std::string, Service> services;
    const auto [found, is_new] = services.emplace(name, FindService(name));
    if (is_new) {
        found->second.listing = Json::Value(Json::objectValue);
    }
    return found->second;
}

std::string ServerId(const Service& service) {
    return std::string(service.name) + "://amy@example.com";
}

void Connect(const Service& service, const Access& access) {
    setenv("ZYROVFS_UID", std::to_string(kUid).c_str(), 1);
    SetHosts(service, access.hosts);
    if (!StoreCloud(ServerId(service), service.name, access.token)) {
        std::fprintf(stderr, "no connection stored\n");
        std::exit(1);
    }
}

void Connect(const Service& service, const RecordedListing& listing) {
    Access access{{}, "token", "account"};
    for (const auto& [entry, use] : service.hosts) {
        access.hosts[use] = listing.Pages().Url();
    }
    Connect(service, access);
}

UniqueCache MakeCache() {
    ZYROCloud_Cache* cache = nullptr;
    ZYROCloud_Cache_Init(&cache);
    return UniqueCache(cache);
}

long ListTop(const Service& service, ZYROCloud_Cache* cache) {
    const Backend& backend = FindBackend(service.name);
    long items = 0;
    const auto count = [](GFileInfo*, void* counter) { ++*static_cast<long*>(counter); };
    return backend.list(ServerId(service).c_str(), cache, backend.top, count, &items) == 1 ? items
                                                                                           : -1;
}

}  // namespace bench
