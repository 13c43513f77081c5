// Which helper program a process runs. The build tree is this test's own copy, and may be changed.
#include "mount/helper_path.h"

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <filesystem>

#include "support/locations.h"
#include "support/scratch.h"

namespace ZYROVFS {
namespace {

namespace fs = std::filesystem;

class HelperFile : public testing::Test {
  protected:
    void TearDown() override {
        chmod(kPath.c_str(), 0755);
        chmod(kFolder.c_str(), 0755);
        EXPECT_EQ(chown(kPath.c_str(), 0, 0), 0);
        EXPECT_EQ(chown(kFolder.c_str(), 0, 0), 0);
    }
    static void ExpectRefused() {
        errno = 0;
        EXPECT_EQ(HelperPath(), "");
        EXPECT_EQ(errno, EPERM);
    }

    const std::string kFolder = fs::canonical(machine::BuildDir() + "/libexec/zyrovfs").string();
    const std::string kPath = kFolder + "/zyrovfs-helper";
};

TEST_F(HelperFile, IsTheOneBesideTheLibraryWhateverTheCallerSets) {
    setenv("PATH", "/tmp", 1);
    EXPECT_EQ(chdir("/tmp"), 0);
    EXPECT_EQ(HelperPath(), kPath);
}

TEST_F(HelperFile, ThatOthersMayWriteToIsNotRunAsRoot) {
    chmod(kPath.c_str(), 0775);
    ExpectRefused();
}

TEST_F(HelperFile, ThatIsSomebodyElsesIsNotRunAsRoot) {
    EXPECT_EQ(chown(kPath.c_str(), 4002, 0), 0);
    ExpectRefused();
}

TEST_F(HelperFile, InAFolderThatIsSomebodyElsesIsNotRunAsRoot) {
    EXPECT_EQ(chown(kFolder.c_str(), 4002, 0), 0);
    ExpectRefused();
    EXPECT_EQ(chown(kFolder.c_str(), 0, 0), 0);
    chmod(kFolder.c_str(), 0777);
    ExpectRefused();
}

TEST_F(HelperFile, IsNotRunByWhoeverCanBeRootAgain) {
    chmod(kPath.c_str(), 0777);
    EXPECT_EQ(scratch::InChild([] {
                  return setresuid(4001, 4001, 0) == 0 && HelperPath().empty() ? 0 : 1;
              }),
              0);
}

TEST_F(HelperFile, IsTheUsersOwnRiskInAProcessWithoutRoot) {
    chmod(kPath.c_str(), 0777);
    EXPECT_EQ(scratch::InChild([this] {
                  return scratch::BecomeUser(4001) && HelperPath() == kPath ? 0 : 1;
              }),
              0);
}

TEST_F(HelperFile, ThatIsMissingIsToldByErrno) {
    fs::rename(kPath, kPath + ".away");
    errno = 0;
    EXPECT_EQ(HelperPath(), "");
    EXPECT_EQ(errno, ENOENT);
    fs::rename(kPath + ".away", kPath);
}

}  // namespace
}  // namespace ZYROVFS
