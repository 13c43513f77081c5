#include <dlfcn.h>
#include <gtest/gtest.h>
#include <sys/file.h>
#include <sys/mount.h>
#include <zosplatform/process.h>

#include <filesystem>

#include "core/identity.h"
#include "core/paths.h"
#include "support/fake_daemons.h"
#include "support/fake_location.h"
#include "support/profiles.h"
#include "support/seams.h"
#include "support/xattrtree/xattrtree.h"
#include "zyrovfs/server.h"

namespace {

/** What a call of the platform's program start is to answer, null to run the program. */
const int* forced_status = nullptr;
std::vector<std::string> executions;

}  // namespace

extern "C" int YLIBCExecv(const char* path, const char* const argv[]) {
    std::string line = path;
    for (int i = 1; argv[i] != nullptr; ++i) {
        line += std::string(" ") + argv[i];
    }
    executions.push_back(line);
    if (forced_status != nullptr) {
        errno = EIO;
        return *forced_status;
    }
    const auto real =
        reinterpret_cast<int (*)(const char*, const char* const[])>(dlsym(RTLD_NEXT, "YLIBCExecv"));
    return real(path, argv);
}

namespace ZYROVFS::Server {
namespace {

using Calls = std::vector<std::string>;
using std::filesystem::exists;

constexpr unsigned kUser = fakes::kUser;
const std::string kServers = profiles::File(VFS_CONFIG_SERVER, kUser);
const std::string kConnect = profiles::File(VFS_CONFIG_CONNECT, kUser);

class DeleteUserTest : public testing::Test {
  protected:
    void SetUp() override {
        for (const unsigned uid : {kUser, kUser + 1}) {
            for (const std::string& tree :
                 {paths::UserConfigDir(uid), paths::UserConnectDir(uid), paths::RuntimeDir(uid)}) {
                std::filesystem::remove_all(tree);
            }
        }
        std::filesystem::remove_all("/tmp/zyrovfs");
        fake_location::Reset();
        forced_status = nullptr;
        executions.clear();
        unsetenv("ZYROVFS_UID");
        Json::Value servers;
        servers["ftp://amy@nas.example"]["protocol"] = "ftp";
        servers["sftp://amy@nas.example:22"]["protocol"] = "sftp";
        profiles::Put(VFS_CONFIG_SERVER, servers, kUser);
        profiles::Put(VFS_CONFIG_CONNECT, servers, kUser);
        profiles::PutText(paths::FuseTree(kUser) + "/some:host=nas/film", "");
        ResetError();
    }

