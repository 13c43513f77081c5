#include <sys/mount.h>
#include <sys/stat.h>
#include <zosplatform/error.h>
#include <zosplatform/task.h>

#include <climits>

#include "support/scratch.h"

namespace {

namespace fs = std::filesystem;
using Ids = std::vector<std::string>;

constexpr const char* kShared = "/var/tmp/zos";
constexpr const char* kStore = "/var/tmp/zos/task";
constexpr uid_t kUser = 4711;
constexpr mode_t kPermissions = 07777;

Json::Value Properties(const std::string& name, const Json::Value& value) {
    Json::Value properties;
    properties[name] = value;
    return properties;
}

std::string FileOf(const std::string& id, const std::string& user = "amy") {
    return std::string(kStore) + "/" + user + "/" + id + ".json";
}

struct stat Look(const std::string& path) {
    struct stat info {};
    EXPECT_EQ(lstat(path.c_str(), &info), 0) << path;
    return info;
}

size_t FilesOf(const std::string& user) {
    return static_cast<size_t>(std::distance(
        fs::directory_iterator(std::string(kStore) + "/" + user), fs::directory_iterator()));
}

class Tasks : public testing::Test {
  protected:
    void SetUp() override {
        fs::remove_all(kShared);
        YLIBCErrSetEx(0, "", 0);
    }
    void TearDown() override { fs::remove_all(kShared); }

    /** Id of a new task that others can read. */
    std::string Make(const Json::Value& properties = Json::Value()) const {
        const auto task = amy_.createTask(properties);
        EXPECT_NE(task, nullptr);
        return task == nullptr ? "" : task->id();
    }

