#include "server/server_factory.h"

#include <gtest/gtest.h>

#include "server/server_box.h"
#include "server/server_sharing.h"
#include "server/server_vfs.h"
#include "support/seams.h"
#include "zyrovfs/error.h"

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

TEST(ServerFactory, BoxHasItsOwnType) {
    EXPECT_TRUE(Makes<BoxServer>("box"));
}

TEST(ServerFactory, EveryTextThatNoTypeNamesIsAStandardProtocol) {
    for (const char* protocol : {"ftp", "sftp", "dav", "davs", "cifs", "nfs", "gopher", "",
                                 "Sharing", "sharing ", "BOX", "google drive"}) {
        EXPECT_TRUE(Makes<VFSServer>(protocol)) << protocol;
    }
    EXPECT_TRUE(Makes<VFSServer>(std::string("sharing\0", 8)));
    EXPECT_TRUE(Makes<VFSServer>(std::string(1 << 20, 's')));
}

TEST(ServerFactory, SomeCloudsAreNotThereYet) {
    ResetError();
    for (const char* protocol : {"google", "dropbox", "onedrive"}) {
        seams::Reset();
        EXPECT_EQ(NewServer(protocol), nullptr) << protocol;
        EXPECT_FALSE(seams::LogLines().empty()) << protocol;
    }
    EXPECT_EQ(GetError(), VFS_ERR_NONE) << "as for memory that ran out";
}

}  // namespace
}  // namespace ZYROVFS::Server
