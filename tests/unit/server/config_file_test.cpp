// The profile files on a disk that fills up or refuses, among users who mean harm, and under kill.
#include <gmock/gmock.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <ctime>
#include <random>
#include <set>

#include "support/profiles.h"
#include "support/seams.h"

namespace ZYROVFS::Server {
namespace {

namespace fs = std::filesystem;
using profiles::Directory;
using profiles::File;
using profiles::kUser;
using profiles::Put;
using profiles::PutText;
using profiles::Stored;
using profiles::Text;

const VFS_CONFIG_MODE kModes[] = {VFS_CONFIG_SERVER, VFS_CONFIG_CONNECT};

Json::Value Profile(const std::string& alias) {
    Json::Value profile;
    profile["protocol"] = "ftp";
    profile["alias"] = alias;
    return profile;
}

Json::Value Two() {
    Json::Value servers;
    servers["ftp://a"] = Profile("a");
    servers["ftp://b"] = Profile("b");
    return servers;
}

struct stat Stat(const std::string& path) {
    struct stat info {};
    EXPECT_EQ(lstat(path.c_str(), &info), 0) << path;
    return info;
}

std::set<std::string> Names(const std::string& directory) {
    std::set<std::string> names;
    for (const fs::directory_entry& entry : fs::directory_iterator(directory)) {
        names.insert(entry.path().filename());
    }
    return names;
}

class ConfigFile : public profiles::ProfileTest {
  protected:
    /** A small disk of its own for the user's directory. */
    void MountDisk(VFS_CONFIG_MODE mode, const char* options) {
        disk_ = Directory(mode);
        fs::create_directories(disk_);
        ASSERT_EQ(mount("tmpfs", disk_.c_str(), "tmpfs", 0, options), 0) << strerror(errno);
    }
    void Remount(unsigned long flags) {
        ASSERT_EQ(mount(nullptr, disk_.c_str(), nullptr, MS_REMOUNT | flags, nullptr), 0);
    }
    void TakeDiskAway() {
        if (!disk_.empty()) {
            EXPECT_EQ(umount2(disk_.c_str(), MNT_DETACH), 0);
            disk_.clear();
        }
    }
    void TearDown() override { TakeDiskAway(); }

    /** Every write is refused with its code and leaves the document, and nothing beside it. */
    void ExpectNoWrite(VFS_CONFIG_MODE mode, const std::set<std::string>& names) {
        const std::string before = Text(File(mode));
        std::string same = "ftp://a", other = "ftp://c";
        const Json::Value large = Profile(std::string(1 << 17, 'x'));
        const auto refused = [&](bool result, __tag_vfs_err_ code, const char* what) {
            EXPECT_FALSE(result) << what;
            EXPECT_EQ(GetError(), code) << what;
            EXPECT_TRUE(seams::Logged("Json::Value::toFile failed: " + File(mode)))
                << what << seams::LogDump();
            EXPECT_EQ(Text(File(mode)), before) << what;
            EXPECT_EQ(Names(Directory(mode)), names) << what;
            ResetError();
            seams::Reset();
        };
        refused(CfgAppend(kUser, mode, "ftp://c", large), VFS_ERR_CONFIG_READ, "append");
        refused(CfgSetByID(kUser, mode, same, same, large), VFS_ERR_CONFIG_WRITE, "set");
    }

