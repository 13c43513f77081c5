#include "core/owned_folder.h"

#include <gmock/gmock.h>
#include <sys/file.h>
#include <sys/mount.h>
#include <sys/sysmacros.h>

#include <cerrno>
#include <string>
#include <vector>

#include "core/entry_name.h"
#include "core/paths.h"
#include "support/stranger.h"

namespace ZYROVFS {
namespace {

using namespace stranger;
using scratch::PutText;
using scratch::Text;

const std::string kShared = paths::kConnectRoot;
const std::string kHome = paths::UserConnectDir(kAmy);

class Owned : public testing::Test {
  protected:
    void SetUp() override {
        umask(022);
        for (const char* tree : {paths::kConnectRoot, "/var/tmp/user", "/tmp/zyrovfs"}) {
            fs::remove_all(tree);
        }
        fs::remove_all("/usr/zyro");
        MakeVictim();
    }
    static OwnedFolder Open(const std::string& path = kHome) {
        errno = 0;
        return OwnedFolder::Open(path, kAmy);
    }
    /** As the library makes it. */
    static OwnedFolder Home() {
        fs::create_directories(kHome);
        chmod(kShared.c_str(), 01777);
        chmod(kHome.c_str(), 01777);
        return Open();
    }
    static std::vector<std::string> Aside(const std::string& folder) {
        std::vector<std::string> names;
        for (const auto& entry : fs::directory_iterator(folder)) {
            if (entry.path().filename().string().rfind(".foreign.", 0) == 0) {
                names.push_back(entry.path());
            }
        }
        return names;
    }

