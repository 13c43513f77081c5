// The three daemons of one user, killed and forged one after the other: the next program that uses
// the library finds what is dead, starts it again, and a mount works through the tree.
#include <gmock/gmock.h>
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
using testing::HasSubstr;

constexpr unsigned kAmy = 4001;
constexpr unsigned kBen = 4002;

constexpr const char* kTree = "/var/tmp/user/4001/gvfs";
constexpr const char* kFile =
    "/var/tmp/user/4001/gvfs/ftp:host=127.0.0.1,port=2121,user=remo/hello.txt";
constexpr const char* kHello = "hello from the remote side\n";

const std::string kRuntime = "/var/tmp/user/4001/";
const std::string kBusPid = kRuntime + "dbus/dbus.pid";
const std::string kBusPath = kRuntime + "dbus/dbus.path";
const std::string kGvfsdPid = kRuntime + "zyrovfs/gvfsd.pid";
const std::string kFusePid = kRuntime + "zyrovfs/gvfsd-fuse.pid";

struct Daemon {
    std::string pid_file;
    std::string name;
};

const Daemon kChain[] = {{kBusPid, "dbus-daemon"}, {kGvfsdPid, "gvfsd"}, {kFusePid, "gvfsd-fuse"}};

pid_t PidIn(const std::string& file) {
    return atoi(machine::Read(file).c_str());
}

bool IsGone(pid_t pid) {
    return kill(pid, 0) != 0 && errno == ESRCH;
}

void Kill(const std::string& pid_file) {
    const pid_t pid = PidIn(pid_file);
    ASSERT_GT(pid, 1) << pid_file;
    ASSERT_EQ(kill(pid, SIGKILL), 0) << pid_file;
    ASSERT_TRUE(Eventually([pid] { return IsGone(pid); }));
}

void Write(const std::string& path, const std::string& text) {
    std::ofstream(path) << text << '\n';
}

std::string StatusOf(pid_t pid) {
    return machine::Read("/proc/" + std::to_string(pid) + "/status");
}

/** Each daemon of the pid files lives, by name and user. */
void ExpectWholeChain() {
    for (const Daemon& daemon : kChain) {
        ASSERT_THAT(StatusOf(PidIn(daemon.pid_file)),
                    testing::AllOf(HasSubstr("Name:\t" + daemon.name + "\n"),
                                   HasSubstr("Uid:\t4001\t4001\t4001\t4001\n")))
            << daemon.pid_file;
    }
}

int Connect() {
    Json::Value profile;
    profile["protocol"] = "ftp";
    profile["hostname"] = "127.0.0.1";
    profile["port"] = 2121;
    profile["alias"] = "Chain";
    profile["account"] = "remo";
    profile["password"] = "secret";
    profile["codepage"] = "UTF-8";
    std::string id;
    Json::Value out;
    return Server::Add(kAmy, Server::VFS_CONFIG_CONNECT, id, profile, false, out) ? 0
                                                                                  : int{GetError()};
}

/** The next program that needs the connection: it must work up to the remote file. */
void ExpectThatTheNextUseWorks() {
    ASSERT_EQ(InProcess(Connect), 0);
    EXPECT_TRUE(Eventually([] {
        return RunAs("amy", std::string("cat '") + kFile + "'").output == kHello;
    })) << RunAs("amy", std::string("ls -l ") + kTree).output;
    ExpectWholeChain();
}

/** A process that is not a daemon of amy's; ends with the object. */
class Stranger {
  public:
    Stranger(const std::string& name, unsigned uid) {
        const std::string program = "/tmp/strangers/" + name;
        Must("mkdir -p /tmp/strangers && cp /bin/sleep " + program);
        pid_ = fork();
        if (pid_ == 0) {
            if (setresuid(uid, uid, uid) == 0) {
                execl(program.c_str(), program.c_str(), "600", nullptr);
            }
            _exit(1);
        }
        Eventually([this, &name] { return StatusOf(pid_).rfind("Name:\t" + name + "\n", 0) == 0; });
    }
    Stranger(const Stranger&) = delete;
    Stranger& operator=(const Stranger&) = delete;
    ~Stranger() {
        kill(pid_, SIGKILL);
        waitpid(pid_, nullptr, 0);
    }
    pid_t Pid() const { return pid_; }
    bool IsAlive() const { return waitpid(pid_, nullptr, WNOHANG) == 0; }

  private:
    pid_t pid_;
};

class DaemonChain : public testing::Test {
  protected:
    static void SetUpTestSuite() {
        machine::AddUser("amy", kAmy);
        machine::AddUser("ben", kBen);
        machine::Remote("start secret");
        ExpectThatTheNextUseWorks();
    }

    /** A test may begin with what the one before has left, but not with half a chain. */
    void SetUp() override { ASSERT_NO_FATAL_FAILURE(ExpectWholeChain()); }
};

