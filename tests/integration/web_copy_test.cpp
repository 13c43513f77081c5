// Copies between two connections in the background: with the page open and closed, stopped, killed,
// one after the other, and nobody else's.
#include <gmock/gmock.h>

#include "support/vfs_cloud_remote.h"
#include "support/web_site.h"

namespace {

using namespace remote_side;
using namespace web_site;
using testing::HasSubstr;
namespace fs = std::filesystem;

std::string dav_id;
std::string sftp_id;

std::string AddServer(const std::string& protocol, int port, const std::string& path) {
    Json::Value form;
    form["protocol"] = protocol;
    form["host"] = "127.0.0.1";
    form["port"] = port;
    form["user"] = "remo";
    form["password"] = kPassword;
    form["path"] = path;
    form["alias"] = "My " + protocol;
    return Post("add", form).Json()["connection"].asString();
}

class Site : public testing::Environment {
    void SetUp() override {
        machine::AddUser("amy", kAmy);
        machine::AddUser("ben", kBen);
        machine::Remote(std::string("start ") + kPassword);
        Must(BuildDir() + "/tools/zyrovfs/zyrovfs policy set --type all");
        StartWebServer();
        dav_id = AddServer("dav", 8080, "");
        sftp_id = AddServer("sftp", 2222, "srv/remote");
        ASSERT_FALSE(dav_id.empty() || sftp_id.empty());
    }
};

const auto* const kSetUp = testing::AddGlobalTestEnvironment(new Site);

Json::Value Plan(const std::vector<std::string>& paths, const std::string& folder) {
    Json::Value plan;
    plan["from"]["connection"] = dav_id;
    for (const std::string& path : paths) {
        plan["from"]["paths"].append(path);
    }
    plan["to"]["connection"] = sftp_id;
    plan["to"]["path"] = folder;
    return plan;
}

std::string Start(const std::vector<std::string>& paths, const std::string& folder) {
    const Answer answer = Post("copy", Plan(paths, folder));
    EXPECT_EQ(answer.status, 200) << answer.body;
    return answer.Json()["task"].asString();
}

Json::Value Task(const std::string& id, const char* who = kAmyIs) {
    const Json::Value tasks = Ask(who, Api("tasks")).Json()["tasks"];
    for (const Json::Value& task : tasks) {
        if (task["id"] == id) {
            return task;
        }
    }
    return {};
}

bool Reaches(const std::string& id, const std::string& state) {
    for (int i = 0; i < 3; ++i) {
        if (Eventually([&] { return Task(id)["state"] == state; })) {
            return true;
        }
    }
    return false;
}

Json::Value Id(const std::string& id) {
    Json::Value body;
    body["id"] = id;
    return body;
}

constexpr unsigned long long kLarge = 600ULL << 20;

class WebCopy : public testing::Test {
  protected:
    void SetUp() override {
        Must(
            "mkdir -p /srv/remote/src/deep/empty /srv/remote/dst; "
            "truncate -s " +
            std::to_string(kLarge) + " /srv/remote/large");
        PutFile(kRemote + "src/a.bin", Noise(3 << 20));
        PutFile(kRemote + "src/deep/grüße.txt", "greetings");
        PutFile(kRemote + "src/nothing", "");
        Must("chown -R remo: /srv/remote/src /srv/remote/dst /srv/remote/large");
        ASSERT_TRUE(Eventually([] {
            return Ask(kAmyIs, At("list", dav_id, "/src/deep")).status == 200 &&
                   Ask(kAmyIs, At("list", sftp_id, "/dst")).status == 200 &&
                   Ask(std::string(kAmyIs) + " -I", At("download", dav_id, "/large")).status == 200;
        }));
    }
    void TearDown() override {
        const Json::Value tasks = Ask(kAmyIs, Api("tasks")).Json()["tasks"];
        for (const Json::Value& task : tasks) {
            Post("tasks/cancel", Id(task["id"].asString()));
        }
        EXPECT_TRUE(Eventually([] { return machine::Run("pgrep -x zyrovfs-web").status != 0; }));
        Must("rm -rf /srv/remote/src /srv/remote/dst /srv/remote/large /run/zyrovfs/web/4001/copy");
    }
};

TEST_F(WebCopy, AFolderGoesFromOneConnectionToTheOtherWhenThePageIsClosed) {
    const std::string id = Start({"/src", "/hello.txt"}, "/dst");
    ASSERT_TRUE(Reaches(id, "done")) << Task(id);
    EXPECT_TRUE(machine::Read(kRemote + "dst/src/a.bin") == Noise(3 << 20));
    EXPECT_EQ(machine::Read(kRemote + "dst/src/deep/grüße.txt"), "greetings");
    EXPECT_TRUE(fs::is_directory(kRemote + "dst/src/deep/empty"));
    EXPECT_TRUE(fs::exists(kRemote + "dst/src/nothing"));
    EXPECT_EQ(machine::Read(kRemote + "dst/hello.txt"), "hello from the remote side\n");
    const Json::Value task = Task(id);
    EXPECT_EQ(task["title"], "src and 1 more to My sftp");
    EXPECT_EQ(task["files_done"], 4);
    EXPECT_EQ(task["files_total"], 4);
    EXPECT_EQ(task["done"], task["total"]);
    EXPECT_EQ(task["total"].asUInt64(), (3ULL << 20) + 9 + 27);
    EXPECT_FALSE(task["counting"].asBool());
    EXPECT_EQ(machine::Read("/var/tmp/user/4001/zyrovfs/task/copy/copy"), "");
    EXPECT_EQ(Post("tasks/remove", Id(id)).status, 200);
    EXPECT_TRUE(Task(id).isNull());
}

TEST_F(WebCopy, AFolderThatIsThereAlreadyTakesInWhatComes) {
    Must(
        "mkdir /srv/remote/dst/src; echo kept >/srv/remote/dst/src/kept; "
        "echo old >/srv/remote/dst/src/a.bin; chown -R remo: /srv/remote/dst");
    const std::string id = Start({"/src"}, "/dst");
    ASSERT_TRUE(Reaches(id, "done")) << Task(id);
    EXPECT_EQ(machine::Read(kRemote + "dst/src/kept"), "kept\n");
    EXPECT_TRUE(machine::Read(kRemote + "dst/src/a.bin") == Noise(3 << 20));
}

TEST_F(WebCopy, ItIsSeenOnItsWayAndStopped) {
    const std::string id = Start({"/large"}, "/dst");
    ASSERT_TRUE(Eventually([&] { return Task(id)["done"].asUInt64() > 1 << 20; })) << Task(id);
    EXPECT_EQ(Task(id)["total"].asUInt64(), kLarge);
    EXPECT_EQ(Post("tasks/remove", Id(id)).status, 409) << "while it runs";
    EXPECT_EQ(Post("tasks/cancel", Id(id)).status, 200);
    EXPECT_TRUE(Reaches(id, "cancelled")) << Task(id);
    EXPECT_LT(Task(id)["done"].asUInt64(), kLarge);
}

TEST_F(WebCopy, NobodyElseSeesOrStopsIt) {
    const std::string id = Start({"/large"}, "/dst");
    EXPECT_TRUE(Task(id, "-u ben:b").isNull());
    for (const char* action : {"tasks/cancel", "tasks/remove"}) {
        EXPECT_EQ(Post(action, Id(id), kBens).status, 404) << action;
        EXPECT_EQ(Post(action, Id(id), kAmyIs).status, 403) << action;
        EXPECT_EQ(Post(action, Id("../" + id)).status, 422) << action;
    }
    EXPECT_EQ(Post("copy", Plan({"/src"}, "/dst"), kBens).status, 404);
    EXPECT_EQ(Post("copy", Plan({"/src"}, "/dst"), kAmyIs).status, 403);
    EXPECT_FALSE(Task(id).isNull());
}

TEST_F(WebCopy, AKilledWorkerLeavesNoCopyThatCountsAsLiving) {
    const std::string id = Start({"/large"}, "/dst");
    ASSERT_TRUE(Eventually([&] { return Task(id)["done"].asUInt64() > 1 << 20; }));
    Must("kill -KILL $(pgrep -x zyrovfs-web)");
    ASSERT_TRUE(Reaches(id, "failed"));
    EXPECT_EQ(Task(id)["error"]["meaning"], "The program that did it was ended.");
    const std::string next = Start({"/src/deep/grüße.txt"}, "/dst");
    EXPECT_TRUE(Reaches(next, "done")) << Task(next);
    EXPECT_EQ(Post("tasks/remove", Id(id)).status, 200);
}

TEST_F(WebCopy, TheFourthWaitsForItsTurn) {
    std::vector<std::string> ids;
    for (int i = 0; i < 3; ++i) {
        Must("mkdir -p /srv/remote/dst/" + std::to_string(i) + "; chown -R remo: /srv/remote/dst");
        ids.push_back(Start({"/large"}, "/dst/" + std::to_string(i)));
        ASSERT_TRUE(Reaches(ids.back(), "running")) << Task(ids.back());
    }
    const std::string fourth = Start({"/src/deep/grüße.txt"}, "/dst");
    EXPECT_EQ(Task(fourth)["state"], "waiting");
    EXPECT_FALSE(fs::exists(kRemote + "dst/grüße.txt"));
    EXPECT_EQ(Post("tasks/cancel", Id(ids[0])).status, 200);
    EXPECT_TRUE(Reaches(fourth, "done")) << Task(fourth);
}

TEST_F(WebCopy, TakingAConnectionDownEndsItsCopies) {
    const std::string id = Start({"/large"}, "/dst");
    ASSERT_TRUE(Eventually([&] { return Task(id)["done"].asUInt64() > 1 << 20; }));
    Json::Value body;
    body["connection"] = sftp_id;
    EXPECT_EQ(Post("disconnect", body).status, 200);
    EXPECT_TRUE(Eventually([&] { return Task(id)["state"] == "cancelled"; })) << Task(id);
    EXPECT_EQ(Post("connect", body).status, 200);
}

TEST_F(WebCopy, WhatFailsIsNamedAndTheRestIsCopied) {
    Must("chmod 0 /srv/remote/src/a.bin; chown root: /srv/remote/src/a.bin");
    const std::string id = Start({"/src"}, "/dst");
    ASSERT_TRUE(Reaches(id, "failed")) << Task(id);
    EXPECT_THAT(Task(id)["error"]["meaning"].asString(), HasSubstr("src/a.bin"));
    EXPECT_EQ(Task(id)["files_done"], 2);
    EXPECT_EQ(machine::Read(kRemote + "dst/src/deep/grüße.txt"), "greetings");
}

TEST_F(WebCopy, WhatCannotBeCopiedIsRefusedAtOnce) {
    EXPECT_EQ(Post("copy", Plan({}, "/dst")).status, 400);
    EXPECT_EQ(Post("copy", Plan({"/src/../.."}, "/dst")).status, 422);
    EXPECT_EQ(Post("copy", Plan({"/src"}, "dst")).status, 422);
    Json::Value same = Plan({"/src"}, "/src/deep");
    same["to"]["connection"] = dav_id;
    EXPECT_EQ(Post("copy", same).status, 422) << "into itself";
    same["to"]["path"] = "/";
    EXPECT_EQ(Post("copy", same).status, 422) << "onto itself";
    Json::Value nowhere = Plan({"/src"}, "/dst");
    nowhere["to"]["connection"] = "sftp://nobody@nowhere";
    EXPECT_EQ(Post("copy", nowhere).status, 404);
    EXPECT_EQ(Ask(kAmyIs, Api("tasks")).Json()["tasks"].size(), 0U);
}

}  // namespace
