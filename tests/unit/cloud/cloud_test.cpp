#include "zyrovfs/cloud.h"

#include <gtest/gtest.h>

#include <filesystem>

#include "core/json.h"
#include "support/bare_driver.h"
#include "support/profiles.h"
#include "support/scratch.h"
#include "support/seams.h"

namespace ZYROCloud {

using namespace ZYROVFS;  // NOLINT(google-build-using-namespace)
using bare::PlainDriver;

constexpr const char* kId = "box://amy@example.com";

TEST(CloudPaths, ASharePathIsTheServerIdAndTheServerPathWithNothingBetween) {
    PlainDriver cloud(7, kId);
    EXPECT_EQ("box://amy@example.com/a/b", cloud.GetSharePathByServerPath("/a/b"));
    EXPECT_EQ("box://amy@example.coma", cloud.GetSharePathByServerPath("a"));
    EXPECT_EQ(kId, cloud.GetServerID());
}

TEST(CloudPaths, AUriWithoutTheServerIdHasNoServerPath) {
    PlainDriver cloud(7, kId);
    EXPECT_EQ("", cloud.GetServerPathBySharePath("box://bob@example.com/a"));
    EXPECT_EQ("", cloud.GetServerPathBySharePath(""));
    EXPECT_EQ("/a", cloud.GetServerPathBySharePath("box://amy@example.com/a"));
}

TEST(CloudPaths, TheFirstOccurrenceOfTheServerIdCounts) {
    PlainDriver cloud(7, "b");
    EXPECT_EQ("ox://b/a", cloud.GetServerPathBySharePath("box://b/a"));
}

TEST(CloudPaths, WithoutAServerIdTheWholeUriIsThePath) {
    PlainDriver cloud;
    EXPECT_EQ("/a", cloud.GetServerPathBySharePath("/a"));
}

TEST(CloudSkip, DesktopFilesWhateverTheirCase) {
    PlainDriver cloud;
    for (const char* path : {"desktop.ini", "/a/Desktop.INI", "/a/THUMBS.DB", "thumbs.db",
                             "/.DS_Store", "/x/Icon\r"}) {
        EXPECT_TRUE(cloud.IsSkipMVCPFile(path)) << path;
    }
    for (const char* path : {"", "/", "/thumbs.db/a", "icon", "thumbs.dbx", ".dropbox", "a.ini"}) {
        EXPECT_FALSE(cloud.IsSkipMVCPFile(path)) << path;
    }
}

TEST(CloudHidden, ANameOf256BytesIsHiddenOneOf255IsNot) {
    EXPECT_TRUE(Cloud::IsHiddenFilePath("", std::string(256, 'a')));
    EXPECT_FALSE(Cloud::IsHiddenFilePath("", std::string(255, 'a')));
}

TEST(CloudHidden, APathOf4097BytesIsHiddenOneOf4096IsNot) {
    EXPECT_TRUE(Cloud::IsHiddenFilePath(std::string(4097, 'a'), "a"));
    EXPECT_FALSE(Cloud::IsHiddenFilePath(std::string(4096, 'a'), "a"));
}

TEST(CloudHidden, NamesOfTheBoxQuotesAndSlashes) {
    for (const char* name : {"@ZyroEA", "a@ZyroEAStream", "a@ZyroResource", "\"", "'",
                             ".ZyrotechWorkingDirectory", "a/b", "/"}) {
        EXPECT_TRUE(Cloud::IsHiddenFilePath("/x", name)) << name;
    }
}

TEST(CloudHidden, TheWorkingDirectoryInLowerCaseIsNotHidden) {
    EXPECT_FALSE(Cloud::IsHiddenFilePath("", ".zyrotechworkingdirectory"));
    EXPECT_FALSE(Cloud::IsHiddenFilePath("", "\"a\""));
}

TEST(CloudHidden, AnEmptyNameWithAnEmptyPathIsNotHidden) {
    EXPECT_FALSE(Cloud::IsHiddenFilePath("", ""));
}

TEST(CloudError, ANewDriverHasNone) {
    PlainDriver cloud;
    EXPECT_EQ(VFS_ERR_NONE, cloud.GetErrorCode());
    EXPECT_TRUE(cloud.GetError().isObject());
    EXPECT_TRUE(cloud.GetError().empty());
}

TEST(CloudError, CodeAndMessageAreWrittenBesideWhatIsThere) {
    PlainDriver cloud;
    Json::Value record;
    record["response_code"] = 404;
    record["code"] = static_cast<int>(VFS_ERR_NOT_FOUND);
    cloud.SetError(record);
    cloud.SetError(VFS_ERR_CANCELLED, "why");
    EXPECT_EQ(VFS_ERR_CANCELLED, cloud.GetErrorCode());
    EXPECT_EQ("{\"code\":33,\"msg\":\"why\",\"response_code\":404}",
              json::toString(cloud.GetError()));
}

TEST(CloudError, AWholeRecordReplacesTheOldOne) {
    PlainDriver cloud;
    cloud.SetError(VFS_ERR_CANCELLED, "why");
    cloud.SetError(Json::Value(Json::objectValue));
    EXPECT_EQ(VFS_ERR_NONE, cloud.GetErrorCode());
    EXPECT_FALSE(cloud.GetError().isMember("msg"));
}

TEST(CloudError, RecordsOfTheWrongShapeHaveNoCode) {
    PlainDriver cloud;
    Json::Value text_code, huge;
    text_code["code"] = "33";
    huge["code"] = Json::UInt64(1) << 40;
    for (const Json::Value& record :
         {Json::Value(), Json::Value("text"), Json::Value(Json::arrayValue), text_code, huge}) {
        cloud.SetError(record);
        EXPECT_EQ(VFS_ERR_NONE, cloud.GetErrorCode()) << record;
        cloud.SetError(VFS_ERR_TIMEOUT, "");
        EXPECT_EQ(VFS_ERR_TIMEOUT, cloud.GetErrorCode()) << record;
    }
}

TEST(CloudDefaults, MetadataIsTheUrl) {
    PlainDriver cloud;
    Json::Value meta;
    meta["kept"] = 1;
    EXPECT_TRUE(cloud.GetMetaDataByURI("box://x/a", meta, "Upload"));
    EXPECT_EQ("{\"kept\":1,\"url\":\"box://x/a\"}", json::toString(meta));
}

TEST(CloudDefaults, MetadataThatIsNoObjectFails) {
    PlainDriver cloud;
    Json::Value meta = "text";
    EXPECT_FALSE(cloud.GetMetaDataByURI("box://x/a", meta, "Upload"));
    EXPECT_EQ(VFS_ERR_CLOUD_FAILED, cloud.GetErrorCode());
}

TEST(CloudDefaults, EverySizeCanBeUploaded) {
    PlainDriver cloud;
    EXPECT_TRUE(cloud.CanFileUpload(0));
    EXPECT_TRUE(cloud.CanFileUpload(~0ULL));
}

TEST(CloudRetry, AsksTheHandler) {
    PlainDriver cloud;
    ASSERT_TRUE(cloud.Init());
    EXPECT_FALSE(cloud.IsNeedRetry());
    EXPECT_EQ(3U, cloud.GetRetrySleepTime());
}

class CloudSize : public profiles::ProfileTest {
  protected:
    void SetUp() override {
        ProfileTest::SetUp();
        std::string name = "/tmp/cloud_size.XXXXXX";
        tree_ = mkdtemp(name.data());
        Json::Value servers;
        servers[kId]["protocol"] = "box";
        servers[kId]["path"] = tree_;
        profiles::Put(profiles::VFS_CONFIG_CONNECT, servers);
    }
    void TearDown() override { std::filesystem::remove_all(tree_); }

