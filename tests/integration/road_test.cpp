// The road of a connection through the shipped library, with real servers and real daemons: one
// user after the other protocol, and two users at the same time.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "support/machine.h"
#include "zyrovfs/zyrovfs_netdrive.h"

namespace {

using namespace ZYROVFS;
using machine::Eventually;
using machine::RunAs;
using testing::HasSubstr;
using testing::Not;
using testing::StartsWith;

constexpr unsigned kAmy = 4001;
constexpr unsigned kBen = 4002;

class RemoteSide : public testing::Environment {
    void SetUp() override {
        machine::AddUser("amy", kAmy);
        machine::AddUser("ben", kBen);
        machine::Remote("start first-secret");
    }
};

const auto* const kRemoteSide = testing::AddGlobalTestEnvironment(new RemoteSide);

struct Location {
    const char* protocol;
    const char* host;
    unsigned port;
    const char* uri_path;  ///< below the server, as the profile has it
    __tag_vfs_err_ wrong_password;
    __tag_vfs_err_ refused_port;
};

std::ostream& operator<<(std::ostream& out, const Location& l) {
    return out << l.protocol;
}

// The check of a certificate goes before the mount, and knows no finer code for a refused password.
const Location kLocations[] = {
    {"ftp", "127.0.0.1", 2121, "", VFS_ERR_WRONG_PASSWORD, VFS_ERR_ACCESS_DENIED},
    {"sftp", "127.0.0.1", 2222, "srv/remote", VFS_ERR_WRONG_PASSWORD, VFS_ERR_ACCESS_DENIED},
    {"dav", "127.0.0.1", 8080, "", VFS_ERR_WRONG_USERNAME, VFS_ERR_ACCESS_DENIED},
    {"davs", "localhost", 8443, "", VFS_ERR_ACCESS_DENIED, VFS_ERR_HOST_UNREACHABLE},
    {"smb", "127.0.0.1", 445, "remote", VFS_ERR_WRONG_PASSWORD, VFS_ERR_ACCESS_DENIED},
};

Json::Value Profile(const Location& l, const std::string& password) {
    Json::Value profile;
    profile["protocol"] = l.protocol;
    profile["hostname"] = l.host;
    profile["port"] = l.port;
    profile["alias"] = std::string("My ") + l.protocol;
    profile["account"] = "remo";
    profile["password"] = password;
    profile["codepage"] = "UTF-8";
    profile["uri_path"] = l.uri_path;
    return profile;
}

std::string Cause() {
    return std::string(GetErrorName(GetError())) + " at " +
           (GetErrorFile() == nullptr ? "" : GetErrorFile()) + ":" + std::to_string(GetErrorLine());
}

bool Exists(const std::string& path) {
    return access(path.c_str(), F_OK) == 0;
}

class Road : public testing::TestWithParam<Location> {
  protected:
    void SetUp() override { machine::Remote("password first-secret"); }

    /**
     * Saves the profile of the location and connects it from its id. A saved profile takes its
     * folder from the live connection, so a location with a folder is connected once before.
     */
    void Connect(unsigned uid) {
        Json::Value stored;
        const bool has_folder = *GetParam().uri_path != '\0';
        if (has_folder) {
            ASSERT_TRUE(Server::Add(uid, Server::VFS_CONFIG_CONNECT, id_,
                                    Profile(GetParam(), "first-secret"), false, stored))
                << Cause();
        }
        ASSERT_TRUE(Server::Add(uid, Server::VFS_CONFIG_SERVER, id_,
                                Profile(GetParam(), "first-secret"), false, stored))
            << Cause();
        if (has_folder) {
            ASSERT_TRUE(Server::Delete(uid, Server::VFS_CONFIG_CONNECT, id_.c_str())) << Cause();
        }
        ASSERT_TRUE(
            Server::Add(uid, Server::VFS_CONFIG_CONNECT, id_, Json::Value(), false, connection_))
            << Cause();
        path_ = connection_["path"].asString();
        ASSERT_TRUE(IsReadable());
    }

    /** For a moment after a remount the tree's client still asks the backend that is gone. */
    bool IsReadable() const {
        return Eventually([this] {
            return RunAs("amy", "cat '" + path_ + "/hello.txt'").output ==
                   "hello from the remote side\n";
        });
    }

    void TearDown() override {
        Server::Delete(kAmy, Server::VFS_CONFIG_CONNECT, id_.c_str());
        Server::Delete(kAmy, Server::VFS_CONFIG_SERVER, id_.c_str());
    }

