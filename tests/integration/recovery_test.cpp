// One process that lives long while the user's daemons die under it, each alone and together: its
// next mount works, and what else the user has connected can be connected again.
#include <gtest/gtest.h>
#include <signal.h>

#include <algorithm>
#include <cerrno>
#include <iterator>

#include "support/machine.h"
#include "zyrovfs/zyrovfs_netdrive.h"

namespace {

using namespace ZYROVFS;
using machine::Eventually;
using machine::InProcess;

constexpr unsigned kAmy = 4001;
const std::string kRuntime = "/var/tmp/user/4001/";

struct Daemon {
    const char* name;
    std::string pid_file;
};
const Daemon kBus = {"bus", kRuntime + "dbus/dbus.pid"};
const Daemon kGvfsd = {"gvfsd", kRuntime + "zyrovfs/gvfsd.pid"};
const Daemon kFuse = {"fuse", kRuntime + "zyrovfs/gvfsd-fuse.pid"};

class Host : public testing::Environment {
    void SetUp() override {
        machine::AddUser("amy", kAmy);
        machine::Remote("start secret");
    }
};
const auto* const kHost = testing::AddGlobalTestEnvironment(new Host);

pid_t PidOf(const Daemon& daemon) {
    return atoi(machine::Read(daemon.pid_file).c_str());
}

Json::Value Profile(const char* protocol, unsigned port) {
    Json::Value profile;
    profile["protocol"] = protocol;
    profile["hostname"] = "127.0.0.1";
    profile["port"] = port;
    profile["alias"] = protocol;
    profile["account"] = "remo";
    profile["password"] = "secret";
    profile["codepage"] = "UTF-8";
    return profile;
}

/** Connects, and reads the remote file at the place that the connection tells. */
bool Works(const Json::Value& profile) {
    std::string id;
    Json::Value out;
    if (!Server::Add(kAmy, Server::VFS_CONFIG_CONNECT, id, profile, false, out)) {
        ADD_FAILURE() << id << " failed with " << GetError();
        return false;
    }
    const std::string file = out["path"].asString() + "/hello.txt";
    return Eventually([&] { return machine::Read(file) == "hello from the remote side\n"; });
}

/** Ends daemons at once. One may follow another before its turn comes. */
bool End(const std::vector<Daemon>& daemons) {
    std::vector<pid_t> pids;
    std::transform(daemons.begin(), daemons.end(), std::back_inserter(pids), PidOf);
    for (const pid_t pid : pids) {
        if (pid < 2 || (kill(pid, SIGKILL) != 0 && errno != ESRCH)) {
            return false;
        }
    }
    return Eventually([&] {
        return std::all_of(pids.begin(), pids.end(), [](pid_t pid) { return kill(pid, 0) != 0; });
    });
}

class Recovery : public testing::TestWithParam<std::vector<Daemon>> {};

TEST_P(Recovery, OfAProcessThatWasReadyBefore) {
    EXPECT_EQ(InProcess([] {
                  alarm(100);
                  const Json::Value first = Profile("ftp", 2121);
                  const Json::Value second = Profile("dav", 8080);
                  if (!Works(first) || !Works(second)) {
                      return 1;
                  }
                  if (!End(GetParam())) {
                      return 2;
                  }
                  if (!Works(first)) {
                      return 3;
                  }
                  return Works(second) ? 0 : 4;
              }),
              0);
    for (const Daemon& daemon : {kBus, kGvfsd, kFuse}) {
        EXPECT_EQ(kill(PidOf(daemon), 0), 0) << daemon.name;
    }
}

INSTANTIATE_TEST_SUITE_P(All, Recovery,
                         testing::Values(std::vector<Daemon>{kGvfsd}, std::vector<Daemon>{kFuse},
                                         std::vector<Daemon>{kBus},
                                         std::vector<Daemon>{kGvfsd, kFuse},
                                         std::vector<Daemon>{kBus, kGvfsd},
                                         std::vector<Daemon>{kBus, kFuse},
                                         std::vector<Daemon>{kBus, kGvfsd, kFuse}),
                         [](const auto& param) {
                             std::string name;
                             for (const Daemon& daemon : param.param) {
                                 name += std::string(name.empty() ? "" : "And") + daemon.name;
                             }
                             return name;
                         });

/** A process that passes for the fuse daemon, and does nothing for anybody. */
class IdleFuse {
  public:
    IdleFuse() {
        machine::Must("cp /bin/sleep /tmp/gvfsd-fuse");
        pid_ = fork();
        if (pid_ == 0) {
            if (setresuid(kAmy, kAmy, kAmy) == 0) {
                execl("/tmp/gvfsd-fuse", "gvfsd-fuse", "100", nullptr);
            }
            _exit(1);
        }
        machine::Must("echo " + std::to_string(pid_) + " > " + kFuse.pid_file);
    }
    IdleFuse(const IdleFuse&) = delete;
    IdleFuse& operator=(const IdleFuse&) = delete;
    ~IdleFuse() {
        kill(pid_, SIGKILL);
        waitpid(pid_, nullptr, 0);
    }

  private:
    pid_t pid_;
};

/** Mounts work and have no local path, since nobody shows them. */
TEST(StaleChain, IsEndedOnceAndItsSuccessorServesTheSameProcess) {
    EXPECT_EQ(
        InProcess([] {
            alarm(100);
            const Json::Value profile = Profile("ftp", 2121);
            std::string id = "ftp://remo@127.0.0.1:2121";
            if (!Works(profile) || !Server::Delete(kAmy, Server::VFS_CONFIG_CONNECT, id.c_str())) {
                return 1;
            }
            const pid_t bus = PidOf(kBus);
            if (!End({kGvfsd, kFuse})) {
                return 2;
            }
            machine::Run("umount -l /var/tmp/user/4001/gvfs");
            {
                const IdleFuse idle;
                Json::Value out;
                id.clear();
                if (Server::Add(kAmy, Server::VFS_CONFIG_CONNECT, id, profile, false, out) ||
                    GetError() != VFS_ERR_FAILED) {
                    return 3;
                }
            }
            if (PidOf(kBus) == bus || kill(PidOf(kBus), 0) != 0) {
                return 4;
            }
            return Works(profile) ? 0 : 5;
        }),
        0);
}

}  // namespace
