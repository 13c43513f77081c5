#include "server/server_mgr.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "support/fake_server.h"
#include "support/profiles.h"

namespace {

/** Services asked for, with the number of mounts attempted by then and who asked. */
struct Start {
    std::string service;
    int flag;
    size_t mounts;
    uid_t effective_uid;
};
std::vector<Start> starts;

}  // namespace

/** In the place of the platform's: no test starts a service of the machine. */
extern "C" int YLIBServicectlStart(const char* service, int flag) {
    starts.push_back({service, flag, fake::Calls("Mount").size(), geteuid()});
    return -1;
}

namespace ZYROVFS::Server {
namespace {

using profiles::kUser;
using testing::ElementsAre;

class ServerMgrTest : public profiles::ProfileTest {
  protected:
    static Json::Value Conf(const char* protocol = "ftp") {
        Json::Value conf;
        conf["protocol"] = protocol;
        conf["hostname"] = "nas";
        conf["alias"] = "mine";
        return conf;
    }

    bool Load(Json::Value conf, bool decrypt = false, bool online = false) {
        return mgr_.Load(kUser, VFS_CONFIG_SERVER, conf, decrypt, online);
    }

    fake::Scope fakes_;
    ServerMgr mgr_;
};

/** Every operation on an instance, by the name that the log gives it. */
struct Operation {
    const char* name;
    bool (*run)(ServerMgr& mgr);
};

const Operation kOperations[] = {
    {"GetServerID",
     [](ServerMgr& mgr) {
         std::string id;
         return mgr.GetServerID(id);
     }},
    {"CreateJsonObj",
     [](ServerMgr& mgr) {
         Json::Value out;
         return mgr.CreateJsonObj(kUser, VFS_CONFIG_SERVER, out, true);
     }},
    {"DeletePostProcess",
     [](ServerMgr& mgr) { return mgr.DeletePostProcess(kUser, VFS_CONFIG_SERVER); }},
    {"DumpToStruct",
     [](ServerMgr& mgr) {
         _tag_VFS_CONFIG_INFO_ info;
         return mgr.DumpToStruct(kUser, VFS_CONFIG_SERVER, info);
     }},
    {"Mount",
     [](ServerMgr& mgr) { return mgr.Mount(kUser, VFS_CONFIG_SERVER, Json::Value(), false); }},
    {"Unmount", [](ServerMgr& mgr) { return mgr.Unmount(kUser, VFS_CONFIG_SERVER); }},
    {"DecryptCredentials",
     [](ServerMgr& mgr) {
         Json::Value conf(Json::objectValue);
         return mgr.DecryptCredentials(kUser, VFS_CONFIG_SERVER, conf);
     }},
    {"RemoveCredentials",
     [](ServerMgr& mgr) {
         Json::Value conf(Json::objectValue);
         return mgr.RemoveCredentials(kUser, VFS_CONFIG_SERVER, conf);
     }},
    {"IsUpdateNeedsRemount",
     [](ServerMgr& mgr) {
         Json::Value changes;
         changes["hostname"] = "other";
         return mgr.IsUpdateNeedsRemount(kUser, VFS_CONFIG_SERVER, changes);
     }},
};

TEST_F(ServerMgrTest, OperationsWithoutAnInstanceLogAndAnswerFalse) {
    for (const Operation& operation : kOperations) {
        EXPECT_FALSE(operation.run(mgr_)) << operation.name;
        EXPECT_TRUE(seams::Logged(std::string(operation.name) + " failed, No instance"))
            << seams::LogDump();
    }
    EXPECT_EQ(GetError(), VFS_ERR_NONE);
    EXPECT_TRUE(seams::IdentityCalls().empty());
}

TEST_F(ServerMgrTest, OperationsReachTheInstanceAndGiveItsResult) {
    ASSERT_TRUE(Load(Conf()));
    for (const Operation& operation : kOperations) {
        EXPECT_TRUE(operation.run(mgr_)) << operation.name;
        EXPECT_EQ(fake::Calls(operation.name).empty(), false) << operation.name;
        fake::Fail(operation.name, {VFS_ERR_BUSY});
        if (std::string(operation.name) != "IsUpdateNeedsRemount") {
            EXPECT_FALSE(operation.run(mgr_)) << operation.name;
            EXPECT_EQ(GetError(), VFS_ERR_BUSY);
        }
    }
}

TEST_F(ServerMgrTest, LoadWithoutProtocolLeavesNoInstance) {
    Json::Value conf = Conf();
    conf.removeMember("protocol");
    EXPECT_FALSE(Load(conf));
    EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM);
    EXPECT_TRUE(seams::Logged("Load instance failed, no protocol")) << seams::LogDump();
    std::string id;
    EXPECT_FALSE(mgr_.GetServerID(id));
    EXPECT_TRUE(seams::Logged("GetServerID failed, No instance"));
    EXPECT_EQ(fake::Now().alive, 0);
}

TEST_F(ServerMgrTest, ProtocolThatIsNoTextIsABadParameter) {
    for (const Json::Value& protocol :
         {Json::Value(), Json::Value(5), Json::Value(true), Json::Value(1.5),
          Json::Value(Json::arrayValue), Json::Value(Json::objectValue)}) {
        Json::Value conf = Conf();
        conf["protocol"] = protocol;
        ResetError();
        EXPECT_FALSE(Load(conf)) << protocol;
        EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM) << protocol;
    }
    EXPECT_TRUE(fake::Now().calls.empty());
}

