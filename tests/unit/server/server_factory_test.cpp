#include "server/server_factory.h"

#include <gtest/gtest.h>

#include "server/server_box.h"
#include "server/server_dropbox.h"
#include "server/server_gdrive.h"
#include "server/server_onedrive.h"
#include "server/server_sharing.h"
#include "server/server_vfs.h"

namespace ZYROVFS::Server {
namespace {

template <typename Type>
bool Makes(const std::string& protocol) {
    const std::unique_ptr<ServerBase> server = NewServer(protocol);
    return dynamic_cast<Type*>(server.get()) != nullptr;
}

TEST(ServerFactory, SharingHasItsOwnType) {
    EXPECT_TRUE(Makes<SharingServer>("sharing"));
}

TEST(ServerFactory, EachCloudHasItsOwnType) {
    EXPECT_TRUE(Makes<BoxServer>("box"));
    EXPECT_TRUE(Makes<DropboxServer>("dropbox"));
    EXPECT_TRUE(Makes<GDriveServer>("google"));
    EXPECT_TRUE(Makes<OneDriveServer>("onedrive"));
}

TEST(ServerFactory, EveryTextThatNoTypeNamesIsAStandardProtocol) {
    for (const char* protocol : {"ftp", "sftp", "dav", "davs", "cifs", "nfs", "gopher", "",
                                 "Sharing", "sharing ", "BOX", "google drive"}) {
        EXPECT_TRUE(Makes<VFSServer>(protocol)) << protocol;
    }
    EXPECT_TRUE(Makes<VFSServer>(std::string("sharing\0", 8)));
    EXPECT_TRUE(Makes<VFSServer>(std::string(1 << 20, 's')));
}

}  // namespace
}  // namespace ZYROVFS::Server
