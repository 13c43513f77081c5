#include <gmock/gmock.h>

#include <memory>

#include "support/profiles.h"
#include "support/seams.h"
#include "zyrovfs/cloud_utils.h"

namespace ZYROCloud {
namespace {

using namespace ZYROVFS;
using namespace Utils;
using profiles::kUser;
using profiles::VFS_CONFIG_CONNECT;
using profiles::VFS_CONFIG_SERVER;

Json::Value Config(const char* id) {
    Json::Value config;
    config["server_id"] = id;
    return config;
}

TEST(CreateCloudByConfig, MakesTheDriverOfTheKind) {
    for (const _tag_cloud_type type : {CLOUD_TYPE_VFS, CLOUD_TYPE_BOX, CLOUD_TYPE_GOOGLE,
                                       CLOUD_TYPE_DROPBOX, CLOUD_TYPE_ONEDRIVE}) {
        const std::unique_ptr<Cloud> cloud(CreateCloudByConfig(type, kUser, Config("x://y")));
        ASSERT_NE(cloud, nullptr);
        EXPECT_EQ(cloud->GetCloudType(), type);
        EXPECT_EQ(cloud->GetServerID(), "x://y");
    }
}

TEST(CreateCloudByConfig, OfAnUnknownTypeLogsAndGivesNull) {
    for (const int type : {0, 9, -1, 1000}) {
        seams::Reset();
        EXPECT_EQ(CreateCloudByConfig(static_cast<_tag_cloud_type>(type), kUser, Config("x")),
                  nullptr);
        EXPECT_TRUE(seams::Logged("Unknown cloud type, uri: " + std::to_string(type)))
            << seams::LogDump();
    }
}

TEST(CreateCloudByConfig, OfShortOneDriveHubicAndS3GivesNullWithoutALogLine) {
    seams::Reset();
    for (const _tag_cloud_type type :
         {CLOUD_TYPE_ONEDRIVE_SHORT, CLOUD_TYPE_HUBIC, CLOUD_TYPE_AWSS3}) {
        EXPECT_EQ(CreateCloudByConfig(type, kUser, Config("x")), nullptr);
    }
    EXPECT_EQ(seams::LogDump(), "");
}

TEST(CreateCloudByConfig, TakesAProfileOfAnyShape) {
    for (const char* text : {"null", "7", "[1]", "\"x\"", R"({"server_id":{},"account":[]})"}) {
        Json::Value config;
        ASSERT_TRUE(json::fromString(config, text));
        for (const _tag_cloud_type type : {CLOUD_TYPE_VFS, CLOUD_TYPE_BOX, CLOUD_TYPE_ONEDRIVE}) {
            const std::unique_ptr<Cloud> cloud(CreateCloudByConfig(type, kUser, config));
            EXPECT_NE(cloud, nullptr) << text;
        }
    }
}

class CreateCloudByStore : public profiles::ProfileTest {};

TEST_F(CreateCloudByStore, AUriAsksForTheProfileInFrontOfItsPathAndAnIdForItself) {
    for (const char* uri : {"dropbox://id/Folder/file", "dropbox://id", "dropbox://id/"}) {
        seams::Reset();
        EXPECT_EQ(CreateCloudByURI(kUser, uri, VFS_CONFIG_CONNECT), nullptr);
        EXPECT_TRUE(seams::Logged("Failed to get config by serverID:dropbox://id, from mode:1"))
            << seams::LogDump();
    }
    EXPECT_EQ(CreateCloudByURI(kUser, "ftp:///x", VFS_CONFIG_SERVER), nullptr);
    EXPECT_TRUE(seams::Logged("Failed to get config by serverID:ftp://, from mode:0"))
        << seams::LogDump();
}

TEST_F(CreateCloudByStore, AUriWithoutASchemeHasNoServerId) {
    EXPECT_EQ(CreateCloudByURI(kUser, "host/share", VFS_CONFIG_CONNECT), nullptr);
    EXPECT_TRUE(seams::Logged("Failed to get serverID from host/share")) << seams::LogDump();
    EXPECT_EQ(CreateCloudByURI(kUser, "", VFS_CONFIG_CONNECT), nullptr);
}

}  // namespace
}  // namespace ZYROCloud
