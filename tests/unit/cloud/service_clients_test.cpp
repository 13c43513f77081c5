#include <gmock/gmock.h>
#include <sys/mount.h>
#include <sys/stat.h>

#include <thread>

#include "cloud/service_config.h"
#include "core/json.h"
#include "core/paths.h"
#include "support/profiles.h"
#include "support/scratch.h"
#include "support/seams.h"
#include "zyrovfs/cloud_utils.h"

namespace ZYROCloud {
namespace {

using namespace ZYROVFS;
using testing::HasSubstr;
using testing::Not;
namespace fs = std::filesystem;

class ServiceClients : public testing::Test {
  protected:
    void SetUp() override {
        fs::remove(paths::kServiceConfig);
        seams::Reset();
        ResetError();
    }
    void TearDown() override { EXPECT_FALSE(seams::LoggedPart("s3cret")) << seams::LogDump(); }

    static void Put(const std::string& text) {
        profiles::PutText(paths::kServiceConfig, text);
        chmod(paths::kServiceConfig, 0640);
    }
    static std::string Text() { return profiles::Text(paths::kServiceConfig); }
    static Json::Value Document() {
        Json::Value document;
        EXPECT_TRUE(json::fromFile(document, paths::kServiceConfig));
        return document;
    }
    static std::string Listed() {
        Json::Value list;
        EXPECT_TRUE(Utils::ListClients(list));
        return json::toString(list);
    }
    /** The plain secret of a client. */
    static std::string Secret(const std::string& service, const std::string& id) {
        std::string enciphered;
        char plain[1024] = "";
        EXPECT_TRUE(FindClientSecret(service, id, enciphered));
        EXPECT_EQ(Utils::Decrypt(enciphered.data(), plain, sizeof plain), 1) << seams::LogDump();
        return plain;
    }
};

TEST_F(ServiceClients, AreAddedEncipheredListedAndRemoved) {
    EXPECT_EQ(Listed(), "{}");
    ASSERT_TRUE(Utils::AddClient("box", "b-id", "s3cret one"));
    ASSERT_TRUE(Utils::AddClient("box", "a-id", "s3cret two"));
    ASSERT_TRUE(Utils::AddClient("onedrive", "c-id", "s3cret three"));
    EXPECT_EQ(Listed(), R"({"box":["a-id","b-id"],"onedrive":["c-id"]})");
    EXPECT_THAT(Text(), Not(HasSubstr("s3cret")));
    EXPECT_EQ(Secret("box", "b-id"), "s3cret one");
    EXPECT_EQ(Secret("box", "a-id"), "s3cret two");
    EXPECT_EQ(Secret("onedrive", "c-id"), "s3cret three");
    EXPECT_TRUE(Utils::RemoveClient("box", "b-id"));
    EXPECT_TRUE(Utils::RemoveClient("onedrive", "c-id"));
    EXPECT_EQ(Listed(), R"({"box":["a-id"]})");
    EXPECT_EQ(Secret("box", "a-id"), "s3cret two");
}

TEST_F(ServiceClients, TheDocumentIsForRootToWriteAndForUsersBackendsToRead) {
    ASSERT_TRUE(Utils::AddClient("box", "id", "s3cret"));
    struct stat info {};
    ASSERT_EQ(stat(paths::kServiceConfig, &info), 0);
    EXPECT_EQ(info.st_mode & 07777, 0640U);
    EXPECT_EQ(info.st_uid, 0U);
    EXPECT_EQ(info.st_gid, 100U);
    EXPECT_EQ(scratch::InChild([] {
                  return scratch::BecomeUser(1234) && Secret("box", "id") == "s3cret" ? 0 : 1;
              }),
              0);
}

TEST_F(ServiceClients, AddingAKnownIdReplacesItsSecretAndKeepsTheKey) {
    ASSERT_TRUE(Utils::AddClient("box", "id", "s3cret one"));
    const Json::Value before = Document();
    ASSERT_TRUE(Utils::AddClient("box", "id", "s3cret two"));
    EXPECT_EQ(Secret("box", "id"), "s3cret two");
    EXPECT_EQ(Document()["key"], before["key"]);
    EXPECT_EQ(Listed(), R"({"box":["id"]})");
}

TEST_F(ServiceClients, TheSameSecretHasAnotherTextEachTime) {
    ASSERT_TRUE(Utils::AddClient("box", "one", "s3cret"));
    ASSERT_TRUE(Utils::AddClient("box", "two", "s3cret"));
    EXPECT_NE(Document()["clients"]["box"]["one"], Document()["clients"]["box"]["two"]);
}

TEST_F(ServiceClients, RemovingWhatIsNotThereIsASuccessThatWritesNothing) {
    EXPECT_TRUE(Utils::RemoveClient("box", "id"));
    EXPECT_FALSE(fs::exists(paths::kServiceConfig));
    Put(R"({"clients" : {"google":{"a":"b"}}} )");
    EXPECT_TRUE(Utils::RemoveClient("box", "id"));
    EXPECT_TRUE(Utils::RemoveClient("google", "id"));
    EXPECT_EQ(Text(), R"({"clients" : {"google":{"a":"b"}}} )");
}

TEST_F(ServiceClients, MembersThatNobodyKnowsStayInTheDocument) {
    Put(R"({"hosts":{"BoxApiHost":"http://x","Other":[1]},"new":{"a":null},)"
        R"("clients":{"box":{"old":"text"},"future":{"x":3}}})");
    ASSERT_TRUE(Utils::AddClient("google", "id", "s3cret"));
    ASSERT_TRUE(Utils::RemoveClient("google", "id"));
    Json::Value document = Document();
    document.removeMember("key");
    EXPECT_EQ(json::toString(document),
              R"({"clients":{"box":{"old":"text"},"future":{"x":3}},)"
              R"("hosts":{"BoxApiHost":"http://x","Other":[1]},"new":{"a":null}})");
    EXPECT_EQ(Listed(), R"({"box":["old"],"future":["x"]})");
}

TEST_F(ServiceClients, BadParametersAreRefused) {
    const std::string nul("a\0b", 3);
    EXPECT_FALSE(Utils::AddClient("hubic", "id", "s3cret"));
    EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM);
    EXPECT_FALSE(Utils::AddClient("box", "", "s3cret"));
    EXPECT_FALSE(Utils::AddClient("box", "id", ""));
    EXPECT_FALSE(Utils::AddClient("box", nul, "s3cret"));
    EXPECT_FALSE(Utils::AddClient("box", "id", nul));
    EXPECT_FALSE(Utils::AddClient("", "id", "s3cret"));
    EXPECT_FALSE(Utils::RemoveClient("Box", "id"));
    EXPECT_FALSE(Utils::RemoveClient("box", ""));
    EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM);
    EXPECT_FALSE(fs::exists(paths::kServiceConfig));
}

TEST_F(ServiceClients, ASecretThatItsReadersCouldNotTakeIsRefused) {
    EXPECT_FALSE(Utils::AddClient("box", "id", std::string(481, 'x')));
    EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM);
    EXPECT_FALSE(fs::exists(paths::kServiceConfig));
    EXPECT_TRUE(Utils::AddClient("box", "id", std::string(480, 'x')));
    EXPECT_EQ(Secret("box", "id"), std::string(480, 'x'));
}

