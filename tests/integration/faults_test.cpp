// What goes wrong around a connection, through the shipped library and against real servers: hosts
// that are silent or not there, killed children, certificates that nobody vouches for.
#include <gtest/gtest.h>
#include <signal.h>

#include <chrono>
#include <filesystem>
#include <fstream>

#include "support/machine.h"
#include "support/silent_host.h"
#include "support/test_certs.h"
#include "zyrovfs/zyrovfs_netdrive.h"

namespace {

using namespace ZYROVFS;
using machine::ChildOf;
using machine::Eventually;
using machine::InProcess;
using machine::Must;
using machine::Program;
using machine::RunAs;
using machine::SilentHost;
namespace fs = std::filesystem;

constexpr unsigned kAmy = 4001;
constexpr const char* kHello = "hello from the remote side\n";

/** Amy's chain is up before the first test, and stays up. */
class Host : public testing::Environment {
    void SetUp() override {
        machine::AddUser("amy", kAmy);
        machine::Remote("start secret");
        // Without a name server, "no such name" is a firm answer only where none is asked.
        Must("sed -i 's/^hosts:.*/hosts: files/' /etc/nsswitch.conf");
        ASSERT_EQ(InProcess([] { return InitGlobal(kAmy, false) ? 0 : 1; }), 0);
    }
};

const auto* const kHost = testing::AddGlobalTestEnvironment(new Host);

Json::Value Profile(const std::string& protocol, const std::string& host, unsigned port) {
    Json::Value profile;
    profile["protocol"] = protocol;
    profile["hostname"] = host;
    profile["port"] = port;
    profile["alias"] = "Faults";
    profile["account"] = "remo";
    profile["password"] = "secret";
    profile["codepage"] = "UTF-8";
    return profile;
}

/** 0, or the failure code, of a connection made by this process. */
int Add(const Json::Value& profile, bool force = false) {
    std::string id;
    Json::Value out;
    return Server::Add(kAmy, Server::VFS_CONFIG_CONNECT, id, profile, force, out) ? 0
                                                                                  : int{GetError()};
}

int AddInProcess(const Json::Value& profile, bool force = false) {
    return InProcess([&] { return Add(profile, force); });
}

/** Removes a connection. */
void Forget(const std::string& id) {
    InProcess([&] {
        return InitGlobal(kAmy, false) &&
                       Server::Delete(kAmy, Server::VFS_CONFIG_CONNECT, id.c_str())
                   ? 0
                   : 1;
    });
}

/** By a part of the id. */
bool IsRecorded(const std::string& id) {
    return machine::Read("/var/tmp/zyrovfs/4001/connect.conf").find(id) != std::string::npos;
}

// --- hosts ------------------------------------------------------------------------------------

struct HostFault {
    const char* what;
    const char* protocol;
    const char* host;
    unsigned port;
    __tag_vfs_err_ code;
};

class HostFaults : public testing::TestWithParam<HostFault> {};

TEST_P(HostFaults, IsToldByItsCodeAndLeavesNoRecord) {
    const HostFault& fault = GetParam();
    Json::Value profile = Profile(fault.protocol, fault.host, fault.port);
    const bool wrong_user = std::string(fault.what) == "WrongUser";
    if (wrong_user) {
        profile["account"] = "nobody-there";
    }
    EXPECT_EQ(AddInProcess(profile), fault.code);
    EXPECT_FALSE(IsRecorded(wrong_user ? "nobody-there" : fault.host));
}

// GIO's codes count whatever their domain: the resolver's "not found" is 0, as "failed" is. Of a
// missing route ssh tells its client only that the connection failed.
const HostFault kHostFaults[] = {
    {"WrongUser", "ftp", "127.0.0.1", 2121, VFS_ERR_WRONG_PASSWORD},
    {"WrongUser", "sftp", "127.0.0.1", 2222, VFS_ERR_WRONG_PASSWORD},
    {"WrongUser", "dav", "127.0.0.1", 8080, VFS_ERR_WRONG_USERNAME},
    {"WrongUser", "davs", "localhost", 8443, VFS_ERR_ACCESS_DENIED},
    {"NoRoute", "ftp", "203.0.113.1", 21, VFS_ERR_HOST_UNREACHABLE},
    {"NoRoute", "sftp", "203.0.113.1", 22, VFS_ERR_ACCESS_DENIED},
    {"NoRoute", "dav", "203.0.113.1", 80, VFS_ERR_HOST_UNREACHABLE},
    {"NoRoute", "davs", "203.0.113.1", 443, VFS_ERR_HOST_UNREACHABLE},
    {"NoName", "ftp", "nowhere.invalid", 21, VFS_ERR_ACCESS_DENIED},
    {"NoName", "sftp", "nowhere.invalid", 22, VFS_ERR_HOST_UNREACHABLE},
    {"NoName", "dav", "nowhere.invalid", 80, VFS_ERR_ACCESS_DENIED},
    {"NoName", "davs", "nowhere.invalid", 443, VFS_ERR_HOST_UNREACHABLE},
};

INSTANTIATE_TEST_SUITE_P(All, HostFaults, testing::ValuesIn(kHostFaults), [](const auto& param) {
    return std::string(param.param.what) + "_" + param.param.protocol;
});

class SilentHosts : public testing::TestWithParam<const char*> {};

TEST_P(SilentHosts, AreWaitedForAndFailOnceTheyClose) {
    SilentHost host;
    const Json::Value profile = Profile(GetParam(), "127.0.0.1", host.Port());
    Program program([&] {
        host.Close();  // this process's copy
        return Add(profile);
    });
    usleep(2000000);
    EXPECT_FALSE(program.IsDone()) << "there is no time limit but the server's own";
    host.Close();
    EXPECT_EQ(program.Result(), VFS_ERR_ACCESS_DENIED);
}

INSTANTIATE_TEST_SUITE_P(Protocols, SilentHosts, testing::Values("ftp", "sftp", "dav"),
                         [](const auto& param) { return std::string(param.param); });

class FrozenServers : public testing::TestWithParam<HostFault> {};

TEST_P(FrozenServers, FailCleanlyWhenTheyAreKilledDuringAMount) {
    const HostFault& server = GetParam();
    const std::string id =
        std::string(server.protocol) + "://remo@" + server.host + ":" + std::to_string(server.port);
    const pid_t pid =
        atoi(machine::Read(std::string("/run/remote/") + server.what + ".pid").c_str());
    ASSERT_EQ(kill(pid, SIGSTOP), 0);
    Program program([&] { return Add(Profile(server.protocol, server.host, server.port)); });
    usleep(1000000);
    EXPECT_FALSE(program.IsDone());
    machine::Remote(std::string("stop ") + server.what);
    EXPECT_EQ(program.Result(), server.code);
    machine::Remote(std::string("restart ") + server.what);
    EXPECT_FALSE(IsRecorded(id));
    EXPECT_EQ(AddInProcess(Profile(server.protocol, server.host, server.port)), 0);
    Forget(id);
}

INSTANTIATE_TEST_SUITE_P(
    Protocols, FrozenServers,
    testing::Values(HostFault{"ftp", "ftp", "127.0.0.1", 2121, VFS_ERR_ACCESS_DENIED},
                    HostFault{"dav", "dav", "127.0.0.1", 8080, VFS_ERR_ACCESS_DENIED}),
    [](const auto& param) { return std::string(param.param.what); });

// --- children and locks -----------------------------------------------------------------------

TEST(MountChild, KilledWhileItWaitsGivesFalseWithTheCellUnchangedAndTheLockFree) {
    SilentHost host;
    Program program([&] {
        const std::string uri = "ftp://127.0.0.1:" + std::to_string(host.Port());
        VFS session;
        if (!InitGlobal(kAmy, false) ||
            !session.Init("remo", "secret", uri.c_str(), "", "UTF-8", Json::Value(), false)) {
            return 10;
        }
        VFSSetErrEx(VFS_ERR_BUSY, "marker", 42);
        const bool mounted = session.Mount();
        const bool unchanged = GetError() == VFS_ERR_BUSY && GetErrorLine() == 42 &&
                               std::string(GetErrorFile()) == "marker";
        // The caller still runs: the lock must be free for others now.
        const int lock = InProcess([] { return Utils::LockMnt(true) ? 0 : 1; });
        return (mounted ? 1 : 0) + (unchanged ? 0 : 2) + (lock == 0 ? 0 : 4);
    });
    ASSERT_TRUE(Eventually([&] { return ChildOf(program.Pid()) > 0; }));
    usleep(500000);
    const pid_t child = ChildOf(program.Pid());
    ASSERT_GT(child, 0);
    ASSERT_EQ(kill(child, SIGKILL), 0);
    EXPECT_EQ(program.Result(), 0);
}

TEST(MountLockHeld, ByAnotherProcessIsWaitedFor) {
    int ready[2];
    ASSERT_EQ(pipe(ready), 0);
    Program holder([&] {
        setenv("ZYROVFS_UID", "4001", 1);
        const bool held = Utils::LockMnt(true);
        (void)!write(ready[1], "x", 1);
        usleep(1000000);
        return held && Utils::UnLockMnt() == 0 ? 0 : 1;
    });
    char byte;
    ASSERT_EQ(read(ready[0], &byte, 1), 1);
    const auto start = std::chrono::steady_clock::now();
    EXPECT_EQ(AddInProcess(Profile("ftp", "127.0.0.1", 2121)), 0);
    const auto took = std::chrono::steady_clock::now() - start;
    EXPECT_GT(took, std::chrono::milliseconds(800));
    EXPECT_LT(took, std::chrono::seconds(5));
    EXPECT_EQ(holder.Result(), 0);
    close(ready[0]);
    close(ready[1]);
    Forget("ftp://remo@127.0.0.1:2121");
}

// --- certificates -----------------------------------------------------------------------------

/** What the server at port 8443 shows from now on. */
void Show(const tls::Identity& identity) {
    std::ofstream("/srv/tls/server.pem") << identity.key << identity.certificate;
    machine::Remote("restart dav");
}

tls::Identity TestAuthority() {
    return {machine::Read("/srv/tls/ca.crt"), machine::Read("/srv/tls/ca.key")};
}

const Json::Value kDavs = Profile("davs", "localhost", 8443);
constexpr const char* kDavsId = "davs://remo@localhost:8443";

std::string ReadDavs() {
    return RunAs("amy", "cat /var/tmp/user/4001/gvfs/dav*ssl=true*/hello.txt").output;
}

class Certificates : public testing::Test {
  protected:
    static void TearDownTestSuite() {
        const tls::Identity authority = TestAuthority();
        Show(tls::Make({}, &authority));
    }
    void SetUp() override { fs::remove_all("/usr/zyro/etc/zyrovfs/4001/ssl"); }
    static bool IsSaved() { return fs::exists("/usr/zyro/etc/zyrovfs/4001/ssl/localhost:8443"); }
};

int forks_seen = 0;
/** Mounts without a chain: the code, +100 when there was a fork, +200 without the detail. */
int MountDavs(const std::string& subject, const std::string& issuer) {
    signal(SIGCHLD, [](int) { ++forks_seen; });
    setenv("ZYROVFS_UID", "4001", 1);
    VFS session;
    session.Init("remo", "secret", "davs://localhost:8443", "", "UTF-8", Json::Value(), false);
    if (session.Mount()) {
        return 0;
    }
    Json::Value detail;
    VFSGetJson(detail);
    const bool told = detail["subject"] == subject && detail["issuer"] == issuer &&
                      detail["availDate"].isInt64() && detail["expDate"].isInt64() &&
                      detail["availDate"] < detail["expDate"];
    return GetError() + (forks_seen > 0 ? 100 : 0) + (told ? 0 : 200);
}

TEST_F(Certificates, ThatNobodyVouchesForAreToldInDetailAndNothingIsForked) {
    Show(tls::Make({}));
    EXPECT_EQ(InProcess([] { return MountDavs("localhost", "localhost"); }),
              VFS_ERR_CERT_UNTRUSTED);
    EXPECT_EQ(AddInProcess(kDavs), VFS_ERR_CERT_UNTRUSTED);
    EXPECT_FALSE(IsSaved());
}

TEST_F(Certificates, ThatHaveExpiredAreNotTrusted) {
    const tls::Identity authority = TestAuthority();
    tls::CertSpec spec;
    spec.starts = -7200;
    spec.ends = -3600;
    Show(tls::Make(spec, &authority));
    EXPECT_EQ(InProcess([] { return MountDavs("localhost", "Test CA"); }), VFS_ERR_CERT_UNTRUSTED);
}

TEST_F(Certificates, ForAnotherHostAreNotTrusted) {
    const tls::Identity authority = TestAuthority();
    tls::CertSpec spec;
    spec.common_names = {"other.example"};
    spec.dns_names = {"other.example"};
    Show(tls::Make(spec, &authority));
    EXPECT_EQ(InProcess([] { return MountDavs("other.example", "Test CA"); }),
              VFS_ERR_CERT_UNTRUSTED);
}

// The stock backend asks about the certificate once more, in words that the library does not know
// and refuses; it goes on all the same. So what the library has checked is the check.
TEST_F(Certificates, ThatTheUserForcesAreSavedAndMount) {
    Show(tls::Make({}));
    ASSERT_EQ(AddInProcess(kDavs, true), 0);
    EXPECT_TRUE(IsSaved());
    EXPECT_TRUE(Eventually([] { return ReadDavs() == kHello; }));

    ASSERT_EQ(InProcess([] { return Server::Disconnect(kAmy, kDavsId) ? 0 : int{GetError()}; }), 0);
    EXPECT_TRUE(Eventually([] { return ReadDavs() != kHello; }));
    EXPECT_EQ(AddInProcess(kDavs), 0) << "what was forced once is trusted from then on";
    EXPECT_TRUE(Eventually([] { return ReadDavs() == kHello; }));
    Forget(kDavsId);
    EXPECT_FALSE(IsSaved());
}

TEST_F(Certificates, RenewedByAnotherThatNobodyVouchesForAreAskedAboutAgain) {
    Show(tls::Make({}));
    ASSERT_EQ(AddInProcess(kDavs, true), 0);
    ASSERT_TRUE(IsSaved());
    Show(tls::Make({}));
    EXPECT_EQ(InProcess([] { return MountDavs("localhost", "localhost"); }),
              VFS_ERR_CERT_UNTRUSTED);
    EXPECT_FALSE(IsSaved());
    EXPECT_EQ(AddInProcess(kDavs), VFS_ERR_CERT_UNTRUSTED) << "asking again is no decision";
    Forget(kDavsId);
    EXPECT_FALSE(IsRecorded(kDavsId));
}

}  // namespace
