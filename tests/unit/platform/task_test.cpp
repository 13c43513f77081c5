#include <gmock/gmock.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <zosplatform/error.h>
#include <zosplatform/task.h>

#include <csignal>
#include <set>

#include "support/scratch.h"

namespace {

namespace fs = std::filesystem;
using ZOS::Task;
using ZOS::TaskMgr;
using Ids = std::vector<std::string>;

const std::string kStore = "/var/tmp/zos/task";
const std::string kAmy = kStore + "/amy";

Json::Value Transfer(int pid) {
    Json::Value properties;
    properties["pid"] = pid;
    properties["data"]["is_vfs"] = true;
    properties["data"]["vfs_uri"]["ftp://amy@nas.example"] = 1;
    return properties;
}

class Tasks : public testing::Test {
  protected:
    void SetUp() override { fs::remove_all("/var/tmp/zos"); }

    /** A file among amy's tasks, as it may have got there. */
    static void Put(const std::string& name, const std::string& text) {
        TaskMgr("amy").createTask(Json::Value())->remove();
        scratch::PutText(kAmy + "/" + name, text);
        fs::permissions(kAmy + "/" + name, fs::perms::owner_read | fs::perms::owner_write);
    }

    const TaskMgr amy_{"amy"};
};

TEST_F(Tasks, AreFoundByOthers) {
    const auto task = amy_.createTask(Transfer(4711));
    ASSERT_NE(task, nullptr);
    EXPECT_EQ(TaskMgr("amy").getAllTaskId(), Ids{task->id()});
    const auto found = TaskMgr("amy").getTask(task->id());
    ASSERT_NE(found, nullptr);
    EXPECT_EQ(found->id(), task->id());
    EXPECT_EQ(found->getProperty("pid").asInt(), 4711);
    EXPECT_EQ(found->getProperty("data"), Transfer(4711)["data"]);
    EXPECT_TRUE(found->getProperty("proc_name").isNull());
}

TEST_F(Tasks, BelongToOneUser) {
    amy_.createTask(Transfer(1));
    EXPECT_EQ(TaskMgr("bob").getAllTaskId(), Ids{});
}

TEST_F(Tasks, IdsAreUniqueAndSorted) {
    Ids made;
    for (int i = 0; i < 500; ++i) {
        made.push_back(amy_.createTask(Json::Value())->id());
    }
    EXPECT_EQ(std::set<std::string>(made.begin(), made.end()).size(), 500U);
    EXPECT_EQ(amy_.getAllTaskId(), made);
}

TEST_F(Tasks, ChangesShowOnceTheyAreSaved) {
    const auto task = amy_.createTask(Transfer(1));
    task->setProperty("pid", 2);
    EXPECT_EQ(amy_.getTask(task->id())->getProperty("pid").asInt(), 1);
    EXPECT_TRUE(task->save());
    EXPECT_EQ(amy_.getTask(task->id())->getProperty("pid").asInt(), 2);
}

TEST_F(Tasks, GoWhenRemoved) {
    const auto task = amy_.createTask(Transfer(1));
    EXPECT_TRUE(task->remove());
    EXPECT_EQ(amy_.getAllTaskId(), Ids{});
    EXPECT_EQ(amy_.getTask(task->id()), nullptr);
    EXPECT_EQ(YLIBCErrGet(), ZOS_ERR_NOT_FOUND);
    EXPECT_TRUE(task->remove()) << "gone is gone";
}

TEST_F(Tasks, KeepTextsOfAllKinds) {
    const std::string text("a\"\n\0\xff\xc3\xa9", 7);
    Json::Value properties;
    properties["large"] = std::string(1 << 20, 'x');
    properties["odd"] = text;
    const auto task = amy_.createTask(properties);
    const auto found = amy_.getTask(task->id());
    ASSERT_NE(found, nullptr);
    EXPECT_EQ(found->getProperty("odd").asString(), text);
    EXPECT_EQ(found->getProperty("large").asString().size(), size_t{1 << 20});
}

TEST_F(Tasks, FilesAreForRootAlone) {
    const mode_t before = umask(0);
    const auto task = amy_.createTask(Transfer(1));
    umask(before);
    struct stat info {};
    ASSERT_EQ(stat((kAmy + "/" + task->id() + ".json").c_str(), &info), 0);
    EXPECT_EQ(info.st_mode & 07777, 0600U);
    ASSERT_EQ(stat(kAmy.c_str(), &info), 0);
    EXPECT_EQ(info.st_mode & 07777, 0700U);
    ASSERT_EQ(stat(kStore.c_str(), &info), 0);
    EXPECT_EQ(info.st_mode & 07777, 0755U);
}

TEST_F(Tasks, UserNamesStayInTheirFolder) {
    amy_.createTask(Transfer(1));
    const std::string names[] = {
        "",      ".",   "..", "../task/amy",           "/var/tmp/zos/task/amy",
        "amy/.", "a/b", ".x", std::string("amy\0x", 5)};
    for (const std::string& name : names) {
        const TaskMgr manager(name);
        EXPECT_EQ(manager.getAllTaskId(), Ids{}) << name;
        EXPECT_EQ(manager.createTask(Transfer(1)), nullptr) << name;
        EXPECT_EQ(YLIBCErrGet(), ZOS_ERR_BAD_PARAMETER);
        EXPECT_EQ(manager.getTask("1"), nullptr);
    }
    EXPECT_EQ(TaskMgr(std::string(5000, 'a')).createTask(Transfer(1)), nullptr);
    EXPECT_NE(TaskMgr("DOMAIN\\amy").createTask(Transfer(1)), nullptr);
}

TEST_F(Tasks, IdsStayInTheirFolder) {
    scratch::PutText("/var/tmp/outside.json", "{}");
    amy_.createTask(Transfer(1));
    for (const char* id : {"../../../outside", "/var/tmp/outside", "", "..", ".", "nothing"}) {
        EXPECT_EQ(amy_.getTask(id), nullptr) << id;
    }
}

TEST_F(Tasks, FilesThatAreNoTaskGiveNone) {
    const std::string nested = std::string(100000, '[') + std::string(100000, ']');
    for (const std::string& text :
         {std::string(), std::string("{"), std::string("[]"), std::string("1"), std::string("null"),
          std::string("\0\xff{}", 4), nested, "{\"a\":" + nested + "}"}) {
        Put("bad.json", text);
        EXPECT_EQ(amy_.getAllTaskId(), Ids{"bad"});
        EXPECT_EQ(amy_.getTask("bad"), nullptr) << text.substr(0, 20);
        EXPECT_EQ(YLIBCErrGet(), ZOS_ERR_BAD_FORMAT);
    }
}

TEST_F(Tasks, OtherNamesAreNoTasks) {
    Put(".new-0123", "{}");
    Put(".json", "{}");
    Put("note.txt", "{}");
    EXPECT_EQ(amy_.getAllTaskId(), Ids{});
}

TEST_F(Tasks, LinksPipesAndFoldersAreNoTasks) {
    Put("real.json", "{}");
    fs::create_symlink(kAmy + "/real.json", kAmy + "/link.json");
    fs::create_directory(kAmy + "/folder.json");
    ASSERT_EQ(mkfifo((kAmy + "/pipe.json").c_str(), 0600), 0);
    for (const char* id : {"link", "folder", "pipe"}) {
        EXPECT_EQ(amy_.getTask(id), nullptr) << id;
    }
    EXPECT_NE(amy_.getTask("real"), nullptr);
}

TEST_F(Tasks, OnlyRootCanNameAProcessForRootToEnd) {
    Put("planted.json", "{\"pid\":1}");
    ASSERT_EQ(chown((kAmy + "/planted.json").c_str(), 1234, 100), 0);
    EXPECT_EQ(amy_.getTask("planted"), nullptr);
    EXPECT_EQ(YLIBCErrGet(), ZOS_ERR_NO_PERMISSION);
    Put("open.json", "{\"pid\":1}");
    ASSERT_EQ(chmod((kAmy + "/open.json").c_str(), 0666), 0);
    EXPECT_EQ(amy_.getTask("open"), nullptr);
}

TEST_F(Tasks, StoreThatSomebodyElseMadeBecomesRoots) {
    const std::string folders[] = {"/var/tmp/zos", kStore, kAmy};
    for (const std::string& folder : folders) {
        fs::remove_all("/var/tmp/zos");
        fs::create_directories(kAmy);
        ASSERT_EQ(chown(folder.c_str(), 1234, 100), 0);
        const auto task = amy_.createTask(Transfer(1));
        ASSERT_NE(task, nullptr) << folder;
        EXPECT_EQ(amy_.getAllTaskId(), Ids{task->id()});
        struct stat info {};
        ASSERT_EQ(stat(folder.c_str(), &info), 0);
        EXPECT_EQ(info.st_uid, 0U) << folder;
        EXPECT_EQ(info.st_mode & 07777, folder == kAmy ? 0700U : 0755U) << folder;
    }
}

TEST_F(Tasks, LinkInPlaceOfTheStoreIsNotFollowed) {
    fs::create_directory_symlink("/etc", "/var/tmp/zos");
    EXPECT_EQ(amy_.createTask(Transfer(1)), nullptr);
    EXPECT_STREQ(YLIBCErrorGetFile(), "task.cpp");
    EXPECT_FALSE(fs::exists("/etc/task"));
    ASSERT_EQ(lchown("/var/tmp/zos", 1234, 100), 0);
    EXPECT_NE(amy_.createTask(Transfer(1)), nullptr) << "a user's gives way";
    EXPECT_FALSE(fs::exists("/etc/task"));
}

TEST_F(Tasks, PropertiesHaveToBeAnObject) {
    EXPECT_EQ(amy_.createTask(Json::Value("text")), nullptr);
    EXPECT_EQ(amy_.createTask(Json::Value(Json::arrayValue)), nullptr);
    EXPECT_EQ(YLIBCErrGet(), ZOS_ERR_BAD_PARAMETER);
    const auto task = amy_.createTask(Json::Value());
    ASSERT_NE(task, nullptr);
    EXPECT_TRUE(task->getProperty("pid").isNull());
}

TEST_F(Tasks, FailedSaveLeavesTheOldTask) {
    const auto task = amy_.createTask(Transfer(1));
    EXPECT_EQ(scratch::InChild([&] {
                  const rlimit limit{100, 100};
                  setrlimit(RLIMIT_FSIZE, &limit);
                  signal(SIGXFSZ, SIG_IGN);
                  task->setProperty("large", std::string(1000, 'x'));
                  return task->save() ? 1 : 0;
              }),
              0);
    EXPECT_EQ(amy_.getTask(task->id())->getProperty("pid").asInt(), 1);
    EXPECT_EQ(std::distance(fs::directory_iterator(kAmy), {}), 1) << "nothing is left beside it";
}

}  // namespace
