// One raw key of one catalogue file.
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

class GetByKeyTest : public testing::Test {
  protected:
    void SetUp() override {
        catalogue::Clear();
        catalogue::Add("ftp", "FTP server", "list,copy");
        failing_alloc::no_hash = false;
        ResetError();
    }
};

TEST_F(GetByKeyTest, GivesTheTextAsItStands) {
    std::string value;
    EXPECT_TRUE(GetByKey("ftp", "Actions", value));
    EXPECT_EQ(value, "list,copy");
    EXPECT_TRUE(GetByKey("ftp", "Type", value)) << "any key of the file";
    EXPECT_EQ(value, "ftp");
}

TEST_F(GetByKeyTest, KeyThatTheFileLacksIsEmptyAndTrue) {
    for (const char* key : {"DefaultPort", "EnableCurl", "name", ""}) {
        std::string value = "old";
        EXPECT_TRUE(GetByKey("ftp", key, value)) << key;
        EXPECT_EQ(value, "") << key;
    }
}

TEST_F(GetByKeyTest, FileThatIsNotThereFails) {
    std::string value = "old";
    EXPECT_FALSE(GetByKey("gopher", "Name", value));
    EXPECT_EQ(GetError(), VFS_ERR_FAILED);
    EXPECT_STREQ(GetErrorFile(), "get_by_key.cpp");
    EXPECT_EQ(value, "old");
    EXPECT_TRUE(seams::LoggedPart("get_by_key.cpp:")) << seams::LogDump();
    EXPECT_TRUE(seams::LoggedPart("YLIBCFileGetSection failed: " + kDir +
                                  "/gopher.mount, zyroerr=[0x0600 section.cpp:"))
        << seams::LogDump();
}

TEST_F(GetByKeyTest, NullArgumentsFail) {
    std::string value = "old";
    EXPECT_FALSE(GetByKey(nullptr, "Name", value));
    EXPECT_EQ(GetError(), VFS_ERR_FAILED);
    ResetError();
    EXPECT_FALSE(GetByKey("ftp", nullptr, value));
    EXPECT_EQ(GetError(), VFS_ERR_FAILED);
    EXPECT_EQ(value, "old");
}

TEST_F(GetByKeyTest, MemoryThatRunsOutIsTold) {
    failing_alloc::no_hash = true;
    std::string value;
    EXPECT_FALSE(GetByKey("ftp", "Name", value));
    EXPECT_EQ(GetError(), VFS_ERR_OUT_OF_MEMORY);
    EXPECT_TRUE(seams::Logged("YLIBCSzHashAlloc(1024) failed [0x0200 heap.cpp:12]"))
        << seams::LogDump();
}

}  // namespace
}  // namespace ZYROVFS::Protocol