    std::string id_;
    Json::Value connection_;
    std::string path_;
};

TEST_P(Road, FromProfileToFileAndBack) {
    ASSERT_NO_FATAL_FAILURE(Connect(kAmy));
    EXPECT_THAT(path_, StartsWith("/var/tmp/user/4001/gvfs/"));

    EXPECT_THAT(RunAs("amy", "ls '" + path_ + "'").output, HasSubstr("hello.txt"));
    EXPECT_EQ(RunAs("amy", "cat '" + path_ + "/hello.txt'").output, "hello from the remote side\n");
    EXPECT_EQ(RunAs("amy", "echo written by amy >'" + path_ + "/from-amy.txt'").status, 0);
    EXPECT_TRUE(
        Eventually([] { return machine::Read("/srv/remote/from-amy.txt") == "written by amy\n"; }));
    EXPECT_EQ(RunAs("amy", "rm '" + path_ + "/from-amy.txt'").status, 0);
    EXPECT_TRUE(Eventually([] { return !Exists("/srv/remote/from-amy.txt"); }));
}

TEST_P(Road, PasswordsStandEncipheredInBothFiles) {
    ASSERT_NO_FATAL_FAILURE(Connect(kAmy));
    for (const char* file :
         {"/usr/zyro/etc/zyrovfs/4001/servers.conf", "/var/tmp/zyrovfs/4001/connect.conf"}) {
        EXPECT_THAT(machine::Read(file), HasSubstr("password"));
        EXPECT_THAT(machine::Read(file), Not(HasSubstr("first-secret")));
    }
    EXPECT_NE(connection_["password"].asString(), "first-secret");
}

TEST_P(Road, DisconnectTakesTheMountAwayAndKeepsTheRecord) {
    ASSERT_NO_FATAL_FAILURE(Connect(kAmy));
    ASSERT_TRUE(Server::Disconnect(kAmy, id_.c_str())) << Cause();
    EXPECT_TRUE(Eventually([this] { return !Exists(path_); }));
    Json::Value list;
    ASSERT_TRUE(Server::List(kAmy, Server::VFS_CONFIG_CONNECT, nullptr, nullptr, true, 0, 0, list));
    ASSERT_EQ(list["connections"].size(), 1U);
    EXPECT_EQ(list["connections"][0]["connect_status"].asInt(), 0);

    ASSERT_TRUE(Server::Connect(kAmy, id_.c_str(), false)) << Cause();
    EXPECT_TRUE(Eventually([this] { return Exists(path_); }));
    ASSERT_TRUE(Server::List(kAmy, Server::VFS_CONFIG_SERVER, nullptr, nullptr, true, 0, 0, list));
    EXPECT_EQ(list["profiles"][0]["connect_status"].asInt(), 1);
}

TEST_P(Road, ChangedPasswordMountsAnew) {
    ASSERT_NO_FATAL_FAILURE(Connect(kAmy));
    machine::Remote("password second-secret");
    Json::Value change = Profile(GetParam(), "second-secret");
    std::string id = id_;
    ASSERT_TRUE(Server::Set(kAmy, Server::VFS_CONFIG_CONNECT, id, change, false)) << Cause();
    EXPECT_EQ(id, id_);
    EXPECT_TRUE(IsReadable());

    Json::Value profile;
    ASSERT_TRUE(Server::Get(kAmy, Server::VFS_CONFIG_CONNECT, id.c_str(), true, false, profile));
    EXPECT_EQ(profile["password"].asString(), "second-secret");
}

TEST_P(Road, WrongPasswordIsToldAndLeavesNoRecord) {
    Json::Value out;
    EXPECT_FALSE(Server::Add(kAmy, Server::VFS_CONFIG_CONNECT, id_, Profile(GetParam(), "wrong"),
                             false, out));
    EXPECT_EQ(GetError(), GetParam().wrong_password) << Cause();
    Json::Value list;
    ASSERT_TRUE(Server::List(kAmy, Server::VFS_CONFIG_CONNECT, nullptr, nullptr, true, 0, 0, list));
    EXPECT_EQ(list["total"].asInt(), 0);
}

TEST_P(Road, RefusedPortIsTold) {
    Json::Value profile = Profile(GetParam(), "first-secret");
    profile["port"] = 9;
    Json::Value out;
    EXPECT_FALSE(Server::Add(kAmy, Server::VFS_CONFIG_CONNECT, id_, profile, false, out));
    EXPECT_EQ(GetError(), GetParam().refused_port) << Cause();
}

INSTANTIATE_TEST_SUITE_P(Protocols, Road, testing::ValuesIn(kLocations),
                         [](const auto& param) { return std::string(param.param.protocol); });

}  // namespace
