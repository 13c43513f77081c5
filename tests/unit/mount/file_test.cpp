#include <fcntl.h>
#include <gio/gio.h>
#include <gmock/gmock.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <unistd.h>

#include <climits>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <string>

#include "support/other_process.h"
#include "support/seams.h"
#include "zyrovfs/utils.h"

// A location whose access rights are known but whose mode is not, as of a remote file system.
struct ModelessFile {
    GObject parent;
    char* uri;
};
struct ModelessFileClass {
    GObjectClass parent;
};

namespace {

GFileInfo* QueryModeless(GFile* file, const char* attributes, GFileQueryInfoFlags, GCancellable*,
                         GError** error) {
    const std::string uri = reinterpret_cast<ModelessFile*>(file)->uri;
    const bool asks_mode = strcmp(attributes, "unix::mode") == 0;
    if (asks_mode && uri.find("/failing/") != std::string::npos) {
        g_set_error(error, G_IO_ERROR, G_IO_ERROR_NOT_SUPPORTED, "no modes here");
        return nullptr;
    }
    GFileInfo* info = g_file_info_new();
    if (!asks_mode) {
        const auto has = [&uri](const char* right) { return uri.find(right) != std::string::npos; };
        g_file_info_set_attribute_string(info, "owner::user", "amy");
        g_file_info_set_attribute_string(info, "owner::group", "users");
        g_file_info_set_attribute_boolean(info, "access::can-read", has("r."));
        g_file_info_set_attribute_boolean(info, "access::can-write", has("w."));
        g_file_info_set_attribute_boolean(info, "access::can-execute", has("x."));
    }
    return info;
}

void InitModeless(gpointer iface, gpointer) {
    static_cast<GFileIface*>(iface)->query_info = QueryModeless;
}

GType ModelessType() {
    static const GType type = [] {
        const GType made = g_type_register_static_simple(
            G_TYPE_OBJECT, "ModelessFile", sizeof(ModelessFileClass),
            [](gpointer klass, gpointer) {
                G_OBJECT_CLASS(klass)->finalize = [](GObject* object) {
                    g_free(reinterpret_cast<ModelessFile*>(object)->uri);
                };
            },
            sizeof(ModelessFile), nullptr, G_TYPE_FLAG_NONE);
        const GInterfaceInfo info{InitModeless, nullptr, nullptr};
        g_type_add_interface_static(made, G_TYPE_FILE, &info);
        return made;
    }();
    return type;
}

GFile* MakeModeless(GVfs*, const char* uri, gpointer) {
    auto* file = static_cast<ModelessFile*>(g_object_new(ModelessType(), nullptr));
    file->uri = g_strdup(uri);
    return G_FILE(file);
}

}  // namespace