    static Json::Value Users(std::initializer_list<Json::Value> users) {
        Json::Value list(Json::arrayValue);
        for (const Json::Value& user : users) {
            list.append(user);
        }
        return list;
    }
    static bool Delete(Json::Value users, bool profiles, bool runtime) {
        return DeleteUser(users, profiles, runtime);
    }
};

/** The user's daemons as living processes, and the files that name them. */
struct LiveChain {
    LiveChain() {
        fakes::Write(paths::DbusPid(kUser), std::to_string(bus.pid()) + "\n");
        fakes::Write(paths::DbusAddress(kUser), "unix:path=/nowhere\n");
        fakes::Write(paths::GvfsdPid(kUser), std::to_string(gvfsd.pid()) + "\n");
        fakes::Write(paths::GvfsdFusePid(kUser), std::to_string(fuse.pid()) + "\n");
    }
    fakes::LiveProcess bus{"dbus-daemon", kUser};
    fakes::LiveProcess gvfsd{"gvfsd", kUser};
    fakes::LiveProcess fuse{"gvfsd-fuse", kUser};
};

TEST_F(DeleteUserTest, EmptyArrayDoesNothing) {
    EXPECT_TRUE(Delete(Users({}), true, true));
    EXPECT_TRUE(executions.empty());
    EXPECT_EQ(getenv("ZYROVFS_UID"), nullptr);
    EXPECT_TRUE(exists(kServers));
}

TEST_F(DeleteUserTest, WithoutRemoveProfilesTheSavedProfilesSurviveAndTheConnectionsGo) {
    EXPECT_TRUE(Delete(Users({kUser}), false, false));
    EXPECT_EQ(profiles::Stored(VFS_CONFIG_SERVER, kUser).size(), 2U);
    EXPECT_FALSE(exists(paths::UserConnectDir(kUser)));
    EXPECT_TRUE(exists(paths::RuntimeDir(kUser)));
    EXPECT_EQ(executions, Calls{"/bin/rm -rf /var/tmp/zyrovfs/4001"});
}

TEST_F(DeleteUserTest, WithRemoveProfilesBothGo) {
    EXPECT_TRUE(Delete(Users({kUser}), true, false));
    EXPECT_FALSE(exists(paths::UserConfigDir(kUser)));
    EXPECT_FALSE(exists(paths::UserConnectDir(kUser)));
    EXPECT_TRUE(exists(paths::RuntimeDir(kUser)));
    EXPECT_EQ(executions, (Calls{"/bin/rm -rf /usr/zyro/etc/zyrovfs/4001",
                                 "/bin/rm -rf /var/tmp/zyrovfs/4001"}));
}

TEST_F(DeleteUserTest, RuntimeGoesWhateverTheFuseTreeHolds) {
    EXPECT_TRUE(Delete(Users({kUser}), false, true));
    EXPECT_FALSE(exists(paths::RuntimeDir(kUser)));
    EXPECT_EQ(executions,
              (Calls{"/bin/rm -rf /var/tmp/zyrovfs/4001", "/bin/rm -rf /var/tmp/user/4001"}));
}

TEST_F(DeleteUserTest, RuntimeWithoutAFuseTreeGoesToo) {
    std::filesystem::remove_all(paths::FuseTree(kUser));
    fakes::Write(paths::RuntimeDir(kUser) + "/left", "over");
    EXPECT_TRUE(Delete(Users({kUser}), false, true));
    EXPECT_FALSE(exists(paths::RuntimeDir(kUser)));
    EXPECT_FALSE(seams::LoggedPart("opendir"));
}

TEST_F(DeleteUserTest, FuseTreeThatCannotBeOpenedIsLogged) {
    std::filesystem::remove_all(paths::FuseTree(kUser));
    fakes::Write(paths::FuseTree(kUser), "a file in its place");
    EXPECT_TRUE(Delete(Users({kUser}), false, true));
    EXPECT_TRUE(seams::Logged("Failed to opendir, path=/var/tmp/user/4001/gvfs"))
        << seams::LogDump();
    EXPECT_FALSE(exists(paths::RuntimeDir(kUser)));
}

TEST_F(DeleteUserTest, LiveFuseTreeWhosePidFilesAreGoneIsTakenAwayAndKeepsItsFiles) {
    std::filesystem::remove_all(paths::FuseTree(kUser));
    XattrTree tree(paths::FuseTree(kUser));
    tree.Add("/nas/film", 7);
    EXPECT_TRUE(Delete(Users({kUser}), false, true));
    EXPECT_FALSE(exists(paths::RuntimeDir(kUser))) << seams::LogDump();
    EXPECT_EQ(executions.back(), "/bin/rm -rf /var/tmp/user/4001") << "the mount was gone before";
}

TEST_F(DeleteUserTest, WhatIsMountedInARemovedTreeKeepsItsFiles) {
    const std::string point = paths::RuntimeDir(kUser) + "/disk";
    const std::string kept = std::string("/var/tmp/kept");
    for (const bool bind : {false, true}) {
        std::filesystem::create_directories(point);
        profiles::PutText(kept + "/film", "seen");
        ASSERT_EQ(bind ? mount(kept.c_str(), point.c_str(), nullptr, MS_BIND, nullptr)
                       : mount("tmpfs", point.c_str(), "tmpfs", 0, "size=1m"),
                  0);
        profiles::PutText(point + "/film", "seen");
        EXPECT_TRUE(Delete(Users({kUser}), false, true));
        const bool there = exists(point + "/film");
        umount2(point.c_str(), MNT_DETACH);
        EXPECT_TRUE(there) << bind;
        EXPECT_TRUE(seams::Logged("Failed to rm -rf /var/tmp/user/4001, errno=10"))
            << seams::LogDump();
    }
}

TEST_F(DeleteUserTest, FileSystemOfTheUserElsewhereInTheTreeStaysAndTheRestGoes) {
    const XattrTree tree(paths::UserConnectDir(kUser) + "/mine");
    EXPECT_TRUE(Delete(Users({kUser}), false, false));
    EXPECT_FALSE(exists(kConnect));
    EXPECT_TRUE(exists(tree.Folder()));
    EXPECT_EQ(executions,
              Calls{"/bin/rm -rf --one-file-system --preserve-root=all /var/tmp/zyrovfs/4001"});
    EXPECT_TRUE(seams::LoggedPart("Failed to rm -rf /var/tmp/zyrovfs/4001, errno="))
        << seams::LogDump();
}

TEST_F(DeleteUserTest, DeadDaemonsAreNotWokenToUnmount) {
    EXPECT_TRUE(Delete(Users({kUser}), true, true));
    EXPECT_TRUE(fake_location::Calls().empty());
    EXPECT_TRUE(seams::Sleeps().empty()) << "a daemon was started";
}

TEST_F(DeleteUserTest, EveryConnectionOfALivingChainIsUnmounted) {
    const LiveChain chain;
    EXPECT_TRUE(Delete(Users({kUser}), false, false)) << seams::LogDump();
    EXPECT_EQ(fake_location::Calls(),
              (Calls{"find ftp://amy@nas.example", "find sftp://amy@nas.example:22"}));
    EXPECT_FALSE(exists(kConnect));
}

/** A service that is one user by its effective id while it cleans up behind another. */
class DeleteUserOfAService : public DeleteUserTest {
  protected:
    void SetUp() override {
        DeleteUserTest::SetUp();
        ASSERT_EQ(seteuid(kUser + 7), 0);
    }
    void TearDown() override {
        EXPECT_EQ(geteuid(), kUser + 7) << "it is the caller again";
        ASSERT_EQ(seteuid(0), 0);
    }
    /** Steps of the test that only root may do. */
    template <typename Step>
    static auto AsRoot(Step step) {
        const EffectiveUid root(0);
        return step();
    }
};

TEST_F(DeleteUserOfAService, WaitsForTheLockOfTheUserWhoGoes) {
    const auto lock = AsRoot([] { return std::make_unique<fakes::ForeignLock>(); });
    EXPECT_TRUE(Delete(Users({kUser}), true, true));
    EXPECT_TRUE(AsRoot([] { return exists(kConnect); })) << "the caller's own lock was taken";
    EXPECT_FALSE(AsRoot([] { return exists(paths::MountLock(kUser + 7)); }));
}

TEST_F(DeleteUserOfAService, SeesThatUsersDaemonsAndUnmountsThatUsersServers) {
    auto chain = AsRoot([] { return std::make_unique<LiveChain>(); });
    EXPECT_TRUE(Delete(Users({kUser}), false, true)) << seams::LogDump();
    EXPECT_EQ(fake_location::Calls(),
              (Calls{"find ftp://amy@nas.example", "find sftp://amy@nas.example:22"}));
    EXPECT_TRUE(AsRoot([] { return exists(paths::RuntimeDir(kUser)); })) << "the chain lives";
    AsRoot([&] {
        chain.reset();  // which ends processes of that user
        return true;
    });
}

TEST_F(DeleteUserTest, ProcessWithoutRootTouchesNobodyElse) {
    fakes::InFreshProcess([] {
        ASSERT_EQ(setresuid(kUser + 7, kUser + 7, kUser + 7), 0);
        EXPECT_TRUE(Delete(Users({kUser}), true, true));
        EXPECT_TRUE(seams::LoggedPart("Failed to clean up behind user(4001) as 4008"))
            << seams::LogDump();
        EXPECT_TRUE(executions.empty());
    });
}

TEST_F(DeleteUserTest, MountsAreLookedForOnTheUsersOwnBus) {
    setenv("DBUS_SESSION_BUS_ADDRESS", "unix:path=/of/somebody/else", 1);
    const LiveChain chain;
    EXPECT_TRUE(Delete(Users({kUser}), false, false));
    EXPECT_STREQ(getenv("DBUS_SESSION_BUS_ADDRESS"), "unix:path=/nowhere");
}

TEST_F(DeleteUserTest, ConnectionThatCannotBeUnmountedIsLoggedAndTheRestGoesOn) {
    Json::Value servers;
    servers["a text that is no uri"]["protocol"] = "ftp";
    servers["ftp://amy@nas.example"]["protocol"] = "ftp";
    profiles::Put(VFS_CONFIG_CONNECT, servers, kUser);
    const LiveChain chain;
    EXPECT_TRUE(Delete(Users({kUser}), false, false));
    EXPECT_TRUE(
        seams::Logged("Failed to unmount vfs server, uid=4001, serverID=a text that is no uri"))
        << seams::LogDump();
    EXPECT_EQ(fake_location::Calls(), Calls{"find ftp://amy@nas.example"});
    EXPECT_FALSE(exists(kConnect));
}

TEST_F(DeleteUserTest, OneLivingDaemonKeepsTheRuntimeDirectory) {
    const fakes::LiveProcess gvfsd("gvfsd", kUser);
    fakes::Write(paths::GvfsdPid(kUser), std::to_string(gvfsd.pid()) + "\n");
    EXPECT_TRUE(Delete(Users({kUser}), false, true));
    EXPECT_TRUE(exists(paths::RuntimeDir(kUser)));
    EXPECT_TRUE(fake_location::Calls().empty());
    EXPECT_FALSE(exists(kConnect));
}

TEST_F(DeleteUserTest, ConnectionsThatCannotBeReadAreLoggedAndTheFilesGo) {
    profiles::PutText(kConnect, "{ no json");
    const LiveChain chain;
    EXPECT_TRUE(Delete(Users({kUser}), true, false));
    EXPECT_TRUE(seams::LoggedPart("Failed to list server config of user(4001), code="))
        << seams::LogDump();
    EXPECT_FALSE(exists(kConnect));
    EXPECT_FALSE(exists(kServers));
}

TEST_F(DeleteUserTest, DocumentsOfAnotherShapeAreNoCrash) {
    for (const char* text : {"[]", "7", "{\"servers\":[]}", "{\"servers\":\"x\"}", "{}"}) {
        profiles::PutText(kConnect, text);
        const LiveChain chain;
        EXPECT_NO_THROW(EXPECT_TRUE(Delete(Users({kUser}), false, false))) << text;
        EXPECT_FALSE(exists(kConnect)) << text;
    }
}

TEST_F(DeleteUserTest, FailedRemovalIsLoggedAndStillTrue) {
    const int status = 1;
    forced_status = &status;
    EXPECT_TRUE(Delete(Users({kUser}), true, true));
    for (const char* tree :
         {"/usr/zyro/etc/zyrovfs/4001", "/var/tmp/zyrovfs/4001", "/var/tmp/user/4001"}) {
        EXPECT_TRUE(seams::Logged(std::string("Failed to rm -rf ") + tree + ", errno=5"))
            << seams::LogDump();
    }
}

TEST_F(DeleteUserTest, WithoutTheMountLockNothingIsRemoved) {
    const fakes::ForeignLock lock;
    EXPECT_TRUE(Delete(Users({kUser}), true, true));
    EXPECT_TRUE(seams::Logged("Fail to lock mnt")) << seams::LogDump();
    EXPECT_TRUE(executions.empty());
    EXPECT_TRUE(exists(kServers));
    EXPECT_TRUE(exists(kConnect));
}

TEST_F(DeleteUserTest, MountLockIsFreeAfterwards) {
    EXPECT_TRUE(Delete(Users({kUser}), true, false));
    EXPECT_TRUE(fakes::LockIsFree());
}

TEST_F(DeleteUserTest, EveryUserOfTheArrayIsCleanedAndTheLastStaysInTheEnvironment) {
    profiles::PutText(profiles::File(VFS_CONFIG_CONNECT, kUser + 1), "{}");
    EXPECT_TRUE(Delete(Users({kUser, kUser + 1}), false, false));
    EXPECT_FALSE(exists(paths::UserConnectDir(kUser)));
    EXPECT_FALSE(exists(paths::UserConnectDir(kUser + 1)));
    EXPECT_STREQ(getenv("ZYROVFS_UID"), "4002");
    EXPECT_STREQ(getenv("XDG_RUNTIME_DIR"), "/var/tmp/user/4002");
    EXPECT_EQ(geteuid(), 0U);
}

TEST_F(DeleteUserTest, ElementsThatAreNoNumbersAreLeftOutAndTheOthersCleaned) {
    EXPECT_NO_THROW(EXPECT_TRUE(Delete(
        Users({"4001", -1, 1e300, 2.5, Json::Value(), Json::Value(Json::objectValue),
               Json::Value(Json::arrayValue), true, Json::Value(Json::UInt64(1) << 40), kUser}),
        false, false)));
    EXPECT_EQ(executions, Calls{"/bin/rm -rf /var/tmp/zyrovfs/4001"});
    EXPECT_TRUE(seams::LoggedPart("a user id is no number"));
}

TEST_F(DeleteUserTest, WhatIsNoArrayNamesNobody) {
    Json::Value object;
    object["uid"] = kUser;
    for (const Json::Value& users :
         {object, Json::Value(kUser), Json::Value("4001"), Json::Value()}) {
        EXPECT_NO_THROW(EXPECT_TRUE(Delete(users, true, true)));
    }
    EXPECT_TRUE(executions.empty());
    EXPECT_TRUE(exists(kServers));
}

}  // namespace
}  // namespace ZYROVFS::Server