TEST_F(DaemonChain, AHealthyChainIsUsedAndNotStartedAgain) {
    const pid_t before[] = {PidIn(kBusPid), PidIn(kGvfsdPid), PidIn(kFusePid)};
    const auto start = std::chrono::steady_clock::now();
    ExpectThatTheNextUseWorks();
    EXPECT_LT(std::chrono::steady_clock::now() - start, std::chrono::seconds(3));
    EXPECT_EQ(PidIn(kBusPid), before[0]);
    EXPECT_EQ(PidIn(kGvfsdPid), before[1]);
    EXPECT_EQ(PidIn(kFusePid), before[2]);
}

TEST_F(DaemonChain, ABusWithoutAnAddressFileIsToldByItsOwnCode) {
    const pid_t bus = PidIn(kBusPid);
    const std::string away = kBusPath + ".away";
    ASSERT_EQ(rename(kBusPath.c_str(), away.c_str()), 0);
    const auto init = [] { return InitGlobal(kAmy, false) ? 0 : int{GetError()}; };
    EXPECT_EQ(InProcess(init), VFS_ERR_DBUS_ADDRESS);
    EXPECT_NE(access(kBusPath.c_str(), F_OK), 0);
    EXPECT_EQ(PidIn(kBusPid), bus) << "a bus that lives is not started again";
    ASSERT_EQ(rename(away.c_str(), kBusPath.c_str()), 0);
    EXPECT_EQ(InProcess(init), 0);
}

TEST_F(DaemonChain, AKilledFuseDaemonLeavesAStaleMountPointThatIsRepaired) {
    const pid_t bus = PidIn(kBusPid);
    ASSERT_NO_FATAL_FAILURE(Kill(kFusePid));
    EXPECT_THAT(machine::Run(std::string("ls ") + kTree).output,
                HasSubstr("Transport endpoint is not connected"));
    ExpectThatTheNextUseWorks();
    EXPECT_EQ(PidIn(kBusPid), bus);
    EXPECT_EQ(Must(std::string("grep -c ' ") + kTree + " ' /proc/mounts"), "1\n")
        << "the stale mount must be gone, not covered";
}

TEST_F(DaemonChain, ForcedInitWithADeadDaemonStartsNothingAndAnswersTrue) {
    const pid_t dead = PidIn(kFusePid);
    ASSERT_NO_FATAL_FAILURE(Kill(kFusePid));
    EXPECT_EQ(InProcess([] {
                  const bool answer = InitGlobal(kAmy, true);
                  const bool environment =
                      std::string(getenv("ZYROVFS_UID")) == "4001" &&
                      std::string(getenv("XDG_RUNTIME_DIR")) == "/var/tmp/user/4001" &&
                      getenv("DBUS_SESSION_BUS_ADDRESS") == nullptr;
                  return answer && environment ? 0 : 1;
              }),
              0);
    EXPECT_EQ(PidIn(kFusePid), dead);
    EXPECT_NE(machine::Run("pgrep -u amy -x gvfsd-fuse").status, 0);
    ExpectThatTheNextUseWorks();
}

TEST_F(DaemonChain, AKilledGvfsdIsStartedAgainOnTheSameBus) {
    const pid_t bus = PidIn(kBusPid);
    const pid_t gvfsd = PidIn(kGvfsdPid);
    ASSERT_NO_FATAL_FAILURE(Kill(kGvfsdPid));
    ExpectThatTheNextUseWorks();
    EXPECT_NE(PidIn(kGvfsdPid), gvfsd);
    EXPECT_EQ(PidIn(kBusPid), bus);
}

TEST_F(DaemonChain, AKilledBusIsStartedAgainWithANewAddress) {
    const std::string address = machine::Read(kBusPath);
    ASSERT_NO_FATAL_FAILURE(Kill(kBusPid));
    ExpectThatTheNextUseWorks();
    EXPECT_NE(machine::Read(kBusPath), address);
}

TEST_F(DaemonChain, PidFilesThatNameStrangersAreOverwrittenAndTheStrangersLeftAlone) {
    const Stranger bens_bus("dbus-daemon", kBen);
    const Stranger other_name("sleep", kAmy);
    const pid_t dead = PidIn(kFusePid);
    for (const Daemon& daemon : kChain) {
        const pid_t pid = PidIn(daemon.pid_file);
        kill(pid, SIGKILL);
        ASSERT_TRUE(Eventually([pid] { return IsGone(pid); }));
    }
    Write(kBusPid, std::to_string(bens_bus.Pid()));
    Write(kGvfsdPid, std::to_string(other_name.Pid()));
    Write(kFusePid, std::to_string(dead));
    ExpectThatTheNextUseWorks();
    EXPECT_NE(PidIn(kBusPid), bens_bus.Pid());
    EXPECT_NE(PidIn(kGvfsdPid), other_name.Pid());
    EXPECT_NE(PidIn(kFusePid), dead);
    EXPECT_TRUE(bens_bus.IsAlive());
    EXPECT_TRUE(other_name.IsAlive());
}

}  // namespace
