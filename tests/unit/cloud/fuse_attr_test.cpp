#include "cloud/fuse_attr.h"

#include <gmock/gmock.h>

#include <cerrno>

#include "support/profiles.h"
#include "support/scripted_cloud.h"
#include "support/seams.h"
#include "support/xattrtree/xattrtree.h"

namespace ZYROCloud {
namespace {

using fuse_attr::CleanCache;
using fuse_attr::ReadDescription;
using fuse_attr::ReadFileId;
using testing::HasSubstr;
using testing::IsEmpty;

constexpr const char* kServerId = "box://amy@example.com";

class MountedCloud : public ScriptedCloud {
  public:
    MountedCloud() {
        uid = profiles::kUser;
        server_id = kServerId;
    }
};

class FuseAttr : public profiles::ProfileTest {
  protected:
    void SetUp() override {
        ProfileTest::SetUp();
        Json::Value servers;
        servers[kServerId]["protocol"] = "box";
        servers[kServerId]["path"] = tree_.Folder();
        profiles::Put(profiles::VFS_CONFIG_CONNECT, servers);
        seams::Reset();
    }

    XattrTree tree_{"/tmp/fuse_attr_tree"};
    MountedCloud cloud_;
};

TEST_F(FuseAttr, TheIdOfAnItemIsReadFromTheTree) {
    tree_.Set("/docs/a b.txt", "id::file", "files/12");
    EXPECT_EQ(ReadFileId(cloud_, "/docs/a b.txt"), "files/12");
    EXPECT_EQ(seams::LogDump(), "");
}

TEST_F(FuseAttr, TheIdEndsAtItsFirstNul) {
    tree_.Set("/a", "id::file", std::string("files/1\0rest", 12));
    EXPECT_EQ(ReadFileId(cloud_, "/a"), "files/1");
}

TEST_F(FuseAttr, AnIdOf128BytesIsTakenALongerOneIsNot) {
    tree_.Set("/a", "id::file", std::string(128, 'x'));
    EXPECT_EQ(ReadFileId(cloud_, "/a"), std::string(128, 'x'));
    tree_.Set("/a", "id::file", std::string(129, 'x'));
    EXPECT_EQ(ReadFileId(cloud_, "/a"), "");
}

TEST_F(FuseAttr, AnItemWithoutAnIdGivesNoneAndALineOnlyWhereTheServiceWantsOne) {
    EXPECT_EQ(ReadFileId(cloud_, "/missing"), "");
    EXPECT_EQ(seams::LogDump(), "");
    EXPECT_EQ(ReadFileId(cloud_, "/missing", true), "");
    EXPECT_TRUE(seams::Logged("Failed to get file id from fuse cache, " + tree_.Folder() +
                              "/missing, No such file or directory"))
        << seams::LogDump();
    EXPECT_TRUE(seams::LoggedPart("fuse_attr_test.cpp:"));
}

TEST_F(FuseAttr, AnEmptyPathGivesNoIdWithoutALook) {
    EXPECT_EQ(ReadFileId(cloud_, "", true), "");
    EXPECT_EQ(seams::LogDump(), "");
}

TEST_F(FuseAttr, ATreeThatAnswersNoAttributesGivesNoId) {
    tree_.Set("/a", "id::file", "files/1");
    tree_.Fail("id::file", EOPNOTSUPP);
    EXPECT_EQ(ReadFileId(cloud_, "/a"), "");
}

TEST_F(FuseAttr, AConnectionThatIsNotThereIsLogged) {
    profiles::Put(profiles::VFS_CONFIG_CONNECT, Json::Value(Json::objectValue));
    EXPECT_EQ(ReadFileId(cloud_, "/a"), "");
    EXPECT_TRUE(seams::Logged("Failed to get full path by [/a]")) << seams::LogDump();
}

TEST_F(FuseAttr, ADescriptionIsReadUpToTheSizeThatTheCallerTakes) {
    const std::string text(500, 'd');
    tree_.Set("/a", "standard::description", text);
    std::string out = "before";
    EXPECT_TRUE(ReadDescription(tree_.Folder() + "/a", 8192, out));
    EXPECT_EQ(out, text);
    out = "before";
    EXPECT_FALSE(ReadDescription(tree_.Folder() + "/a", 32, out));
    EXPECT_EQ(errno, ERANGE);
    EXPECT_EQ(out, "before");
}

TEST_F(FuseAttr, ACachedEntryIsDroppedByAnEmptyAttribute) {
    tree_.Add("/docs/a.txt");
    EXPECT_TRUE(CleanCache(tree_.Folder() + "/docs/a.txt"));
    const auto writes = tree_.Writes();
    ASSERT_EQ(writes.size(), 1U);
    EXPECT_EQ(writes[0].path, "/docs/a.txt");
    EXPECT_EQ(writes[0].name, "zyro::cacheclean");
    EXPECT_EQ(writes[0].value, "");
    tree_.Fail("zyro::cacheclean", EACCES);
    EXPECT_FALSE(CleanCache(tree_.Folder() + "/docs/a.txt"));
    EXPECT_EQ(errno, EACCES);
    EXPECT_FALSE(CleanCache(""));
}

}  // namespace
}  // namespace ZYROCloud