TEST_F(ServiceClients, ADocumentThatIsNotTrustedOrNotUnderstoodIsLeftAlone) {
    for (const char* wrong :
         {"{", "[]", R"({"clients":[]})", R"({"clients":{"box":7}})", R"({"clients":"x"})"}) {
        Put(wrong);
        ResetError();
        EXPECT_FALSE(Utils::AddClient("box", "id", "s3cret")) << wrong;
        EXPECT_EQ(GetError(), VFS_ERR_CONFIG_READ) << wrong;
        EXPECT_FALSE(Utils::RemoveClient("box", "id")) << wrong;
        EXPECT_EQ(Text(), wrong);
    }
    Put("{}");
    chmod(paths::kServiceConfig, 0666);
    EXPECT_FALSE(Utils::AddClient("box", "id", "s3cret"));
    Json::Value list;
    EXPECT_FALSE(Utils::ListClients(list));
    EXPECT_EQ(GetError(), VFS_ERR_CONFIG_READ);
    EXPECT_EQ(Text(), "{}");
}

TEST_F(ServiceClients, AKeyOfAnotherMachineStaysAndNothingIsAdded) {
    ASSERT_TRUE(Utils::AddClient("box", "id", "s3cret"));
    Json::Value document = Document();
    document["key"] = "$1$AAAA";
    Put(json::toString(document));
    const std::string before = Text();
    EXPECT_FALSE(Utils::AddClient("box", "other", "s3cret"));
    EXPECT_EQ(GetError(), VFS_ERR_CONFIG_READ);
    EXPECT_EQ(Text(), before);
    EXPECT_TRUE(seams::LoggedPart("it was not made on this machine")) << seams::LogDump();
    EXPECT_TRUE(Utils::RemoveClient("box", "id"));
}

TEST_F(ServiceClients, AFullDiskKeepsTheOldDocument) {
    ASSERT_TRUE(Utils::AddClient("box", "id", "s3cret"));
    const std::string before = Text();
    ASSERT_EQ(mount("tmpfs", paths::kConfigRoot, "tmpfs", 0, "size=4k"), 0);
    Put(before);
    profiles::PutText(std::string(paths::kServiceConfig) + ".lock", "");
    EXPECT_FALSE(Utils::AddClient("box", "other", std::string(400, 'x')));
    EXPECT_EQ(GetError(), VFS_ERR_CONFIG_WRITE);
    EXPECT_EQ(Text(), before);
    umount(paths::kConfigRoot);
}

TEST_F(ServiceClients, AUserMayNotAddAny) {
    EXPECT_EQ(scratch::InChild([] {
                  return scratch::BecomeUser(1234) && !Utils::AddClient("box", "id", "s3cret")
                             ? int{GetError()}
                             : 0;
              }),
              VFS_ERR_CONFIG_WRITE);
}

TEST_F(ServiceClients, ProgramsThatAddAtTheSameTimeLoseNothing) {
    std::vector<pid_t> programs;
    for (int i = 0; i < 8; ++i) {
        programs.push_back(scratch::Start(
            [i] { return Utils::AddClient("box", "id" + std::to_string(i), "s3cret") ? 0 : 1; }));
    }
    for (const pid_t program : programs) {
        EXPECT_EQ(scratch::End(program), 0);
    }
    for (int i = 0; i < 8; ++i) {
        EXPECT_EQ(Secret("box", "id" + std::to_string(i)), "s3cret");
    }
}

}  // namespace
}  // namespace ZYROCloud
