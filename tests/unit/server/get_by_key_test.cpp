// One raw key of one protocol's file.
#include "support/catalogue_test.h"

namespace ZYROVFS::Protocol {
namespace {

using catalogue::Put;

class GetByKeyTest : public catalogue::CatalogueTest {
  protected:
    std::string value_ = "before";
};

TEST_F(GetByKeyTest, GivesAnyKeyOfTheFileAsItStands) {
    Put("sftp.mount", "[Mount]\nDefaultPort=0022\nX-Anything=a = b\n");
    EXPECT_TRUE(GetByKey("sftp", "DefaultPort", value_));
    EXPECT_EQ(value_, "0022");
    EXPECT_TRUE(GetByKey("sftp", "X-Anything", value_));
    EXPECT_EQ(value_, "a = b");
}

TEST_F(GetByKeyTest, KeyThatTheFileLacksGivesAnEmptyTextWithoutAnyDefault) {
    Put("sftp.mount", "[Mount]\nProtocol=sftp\n");
    for (const char* key : {"DefaultPort", "EnableCurl", "", "protocol"}) {
        value_ = "before";
        EXPECT_TRUE(GetByKey("sftp", key, value_)) << key;
        EXPECT_EQ(value_, "");
    }
}

TEST_F(GetByKeyTest, NullArgumentsAreFailures) {
    Put("sftp.mount", "[Mount]\nProtocol=sftp\n");
    EXPECT_FALSE(GetByKey(nullptr, "Protocol", value_));
    EXPECT_EQ(GetError(), VFS_ERR_FAILED);
    ResetError();
    EXPECT_FALSE(GetByKey("sftp", nullptr, value_));
    EXPECT_EQ(GetError(), VFS_ERR_FAILED);
    EXPECT_EQ(value_, "before");
}

TEST_F(GetByKeyTest, OfAProtocolWithoutAFileFails) {
    EXPECT_FALSE(GetByKey("gopher", "Protocol", value_));
    EXPECT_EQ(GetError(), VFS_ERR_FAILED);
    EXPECT_EQ(value_, "before");
    EXPECT_TRUE(seams::LoggedPart("YLIBCFileGetSection failed: " + catalogue::Path("gopher.mount") +
                                  ", zyroerr=[0x"))
        << seams::LogDump();
}

TEST_F(GetByKeyTest, WithoutMemoryNothingIsRead) {
    Put("sftp.mount", "[Mount]\nProtocol=sftp\n");
    catalogue::out_of_hashes = true;
    EXPECT_FALSE(GetByKey("sftp", "Protocol", value_));
    EXPECT_EQ(GetError(), VFS_ERR_OUT_OF_MEMORY);
    EXPECT_EQ(value_, "before");
    EXPECT_TRUE(seams::LoggedPart("YLIBCSzHashAlloc(1024) failed [0x")) << seams::LogDump();
}

TEST_F(GetByKeyTest, TextsThatAreNoMountFileHaveNoKeys) {
    for (const auto& [name, text] : catalogue::DamagedTexts()) {
        SCOPED_TRACE(name);
        Put("x.mount", text);
        value_ = "before";
        EXPECT_TRUE(GetByKey("x", "Protocol", value_));
        EXPECT_EQ(value_, "");
    }
}

TEST_F(GetByKeyTest, WhatIsNoFileOrLiesOutsideOfTheCatalogueFails) {
    std::filesystem::create_directory(catalogue::Path("dir.mount"));
    std::ofstream("/tmp/outside.mount") << "[Mount]\nName=outside\n";
    for (const char* protocol : {"dir", "../../../../tmp/outside", ""}) {
        ResetError();
        EXPECT_FALSE(GetByKey(protocol, "Name", value_)) << protocol;
        EXPECT_EQ(GetError(), VFS_ERR_FAILED);
    }
    EXPECT_EQ(value_, "before");
}

TEST_F(GetByKeyTest, KeyOfAMebibyteIsJustAbsent) {
    Put("x.mount", "[Mount]\nName=x\n");
    EXPECT_TRUE(GetByKey("x", std::string(1 << 20, 'k').c_str(), value_));
    EXPECT_EQ(value_, "");
}

}  // namespace
}  // namespace ZYROVFS::Protocol
