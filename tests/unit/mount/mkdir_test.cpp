#include <dlfcn.h>
#include <fcntl.h>
#include <gmock/gmock.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <unistd.h>
#include <zosplatform/error.h>

#include <cerrno>
#include <filesystem>
#include <functional>
#include <string>

#include "mount/mkdir.h"
#include "support/other_process.h"
#include "support/seams.h"
#include "zyrovfs/utils.h"

namespace {

/** What mkdirat of the code under test does in place of the system call, if set. */
std::function<int(const char*)> instead_of_mkdir;
/** The same for fchownat: its errno. */
int chown_fails_with = 0;

}  // namespace

extern "C" int mkdirat(int folder, const char* path, mode_t mode) noexcept {
    if (instead_of_mkdir) {
        return instead_of_mkdir(path);
    }
    using Real = int (*)(int, const char*, mode_t);
    static const auto real = reinterpret_cast<Real>(dlsym(RTLD_NEXT, "mkdirat"));
    return real(folder, path, mode);
}

extern "C" int fchownat(int folder, const char* path, uid_t uid, gid_t gid, int flags) noexcept {
    if (chown_fails_with != 0) {
        errno = chown_fails_with;
        return -1;
    }
    using Real = int (*)(int, const char*, uid_t, gid_t, int);
    static const auto real = reinterpret_cast<Real>(dlsym(RTLD_NEXT, "fchownat"));
    return real(folder, path, uid, gid, flags);
}

