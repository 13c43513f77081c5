#include <gtest/gtest.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>
#include <zosplatform/process.h>

#include <cstdarg>
#include <filesystem>

#include "core/error_cell.h"
#include "core/paths.h"
#include "server/server_vfs.h"
#include "support/fake_location.h"
#include "support/other_process.h"
#include "support/profiles.h"
#include "support/seams.h"
#include "support/soup_seam.h"
#include "support/stranger.h"
#include "zyrovfs/utils.h"

namespace {

struct Execution {
    std::vector<std::string> arguments;
    uid_t uid;
    gid_t gid;
};
std::vector<Execution> executions;
int forced_status = 0;

}  // namespace

extern "C" {

/** No chain is started here; the server type goes on whatever came of it. */
int ZYRODZOSIsPrivilegedMode(void) {
    return 0;
}

int YLIBCExec(const char* path, ...) {
    std::vector<const char*> argv{path};
    va_list list;
    va_start(list, path);
    while (const char* argument = va_arg(list, const char*)) {
        argv.push_back(argument);
    }
    va_end(list);
    executions.push_back({{argv.begin(), argv.end()}, geteuid(), getegid()});
    if (forced_status != 0) {
        errno = EACCES;
        return forced_status;
    }
    argv.push_back(nullptr);
    return YLIBCExecv(path, argv.data());
}

}  // extern "C"

namespace ZYROVFS::Server {
namespace {

using profiles::kUser;
using Calls = std::vector<std::string>;

const std::string kKnownHosts = paths::KnownHosts(kUser);
constexpr const char* kKey =
    "ssh-ed25519 AAAAC3NzaC1lZDI1NTE5AAAAIGPmzVn0t3Ql9jW0hEYQ0Q8m9rP"
    "T1rBqS9gq1b0m0v3X\n";

class VfsServerMount : public profiles::ProfileTest {
  protected:
    void SetUp() override {
        ProfileTest::SetUp();
        fake_location::Reset();
        soup_seam::Reset();
        executions.clear();
        forced_status = 0;
        conf["protocol"] = "sftp";
        conf["hostname"] = "nas.example";
        conf["port"] = 2222;
        conf["alias"] = "Home";
        conf["account"] = "amy";
        conf["password"] = "secret";
        conf["codepage"] = "UTF-8";
        conf["uri_path"] = "pub";
    }
    void TearDown() override { soup_seam::Reset(); }

    void Load() {
        ASSERT_TRUE(server.Load(kUser, VFS_CONFIG_CONNECT, conf, false, false));
        ResetError();
        seams::Reset();
    }
    bool Mount() { return server.Mount(kUser, VFS_CONFIG_CONNECT, conf, false); }
    bool Delete(VFS_CONFIG_MODE mode) { return server.DeletePostProcess(kUser, mode); }

    Json::Value Stored() {
        Json::Value out;
        EXPECT_TRUE(server.CreateJsonObj(kUser, VFS_CONFIG_CONNECT, out, false));
        return out;
    }
    /** Key and certificate of the host, in a folder that is the user's. */
    void Trust(const std::string& known_hosts, const std::string& certificate) {
        profiles::PutText(kKnownHosts, known_hosts);
        ASSERT_EQ(chown(kKnownHosts.c_str(), kUser, 100), 0);
        const std::string folder = std::filesystem::path(kKnownHosts).parent_path();
        ASSERT_EQ(chown(folder.c_str(), kUser, 100), 0);
        profiles::PutText(certificate, "certificate");
    }

