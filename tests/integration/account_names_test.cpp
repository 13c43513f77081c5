// Accounts whose names hold what ends other parts of a URI, from the connection to its end, with a
// real server and the real chain.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>

#include "support/vfs_cloud_remote.h"

namespace {

using namespace remote_side;
namespace fs = std::filesystem;

class AccountName : public testing::TestWithParam<const char*> {
  protected:
    static void SetUpTestSuite() {
        setenv("ZYROVFS_UID", "4001", 1);
        machine::AddUser("amy", kAmy);
        machine::Remote(std::string("start ") + kPassword);
        Cloud::InitCurlGlobal();
    }
    static void TearDownTestSuite() { Cloud::CleanupCurlGlobal(); }
};

TEST_P(AccountName, ConnectsTransfersAndIsForgotten) {
    const std::string account = GetParam();
    std::ofstream("/run/remote/config/dav.users") << account << ":" << kPassword << "\n";
    PutFile(kRemote + "told.txt", "told");
    const std::string id = Connect(kDav, account);
    EXPECT_EQ(id, "dav://" + account + "@127.0.0.1:8080");
    Json::Value record;
    ASSERT_TRUE(Server::CfgGetByID(kAmy, Server::VFS_CONFIG_CONNECT, id.c_str(), record));
    EXPECT_EQ(machine::Read(record["path"].asString() + "/told.txt"), "told");

    std::string path;
    EXPECT_TRUE(Utils::GetFullPathByConfig((id + "/told.txt").c_str(), path));
    EXPECT_EQ(path, record["path"].asString() + "/told.txt");
    const std::unique_ptr<Cloud> cloud(
        ZYROCloud::Utils::CreateCloudByURI(kAmy, id + "/dir@x/any", Server::VFS_CONFIG_CONNECT));
    ASSERT_NE(cloud, nullptr);
    const LocalFile file("from amy");
    EXPECT_TRUE(
        Cloud::UploadFile(cloud.get(), id + "/new.txt", file.Fd(), 8, nullptr, nullptr, nullptr))
        << cloud->GetError().toStyledString();
    EXPECT_EQ(machine::Read(kRemote + "new.txt"), "from amy");

    const machine::Outcome told =
        machine::Run(BuildDir() + "/tools/zyrovfs/zyrovfs cat '" + id + "/told.txt' --user amy");
    EXPECT_EQ(told.output, "told") << told.status;

    EXPECT_TRUE(Server::Delete(kAmy, Server::VFS_CONFIG_CONNECT, id.c_str()))
        << GetErrorName(GetError());
    EXPECT_TRUE(
        machine::Eventually([&] { return !fs::exists(record["path"].asString() + "/told.txt"); }));
}

INSTANTIATE_TEST_SUITE_P(Names, AccountName,
                         testing::Values("remo", "re@mo", "re/mo", "re?mo", "re#mo"));

}  // namespace
