#include "mount/known_hosts.h"

#include "support/mount_fixture.h"
#include "support/stranger.h"

namespace ZYROVFS {
namespace {

using namespace stranger;

const std::string kFile = paths::KnownHosts(kAmy);
const std::string kFolder = fs::path(kFile).parent_path();

class KnownHosts : public mounting::Road {
  protected:
    KnownHosts() {
        fs::remove_all("/usr/zyro");
        MakeOpenToAll(paths::UserConfigDir(kAmy));
        MakeVictim();
    }
    ~KnownHosts() override { EXPECT_TRUE(IsVictimUntouched()); }

    static bool MakeFolder() {
        return As(kAmy, [] { return mkdir(kFolder.c_str(), 0700) == 0; });
    }

    const Patience patience_;
};

TEST_F(KnownHosts, AreThereWhenTheUserOrRootWroteThem) {
    EXPECT_FALSE(HasKnownHosts(kAmy));
    ASSERT_TRUE(MakeFolder());
    EXPECT_FALSE(HasKnownHosts(kAmy));
    scratch::PutText(kFile, "");
    EXPECT_TRUE(HasKnownHosts(kAmy));
    ASSERT_EQ(chown(kFile.c_str(), kAmy, 100), 0);
    EXPECT_TRUE(HasKnownHosts(kAmy));
}

TEST_F(KnownHosts, FifoIsNone) {
    ASSERT_TRUE(MakeFolder());
    ASSERT_TRUE(As(kAmy, [] { return mkfifo(kFile.c_str(), 0600) == 0; }));
    EXPECT_FALSE(HasKnownHosts(kAmy));
}

TEST_F(KnownHosts, FifoInAStrangersFolderDoesNotHangAMountWithForce) {
    ASSERT_TRUE(Folder(kFolder));
    ASSERT_TRUE(Fifo(kFile));
    session_.SetURI("sftp://nas.example:2222");
    session_.SetForce(true);
    EXPECT_TRUE(session_.Mount()) << GetErrorName(GetError());
}

TEST_F(KnownHosts, StrangersLinkLeadsNowhere) {
    ASSERT_TRUE(Link(kVictim, kFolder));
    EXPECT_FALSE(HasKnownHosts(kAmy));
}

}  // namespace
}  // namespace ZYROVFS
