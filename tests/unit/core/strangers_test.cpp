// What a second user of the machine can put in the way of the library, which works as root in
// folders that all may write to: root is led nowhere, believes nothing and waits for nobody.
#include <gtest/gtest.h>
#include <sys/file.h>
#include <zosplatform/file.h>
#include <zosplatform/task.h>

#include "support/other_process.h"
#include "support/stranger.h"
#include "zyrovfs/zyrovfs_netdrive.h"

namespace {

using namespace ZYROVFS;
using namespace ZYROVFS::Server;
using namespace stranger;
using scratch::PutText;
using scratch::Text;

constexpr const char* kId = "ftp://amy@nas.example";

Json::Value Profile() {
    Json::Value profile;
    profile["protocol"] = "ftp";
    return profile;
}

class Strangers : public testing::Test {
  protected:
    void SetUp() override {
        umask(022);
        for (const char* tree :
             {"/usr/zyro", "/var/tmp/zyrovfs", "/var/tmp/user", "/var/tmp/zos", "/tmp/zyrovfs"}) {
            fs::remove_all(tree);
        }
        setenv("ZYROVFS_UID", std::to_string(kAmy).c_str(), 1);
        MakeVictim();
        ResetError();
    }
    void TearDown() override { EXPECT_TRUE(IsVictimUntouched()); }

