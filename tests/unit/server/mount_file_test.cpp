// One catalogue file: which keys make the record, and what stands in for those that are absent.
#include "server/mount_file.h"

#include <gmock/gmock.h>

#include "support/scratch.h"
#include "support/seams.h"
#include "zyrovfs/error.h"

namespace ZYROVFS::Protocol {
namespace {

class MountFileRecord : public scratch::ScratchTest {
  protected:
    void SetUp() override { ASSERT_TRUE(file_.Init()); }

    _tag_VFS_PROTOCOL_INFO_ Record(const std::string& text) {
        EXPECT_TRUE(file_.Read(Put("file", text)));
        return file_.Record();
    }

    MountFile file_;
};

TEST_F(MountFileRecord, HoldsTheFiveKeys) {
    const auto record = Record(
        "[Mount]\nType=ftp\nProtocol=ftp\nName=FTP\nActions=a,b\nEnableCurl=true\nDefaultPort="
        "21\n");
    EXPECT_EQ(record.protocol, "ftp");
    EXPECT_EQ(record.name, "FTP");
    EXPECT_EQ(record.api, "a,b");
    EXPECT_EQ(record.enable_curl, "true");
    EXPECT_EQ(record.default_port, 21U);
}

TEST_F(MountFileRecord, OfAnEmptySectionHasEmptyTextsAndDefaults) {
    for (const char* text : {"", "[Mount]\n", "[Other]\nName=FTP\n"}) {
        const auto record = Record(text);
        EXPECT_EQ(record.protocol, "");
        EXPECT_EQ(record.name, "");
        EXPECT_EQ(record.api, "");
        EXPECT_EQ(record.enable_curl, "false");
        EXPECT_EQ(record.default_port, 80U);
    }
}

TEST_F(MountFileRecord, KeyWithoutAValueIsNotAbsent) {
    const auto record = Record("[Mount]\nEnableCurl=\nDefaultPort=\n");
    EXPECT_EQ(record.enable_curl, "");
    EXPECT_EQ(record.default_port, 0U);
}

TEST_F(MountFileRecord, PortIsReadAsFarAsItIsANumber) {
    EXPECT_EQ(Record("[Mount]\nDefaultPort=2121 tcp\n").default_port, 2121U);
    EXPECT_EQ(Record("[Mount]\nDefaultPort=0x15\n").default_port, 0U);
    EXPECT_EQ(Record("[Mount]\nDefaultPort=ftp\n").default_port, 0U);
}

TEST_F(MountFileRecord, ForgetsTheFileBefore) {
    Record("[Mount]\nName=FTP\n");
    EXPECT_EQ(Record("[Mount]\nProtocol=dav\n").name, "");
}

TEST_F(MountFileRecord, OfAFileThatCannotBeReadFails) {
    ResetError();
    EXPECT_FALSE(file_.Read(directory_));
    EXPECT_EQ(GetError(), VFS_ERR_FAILED);
    EXPECT_STREQ(GetErrorFile(), "mount_file_test.cpp") << "told for the caller";
    EXPECT_TRUE(seams::LoggedPart("YLIBCFileGetSection failed: " + directory_ +
                                  ", zyroerr=[0x0900 "
                                  "section.cpp:"))
        << seams::LogDump();
}

}  // namespace
}  // namespace ZYROVFS::Protocol
