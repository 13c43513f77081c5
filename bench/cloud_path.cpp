// bench_cloud_path: requests that each service is asked for a path of ten components, which the
// mounted tree does not know.
#include <cstdio>

#include "cloud/box/box.h"
#include "cloud/dropbox/dropbox.h"
#include "cloud/gdrive/gdrive.h"
#include "cloud/onedrive/onedrive.h"
#include "cloud_services.h"

namespace {

constexpr int kFolders = 9;

/** The driver's own walk. */
template <typename Driver>
bool Walk(const Json::Value& profile, const std::string& path, std::string& id) {
    Driver driver(4001, profile);
    return driver.GetFileIDByPathFromServer("", path, "", "", id) && !id.empty();
}

/** Nothing to walk: the path names the item, and one request tells whether it is there. */
bool Look(const Json::Value& profile, const std::string& path, std::string& id) {
    ZYROCloud::Dropbox driver(4001, profile);
    Json::Value item;
    id = path;
    return driver.GetFileInfo(path.substr(1), Json::Value(Json::objectValue), item);
}

constexpr struct {
    const char* service;
    bool (*resolve)(const Json::Value& profile, const std::string& path, std::string& id);
} kWalks[] = {
    {"box", Walk<ZYROCloud::Box>},
    {"dropbox", Look},
    {"google", Walk<ZYROCloud::GDrive>},
    {"onedrive", Walk<ZYROCloud::OneDrive>},
};

}  // namespace

int main() {
    std::string path;
    for (int i = 0; i < kFolders; ++i) {
        path += "/folder-" + std::to_string(i);
    }
    path += "/file.txt";
    for (const auto& walk : kWalks) {
        const bench::Service& service = bench::FindService(walk.service);
        const bench::Simulated simulated(service, true);
        simulated.amy->AddPath(path, "hello");
        const bench::Access access = simulated.Grant();
        bench::SetHosts(service, access.hosts);
        std::string id;
        if (!walk.resolve(bench::Profile(service, access), path, id)) {
            std::fprintf(stderr, "not found: %s\n", walk.service);
            return 1;
        }
        std::printf("  %-9s %zu requests\n", walk.service,
                    simulated.running.service->Journal().All().size());
    }
    return 0;
}
