// One protocol of the catalogue as an object.
#include <gmock/gmock.h>

#include "support/catalogue.h"
#include "support/failing_alloc.h"
#include "support/scratch.h"
#include "support/seams.h"
#include "zyrovfs/error.h"
#include "zyrovfs/protocol.h"

namespace ZYROVFS::Protocol {
namespace {

const std::string kDir = paths::kCatalogueDir;

class GetProtocolTest : public testing::Test {
  protected:
    void SetUp() override {
        catalogue::Clear();
        failing_alloc::no_hash = false;
        ResetError();
    }
    static Json::Value Get(const char* protocol) {
        Json::Value out;
        EXPECT_TRUE(GetProtocol(protocol, out));
        return out;
    }
    static void ExpectNoFile(const std::string& protocol) {
        Json::Value out("old");
        ResetError();
        EXPECT_FALSE(GetProtocol(protocol.c_str(), out)) << protocol.substr(0, 40);
        EXPECT_EQ(GetError(), VFS_ERR_FAILED);
        EXPECT_STREQ(GetErrorFile(), "get.cpp");
        EXPECT_EQ(out, Json::Value(Json::objectValue));
        EXPECT_TRUE(seams::LoggedPart("YLIBCFileGetSection failed: " + kDir + "/" + protocol +
                                      ".mount, zyroerr=[0x"))
            << seams::LogDump().substr(0, 200);
    }
};

TEST_F(GetProtocolTest, TellsWhatTheFileSays) {
    scratch::PutText(kDir + "/ftp.mount",
                     "[Mount]\nProtocol=ftp\nName=FTP server\nActions=list,copy\nEnableCurl=true\n"
                     "DefaultPort=21\n");
    const Json::Value out = Get("ftp");
    EXPECT_EQ(out["protocol"], "ftp");
    EXPECT_EQ(out["name"], "FTP server");
    EXPECT_EQ(out["api"], "list,copy");
    EXPECT_EQ(out["enable_curl"], "true");
    EXPECT_EQ(out.size(), 4U) << "the port is told by the listing only";
}

TEST_F(GetProtocolTest, FileWithoutEnableCurlSaysFalse) {
    catalogue::Add("dav", "WebDAV", "list");
    EXPECT_EQ(Get("dav")["enable_curl"], "false");
}

TEST_F(GetProtocolTest, FileWithoutTheSectionGivesEmptyTexts) {
    scratch::PutText(kDir + "/odd.mount", "Name=no section\n");
    const Json::Value out = Get("odd");
    EXPECT_EQ(out["protocol"], "");
    EXPECT_EQ(out["name"], "");
    EXPECT_EQ(out["api"], "");
    EXPECT_EQ(out["enable_curl"], "false");
}

TEST_F(GetProtocolTest, NameOfTheFileDecidesNotTheKey) {
    scratch::PutText(kDir + "/ftp.mount", "[Mount]\nProtocol=other\n");
    EXPECT_EQ(Get("ftp")["protocol"], "other");
    ExpectNoFile("other");
}

TEST_F(GetProtocolTest, ProtocolWithNoFileFails) {
    ExpectNoFile("gopher");
    ExpectNoFile("");
    ExpectNoFile(std::string(1 << 20, 'x'));
}

TEST_F(GetProtocolTest, FolderWhereAFileShouldBeFails) {
    std::filesystem::create_directory(kDir + "/ftp.mount");
    ExpectNoFile("ftp");
}

TEST_F(GetProtocolTest, NamesDoNotLeaveTheCatalogue) {
    scratch::PutText("/tmp/outside.mount", "[Mount]\nProtocol=outside\n");
    ExpectNoFile("../../../../tmp/outside");
    ExpectNoFile("/tmp/outside");
}

TEST_F(GetProtocolTest, BinaryFileGivesWhatCanBeReadInIt) {
    scratch::PutText(kDir + "/bin.mount",
                     std::string("\x7f\0\xff[Mount]\n[Mount]\nName=\xff\xfe\0x\n", 30));
    EXPECT_EQ(Get("bin")["name"], "\xff\xfe");
}

TEST_F(GetProtocolTest, LinesOfAMebibyte) {
    const std::string large(1 << 20, 'n');
    catalogue::Add("ftp", large, "list");
    EXPECT_EQ(Get("ftp")["name"], large);
}

TEST_F(GetProtocolTest, NullNameFailsWithoutALogLine) {
    Json::Value out("old");
    EXPECT_FALSE(GetProtocol(nullptr, out));
    EXPECT_EQ(GetError(), VFS_ERR_FAILED);
    EXPECT_EQ(out, "old");
    EXPECT_TRUE(seams::LogLines().empty());
}

TEST_F(GetProtocolTest, MemoryThatRunsOutIsTold) {
    failing_alloc::no_hash = true;
    Json::Value out("old");
    EXPECT_FALSE(GetProtocol("ftp", out));
    EXPECT_EQ(GetError(), VFS_ERR_OUT_OF_MEMORY);
    EXPECT_EQ(out, "old");
    EXPECT_TRUE(seams::Logged("YLIBCSzHashAlloc(1024) failed [0x0200 heap.cpp:12]"))
        << seams::LogDump();
}

}  // namespace
}  // namespace ZYROVFS::Protocol
