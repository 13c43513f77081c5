// Unusual callers of the shipped library: one without an account on the server, one that asks for
// a path of a location that is not connected yet, and one that is no longer root.
#include <grp.h>
#include <gtest/gtest.h>
#include <signal.h>

#include <chrono>
#include <fstream>

#include "support/machine.h"
#include "zyrovfs/zyrovfs_netdrive.h"

namespace {

using namespace ZYROVFS;
using machine::Eventually;
using machine::InProcess;
using machine::Must;
using machine::RunAs;

constexpr unsigned kAmy = 4001;
constexpr unsigned kBen = 4002;
constexpr const char* kHello = "hello from the remote side\n";
constexpr unsigned kHangLimit = 30;  ///< seconds, after which SIGALRM tells of a hang

Json::Value Profile(unsigned port, const char* account, const char* password) {
    Json::Value profile;
    profile["protocol"] = "ftp";
    profile["hostname"] = "127.0.0.1";
    profile["port"] = port;
    profile["alias"] = "Caller";
    profile["account"] = account;
    profile["password"] = password;
    profile["codepage"] = "UTF-8";
    return profile;
}

/** An ftp server for everybody, on port 2122. It ends with the object. */
class AnonymousServer {
  public:
    AnonymousServer() {
        Must("mkdir -p /srv/public && printf 'for everybody\\n' >/srv/public/open.txt");
        std::ofstream("/run/remote/config/anonymous.conf")
            << "listen=YES\nlisten_address=127.0.0.1\nlisten_port=2122\nbackground=NO\n"
               "anonymous_enable=YES\nlocal_enable=NO\nno_anon_password=YES\n"
               "anon_root=/srv/public\nsecure_chroot_dir=/var/run/vsftpd/empty\n"
               "seccomp_sandbox=NO\nutf8_filesystem=YES\n";
        pid_ = fork();
        if (pid_ == 0) {
            setsid();
            execlp("vsftpd", "vsftpd", "/run/remote/config/anonymous.conf", nullptr);
            _exit(1);
        }
        Eventually(
            [] { return machine::Run("bash -c 'exec 3<>/dev/tcp/127.0.0.1/2122'").status == 0; });
    }
    AnonymousServer(const AnonymousServer&) = delete;
    AnonymousServer& operator=(const AnonymousServer&) = delete;
    ~AnonymousServer() {
        kill(-pid_, SIGKILL);
        waitpid(pid_, nullptr, 0);
    }

  private:
    pid_t pid_;
};

class Callers : public testing::Test {
  protected:
    static void SetUpTestSuite() {
        machine::AddUser("amy", kAmy);
        machine::AddUser("ben", kBen);
        machine::Remote("start secret");
        ASSERT_EQ(InProcess([] { return InitGlobal(kAmy, false) ? 0 : 1; }), 0);
    }
    /** Takes mount and record away again. */
    static void Forget(const std::string& id) {
        InProcess([&] {
            return InitGlobal(kAmy, false) &&
                           Server::Delete(kAmy, Server::VFS_CONFIG_CONNECT, id.c_str())
                       ? 0
                       : 1;
        });
    }
    static Json::Value Connections() {
        Json::Value document;
        Server::CfgAccess(kAmy, Server::VFS_CONFIG_CONNECT, Server::VFS_CONFIG_READ, document);
        return document["servers"];
    }
    static void Save(const Json::Value& profile, std::string& id) {
        Json::Value out;
        ASSERT_TRUE(Server::Add(kAmy, Server::VFS_CONFIG_SERVER, id, profile, false, out))
            << GetErrorName(GetError());
    }
};

TEST_F(Callers, WithoutAnAccountAreMountedTwiceAndStoredAsAnonymous) {
    const AnonymousServer server;
    ASSERT_EQ(InProcess([] {
                  std::string id;
                  Json::Value out;
                  return Server::Add(kAmy, Server::VFS_CONFIG_CONNECT, id, Profile(2122, "", ""),
                                     false, out)
                             ? 0
                             : int{GetError()};
              }),
              0);
    const Json::Value connections = Connections();
    ASSERT_EQ(connections.size(), 1U);
    const std::string id = connections.getMemberNames()[0];
    EXPECT_EQ(connections[id]["account"].asString(), "anonymous");
    const std::string path = connections[id]["path"].asString();
    EXPECT_EQ(RunAs("amy", "ls /var/tmp/user/4001/gvfs").output,
              "ftp:host=127.0.0.1,port=2122\nftp:host=127.0.0.1,port=2122,user=anonymous\n");
    EXPECT_TRUE(Eventually(
        [&] { return RunAs("amy", "cat '" + path + "/open.txt'").output == "for everybody\n"; }));
    Forget(id);
}

/** 0 when `find` tells a path at which the remote file can be read. */
int FindInner(const std::function<bool(std::string& full)>& find) {
    return InProcess([&] {
        alarm(kHangLimit);
        std::string full;
        return InitGlobal(kAmy, false) && find(full) &&
                       Eventually([&] { return machine::Read(full) == "second level\n"; })
                   ? 0
                   : 1;
    });
}

TEST_F(Callers, WhoAskForAPathOfASavedLocationGetItConnected) {
    std::string id;
    ASSERT_NO_FATAL_FAILURE(Save(Profile(2121, "remo", "secret"), id));
    ASSERT_FALSE(Connections().isMember(id));
    const std::string uri = id + "/docs/inner.txt";
    EXPECT_EQ(
        FindInner([&](std::string& full) { return Utils::GetFullPathByConfig(uri.c_str(), full); }),
        0);
    EXPECT_TRUE(Connections().isMember(id));

    Forget(id);
    ASSERT_FALSE(Connections().isMember(id));
    EXPECT_EQ(FindInner([&](std::string& full) {
                  std::string remote;
                  return Utils::GetFullPath(kAmy, id.c_str(), "docs/inner.txt", "UTF-8", remote,
                                            full) &&
                         remote == "docs/inner.txt";
              }),
              0)
        << "in the child that asks as the user, too";
    EXPECT_TRUE(Connections().isMember(id));
    Forget(id);
}

/** Becomes the user for good and connects; the code, 0 for success, -SIGALRM for a hang. */
int ConnectWithoutRoot(unsigned uid) {
    return InProcess([=] {
        alarm(kHangLimit);
        if (setgroups(0, nullptr) != 0 || setresgid(100, 100, 100) != 0 ||
            setresuid(uid, uid, uid) != 0) {
            return 200;
        }
        std::string id;
        Json::Value out;
        return Server::Add(uid, Server::VFS_CONFIG_CONNECT, id, Profile(2121, "remo", "secret"),
                           false, out)
                   ? 0
                   : 100 + GetError();
    });
}

TEST_F(Callers, WhoHaveDroppedRootForGoodCanConnectButStartNoDaemons) {
    EXPECT_EQ(ConnectWithoutRoot(kAmy), 0) << "with the daemons up there is no need of root";
    Forget("ftp://remo@127.0.0.1:2121");
    const auto start = std::chrono::steady_clock::now();
    EXPECT_EQ(ConnectWithoutRoot(kBen), 100 + VFS_ERR_ACCESS_DENIED);
    EXPECT_LT(std::chrono::steady_clock::now() - start, std::chrono::seconds(15));
    EXPECT_NE(machine::Run("pgrep -u ben").status, 0) << "no daemon was left behind";
}

}  // namespace
