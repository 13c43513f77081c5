// Two users at the same time, each from a process of its own: neither sees the other's tree,
// profiles or daemons.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "support/machine.h"
#include "zyrovfs/zyrovfs_netdrive.h"

namespace {

using namespace ZYROVFS;
using machine::Must;
using machine::RunAs;
using testing::HasSubstr;
using testing::Not;

constexpr unsigned kAmy = 4001;
constexpr unsigned kBen = 4002;

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

/** As a CGI program would: one process, one user, one connection. */
int ConnectTo(unsigned uid, const char* protocol, unsigned port) {
    std::string id;
    Json::Value out;
    if (!Server::Add(uid, Server::VFS_CONFIG_CONNECT, id, Profile(protocol, port), false, out)) {
        fprintf(stderr, "%s for %u: %s\n", protocol, uid, GetErrorName(GetError()));
        return 1;
    }
    return 0;
}

class TwoUsers : public testing::Test {
  protected:
    static void SetUpTestSuite() {
        machine::AddUser("amy", kAmy);
        machine::AddUser("ben", kBen);
        machine::Remote("start secret");
        const pid_t amy = fork();
        if (amy == 0) {
            _exit(ConnectTo(kAmy, "ftp", 2121));
        }
        ASSERT_EQ(machine::InProcess([] { return ConnectTo(kBen, "dav", 8080); }), 0);
        int status = 0;
        waitpid(amy, &status, 0);
        ASSERT_EQ(status, 0);
    }

    static std::string Pid(unsigned uid, const std::string& file) {
        const std::string text = machine::Read("/var/tmp/user/" + std::to_string(uid) + "/" + file);
        return text.substr(0, text.find('\n'));
    }
};

TEST_F(TwoUsers, EachTreeHoldsTheOwnMountsOnly) {
    const std::string amy = RunAs("amy", "ls /var/tmp/user/4001/gvfs").output;
    const std::string ben = RunAs("ben", "ls /var/tmp/user/4002/gvfs").output;
    EXPECT_THAT(amy, HasSubstr("ftp:host=127.0.0.1"));
    EXPECT_THAT(amy, Not(HasSubstr("dav:")));
    EXPECT_THAT(ben, HasSubstr("dav:host=127.0.0.1"));
    EXPECT_THAT(ben, Not(HasSubstr("ftp:")));
}

TEST_F(TwoUsers, OneCannotReadTheTreeOfTheOther) {
    EXPECT_THAT(RunAs("amy", "cat /var/tmp/user/4001/gvfs/ftp*/hello.txt").output,
                HasSubstr("hello from the remote side"));
    const auto outcome = RunAs("ben", "ls /var/tmp/user/4001/gvfs/");
    EXPECT_NE(outcome.status, 0);
    EXPECT_THAT(outcome.output, HasSubstr("Permission denied"));
}

TEST_F(TwoUsers, RootReadsBothTrees) {
    EXPECT_THAT(Must("cat /var/tmp/user/4001/gvfs/ftp*/hello.txt"), HasSubstr("hello"));
    EXPECT_THAT(Must("cat /var/tmp/user/4002/gvfs/dav*/hello.txt"), HasSubstr("hello"));
}

TEST_F(TwoUsers, EachListsTheOwnConnectionsOnly) {
    for (const auto& [uid, protocol] : {std::pair{kAmy, "ftp"}, std::pair{kBen, "dav"}}) {
        Json::Value list;
        ASSERT_TRUE(
            Server::List(uid, Server::VFS_CONFIG_CONNECT, nullptr, nullptr, true, 0, 0, list));
        ASSERT_EQ(list["total"].asInt(), 1);
        EXPECT_EQ(list["connections"][0]["protocol"].asString(), protocol);
    }
}

TEST_F(TwoUsers, EachHasDaemonsThatAreFullyTheUsers) {
    for (const char* file : {"dbus/dbus.pid", "zyrovfs/gvfsd.pid", "zyrovfs/gvfsd-fuse.pid"}) {
        const std::string amy = Pid(kAmy, file);
        const std::string ben = Pid(kBen, file);
        EXPECT_NE(amy, ben) << file;
        EXPECT_THAT(machine::Read("/proc/" + amy + "/status"),
                    testing::AllOf(HasSubstr("Uid:\t4001\t4001\t4001\t4001"),
                                   HasSubstr("Gid:\t100\t100\t100\t100")))
            << file;
        EXPECT_THAT(machine::Read("/proc/" + ben + "/status"),
                    HasSubstr("Uid:\t4002\t4002\t4002\t4002"))
            << file;
    }
}

TEST_F(TwoUsers, OneCannotUseTheBusOfTheOther) {
    const std::string bus = Pid(kAmy, "dbus/dbus.path");
    const std::string ask = "DBUS_SESSION_BUS_ADDRESS='" + bus +
                            "' gdbus call --session --dest org.freedesktop.DBus --object-path / "
                            "--method org.freedesktop.DBus.GetId";
    EXPECT_EQ(RunAs("amy", ask).status, 0);
    EXPECT_NE(RunAs("ben", ask).status, 0);
}

}  // namespace
