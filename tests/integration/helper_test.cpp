// The helper program of the shipped library, under callers of every kind: what it is given and what
// not, with whom it ends, and that its answer is known.
#include <fcntl.h>
#include <gio/gio.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/prctl.h>

#include <algorithm>
#include <filesystem>
#include <thread>

#include "support/machine.h"
#include "support/silent_host.h"
#include "zyrovfs/zyrovfs_netdrive.h"

namespace {

using namespace ZYROVFS;
using machine::ChildOf;
using machine::Eventually;
using machine::InProcess;
using machine::Must;
using machine::Program;
using machine::SilentHost;
using testing::HasSubstr;
using testing::Not;

constexpr unsigned kAmy = 4001;
constexpr unsigned kBen = 4002;
constexpr unsigned kHangLimit = 20;  ///< seconds, after which SIGALRM tells of a hang
constexpr const char* kPassword = "a-secret-of-amys";
constexpr const char* kBusPid = "/var/tmp/user/4001/dbus/dbus.pid";
constexpr const char* kBusPath = "/var/tmp/user/4001/dbus/dbus.path";

/** Amy's chain is up before the first test. */
class Host : public testing::Environment {
    void SetUp() override {
        machine::AddUser("amy", kAmy);
        machine::AddUser("ben", kBen);
        machine::Remote("start secret");
        ASSERT_EQ(InProcess([] { return InitGlobal(kAmy, false) ? 0 : 1; }), 0);
    }
};
const auto* const kHost = testing::AddGlobalTestEnvironment(new Host);

Json::Value Profile(const char* protocol, unsigned port, const char* password) {
    Json::Value profile;
    profile["protocol"] = protocol;
    profile["hostname"] = "127.0.0.1";
    profile["port"] = port;
    profile["alias"] = "Helper";
    profile["account"] = "remo";
    profile["password"] = password;
    profile["codepage"] = "UTF-8";
    return profile;
}

int Connect(unsigned uid, const Json::Value& profile) {
    std::string id;
    Json::Value out;
    return Server::Add(uid, Server::VFS_CONFIG_CONNECT, id, profile, false, out) ? 0
                                                                                 : int{GetError()};
}
int ConnectFtp() {
    return Connect(kAmy, Profile("ftp", 2121, "secret"));
}
int Disconnect(unsigned uid, const char* id) {
    return Server::Delete(uid, Server::VFS_CONFIG_CONNECT, id) ? 0 : int{GetError()};
}
constexpr const char* kFtp = "ftp://remo@127.0.0.1:2121";
constexpr const char* kFile =
    "/var/tmp/user/4001/gvfs/ftp:host=127.0.0.1,port=2121,user=remo/hello.txt";

void Forget() {
    EXPECT_EQ(InProcess([] { return InitGlobal(kAmy, false) ? Disconnect(kAmy, kFtp) : 1; }), 0);
}

bool IsMounted() {
    return machine::Run(std::string("test -e '") + kFile + "'").status == 0;
}

std::string Proc(pid_t pid, const char* file) {
    std::string text = machine::Read("/proc/" + std::to_string(pid) + "/" + file);
    std::replace(text.begin(), text.end(), '\0', '\n');
    return text;
}

/** What each descriptor of a process is. */
std::vector<std::string> Descriptors(pid_t pid) {
    std::vector<std::string> found;
    const std::string folder = "/proc/" + std::to_string(pid) + "/fd";
    for (const auto& entry : std::filesystem::directory_iterator(folder)) {
        std::error_code gone;
        found.push_back(entry.path().filename().string() + " " +
                        std::filesystem::read_symlink(entry.path(), gone).string());
    }
    return found;
}

/** A caller whose mount waits for a host that says nothing, and its helper. */
class WaitingMount {
  public:
    explicit WaitingMount(const std::function<void()>& prepare = [] {})
        : program_([this, prepare] {
              prepare();
              VFS session;
              const std::string uri = "ftp://127.0.0.1:" + std::to_string(host_.Port());
              return InitGlobal(kAmy, false) &&
                             session.Init("remo", kPassword, uri.c_str(), "", "UTF-8",
                                          Json::Value(Json::objectValue), false) &&
                             session.Mount()
                         ? 0
                         : 1;
          }) {
        Eventually([this] {
            return Proc(Helper(), "status").find("\nUid:\t4001\t4001\t4001\t4001\n") !=
                   std::string::npos;
        });
    }
    pid_t Helper() const { return ChildOf(program_.Pid()); }
    pid_t Caller() const { return program_.Pid(); }

