// The two files of a user on a disk that is full or cannot be written, and under writers that are
// killed: an operation fails with its code, and what stood in the file stands there still.
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/mount.h>

#include <filesystem>
#include <fstream>

#include "support/machine.h"
#include "zyrovfs/zyrovfs_netdrive.h"

namespace {

using namespace ZYROVFS;
using namespace ZYROVFS::Server;
using machine::Must;
namespace fs = std::filesystem;

constexpr unsigned kAmy = 4001;

Json::Value Profile(unsigned port) {
    Json::Value profile;
    profile["protocol"] = "ftp";
    profile["hostname"] = "127.0.0.1";
    profile["port"] = port;
    profile["alias"] = "Store";
    profile["account"] = "remo";
    profile["password"] = "secret";
    profile["codepage"] = "UTF-8";
    return profile;
}

struct Store {
    const char* name;
    VFS_CONFIG_MODE mode;
    const char* folder;
    const char* file;
};

const Store kStores[] = {
    {"Saved", VFS_CONFIG_SERVER, "/usr/zyro/etc/zyrovfs/4001",
     "/usr/zyro/etc/zyrovfs/4001/servers.conf"},
    {"Connected", VFS_CONFIG_CONNECT, "/var/tmp/zyrovfs/4001",
     "/var/tmp/zyrovfs/4001/connect.conf"},
};

/** Lays a small file system over the folder of a store, with two profiles in the file. */
class StoreFaults : public testing::TestWithParam<Store> {
  protected:
    void SetUp() override {
        fs::create_directories(GetParam().folder);
        ASSERT_EQ(mount("tmpfs", GetParam().folder, "tmpfs", 0, "size=64k,mode=777"), 0);
        ASSERT_TRUE(CfgAppend(kAmy, GetParam().mode, kId, Stored(2121)));
        ASSERT_TRUE(CfgAppend(kAmy, GetParam().mode, "ftp://remo@127.0.0.1:2122", Stored(2122)));
        before_ = machine::Read(GetParam().file);
        ASSERT_NE(before_, "");
    }
    void TearDown() override { ASSERT_EQ(umount(GetParam().folder), 0); }

    static Json::Value Stored(unsigned port) {
        Json::Value profile = Profile(port);
        char password[1024];
        EXPECT_NE(SzEncrypt("secret", password, sizeof password), 0);
        profile["password"] = password;
        return profile;
    }

    void FillDisk() {
        machine::Run(std::string("cat /dev/zero >") + GetParam().folder + "/filler");
        files_ = Files();
    }
    void MakeReadOnly() {
        ASSERT_EQ(mount("tmpfs", GetParam().folder, nullptr, MS_REMOUNT | MS_RDONLY, nullptr), 0);
        files_ = Files();
    }
    static std::string Files() { return Must(std::string("ls -A ") + GetParam().folder); }

    /** The codes of all operations that write, and the file as it was. */
    void ExpectFailuresThatChangeNothing() {
        const VFS_CONFIG_MODE mode = GetParam().mode;
        EXPECT_FALSE(CfgAppend(kAmy, mode, "ftp://remo@127.0.0.1:2123", Stored(2123)));
        EXPECT_EQ(GetError(), VFS_ERR_CONFIG_READ);
        std::string id = kId;
        EXPECT_FALSE(CfgSetByID(kAmy, mode, kId, id, Stored(2121)));
        EXPECT_EQ(GetError(), VFS_ERR_CONFIG_WRITE);
        std::string other = "ftp://remo@127.0.0.1:2129";
        EXPECT_FALSE(CfgSetByID(kAmy, mode, kId, other, Stored(2129)));
        EXPECT_EQ(GetError(), VFS_ERR_CONFIG_READ);
        EXPECT_FALSE(Server::Delete(kAmy, mode, kId));
        EXPECT_EQ(GetError(), VFS_ERR_CONFIG_READ);
        if (mode == VFS_CONFIG_SERVER) {
            ExpectSavedOperationsFail();
        }
        EXPECT_EQ(machine::Read(GetParam().file), before_);
        EXPECT_EQ(Files(), files_) << "a half-written file was left behind";
        Json::Value document;
        ASSERT_TRUE(CfgAccess(kAmy, mode, VFS_CONFIG_READ, document));
        EXPECT_EQ(document["servers"].size(), 2U);
    }

    /** What needs no mount. */
    static void ExpectSavedOperationsFail() {
        std::string id;
        Json::Value out;
        EXPECT_FALSE(Server::Add(kAmy, VFS_CONFIG_SERVER, id, Profile(2124), false, out));
        EXPECT_EQ(GetError(), VFS_ERR_CONFIG_READ);
        Json::Value change;
        change["alias"] = "Other";
        id = kId;
        EXPECT_FALSE(Server::Set(kAmy, VFS_CONFIG_SERVER, id, change, false));
        EXPECT_EQ(GetError(), VFS_ERR_FAILED);
        EXPECT_EQ(id, kId);
    }

    static constexpr const char* kId = "ftp://remo@127.0.0.1:2121";
    std::string before_;
    std::string files_;
};

TEST_P(StoreFaults, AFullDiskFailsEachOperationAndKeepsTheOldFile) {
    FillDisk();
    ExpectFailuresThatChangeNothing();
    ASSERT_EQ(unlink((std::string(GetParam().folder) + "/filler").c_str()), 0);
    EXPECT_TRUE(CfgAppend(kAmy, GetParam().mode, "ftp://remo@127.0.0.1:2123", Stored(2123)))
        << "and all is well once there is room again";
}

TEST_P(StoreFaults, AReadOnlyDiskFailsEachOperationAndKeepsTheOldFile) {
    ASSERT_NO_FATAL_FAILURE(MakeReadOnly());
    ExpectFailuresThatChangeNothing();
}

/** Rewrites one profile of the file again and again, each time with another long text. */
int WriteForEver(VFS_CONFIG_MODE mode) {
    const std::string id = "ftp://remo@127.0.0.1:2121";
    for (unsigned i = 0;; ++i) {
        Json::Value profile = Profile(2121);
        profile["alias"] = std::string(8000 + i % 1000, 'x');
        std::string new_id = id;
        CfgSetByID(kAmy, mode, id, new_id, profile);
    }
}

TEST_P(StoreFaults, TheListSurvivesAWriterThatIsKilledAtAnyMoment) {
    unsigned changed = 0;
    for (int round = 0; round < 40; ++round) {
        const pid_t writer = fork();
        if (writer == 0) {
            _exit(WriteForEver(GetParam().mode));
        }
        usleep(3000 + round * 370);
        ASSERT_EQ(kill(writer, SIGKILL), 0);
        waitpid(writer, nullptr, 0);
        Json::Value document;
        ASSERT_TRUE(CfgAccess(kAmy, GetParam().mode, VFS_CONFIG_READ, document)) << round;
        ASSERT_EQ(document["servers"].size(), 2U) << round;
        ASSERT_EQ(document["servers"]["ftp://remo@127.0.0.1:2122"]["port"].asUInt(), 2122U);
        changed += document["servers"][kId]["alias"].asString().size() >= 8000 ? 1 : 0;
        Must(std::string("rm -f ") + GetParam().file + ".??????");
    }
    EXPECT_GT(changed, 0U) << "no writer came as far as writing";
}

INSTANTIATE_TEST_SUITE_P(Both, StoreFaults, testing::ValuesIn(kStores),
                         [](const auto& param) { return std::string(param.param.name); });

}  // namespace
