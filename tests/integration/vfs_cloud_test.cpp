// Contents of files to and from real servers of standard protocols, past the mounted tree, through
// the shipped library: what arrives is compared byte for byte.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <filesystem>
#include <memory>

#include "support/vfs_cloud_remote.h"
#include "support/xattrtree/xattrtree.h"

namespace {

using namespace remote_side;
using machine::Must;
using testing::HasSubstr;
using testing::Not;
namespace fs = std::filesystem;

constexpr const char* kFtpLog = "/run/remote/ftp-dialogue.log";

class RemoteSide : public testing::Environment {
    void SetUp() override {
        setenv("ZYROVFS_UID", "4001", 1);
        machine::AddUser("amy", kAmy);
        machine::Remote(std::string("start ") + kPassword);
        Must(std::string("printf 'log_ftp_protocol=YES\\nxferlog_enable=YES\\n"
                         "xferlog_std_format=NO\\nvsftpd_log_file=") +
             kFtpLog + "\\n' >>/run/remote/config/vsftpd.conf");
        machine::Remote("restart ftp");
        Cloud::InitCurlGlobal();
    }
    void TearDown() override { Cloud::CleanupCurlGlobal(); }
};

const auto* const kRemoteSide = testing::AddGlobalTestEnvironment(new RemoteSide);

/** Members of the live connection's record, as somebody with an editor would change them. */
void Change(const std::string& id, const Json::Value& members) {
    Json::Value record;
    ASSERT_TRUE(Server::CfgGetByID(kAmy, Server::VFS_CONFIG_CONNECT, id.c_str(), record));
    for (const std::string& name : members.getMemberNames()) {
        record[name] = members[name];
    }
    std::string same = id;
    ASSERT_TRUE(Server::CfgSetByID(kAmy, Server::VFS_CONFIG_CONNECT, id, same, record));
}

class VfsCloud : public ConnectionTest {};

TEST_P(VfsCloud, WholeFilesArriveAsTheyWere) {
    for (const size_t size : {0, 1, 23, 16384, 3 * 1024 * 1024 + 7}) {
        const std::string bytes = Noise(size);
        ASSERT_TRUE(Upload("from amy.bin", bytes)) << size << Cause();
        EXPECT_TRUE(machine::Read(kRemote + "from amy.bin") == bytes) << size;
        ASSERT_TRUE(Download("from amy.bin", static_cast<long long>(size))) << size << Cause();
        EXPECT_TRUE(LocalFile::Bytes() == bytes) << size;
    }
    fs::remove(kRemote + "from amy.bin");
}

TEST_P(VfsCloud, AShorterFileReplacesALongerOne) {
    ASSERT_TRUE(Upload("again.bin", Noise(100000))) << Cause();
    ASSERT_TRUE(Upload("again.bin", "short")) << Cause();
    EXPECT_EQ(machine::Read(kRemote + "again.bin"), "short");
    fs::remove(kRemote + "again.bin");
}

TEST_P(VfsCloud, NamesKeepTheirCharacters) {
    for (const std::string name :
         {"two words.txt", "gr\xc3\xbcn und wei\xc3\x9f.txt", "50% #1.txt", "ends%20in%41.txt",
          "what?.txt", "a+b&c=d.txt", "it's \"quoted\".txt", "semi;type=a.txt"}) {
        ASSERT_TRUE(Upload(name, "of " + name)) << name << Cause();
        EXPECT_EQ(machine::Read(kRemote + name), "of " + name) << name;
        ASSERT_TRUE(Download(name, 3 + static_cast<long long>(name.size()))) << name << Cause();
        EXPECT_EQ(LocalFile::Bytes(), "of " + name) << name;
        fs::remove(kRemote + name);
    }
}

TEST_P(VfsCloud, FilesBelowFoldersAreReached) {
    const std::string folder = "docs/two words/gr\xc3\xbcn #1";
    fs::create_directories(kRemote + folder);
    Must("chown -R remo: /srv/remote/docs");
    ASSERT_TRUE(Upload(folder + "/file.txt", "deep down")) << Cause();
    EXPECT_EQ(machine::Read(kRemote + folder + "/file.txt"), "deep down");
    ASSERT_TRUE(Download(folder + "/file.txt", 9)) << Cause();
    EXPECT_EQ(LocalFile::Bytes(), "deep down");
}

TEST_P(VfsCloud, RangesGiveTheBytesAskedFor) {
    const std::string bytes = Noise(300000);
    PutFile(kRemote + "range.bin", bytes);
    Json::Value meta;
    ASSERT_TRUE(cloud_->GetMetaDataByURI(id_ + "/range.bin", meta, "Download"));
    const struct {
        size_t from;
        size_t length;
    } ranges[] = {{0, 1}, {0, 1000}, {1, 22}, {65535, 131072}, {299000, 999}, {0, 299999}};
    for (const auto& range : ranges) {
        std::string buffer(range.length + 1, 'x');
        long long got = 0;
        ASSERT_TRUE(Cloud::DownloadFileToBuffer(
            cloud_.get(), meta["url"].asString(), buffer.data(), static_cast<long long>(range.from),
            static_cast<long long>(range.length), &got, nullptr, nullptr, nullptr))
            << range.from << Cause();
        EXPECT_GE(static_cast<size_t>(got), range.length);
        EXPECT_TRUE(buffer.compare(0, range.length, bytes, range.from, range.length) == 0)
            << range.from;
    }
    fs::remove(kRemote + "range.bin");
}

TEST_P(VfsCloud, AFileThatIsNotThereIsNotFound) {
    EXPECT_FALSE(Download("no such file", 10));
    EXPECT_EQ(cloud_->GetErrorCode(), VFS_ERR_NOT_FOUND) << Cause();
    EXPECT_EQ(LocalFile::Bytes(), "");
}

TEST_P(VfsCloud, AWrongPasswordIsToldAndMovesNothing) {
    PutFile(kRemote + "kept.txt", "kept");
    Must("chown remo: /srv/remote/kept.txt");
    machine::Remote("password other-secret");
    EXPECT_FALSE(Download("kept.txt", 4));
    EXPECT_EQ(cloud_->GetErrorCode(), GetParam().wrong_password) << Cause();
    EXPECT_EQ(LocalFile::Bytes(), "");
    EXPECT_FALSE(Upload("kept.txt", "changed"));
    EXPECT_EQ(cloud_->GetErrorCode(), GetParam().wrong_password) << Cause();
    EXPECT_EQ(machine::Read(kRemote + "kept.txt"), "kept");
}

TEST_P(VfsCloud, ACopyGoesThroughMemoryToAnotherServer) {
    const std::string bytes = Noise(700000, 2);
    PutFile(kRemote + "copy me.bin", bytes);
    // The target's file stands in a folder of its own: all servers show the same folder.
    Must("mkdir /srv/remote/new && chown remo: /srv/remote/new");
    const std::unique_ptr<Cloud> target(
        ZYROCloud::Utils::CreateCloudByURI(kAmy, id_, Server::VFS_CONFIG_CONNECT));
    ASSERT_TRUE(Cloud::CopyFile(cloud_.get(), target.get(), id_ + "/copy me.bin",
                                id_ + "/new/copy of it.bin", static_cast<long long>(bytes.size()),
                                nullptr, nullptr, nullptr))
        << Cause() << target->GetError().toStyledString();
    EXPECT_TRUE(machine::Read(kRemote + "new/copy of it.bin") == bytes);
}

INSTANTIATE_TEST_SUITE_P(Protocols, VfsCloud, testing::Values(kFtp, kDav, kDavs, kSftp),
                         [](const auto& param) { return std::string(param.param.protocol); });

/** The ways of ftp. */
class FtpCloud : public VfsCloud {
  protected:
    void SetUp() override {
        VfsCloud::SetUp();
        Must(std::string(": >") + kFtpLog);
    }
    void TearDown() override {
        Must("sed -i /pasv_enable/d /run/remote/config/vsftpd.conf");
        machine::Remote("restart ftp");
        VfsCloud::TearDown();
    }
    static std::string Dialogue() { return machine::Read(kFtpLog); }
    void UpAndDown() {
        const std::string bytes = Noise(200000, 3);
        ASSERT_TRUE(Upload("ways.bin", bytes)) << Cause();
        EXPECT_TRUE(machine::Read(kRemote + "ways.bin") == bytes);
        ASSERT_TRUE(Download("ways.bin", 200000)) << Cause();
        EXPECT_TRUE(LocalFile::Bytes() == bytes);
        fs::remove(kRemote + "ways.bin");
    }
};

TEST_P(FtpCloud, Utf8IsTurnedOnAndExtendedPassiveModeUsedByItself) {
    UpAndDown();
    EXPECT_THAT(Dialogue(), HasSubstr("\"OPTS UTF8 ON\""));
    EXPECT_THAT(Dialogue(), HasSubstr("\"EPSV\""));
    EXPECT_THAT(Dialogue(), Not(HasSubstr("\"PASV\"")));
}

TEST_P(FtpCloud, AMountThatKnowsBetterTurnsExtendedPassiveModeOff) {
    XattrTree tree("/tmp/ftp_tree");
    tree.Set("/", "standard::description", "2");
    Json::Value members;
    members["path"] = tree.Folder();
    ASSERT_NO_FATAL_FAILURE(Change(id_, members));
    UpAndDown();
    EXPECT_THAT(Dialogue(), HasSubstr("\"PASV\""));
    EXPECT_THAT(Dialogue(), Not(HasSubstr("\"EPSV\"")));
}

TEST_P(FtpCloud, AServerWithoutPassiveModeIsReachedInActiveMode) {
    Must("echo pasv_enable=NO >>/run/remote/config/vsftpd.conf");
    machine::Remote("restart ftp");
    UpAndDown();
    EXPECT_THAT(Dialogue(), HasSubstr("\"EPRT |1|127.0.0.1|"));
}

TEST_P(FtpCloud, AnotherCodePageNamesTheFolderInTheServersBytesAndTurnsNoUtf8On) {
    const std::string folder = kRemote + "gr\xfc\xdf";
    fs::create_directories(folder);
    Must("chown remo: '" + folder + "'");
    Json::Value members;
    members["codepage"] = "ISO-8859-1";
    members["uri_path"] = "gr\xc3\xbc\xc3\x9f";
    ASSERT_NO_FATAL_FAILURE(Change(id_, members));
    ASSERT_NO_FATAL_FAILURE(Open());
    const std::string bytes = Noise(5000, 4);
    ASSERT_TRUE(Upload("two words.bin", bytes)) << Cause();
    EXPECT_TRUE(machine::Read(folder + "/two words.bin") == bytes);
    ASSERT_TRUE(Download("two words.bin", 5000)) << Cause();
    EXPECT_TRUE(LocalFile::Bytes() == bytes);
    EXPECT_THAT(Dialogue(), Not(HasSubstr("OPTS UTF8")));
}

TEST_P(FtpCloud, AReadOnlyFolderRefusesAnUpload) {
    Must("mkdir -p /srv/remote/locked && chown root: /srv/remote/locked");
    EXPECT_FALSE(Upload("locked/file.txt", "x"));
    EXPECT_EQ(cloud_->GetErrorCode(), VFS_ERR_PERMISSION_DENIED) << Cause();
    EXPECT_FALSE(fs::exists(kRemote + "locked/file.txt"));
}

INSTANTIATE_TEST_SUITE_P(Servers, FtpCloud, testing::Values(kFtp),
                         [](const auto& param) { return std::string(param.param.protocol); });

}  // namespace
