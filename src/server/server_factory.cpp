#include "server/server_factory.h"

#include <new>

#include "core/log.h"
#include "server/server_box.h"
#include "server/server_dropbox.h"
#include "server/server_gdrive.h"
#include "server/server_onedrive.h"
#include "server/server_sharing.h"
#include "server/server_vfs.h"

namespace ZYROVFS::Server {
namespace {

template <typename Type>
std::unique_ptr<ServerBase> Make() {
    return std::unique_ptr<ServerBase>(new (std::nothrow) Type);
}

struct Row {
    const char* protocol;
    std::unique_ptr<ServerBase> (*make)();
};

constexpr Row kTypes[] = {
    {"google", Make<GDriveServer>},     {"dropbox", Make<DropboxServer>},
    {"onedrive", Make<OneDriveServer>}, {"box", Make<BoxServer>},
    {"sharing", Make<SharingServer>},
};

}  // namespace

std::unique_ptr<ServerBase> NewServer(const std::string& protocol) {
    for (const Row& row : kTypes) {
        if (protocol == row.protocol) {
            return row.make();
        }
    }
    return Make<VFSServer>();
}

ServerFactory server_factory = NewServer;

}  // namespace ZYROVFS::Server