    std::string tree_;
    PlainDriver cloud_{profiles::kUser, kId};
};

TEST_F(CloudSize, IsThatOfTheMountedFile) {
    scratch::PutText(tree_ + "/a", "12345");
    long long size = -1;
    EXPECT_TRUE(cloud_.GetFileSize(std::string(kId) + "/a", &size)) << seams::LogDump();
    EXPECT_EQ(5, size);
    std::string path;
    EXPECT_TRUE(cloud_.GetFullPathByServerPath("/a", path));
    EXPECT_EQ(tree_ + "/a", path);
}

TEST_F(CloudSize, OfAMissingFileFailsAndLeavesTheNumber) {
    long long size = 7;
    EXPECT_FALSE(cloud_.GetFileSize(std::string(kId) + "/gone", &size));
    EXPECT_EQ(7, size);
    EXPECT_TRUE(seams::Logged("Failed to stat " + tree_ + "/gone, No such file or directory"))
        << seams::LogDump();
}

TEST_F(CloudSize, OfAPathThatIsNotMountedFails) {
    long long size = 7;
    EXPECT_FALSE(cloud_.GetFileSize("", &size));
    EXPECT_TRUE(seams::Logged("Failed to get full path from ")) << seams::LogDump();
    EXPECT_FALSE(cloud_.GetFileSize(kId, nullptr));
}

}  // namespace ZYROCloud
