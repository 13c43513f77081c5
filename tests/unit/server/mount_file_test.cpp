// Files of the catalogue in every state, through the operations that read them.
#include "support/catalogue_test.h"

namespace ZYROVFS::Protocol {
namespace {

using catalogue::Put;

class MountFileTest : public catalogue::CatalogueTest {
  protected:
    static void PutNamed(const std::string& protocol, const std::string& name) {
        Put(protocol + ".mount", "[Mount]\nProtocol=" + protocol + "\nName=" + name + "\n");
    }

    Json::Value out_;
};

TEST_F(MountFileTest, EnableCurlStaysTextWhateverItSays) {
    Put("a.mount", "[Mount]\nEnableCurl=perhaps 1\n");
    ASSERT_TRUE(GetProtocol("a", out_));
    EXPECT_EQ(out_["enable_curl"], "perhaps 1");
}

TEST_F(MountFileTest, TextsThatAreNoMountFileGiveEmptyTexts) {
    for (const auto& [name, text] : catalogue::DamagedTexts()) {
        SCOPED_TRACE(name);
        Put("x.mount", text);
        EXPECT_TRUE(GetProtocol("x", out_));
        EXPECT_EQ(out_["protocol"], "");
        EXPECT_EQ(out_["enable_curl"], "false");
    }
}

TEST_F(MountFileTest, ValueThatIsNotUtf8ComesAsItIs) {
    Put("x.mount", "[Mount]\nName=\xff\xfe\n");
    ASSERT_TRUE(GetProtocol("x", out_));
    EXPECT_EQ(out_["name"].asString(), "\xff\xfe");
}

TEST_F(MountFileTest, DirectoryOrFifoInTheFilesPlaceFailsWithoutWaiting) {
    std::filesystem::create_directory(catalogue::Path("dir.mount"));
    ASSERT_EQ(mkfifo(catalogue::Path("fifo.mount").c_str(), 0666), 0);
    for (const char* protocol : {"dir", "fifo"}) {
        ResetError();
        EXPECT_FALSE(GetProtocol(protocol, out_)) << protocol;
        EXPECT_EQ(GetError(), VFS_ERR_FAILED);
    }
}

TEST_F(MountFileTest, FileThatMayNotBeReadFails) {
    Put("x.mount", "[Mount]\nName=x\n");
    ASSERT_EQ(chmod(catalogue::Path("x.mount").c_str(), 0600), 0);
    catalogue::AsUser([&] { EXPECT_FALSE(GetProtocol("x", out_)); });
    EXPECT_EQ(GetError(), VFS_ERR_FAILED);
}

TEST_F(MountFileTest, SuccessLeavesTheCellAlone) {
    Put("ftp.mount", "[Mount]\nProtocol=ftp\n");
    VFSSetErrEx(VFS_ERR_BUSY, "x", 1);
    EXPECT_TRUE(GetProtocol("ftp", out_));
    EXPECT_EQ(GetError(), VFS_ERR_BUSY);
}

TEST_F(MountFileTest, DefaultPortIsTheDecimalNumberThatItsTextBeginsWith) {
    for (const auto& [text, port] :
         {std::pair("0x16", 0U), std::pair("21 or so", 21U), std::pair("none", 0U),
          std::pair("", 0U), std::pair("-1", 4294967295U), std::pair("010", 10U)}) {
        Put("x.mount", std::string("[Mount]\nDefaultPort=") + text + "\n");
        ASSERT_TRUE(ListProtocol(out_)) << text;
        EXPECT_EQ(out_[0]["default_port"].asUInt(), port) << text;
    }
}

TEST_F(MountFileTest, KeysOfOneFileDoNotReachTheNext) {
    Put("a.mount", "[Mount]\nProtocol=a\nName=A\nActions=list\nDefaultPort=7\n");
    Put("b.mount", "[Mount]\nProtocol=b\n");
    ASSERT_TRUE(ListProtocol(out_));
    EXPECT_EQ(out_[0]["protocol"], "b");  // its name is empty
    EXPECT_EQ(out_[0]["api"], "");
    EXPECT_EQ(out_[0]["default_port"].asUInt(), 80U);
}

TEST_F(MountFileTest, FilesThatCannotBeOpenedLoseTheListWithoutWaiting) {
    PutNamed("ftp", "FTP");
    std::filesystem::create_symlink("/nowhere", catalogue::Path("link.mount"));
    EXPECT_FALSE(ListProtocol(out_));
    EXPECT_EQ(GetError(), VFS_ERR_FAILED);
    std::filesystem::remove(catalogue::Path("link.mount"));
    ResetError();
    ASSERT_EQ(mkfifo(catalogue::Path("fifo.mount").c_str(), 0666), 0);
    EXPECT_FALSE(ListProtocol(out_));
    EXPECT_EQ(GetError(), VFS_ERR_FAILED);
}

TEST_F(MountFileTest, FolderThatMayNotBeReadFails) {
    PutNamed("ftp", "FTP");
    ASSERT_EQ(chmod(paths::kCatalogueDir, 0700), 0);
    catalogue::AsUser([&] { EXPECT_FALSE(ListProtocol(out_)); });
    ASSERT_EQ(chmod(paths::kCatalogueDir, 0755), 0);
    EXPECT_EQ(GetError(), VFS_ERR_FAILED);
    EXPECT_TRUE(seams::LoggedPart("YLIBCFileEnumDir failed: " + std::string(paths::kCatalogueDir) +
                                  ", zyroerr=[0x"))
        << seams::LogDump();
}

}  // namespace
}  // namespace ZYROVFS::Protocol