    const Patience patience_;
};

// --- the way there ------------------------------------------------------------------------------

TEST_F(Owned, MissingFolderTellsENOENT) {
    EXPECT_FALSE(Open());
    EXPECT_EQ(errno, ENOENT);
    EXPECT_FALSE(Open(""));
    EXPECT_FALSE(Open(std::string("/var/tmp\0/x", 11)));
    EXPECT_EQ(errno, EINVAL);
}

TEST_F(Owned, LinkAtAnyComponentIsNotFollowed) {
    const std::string path = "/tmp/zyrovfs/lock/user/5001";
    for (const char* linked :
         {"/tmp/zyrovfs", "/tmp/zyrovfs/lock", "/tmp/zyrovfs/lock/user", path.c_str()}) {
        fs::remove_all("/tmp/zyrovfs");
        fs::create_directories(kVictim + "/lock/user/5001");
        fs::create_directories(kVictim + "/user/5001");
        fs::create_directories(kVictim + "/5001");
        fs::create_directories(fs::path(linked).parent_path());
        fs::create_directory_symlink(kVictim, linked);
        EXPECT_FALSE(Open(path)) << linked;
        EXPECT_EQ(errno, ENOTDIR) << linked;
        MakeVictim();
    }
}

TEST_F(Owned, FileFifoAndDeviceAreNoFolders) {
    fs::create_directories(kShared);
    PutText(kHome, "");
    EXPECT_FALSE(Open());
    fs::remove(kHome);
    ASSERT_EQ(mkfifo(kHome.c_str(), 0666), 0);
    EXPECT_FALSE(Open());
    fs::remove(kHome);
    ASSERT_EQ(mknod(kHome.c_str(), S_IFCHR | 0666, makedev(1, 5)), 0);
    EXPECT_FALSE(Open());
    EXPECT_EQ(errno, ENOTDIR);
}

TEST_F(Owned, MachinesOwnFoldersMayBeLinksOfRoots) {
    fs::remove_all("/var/tmp");
    fs::create_directories("/var/real/zyrovfs/5001");
    fs::create_directory_symlink("/var/real", "/var/tmp");
    const bool opened = static_cast<bool>(Open());
    fs::remove("/var/tmp");
    fs::remove_all("/var/real");
    fs::create_directory("/var/tmp");
    ASSERT_EQ(chmod("/var/tmp", 01777), 0);
    EXPECT_TRUE(opened);
}

TEST_F(Owned, FoldersThatAnOlderVersionLeftOpenBecomeSticky) {
    MakeOpenToAll(kHome);
    PutText(kHome + "/connect.conf", "kept");
    EXPECT_TRUE(Open());
    EXPECT_EQ(ModeOf(kShared), 01777U);
    EXPECT_EQ(ModeOf(kHome), 01777U);
    EXPECT_EQ(Text(kHome + "/connect.conf"), "kept");
    EXPECT_FALSE(As(kMallory, [] { return rename(kHome.c_str(), (kHome + ".x").c_str()) == 0; }));
}

TEST_F(Owned, ConfigurationThatAnOlderVersionLeftOpenIsClosed) {
    MakeOpenToAll("/usr/zyro/etc/zyrovfs/5001");
    PutText(paths::kPolicyFile, "kept");
    EXPECT_TRUE(Open("/usr/zyro/etc/zyrovfs/5001"));
    for (const char* shared : {"/usr/zyro", "/usr/zyro/etc", "/usr/zyro/etc/zyrovfs"}) {
        EXPECT_EQ(ModeOf(shared), 0755U) << shared;
    }
    EXPECT_EQ(ModeOf("/usr/zyro/etc/zyrovfs/5001"), 01777U);
    EXPECT_EQ(Text(paths::kPolicyFile), "kept");
}

TEST_F(Owned, ServiceThatActsAsTheUserRepairsAsRoot) {
    MakeOpenToAll(kHome);
    ASSERT_EQ(seteuid(kAmy), 0);
    const bool opened = static_cast<bool>(Open());
    const uid_t after = geteuid();
    ASSERT_EQ(seteuid(0), 0);
    EXPECT_TRUE(opened);
    EXPECT_EQ(after, kAmy);
    EXPECT_EQ(ModeOf(kHome), 01777U);
}

TEST_F(Owned, UserAloneGoesOnWithWhatOnlyRootCanRepair) {
    MakeOpenToAll(kHome);
    EXPECT_TRUE(As(kAmy, [] { return static_cast<bool>(Open()); }));
    EXPECT_EQ(ModeOf(kHome), 0777U);
}

TEST_F(Owned, FoldersOnADiskThatNobodyCanWriteToAreTakenAsTheyAre) {
    fs::create_directories(kHome);
    ASSERT_EQ(mount("tmpfs", kHome.c_str(), "tmpfs", MS_RDONLY, "mode=777"), 0);
    const bool opened = static_cast<bool>(Open());
    ASSERT_EQ(umount2(kHome.c_str(), MNT_DETACH), 0);
    EXPECT_TRUE(opened);
}

TEST_F(Owned, SharedFolderThatAStrangerMadeFirstBecomesRoots) {
    ASSERT_TRUE(Folder(kShared));
    fs::create_directories(kHome);
    EXPECT_TRUE(Open());
    EXPECT_EQ(OwnerOf(kShared), 0U);
    EXPECT_EQ(ModeOf(kShared) & 0022, 0U);
    EXPECT_FALSE(As(kMallory, [] { return rename(kHome.c_str(), (kHome + ".x").c_str()) == 0; }));
}

TEST_F(Owned, StrangersFolderInTheUsersPlaceIsMovedAsideAndNothingInItLost) {
    Home();
    fs::remove(kHome);
    ASSERT_TRUE(Folder(kHome));
    ASSERT_TRUE(File(kHome + "/connect.conf", "planted"));
    EXPECT_FALSE(Open());
    EXPECT_EQ(errno, ENOENT);
    EXPECT_FALSE(fs::exists(kHome));
    ASSERT_EQ(Aside(kShared).size(), 1U);
    EXPECT_EQ(Text(Aside(kShared)[0] + "/connect.conf"), "planted");
}

TEST_F(Owned, PathSaysWhoseItIsWhateverTheCallerSays) {
    Home();
    ASSERT_EQ(chown(kHome.c_str(), kAmy, 100), 0);
    EXPECT_TRUE(OwnedFolder::Open(kHome, kMallory)) << "and amy's folder is not moved aside";
    EXPECT_TRUE(OwnedFolder::Open(kHome, 0));
}

TEST_F(Owned, UserAloneRefusesAStrangersFolder) {
    Home();
    fs::remove(kHome);
    ASSERT_TRUE(Folder(kHome));
    EXPECT_TRUE(As(kAmy, [] { return !Open() && errno == EPERM; }));
}

TEST_F(Owned, FolderOfAnotherTreeIsNeitherRepairedNorMoved) {
    MakeOpenToAll("/var/tmp/other/folder");
    EXPECT_FALSE(Open("/var/tmp/other/folder"));
    EXPECT_EQ(errno, EPERM);
    EXPECT_EQ(ModeOf("/var/tmp/other"), 0777U);
    fs::remove_all("/var/tmp/other");
    ASSERT_TRUE(Folder("/var/tmp/other"));
    EXPECT_FALSE(Open("/var/tmp/other"));
    EXPECT_EQ(OwnerOf("/var/tmp/other"), kMallory);
    fs::remove_all("/var/tmp/other");
}

TEST_F(Owned, FileSystemOfAUserIsNotEntered) {
    Home();
    const UniqueFd fuse(open("/dev/fuse", O_RDWR | O_CLOEXEC));
    const std::string options =
        "fd=" + std::to_string(fuse.Get()) + ",rootmode=41777,user_id=0,group_id=0,allow_other";
    ASSERT_EQ(mount("theirs", kHome.c_str(), "fuse", MS_NOSUID | MS_NODEV, options.c_str()), 0);
    const bool opened = static_cast<bool>(Open());
    const int error = errno;
    umount2(kHome.c_str(), MNT_DETACH);
    EXPECT_FALSE(opened) << "and its program, which never answers, was not asked";
    EXPECT_EQ(error, EPERM);
}

// --- what is in it ------------------------------------------------------------------------------

TEST_F(Owned, ReadsAFileOfRootsAndOfTheUsers) {
    const OwnedFolder home = Home();
    PutText(kHome + "/f", "text");
    std::string text;
    EXPECT_TRUE(home.Read("f", 4, text));
    EXPECT_EQ(text, "text");
    ASSERT_EQ(chown((kHome + "/f").c_str(), kAmy, 100), 0);
    EXPECT_TRUE(home.Read("f", 4, text));
}

TEST_F(Owned, ReadsNoMoreThanTheLimit) {
    const OwnedFolder home = Home();
    PutText(kHome + "/f", "12345");
    std::string text;
    EXPECT_FALSE(home.Read("f", 4, text));
    EXPECT_EQ(errno, EFBIG);
    // The kernel says of such files that they are empty.
    EXPECT_FALSE(OwnedFolder::Open("/proc/" + std::to_string(getpid()), 0).Read("maps", 4, text));
    EXPECT_EQ(errno, EFBIG);
    ASSERT_EQ(truncate((kHome + "/f").c_str(), off_t{1} << 40), 0);
    EXPECT_FALSE(home.Read("f", 1 << 20, text));
    EXPECT_EQ(errno, EFBIG);
}

TEST_F(Owned, LinkFifoDeviceAndFolderAreNotOpened) {
    const OwnedFolder home = Home();
    fs::create_symlink("/etc/passwd", kHome + "/link");
    ASSERT_EQ(mkfifo((kHome + "/fifo").c_str(), 0666), 0);
    ASSERT_EQ(mknod((kHome + "/zero").c_str(), S_IFCHR | 0666, makedev(1, 5)), 0);
    fs::create_directory(kHome + "/folder");
    for (const int flags : {O_RDONLY, O_RDWR}) {
        for (const char* name : {"link", "fifo", "zero", "folder"}) {
            EXPECT_FALSE(home.OpenFile(name, flags)) << name;
            EXPECT_FALSE(home.OpenOrMake(name, flags, 0600)) << name;
        }
    }
}

TEST_F(Owned, FurtherNameOfAFileIsNotWrittenTo) {
    const OwnedFolder home = Home();
    PutText("/var/tmp/roots", "root's");
    fs::create_hard_link("/var/tmp/roots", kHome + "/f");
    EXPECT_FALSE(home.OpenOrMake("f", O_RDWR | O_APPEND, 0600));
    EXPECT_EQ(errno, EMLINK);
    fs::remove("/var/tmp/roots");
    EXPECT_TRUE(home.OpenOrMake("f", O_RDWR | O_APPEND, 0600));
}

TEST_F(Owned, NamesLeadNowhere) {
    const OwnedFolder home = Home();
    struct stat info {};
    for (const std::string& name :
         {std::string(), std::string("."), std::string(".."), std::string("a/b"),
          std::string("/etc/passwd"), std::string("../5001"), std::string("a\0b", 3)}) {
        EXPECT_FALSE(home.Stat(name, info)) << name;
        EXPECT_FALSE(home.OpenOrMake(name, O_RDWR, 0600)) << name;
        EXPECT_FALSE(home.Replace(name, "x", 0600)) << name;
        EXPECT_FALSE(home.Remove(name)) << name;
        EXPECT_FALSE(home.Rename("a", name)) << name;
        EXPECT_FALSE(home.MakeFolder(name, 0700, {})) << name;
        EXPECT_FALSE(home.MakeLink(name, "/etc")) << name;
        EXPECT_EQ(errno, EINVAL) << name;
    }
}

TEST_F(Owned, StrangersEntryOfAnyKindCountsAsMissingAndIsKept) {
    const OwnedFolder home = Home();
    ASSERT_TRUE(File(kHome + "/file", "theirs"));
    ASSERT_TRUE(Link("/etc/passwd", kHome + "/link"));
    ASSERT_TRUE(Fifo(kHome + "/fifo"));
    ASSERT_TRUE(Folder(kHome + "/folder"));
    for (const char* name : {"file", "link", "fifo", "folder"}) {
        std::string text;
        EXPECT_FALSE(home.Read(name, 100, text)) << name;
        EXPECT_EQ(errno, ENOENT) << name;
        EXPECT_TRUE(home.OpenOrMake(name, O_RDWR, 0600)) << name << ": and its place is free";
        EXPECT_EQ(OwnerOf(kHome + "/" + name), 0U);
    }
    EXPECT_EQ(Aside(kHome).size(), 4U);
}

TEST_F(Owned, StrangersFileWhereOnlyRootCouldHavePutItIsRefusedAndStays) {
    Home();
    ASSERT_EQ(chmod(kHome.c_str(), 0755), 0);
    PutText(kHome + "/f", "restored from somewhere");
    ASSERT_EQ(chown((kHome + "/f").c_str(), kMallory, 100), 0);
    std::string text;
    EXPECT_FALSE(Open().Read("f", 100, text));
    EXPECT_EQ(errno, EPERM);
    EXPECT_EQ(Text(kHome + "/f"), "restored from somewhere");
}

TEST_F(Owned, ReplaceLeavesTheNewFileAndNothingElse) {
    const OwnedFolder home = Home();
    PutText(kHome + "/f", "old");
    const mode_t saved = umask(077);
    EXPECT_TRUE(home.Replace("f", "new", 0644, {kAmy, 100}));
    umask(saved);
    EXPECT_EQ(Text(kHome + "/f"), "new");
    EXPECT_EQ(OwnerOf(kHome + "/f"), kAmy);
    EXPECT_EQ(ModeOf(kHome + "/f"), 0644U);
    EXPECT_EQ(std::distance(fs::directory_iterator(kHome), fs::directory_iterator()), 1);
}

TEST_F(Owned, ReplaceTakesAPlaceFromAStrangerAlsoForAServiceThatActsAsTheUser) {
    const OwnedFolder home = Home();
    ASSERT_TRUE(Link("/etc/passwd", kHome + "/f"));
    ASSERT_EQ(seteuid(kAmy), 0);
    const bool replaced = home.Replace("f", "amy's", 0600, {kAmy, 100});
    ASSERT_EQ(seteuid(0), 0);
    EXPECT_TRUE(replaced);
    EXPECT_EQ(Text(kHome + "/f"), "amy's");
}

TEST_F(Owned, WorksOnTheFolderThatWasOpenedWhateverTakesItsPlace) {
    const OwnedFolder home = Home();
    fs::rename(kHome, kShared + "/elsewhere");
    fs::create_directory_symlink(kVictim, kHome);
    EXPECT_TRUE(home.Replace("f", "text", 0600));
    EXPECT_TRUE(home.OpenOrMake("g", O_RDWR, 0600));
    EXPECT_TRUE(home.MakeFolder("h", 0700, {kAmy, 100}));
    EXPECT_TRUE(IsVictimUntouched());
    EXPECT_TRUE(fs::exists(kShared + "/elsewhere/f"));
}

TEST_F(Owned, LockKeepsOthersOutUntilItIsClosed) {
    const OwnedFolder home = Home();
    UniqueFd first = home.Lock("l", LOCK_EX | LOCK_NB, 0600);
    EXPECT_TRUE(first);
    EXPECT_FALSE(home.Lock("l", LOCK_EX | LOCK_NB, 0600));
    EXPECT_EQ(errno, EWOULDBLOCK);
    first.Reset();
    EXPECT_TRUE(home.Lock("l", LOCK_EX | LOCK_NB, 0600));
}

TEST_F(Owned, FolderThatWasNotOpenedDoesNothing) {
    const OwnedFolder none;
    struct stat info {};
    std::string text;
    EXPECT_FALSE(none.Stat("f", info));
    EXPECT_FALSE(none.Read("f", 1, text));
    EXPECT_FALSE(none.Replace("f", "x", 0600));
    EXPECT_FALSE(none.Remove("f"));
    EXPECT_FALSE(none.MoveStrangerAside("f"));
    EXPECT_FALSE(none.OpenForReading());
}

TEST(EntryName, PathIsCutBehindItsLastSlash) {
    EXPECT_EQ(SplitPath("/a/b").folder, "/a");
    EXPECT_EQ(SplitPath("/a/b").name, "b");
    EXPECT_EQ(SplitPath("/b").folder, "/");
    EXPECT_EQ(SplitPath("b").folder, ".");
    EXPECT_EQ(SplitPath("b").name, "b");
    EXPECT_EQ(SplitPath("/a/").name, "");
}

}  // namespace
}  // namespace ZYROVFS