namespace ZYROVFS::Utils {
namespace {

namespace fs = std::filesystem;

constexpr unsigned kNone = static_cast<unsigned>(-1);
const std::string kTop = "/var/tmp/mkdir_test";

struct stat StatOf(const std::string& path) {
    struct stat info {};
    EXPECT_EQ(lstat(path.c_str(), &info), 0) << path;
    return info;
}

void MakeFile(const std::string& path) {
    const int fd = open(path.c_str(), O_WRONLY | O_CREAT | O_CLOEXEC, 0600);
    ASSERT_GE(fd, 0);
    close(fd);
}

class Folders : public testing::Test {
  protected:
    void SetUp() override {
        fs::remove_all(kTop);
        fs::create_directories(kTop);
        YLIBCErrSetEx(0, "", 0);
        errno = 0;
        umask(022);
    }
    void TearDown() override {
        instead_of_mkdir = nullptr;
        chown_fails_with = 0;
        umask(022);
    }
    /** MkdirP with nothing special asked for. */
    static int Make(const std::string& path, int replace = 0) {
        return MkdirP(path.c_str(), nullptr, replace, kNone, kNone, kNone);
    }
};

using MkdirPTest = Folders;
using CreateFolderTest = Folders;
using CreateParentFolderTest = Folders;

TEST_F(MkdirPTest, NullAndEmptyPathsAreRefused) {
    for (const char* path : {static_cast<const char*>(nullptr), ""}) {
        seams::Reset();
        EXPECT_EQ(MkdirP(path, nullptr, 0, kNone, kNone, kNone), -1);
        EXPECT_EQ(YLIBCErrGet(), 0xd00U);
        EXPECT_TRUE(seams::LoggedPart("Invaild Argument (")) << seams::LogDump();
        EXPECT_EQ(seams::LogLines().at(0).text.back(), '\n');
    }
}

TEST_F(MkdirPTest, MakesEveryMissingFolder) {
    EXPECT_EQ(Make(kTop + "/a/b/c/d"), 0);
    EXPECT_TRUE(fs::is_directory(kTop + "/a/b/c/d"));
    EXPECT_EQ(Make(kTop + "/a/b/c/d"), 0) << "and is content with what is there";
    EXPECT_EQ(YLIBCErrGet(), 0U);
}

TEST_F(MkdirPTest, SlashesMayStandDoubledAndAtTheEnd) {
    EXPECT_EQ(Make("/" + kTop + "//a///b//"), 0);
    EXPECT_TRUE(fs::is_directory(kTop + "/a/b"));
    EXPECT_EQ(Make("/"), 0);
    EXPECT_EQ(Make("///"), 0);
}

TEST_F(MkdirPTest, RelativePathsStartAtTheWorkingFolder) {
    const fs::path saved = fs::current_path();
    fs::current_path(kTop);
    EXPECT_EQ(Make("r/s"), 0);
    EXPECT_EQ(Make("./t/../u"), 0);
    EXPECT_EQ(Make("."), 0);
    fs::current_path(saved);
    EXPECT_TRUE(fs::is_directory(kTop + "/r/s"));
    EXPECT_TRUE(fs::is_directory(kTop + "/u"));
}

TEST_F(MkdirPTest, WithoutAModeTheUmaskIsInForce) {
    umask(027);
    EXPECT_EQ(Make(kTop + "/a/b"), 0);
    EXPECT_EQ(umask(022), 027U);
    EXPECT_EQ(StatOf(kTop + "/a").st_mode & 07777, 0750U);
    EXPECT_EQ(StatOf(kTop + "/a/b").st_mode & 07777, 0750U);
}

TEST_F(MkdirPTest, AModeIsTakenAsItIsAndTheUmaskComesBack) {
    umask(077);
    EXPECT_EQ(MkdirP((kTop + "/a/b").c_str(), nullptr, 0, kNone, kNone, 0775), 0);
    EXPECT_EQ(umask(077), 077U);
    EXPECT_EQ(StatOf(kTop + "/a").st_mode & 07777, 0775U);
    EXPECT_EQ(StatOf(kTop + "/a/b").st_mode & 07777, 0775U);

    MakeFile(kTop + "/file");
    EXPECT_EQ(MkdirP((kTop + "/file").c_str(), nullptr, 0, kNone, kNone, 0775), -1);
    EXPECT_EQ(umask(022), 077U) << "also after a failure";
}

TEST_F(MkdirPTest, OwnersAreGivenToWhatIsMadeAndToNothingElse) {
    ASSERT_EQ(Make(kTop + "/old"), 0);
    EXPECT_EQ(MkdirP((kTop + "/old/a/b").c_str(), nullptr, 0, 1001, 100, kNone), 0);
    EXPECT_EQ(StatOf(kTop + "/old").st_uid, 0U);
    for (const char* made : {"/old/a", "/old/a/b"}) {
        EXPECT_EQ(StatOf(kTop + made).st_uid, 1001U) << made;
        EXPECT_EQ(StatOf(kTop + made).st_gid, 100U) << made;
    }
}

TEST_F(MkdirPTest, OneMissingOwnerIsTheEffectiveId) {
    ASSERT_EQ(setegid(77), 0);
    const int by_uid = MkdirP((kTop + "/u").c_str(), nullptr, 0, 1001, kNone, kNone);
    const int by_gid = MkdirP((kTop + "/g").c_str(), nullptr, 0, kNone, 100, kNone);
    ASSERT_EQ(setegid(0), 0);
    EXPECT_EQ(by_uid, 0);
    EXPECT_EQ(by_gid, 0);
    EXPECT_EQ(StatOf(kTop + "/u").st_uid, 1001U);
    EXPECT_EQ(StatOf(kTop + "/u").st_gid, 77U);
    EXPECT_EQ(StatOf(kTop + "/g").st_uid, 0U);
    EXPECT_EQ(StatOf(kTop + "/g").st_gid, 100U);
}

TEST_F(MkdirPTest, OwnerThatCannotBeGivenFails) {
    ASSERT_EQ(chmod(kTop.c_str(), 0777), 0);
    ASSERT_EQ(seteuid(1001), 0);
    const int result = MkdirP((kTop + "/a").c_str(), nullptr, 0, 1002, kNone, kNone);
    const int error = errno;
    ASSERT_EQ(seteuid(0), 0);
    EXPECT_EQ(result, -1);
    EXPECT_EQ(error, EPERM);
    EXPECT_EQ(YLIBCErrGet(), 0x3c00U);
}

TEST_F(MkdirPTest, FileAsLastComponentIsThere) {
    MakeFile(kTop + "/file");
    EXPECT_EQ(Make(kTop + "/file"), -1);
    EXPECT_EQ(errno, EEXIST);
    EXPECT_EQ(YLIBCErrGet(), 0x800U);
    EXPECT_EQ(Make(kTop + "/file//"), -1);
    EXPECT_EQ(YLIBCErrGet(), 0x800U) << "slashes name no further component";
}

TEST_F(MkdirPTest, FileOnTheWayIsNoFolder) {
    MakeFile(kTop + "/file");
    EXPECT_EQ(Make(kTop + "/file/a"), -1);
    EXPECT_EQ(errno, ENOTDIR);
    EXPECT_EQ(YLIBCErrGet(), 0xa100U);
    EXPECT_TRUE(fs::is_regular_file(kTop + "/file"));
}

TEST_F(MkdirPTest, WhatIsNoFolderIsReplacedWhenAskedFor) {
    MakeFile(kTop + "/file");
    ASSERT_EQ(mkfifo((kTop + "/fifo").c_str(), 0600), 0);
    fs::create_symlink("/nowhere", kTop + "/dangling");
    for (const char* name : {"/file", "/fifo", "/dangling"}) {
        EXPECT_EQ(Make(kTop + name + "/a", 1), 0) << name;
        EXPECT_TRUE(fs::is_directory(fs::symlink_status(kTop + name))) << name;
        EXPECT_TRUE(fs::is_directory(kTop + name + "/a")) << name;
    }
    EXPECT_FALSE(fs::exists("/nowhere"));
}

TEST_F(MkdirPTest, DanglingLinkStandsInTheWay) {
    fs::create_symlink("/nowhere", kTop + "/dangling");
    EXPECT_EQ(Make(kTop + "/dangling"), -1);
    EXPECT_EQ(YLIBCErrGet(), 0x800U);
}

TEST_F(MkdirPTest, LinkToAFolderIsAFolder) {
    fs::create_directories(kTop + "/real");
    fs::create_directory_symlink(kTop + "/real", kTop + "/link");
    EXPECT_EQ(Make(kTop + "/link/a", 1), 0);
    EXPECT_TRUE(fs::is_directory(kTop + "/real/a"));
    EXPECT_TRUE(fs::is_symlink(kTop + "/link"));
}

TEST_F(MkdirPTest, LinkThatAUserPlantedIsNoFolder) {
    fs::create_directories(kTop + "/real");
    ASSERT_EQ(chmod(kTop.c_str(), 01777), 0);
    fs::create_directory_symlink(kTop + "/real", kTop + "/link");
    ASSERT_EQ(lchown((kTop + "/link").c_str(), 1001, 100), 0);
    EXPECT_EQ(MkdirP((kTop + "/link/a").c_str(), nullptr, 0, kNone, kNone, 0777), -1);
    EXPECT_EQ(YLIBCErrGet(), 0xa100U);
    EXPECT_EQ(MkdirP((kTop + "/link/a").c_str(), nullptr, 1, kNone, kNone, 0777), 0);
    EXPECT_TRUE(fs::is_directory(fs::symlink_status(kTop + "/link"))) << "replaced, not followed";
    EXPECT_TRUE(fs::is_empty(kTop + "/real"));
}

TEST_F(MkdirPTest, WhatAllUsersShareOfTheConfigurationIsRootsToChange) {
    fs::remove_all("/usr/zyro");
    const mode_t saved = umask(0);
    for (const unsigned mode : {0777U, kNone}) {
        EXPECT_EQ(MkdirP("/usr/zyro/etc/zyrovfs/1001", nullptr, 1, kNone, kNone, mode), 0);
        for (const char* shared : {"/usr/zyro", "/usr/zyro/etc", "/usr/zyro/etc/zyrovfs"}) {
            EXPECT_EQ(StatOf(shared).st_mode & 07777, 0755U) << shared;
        }
        EXPECT_EQ(StatOf("/usr/zyro/etc/zyrovfs/1001").st_mode & 07777, 01777U);
        fs::remove_all("/usr/zyro");
    }
    umask(saved);
}

TEST_F(MkdirPTest, FailedRemovalIsLoggedAndTheWalkGoesOn) {
    MakeFile(kTop + "/pinned");
    ASSERT_EQ(mount("/etc/passwd", (kTop + "/pinned").c_str(), nullptr, MS_BIND, nullptr), 0);
    EXPECT_EQ(Make(kTop + "/pinned/a", 1), -1);
    const int error = errno;
    ASSERT_EQ(umount((kTop + "/pinned").c_str()), 0);
    EXPECT_TRUE(seams::Logged("Failed to remove " + kTop + "/pinned, Device or resource busy"))
        << seams::LogDump();
    EXPECT_EQ(error, ENOTDIR);
    EXPECT_EQ(YLIBCErrGet(), 0x3c00U) << "what fails in the end is the folder below";
}

TEST_F(MkdirPTest, SystemFailuresGiveTheSystemError) {
    EXPECT_EQ(Make(kTop + "/" + std::string(300, 'x')), -1);
    EXPECT_EQ(errno, ENAMETOOLONG);
    EXPECT_EQ(YLIBCErrGet(), 0x3c00U);

    YLIBCErrSetEx(0, "", 0);
    EXPECT_EQ(Make(kTop + "/" + std::string(100000, 'x')), -1);
    EXPECT_EQ(YLIBCErrGet(), 0x3c00U);

    YLIBCErrSetEx(0, "", 0);
    ASSERT_EQ(mount("none", kTop.c_str(), "tmpfs", MS_RDONLY, nullptr), 0);
    EXPECT_EQ(Make(kTop + "/a"), -1);
    EXPECT_EQ(errno, EROFS);
    EXPECT_EQ(YLIBCErrGet(), 0x3c00U);
    ASSERT_EQ(umount(kTop.c_str()), 0);
}

TEST_F(MkdirPTest, FolderThatSomebodyElseMadeMeanwhileIsTaken) {
    instead_of_mkdir = [](const char*) {
        errno = EEXIST;  // as if it had come into being after we looked
        return -1;
    };
    EXPECT_EQ(MkdirP((kTop + "/mine").c_str(), nullptr, 0, 1001, 100, 0700), 0);
    EXPECT_EQ(YLIBCErrGet(), 0U);
}

TEST_F(MkdirPTest, BinaryNamesAreNames) {
    const std::string name = "\x01\xff\xfe \n\"'$(x)";
    EXPECT_EQ(Make(kTop + "/" + name), 0);
    EXPECT_TRUE(fs::is_directory(kTop + "/" + name));
}

TEST_F(MkdirPTest, StopPointsBehindTheLastComponentReached) {
    char* stop = nullptr;
    const std::string all = kTop + "/a/b/";
    EXPECT_EQ(MkdirP(all.c_str(), &stop, 0, kNone, kNone, kNone), 0);
    EXPECT_EQ(stop, all.c_str() + all.size() - 1);

    MakeFile(kTop + "/file");
    const std::string blocked = kTop + "/file/a/b";
    EXPECT_EQ(MkdirP(blocked.c_str(), &stop, 0, kNone, kNone, kNone), -1);
    EXPECT_EQ(stop - blocked.c_str(), static_cast<ptrdiff_t>(kTop.size() + 5));
    EXPECT_STREQ(stop, "/a/b") << "it points into the caller's text";

    EXPECT_EQ(MkdirP("/", &stop, 0, kNone, kNone, kNone), 0);
    EXPECT_STREQ(stop, "/");
}

TEST_F(CreateFolderTest, RootMakesItForACallerWhoIsAUser) {
    ASSERT_EQ(seteuid(1001), 0);
    seams::Reset();
    const bool made = CreateFolder((kTop + "/a/b").c_str(), nullptr, false, kNone, kNone, 0777);
    const uid_t after = geteuid();
    const auto calls = seams::IdentityCalls();
    ASSERT_EQ(seteuid(0), 0);
    EXPECT_TRUE(made);
    EXPECT_EQ(after, 1001U);
    EXPECT_THAT(calls, testing::ElementsAre("seteuid(0)", "seteuid(1001)"));
    EXPECT_EQ(StatOf(kTop + "/a/b").st_uid, 0U);
    EXPECT_EQ(StatOf(kTop + "/a/b").st_mode & 07777, 01777U) << "nobody takes what is another's";
}

TEST_F(CreateFolderTest, FailureTellsThePlatformErrorAndErrno) {
    MakeFile(kTop + "/file");
    EXPECT_FALSE(CreateFolder((kTop + "/file").c_str(), nullptr, false, kNone, kNone, 0777));
    EXPECT_EQ(errno, EEXIST);
    EXPECT_EQ(YLIBCErrGet(), 0x800U);
    const std::string begin = "Failed to mkdir " + kTop + "/file [0x0800 mkdir.cpp:";
    EXPECT_TRUE(seams::LoggedPart(begin)) << seams::LogDump();
    EXPECT_TRUE(seams::LoggedPart("], File exists")) << seams::LogDump();
}

TEST_F(CreateFolderTest, SystemFailureThatSaysItIsThereCountsAsSuccess) {
    chown_fails_with = EEXIST;
    EXPECT_EQ(MkdirP((kTop + "/a").c_str(), nullptr, 0, 1001, 100, 0777), -1);
    EXPECT_EQ(YLIBCErrGet(), 0x3c00U);
    EXPECT_TRUE(CreateFolder((kTop + "/b").c_str(), nullptr, false, 1001, 100, 0777));
    chown_fails_with = EPERM;
    EXPECT_FALSE(CreateFolder((kTop + "/c").c_str(), nullptr, false, 1001, 100, 0777));
}

TEST_F(CreateFolderTest, NullPathIsAFailure) {
    EXPECT_FALSE(CreateFolder(nullptr, nullptr, true, kNone, kNone, 0777));
    EXPECT_FALSE(CreateFolder("", nullptr, true, kNone, kNone, 0777));
    EXPECT_EQ(YLIBCErrGet(), 0xd00U);
}

TEST_F(CreateFolderTest, FilesInTheWayAreReplacedWhenAskedFor) {
    MakeFile(kTop + "/file");
    EXPECT_TRUE(CreateFolder((kTop + "/file/a").c_str(), nullptr, true, kNone, kNone, 0777));
    EXPECT_TRUE(fs::is_directory(kTop + "/file/a"));
}

TEST_F(CreateFolderTest, StopIsHandedThrough) {
    const std::string path = kTop + "/a";
    char* stop = nullptr;
    EXPECT_TRUE(CreateFolder(path.c_str(), &stop, true, kNone, kNone, 0777));
    EXPECT_EQ(stop, path.c_str() + path.size());
}

TEST_F(CreateFolderTest, CallerWithoutRootIdentityDoesWhatItMay) {
    fs::create_directories(kTop + "/own");
    ASSERT_EQ(chown((kTop + "/own").c_str(), 1001, 100), 0);
    const int status = support::ExitOf([] {
        if (setresgid(100, 100, 100) != 0 || setresuid(1001, 1001, 1001) != 0) {
            return 10;
        }
        if (!CreateFolder((kTop + "/own/a").c_str(), nullptr, true, kNone, kNone, 0777)) {
            return 11;
        }
        if (CreateFolder((kTop + "/a").c_str(), nullptr, true, kNone, kNone, 0777)) {
            return 12;
        }
        if (errno != EACCES || YLIBCErrGet() != 0x3c00) {
            return 13;
        }
        return geteuid() == 1001 ? 0 : 14;
    });
    EXPECT_EQ(status, 0);
    EXPECT_EQ(StatOf(kTop + "/own/a").st_uid, 1001U);
}

TEST_F(CreateParentFolderTest, IsTheFolderThatAFileStandsIn) {
    EXPECT_TRUE(CreateParentFolder(kTop + "/a/b/file", 0));
    EXPECT_TRUE(fs::is_directory(kTop + "/a/b"));
    EXPECT_FALSE(fs::exists(kTop + "/a/b/file"));
    EXPECT_TRUE(CreateParentFolder("/file", 0));
    EXPECT_TRUE(CreateParentFolder("file", 0));
    EXPECT_TRUE(CreateParentFolder("", 0));
}

TEST_F(CreateParentFolderTest, FailureIsLoggedInTheNameOfTheCaller) {
    ASSERT_EQ(mount("none", kTop.c_str(), "tmpfs", MS_RDONLY, nullptr), 0);
    EXPECT_FALSE(CreateParentFolder(kTop + "/a/file", 0, {"caller.cpp", 7}));
    ASSERT_EQ(umount(kTop.c_str()), 0);
    EXPECT_TRUE(
        seams::LoggedPart("caller.cpp:7 Failed to mkdir " + kTop + "/a, Read-only file system"))
        << seams::LogDump();
}

}  // namespace
}  // namespace ZYROVFS::Utils