namespace ZYROVFS::Utils {
namespace {

namespace fs = std::filesystem;
using support::OtherProcess;

const std::string kTop = "/var/tmp/file_test";
const std::string kFile = kTop + "/a/b/daemon.pid";

std::string ReadAll(const std::string& path) {
    std::ifstream stream(path, std::ios::binary);
    std::ostringstream text;
    text << stream.rdbuf();
    return text.str();
}

void Write(const std::string& path, const std::string& text) {
    fs::create_directories(fs::path(path).parent_path());
    std::ofstream(path, std::ios::binary) << text;
}

bool HoldForWriting() {
    const int fd = open(kFile.c_str(), O_RDWR | O_CLOEXEC);
    struct flock range {};
    range.l_type = F_WRLCK;
    return fd >= 0 && fcntl(fd, F_SETLK, &range) == 0;
}

class Files : public testing::Test {
  protected:
    void SetUp() override {
        fs::remove_all(kTop);
        fs::create_directories(kTop);
    }
};

using CreateFileTest = Files;
using GetFileLineTest = Files;
using GetFileInfoTest = Files;

TEST_F(CreateFileTest, WritesOneLineAndMakesTheFolders) {
    EXPECT_TRUE(CreateFile(kFile.c_str(), "unix:path=/bus"));
    EXPECT_EQ(ReadAll(kFile), "unix:path=/bus\n");
    struct stat info {};
    ASSERT_EQ(stat(kFile.c_str(), &info), 0);
    EXPECT_EQ(info.st_mode & 07777, 0600U);
    ASSERT_EQ(stat((kTop + "/a").c_str(), &info), 0);
    EXPECT_EQ(info.st_mode & 07777, 01777U);
}

TEST_F(CreateFileTest, LongerOldTextIsGone) {
    Write(kFile, std::string(100000, 'o') + "\n");
    EXPECT_TRUE(CreateFile(kFile.c_str(), "7"));
    EXPECT_EQ(ReadAll(kFile), "7\n");
    EXPECT_TRUE(CreateFile(kFile.c_str(), ""));
    EXPECT_EQ(ReadAll(kFile), "\n");
}

TEST_F(CreateFileTest, FileThatAnotherProcessHasLockedIsLeftAloneAndSuccessReported) {
    Write(kFile, "old\n");
    OtherProcess holder(HoldForWriting);
    ASSERT_TRUE(holder.ok());
    EXPECT_TRUE(CreateFile(kFile.c_str(), "new"));
    EXPECT_EQ(ReadAll(kFile), "old\n");
    EXPECT_THAT(seams::LogLines(), testing::IsEmpty());
    holder.End();
    EXPECT_TRUE(CreateFile(kFile.c_str(), "new"));
    EXPECT_EQ(ReadAll(kFile), "new\n");
}

TEST_F(CreateFileTest, LockIsGivenBack) {
    EXPECT_TRUE(CreateFile(kFile.c_str(), "1"));
    OtherProcess other(HoldForWriting);
    EXPECT_TRUE(other.ok());
}

TEST_F(CreateFileTest, NullArgumentsAreRefused) {
    EXPECT_FALSE(CreateFile(nullptr, "text"));
    EXPECT_FALSE(CreateFile(kFile.c_str(), nullptr));
    EXPECT_EQ(seams::LogLines().size(), 2U);
    EXPECT_TRUE(seams::Logged("Wrong parameters")) << seams::LogDump();
    EXPECT_FALSE(fs::exists(kFile));
}

TEST_F(CreateFileTest, FolderThatCannotBeMadeIsAFailure) {
    ASSERT_EQ(mount("none", kTop.c_str(), "tmpfs", MS_RDONLY, nullptr), 0);
    EXPECT_FALSE(CreateFile(kFile.c_str(), "1"));
    EXPECT_FALSE(CreateFile((kTop + "/direct").c_str(), "1"));
    ASSERT_EQ(umount(kTop.c_str()), 0);
    EXPECT_TRUE(seams::Logged("Failed to mkdir " + kTop + "/a/b, Read-only file system"))
        << seams::LogDump();
    EXPECT_TRUE(seams::LoggedPart(kTop + "/direct, Read-only file system")) << seams::LogDump();
}

TEST_F(CreateFileTest, FullDiskIsAFailure) {
    ASSERT_EQ(mount("none", kTop.c_str(), "tmpfs", 0, "size=64k"), 0);
    const bool written = CreateFile((kTop + "/f").c_str(), std::string(1 << 20, 'x').c_str());
    ASSERT_EQ(umount(kTop.c_str()), 0);
    EXPECT_FALSE(written);
    EXPECT_TRUE(seams::LoggedPart("Writing to file [" + kTop + "/f], ")) << seams::LogDump();
}

TEST_F(CreateFileTest, WhatCannotBeTruncatedIsAFailure) {
    EXPECT_FALSE(CreateFile("/dev/full", "1"));
    EXPECT_TRUE(seams::Logged("Could not truncate PID file [/dev/full], Invalid argument"))
        << seams::LogDump();
}

TEST_F(CreateFileTest, FolderOrLinkInTheFilesPlaceIsRefused) {
    fs::create_directories(kFile);
    EXPECT_FALSE(CreateFile(kFile.c_str(), "1"));
    fs::remove_all(kFile);
    Write(kTop + "/precious", "keep me");
    fs::create_symlink(kTop + "/precious", kFile);
    EXPECT_FALSE(CreateFile(kFile.c_str(), "1"));
    EXPECT_EQ(ReadAll(kTop + "/precious"), "keep me");
}

TEST_F(CreateFileTest, PidIsWrittenAsDecimalNumber) {
    EXPECT_TRUE(CreatePidFile(kFile.c_str(), 4711));
    EXPECT_EQ(ReadAll(kFile), "4711\n");
    EXPECT_TRUE(CreatePidFile(kFile.c_str(), INT_MAX));
    EXPECT_EQ(ReadAll(kFile), "2147483647\n");
    EXPECT_TRUE(CreatePidFile(kFile.c_str(), -1));
    EXPECT_EQ(ReadAll(kFile), "4294967295\n");
    EXPECT_FALSE(CreatePidFile(nullptr, 1));
}

TEST_F(GetFileLineTest, GivesTheFirstLineWithoutItsNewline) {
    const struct {
        std::string text;
        std::string line;
    } rows[] = {
        {"one\ntwo\n", "one"},
        {"one", "one"},
        {"one\r\n", "one\r"},
        {" \n", " "},
        {std::string("a\0b\n", 4), std::string("a\0b", 3)},
        {"\xff\xfe\n", "\xff\xfe"},
        {std::string(1 << 20, 'x') + "\n", std::string(1 << 20, 'x')},
    };
    for (const auto& row : rows) {
        Write(kFile, row.text);
        std::string line;
        EXPECT_TRUE(GetFileLine(kFile.c_str(), line));
        EXPECT_EQ(line, row.line);
    }
}

TEST_F(GetFileLineTest, ReadsWhatCreateFileWrote) {
    ASSERT_TRUE(CreateFile(kFile.c_str(), "unix:path=/bus"));
    std::string line;
    EXPECT_TRUE(GetFileLine(kFile.c_str(), line));
    EXPECT_EQ(line, "unix:path=/bus");
}

TEST_F(GetFileLineTest, AbsentAndEmptyFilesAndAnEmptyFirstLineGiveFalseWithoutALogLine) {
    std::string line = "as it was";
    EXPECT_FALSE(GetFileLine(kFile.c_str(), line));
    Write(kFile, "");
    EXPECT_FALSE(GetFileLine(kFile.c_str(), line));
    Write(kFile, "\nsecond\n");
    EXPECT_FALSE(GetFileLine(kFile.c_str(), line));
    EXPECT_EQ(line, "as it was");
    EXPECT_THAT(seams::LogLines(), testing::IsEmpty());
}

TEST_F(GetFileLineTest, NullPathIsLogged) {
    std::string line;
    EXPECT_FALSE(GetFileLine(nullptr, line));
    EXPECT_TRUE(seams::Logged("Wrong parameters")) << seams::LogDump();
}

TEST_F(GetFileLineTest, FileThatCannotBeOpenedIsLogged) {
    Write(kFile, "secret\n");
    ASSERT_EQ(chmod(kFile.c_str(), 0600), 0);
    ASSERT_EQ(seteuid(1001), 0);
    std::string line;
    const bool read = GetFileLine(kFile.c_str(), line);
    ASSERT_EQ(seteuid(0), 0);
    EXPECT_FALSE(read);
    EXPECT_TRUE(seams::Logged("Can't open file " + kFile + ", Permission denied"))
        << seams::LogDump();
}

TEST_F(GetFileLineTest, FolderFifoAndDeviceAreRefusedWithoutWaiting) {
    ASSERT_EQ(mkfifo((kTop + "/fifo").c_str(), 0666), 0);
    std::string line;
    alarm(20);
    for (const std::string& path : {kTop + "/fifo", kTop, std::string("/dev/zero")}) {
        EXPECT_FALSE(GetFileLine(path.c_str(), line)) << path;
        EXPECT_TRUE(seams::LoggedPart("Can't open file " + path)) << seams::LogDump();
    }
    alarm(0);
}

TEST_F(GetFileInfoTest, TellsOwnerGroupAndMode) {
    Write(kFile, "text");
    ASSERT_EQ(chmod(kFile.c_str(), 0640), 0);
    ASSERT_EQ(chown(kFile.c_str(), 1, 2), 0);
    std::string owner, group;
    unsigned mode = 0;
    EXPECT_EQ(GetFileInfo(kFile.c_str(), owner, group, mode), 0);
    EXPECT_EQ(owner, "daemon");
    EXPECT_EQ(group, "bin");
    EXPECT_EQ(mode & 07777, 0640U);
}

TEST_F(GetFileInfoTest, MissingFileAndNullLeaveTheOutputsAndReturnZero) {
    std::string owner = "o", group = "g";
    unsigned mode = 7;
    EXPECT_EQ(GetFileInfo((kTop + "/none").c_str(), owner, group, mode), 0);
    EXPECT_EQ(GetFileInfo(nullptr, owner, group, mode), 0);
    EXPECT_EQ(seams::LogLines().size(), 2U) << seams::LogDump();
    EXPECT_EQ(owner + group, "og");
    EXPECT_EQ(mode, 7U);
}

TEST_F(GetFileInfoTest, ModeThatCannotBeReadIsMadeOfTheAccessRights) {
    g_vfs_register_uri_scheme(g_vfs_get_default(), "modeless", MakeModeless, nullptr, nullptr,
                              nullptr, nullptr, nullptr);
    const struct {
        const char* uri;
        unsigned mode;
    } rows[] = {
        {"modeless://h/r.w.x.", 700}, {"modeless://h/r.w.", 600},
        {"modeless://h/r.x.", 500},   {"modeless://h/r.", 400},
        {"modeless://h/w.", 200},     {"modeless://h/x.", 100},
        {"modeless://h/none", 0},     {"modeless://h/failing/r.w.x.", 700},
    };
    for (const auto& row : rows) {
        std::string owner, group;
        unsigned mode = 7;
        EXPECT_EQ(GetFileInfo(row.uri, owner, group, mode), 0);
        EXPECT_EQ(mode, row.mode) << row.uri;
        EXPECT_EQ(owner, "amy");
        EXPECT_EQ(group, "users");
    }
}

const bool kLocalFilesOnly = setenv("GIO_USE_VFS", "local", 1) == 0;

}  // namespace
}  // namespace ZYROVFS::Utils
