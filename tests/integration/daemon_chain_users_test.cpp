// The daemons of two users beside each other, and of one user under unusual callers: two processes
// at once, a service that ignores its children, a bus that activates its own gvfsd.
#include <gio/gio.h>
#include <gmock/gmock.h>
#include <grp.h>
#include <gtest/gtest.h>

#include <chrono>
#include <csignal>
#include <thread>
#include <vector>

#include "support/machine.h"
#include "zyrovfs/zyrovfs_netdrive.h"

namespace {

using namespace ZYROVFS;
using machine::InProcess;
using machine::Must;
using machine::RunAs;
using testing::HasSubstr;
using testing::StartsWith;

constexpr unsigned kAmy = 4001;
constexpr unsigned kBen = 4002;

std::string Runtime(unsigned uid) {
    return "/var/tmp/user/" + std::to_string(uid);
}
std::string Tree(unsigned uid) {
    return Runtime(uid) + "/gvfs";
}

std::string FirstLine(const std::string& path) {
    const std::string text = machine::Read(path);
    return text.substr(0, text.find('\n'));
}

struct Chain {
    int bus;
    int gvfsd;
    int fuse;
};

Chain ChainOf(unsigned uid) {
    const auto pid = [uid](const char* file) {
        return atoi(FirstLine(Runtime(uid) + file).c_str());
    };
    return {pid("/dbus/dbus.pid"), pid("/zyrovfs/gvfsd.pid"), pid("/zyrovfs/gvfsd-fuse.pid")};
}

/** Living processes of a name and an owner. */
std::vector<int> Processes(const std::string& name, unsigned uid) {
    std::istringstream list(
        machine::Run("pgrep --euid " + std::to_string(uid) + " --exact " + name).output);
    std::vector<int> pids;
    for (int pid = 0; list >> pid;) {
        pids.push_back(pid);
    }
    return pids;
}

void ExpectOneLivingChain(unsigned uid) {
    const Chain chain = ChainOf(uid);
    EXPECT_THAT(Processes("dbus-daemon", uid), testing::ElementsAre(chain.bus));
    EXPECT_THAT(Processes("gvfsd", uid), testing::ElementsAre(chain.gvfsd));
    EXPECT_THAT(Processes("gvfsd-fuse", uid), testing::ElementsAre(chain.fuse));
}

/** Ends processes as a crash would, and returns when they are gone. */
void Kill(const std::vector<int>& pids) {
    for (const int pid : pids) {
        ASSERT_GT(pid, 1);
        kill(pid, SIGKILL);
    }
    for (const int pid : pids) {
        const std::string entry = "/proc/" + std::to_string(pid);
        for (int i = 0; i < 1000 && access(entry.c_str(), F_OK) == 0; ++i) {
            std::this_thread::sleep_for(std::chrono::milliseconds(10));
        }
        ASSERT_NE(access(entry.c_str(), F_OK), 0) << pid;
    }
}

/** One use by a process of its own, which a program of the web layer would be. */
int Use(unsigned uid) {
    return InProcess([uid] {
        if (InitGlobal(uid, false)) {
            return 0;
        }
        fprintf(stderr, "InitGlobal(%u): %s\n", uid, GetErrorName(GetError()));
        return 1;
    });
}

void OnMounted(GObject* file, GAsyncResult* result, gpointer loop) {
    GError* error = nullptr;
    if (g_file_mount_enclosing_volume_finish(G_FILE(file), result, &error) == FALSE) {
        fprintf(stderr, "mount: %s\n", error->message);
    }
    g_clear_error(&error);
    g_main_loop_quit(static_cast<GMainLoop*>(loop));
}

/** A client that runs as the user: mounts the machine's own files and tells the local path of
 * /srv/chain/hello.txt in that mount. */
int MountAndTellPath(unsigned uid, const std::string& answer) {
    if (!InitGlobal(uid, false) || setgroups(0, nullptr) != 0 || setregid(100, 100) != 0 ||
        setreuid(uid, uid) != 0) {
        return 1;
    }
    setenv("GIO_USE_VOLUME_MONITOR", "unix", 1);
    GFile* file = g_file_new_for_uri("localtest:///srv/chain/hello.txt");
    GMainLoop* loop = g_main_loop_new(nullptr, FALSE);
    g_file_mount_enclosing_volume(file, G_MOUNT_MOUNT_NONE, nullptr, nullptr, OnMounted, loop);
    g_main_loop_run(loop);
    char* path = g_file_get_path(file);
    std::ofstream(answer) << (path == nullptr ? "no path" : path);
    return path == nullptr ? 2 : 0;
}

std::string LocalPath(unsigned uid) {
    const std::string answer = "/tmp/path-" + std::to_string(uid);
    unlink(answer.c_str());
    EXPECT_EQ(InProcess([&] { return MountAndTellPath(uid, answer); }), 0);
    return machine::Read(answer);
}

/** Reads as the user. After a mount was made anew the first accesses may still meet the old one in
 * the fuse daemon's memory. */
std::string ReadAs(const char* user, const std::string& path) {
    machine::Outcome outcome{};
    for (int i = 0; i < 3; ++i) {
        outcome = RunAs(user, "cat '" + path + "'");
        if (outcome.status == 0) {
            break;
        }
    }
    return outcome.output;
}

void ExpectTreeWorks(unsigned uid, const char* user) {
    const std::string path = LocalPath(uid);
    EXPECT_THAT(path, StartsWith(Tree(uid) + "/"));
    EXPECT_EQ(ReadAs(user, path), "hello\n");
}

class DaemonChains : public testing::Test {
  protected:
    static void SetUpTestSuite() {
        machine::AddUser("amy", kAmy);
        machine::AddUser("ben", kBen);
        // The machine's catalogue offers remote servers only; this one needs no server.
        Must("cd /usr/share/gvfs/mounts && cp localtest.mount.zyrovfs-stock localtest.mount");
        Must("mkdir -p /srv/chain; echo hello >/srv/chain/hello.txt; chmod -R a+rX /srv/chain");
    }
    /** Both users at once; what lives already is left alone. */
    void SetUp() override {
        const pid_t ben = fork();
        if (ben == 0) {
            _exit(Use(kBen));
        }
        ASSERT_EQ(Use(kAmy), 0);
        int status = 0;
        waitpid(ben, &status, 0);
        ASSERT_EQ(status, 0);
        ASSERT_NO_FATAL_FAILURE(ExpectOneLivingChain(kAmy));
    }
};

TEST_F(DaemonChains, TwoUsersHaveAChainEach) {
    ExpectOneLivingChain(kAmy);
    ExpectOneLivingChain(kBen);
    const std::string mounts = machine::Read("/proc/mounts");
    EXPECT_THAT(mounts, HasSubstr("gvfsd-fuse " + Tree(kAmy) + " fuse.gvfsd-fuse"));
    EXPECT_THAT(mounts, HasSubstr("gvfsd-fuse " + Tree(kBen) + " fuse.gvfsd-fuse"));
}

TEST_F(DaemonChains, MountIsSeenThroughTheTreeOfItsUser) {
    ExpectTreeWorks(kAmy, "amy");
    ExpectTreeWorks(kBen, "ben");
}

TEST_F(DaemonChains, TreeLetsInItsUserAndRootOnly) {
    const std::string path = LocalPath(kAmy);
    ASSERT_EQ(ReadAs("amy", path), "hello\n");
    EXPECT_EQ(machine::Run("cat '" + path + "'").output, "hello\n");
    const auto other = RunAs("ben", "cat '" + path + "'");
    EXPECT_NE(other.status, 0);
    EXPECT_THAT(other.output, HasSubstr("Permission denied"));
}

TEST_F(DaemonChains, BusThatWasAskedToEndIsStartedAgain) {
    ASSERT_EQ(InProcess([] {
                  setenv("ZYROVFS_UID", "4001", 1);
                  return DBUS::DoKill() && DBUS::CheckDaemonDied() ? 0 : 1;
              }),
              0);
    ASSERT_EQ(Use(kAmy), 0);
    ExpectTreeWorks(kAmy, "amy");
    ExpectOneLivingChain(kAmy);
}

TEST_F(DaemonChains, DaemonsOfOneUserDoNotFeelTheDeathOfAnothers) {
    const std::string path = LocalPath(kBen);
    const Chain ben = ChainOf(kBen);
    const Chain amy = ChainOf(kAmy);
    Kill({amy.bus, amy.gvfsd, amy.fuse});
    EXPECT_EQ(ReadAs("ben", path), "hello\n");
    EXPECT_EQ(ChainOf(kBen).gvfsd, ben.gvfsd);
    ExpectOneLivingChain(kBen);
}

TEST_F(DaemonChains, GvfsdThatTheBusActivatesBringsNoFuseDaemonAndIsReplaced) {
    Kill({ChainOf(kAmy).gvfsd});
    const std::string bus = FirstLine(Runtime(kAmy) + "/dbus/dbus.path");
    const auto asked =
        RunAs("amy", "DBUS_SESSION_BUS_ADDRESS='" + bus +
                         "' gdbus call --session --dest org.gtk.vfs.Daemon --object-path "
                         "/org/gtk/vfs/mounttracker --method "
                         "org.gtk.vfs.MountTracker.ListMounts2 false");
    ASSERT_EQ(asked.status, 0) << asked.output;
    ASSERT_EQ(Processes("gvfsd", kAmy).size(), 1U) << "the activated one";
    std::this_thread::sleep_for(std::chrono::seconds(1));
    EXPECT_LE(Processes("gvfsd-fuse", kAmy).size(), 1U);
    ASSERT_EQ(Use(kAmy), 0);
    ExpectTreeWorks(kAmy, "amy");
    ExpectOneLivingChain(kAmy);
}

TEST_F(DaemonChains, TwoProcessesThatFindAllDeadStartOneChain) {
    const Chain chain = ChainOf(kAmy);
    Kill({chain.fuse, chain.gvfsd, chain.bus});
    const pid_t other = fork();
    if (other == 0) {
        _exit(Use(kAmy));
    }
    EXPECT_EQ(Use(kAmy), 0);
    int status = 0;
    waitpid(other, &status, 0);
    EXPECT_EQ(status, 0);
    ExpectOneLivingChain(kAmy);
    ExpectTreeWorks(kAmy, "amy");
}

TEST_F(DaemonChains, ServiceThatIgnoresItsChildrenGetsAChain) {
    const Chain chain = ChainOf(kAmy);
    Kill({chain.fuse, chain.gvfsd, chain.bus});
    ASSERT_EQ(InProcess([] {
                  signal(SIGCHLD, SIG_IGN);
                  return InitGlobal(kAmy, false) ? 0 : 1;
              }),
              0);
    ExpectOneLivingChain(kAmy);
    ExpectTreeWorks(kAmy, "amy");
}

}  // namespace