  private:
    SilentHost host_;
    Program program_;
};

// --- what it is given -------------------------------------------------------------------------

TEST(Helper, ShowsNoPasswordToWhoeverLooksAtProcesses) {
    const WaitingMount mount;
    ASSERT_THAT(Proc(mount.Helper(), "comm"), HasSubstr("zyrovfs-helper"));
    EXPECT_THAT(Proc(mount.Helper(), "cmdline"), Not(HasSubstr(kPassword)));
    EXPECT_THAT(Proc(mount.Helper(), "environ"), Not(HasSubstr(kPassword)));
}

TEST(Helper, HasTheUsersOwnBusInItsEnvironmentAndNothingOfTheCallers) {
    const WaitingMount mount([] {
        setenv("DBUS_SESSION_BUS_ADDRESS", "unix:path=/tmp/trap", 1);
        setenv("HTTP_COOKIE", "session=42", 1);
        setenv("LD_LIBRARY_PATH", "/tmp/trap", 1);
        setenv("GIO_EXTRA_MODULES", "/tmp/trap", 1);
        setenv("PATH", "/tmp/trap", 1);
    });
    const std::string environment = Proc(mount.Helper(), "environ");
    ASSERT_THAT(environment, HasSubstr("XDG_RUNTIME_DIR=/var/tmp/user/4001\n"));
    EXPECT_THAT(environment, HasSubstr("DBUS_SESSION_BUS_ADDRESS=" + machine::Read(kBusPath)));
    EXPECT_THAT(environment, Not(HasSubstr("trap")));
    EXPECT_THAT(environment, Not(HasSubstr("HTTP_COOKIE")));
}

TEST(Helper, InheritsNoSignalAndNoDescriptorButItsOwnAndTheLock) {
    const WaitingMount mount([] {
        sigset_t all;
        sigfillset(&all);
        sigprocmask(SIG_SETMASK, &all, nullptr);
        signal(SIGUSR1, SIG_IGN);
        open("/etc/shadow", O_RDONLY);
    });
    const std::string status = Proc(mount.Helper(), "status");
    EXPECT_THAT(status, HasSubstr("\nSigBlk:\t0000000000000000\n"));
    EXPECT_THAT(status, HasSubstr("\nSigIgn:\t0000000000001000\n")) << "SIGPIPE, by its own choice";
    EXPECT_THAT(status, HasSubstr("\nGroups:\t \n"));
    const std::vector<std::string> open = Descriptors(mount.Helper());
    EXPECT_THAT(open, testing::Contains(HasSubstr("0 socket:")));
    EXPECT_THAT(open, testing::Contains(HasSubstr("1 pipe:")));
    EXPECT_THAT(open, testing::Contains("2 /dev/null"));
    EXPECT_THAT(open, testing::Contains(HasSubstr("mnt.lock")));
    EXPECT_THAT(open, testing::Each(Not(HasSubstr("shadow"))));
}

TEST(Helper, EndsWithItsCallerAndSoDoesTheLock) {
    const WaitingMount mount;
    const pid_t helper = mount.Helper();
    ASSERT_GT(helper, 0);
    ASSERT_EQ(kill(mount.Caller(), SIGKILL), 0);
    EXPECT_TRUE(Eventually([helper] { return kill(helper, 0) != 0; }));
    EXPECT_EQ(InProcess([] {
                  alarm(kHangLimit);
                  setenv("ZYROVFS_UID", "4001", 1);
                  return Utils::LockMnt(true) ? 0 : 1;
              }),
              0);
}

// --- callers ----------------------------------------------------------------------------------

/** In a process of its own; 0 when all that it asserts holds, -SIGALRM when it hangs. */
int InCaller(const std::function<bool()>& body) {
    return InProcess([&] {
        alarm(kHangLimit);
        return body() ? 0 : 1;
    });
}

TEST(Caller, ThatHasUsedGioItselfCanMountAndUnmount) {
    ASSERT_EQ(InProcess([] { return InitGlobal(kAmy, false) ? ConnectFtp() : 100; }), 0);
    EXPECT_EQ(InCaller([] {
                  // As a daemon does that is the user: its GIO has a connection and threads.
                  if (!InitGlobal(kAmy, false) || setresgid(100, 100, 100) != 0 ||
                      setresuid(kAmy, kAmy, 0) != 0) {
                      return false;
                  }
                  std::string owner;
                  std::string group;
                  unsigned mode = 0;
                  Utils::GetFileInfo((std::string(kFtp) + "/hello.txt").c_str(), owner, group,
                                     mode);
                  GFile* file = g_file_new_for_uri(kFtp);
                  char* path = g_file_get_path(file);
                  const bool used = path != nullptr;
                  g_free(path);
                  g_object_unref(file);
                  return used && Disconnect(kAmy, kFtp) == 0 && !IsMounted() && ConnectFtp() == 0 &&
                         Eventually(IsMounted);
              }),
              0);
    Forget();
}

TEST(Caller, WhoseEffectiveUserIsTheUserGetsALocationConnectedOnDemand) {
    std::string id;
    Json::Value out;
    ASSERT_TRUE(Server::Add(kAmy, Server::VFS_CONFIG_SERVER, id, Profile("ftp", 2121, "secret"),
                            false, out));
    EXPECT_EQ(InCaller([] {
                  std::string full;
                  const std::string uri = std::string(kFtp) + "/hello.txt";
                  return InitGlobal(kAmy, false) &&
                         setresuid(static_cast<uid_t>(-1), kAmy, 0) == 0 &&
                         Utils::GetFullPath(uri.c_str(), full) && full == kFile &&
                         Eventually(IsMounted);
              }),
              0);
    Forget();
    EXPECT_EQ(
        InProcess([] { return Server::Delete(kAmy, Server::VFS_CONFIG_SERVER, kFtp) ? 0 : 1; }), 0);
}

/** The helper has the lock of its caller, and would wait for it for 110 seconds otherwise. */
TEST(Caller, WhoHoldsTheMountLockGetsALocationConnectedOnDemand) {
    std::string id;
    Json::Value out;
    ASSERT_TRUE(Server::Add(kAmy, Server::VFS_CONFIG_SERVER, id, Profile("ftp", 2121, "secret"),
                            false, out));
    EXPECT_EQ(InCaller([] {
                  std::string remote;
                  std::string full;
                  return InitGlobal(kAmy, false) && Utils::LockMnt(true) &&
                         Utils::GetFullPath(kAmy, kFtp, "hello.txt", "UTF-8", remote, full) &&
                         full == kFile;
              }),
              0);
    Forget();
    EXPECT_EQ(
        InProcess([] { return Server::Delete(kAmy, Server::VFS_CONFIG_SERVER, kFtp) ? 0 : 1; }), 0);
}

void CollectAll(int) {
    while (waitpid(-1, nullptr, WNOHANG) > 0) {
    }
}

TEST(Caller, ThatIgnoresOrCollectsItsChildrenIsToldOfAFailedMountAndKeepsItsChain) {
    const std::string bus = machine::Read(kBusPid);
    for (void (*handler)(int) : {SIG_IGN, CollectAll}) {
        EXPECT_EQ(InCaller([&] {
                      signal(SIGCHLD, handler);
                      return InitGlobal(kAmy, false) &&
                             Connect(kAmy, Profile("ftp", 2121, "wrong")) ==
                                 VFS_ERR_WRONG_PASSWORD &&
                             ConnectFtp() == 0;
                  }),
                  0);
        EXPECT_EQ(machine::Read(kBusPid), bus) << "a healthy chain was taken for a stale one";
        Forget();
    }
}

TEST(Caller, WithoutStandardDescriptorsCanMount) {
    EXPECT_EQ(InCaller([] {
                  for (const int fd : {0, 1, 2}) {
                      close(fd);
                  }
                  return InitGlobal(kAmy, false) && ConnectFtp() == 0;
              }),
              0);
    Forget();
}

TEST(Caller, WithThreadsCanMountWhileTheyAreBusy) {
    EXPECT_EQ(InCaller([] {
                  std::atomic<bool> stop{false};
                  std::thread busy([&stop] {
                      while (!stop) {
                          std::free(std::malloc(100));
                          tzset();
                      }
                  });
                  const bool connected = InitGlobal(kAmy, false) && ConnectFtp() == 0;
                  stop = true;
                  busy.join();
                  return connected;
              }),
              0);
    Forget();
}

TEST(Caller, ThatCleansUpBehindOneUserMountsTheNextUsersServersAsThatUser) {
    ASSERT_EQ(InProcess([] { return InitGlobal(kBen, false) ? 0 : 1; }), 0);
    EXPECT_EQ(InProcess([] {
                  alarm(60);
                  Json::Value gone(Json::arrayValue);
                  gone.append(kBen);
                  // A service that is amy by its effective id.
                  if (!InitGlobal(kAmy, false) || seteuid(kAmy) != 0 ||
                      !Server::DeleteUser(gone, true, true)) {
                      return 1;
                  }
                  return ConnectFtp() == 0 && Eventually(IsMounted) ? 0 : 2;
              }),
              0);
    EXPECT_EQ(machine::Run("ls -A /var/tmp/user/4002/gvfs").output, "")
        << "amy's server is shown to ben";
    Forget();
}

TEST(Caller, WithoutTheHelperIsToldSo) {
    const std::string helper = BuildDir() + "/libexec/zyrovfs/zyrovfs-helper";
    Must("mv " + helper + " " + helper + ".away");
    EXPECT_EQ(InProcess([] { return InitGlobal(kAmy, false) ? ConnectFtp() : 100; }),
              VFS_ERR_FAILED);
    EXPECT_THAT(
        machine::Run(BuildDir() + "/tools/zyrovfs/zyrovfs host check --build " + BuildDir()).output,
        HasSubstr("zyrovfs-helper"));
    Must("mv " + helper + ".away " + helper);
}

TEST(Caller, WhoIsRootDoesNotRunAHelperThatOthersMayChange) {
    const std::string helper = BuildDir() + "/libexec/zyrovfs/zyrovfs-helper";
    for (const char* spoil : {"chmod 0777 ", "chown 4002 "}) {
        Must(spoil + helper);
        EXPECT_EQ(InProcess([] { return InitGlobal(kAmy, false) ? ConnectFtp() : 100; }),
                  VFS_ERR_FAILED)
            << spoil;
        Must("chown 0 " + helper + " && chmod 0755 " + helper);
    }
}

}  // namespace