    const ZOS::TaskMgr amy_{"amy"};
};

TEST_F(Tasks, NoneToBeginWith) {
    EXPECT_EQ(amy_.getAllTaskId(), Ids());
    EXPECT_EQ(amy_.getTask("1"), nullptr);
    EXPECT_FALSE(fs::exists(kShared)) << "looking makes nothing";
}

TEST_F(Tasks, NewOneIsReadBack) {
    Json::Value properties = Properties("pid", 4711);
    properties["data"]["vfs_uri"]["ftp://a.example"] = true;
    const std::string id = Make(properties);
    EXPECT_EQ(amy_.getAllTaskId(), Ids{id});
    const auto task = ZOS::TaskMgr("amy").getTask(id);
    ASSERT_NE(task, nullptr);
    EXPECT_EQ(task->id(), id);
    EXPECT_EQ(task->getProperty("pid"), Json::Value(4711));
    EXPECT_EQ(task->getProperty("data"), properties["data"]);
    EXPECT_TRUE(task->getProperty("none").isNull());
}

TEST_F(Tasks, MayHaveNoProperties) {
    const auto task = amy_.getTask(Make());
    ASSERT_NE(task, nullptr);
    EXPECT_TRUE(task->getProperty("pid").isNull());
}

TEST_F(Tasks, EachHasAnIdOfItsOwnInTheOrderOfTime) {
    Ids made;
    for (int i = 0; i < 50; ++i) {
        made.push_back(Make(Properties("number", i)));
    }
    EXPECT_EQ(amy_.getAllTaskId(), made);
    EXPECT_EQ(amy_.getTask(made[7])->getProperty("number"), Json::Value(7));
}

TEST_F(Tasks, BelongToOneUser) {
    const std::string id = Make();
    const ZOS::TaskMgr bob("bob");
    EXPECT_EQ(bob.getAllTaskId(), Ids());
    EXPECT_EQ(bob.getTask(id), nullptr);
    EXPECT_EQ(YLIBCErrGet(), ZOS_ERR_NOT_FOUND);
}

TEST_F(Tasks, ChangeIsSeenOnlyAfterItIsSaved) {
    const std::string id = Make(Properties("state", "old"));
    const auto task = amy_.getTask(id);
    task->setProperty("state", "new");
    EXPECT_EQ(amy_.getTask(id)->getProperty("state"), Json::Value("old"));
    EXPECT_TRUE(task->save());
    EXPECT_EQ(amy_.getTask(id)->getProperty("state"), Json::Value("new"));
    EXPECT_EQ(FilesOf("amy"), 1U);
}

TEST_F(Tasks, RemovedOneIsGone) {
    const std::string id = Make();
    const std::string other = Make();
    const auto task = amy_.getTask(id);
    EXPECT_TRUE(task->remove());
    EXPECT_EQ(amy_.getAllTaskId(), Ids{other});
    EXPECT_EQ(amy_.getTask(id), nullptr);
    EXPECT_TRUE(task->remove()) << "gone is gone";
    fs::remove_all(kShared);
    EXPECT_TRUE(task->remove());
}

TEST_F(Tasks, StandInFilesOfRootAlone) {
    const mode_t before = umask(0);
    const std::string id = Make();
    umask(before);
    EXPECT_EQ(Look(FileOf(id)).st_mode & kPermissions, 0600U);
    EXPECT_EQ(Look(std::string(kStore) + "/amy").st_mode & kPermissions, 0700U);
    EXPECT_EQ(Look(kStore).st_mode & kPermissions, 0755U);
    EXPECT_EQ(Look(kShared).st_mode & kPermissions, 0755U);
}

TEST_F(Tasks, BinaryPropertiesComeBack) {
    const std::string binary("\x00\x01\xff\xfe\"\\\n\xc3\xa4", 9);
    Json::Value properties;
    properties["text"] = binary;
    properties[binary] = "name";
    const auto task = amy_.getTask(Make(properties));
    ASSERT_NE(task, nullptr);
    EXPECT_EQ(task->getProperty("text").asString(), binary);
    EXPECT_EQ(task->getProperty(binary), Json::Value("name"));
}

TEST_F(Tasks, PropertiesThatAreNoObjectAreRefused) {
    for (const Json::Value& value :
         {Json::Value("text"), Json::Value(1), Json::Value(true), Json::Value(Json::arrayValue)}) {
        YLIBCErrSetEx(0, "", 0);
        EXPECT_EQ(amy_.createTask(value), nullptr) << value.toStyledString();
        EXPECT_EQ(YLIBCErrGet(), ZOS_ERR_BAD_PARAMETER);
    }
    EXPECT_EQ(amy_.getAllTaskId(), Ids());
}

class TaskNames : public Tasks, public testing::WithParamInterface<std::string> {};

TEST_P(TaskNames, OfUsersThatLeaveTheStoreAreRefused) {
    const ZOS::TaskMgr tasks(GetParam());
    EXPECT_EQ(tasks.createTask(Json::Value()), nullptr);
    EXPECT_NE(YLIBCErrGet(), 0U);
    EXPECT_EQ(tasks.getAllTaskId(), Ids());
    EXPECT_EQ(tasks.getTask("1"), nullptr);
    EXPECT_FALSE(fs::exists(kStore) && !fs::is_empty(kStore));
    EXPECT_FALSE(fs::exists("/var/tmp/1.json"));
}

TEST_P(TaskNames, OfTasksThatLeaveTheFolderAreRefused) {
    const std::string id = Make();
    scratch::PutText(std::string(kStore) + "/outside.json", "{}");
    EXPECT_EQ(amy_.getTask(GetParam()), nullptr);
    EXPECT_NE(YLIBCErrGet(), 0U);
    EXPECT_EQ(amy_.getTask("../outside"), nullptr);
    EXPECT_EQ(amy_.getAllTaskId(), Ids{id});
}

INSTANTIATE_TEST_SUITE_P(Names, TaskNames,
                         testing::Values("", ".", "..", ".hidden", "a/b", "/", "../amy",
                                         "/etc/passwd", std::string("a\0b", 3),
                                         std::string(300, 'n'), std::string(PATH_MAX, 'n')));

TEST_F(Tasks, PathOutsideOfTheStoreIsNeitherWrittenNorRemoved) {
    scratch::PutText("/var/tmp/precious.json", "{}");
    for (const char* path :
         {"", "x.json", "/precious.json", "/var/tmp/precious.json", "/var/tmp/zos/task/x.json",
          "/var/tmp/zos/task/../precious.json", "/var/tmp/zos/task/../../precious.json",
          "/var/tmp/zos/task/amy/../x.json"}) {
        YLIBCErrSetEx(0, "", 0);
        const ZOS::Task task(path, "x", Properties("a", 1));
        EXPECT_FALSE(task.save()) << path;
        EXPECT_FALSE(task.remove()) << path;
        EXPECT_EQ(YLIBCErrGet(), ZOS_ERR_BAD_PARAMETER) << path;
    }
    EXPECT_EQ(scratch::Text("/var/tmp/precious.json"), "{}");
    EXPECT_FALSE(fs::exists(kShared));
}

TEST_F(Tasks, BrokenFileIsNoTask) {
    const std::string id = Make();
    for (const std::string& text :
         {std::string(), std::string("{"), std::string("[]"), std::string("null"), std::string("1"),
          std::string("\xff\xfe\0", 3), std::string("{\"a\":1"), std::string(100000, '['),
          std::string(64, '\0')}) {
        scratch::PutText(FileOf(id), text);
        YLIBCErrSetEx(0, "", 0);
        EXPECT_EQ(amy_.getTask(id), nullptr) << text.substr(0, 20);
        EXPECT_EQ(YLIBCErrGet(), ZOS_ERR_BAD_FORMAT);
        EXPECT_EQ(amy_.getAllTaskId(), Ids{id}) << "it is listed, so that it can be seen";
    }
}

TEST_F(Tasks, WhatIsNoFileIsNoTask) {
    const std::string id = Make(Properties("a", 1));
    fs::rename(FileOf(id), "/var/tmp/zos/elsewhere");
    const auto refused = [&](unsigned code) {
        YLIBCErrSetEx(0, "", 0);
        return amy_.getTask(id) == nullptr && YLIBCErrGet() == code;
    };
    fs::create_symlink("/var/tmp/zos/elsewhere", FileOf(id));
    EXPECT_TRUE(refused(ZOS_ERR_OPEN_FAILED));
    fs::remove(FileOf(id));
    fs::create_directory(FileOf(id));
    EXPECT_TRUE(refused(ZOS_ERR_OPEN_FAILED));
    fs::remove(FileOf(id));
    ASSERT_EQ(mkfifo(FileOf(id).c_str(), 0600), 0);
    EXPECT_TRUE(refused(ZOS_ERR_OPEN_FAILED)) << "and is not waited for";
}

TEST_F(Tasks, SavingReplacesALinkAndNotWhatItNames) {
    const auto task = amy_.createTask(Properties("a", 1));
    scratch::PutText("/var/tmp/zos/precious", "text");
    fs::remove(FileOf(task->id()));
    fs::create_symlink("/var/tmp/zos/precious", FileOf(task->id()));
    EXPECT_TRUE(task->save());
    EXPECT_EQ(scratch::Text("/var/tmp/zos/precious"), "text");
    ASSERT_NE(amy_.getTask(task->id()), nullptr);
}

TEST_F(Tasks, SavingOverAFolderFailsAndLeavesNoFileBehind) {
    const auto task = amy_.createTask(Properties("a", 1));
    fs::remove(FileOf(task->id()));
    fs::create_directory(FileOf(task->id()));
    EXPECT_FALSE(task->save());
    EXPECT_NE(YLIBCErrGet(), 0U);
    EXPECT_EQ(FilesOf("amy"), 1U);
    EXPECT_FALSE(task->remove());
}

TEST_F(Tasks, OnlyTaskFilesAreListed) {
    const std::string id = Make();
    for (const char* name : {"notes", ".json", ".new-1.json", "x.json.old", "json"}) {
        scratch::PutText(std::string(kStore) + "/amy/" + name, "{}");
    }
    EXPECT_EQ(amy_.getAllTaskId(), Ids{id});
}

TEST_F(Tasks, FileOfAnotherUserIsNoTask) {
    const std::string id = Make();
    ASSERT_EQ(chown(FileOf(id).c_str(), kUser, 100), 0);
    EXPECT_EQ(amy_.getTask(id), nullptr);
    EXPECT_EQ(YLIBCErrGet(), ZOS_ERR_NO_PERMISSION);
    ASSERT_EQ(chown(FileOf(id).c_str(), 0, 0), 0);
    ASSERT_EQ(chmod(FileOf(id).c_str(), 0602), 0);
    EXPECT_EQ(amy_.getTask(id), nullptr) << "others may write it";
    ASSERT_EQ(chmod(FileOf(id).c_str(), 0600), 0);
    EXPECT_NE(amy_.getTask(id), nullptr);
}

TEST_F(Tasks, StoreThatAUserPreparedIsNotUsed) {
    fs::create_directories(std::string(kStore) + "/amy");
    scratch::PutText(FileOf("1"), "{\"pid\":1}");
    ASSERT_EQ(chown(kShared, kUser, 100), 0);
    EXPECT_EQ(amy_.getAllTaskId(), Ids());
    EXPECT_EQ(amy_.getTask("1"), nullptr);
    EXPECT_EQ(amy_.createTask(Json::Value()), nullptr);
    fs::rename(kShared, "/var/tmp/zos-elsewhere");
    fs::create_symlink("/var/tmp/zos-elsewhere", kShared);
    EXPECT_EQ(amy_.getAllTaskId(), Ids());
    fs::remove_all("/var/tmp/zos-elsewhere");
}

TEST_F(Tasks, FirstUserDoesNotTakeTheSharedFolders) {
    EXPECT_EQ(scratch::InChild([] {
                  return scratch::BecomeUser(kUser) &&
                                 ZOS::TaskMgr("amy").createTask(Json::Value()) == nullptr
                             ? 0
                             : 1;
              }),
              0);
    EXPECT_FALSE(fs::exists(kShared));
    Make();
}

TEST_F(Tasks, FullDiskLeavesTheOldTask) {
    fs::create_directories(kShared);
    ASSERT_EQ(mount("tmpfs", kShared, "tmpfs", 0, "size=256k,mode=755"), 0);
    const std::string id = Make(Properties("state", "old"));
    const auto task = amy_.getTask(id);
    ASSERT_NE(task, nullptr);
    task->setProperty("state", std::string(1024 * 1024, 'x'));
    YLIBCErrSetEx(0, "", 0);
    EXPECT_FALSE(task->save());
    EXPECT_EQ(YLIBCErrGet(), ZOS_ERR_WRITE_FAILED);
    EXPECT_EQ(amy_.createTask(Properties("big", std::string(1024 * 1024, 'x'))), nullptr);
    EXPECT_EQ(amy_.getAllTaskId(), Ids{id});
    EXPECT_EQ(amy_.getTask(id)->getProperty("state"), Json::Value("old"));
    EXPECT_EQ(FilesOf("amy"), 1U) << "half a file is left";
    EXPECT_EQ(umount(kShared), 0);
}

/** Readers beside a writer see one whole task or the other. */
TEST_F(Tasks, AreReplacedWhole) {
    const std::string id = Make(Properties("text", std::string(20000, 'a')));
    const pid_t writer = scratch::Start([&] {
        const auto task = amy_.getTask(id);
        for (int i = 0; i < 200; ++i) {
            task->setProperty("text", std::string(20000, i % 2 == 0 ? 'b' : 'a'));
            if (!task->save()) {
                return 1;
            }
        }
        return 0;
    });
    for (int i = 0; i < 200; ++i) {
        const auto task = amy_.getTask(id);
        EXPECT_NE(task, nullptr);
        const std::string text = task == nullptr ? "" : task->getProperty("text").asString();
        EXPECT_EQ(text, std::string(20000, text.empty() ? '?' : text.front()));
    }
    EXPECT_EQ(scratch::End(writer), 0);
}

}  // namespace
