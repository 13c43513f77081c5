#include <gmock/gmock.h>
#include <signal.h>
#include <sys/prctl.h>
#include <unistd.h>
#include <zosplatform/error.h>
#include <zosplatform/process.h>
#include <zosplatform/task.h>

#include <cerrno>
#include <climits>
#include <filesystem>
#include <functional>
#include <string>

#include "support/kill_seam.h"
#include "support/other_process.h"
#include "support/seams.h"
#include "zyrovfs/error.h"
#include "zyrovfs/utils.h"

namespace {

bool no_records = false;

}  // namespace

extern "C" PYLIBCPROC YLIBCProcGetByPid(pid_t pid) {
    if (no_records) {
        YLIBCErrSetEx(0x600, "process.cpp", 9);
        return nullptr;
    }
    return kill_seam::Real<PYLIBCPROC(pid_t)>("YLIBCProcGetByPid")(pid);
}

namespace ZYROVFS::Utils {
namespace {

using support::OtherProcess;

constexpr const char* kUser = "daemon";  // uid 1 on any Debian
constexpr unsigned kUserUid = 1;
constexpr const char* kUri = "sftp://amy@nas.example";

bool BecomeMover() {
    return prctl(PR_SET_NAME, "zyrovfs.7") == 0;
}

bool BecomeMoverThatWillNotEnd() {
    signal(SIGTERM, SIG_IGN);
    return BecomeMover();
}

Json::Value Properties(pid_t pid) {
    Json::Value properties;
    properties["pid"] = pid;
    properties["data"]["is_vfs"] = true;
    properties["data"]["vfs_uri"][kUri] = true;
    return properties;
}

void Register(const Json::Value& properties, const char* user = kUser) {
    ASSERT_NE(ZOS::TaskMgr(user).createTask(properties), nullptr);
}

class Tasks : public testing::Test {
  protected:
    void SetUp() override {
        std::filesystem::remove_all("/var/tmp/zos");
        VFSSetErrEx(VFS_ERR_NONE, nullptr, 0);
    }
    void TearDown() override {
        kill_seam::instead = nullptr;
        no_records = false;
    }
};

using KillProcByUsernameTest = Tasks;
using KillProcByUIDTest = Tasks;

TEST_F(KillProcByUsernameTest, NullArgumentsAreBadParameters) {
    EXPECT_FALSE(KillProcByUsername(nullptr, kUser));
    EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM);
    ResetError();
    EXPECT_FALSE(KillProcByUsername(kUri, nullptr));
    EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM);
}

TEST_F(KillProcByUsernameTest, UserWithoutTasksIsDoneAtOnce) {
    EXPECT_TRUE(KillProcByUsername(kUri, kUser));
    EXPECT_TRUE(KillProcByUsername(kUri, "no-such-user"));
    EXPECT_TRUE(KillProcByUsername(kUri, "../../../etc"));
    EXPECT_TRUE(KillProcByUsername("", ""));
    EXPECT_THAT(seams::LogLines(), testing::IsEmpty());
}

TEST_F(KillProcByUsernameTest, EndsTheTasksOfTheConnectionAndNoOthers) {
    OtherProcess ours(BecomeMover);
    OtherProcess other_uri(BecomeMover);
    OtherProcess not_vfs(BecomeMover);
    OtherProcess other_user(BecomeMover);
    Register(Properties(ours.pid()));
    Json::Value properties = Properties(other_uri.pid());
    properties["data"]["vfs_uri"] = Json::objectValue;
    properties["data"]["vfs_uri"]["sftp://amy@nas.example:2222"] = true;
    Register(properties);
    properties = Properties(not_vfs.pid());
    properties["data"]["is_vfs"] = false;
    Register(properties);
    Register(Properties(other_user.pid()), "bin");

    EXPECT_TRUE(KillProcByUsername(kUri, kUser));
    EXPECT_EQ(ours.EndedBy(), SIGTERM);
    EXPECT_TRUE(other_uri.Runs());
    EXPECT_TRUE(not_vfs.Runs());
    EXPECT_TRUE(other_user.Runs());
    EXPECT_THAT(seams::LogLines(), testing::IsEmpty()) << seams::LogDump();
}

TEST_F(KillProcByUsernameTest, ATaskMayMoveFilesOfSeveralConnections) {
    OtherProcess mover(BecomeMover);
    Json::Value properties = Properties(mover.pid());
    properties["data"]["vfs_uri"]["dav://h"] = Json::Value();
    Register(properties);
    EXPECT_TRUE(KillProcByUsername("dav://h", kUser));
    EXPECT_EQ(mover.EndedBy(), SIGTERM);
}

TEST_F(KillProcByUsernameTest, ProcessNameIsComparedUpToItsFirstDot) {
    OtherProcess same(BecomeMover);
    OtherProcess longer(BecomeMover);
    OtherProcess other(BecomeMover);
    const auto add = [](pid_t pid, const Json::Value& name) {
        Json::Value properties = Properties(pid);
        properties["proc_name"] = name;
        Register(properties);
    };
    add(same.pid(), "zyrovfs");
    add(longer.pid(), "zyrovfs-with-a-longer-name");
    add(other.pid(), "zyro");
    EXPECT_TRUE(KillProcByUsername(kUri, kUser));
    EXPECT_EQ(same.EndedBy(), SIGTERM);
    EXPECT_EQ(longer.EndedBy(), SIGTERM) << "the kernel cuts names, so a beginning will do";
    EXPECT_TRUE(other.Runs()) << "the pid belongs to another program by now";
}

