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
        chmod(path_.c_str(), 0755);
        chmod(folder_.c_str(), 0755);
        EXPECT_EQ(chown(path_.c_str(), 0, 0), 0);
        EXPECT_EQ(chown(folder_.c_str(), 0, 0), 0);
    }
    static void ExpectRefused() {
        errno = 0;
        EXPECT_EQ(HelperPath(), "");
        EXPECT_EQ(errno, EPERM);
    }

    const std::string folder_ = fs::canonical(BuildDir() + "/libexec/zyrovfs").string();
    const std::string path_ = folder_ + "/zyrovfs-helper";
};

TEST_F(HelperFile, IsTheOneBesideTheLibraryWhateverTheCallerSets) {
    setenv("PATH", "/tmp", 1);
    EXPECT_EQ(chdir("/tmp"), 0);
    EXPECT_EQ(HelperPath(), path_);
}

TEST_F(HelperFile, ThatOthersMayWriteToIsNotRunAsRoot) {
    chmod(path_.c_str(), 0775);
    ExpectRefused();
}

TEST_F(HelperFile, ThatIsSomebodyElsesIsNotRunAsRoot) {
    EXPECT_EQ(chown(path_.c_str(), 4002, 0), 0);
    ExpectRefused();
}

TEST_F(HelperFile, InAFolderThatIsSomebodyElsesIsNotRunAsRoot) {
    EXPECT_EQ(chown(folder_.c_str(), 4002, 0), 0);
    ExpectRefused();
    EXPECT_EQ(chown(folder_.c_str(), 0, 0), 0);
    chmod(folder_.c_str(), 0777);
    ExpectRefused();
}

TEST_F(HelperFile, IsNotRunByWhoeverCanBeRootAgain) {
    chmod(path_.c_str(), 0777);
    EXPECT_EQ(scratch::InChild(
                  [] { return setresuid(4001, 4001, 0) == 0 && HelperPath().empty() ? 0 : 1; }),
              0);
}

TEST_F(HelperFile, IsFoundWhereTheEffectiveUserMayNotGo) {
    chmod(folder_.c_str(), 0700);
    EXPECT_EQ(
        scratch::InChild([this] {
            return setresuid(0, 4001, 0) == 0 && HelperPath() == path_ && geteuid() == 4001 ? 0 : 1;
        }),
        0);
}

TEST_F(HelperFile, IsTheUsersOwnRiskInAProcessWithoutRoot) {
    chmod(path_.c_str(), 0777);
    EXPECT_EQ(scratch::InChild(
                  [this] { return scratch::BecomeUser(4001) && HelperPath() == path_ ? 0 : 1; }),
              0);
}

TEST_F(HelperFile, ThatIsMissingIsToldByErrno) {
    fs::rename(path_, path_ + ".away");
    errno = 0;
    EXPECT_EQ(HelperPath(), "");
    EXPECT_EQ(errno, ENOENT);
    fs::rename(path_ + ".away", path_);
}

}  // namespace
}  // namespace ZYROVFS