    Json::Value conf;
    VFSServer server;
};

// --- mount --------------------------------------------------------------------------------------

TEST_F(VfsServerMount, MountsTheRemotePathOnceWithAnAccount) {
    Load();
    ASSERT_TRUE(Mount()) << seams::LogDump();
    EXPECT_EQ(fake_location::Calls(), Calls{"mount sftp://amy@nas.example:2222/pub"});
}

TEST_F(VfsServerMount, AccountsWithReservedCharactersMountTheirOwnServer) {
    const std::map<std::string, std::string> accounts = {
        {"a@b", "a%40b"}, {"a/b", "a%2Fb"}, {"a?b", "a%3Fb"}, {"a#b", "a%23b"}};
    fake_location::rules.path = [](const std::string& uri) { return "/local of " + uri; };
    for (const auto& [account, escaped] : accounts) {
        conf["account"] = account;
        Load();
        const size_t before = fake_location::Calls().size();
        ASSERT_TRUE(Mount()) << seams::LogDump();
        const std::string uri = "sftp://" + escaped + "@nas.example:2222/pub";
        EXPECT_EQ(fake_location::Calls()[before], "mount " + uri);
        EXPECT_EQ(Stored()["path"], "/local of " + uri);
        ASSERT_TRUE(server.Unmount(kUser, VFS_CONFIG_CONNECT)) << seams::LogDump();
        EXPECT_EQ(fake_location::Calls().back(), "find " + uri);
    }
}

TEST_F(VfsServerMount, GoesOnWhenTheChainCouldNotBePrepared) {
    Load();
    EXPECT_TRUE(Mount());
    EXPECT_TRUE(seams::Logged("not support VFS in DZOS"));
}

TEST_F(VfsServerMount, RemotePathBecomesWhatTheBackendReports) {
    fake_location::rules.mount_path = "/home/amy";
    fake_location::rules.path = [](const std::string&) { return "/fuse/x"; };
    Load();
    ASSERT_TRUE(Mount());
    EXPECT_EQ(Stored()["uri_path"], "home/amy");
}

TEST_F(VfsServerMount, FailedMountKeepsItsCodeAndTheRemotePath) {
    fake_location::rules.mount = [](const std::string&) { return G_IO_ERROR_TIMED_OUT; };
    Load();
    EXPECT_FALSE(Mount());
    EXPECT_EQ(GetError(), VFS_ERR_HOST_UNREACHABLE);
    EXPECT_EQ(fake_location::Calls().size(), 1U);
    _tag_VFS_CONFIG_INFO_ info;
    server.DumpToStruct(kUser, VFS_CONFIG_CONNECT, info);
    EXPECT_EQ(info.uri_path, "pub");
}

TEST_F(VfsServerMount, EmptyAccountMountsTwiceAndIsStoredAsAnonymous) {
    fake_location::rules.path = [](const std::string&) { return "/fuse/x"; };
    conf["account"] = "";
    Load();
    ASSERT_TRUE(Mount()) << seams::LogDump();
    EXPECT_EQ(fake_location::Calls(), (Calls{"mount sftp://nas.example:2222/pub",
                                             "mount sftp://anonymous@nas.example:2222/pub"}));
    EXPECT_EQ(Stored()["account"], "anonymous");
    std::string id;
    ASSERT_TRUE(server.GetServerID(id));
    EXPECT_EQ(id, "sftp://anonymous@nas.example:2222");
}

TEST_F(VfsServerMount, EmptyAccountThatIsRefusedMountsOnce) {
    fake_location::rules.mount = [](const std::string&) { return G_IO_ERROR_PERMISSION_DENIED; };
    conf["account"] = "";
    Load();
    EXPECT_FALSE(Mount());
    EXPECT_EQ(fake_location::Calls().size(), 1U);
}

TEST_F(VfsServerMount, RefusedAnonymousMountKeepsTheAccountEmpty) {
    fake_location::rules.mount = [](const std::string& uri) {
        return uri.find("anonymous") == std::string::npos ? -1 : int{G_IO_ERROR_PERMISSION_DENIED};
    };
    conf["account"] = "";
    Load();
    EXPECT_FALSE(Mount());
    EXPECT_EQ(GetError(), VFS_ERR_WRONG_USERNAME);
    EXPECT_TRUE(seams::Logged("Failed to mount sftp://nas.example:2222/pub")) << seams::LogDump();
    _tag_VFS_CONFIG_INFO_ info;
    server.DumpToStruct(kUser, VFS_CONFIG_CONNECT, info);
    EXPECT_EQ(info.account, "");
}

TEST_F(VfsServerMount, WithoutAnIdTheMountIsLeftToTheNextStepAndAnswersTrue) {
    Load();
    SetErr(VFS_ERR_BUSY, {"before.cpp", 1});
    soup_seam::fail_new_after = 0;
    EXPECT_TRUE(Mount());
    EXPECT_EQ(GetError(), VFS_ERR_INVALID_SERVER);
    EXPECT_TRUE(seams::Logged("Failed to get server ID, uid=1234, mode=1, code=19"))
        << seams::LogDump();
    EXPECT_TRUE(fake_location::Calls().empty());
    Json::Value out;
    EXPECT_FALSE(server.CreateJsonObj(kUser, VFS_CONFIG_CONNECT, out, false));
    EXPECT_EQ(GetError(), VFS_ERR_INVALID_SERVER);
}

TEST_F(VfsServerMount, WithoutAnIdTheAnonymousMountFails) {
    conf["account"] = "";
    Load();
    // One URI is made for the first id; those of the mount belong to its child.
    soup_seam::fail_new_after = 1;
    EXPECT_FALSE(Mount());
    EXPECT_EQ(GetError(), VFS_ERR_INVALID_SERVER);
    EXPECT_TRUE(seams::Logged("GetServerID failed, code=5")) << seams::LogDump();
}

// --- unmount ------------------------------------------------------------------------------------

TEST_F(VfsServerMount, UnmountLooksForTheRemotePath) {
    Load();
    EXPECT_TRUE(server.Unmount(kUser, VFS_CONFIG_CONNECT));
    EXPECT_EQ(fake_location::Calls(), Calls{"find sftp://amy@nas.example:2222/pub"});
}

TEST_F(VfsServerMount, UnmountWithoutAnIdFails) {
    Load();
    soup_seam::fail_new_after = 0;
    EXPECT_FALSE(server.Unmount(kUser, VFS_CONFIG_CONNECT));
    EXPECT_EQ(GetError(), VFS_ERR_INVALID_SERVER);
    EXPECT_TRUE(seams::Logged("Failed to get server ID"));
}

TEST_F(VfsServerMount, FailedUnmountIsLogged) {
    conf["protocol"] = "1";
    Load();
    EXPECT_FALSE(server.Unmount(kUser, VFS_CONFIG_CONNECT));
    EXPECT_TRUE(seams::Logged("Unmount failed, id: 1://amy@nas.example:2222")) << seams::LogDump();
}

// --- after a delete -----------------------------------------------------------------------------

TEST_F(VfsServerMount, DeletedConnectionForgetsTheHostKeyAsTheUser) {
    Trust(std::string("[nas.example]:2222 ") + kKey + "other.example " + kKey,
          paths::SslDir(kUser) + "/other.example:1");
    Load();
    EXPECT_TRUE(Delete(VFS_CONFIG_CONNECT));
    ASSERT_EQ(executions.size(), 1U);
    EXPECT_EQ(executions[0].arguments,
              (Calls{"/usr/bin/ssh-keygen", "-R", "[nas.example]:2222", "-f", kKnownHosts}));
    EXPECT_EQ(executions[0].uid, kUser);
    EXPECT_EQ(executions[0].gid, 0U);
    EXPECT_EQ(geteuid(), 0U);
    EXPECT_EQ(profiles::Text(kKnownHosts), std::string("other.example ") + kKey);
    struct stat info {};
    ASSERT_EQ(stat(kKnownHosts.c_str(), &info), 0);
    EXPECT_EQ(info.st_uid, kUser);
    EXPECT_TRUE(std::filesystem::exists(paths::SslDir(kUser) + "/other.example:1"));
}

TEST_F(VfsServerMount, DeletedConnectionForgetsTheCertificate) {
    const std::string certificate = paths::SslDir(kUser) + "/nas.example:2222";
    Trust("", certificate);
    Load();
    EXPECT_TRUE(Delete(VFS_CONFIG_CONNECT));
    EXPECT_FALSE(std::filesystem::exists(certificate));
}

TEST_F(VfsServerMount, DeletedConnectionOfAnAccountWithReservedCharactersForgetsBoth) {
    const std::string certificate = paths::SslDir(kUser) + "/nas.example:2222";
    for (const char* account : {"a@b", "a/b", "a?b", "a#b"}) {
        executions.clear();
        Trust(std::string("[nas.example]:2222 ") + kKey, certificate);
        conf["account"] = account;
        Load();
        EXPECT_TRUE(Delete(VFS_CONFIG_CONNECT));
        ASSERT_EQ(executions.size(), 1U);
        EXPECT_EQ(executions[0].arguments[2], "[nas.example]:2222");
        EXPECT_FALSE(std::filesystem::exists(certificate)) << account;
    }
}

TEST_F(VfsServerMount, DeletedConnectionForgetsACertificateInBrackets) {
    const std::string certificate = paths::SslDir(kUser) + "/[::1]:2222";
    Trust("", certificate);
    conf["hostname"] = "::1";
    Load();
    EXPECT_TRUE(Delete(VFS_CONFIG_CONNECT));
    EXPECT_FALSE(std::filesystem::exists(certificate));
}

TEST_F(VfsServerMount, DeleteInServerModeRunsNeitherSshKeygenNorTheUnlink) {
    const std::string certificate = paths::SslDir(kUser) + "/nas.example:2222";
    const std::string hosts = std::string("[nas.example]:2222 ") + kKey;
    Trust(hosts, certificate);
    Load();
    EXPECT_TRUE(Delete(VFS_CONFIG_SERVER));
    EXPECT_TRUE(executions.empty());
    EXPECT_EQ(profiles::Text(kKnownHosts), hosts);
    EXPECT_TRUE(std::filesystem::exists(certificate));
}

TEST_F(VfsServerMount, NothingLearntIsNothingToForget) {
    Load();
    EXPECT_TRUE(Delete(VFS_CONFIG_CONNECT));
    EXPECT_TRUE(executions.empty());
    EXPECT_TRUE(seams::LogLines().empty()) << seams::LogDump();
}

TEST_F(VfsServerMount, SshKeygenThatDoesNotRunIsLoggedAndNoFailure) {
    const std::string certificate = paths::SslDir(kUser) + "/nas.example:2222";
    Trust("x", certificate);
    Load();
    forced_status = -1;
    EXPECT_TRUE(Delete(VFS_CONFIG_CONNECT));
    EXPECT_TRUE(seams::Logged("Failed to remove ssh key [nas.example]:2222, errno=D, Permission "
                              "denied") ||
                seams::Logged("Failed to remove ssh key [nas.example]:2222, errno=D, %m"))
        << seams::LogDump();
    EXPECT_FALSE(std::filesystem::exists(certificate));
}

TEST_F(VfsServerMount, FailureStatusOfSshKeygenIsNotLogged) {
    Trust("x", paths::SslDir(kUser) + "/nas.example:2222");
    Load();
    forced_status = 255;
    EXPECT_TRUE(Delete(VFS_CONFIG_CONNECT));
    EXPECT_FALSE(seams::LoggedPart("Failed to remove ssh key"));
}

TEST_F(VfsServerMount, RefusedSwitchOfIdentitySkipsTheHostKeyOnly) {
    const std::string certificate = paths::SslDir(kUser) + "/nas.example:2222";
    Trust("x", certificate);
    Load();
    seams::FailIdentity("setresuid", EPERM);
    EXPECT_TRUE(Delete(VFS_CONFIG_CONNECT));
    EXPECT_TRUE(executions.empty());
    EXPECT_TRUE(seams::Logged("Failed to change uid to 1234")) << seams::LogDump();
    EXPECT_FALSE(std::filesystem::exists(certificate));
}

TEST_F(VfsServerMount, CertificateThatCannotBeUnlinkedIsLogged) {
    const std::string certificate = paths::SslDir(kUser) + "/nas.example:2222";
    std::filesystem::create_directories(certificate);
    Load();
    EXPECT_TRUE(Delete(VFS_CONFIG_CONNECT));
    EXPECT_TRUE(seams::LoggedPart("Failed to unlink " + certificate)) << seams::LogDump();
}

TEST_F(VfsServerMount, HostNameDoesNotLeadOutOfTheFolderOfCertificates) {
    profiles::PutText(paths::UserConfigDir(kUser) + "/precious:2222", "keep me");
    std::filesystem::create_directories(paths::SslDir(kUser));
    conf["hostname"] = "..%2Fprecious";
    Load();
    EXPECT_TRUE(Delete(VFS_CONFIG_CONNECT));
    EXPECT_TRUE(seams::LoggedPart("Failed to unlink ")) << seams::LogDump();
    EXPECT_EQ(profiles::Text(paths::UserConfigDir(kUser) + "/precious:2222"), "keep me");
}

/** The folder of the user's profiles as all may write to it, and another user of the machine. */
class StrangerAtTrust : public VfsServerMount {
  protected:
    void SetUp() override {
        VfsServerMount::SetUp();
        stranger::MakeOpenToAll(paths::UserConfigDir(kUser));
    }
    const stranger::Patience patience_;
};

TEST_F(StrangerAtTrust, LinkInPlaceOfTheCertificatesLetsNothingBeUnlinked) {
    std::filesystem::create_directories("/etc/elsewhere");
    profiles::PutText("/etc/elsewhere/nas.example:2222", "keep me");
    ASSERT_TRUE(stranger::Link("/etc/elsewhere", paths::SslDir(kUser)));
    Load();
    EXPECT_TRUE(Delete(VFS_CONFIG_CONNECT));
    EXPECT_EQ(profiles::Text("/etc/elsewhere/nas.example:2222"), "keep me");
}

TEST_F(StrangerAtTrust, FifoInPlaceOfTheHostKeysHangsNobody) {
    const std::string folder = std::filesystem::path(kKnownHosts).parent_path();
    ASSERT_TRUE(stranger::Folder(folder));
    ASSERT_TRUE(stranger::Fifo(kKnownHosts));
    Load();
    EXPECT_TRUE(Delete(VFS_CONFIG_CONNECT));
    EXPECT_TRUE(executions.empty()) << "ssh-keygen would wait for a writer";
    EXPECT_TRUE(support::OthersCanLock(paths::MountLock(kUser).c_str(), LOCK_EX));
}

TEST_F(VfsServerMount, WithoutAnIdNothingIsForgotten) {
    Load();
    soup_seam::fail_new_after = 0;
    EXPECT_FALSE(Delete(VFS_CONFIG_CONNECT));
    EXPECT_EQ(GetError(), VFS_ERR_INVALID_SERVER);
    EXPECT_TRUE(seams::Logged("Failed to get server ID"));
}

TEST_F(VfsServerMount, WithoutTheMountLockNothingIsForgotten) {
    const std::string certificate = paths::SslDir(kUser) + "/nas.example:2222";
    Trust("x", certificate);
    Load();
    // A shared lock of this process cannot become an exclusive one.
    ASSERT_TRUE(Utils::LockMnt(false));
    EXPECT_FALSE(Delete(VFS_CONFIG_CONNECT));
    EXPECT_TRUE(seams::Logged("Fail to lock mnt"));
    EXPECT_TRUE(executions.empty());
    EXPECT_TRUE(std::filesystem::exists(certificate));
    // The level that was not taken was given back all the same: the lock is free again.
    EXPECT_TRUE(Utils::LockMnt(true));
    EXPECT_EQ(Utils::UnLockMnt(), 0);
}

TEST_F(VfsServerMount, EveryWayOutGivesOneLevelOfTheMountLockBack) {
    Load();
    for (const VFS_CONFIG_MODE mode : {VFS_CONFIG_SERVER, VFS_CONFIG_CONNECT}) {
        ASSERT_TRUE(Utils::LockMnt(true));
        EXPECT_TRUE(Delete(mode));
        Utils::UnLockMnt();
    }
    ASSERT_TRUE(Utils::LockMnt(false));
    EXPECT_TRUE(Delete(VFS_CONFIG_SERVER));
    EXPECT_TRUE(Utils::LockMnt(true)) << "the shared hold was given up";
    Utils::UnLockMnt();
}

}  // namespace
}  // namespace ZYROVFS::Server