    const Patience patience_;
};

// --- profiles -----------------------------------------------------------------------------------

struct Store {
    const char* name;
    VFS_CONFIG_MODE mode;
    std::string folder;
    std::string file;
};

class StrangersAtProfiles : public Strangers, public testing::WithParamInterface<Store> {
  protected:
    void ExpectStored() {
        EXPECT_TRUE(IsRealFolder(GetParam().folder));
        EXPECT_EQ(OwnerOf(GetParam().folder + "/" + GetParam().file), kAmy);
        Json::Value profile;
        EXPECT_TRUE(CfgGetByID(kAmy, GetParam().mode, kId, profile));
        EXPECT_EQ(profile, Profile());
    }
};

TEST_P(StrangersAtProfiles, LinkInPlaceOfTheUsersFolderLeadsAnAppendNowhere) {
    MakeOpenToAll(fs::path(GetParam().folder).parent_path());
    ASSERT_TRUE(Link(kVictim, GetParam().folder));
    EXPECT_TRUE(CfgAppend(kAmy, GetParam().mode, kId, Profile()));
    ExpectStored();
}

TEST_P(StrangersAtProfiles, LinkInPlaceOfTheUsersFolderLeadsAChangeNowhere) {
    MakeOpenToAll(fs::path(GetParam().folder).parent_path());
    ASSERT_TRUE(Link(kVictim, GetParam().folder));
    std::string id = kId;
    EXPECT_TRUE(CfgSetByID(kAmy, GetParam().mode, id, id, Profile()));
    ExpectStored();
}

TEST_P(StrangersAtProfiles, FolderThatWasRenamedAwayByAStrangerDoesNotLeadElsewhere) {
    MakeOpenToAll(GetParam().folder);
    ASSERT_TRUE(As(kMallory, [] {
        const std::string folder = GetParam().folder;
        return rename(folder.c_str(), (folder + ".mine").c_str()) == 0 &&
               symlink(kVictim.c_str(), folder.c_str()) == 0;
    }));
    EXPECT_TRUE(CfgAppend(kAmy, GetParam().mode, kId, Profile()));
    ExpectStored();
}

TEST_P(StrangersAtProfiles, FolderAndDocumentOfAStrangersAreNotTheUsers) {
    MakeOpenToAll(fs::path(GetParam().folder).parent_path());
    ASSERT_TRUE(Folder(GetParam().folder));
    ASSERT_TRUE(File(GetParam().folder + "/" + GetParam().file,
                     "{\"servers\":{\"ftp://trap.example\":{\"protocol\":\"ftp\"}}}"));
    Json::Value profile;
    EXPECT_FALSE(CfgGetByID(kAmy, GetParam().mode, "ftp://trap.example", profile));
    EXPECT_TRUE(CfgAppend(kAmy, GetParam().mode, kId, Profile()));
    ExpectStored();
}

TEST_P(StrangersAtProfiles, DocumentThatAStrangerPlantedIsNotTheUsers) {
    ASSERT_TRUE(CfgCheckPath(kAmy, GetParam().mode));
    ASSERT_TRUE(File(GetParam().folder + "/" + GetParam().file,
                     "{\"servers\":{\"ftp://trap.example\":{\"protocol\":\"ftp\"}}}"));
    Json::Value profile;
    EXPECT_FALSE(CfgGetByID(kAmy, GetParam().mode, "ftp://trap.example", profile));
    EXPECT_EQ(GetError(), VFS_ERR_CONFIG_NOT_FOUND);
    EXPECT_TRUE(CfgAppend(kAmy, GetParam().mode, kId, Profile()));
    ExpectStored();
}

TEST_P(StrangersAtProfiles, ServiceThatActsAsTheUserIsSafeFromThemToo) {
    MakeOpenToAll(fs::path(GetParam().folder).parent_path());
    ASSERT_TRUE(Link(kVictim, GetParam().folder));
    ASSERT_EQ(seteuid(kAmy), 0);
    const bool appended = CfgAppend(kAmy, GetParam().mode, kId, Profile());
    ASSERT_EQ(seteuid(0), 0);
    EXPECT_TRUE(appended);
    ExpectStored();
}

INSTANTIATE_TEST_SUITE_P(Both, StrangersAtProfiles,
                         testing::Values(Store{"Saved", VFS_CONFIG_SERVER,
                                               "/usr/zyro/etc/zyrovfs/5001", "servers.conf"},
                                         Store{"Connected", VFS_CONFIG_CONNECT,
                                               "/var/tmp/zyrovfs/5001", "connect.conf"}),
                         [](const auto& param) { return param.param.name; });

TEST_F(Strangers, UpgradeKeepsWhatOlderVersionsLeftInOpenFolders) {
    for (const char* folder : {"/usr/zyro/etc/zyrovfs/5001", "/var/tmp/zyrovfs/5001"}) {
        MakeOpenToAll(folder);
    }
    const std::string text = std::string("{\"servers\":{\"") + kId + "\":{\"protocol\":\"ftp\"}}}";
    for (const char* file :
         {"/usr/zyro/etc/zyrovfs/5001/servers.conf", "/var/tmp/zyrovfs/5001/connect.conf"}) {
        PutText(file, text);
        ASSERT_EQ(chown(file, kAmy, 100), 0);
    }
    for (const VFS_CONFIG_MODE mode : {VFS_CONFIG_SERVER, VFS_CONFIG_CONNECT}) {
        Json::Value profile;
        EXPECT_TRUE(As(kAmy, [&] { return CfgGetByID(kAmy, mode, kId, profile); }))
            << "before root has come by";
        EXPECT_TRUE(CfgGetByID(kAmy, mode, kId, profile));
    }
    EXPECT_EQ(ModeOf("/usr/zyro/etc/zyrovfs"), 0755U);
    EXPECT_EQ(ModeOf("/var/tmp/zyrovfs"), 01777U);
}

TEST_F(Strangers, FirstProfileOfAMachineMakesNoFolderOfTheConfigurationForAllToChange) {
    ASSERT_TRUE(CfgCheckPath(kAmy, VFS_CONFIG_SERVER));
    for (const char* shared : {"/usr/zyro", "/usr/zyro/etc", "/usr/zyro/etc/zyrovfs"}) {
        EXPECT_EQ(ModeOf(shared), 0755U) << shared;
    }
    EXPECT_EQ(ModeOf("/usr/zyro/etc/zyrovfs/5001") & 0777U, 0777U);
}

// --- queues of tasks ----------------------------------------------------------------------------

TEST_F(Strangers, LinkInPlaceOfATypesFolderLeadsNoTaskOutOfTheRegistry) {
    MakeOpenToAll("/var/tmp/user/5001/zyrovfs/task");
    ASSERT_TRUE(Link(kVictim, "/var/tmp/user/5001/zyrovfs/task/copy"));
    TaskMgr tasks(3);
    EXPECT_TRUE(tasks.Add("copy", "job", getpid()));
    EXPECT_TRUE(tasks.Clean("copy", nullptr, 0, nullptr, nullptr, false));
    EXPECT_TRUE(IsRealFolder("/var/tmp/user/5001/zyrovfs/task/copy"));
    EXPECT_EQ(Text("/var/tmp/user/5001/zyrovfs/task/copy/copy"),
              "job\t" + std::to_string(getpid()) + "\n");
}

TEST_F(Strangers, LinkHigherUpLeadsNoTaskOutOfTheRegistry) {
    for (const char* linked : {"/var/tmp/user", "/var/tmp/user/5001", "/var/tmp/user/5001/zyrovfs",
                               "/var/tmp/user/5001/zyrovfs/task"}) {
        fs::remove_all("/var/tmp/user");
        if (fs::path(linked).parent_path() != "/var/tmp") {
            MakeOpenToAll(fs::path(linked).parent_path());
        }
        ASSERT_TRUE(Link(kVictim, linked));
        EXPECT_TRUE(TaskMgr(3).Add("copy", "job", getpid())) << linked;
        EXPECT_TRUE(IsVictimUntouched()) << linked;
    }
}

TEST_F(Strangers, LinksInPlaceOfTheFilesOfAQueueAreNotFollowed) {
    const std::string folder = "/var/tmp/user/5001/zyrovfs/task/copy";
    MakeOpenToAll(folder);
    for (const char* file : {"/copy", "/copy.lock", "/copy.clean.stamp", "/copy.tmp"}) {
        ASSERT_TRUE(Link(kVictim + file, folder + file));
    }
    TaskMgr tasks(3);
    EXPECT_TRUE(tasks.Add("copy", "job", getpid()));
    EXPECT_TRUE(tasks.Clean("copy", nullptr, 0, nullptr, nullptr, false));
    EXPECT_EQ(tasks.IsRunnable("copy", "job", getpid(), nullptr, nullptr), 1);
}

TEST_F(Strangers, TypeThatNamesAPathIsRefused) {
    TaskMgr tasks(3);
    std::string path;
    for (const char* name : {"..", ".", "a/b", "../../zyrovfs", "/etc"}) {
        EXPECT_FALSE(tasks.Add(name, "job", getpid())) << name;
        EXPECT_FALSE(tasks.Clean(name, nullptr, 0, nullptr, nullptr, false)) << name;
        EXPECT_EQ(tasks.IsRunnable(name, "job", getpid(), nullptr, nullptr), 0) << name;
        EXPECT_TRUE(tasks.IsAddable(name, getpid())) << name;
        EXPECT_FALSE(TaskMgr::GetTaskPath(name, path)) << name;
    }
    EXPECT_FALSE(fs::exists("/var/tmp/user"));
}

TEST_F(Strangers, LockOfAStrangersKeepsNoTaskWaiting) {
    const std::string folder = "/var/tmp/user/5001/zyrovfs/task/copy";
    MakeOpenToAll(folder);
    support::OtherProcess holder([&] {
        if (!scratch::BecomeUser(kMallory)) {
            return false;
        }
        const int fd = open((folder + "/copy.lock").c_str(), O_RDWR | O_CREAT | O_CLOEXEC, 0600);
        return fd >= 0 && flock(fd, LOCK_EX | LOCK_NB) == 0;
    });
    ASSERT_TRUE(holder.ok());
    EXPECT_TRUE(TaskMgr(3).Add("copy", "job", getpid()));
}

// --- the mount lock and one-line files ----------------------------------------------------------

TEST_F(Strangers, FifoWithAReaderInPlaceOfTheMountLockHangsNobody) {
    MakeOpenToAll("/tmp/zyrovfs/lock/user/5001");
    ASSERT_TRUE(Fifo("/tmp/zyrovfs/lock/user/5001/mnt.lock"));
    support::OtherProcess reader([] {
        return scratch::BecomeUser(kMallory) &&
               open("/tmp/zyrovfs/lock/user/5001/mnt.lock", O_RDONLY | O_NONBLOCK | O_CLOEXEC) >= 0;
    });
    ASSERT_TRUE(reader.ok());
    EXPECT_TRUE(Utils::LockMnt(true));
    EXPECT_EQ(Utils::UnLockMnt(), 0);
}

TEST_F(Strangers, LinkInPlaceOfTheMountLockLocksNoOtherFile) {
    MakeOpenToAll("/tmp/zyrovfs/lock/user/5001");
    PutText("/etc/precious", "");
    ASSERT_TRUE(Link("/etc/precious", "/tmp/zyrovfs/lock/user/5001/mnt.lock"));
    EXPECT_TRUE(Utils::LockMnt(true));
    EXPECT_TRUE(support::OthersCanLock("/etc/precious", LOCK_EX));
    EXPECT_EQ(Utils::UnLockMnt(), 0);
}

TEST_F(Strangers, LockThatRootMadeUnderAStrictUmaskIsTheUsersToo) {
    umask(077);
    ASSERT_TRUE(Utils::LockMnt(true));
    EXPECT_EQ(Utils::UnLockMnt(), 0);
    EXPECT_TRUE(As(kAmy, [] { return Utils::LockMnt(true); }));
}

TEST_F(Strangers, AddressAndPidOfAStrangersAreNotRead) {
    MakeOpenToAll("/var/tmp/user/5001/dbus");
    ASSERT_TRUE(File("/var/tmp/user/5001/dbus/dbus.path", "unix:path=/tmp/trap\n"));
    ASSERT_TRUE(File("/var/tmp/user/5001/dbus/dbus.pid", "1\n"));
    std::string line;
    EXPECT_FALSE(Utils::GetFileLine("/var/tmp/user/5001/dbus/dbus.path", line));
    EXPECT_FALSE(Utils::GetFileLine("/var/tmp/user/5001/dbus/dbus.pid", line));
    EXPECT_TRUE(Utils::CreateFile("/var/tmp/user/5001/dbus/dbus.path", "unix:path=/amys"));
    EXPECT_TRUE(Utils::GetFileLine("/var/tmp/user/5001/dbus/dbus.path", line));
    EXPECT_EQ(line, "unix:path=/amys");
}

TEST_F(Strangers, LineWithoutAnEndIsNotReadWhole) {
    const std::string path = "/var/tmp/user/5001/dbus/dbus.path";
    MakeOpenToAll("/var/tmp/user/5001/dbus");
    PutText(path, "");
    ASSERT_EQ(truncate(path.c_str(), off_t{1} << 30), 0);
    std::string line;
    EXPECT_FALSE(Utils::GetFileLine(path.c_str(), line));
}

// --- the policy ---------------------------------------------------------------------------------

TEST_F(Strangers, PolicyThatIsNotRootsIsRefused) {
    fs::create_directories("/usr/zyro/etc/zyrovfs");
    const char* policy = "/usr/zyro/etc/zyrovfs/user.conf";
    PutText(policy, "{\"user_enabled_type\":\"all\"}");
    std::string type;
    EXPECT_TRUE(Cfg::VFSUser().GetUserEnabledType(type));
    EXPECT_EQ(type, "all");
    ASSERT_EQ(chown(policy, kMallory, 100), 0);
    EXPECT_TRUE(Cfg::VFSUser().GetUserEnabledType(type));
    EXPECT_EQ(type, "admin");
    EXPECT_EQ(GetError(), VFS_ERR_CONFIG_READ);
    ASSERT_EQ(chown(policy, 0, 0), 0);
    ASSERT_EQ(chmod(policy, 0666), 0);
    EXPECT_TRUE(Cfg::VFSUser().GetUserEnabledType(type));
    EXPECT_EQ(type, "admin");
}

TEST_F(Strangers, LockOfAStrangersKeepsNoListBusy) {
    fs::remove("/tmp/userlock");
    support::OtherProcess holder([] {
        if (!scratch::BecomeUser(kMallory)) {
            return false;
        }
        const int fd = open("/tmp/userlock", O_RDWR | O_CREAT | O_CLOEXEC, 0600);
        return fd >= 0 && flock(fd, LOCK_EX | LOCK_NB) == 0;
    });
    ASSERT_TRUE(holder.ok());
    Json::Value out;
    EXPECT_TRUE(Cfg::VFSUser().List(0, -1, "local", "", "", true, false, out))
        << GetErrorName(GetError());
}

// --- the platform -------------------------------------------------------------------------------

TEST_F(Strangers, TouchFollowsNoLink) {
    MakeOpenToAll("/var/tmp/user/5001");
    ASSERT_TRUE(Link("/etc/passwd", "/var/tmp/user/5001/stamp"));
    struct stat before {};
    struct stat after {};
    ASSERT_EQ(stat("/etc/passwd", &before), 0);
    EXPECT_EQ(YLIBCFileTouch("/var/tmp/user/5001/stamp"), -1);
    ASSERT_TRUE(Link(kVictim, "/var/tmp/user/5001/folder"));
    EXPECT_EQ(YLIBCFileTouch("/var/tmp/user/5001/folder/stamp"), -1);
    ASSERT_EQ(stat("/etc/passwd", &after), 0);
    EXPECT_EQ(before.st_mtim.tv_nsec, after.st_mtim.tv_nsec);
    EXPECT_EQ(before.st_mtim.tv_sec, after.st_mtim.tv_sec);
}

TEST_F(Strangers, LockThroughAStrangersLinkIsRefused) {
    MakeOpenToAll("/var/tmp/user/5001");
    ASSERT_TRUE(Link(kVictim, "/var/tmp/user/5001/folder"));
    int fd = -1;
    EXPECT_EQ(YLIBCFileLockTimeByFile("/var/tmp/user/5001/folder/lock", 1, 0, &fd), 0);
}

TEST_F(Strangers, StoreOfTasksThatAStrangerMadeFirstDisablesNobodysTasks) {
    ASSERT_TRUE(Folder("/var/tmp/zos"));
    ASSERT_TRUE(Folder("/var/tmp/zos/task"));
    ASSERT_TRUE(Folder("/var/tmp/zos/task/amy"));
    ASSERT_TRUE(File("/var/tmp/zos/task/amy/planted.json", "{\"pid\":1}"));
    const auto task = ZOS::TaskMgr("amy").createTask(Json::Value(Json::objectValue));
    ASSERT_NE(task, nullptr);
    EXPECT_NE(ZOS::TaskMgr("amy").getTask(task->id()), nullptr);
    EXPECT_EQ(ZOS::TaskMgr("amy").getTask("planted"), nullptr) << "who reads it ends the process";
    EXPECT_EQ(OwnerOf("/var/tmp/zos"), 0U);
    EXPECT_EQ(ModeOf("/var/tmp/zos"), 0755U);
}

}  // namespace