    std::string disk_;
};

TEST_F(ConfigFile, BelongsToItsUserAndIsReadByNobodyElse) {
    for (const VFS_CONFIG_MODE mode : kModes) {
        ASSERT_TRUE(CfgAppend(kUser, mode, "ftp://a", Profile("a")));
        const struct stat info = Stat(File(mode));
        EXPECT_EQ(info.st_uid, kUser);
        EXPECT_EQ(info.st_gid, 100U);
        EXPECT_EQ(info.st_mode & 07777, 0600U);
        EXPECT_TRUE(CfgDeleteByID(kUser, mode, "ftp://a"));
        EXPECT_EQ(Stat(File(mode)).st_uid, kUser) << "after every write";
    }
}

TEST_F(ConfigFile, OwnerThatCannotBeSetDoesNotFailTheWrite) {
    ASSERT_TRUE(CfgCheckPath(kUser, VFS_CONFIG_CONNECT));
    ASSERT_EQ(seteuid(4321), 0);
    const bool written = CfgAppend(kUser, VFS_CONFIG_CONNECT, "ftp://a", Profile("a"));
    ASSERT_EQ(seteuid(0), 0);
    EXPECT_TRUE(written);
    EXPECT_EQ(Stat(File(VFS_CONFIG_CONNECT)).st_uid, 4321U);
}

TEST_F(ConfigFile, LinkInItsPlaceIsNeitherReadNorFollowed) {
    const std::string victim = "/etc/zyrovfs-victim";
    for (const VFS_CONFIG_MODE mode : kModes) {
        PutText(victim, R"({"servers":{"ftp://a":{"protocol":"ftp"}}})");
        const std::string before = Text(victim);
        fs::create_directories(Directory(mode));
        fs::create_symlink(victim, File(mode));
        Json::Value profile;
        EXPECT_FALSE(CfgGetByID(kUser, mode, "ftp://a", profile));
        EXPECT_EQ(GetError(), VFS_ERR_CONFIG_READ);
        Json::Value doc;
        doc["servers"] = Two();
        EXPECT_TRUE(CfgAccess(kUser, mode, VFS_CONFIG_WRITE, doc));
        EXPECT_EQ(Text(victim), before);
        EXPECT_EQ(Stat(victim).st_uid, 0U) << "ownership must not go through a link";
        EXPECT_TRUE(S_ISREG(Stat(File(mode)).st_mode)) << "the link is replaced";
        EXPECT_EQ(Stored(mode), Two());
    }
}

TEST_F(ConfigFile, DanglingLinkReadsAsMissingAndIsReplaced) {
    fs::create_directories(Directory(VFS_CONFIG_CONNECT));
    fs::create_symlink("/nowhere/at/all", File(VFS_CONFIG_CONNECT));
    EXPECT_TRUE(CfgAppend(kUser, VFS_CONFIG_CONNECT, "ftp://a", Profile("a")));
    EXPECT_FALSE(fs::exists("/nowhere"));
    EXPECT_TRUE(S_ISREG(Stat(File(VFS_CONFIG_CONNECT)).st_mode));
}

TEST_F(ConfigFile, DirectoryInItsPlaceFailsTheReadAndTheWrite) {
    fs::create_directories(File(VFS_CONFIG_SERVER) + "/below");
    Json::Value doc;
    EXPECT_FALSE(CfgAppend(kUser, VFS_CONFIG_SERVER, "ftp://a", Profile("a")));
    EXPECT_EQ(GetError(), VFS_ERR_CONFIG_READ);
    doc["servers"] = Two();
    EXPECT_FALSE(CfgAccess(kUser, VFS_CONFIG_SERVER, VFS_CONFIG_WRITE, doc));
    EXPECT_TRUE(seams::Logged("Json::Value::toFile failed: " + File(VFS_CONFIG_SERVER)));
    EXPECT_EQ(Names(Directory(VFS_CONFIG_SERVER)), std::set<std::string>{"servers.conf"});
}

TEST_F(ConfigFile, FifoInItsPlaceHoldsNobodyUp) {
    fs::create_directories(Directory(VFS_CONFIG_CONNECT));
    ASSERT_EQ(mkfifo(File(VFS_CONFIG_CONNECT).c_str(), 0666), 0);
    Json::Value doc;
    EXPECT_TRUE(CfgAccess(kUser, VFS_CONFIG_CONNECT, VFS_CONFIG_READ, doc)) << "size 0 is empty";
    EXPECT_TRUE(doc["servers"].empty());
    EXPECT_TRUE(CfgAppend(kUser, VFS_CONFIG_CONNECT, "ftp://a", Profile("a")));
    EXPECT_TRUE(S_ISREG(Stat(File(VFS_CONFIG_CONNECT)).st_mode));
}

TEST_F(ConfigFile, FileInTheDirectorysPlaceGivesWay) {
    fs::remove_all(Directory(VFS_CONFIG_SERVER));
    PutText(Directory(VFS_CONFIG_SERVER), "in the way");
    EXPECT_TRUE(CfgAppend(kUser, VFS_CONFIG_SERVER, "ftp://a", Profile("a")));
    EXPECT_TRUE(Stored(VFS_CONFIG_SERVER).isMember("ftp://a"));
}

TEST_F(ConfigFile, DirectoryThatCannotBeMadeIsAFailure) {
    const std::string root = paths::kConnectRoot;
    fs::create_directories(root);
    ASSERT_EQ(mount("tmpfs", root.c_str(), "tmpfs", MS_RDONLY, nullptr), 0);
    EXPECT_FALSE(CfgCheckPath(kUser, VFS_CONFIG_CONNECT));
    EXPECT_EQ(GetError(), VFS_ERR_FAILED);
    EXPECT_TRUE(seams::Logged("Error VFS server config directory, uid: 1234")) << seams::LogDump();
    Json::Value out;
    EXPECT_FALSE(CfgAccess(kUser, VFS_CONFIG_CONNECT, VFS_CONFIG_READ, out));
    EXPECT_EQ(GetError(), VFS_ERR_FAILED);
    EXPECT_FALSE(CfgGetByID(kUser, VFS_CONFIG_CONNECT, "ftp://a", out));
    EXPECT_EQ(GetError(), VFS_ERR_CONFIG_READ) << "the operations name the read";
    ASSERT_EQ(umount2(root.c_str(), MNT_DETACH), 0);
}

TEST_F(ConfigFile, FullDiskKeepsTheOldDocument) {
    for (const VFS_CONFIG_MODE mode : kModes) {
        MountDisk(mode, "size=64k,mode=777");
        Put(mode, Two());
        ExpectNoWrite(mode, Names(Directory(mode)));
        TakeDiskAway();
    }
}

TEST_F(ConfigFile, DiskWithoutARoomForOneMoreFileKeepsTheOldDocument) {
    for (const VFS_CONFIG_MODE mode : kModes) {
        MountDisk(mode, "size=1m,nr_inodes=2,mode=777");
        Put(mode, Two());
        ExpectNoWrite(mode, Names(Directory(mode)));
        EXPECT_FALSE(CfgDeleteByID(kUser, mode, "ftp://a"));
        EXPECT_EQ(GetError(), VFS_ERR_CONFIG_READ);
        EXPECT_EQ(Stored(mode), Two());
        TakeDiskAway();
    }
}

TEST_F(ConfigFile, ReadOnlyDiskKeepsTheOldDocument) {
    for (const VFS_CONFIG_MODE mode : kModes) {
        MountDisk(mode, "mode=777");
        Put(mode, Two());
        Remount(MS_RDONLY);
        ExpectNoWrite(mode, Names(Directory(mode)));
        EXPECT_FALSE(CfgDeleteByID(kUser, mode, "ftp://a"));
        EXPECT_EQ(GetError(), VFS_ERR_CONFIG_READ);
        std::string other = "ftp://c";
        EXPECT_FALSE(CfgSetByID(kUser, mode, "ftp://a", other, Profile("c")));
        EXPECT_EQ(GetError(), VFS_ERR_CONFIG_READ) << "a change of id begins with a delete";
        EXPECT_TRUE(seams::Logged("CfgDeleteByID failed, uid=1234, mode=" + std::to_string(mode) +
                                  ", serverID=ftp://a, code=15"))
            << seams::LogDump();
        EXPECT_EQ(Stored(mode), Two());
        TakeDiskAway();
    }
}

TEST_F(ConfigFile, DiskThatFillsBetweenDeleteAndAppendLosesTheProfileButNotTheFile) {
    MountDisk(VFS_CONFIG_SERVER, "size=64k,mode=777");
    Put(VFS_CONFIG_SERVER, Two());
    std::string other = "ftp://c";
    EXPECT_FALSE(
        CfgSetByID(kUser, VFS_CONFIG_SERVER, "ftp://a", other, Profile(std::string(1 << 17, 'x'))));
    EXPECT_EQ(GetError(), VFS_ERR_CONFIG_READ);
    EXPECT_EQ(Stored(VFS_CONFIG_SERVER).getMemberNames(), std::vector<std::string>{"ftp://b"});
}

void SleepMicroseconds(long microseconds) {
    timespec time{0, microseconds * 1000};
    nanosleep(&time, nullptr);
}

/** Writes version after version until it is killed. */
[[noreturn]] void WriteForever(const Json::Value& even, const Json::Value& odd) {
    std::string id = "ftp://a";
    for (unsigned i = 0;; ++i) {
        if (!CfgSetByID(kUser, VFS_CONFIG_SERVER, id, id, i % 2 == 0 ? even : odd)) {
            _exit(1);
        }
    }
}

TEST_F(ConfigFile, KillAtAnyMomentLeavesOneWholeVersion) {
    const Json::Value even = Profile(std::string(60000, 'e'));
    const Json::Value odd = Profile(std::string(90000, 'o'));
    std::string id = "ftp://a";
    ASSERT_TRUE(CfgSetByID(kUser, VFS_CONFIG_SERVER, id, id, even));
    std::mt19937 random(20240229);
    std::uniform_int_distribution<long> wait(0, 5000);
    int seen[2] = {};
    for (int i = 0; i < 200; ++i) {
        const pid_t writer = fork();
        ASSERT_GE(writer, 0);
        if (writer == 0) {
            WriteForever(odd, even);
        }
        SleepMicroseconds(wait(random));
        kill(writer, SIGKILL);
        int status = 0;
        ASSERT_EQ(waitpid(writer, &status, 0), writer);
        ASSERT_TRUE(WIFSIGNALED(status)) << "the writer must not have failed before";
        Json::Value profile;
        ASSERT_TRUE(CfgGetByID(kUser, VFS_CONFIG_SERVER, "ftp://a", profile)) << i;
        ASSERT_TRUE(profile == even || profile == odd) << i;
        ++seen[profile == odd ? 1 : 0];
    }
    EXPECT_GT(seen[0], 0);
    EXPECT_GT(seen[1], 0) << "the writers must have written for this to say anything";
}

TEST_F(ConfigFile, TwoProcessesWriteForDifferentUsers) {
    constexpr int kWrites = 100;
    pid_t writers[2];
    for (unsigned n = 0; n < 2; ++n) {
        const unsigned uid = 5001 + n;
        fs::remove_all(Directory(VFS_CONFIG_SERVER, uid));
        writers[n] = fork();
        ASSERT_GE(writers[n], 0);
        if (writers[n] == 0) {
            int done = 0;
            for (int i = 0; i < kWrites; ++i) {
                const std::string id = "ftp://host" + std::to_string(i);
                done += CfgAppend(uid, VFS_CONFIG_SERVER, id.c_str(), Profile(id)) ? 1 : 0;
            }
            _exit(done == kWrites ? 0 : 1);
        }
    }
    for (unsigned n = 0; n < 2; ++n) {
        int status = 0;
        ASSERT_EQ(waitpid(writers[n], &status, 0), writers[n]);
        EXPECT_EQ(status, 0);
        EXPECT_EQ(Stored(VFS_CONFIG_SERVER, 5001 + n).size(), unsigned{kWrites});
        EXPECT_EQ(Stat(File(VFS_CONFIG_SERVER, 5001 + n)).st_uid, 5001 + n);
    }
}

}  // namespace
}  // namespace ZYROVFS::Server
