#include "support/cloudsim/main_service.h"

#include <tuple>

#include "support/cloudsim/cloudsim.h"

namespace cloudsim {
namespace {

template <typename Options>
Options Common(const ServiceOptions& options) {
    Options own;
    static_cast<ServerOptions&>(own) = options;
    return own;
}

Running StartBox(const ServiceOptions& options) {
    auto own = Common<BoxOptions>(options);
    if (options.names) {
        std::tie(own.api_name, own.upload_name, own.download_name) = std::tuple_cat(*options.names);
    }
    own.max_offset = options.max_offset;
    auto box = std::make_unique<BoxService>(own);
    Running running;
    running.hosts = {
        {"api", box->ApiHost()}, {"upload", box->UploadHost()}, {"download", box->DownloadHost()}};
    running.service = std::move(box);
    return running;
}

Running StartDropbox(const ServiceOptions& options) {
    auto own = Common<DropboxOptions>(options);
    if (options.names) {
        std::tie(own.api_name, own.content_name, std::ignore) = std::tuple_cat(*options.names);
    }
    auto dropbox = std::make_unique<Dropbox>(own);
    Running running;
    running.hosts = {{"api", dropbox->ApiHost()}, {"content", dropbox->ContentHost()}};
    running.service = std::move(dropbox);
    return running;
}

Running StartGoogle(const ServiceOptions& options) {
    auto own = Common<GDriveOptions>(options);
    if (options.names) {
        std::tie(own.api_name, own.accounts_name, own.content_name) =
            std::tuple_cat(*options.names);
    }
    auto drive = std::make_unique<GDrive>(own);
    Running running;
    running.hosts = {{"api", drive->ApiHost()},
                     {"accounts", drive->AccountsHost()},
                     {"content", drive->ContentHost()}};
    running.service = std::move(drive);
    return running;
}

Running StartOneDrive(const ServiceOptions& options) {
    auto own = Common<OneDriveOptions>(options);
    if (options.names) {
        std::tie(own.api_name, own.login_name, own.content_name) = std::tuple_cat(*options.names);
    }
    auto drive = std::make_unique<OneDrive>(own);
    Running running;
    running.hosts = {{"api", drive->ApiHost()},
                     {"login", drive->LoginHost()},
                     {"content", drive->ContentHost()},
                     {"storage", drive->StorageDomain()}};
    running.service = std::move(drive);
    return running;
}

constexpr ServiceKind kKinds[] = {{"--box", StartBox},
                                  {"--dropbox", StartDropbox},
                                  {"--google", StartGoogle},
                                  {"--onedrive", StartOneDrive}};

}  // namespace

const ServiceKind* FindServiceKind(const std::string& option) {
    for (const ServiceKind& kind : kKinds) {
        if (option == kind.option) {
            return &kind;
        }
    }
    return nullptr;
}

}  // namespace cloudsim
