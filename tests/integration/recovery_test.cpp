// One process that lives long while the user's daemons die under it, each alone and together: its
// next mount works, and what else the user has connected can be connected again.
#include <gtest/gtest.h>
#include <signal.h>

#include <algorithm>
#include <cctype>

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

class Recovery : public testing::TestWithParam<std::vector<Daemon>> {};

TEST_P(Recovery, OfAProcessThatWasReadyBefore) {
    EXPECT_EQ(InProcess([] {
                  alarm(100);
                  const Json::Value first = Profile("ftp", 2121);
                  const Json::Value second = Profile("dav", 8080);
                  if (!Works(first) || !Works(second)) {
                      return 1;
                  }
                  for (const Daemon& daemon : GetParam()) {
                      const pid_t pid = PidOf(daemon);
                      if (pid < 2 || kill(pid, SIGKILL) != 0 ||
                          !Eventually([pid] { return kill(pid, 0) != 0; })) {
                          return 2;
                      }
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

/** A chain whose fuse daemon has lost its registration: mounts work and have no local path. */
TEST(StaleChain, IsEndedAndStartedAnewByTheSameProcess) {
    EXPECT_EQ(InProcess([] {
                  alarm(100);
                  const Json::Value profile = Profile("ftp", 2121);
                  if (!Works(profile)) {
                      return 1;
                  }
                  const pid_t bus = PidOf(kBus);
                  const pid_t fuse = PidOf(kFuse);
                  // It lives, by pid, name and owner, and does nothing for anybody.
                  machine::Must("cp /bin/sleep /tmp/gvfsd-fuse");
                  const pid_t idle = fork();
                  if (idle == 0) {
                      if (setresuid(kAmy, kAmy, kAmy) == 0) {
                          execl("/tmp/gvfsd-fuse", "gvfsd-fuse", "100", nullptr);
                      }
                      _exit(1);
                  }
                  kill(fuse, SIGKILL);
                  machine::Must("umount -l /var/tmp/user/4001/gvfs");
                  machine::Must("echo " + std::to_string(idle) + " > " + kFuse.pid_file);
                  kill(PidOf(kGvfsd), SIGKILL);
                  const bool failed = !Eventually([] { return kill(PidOf(kGvfsd), 0) != 0; });
                  std::string id;
                  Json::Value out;
                  // The daemon in its place never answers: the one recovery cannot end it, and the
                  // failure is told; once it is gone, the next mount brings all up.
                  const bool first =
                      Server::Add(kAmy, Server::VFS_CONFIG_CONNECT, id, profile, false, out);
                  const bool recovered = PidOf(kBus) != bus;
                  kill(idle, SIGKILL);
                  waitpid(idle, nullptr, 0);
                  return failed || first || !recovered || GetError() != VFS_ERR_FAILED ? 2
                         : Works(profile)                                              ? 0
                                                                                       : 3;
              }),
              0);
}

}  // namespace