TEST_F(ServerMgrTest, ProfileThatIsNoObjectIsABadParameter) {
    for (const Json::Value& conf : {Json::Value(), Json::Value("ftp"), Json::Value(7),
                                    Json::Value(false), Json::Value(Json::arrayValue)}) {
        ResetError();
        EXPECT_FALSE(Load(conf)) << conf;
        EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM) << conf;
    }
}

TEST_F(ServerMgrTest, SecondLoadFreesTheFirstInstance) {
    ASSERT_TRUE(Load(Conf("ftp")));
    ASSERT_TRUE(Load(Conf("dav")));
    EXPECT_EQ(fake::Now().alive, 1);
    std::string id;
    EXPECT_TRUE(mgr_.GetServerID(id));
    EXPECT_EQ(id, "dav://nas");
}

TEST_F(ServerMgrTest, LoadWithoutProtocolKeepsTheEarlierInstance) {
    ASSERT_TRUE(Load(Conf()));
    EXPECT_FALSE(Load(Json::Value(Json::objectValue)));
    EXPECT_EQ(fake::Now().alive, 1);
}

TEST_F(ServerMgrTest, InstanceStaysHeldWhenItsLoadFails) {
    fake::Fail("Load", {VFS_ERR_UNAUTHORIZED});
    EXPECT_FALSE(Load(Conf()));
    EXPECT_EQ(GetError(), VFS_ERR_UNAUTHORIZED);
    EXPECT_EQ(fake::Now().alive, 1);
    std::string id;
    EXPECT_TRUE(mgr_.GetServerID(id));
}

TEST_F(ServerMgrTest, FailedAllocationSetsNothing) {
    ASSERT_TRUE(Load(Conf()));
    server_factory = [](const std::string&) { return std::unique_ptr<ServerBase>(); };
    EXPECT_FALSE(Load(Conf()));
    EXPECT_EQ(fake::Now().alive, 0) << "the earlier instance is gone all the same";
    std::string id;
    EXPECT_FALSE(mgr_.GetServerID(id));
    EXPECT_NE(GetError(), VFS_ERR_OUT_OF_MEMORY);
    EXPECT_NE(GetError(), VFS_ERR_BAD_PARAM);
}

