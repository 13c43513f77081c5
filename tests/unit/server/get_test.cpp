// One protocol of the catalogue.
#include "support/catalogue_test.h"

namespace ZYROVFS::Protocol {
namespace {

using catalogue::Put;

class GetProtocolTest : public catalogue::CatalogueTest {
  protected:
    Json::Value out_;
};

TEST_F(GetProtocolTest, GivesTheFourTextsOfTheFile) {
    Put("sftp.mount",
        "[Mount]\nProtocol=sftp\nName=SSH\nActions=list,read,,write\nEnableCurl=true\n"
        "DefaultPort=22\n");
    ASSERT_TRUE(GetProtocol("sftp", out_));
    Json::Value expected;
    expected["protocol"] = "sftp";
    expected["name"] = "SSH";
    expected["api"] = "list,read,,write";
    expected["enable_curl"] = "true";
    EXPECT_EQ(out_, expected);  // and no "default_port"
}

TEST_F(GetProtocolTest, AbsentKeysHaveDefaultsAndEmptyOnesNone) {
    Put("a.mount", "[Mount]\n");
    Put("b.mount", "[Mount]\nEnableCurl=\n");
    ASSERT_TRUE(GetProtocol("a", out_));
    EXPECT_EQ(out_["protocol"], "");
    EXPECT_EQ(out_["name"], "");
    EXPECT_EQ(out_["api"], "");
    EXPECT_EQ(out_["enable_curl"], "false");
    ASSERT_TRUE(GetProtocol("b", out_));
    EXPECT_EQ(out_["enable_curl"], "");
}

TEST_F(GetProtocolTest, EnableCurlStaysTextWhateverItSays) {
    Put("a.mount", "[Mount]\nEnableCurl=perhaps 1\n");
    ASSERT_TRUE(GetProtocol("a", out_));
    EXPECT_EQ(out_["enable_curl"], "perhaps 1");
}

TEST_F(GetProtocolTest, OfAProtocolWithoutAFileFails) {
    out_ = "before";
    EXPECT_FALSE(GetProtocol("gopher", out_));
    EXPECT_EQ(GetError(), VFS_ERR_FAILED);
    EXPECT_EQ(out_, Json::Value(Json::objectValue));
    EXPECT_TRUE(seams::LoggedPart("YLIBCFileGetSection failed: " + catalogue::Path("gopher.mount") +
                                  ", zyroerr=[0x"))
        << seams::LogDump();
}

TEST_F(GetProtocolTest, NullIsAFailureThatLeavesTheAnswer) {
    out_ = "before";
    EXPECT_FALSE(GetProtocol(nullptr, out_));
    EXPECT_EQ(GetError(), VFS_ERR_FAILED);
    EXPECT_EQ(out_, "before");
}

TEST_F(GetProtocolTest, WithoutMemoryNothingIsRead) {
    Put("ftp.mount", "[Mount]\nProtocol=ftp\n");
    catalogue::out_of_hashes = true;
    out_ = "before";
    EXPECT_FALSE(GetProtocol("ftp", out_));
    EXPECT_EQ(GetError(), VFS_ERR_OUT_OF_MEMORY);
    EXPECT_EQ(out_, "before");
    EXPECT_TRUE(seams::LoggedPart("YLIBCSzHashAlloc(1024) failed [0x")) << seams::LogDump();
}

TEST_F(GetProtocolTest, TextsThatAreNoMountFileGiveEmptyTexts) {
    for (const auto& [name, text] : catalogue::DamagedTexts()) {
        SCOPED_TRACE(name);
        Put("x.mount", text);
        EXPECT_TRUE(GetProtocol("x", out_));
        EXPECT_EQ(out_["protocol"], "");
        EXPECT_EQ(out_["enable_curl"], "false");
    }
}

TEST_F(GetProtocolTest, ValueOfAMebibyteComesWhole) {
    const std::string name(1 << 20, 'n');
    Put("x.mount", "[Mount]\nName=" + name + "\n");
    ASSERT_TRUE(GetProtocol("x", out_));
    EXPECT_EQ(out_["name"].asString(), name);
}

TEST_F(GetProtocolTest, ValueThatIsNotUtf8ComesAsItIs) {
    Put("x.mount", "[Mount]\nName=\xff\xfe\n");
    ASSERT_TRUE(GetProtocol("x", out_));
    EXPECT_EQ(out_["name"].asString(), "\xff\xfe");
}

TEST_F(GetProtocolTest, DirectoryOrFifoInTheFilesPlaceFailsWithoutWaiting) {
    std::filesystem::create_directory(catalogue::Path("dir.mount"));
    ASSERT_EQ(mkfifo(catalogue::Path("fifo.mount").c_str(), 0666), 0);
    for (const char* protocol : {"dir", "fifo"}) {
        ResetError();
        EXPECT_FALSE(GetProtocol(protocol, out_)) << protocol;
        EXPECT_EQ(GetError(), VFS_ERR_FAILED);
    }
}

TEST_F(GetProtocolTest, FileThatMayNotBeReadFails) {
    Put("x.mount", "[Mount]\nName=x\n");
    ASSERT_EQ(chmod(catalogue::Path("x.mount").c_str(), 0600), 0);
    catalogue::AsUser([&] { EXPECT_FALSE(GetProtocol("x", out_)); });
    EXPECT_EQ(GetError(), VFS_ERR_FAILED);
}

TEST_F(GetProtocolTest, NameDoesNotLeadOutOfTheCatalogue) {
    std::ofstream("/tmp/outside.mount") << "[Mount]\nName=outside\n";
    for (const char* protocol : {"../../../../tmp/outside", "/tmp/outside", "", "..", "x/y"}) {
        ResetError();
        EXPECT_FALSE(GetProtocol(protocol, out_)) << protocol;
        EXPECT_EQ(GetError(), VFS_ERR_FAILED);
    }
    const std::string huge(1 << 20, 'p');
    EXPECT_FALSE(GetProtocol(huge.c_str(), out_));
    EXPECT_EQ(GetError(), VFS_ERR_FAILED);
}

TEST_F(GetProtocolTest, SuccessLeavesTheCellAlone) {
    Put("ftp.mount", "[Mount]\nProtocol=ftp\n");
    VFSSetErrEx(VFS_ERR_BUSY, "x", 1);
    EXPECT_TRUE(GetProtocol("ftp", out_));
    EXPECT_EQ(GetError(), VFS_ERR_BUSY);
}

}  // namespace
}  // namespace ZYROVFS::Protocol