TEST_F(KillProcByUsernameTest, ProcessWithoutARecordIsLoggedAndEnded) {
    OtherProcess mover(BecomeMover);
    Json::Value properties = Properties(mover.pid());
    properties["proc_name"] = "another";
    Register(properties);
    no_records = true;
    EXPECT_TRUE(KillProcByUsername(kUri, kUser));
    EXPECT_TRUE(seams::Logged("YLIBCProcGetByPid failed, pid=" + std::to_string(mover.pid()) +
                              ", zyroerr=[0x0600 process.cpp:9]"))
        << seams::LogDump();
    EXPECT_EQ(mover.EndedBy(), SIGTERM);
}

TEST_F(KillProcByUsernameTest, EachProcessIsWaitedForThreeSecondsAfterAllWereTold) {
    OtherProcess first(BecomeMoverThatWillNotEnd);
    OtherProcess second(BecomeMoverThatWillNotEnd);
    Register(Properties(first.pid()));
    Register(Properties(second.pid()));
    EXPECT_TRUE(KillProcByUsername(kUri, kUser));
    EXPECT_EQ(seams::MicroSleeps(), std::vector<unsigned>(12, 500000U));
    EXPECT_TRUE(first.Runs());
}

TEST_F(KillProcByUsernameTest, FailedKillIsLoggedNotWaitedForAndStillSuccess) {
    OtherProcess mover(BecomeMover);
    Register(Properties(mover.pid()));
    kill_seam::instead = [](pid_t, int) {
        errno = EPERM;
        return -1;
    };
    EXPECT_TRUE(KillProcByUsername(kUri, kUser));
    EXPECT_TRUE(seams::Logged("Failed to kill process(" + std::to_string(mover.pid()) +
                              "), error=Operation not permitted(1)"))
        << seams::LogDump();
    EXPECT_THAT(seams::MicroSleeps(), testing::IsEmpty());
    kill_seam::instead = nullptr;
}

TEST_F(KillProcByUsernameTest, PropertiesOfTheWrongTypeEndNothing) {
    kill_seam::instead = [](pid_t pid, int) {
        ADD_FAILURE() << "a signal for " << pid;
        return 0;
    };
    const Json::Value good = Properties(getpid());
    const auto with = [&good](const char* key, const Json::Value& value) {
        Json::Value changed = good;
        changed[key] = value;
        return changed;
    };
    Json::Value is_text = good;
    is_text["data"]["is_vfs"] = "true";
    Json::Value uri_text = good;
    uri_text["data"]["vfs_uri"] = kUri;
    Json::Value uri_list = good;
    uri_list["data"]["vfs_uri"] = Json::arrayValue;
    uri_list["data"]["vfs_uri"].append(kUri);
    Json::Value no_pid = good;
    no_pid.removeMember("pid");
    for (const Json::Value& properties :
         {with("data", Json::Value()), with("data", "text"), with("data", Json::arrayValue),
          with("data", 7), is_text, uri_text, uri_list, no_pid, with("pid", "amy"),
          with("pid", Json::objectValue), with("pid", 0), with("pid", -1), with("pid", 1e300),
          with("pid", Json::Int64(INT_MAX) + 1), with("pid", INT_MAX), with("pid", true),
          with("proc_name", 7), with("proc_name", Json::objectValue), with("proc_name", "none")}) {
        Register(properties);
    }
    EXPECT_TRUE(KillProcByUsername(kUri, kUser));
    kill_seam::instead = nullptr;
}

TEST_F(KillProcByUsernameTest, ATaskThatCannotBeReadIsPassedOver) {
    OtherProcess mover(BecomeMover);
    Register(Properties(mover.pid()));
    for (const char* text : {"", "{", "[]", "\xff", "7"}) {
        static int number = 0;
        const std::string path =
            std::string("/var/tmp/zos/task/") + kUser + "/0" + std::to_string(++number) + ".json";
        FILE* file = fopen(path.c_str(), "w");
        ASSERT_NE(file, nullptr);
        fputs(text, file);
        fclose(file);
    }
    EXPECT_TRUE(KillProcByUsername(kUri, kUser));
    EXPECT_EQ(mover.EndedBy(), SIGTERM);
}

TEST_F(KillProcByUIDTest, EndsTheTasksOfTheUserOfThatNumber) {
    OtherProcess mover(BecomeMover);
    Register(Properties(mover.pid()));
    EXPECT_TRUE(KillProcByUID(kUri, kUserUid));
    EXPECT_EQ(mover.EndedBy(), SIGTERM);
}

TEST_F(KillProcByUIDTest, UnknownUserIsLogged) {
    EXPECT_FALSE(KillProcByUID(kUri, 4294900000U));
    EXPECT_TRUE(
        seams::LoggedPart("ZYROUserGetByUID failed, uid=4294900000, zyroerr=[0x1D00 user.cpp:"))
        << seams::LogDump();
}

TEST_F(KillProcByUIDTest, NullUriIsLoggedWithTheName) {
    EXPECT_FALSE(KillProcByUID(nullptr, kUserUid));
    EXPECT_TRUE(seams::Logged("KIllVFSProcByUsername failed, username=daemon")) << seams::LogDump();
    EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM);
}

}  // namespace
}  // namespace ZYROVFS::Utils