TEST_F(ServerMgrTest, LoadHandsItsFlagsOnAndLeavesTheProfileAlone) {
    Json::Value conf = Conf();
    conf["password"] = fake::Sealed("x");
    const Json::Value before = conf;
    ASSERT_TRUE(mgr_.Load(kUser, VFS_CONFIG_CONNECT, conf, true, false));
    ASSERT_TRUE(mgr_.Load(kUser, VFS_CONFIG_SERVER, conf, false, true));
    EXPECT_EQ(conf, before);
    const std::vector<fake::Call> loads = fake::Calls("Load");
    EXPECT_TRUE(loads[0].mode == VFS_CONFIG_CONNECT && loads[0].flag && !loads[0].online);
    EXPECT_TRUE(loads[1].mode == VFS_CONFIG_SERVER && !loads[1].flag && loads[1].online);
}

TEST_F(ServerMgrTest, MountUnmountAndCleanUpRunAsRootTheRestAsTheCaller) {
    ASSERT_TRUE(Load(Conf()));
    fake::Now().calls.clear();
    ASSERT_EQ(setegid(100), 0);
    ASSERT_EQ(seteuid(kUser), 0);
    for (const Operation& operation : kOperations) {
        operation.run(mgr_);
        EXPECT_EQ(geteuid(), kUser) << operation.name;
        EXPECT_EQ(getegid(), 100U) << operation.name;
    }
    ASSERT_EQ(seteuid(0), 0);
    ASSERT_EQ(setegid(0), 0);
    for (const fake::Call& call : fake::Now().calls) {
        const bool privileged = call.operation == "Mount" || call.operation == "Unmount" ||
                                call.operation == "DeletePostProcess";
        EXPECT_EQ(call.effective_uid, privileged ? 0 : kUser) << call.operation;
    }
}

TEST_F(ServerMgrTest, EveryAttemptToMountStartsTheWatchingServiceAsRoot) {
    ASSERT_TRUE(Load(Conf()));
    for (const __tag_vfs_err_ outcome : {VFS_ERR_NONE, VFS_ERR_WRONG_PASSWORD}) {
        fake::Now().calls.clear();
        starts.clear();
        fake::Fail("Mount", {outcome});
        ASSERT_EQ(seteuid(kUser), 0);
        const bool mounted = mgr_.Mount(kUser, VFS_CONFIG_CONNECT, Conf(), true);
        ASSERT_EQ(seteuid(0), 0);
        EXPECT_EQ(mounted, outcome == VFS_ERR_NONE) << "whatever the service says";
        ASSERT_EQ(starts.size(), 1U);
        EXPECT_EQ(starts[0].service, "pkg-FileHarbor-zyrovfsd");
        EXPECT_EQ(starts[0].flag, 0);
        EXPECT_EQ(starts[0].mounts, 1U) << "after the mount";
        EXPECT_EQ(starts[0].effective_uid, 0U);
    }
    starts.clear();
    mgr_.Unmount(kUser, VFS_CONFIG_CONNECT);
    ServerMgr().Mount(kUser, VFS_CONFIG_CONNECT, Conf(), true);
    EXPECT_TRUE(starts.empty()) << "neither an unmount nor a mount of nothing";
}

TEST_F(ServerMgrTest, SectionThatCannotBecomeRootStillRunsAndGivesTheResult) {
    ASSERT_TRUE(Load(Conf()));
    for (const bool succeeds : {true, false}) {
        fake::Now().calls.clear();
        if (!succeeds) {
            fake::Fail("Unmount", {VFS_ERR_BUSY});
        }
        ASSERT_EQ(seteuid(kUser), 0);
        seams::FailIdentity("setresuid", EPERM);
        const bool result = mgr_.Unmount(kUser, VFS_CONFIG_CONNECT);
        seams::FailIdentity("setresuid", EPERM, 1000);
        const uid_t during = fake::Calls("Unmount").at(0).effective_uid;
        ASSERT_EQ(seteuid(0), 0);
        EXPECT_EQ(during, kUser);
        EXPECT_EQ(result, succeeds);
        EXPECT_TRUE(seams::Logged("ERROR: ENTERCriticalSection")) << seams::LogDump();
        seams::Reset();
    }
}

}  // namespace
}  // namespace ZYROVFS::Server
